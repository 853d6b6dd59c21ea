#!/usr/bin/env python3
"""Writes part files from the tab-separated SPI NOR fact tables.

    scripts/parts_from_tables.py tests/data/parts/spi-nor-parts.tsv \
        tests/data/parts/spi-nor-parts-more.tsv --out parts/

Each row becomes one [part.NAME] table. Parts are grouped into families (one
command set and status-register layout each); keys that every part of a
family shares are written once in the family. The output is committed and
reviewed like any hand-written part file; rerun the script rather than
editing its output, so a fix reaches every part it applies to.

Rows that the plug-in cannot drive are left out, each for a stated reason
(see SKIPPED). Parts already described by a hand-written file are skipped
too (their names are read from the existing files).

The wait rule is the one of the hand-written files (times in microseconds):
first wait = typical time, polling step = a tenth of it, limit = maximum x
1.5 (capped where that leaves the 32-bit range), erase progress step =
(limit - first wait) / 100, status-write limit = tW max x 1.5, release wait =
tRES1 x 1.5 rounded up.
"""

import argparse
import csv
import math
import os
import re
import sys
import textwrap

INT32_MAX = 2**31 - 1

# Rows left out, with the reason written into the vendor file's header.
SKIPPED = {
    "SST26VF032B": "every block is write-protected at power-up and only WREN + 98h clears it; "
                   "the tool's unlock is a status-register write",
    "SST26VF016B": "every block is write-protected at power-up and only WREN + 98h clears it; "
                   "the tool's unlock is a status-register write",
    "SST26VF064B": "every block is write-protected at power-up and only WREN + 98h clears it; "
                   "the tool's unlock is a status-register write",
    "SST25VF064C": "its status register is written only after EWSR (50h) and its block protection is set "
                   "at power-up, so the one-byte unlock would not arm and every erase would do nothing",
    "W25Q256FV": "over 16 MiB without a native 4-byte page program (12h), and the tool does not switch "
                 "address modes",
    "XM25QH512C": "over 16 MiB without a native 4-byte page program (12h)",
    "XM25QU512C": "over 16 MiB without a native 4-byte page program (12h)",
    "N25Q256A": "over 16 MiB and its native 4-byte opcodes are not confirmed by any peer table",
    "N25Q256A11": "over 16 MiB and its native 4-byte opcodes are not confirmed by any peer table",
    "IS25LP512M": "over 16 MiB; how it takes 4-byte addresses is only assumed in the tables",
    "IS25WP512M": "over 16 MiB; how it takes 4-byte addresses is only assumed in the tables",
    "XT25F256B": "over 16 MiB; how it takes 4-byte addresses is only assumed in the tables",
    "BY25Q256FS": "over 16 MiB; how it takes 4-byte addresses is only assumed in the tables",
}

# A one-byte 01h may clear status register 2 (Quad Enable, CMP) on these
# families, which have no confirmed separate register-2 write; their entries
# do not unlock by writing the status register.
UNLOCK_MAY_CLEAR_REGISTER_2 = re.compile(r"^(S25FL1\d\dK|P25Q|PY25Q|XT25F|GD25Q16C)")

# Output file (without .toml) per vendor text of the tables. Vendors that
# already have a hand-written file get a "-more" file beside it.
VENDOR_FILES = {
    "Winbond": "winbond-more", "Macronix": "macronix-more", "GigaDevice": "gigadevice-more",
    "Micron": "micron-more", "Micron (ST)": "micron-more", "ISSI": "issi-more",
    "Infineon (Spansion)": "spansion-more", "Renesas (Adesto)": "adesto-more", "Renesas (Atmel)": "adesto-more",
    "XMC": "xmc", "XTX": "xtx", "Puya": "puya", "Zbit": "zbit", "Boya": "boya", "Eon": "eon",
    "Fudan": "fudan", "ESMT": "esmt", "Zetta": "zetta", "Microchip (SST)": "microchip",
}

# Keys that name one chip: never written into a family, even when a family
# has a single part.
IDENTITY_KEYS = {"JEDEC_ID", "IDCODE", "RES_SIGNATURE", "DEVICE_SIZE", "SFDP"}

# Parts whose SFDP area, read from a real chip, is in tests/data/sfdp (part ->
# dump name); the simulator serves it instead of one written from the keys.
SFDP_DUMPS = {"W25Q64JW-IM": "W25Q64JWM", "W25Q512NW-IM": "W25Q512NW-IM", "MX25U25645G": "MX25U25645G",
              "IS25WP256": "IS25WP256", "N25Q064A": "N25Q064A"}
# Generations older than SFDP: their simulated chips ignore 5Ah.
NO_SFDP = re.compile(r"^(W25X|M25P|AT25DF|EN25F|EN25Q\d|F25L|MX25L\d+0[56]E)")
SFDP_FOLDER = os.path.join(os.path.dirname(os.path.abspath(__file__)), "..", "tests", "data", "sfdp")


def sfdp_value(part):
    if part in SFDP_DUMPS:
        with open(os.path.join(SFDP_FOLDER, SFDP_DUMPS[part] + ".sfdp.hex"), encoding="ascii") as handle:
            return "".join(handle.read().split()).upper()
    return "none" if NO_SFDP.search(part) else None

HIDDEN_REGISTER_2 = ["NOT_VALID"] * 8
WINBOND_REGISTER_1 = ["BUSY", "WEL", "BP0", "BP1", "BP2", "TB", "SEC", "SRP"]
WINBOND_REGISTER_2 = ["SRL", "QE", "NOT_VALID", "LB1", "LB2", "LB3", "CMP", "SUS"]

# Families: (name pattern, family, status labels bit 0..15, what the family comment says).
FAMILIES = [
    (r"^W25Q\d+[JN]V|^W25Q\d+[FJEN]W|^W25Q\d+[CD][LV]|^W25Q\d+FV", "WINBOND_W25Q_MORE",
     WINBOND_REGISTER_1 + WINBOND_REGISTER_2,
     "Winbond W25Q: register 2 (read with 35h) holds QE at bit 1, the lock bits and CMP."),
    (r"^W25X", "WINBOND_W25X", ["BUSY", "WEL", "BP0", "BP1", "BP2", "TB", "NOT_VALID", "SRP"] + HIDDEN_REGISTER_2,
     "Winbond W25X: one status register, no Quad Enable; 35h is not defined, so register 1 is read again."),
    (r"^MX", "MACRONIX_MX25_MORE", ["WIP", "WEL", "BP0", "BP1", "BP2", "BP3", "QE", "SRWD"] + HIDDEN_REGISTER_2,
     "Macronix: one status register with QE at bit 6 (where the part has it); 35h enters QPI mode, so register 1 "
     "is read again. The unlock's zero byte also clears QE."),
    (r"^M25PX", "MICRON_M25PX", ["WIP", "WEL", "BP0", "BP1", "BP2", "TB", "NOT_VALID", "SRWD"] + HIDDEN_REGISTER_2,
     "Micron (ST) M25PX: one status register, 4 KiB subsectors, no electronic signature."),
    (r"^M25P", "MICRON_M25P", ["WIP", "WEL", "BP0", "BP1", "BP2", "NOT_VALID", "NOT_VALID", "SRWD"] + HIDDEN_REGISTER_2,
     "Micron (ST) M25P: one status register, 64 KiB sectors (256 KiB on the M25P128)."),
    (r"^(N25Q|MT25Q)", "MICRON_25Q_MORE", ["WIP", "WEL", "BP0", "BP1", "BP2", "TB", "BP3", "SRWD"] + HIDDEN_REGISTER_2,
     "Micron N25Q/MT25Q: no Quad Enable bit (the quad-protocol configuration bits would switch the whole "
     "protocol); 35h enters quad mode on MT25Q, so register 1 is read again."),
    (r"^S25FL1\d\dK", "INFINEON_S25FL_K", WINBOND_REGISTER_1 + WINBOND_REGISTER_2,
     "Infineon S25FL1-K: Winbond-style registers, QE in register 2 bit 1, 01h takes both registers."),
    (r"^S25FL\d+[PS]", "INFINEON_S25FL_PS",
     ["WIP", "WEL", "BP0", "BP1", "BP2", "E_ERR", "P_ERR", "SRWD",
      "FREEZE", "QUAD", "TBPARM", "BPNV", "NOT_VALID", "TBPROT", "LC0", "LC1"],
     "Infineon S25FL-P/-S: configuration register 1 (read with 35h) holds QUAD at bit 1 and one-time bits; "
     "01h writes status register 1 and CR1. 20h erases only parameter sectors, so the smallest erase that "
     "works everywhere is D8h."),
    (r"^S25FL\d+L", "INFINEON_S25FL_L",
     ["WIP", "WEL", "BP0", "BP1", "BP2", "TBPROT", "SEC", "SRWD",
      "SRP1", "QUAD", "NOT_VALID", "LB1", "LB2", "LB3", "CMP", "SUS"],
     "Infineon S25FL-L: configuration register 1 (read with 35h) holds QUAD at bit 1; 01h takes two bytes."),
    (r"^IS25", "ISSI_IS25_MORE", ["WIP", "WEL", "BP0", "BP1", "BP2", "BP3", "QE", "SRWD"] + HIDDEN_REGISTER_2,
     "ISSI: one status register with QE at bit 6; 35h enters QPI mode, so register 1 is read again. The unlock's "
     "zero byte also clears QE."),
    (r"^GD25", "GIGADEVICE_GD25_MORE",
     ["WIP", "WEL", "BP0", "BP1", "BP2", "BP3", "BP4", "SRP0", "SRP1", "QE", "SUS2", "LB1", "LB2", "LB3", "CMP", "SUS1"],
     "GigaDevice GD25: register 2 (read with 35h) holds QE at bit 1, the lock bits and CMP."),
    (r"^AT25S[FL]", "ADESTO_AT25S_MORE",
     ["BUSY", "WEL", "BP0", "BP1", "BP2", "TB", "SEC", "SRP0", "SRP1", "QE", "NOT_VALID", "LB1", "LB2", "LB3", "CMP", "SUS"],
     "Renesas (Adesto) AT25SF/AT25SL: register 2 (read with 35h) holds QE at bit 1."),
    (r"^AT25DF", "ATMEL_AT25DF",
     ["BSY", "WEL", "SWP0", "SWP1", "WPP", "EPE", "NOT_VALID", "SPRL"] + HIDDEN_REGISTER_2,
     "Renesas (Atmel) AT25DF: every sector is protected at power-up; the unlock's 01h 00h is the global "
     "unprotect (it fails while SPRL = 1 and WP# is low). No Quad Enable bit."),
    (r"^(P25Q|PY25Q)", "PUYA_P25Q",
     ["WIP", "WEL", "BP0", "BP1", "BP2", "BP3", "BP4", "SRP0", "SRP1", "QE", "LB0", "LB1", "LB2", "LB3", "CMP", "SUS1"],
     "Puya P25Q/PY25Q: register 2 (read with 35h) holds QE at bit 1. The smallest erase is the 256-byte page "
     "erase 81h on P25Q."),
    (r"^P25D", "PUYA_P25D", ["WIP", "WEL", "BP0", "BP1", "BP2", "BP3", "BP4", "SRP0"] + HIDDEN_REGISTER_2,
     "Puya P25D: dual-output only, no Quad Enable; register 1 is read again for register 2."),
    (r"^(XM25Q|XT25F|ZB25VQ|BY25Q|FM25[QW]|ZD25WQ)", "VENDOR_W25Q_STYLE",
     WINBOND_REGISTER_1 + WINBOND_REGISTER_2,
     "Follows the Winbond W25Q command set and register layout: register 2 (read with 35h) holds QE at bit 1. "
     "The labels are the Winbond ones; check the datasheet before relying on a lock bit."),
    (r"^(BY25D|ZD25D|EN25|F25L)", "VENDOR_SINGLE_REGISTER",
     ["WIP", "WEL", "BP0", "BP1", "BP2", "BP3", "NOT_VALID", "SRWD"] + HIDDEN_REGISTER_2,
     "One status register and no Quad Enable bit reachable by 01h; what 35h does is not known, so register 1 "
     "is read again for register 2."),
]


def opcode_bits(hex_text):
    return format(int(hex_text, 16), "08b")


def family_of(part):
    for pattern, family, labels, comment in FAMILIES:
        if re.search(pattern, part):
            return family, labels, comment
    raise SystemExit(f"no family pattern matches {part}; add one to FAMILIES")


def has_low_confidence(source):
    return "low conf" in source or "placeholder" in source.lower()


def short_source(source):
    clauses = [c.strip() for c in source.split(";")]
    first = clauses[0]
    first = re.sub(r"\s*\(ID/size/page/erasers\)", "", first)
    shares = [c for c in clauses if c.startswith("shares ")]
    return ascii_text(first), [ascii_text(c) for c in shares]


def source_summary(source):
    """Where the identity facts come from, in a few words for the part list."""
    if source.startswith("flashrom"):
        return "flashrom chip table"
    found = re.match(r"not in flashrom: (\S+)", source)
    return (found.group(1) + " table") if found else "peer tables"


ASCII_FOR = {"\u2013": "-", "\u2014": "-", "\u00d7": "x", "\u00b5": "u", "\u2192": "->", "\u2264": "<=",
             "\u2265": ">=", "\u2019": "'", "\u201c": '"', "\u201d": '"', "\u2026": "..."}


def ascii_text(text):
    """Part files are plain ASCII: the loader refuses other bytes."""
    return "".join(ch if ord(ch) < 128 else ASCII_FOR.get(ch, "?") for ch in text)


def sector_erase_estimate_us(size):
    # (typical, maximum) of one erase of the smallest size: the vendor
    # families' usual datasheet figures, placeholders for parts whose own
    # figures are not in the reference data. Polling ends the wait when the
    # chip is done, so a typical guess costs a few polls, never a page.
    return {256: (1000, 20000), 4096: (45000, 400000), 65536: (600000, 3000000),
            262144: (520000, 6000000)}[size]


# (typical, maximum) of a block erase whose SFDP table (before revision 1.5)
# names the erase but not its time: placeholders with a generous maximum.
BLOCK_ERASE_PLACEHOLDER_US = {32768: (120000, 2000000), 65536: (200000, 3000000)}


def sfdp_erase_types(part):
    """Erase types of a part's real SFDP dump: [(bytes, opcode, typical us,
    maximum us)] in the table's order, times None where the table (before
    revision 1.5) has none; [] without a dump."""
    if part not in SFDP_DUMPS:
        return []
    table = bytes.fromhex(sfdp_value(part))
    for header in range(table[6] + 1):
        entry = table[8 + 8 * header:16 + 8 * header]
        if entry[0] == 0x00 and entry[7] == 0xFF:  # the basic flash parameter table
            length, start = entry[3], entry[4] | entry[5] << 8 | entry[6] << 16
            break
    else:
        return []
    dword = lambda k: int.from_bytes(table[start + 4 * k:start + 4 * k + 4], "little")
    times = dword(9) if length >= 10 else None
    types = []
    for k, (word, shift) in enumerate([(7, 0), (7, 16), (8, 0), (8, 16)]):
        field = dword(word) >> shift & 0xFFFF
        if field & 0xFF == 0:
            continue
        typical = maximum = None
        if times is not None:
            low = (4, 11, 18, 25)[k]
            count, unit = times >> low & 0x1F, times >> (low + 5) & 3
            typical = (count + 1) * (1000, 16000, 128000, 1000000)[unit]
            maximum = typical * 2 * ((times & 0xF) + 1)
        types.append((1 << (field & 0xFF), "%02X" % (field >> 8), typical, maximum))
    return types


def part_keys(row):
    """All keys of one part, as (key, value) in file order."""
    size = int(row["size_bytes"])
    four_byte = int(row["addr_bits"]) == 32
    qe = row["qe_location"]
    wrsr_bits = int(row["sr_bits_written_by_wrsr"])
    keys = []
    add = lambda k, v: keys.append((k, v))

    add("VENDOR", row["vendor"])
    add("JEDEC_ID", row["jedec_id_hex"])
    add("IDCODE", row["jedec_id_hex"])
    if row["res_signature_hex"] != "-":
        add("RES_SIGNATURE", row["res_signature_hex"])
    add("DEVICE_SIZE", size * 8)
    add("QE_LOCATION", qe)
    add("WRSR_BITS", wrsr_bits)

    add("ENABLE_INSTRUCTION", opcode_bits(row["wren"]))
    add("DISABLE_INSTRUCTION", opcode_bits(row["wrdi"]))
    add("IDENTIFICATION_INSTRUCTION", opcode_bits(row["rdid"]))
    add("READSTATUS_INSTRUCTION", opcode_bits(row["rdsr"]))
    # 35h only where it reads the register holding QE; elsewhere it may enter
    # a quad mode, so register 1 is read again.
    rdsr2 = row["rdsr2"] if qe == "SR2.1" and row["rdsr2"] != "-" else row["rdsr"]
    add("READSTATUS2_INSTRUCTION", opcode_bits(rdsr2))
    add("WRITESTATUS_INSTRUCTION", opcode_bits(row["wrsr"]))
    add("WRITESR_INSTRUCTION", opcode_bits(row["wrsr"]))
    # Over 16 MiB: the opcodes that always take a 4-byte address, so no mode
    # switch is needed or left behind.
    native = {"03": "13", "0B": "0C", "02": "12", "20": "21", "52": "5C", "D8": "DC"}
    pick = lambda op: native[op] if four_byte else op
    add("READ_INSTRUCTION", opcode_bits(pick(row["read"])))
    add("FASTREAD_INSTRUCTION", opcode_bits(pick(row["fast_read"])))
    add("PAGEPROGRAM_INSTRUCTION", opcode_bits(pick(row["pp"])))
    add("SECTORERASE_INSTRUCTION", opcode_bits(pick(row["se"])))
    sector = int(row["se_size_bytes"])
    add("SECTOR_SIZE", sector)
    # Each erase size the real SFDP table lists with its times; otherwise the
    # smallest erase with family estimates.
    erase_types = {size: (op, typ, mx) for size, op, typ, mx in sfdp_erase_types(row["part"])}
    timed = sector in erase_types and erase_types[sector][1] is not None
    typ, mx = erase_types[sector][1:] if timed else sector_erase_estimate_us(sector)
    add("SECTORERASE_WAITTIME", typ)
    add("SECTORERASE_WAITTIME_INC", max(1, typ // 10))
    add("SECTORERASE_MAXWAITTIME", mx * 3 // 2)
    for size, prefix, simulated in ((32768, "BLOCKERASE32", "SIM_BLOCK32_ERASE_US"),
                                    (65536, "BLOCKERASE64", "SIM_BLOCK64_ERASE_US")):
        if size == sector or size not in erase_types:
            continue
        op, typ, mx = erase_types[size]
        if typ is None:
            typ, mx = BLOCK_ERASE_PLACEHOLDER_US[size]
        add(prefix + "_INSTRUCTION", opcode_bits(pick(op)))
        add(prefix + "_SIZE", size)
        add(prefix + "_WAITTIME", typ)
        add(prefix + "_WAITTIME_INC", max(1, typ // 10))
        add(prefix + "_MAXWAITTIME", mx * 3 // 2)
        add(simulated, typ)
    if timed:
        add("SIM_SECTOR_ERASE_US", erase_types[sector][1])
    add("BULKERASE_INSTRUCTION", opcode_bits(row["be"]))
    has_dp = row["dp"] != "-"
    has_res = row["res"] != "-"
    add("DEEPDOWN_INSTRUCTION", opcode_bits(row["dp"]) if has_dp else "00000000")
    add("RELEASE_INSTRUCTION", opcode_bits(row["res"]) if has_dp and has_res else "00000000")
    add("READSIGNATURE_INSTRUCTION", opcode_bits(row["res"]) if has_res else "00000000")

    address = 32 if four_byte else 24
    page_bits = int(row["page_bytes"]) * 8
    add("ADDRESS_SIZE", address)
    add("READ_SIZE", 8 + address)
    add("PAGE_ADDRESS_START_INDEX", 8)
    add("DATA_START_INDEX", 8 + address)
    add("PAGE_SIZE", page_bits)
    add("TOTAL_SHIFT_SIZE", 8 + address + page_bits)

    tpp_typ, tpp_max = int(row["tpp_typ_us"]), int(row["tpp_max_us"])
    add("PROGRAM_WAITTIME", tpp_typ)
    add("PROGRAM_WAITTIME_INC", max(1, tpp_typ // 10))
    add("PROGRAM_MAXWAITTIME", tpp_max * 3 // 2)
    add("SIM_PAGE_PROGRAM_US", tpp_typ)
    tbe_typ, tbe_max = int(row["tbe_typ_ms"]) * 1000, int(row["tbe_max_ms"]) * 1000
    step = max(1, tbe_typ // 10)
    limit = tbe_max * 3 // 2
    capped = limit + step > INT32_MAX
    if capped:
        # The poll adds one step before it compares, and both must stay
        # 32-bit numbers: keep the limit a whole second below that.
        limit = (INT32_MAX - step) // 1000000 * 1000000
    add("BULKERASE_WAITTIME", tbe_typ)
    add("BULKERASE_WAITTIME_INC", step)
    add("BULKERASE_MAXWAITTIME", limit)
    add("PROGRESS_ERASE_WAITTIME_INC", max(1, (limit - tbe_typ) // 100))
    add("SIM_BULK_ERASE_US", tbe_typ)
    tw = int(row["tw_max_ms"]) * 1000
    add("WRITESTATUS_WAITTIME", tw)
    add("WRSR_MAXWAITTIME", tw * 3 // 2)
    add("SIM_WRITE_STATUS_US", tw)
    if row["tres_us"] != "-" and has_dp:
        add("RELEASE_FROM_STANDBY_MAX_WAITTIME", math.ceil(int(row["tres_us"]) * 1.5))
        add("SIM_RELEASE_US", int(row["tres_us"]))
    else:
        add("RELEASE_FROM_STANDBY_MAX_WAITTIME", 1)
        add("SIM_RELEASE_US", 0)

    add("USE_RES", "FALSE")
    add("INSTRUCTION_LENGTH", 8)
    add("USE_UNLOCKSR", "FALSE" if UNLOCK_MAY_CLEAR_REGISTER_2.search(row["part"]) else "TRUE")
    add("READ_STATUS_ENABLED", "TRUE")
    add("X2_READ", "FALSE")
    add("X4_READ", "TRUE" if qe == "SR2.1" and wrsr_bits == 16 else "FALSE")
    add("STATUS_REGISTER_LENGTH", 16)
    low = has_low_confidence(row["source"])
    sfdp = sfdp_value(row["part"])
    if sfdp is not None:
        add("SFDP", sfdp)
    add("SOURCE", source_summary(row["source"]) + ("; typical times estimated" if low else ""))
    return keys, capped, low


def value_text(value):
    return str(value) if isinstance(value, int) else '"' + value + '"'


def description(row):
    size = int(row["size_bytes"])
    mbit = size * 8 // (1 << 20)
    size_text = f"{mbit} Mbit" if mbit else f"{size * 8 // 1024} Kbit"
    mib = size / (1 << 20)
    bytes_text = f"{int(mib)} MiB" if mib >= 1 else f"{size // 1024} KiB"
    return f"{row['vendor']} {row['part']}, {size_text} ({bytes_text}) SPI NOR"


def render(file_stem, rows, skipped, tables):
    families = {}
    for row in rows:
        family, labels, comment = family_of(row["part"])
        keys, capped, low = part_keys(row)
        for bit, label in enumerate(labels):
            keys.append((f"STATUS_LOCATION_{bit}", label))
        families.setdefault(family, {"comment": comment, "parts": []})["parts"].append((row, keys, capped, low))

    out = []
    vendors = sorted({row["vendor"] for row in rows} | {vendor for vendor, _, _ in skipped})
    out.append(f"# {', '.join(vendors)} serial NOR flash: parts generated from the SPI NOR fact tables.")
    out.append("#")
    out.append("# Written by scripts/parts_from_tables.py from " + ", ".join(os.path.basename(t) for t in tables) + ";")
    out.append("# change the script or the tables and rerun it rather than editing this file.")
    out.append("# Where the facts come from: IDs, sizes, pages, erase opcodes and the two-byte")
    out.append("# status write from flashrom's chip tables (b946ca13a21a) or, for parts it lacks,")
    out.append("# the Linux and U-Boot SPI NOR tables; Quad Enable positions from ESP-IDF,")
    out.append("# Adafruit and Linux; timings from vendor QSPI drivers where one exists, else")
    out.append("# family values scaled by density. Each part names its own source below, and")
    out.append("# SOURCE says when its typical times are estimates.")
    out.append("#")
    out.append("# Wait rule (microseconds), as in the hand-written files: first wait = typical")
    out.append("# time, polling step = a tenth of it, limit = maximum x 1.5, erase progress")
    out.append("# step = (limit - first wait) / 100, status-write limit = tW max x 1.5,")
    out.append("# release wait = tRES1 x 1.5 rounded up. Erase sizes and times: a part with")
    out.append("# a real SFDP table (SFDP key) takes its erase types and typical and maximum")
    out.append("# times from it (a table without times: its erase types, with placeholder")
    out.append("# times of 120 ms / 2 s for 32 KiB and 200 ms / 3 s for 64 KiB); the others")
    out.append("# keep their smallest erase with family estimates (typical 45 ms and")
    out.append("# maximum 400 ms for 4 KiB) as placeholders.")
    if skipped:
        out.append("#")
        out.append("# Left out:")
        for _, part, reason in skipped:
            out.append(f"#   {part}: {reason}.")
    for family, body in families.items():
        parts = body["parts"]
        # The family holds each key's most common value; a part writes only
        # the keys where it differs.
        # Keys some part lacks stay with the parts, or those parts would
        # inherit them.
        shared = {}
        for key, _ in parts[0][1]:
            values = [dict(keys).get(key) for _, keys, _, _ in parts]
            if None not in values and key not in IDENTITY_KEYS:
                shared[key] = max(values, key=values.count)
        family_name = family.replace("VENDOR", file_stem.replace("-more", "").upper())
        out.append("")
        out.extend("# " + line for line in textwrap.wrap(body["comment"], 96))
        out.append(f"[family.{family_name}]")
        for key, _ in parts[0][1]:
            if key in shared:
                out.append(f"{key} = {value_text(shared[key])}")
        for row, keys, capped, low in parts:
            first, shares = short_source(row["source"])
            out.append("")
            out.append(f"# {first}.")
            for clause in shares:
                out.append(f"# It {clause}.")
            if low:
                out.append("# The typical times are estimates (low confidence in the tables).")
            if capped:
                out.append(f"# Chip erase maximum {int(row['tbe_max_ms']) // 1000} s x 1.5 does not fit the 32-bit")
                out.append("# limit the validator enforces (limit plus polling step): capped below it.")
            if "USE_UNLOCKSR" in dict(keys) and dict(keys)["USE_UNLOCKSR"] == "FALSE":
                out.append("# No unlock: a one-byte 01h may clear status register 2 (QE, CMP) on this part.")
            out.append(f"[part.{row['part']}]")
            out.append(f'extends = "{family_name}"')
            out.append(f'DESCRIPTION = "{description(row)}"')
            for key, value in keys:
                if shared.get(key) != value:
                    out.append(f"{key} = {value_text(value)}")
    return "\n".join(out) + "\n"


def hand_written_parts(folder, generated_stems):
    names = set()
    for name in os.listdir(folder):
        if not name.endswith(".toml") or name[:-5] in generated_stems:
            continue
        with open(os.path.join(folder, name), encoding="ascii") as handle:
            names.update(re.findall(r"^\[part\.([^\]]+)\]", handle.read(), re.M))
    return names


def main():
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    parser.add_argument("tables", nargs="+")
    parser.add_argument("--out", required=True)
    args = parser.parse_args()

    rows = []
    for table in args.tables:
        with open(table, encoding="utf-8") as handle:
            rows.extend(csv.DictReader(handle, delimiter="\t", quoting=csv.QUOTE_NONE))
    stems = set(VENDOR_FILES.values())
    existing = hand_written_parts(args.out, stems)
    by_file, skipped_by_file = {}, {}
    for row in rows:
        stem = VENDOR_FILES[row["vendor"]]
        if row["part"] in existing:
            continue
        if row["part"] in SKIPPED:
            skipped_by_file.setdefault(stem, []).append((row["vendor"], row["part"], SKIPPED[row["part"]]))
            continue
        by_file.setdefault(stem, []).append(row)
    for stem in sorted(stems):
        path = os.path.join(args.out, stem + ".toml")
        if stem not in by_file:
            if stem in skipped_by_file:
                print(f"{stem}: every row is left out: " +
                      ", ".join(p for _, p, _ in skipped_by_file[stem]), file=sys.stderr)
            continue
        with open(path, "w", encoding="ascii") as handle:
            handle.write(render(stem, by_file[stem], skipped_by_file.get(stem, []), args.tables))
        print(f"{path}: {len(by_file[stem])} parts")


if __name__ == "__main__":
    main()

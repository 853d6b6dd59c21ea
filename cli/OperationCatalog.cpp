#include "cli/OperationCatalog.h"

namespace vorant::cli {

namespace {

const SwitchInfo kErase{"-e"}, kEraseLong{"-erase"}, kVerify{"-v"}, kVerifyLong{"-verify"},
    kQeBit{"-qebit"}, kFile{"-f", true}, kFileLong{"-file", true};
// Filters of the part list; long, as a user types them after 'parts'.
const SwitchInfo kVendor{"--vendor", true, "a vendor name"}, kSize{"--size", true, "a size such as 16MiB"},
    kId{"--id", true, "a JEDEC ID such as EF4018"};

std::vector<OperationInfo> buildCatalog() {
    using O = Operation;
    using K = OperandKind;
    return {
        {O::Program, "program", "program FILE [-e|-erase] [-v|-verify] [-qebit]",
         "write FILE (binary, Intel HEX or S-records) where its addresses say, erasing and rewriting only the blocks it covers, then verify; -e erases the whole chip first",
         K::ImageFile, {kErase, kEraseLong, kVerify, kVerifyLong, kQeBit}, true, true, "program"},
        {O::Verify, "verify", "verify FILE [-v|-verify]",
         "compare the flash with FILE (-v: without the status display)", K::ImageFile,
         {kVerify, kVerifyLong}, true, true, "verify"},
        {O::Checksum, "checksum", "checksum FILE [-v|-verify]",
         "CRC-32 of the bytes FILE holds and of the flash there (--whole-span: every byte from address 0)", K::ImageFile,
         {kVerify, kVerifyLong}, true, false, ""},
        {O::Erase, "erase", "erase [-e|-erase] [-qebit]",
         "erase the whole flash (-e: without the status display; -qebit: clear Quad Enable)", K::None,
         {kErase, kEraseLong, kQeBit}, true, true, "erase"},
        {O::BlankCheck, "blankcheck", "blankcheck", "check that the flash is erased (exit 0: blank)",
         K::None, {}, true, true, "blankcheck"},
        {O::Readback, "readback", "readback -f FILE",
         "read the whole flash into FILE (format from its extension; - for standard output)", K::None, {kFile, kFileLong},
         true, false, "readbacktofile"},
        {O::IdCode, "idcode", "idcode", "read and show the 24-bit JEDEC ID", K::None, {}, true, false,
         ""},
        {O::Signature, "signature", "signature", "read and show the electronic signature", K::None, {},
         true, false, ""},
        {O::Validate, "validate", "validate", "check that the chip's ID is the part's", K::None, {},
         true, false, ""},
        {O::Status, "status", "status", "show the status registers", K::None, {}, true, false, ""},
        {O::Release, "release", "release", "release the chip from deep power-down", K::None, {}, true,
         true, ""},
        {O::Unlock, "unlock", "unlock", "clear the block-protect bits", K::None, {}, true, true, ""},
        {O::QuadEnable, "qe", "qe set|clear", "set or clear Quad Enable (parts with X4_READ only)", K::QeMode, {}, true,
         true, ""},
        {O::Sfdp, "sfdp", "sfdp", "read the chip's SFDP table (5Ah) and show it decoded", K::None, {}, true, false,
         ""},
        {O::Parts, "parts", "parts [PATTERN] [--vendor NAME] [--size SIZE] [--id JEDECID]",
         "list the part database (PATTERN: '*' and '?' wildcards, any case; --vendor: part of the name)",
         K::OptionalPattern, {kVendor, kSize, kId},
         false, false, ""},
        {O::Ports, "ports", "ports", "list the cables found on this machine: spidev nodes, FTDI and CH341A devices",
         K::None, {}, false, false, ""},
        {O::Play, "play", "play FILE.svf",
         "play a recorded SVF file on the simulated flash and report mismatches", K::SvfFile, {}, false,
         false, ""},
    };
}

}  // namespace

const std::vector<OperationInfo>& operationCatalog() {
    static const std::vector<OperationInfo> catalog = buildCatalog();
    return catalog;
}

const OperationInfo* findOperation(std::string_view name) {
    for (const OperationInfo& info : operationCatalog())
        if (info.name == name) return &info;
    return nullptr;
}

std::string operationNames() {
    std::string names;
    for (const OperationInfo& info : operationCatalog()) {
        if (!names.empty()) names += ", ";
        names += info.name;
    }
    return names;
}

}  // namespace vorant::cli

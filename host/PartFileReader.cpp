#include "PartFileReader.h"

#include "VorantException.h"

#include <cstdint>
#include <cstdio>
#include <string_view>

namespace vorant::host::toml_checks {

// toml++ checks its own assumptions about the text in hand with TOML_ASSERT
// and TOML_ASSERT_ASSUME. Some malformed files break them ("[}", "a = [}"):
// a debug build then aborts, and with NDEBUG they become assumptions the
// optimiser may build on. Here every such check throws, in every build, and
// the loader reports the file as malformed instead.
struct CheckFailed {
    const char* check;
};

[[noreturn]] void fail(const char* check) { throw CheckFailed{check}; }

}  // namespace vorant::host::toml_checks

#define TOML_EXCEPTIONS 1
// The library's configuration header decides both macros (without regard to
// a definition made earlier when NDEBUG is set), so they are replaced after
// it and before any code that uses them.
#include <toml++/impl/preprocessor.h>
#undef TOML_ASSERT
#define TOML_ASSERT(expr) \
    (static_cast<bool>(expr) ? static_cast<void>(0) : ::vorant::host::toml_checks::fail(#expr))
#undef TOML_ASSERT_ASSUME
#define TOML_ASSERT_ASSUME(expr) TOML_ASSERT(expr)
#include <toml++/toml.h>

namespace vorant::host {
namespace {

std::string where(const toml::source_region& region) {
    return std::to_string(region.begin.line) + ":" + std::to_string(region.begin.column);
}

// The shipped part files are ASCII, and keeping toml++ to ASCII keeps it out
// of its Unicode tables (3.3.0 reaches an unreachable branch for some code
// points, CF AD among them). The first byte past ASCII is named with its
// line, column and offset.
void requireAscii(const std::string& text, const std::string& sourceName) {
    std::size_t line = 1, lineStart = 0;
    for (std::size_t offset = 0; offset < text.size(); ++offset) {
        const auto byte = static_cast<unsigned char>(text[offset]);
        if (byte == '\n') {
            ++line;
            lineStart = offset + 1;
        } else if (byte >= 0x80) {
            char hex[8];
            std::snprintf(hex, sizeof hex, "0x%02X", byte);
            throw VorantException(sourceName + ":" + std::to_string(line) + ":" +
                                  std::to_string(offset - lineStart + 1) + ": byte " + hex + " at offset " +
                                  std::to_string(offset) + " is not ASCII; part files are plain ASCII text");
        }
    }
}

// A TOML value as the text the database stores.
std::string valueText(const toml::node& node, const std::string& context) {
    if (auto s = node.as_string()) return s->get();
    if (auto b = node.as_boolean()) return b->get() ? "TRUE" : "FALSE";
    if (auto i = node.as_integer()) {
        const std::int64_t v = i->get();
        if (v < INT32_MIN || v > INT32_MAX)
            throw VorantException(context + ": " + std::to_string(v) + " is outside the 32-bit range");
        return std::to_string(v);
    }
    throw VorantException(context + ": expected a text, a whole number or true/false");
}

PartProperties readTable(const toml::table& table, const std::string& context) {
    PartProperties result;
    for (const auto& [key, node] : table) {
        const std::string name(key.str());
        result[name] = valueText(node, context + ": " + name);
    }
    return result;
}

toml::table parseToml(const std::string& text, const std::string& sourceName) {
    try {
        return toml::parse(text, std::string_view(sourceName));
    } catch (const toml::parse_error& error) {
        throw VorantException(sourceName + ":" + where(error.source()) + ": " + std::string(error.description()));
    } catch (const toml_checks::CheckFailed& failed) {
        throw VorantException(sourceName + ": malformed TOML: the reader stopped where its check '" +
                              std::string(failed.check) + "' failed");
    }
}

}  // namespace

PartFileTables readPartFileText(const std::string& text, const std::string& sourceName) {
    requireAscii(text, sourceName);
    const toml::table root = parseToml(text, sourceName);
    PartFileTables parsed;
    for (const auto& [key, node] : root) {
        const std::string section(key.str());
        if (section != "family" && section != "part")
            throw VorantException(sourceName + ": unknown table '" + section +
                                  "' (a part file holds [family.NAME] and [part.NAME] tables)");
        const toml::table* entries = node.as_table();
        if (!entries) throw VorantException(sourceName + ": '" + section + "' must be a table");
        auto& target = section == "family" ? parsed.families : parsed.parts;
        for (const auto& [name, body] : *entries) {
            const std::string entryName(name.str());
            const toml::table* table = body.as_table();
            const std::string context = sourceName + ": " + section + " " + entryName;
            if (!table) throw VorantException(context + ": must be a table of keys");
            target[entryName] = readTable(*table, context);
        }
    }
    return parsed;
}

}  // namespace vorant::host

#pragma once
// Part file text to its tables: the [family.NAME] and [part.NAME] tables of
// one TOML file, each as key -> value text, before families are resolved and
// parts validated. This is the only place that reads TOML.

#include <map>
#include <string>

namespace vorant::host {

using PartProperties = std::map<std::string, std::string>;

struct PartFileTables {
    std::map<std::string, PartProperties> families;
    std::map<std::string, PartProperties> parts;
};

// Throws VorantException naming sourceName (and the line and column where
// known) for text that is not ASCII, not TOML, or not laid out as families
// and parts of numbers, texts and flags.
PartFileTables readPartFileText(const std::string& text, const std::string& sourceName);

}  // namespace vorant::host

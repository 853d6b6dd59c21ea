#pragma once
#include <map>
#include <string>

// The keys a part file may hold. A key outside this list is almost always a
// misspelling, and a misspelt key would otherwise leave the family's value
// (or no value) in force without a word, so loading refuses it.
namespace vorant::host {

bool isKnownPartKey(const std::string& key);

// The known key closest to `key` in edit distance (letter case ignored).
std::string nearestPartKey(const std::string& key);

// Throws VorantException "<source>: <kind> <name>: <key>: unknown key; did
// you mean '<nearest>'?" for the first unknown key of one table.
void checkPartKeys(const std::string& sourceName, const std::string& kind, const std::string& name,
                   const std::map<std::string, std::string>& properties);

}  // namespace vorant::host

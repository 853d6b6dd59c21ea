#pragma once
// A --port value: "kind[:path][,key=value...]".
//
// Everything after the first colon up to the first comma is the path, so
// a Windows file name such as sim:C:\flash.bin keeps its drive letter and
// openocd:HOST:PORT keeps both parts for the port to split. Keys follow,
// each once.

#include <map>
#include <string>

namespace vorant::ports {

struct PortInfo;

struct PortAddress {
    std::string text{};  // as the user gave it, for messages
    std::string kind{};
    std::string path{};
    bool hasPath = false;
    std::map<std::string, std::string> keys{};

    // The key's value, or `fallback` when it was not given. Inline: every
    // port library reads its keys, below the table that lists the ports.
    std::string key(const std::string& name, const std::string& fallback = {}) const {
        const auto found = keys.find(name);
        return found == keys.end() ? fallback : found->second;
    }
};

// Splits the text and checks it against the row of its kind: a known kind,
// a path where the row wants one and none where it takes none, known keys
// each given once with a value. Throws PortError (BadRequest) naming the
// text and what would be right.
PortAddress parsePortAddress(const std::string& text);

// The same checks of an address built elsewhere against its row.
void checkPortAddress(const PortAddress& address, const PortInfo& row);

}  // namespace vorant::ports

#include "ports/PortAddress.h"

#include "ports/PortError.h"
#include "ports/PortTable.h"

namespace vorant::ports {

namespace {

[[noreturn]] void refuse(const std::string& text, const std::string& why) {
    throw PortError(PortError::Kind::BadRequest, "--port " + text + ": " + why);
}

std::string keyList(const PortInfo& row) {
    std::string list;
    for (const PortKey& key : row.keys) list += (list.empty() ? "" : ", ") + key.name;
    return list;
}

// How the row's address is written: "sim[:FILE]", "svf:FILE[,bridge=NAME]".
std::string form(const PortInfo& row) {
    std::string text = row.name;
    if (row.path == PathUse::Required) text += ":" + row.pathName;
    if (row.path == PathUse::Optional) text += "[:" + row.pathName + "]";
    for (const PortKey& key : row.keys) text += "[," + key.name + "=" + key.valueName + "]";
    return text;
}

}  // namespace

PortAddress parsePortAddress(const std::string& text) {
    PortAddress address;
    address.text = text;
    const std::size_t kindEnd = text.find_first_of(":,");
    address.kind = text.substr(0, kindEnd);
    std::size_t next = kindEnd;
    if (next != std::string::npos && text[next] == ':') {
        const std::size_t pathEnd = text.find(',', next + 1);
        address.hasPath = true;
        address.path = text.substr(next + 1, pathEnd == std::string::npos ? std::string::npos : pathEnd - next - 1);
        next = pathEnd;
    }
    while (next != std::string::npos) {
        const std::size_t end = text.find(',', next + 1);
        const std::string item = text.substr(next + 1, end == std::string::npos ? std::string::npos : end - next - 1);
        const std::size_t equals = item.find('=');
        if (equals == std::string::npos || equals == 0)
            refuse(text, "'" + item + "' is not KEY=VALUE; write the options as ,key=value after the port");
        const std::string name = item.substr(0, equals);
        if (!address.keys.emplace(name, item.substr(equals + 1)).second)
            refuse(text, "'" + name + "' is given twice; give each key once");
        next = end;
    }
    const PortInfo* row = findPort(address.kind);
    if (row == nullptr)
        refuse(text, "unknown port '" + address.kind + "'; the ports are " + portNames() +
                         " ('vorant-spi --help' shows their forms)");
    checkPortAddress(address, *row);
    return address;
}

void checkPortAddress(const PortAddress& address, const PortInfo& row) {
    const std::string& text = address.text.empty() ? address.kind : address.text;
    if (row.path == PathUse::Required && address.path.empty())
        refuse(text, row.name + " needs a " + row.pathName + ": --port " + form(row));
    if (row.path == PathUse::Optional && address.hasPath && address.path.empty())
        refuse(text, "the " + row.pathName + " after the colon is empty; --port " + form(row));
    if (row.path == PathUse::None && address.hasPath)
        refuse(text, row.name + " takes nothing after a colon; --port " + form(row));
    for (const auto& [name, value] : address.keys) {
        if (!row.takesKey(name))
            refuse(text, row.name + " has no key '" + name + "'" +
                             (row.keys.empty() ? "; it takes none" : "; its keys are " + keyList(row)));
        if (value.empty()) refuse(text, "'" + name + "=' needs a value");
    }
}

}  // namespace vorant::ports

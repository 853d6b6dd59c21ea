#include "UT_CMDARGS.h"

#include <utility>

UT_CMDSWINFO::UT_CMDSWINFO(std::string name, std::vector<std::string> args)
    : name_(std::move(name)), args_(std::move(args)) {}

const char* UT_CMDSWINFO::getargtxt(short i) const {
    if (i < 0 || static_cast<std::size_t>(i) >= args_.size()) return nullptr;
    return args_[static_cast<std::size_t>(i)].c_str();
}

UT_CMDARGS::UT_CMDARGS(const std::vector<std::string>& tokens) {
    for (const std::string& token : tokens) {
        // A lone "-" is an argument (conventionally standard input), not a switch.
        if (token.size() > 1 && token[0] == '-') {
            switches_.emplace_back(token, std::vector<std::string>{});
        } else if (switches_.empty()) {
            positional_.push_back(token);
        } else {
            switches_.back().addArgument(token);
        }
    }
}

const UT_CMDSWINFO* UT_CMDARGS::getsw(const char* name, short) const {
    if (!name) return nullptr;
    for (const auto& sw : switches_)
        if (sw.name() == std::string(name)) return &sw;
    return nullptr;
}

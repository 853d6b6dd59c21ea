#pragma once
#include "HostExport.h"

#include <string>
#include <utility>
#include <vector>

// One command switch and its arguments.
class VORANT_HOST_API UT_CMDSWINFO {
public:
    UT_CMDSWINFO(std::string name, std::vector<std::string> args);
    const char* name() const { return name_.c_str(); }
    // The i-th argument text, or null when there is none.
    const char* getargtxt(short i) const;
    int argCount() const { return static_cast<int>(args_.size()); }
    void addArgument(std::string text) { args_.push_back(std::move(text)); }

private:
    std::string name_;
    std::vector<std::string> args_;
};

// An operation's switches, parsed from argument tokens such as
// {"-e", "-f", "name.bin"}. A token starting with '-' opens a switch; the
// tokens after it that do not start with '-' are its arguments. Tokens
// before the first switch are positional.
class VORANT_HOST_API UT_CMDARGS {
public:
    UT_CMDARGS() = default;
    explicit UT_CMDARGS(const std::vector<std::string>& tokens);

    // The switch called `name` (exact, as given with its dash), or null.
    // When a switch is given twice the first one counts.
    const UT_CMDSWINFO* getsw(const char* name, short) const;
    const std::vector<UT_CMDSWINFO>& switches() const { return switches_; }
    const std::vector<std::string>& positional() const { return positional_; }

private:
    std::vector<UT_CMDSWINFO> switches_;
    std::vector<std::string> positional_;
};

// Text services of the host: the string type's formatting, the text pool,
// case-insensitive comparison and matching, the environment.
#include "PortString.h"
#include "UT_STR.h"

#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <mutex>
#include <string>
#include <unordered_set>
#include <vector>

namespace {

std::string formatText(const char* format, std::va_list args) {
    if (!format) return {};
    std::va_list copy;
    va_copy(copy, args);
    const int needed = std::vsnprintf(nullptr, 0, format, copy);
    va_end(copy);
    if (needed <= 0) return {};
    std::vector<char> buffer(static_cast<std::size_t>(needed) + 1);
    std::vsnprintf(buffer.data(), buffer.size(), format, args);
    return std::string(buffer.data(), static_cast<std::size_t>(needed));
}

int lower(char c) { return std::tolower(static_cast<unsigned char>(c)); }

// Wildcard match, '*' any run and '?' one character, ignoring case.
// Iterative with one backtrack point, so it is linear in practice and never
// recurses deeply on long patterns.
bool wildcardMatch(const char* text, const char* pattern) {
    const char* star = nullptr;
    const char* resume = nullptr;
    while (*text) {
        if (*pattern == '*') {
            star = pattern++;
            resume = text;
        } else if (*pattern == '?' || (*pattern && lower(*pattern) == lower(*text))) {
            ++pattern;
            ++text;
        } else if (star) {
            pattern = star + 1;
            text = ++resume;
        } else {
            return false;
        }
    }
    while (*pattern == '*') ++pattern;
    return *pattern == '\0';
}

}  // namespace

namespace Port {

char* internText(const char* text) {
    // Node-based set: element addresses stay valid as the pool grows.
    static std::mutex mutex;
    static std::unordered_set<std::string> pool;
    std::lock_guard<std::mutex> lock(mutex);
    auto it = pool.insert(text ? text : "").first;
    return const_cast<char*>(it->c_str());
}

std::string vformat(const char* format, std::va_list args) { return formatText(format, args); }

}  // namespace Port

int UT_STR::ICompare(const char* a, const char* b) {
    if (!a || !b) return (a == b) ? 0 : (a ? 1 : -1);
    for (;; ++a, ++b) {
        const int diff = lower(*a) - lower(*b);
        if (diff != 0 || *a == '\0') return diff;
    }
}

int UT_STR::IMatch(const char* text, const char* pattern) {
    if (!text || !pattern) return 0;
    return wildcardMatch(text, pattern) ? 1 : 0;
}

char* UT_STR::Dup(const char* text) { return Port::internText(text); }

const char* Port_Env::GetEnv(const char* name) { return name ? std::getenv(name) : nullptr; }

#pragma once
#include "HostExport.h"

#include <cstdarg>
#include <cstddef>
#include <string>

namespace Port {

// The text printf would make of format and args.
VORANT_HOST_API std::string vformat(const char* format, std::va_list args);

// The host's string type: an owning text with printf-style formatting.
template <class Char>
class StringBase {
public:
    StringBase() = default;
    StringBase(const Char* text) { assign(text); }
    StringBase(const std::basic_string<Char>& text) : text_(text) {}

    StringBase& operator=(const Char* text) { assign(text); return *this; }

    const Char* c_str() const { return text_.c_str(); }
    operator const Char*() const { return text_.c_str(); }
    std::size_t length() const { return text_.size(); }
    bool empty() const { return text_.empty(); }
    const std::basic_string<Char>& str() const { return text_; }

    // Replaces the contents with the text printf would make. Formatting is
    // for char texts only, so the format is a plain char text: a type that
    // does not hang on Char lets every compiler check it as a printf format.
    StringBase& doFormat(const char* format, ...) VORANT_PRINTF(2, 3) {
        static_assert(sizeof(Char) == 1, "formatting is provided for char texts");
        std::va_list args;
        va_start(args, format);
        text_ = vformat(format, args);
        va_end(args);
        return *this;
    }

private:
    void assign(const Char* text) { text_ = text ? text : std::basic_string<Char>(); }
    std::basic_string<Char> text_;
};

// The host's text pool: returns a stable copy of text that lives until the
// host library is unloaded. Equal texts share one copy.
VORANT_HOST_API char* internText(const char* text);

}  // namespace Port

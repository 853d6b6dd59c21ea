#pragma once
// Splits SVF text into words, parenthesised values and semicolons.
// Comments ("!" or "//" to the end of the line) and white space vanish;
// every token carries the line it starts on. Reads the stream through its
// own buffer, so files of any size are read in one pass.

#include <array>
#include <cstddef>
#include <istream>
#include <string>

namespace vorant::svf {

struct SvfToken {
    enum class Kind { Word, Value, Semicolon, End };
    Kind kind = Kind::End;
    // Word: the text as written. Value: the characters between the
    // parentheses, white space removed.
    std::string text;
    std::size_t line = 0;
    // Value: the first character that is not a hex digit and its line
    // (badCharacter < 0: none). Values of PIO are not hex, so the parser
    // decides whether this is an error.
    int badCharacter = -1;
    std::size_t badCharacterLine = 0;
};

// 'G' for a printable character, "byte 0x07" otherwise.
std::string describeCharacter(int c);

class SvfTokenizer {
public:
    explicit SvfTokenizer(std::istream& in) : in_(in) {}

    // Throws SvfParseError on an unbalanced parenthesis.
    void next(SvfToken& token);
    std::size_t line() const { return line_; }

private:
    int peek();
    int get();
    void skipToLineEnd();
    void readValue(SvfToken& token);

    std::istream& in_;
    std::array<char, 64 * 1024> buffer_{};
    std::size_t position_ = 0, filled_ = 0;
    bool atEnd_ = false;
    std::size_t line_ = 1;
};

}  // namespace vorant::svf

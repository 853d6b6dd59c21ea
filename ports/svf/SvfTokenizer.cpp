#include "ports/svf/SvfTokenizer.h"

#include "ports/svf/SvfError.h"
#include "ports/svf/SvfHex.h"

namespace vorant::svf {
namespace {

bool isSpace(int c) { return c == ' ' || c == '\t' || c == '\r' || c == '\n' || c == '\f' || c == '\v'; }

}  // namespace

std::string describeCharacter(int c) {
    if (c >= 0x21 && c < 0x7F) return std::string("'") + static_cast<char>(c) + "'";
    const char* digits = "0123456789ABCDEF";
    return std::string("byte 0x") + digits[(c >> 4) & 0xF] + digits[c & 0xF];
}

int SvfTokenizer::peek() {
    if (position_ == filled_) {
        if (atEnd_) return -1;
        in_.read(buffer_.data(), static_cast<std::streamsize>(buffer_.size()));
        filled_ = static_cast<std::size_t>(in_.gcount());
        position_ = 0;
        if (filled_ == 0) {
            atEnd_ = true;
            return -1;
        }
    }
    return static_cast<unsigned char>(buffer_[position_]);
}

int SvfTokenizer::get() {
    const int c = peek();
    if (c < 0) return c;
    ++position_;
    if (c == '\n') ++line_;
    return c;
}

void SvfTokenizer::skipToLineEnd() {
    for (int c = peek(); c >= 0 && c != '\n'; c = peek()) get();
}

void SvfTokenizer::next(SvfToken& token) {
    token.text.clear();
    for (;;) {
        const int c = peek();
        if (c < 0) {
            token.kind = SvfToken::Kind::End;
            token.line = line_;
            return;
        }
        if (isSpace(c)) {
            get();
            continue;
        }
        if (c == '!') {
            skipToLineEnd();
            continue;
        }
        if (c == '/') {
            get();
            if (peek() == '/') {
                skipToLineEnd();
                continue;
            }
            // A lone '/' starts a word; the parser rejects the word.
            token.kind = SvfToken::Kind::Word;
            token.line = line_;
            token.text = "/";
            break;
        }
        token.line = line_;
        if (c == ';') {
            get();
            token.kind = SvfToken::Kind::Semicolon;
            return;
        }
        if (c == '(') {
            get();
            readValue(token);
            return;
        }
        if (c == ')') throw SvfParseError(line_, "unbalanced parentheses: ')' without '('");
        token.kind = SvfToken::Kind::Word;
        break;
    }
    for (int c = peek(); c >= 0 && !isSpace(c) && c != ';' && c != '(' && c != ')' && c != '!'; c = peek()) {
        if (c == '/' && !token.text.empty() && token.text.back() == '/') {
            // "//" right after a word begins a comment.
            token.text.pop_back();
            skipToLineEnd();
            break;
        }
        token.text.push_back(static_cast<char>(get()));
    }
}

void SvfTokenizer::readValue(SvfToken& token) {
    token.kind = SvfToken::Kind::Value;
    token.badCharacter = -1;
    const std::size_t opened = line_;
    for (;;) {
        const int c = get();
        if (c < 0)
            throw SvfParseError(opened, "unbalanced parentheses: '(' is never closed");
        if (c == ')') return;
        if (isSpace(c)) continue;
        if (c == '(') throw SvfParseError(line_, "unbalanced parentheses: '(' inside a value");
        if (c == ';') throw SvfParseError(line_, "unbalanced parentheses: ';' inside a value (missing ')')");
        if (hexDigitValue(static_cast<char>(c)) < 0 && token.badCharacter < 0) {
            token.badCharacter = c;
            token.badCharacterLine = line_;
        }
        token.text.push_back(static_cast<char>(c));
    }
}

}  // namespace vorant::svf

#pragma once
// Walks over JSON text from the front without building anything of it.

#include <cstddef>
#include <string_view>

namespace Mailing {

/// What is walked over as a whole may be anything that is as long as its brackets and quotes say. Throws
/// Error where the text is not what is asked for.
class JsonWalk {
public:
    /// The text has to outlive it.
    explicit JsonWalk(std::string_view text) : text_(text) {}

    /// Calls `member` with each key, in its quotes; it has to walk over the value.
    template<typename Member>
    void object(Member member) {
        list('{', '}', [&] {
            std::string_view const key = string();
            take(':');
            member(key);
        });
    }
    /// Calls `element` for each; it has to walk over it.
    template<typename Element>
    void array(Element element) {
        list('[', ']', element);
    }
    /// Walks over a value, whose text it gives.
    std::string_view value();
    /// Only blanks may be left.
    void end();

private:
    void skipBlanks() {
        while (at_ < text_.size() && isBlank(text_[at_]))
            ++at_;
    }
    static bool isBlank(char c) { return c == ' ' || c == '\n' || c == '\t' || c == '\r'; }
    /// What comes next but blanks.
    char peek() {
        skipBlanks();
        if (at_ == text_.size())
            fail();
        return text_[at_];
    }
    void take(char wanted) {
        if (peek() != wanted)
            fail();
        ++at_;
    }
    template<typename Element>
    void list(char open, char close, Element element) {
        take(open);
        if (peek() == close)
            return take(close);
        for (;;) {
            element();
            if (peek() == close)
                return take(close);
            take(',');
        }
    }
    std::string_view string();
    static bool endsNumberOrWord(char c);
    void skipNumberOrWord();
    [[noreturn]] static void fail();

    std::string_view text_;
    std::size_t at_ = 0;
};

/// Where what begins with the bracket at `at` ends, behind its own last one; npos when it does not. Brackets
/// of both kinds count alike, those in strings not at all.
std::size_t behindNested(std::string_view text, std::size_t at);

} // namespace Mailing

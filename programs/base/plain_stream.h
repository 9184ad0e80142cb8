#pragma once
// A stream for people: what is written to it reaches another one as plainText().

#include <ostream>
#include <streambuf>
#include <string>

namespace Base {

/// Hands lines on as they are finished. A failure of the other stream is a failure of this one, at the
/// latest when it is flushed.
class PlainStream : public std::ostream {
public:
    /// `target` must live longer.
    explicit PlainStream(std::ostream& target);
    ~PlainStream() override;

private:
    class Buffer : public std::streambuf {
    public:
        explicit Buffer(std::ostream& target) : target_(target) {}

    protected:
        int_type overflow(int_type character) override;
        std::streamsize xsputn(char const* text, std::streamsize count) override;
        int sync() override;

    private:
        bool handOn(std::size_t count);

        std::ostream& target_;
        /// A line that is not finished.
        std::string held_;
    };

    Buffer buffer_;
};

} // namespace Base

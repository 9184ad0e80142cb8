#include "programs/base/plain_stream.h"

#include "programs/base/plain_text.h"
#include "programs/base/utf8.h"

namespace Base {
namespace {

/// A longer line is handed on in pieces.
constexpr std::size_t LONGEST_HELD = std::size_t{1} << 16;

} // namespace

PlainStream::PlainStream(std::ostream& target) : std::ostream(nullptr), buffer_(target) { rdbuf(&buffer_); }

PlainStream::~PlainStream() { flush(); }

PlainStream::Buffer::int_type PlainStream::Buffer::overflow(int_type character) {
    char const text = traits_type::to_char_type(character);
    return xsputn(&text, 1) == 1 ? character : traits_type::eof();
}

std::streamsize PlainStream::Buffer::xsputn(char const* text, std::streamsize count) {
    std::string_view const more(text, static_cast<std::size_t>(count));
    std::size_t const lineEnd = more.rfind('\n');
    std::size_t const finished = held_.size() + lineEnd + 1;
    held_ += more;
    bool isTaken = true;
    if (lineEnd != std::string::npos)
        isTaken = handOn(finished);
    else if (held_.size() > LONGEST_HELD)
        isTaken = handOn(firstBytes(held_, held_.size() - 1).size());
    return isTaken ? count : 0;
}

int PlainStream::Buffer::sync() {
    bool const isTaken = handOn(held_.size());
    return isTaken && target_.flush() ? 0 : -1;
}

bool PlainStream::Buffer::handOn(std::size_t count) {
    target_ << plainText(std::string_view(held_).substr(0, count));
    held_.erase(0, count);
    return target_.good();
}

} // namespace Base

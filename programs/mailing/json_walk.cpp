#include "programs/mailing/json_walk.h"

#include "programs/base/error.h"

#include <algorithm>
#include <bit>
#include <cstdint>

#ifdef __SSE2__
#include <emmintrin.h>
#endif

namespace Mailing {
namespace {

/// So many bytes are looked at in one go: a bit a byte.
constexpr std::size_t BLOCK = 64;
using Bits = std::uint64_t;

/// Of the bytes of a block.
struct Marks {
    Bits quotes = 0;
    Bits backslashes = 0;
    Bits opens = 0;
    Bits closes = 0;
};

/// Brackets differ in one bit from those of the other kind.
constexpr char ONE_KIND = 0x20;

#ifdef __SSE2__
Bits equalTo(__m128i bytes, char wanted) {
    return static_cast<unsigned>(_mm_movemask_epi8(_mm_cmpeq_epi8(bytes, _mm_set1_epi8(wanted))));
}

Marks marksIn(char const* block) {
    Marks marks;
    for (unsigned i = 0; i < BLOCK; i += sizeof(__m128i)) {
        __m128i const bytes = _mm_loadu_si128(reinterpret_cast<__m128i const*>(block + i));
        __m128i const oneKind = _mm_or_si128(bytes, _mm_set1_epi8(ONE_KIND));
        marks.quotes |= equalTo(bytes, '"') << i;
        marks.backslashes |= equalTo(bytes, '\\') << i;
        marks.opens |= equalTo(oneKind, '{') << i;
        marks.closes |= equalTo(oneKind, '}') << i;
    }
    return marks;
}
#else
Marks marksIn(char const* block) {
    Marks marks;
    for (unsigned i = 0; i < BLOCK; ++i) {
        marks.quotes |= Bits{block[i] == '"'} << i;
        marks.backslashes |= Bits{block[i] == '\\'} << i;
        marks.opens |= Bits{(block[i] | ONE_KIND) == '{'} << i;
        marks.closes |= Bits{(block[i] | ONE_KIND) == '}'} << i;
    }
    return marks;
}
#endif

/// Each bit is the sum of those up to it.
Bits sums(Bits bits) {
    for (unsigned shift = 1; shift < BLOCK; shift *= 2)
        bits ^= bits << shift;
    return bits;
}

class NestedWalk {
public:
    bool isOver() const { return depth_ == 0; }

    /// A byte behind the first bracket.
    void step(char c) {
        if (isEscaped_)
            isEscaped_ = false;
        else if (c == '"')
            isInString_ = !isInString_;
        else if (isInString_)
            isEscaped_ = c == '\\';
        else if ((c | ONE_KIND) == '{')
            ++depth_;
        else if ((c | ONE_KIND) == '}')
            --depth_;
    }

    /// How many bytes of a block were walked over: all, or those up to the end of the walk; none of one whose
    /// backslashes have to be looked at one by one.
    std::size_t stepOver(char const* block) {
        Marks const marks = marksIn(block);
        Bits const escaped = marks.backslashes << 1 | Bits{isEscaped_};
        Bits const inStrings = sums(marks.quotes & ~escaped) ^ (isInString_ ? ~Bits{0} : Bits{0});
        if ((marks.backslashes & (escaped | ~inStrings)) != 0)
            return 0;
        Bits const opens = marks.opens & ~inStrings;
        for (Bits left = opens | (marks.closes & ~inStrings); left != 0; left &= left - 1) {
            auto const place = static_cast<unsigned>(std::countr_zero(left));
            depth_ += (opens >> place & 1) != 0 ? 1 : std::size_t(-1);
            if (isOver())
                return place + 1;
        }
        isInString_ = inStrings >> (BLOCK - 1) != 0;
        isEscaped_ = marks.backslashes >> (BLOCK - 1) != 0;
        return BLOCK;
    }

private:
    std::size_t depth_ = 1;
    bool isInString_ = false;
    bool isEscaped_ = false;
};

} // namespace

std::size_t behindNested(std::string_view text, std::size_t at) {
    NestedWalk walk;
    ++at;
    while (!walk.isOver() && at < text.size()) {
        std::size_t const walked = text.size() - at < BLOCK ? 0 : walk.stepOver(text.data() + at);
        std::size_t const end = walked > 0 ? at += walked : std::min(text.size(), at + BLOCK);
        for (; at < end && !walk.isOver(); ++at)
            walk.step(text[at]);
    }
    return walk.isOver() ? at : text.npos;
}

std::string_view JsonWalk::value() {
    char const c = peek();
    std::size_t const begin = at_;
    if (c == '"')
        string();
    else if (c == '{' || c == '[')
        at_ = behindNested(text_, at_);
    else
        skipNumberOrWord();
    if (at_ > text_.size())
        fail();
    return text_.substr(begin, at_ - begin);
}

void JsonWalk::end() {
    skipBlanks();
    if (at_ != text_.size())
        fail();
}

std::string_view JsonWalk::string() {
    take('"');
    std::size_t const begin = at_ - 1;
    for (; at_ < text_.size() && text_[at_] != '"'; ++at_)
        if (text_[at_] == '\\')
            ++at_;
    if (at_ >= text_.size())
        fail();
    ++at_;
    return text_.substr(begin, at_ - begin);
}

bool JsonWalk::endsNumberOrWord(char c) {
    return isBlank(c) || c == '"' || c == ',' || c == ':' || (c | ONE_KIND) == '{' || (c | ONE_KIND) == '}';
}

void JsonWalk::skipNumberOrWord() {
    std::size_t const begin = at_;
    while (at_ < text_.size() && !endsNumberOrWord(text_[at_]))
        ++at_;
    if (at_ == begin)
        fail();
}

void JsonWalk::fail() { throw Base::Error(Base::Code::MailingDamaged, "it is no metadata of a mailing"); }

} // namespace Mailing

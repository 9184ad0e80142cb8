#include "programs/reader/clean_text.h"

#include <algorithm>
#include <cstdint>
#include <limits>
#include <memory>
#include <new>
#include <stdexcept>
#include <unicode/uchar.h>
#include <unicode/ucnv.h>
#include <unicode/unorm2.h>
#include <unicode/ustring.h>
#include <unicode/utf16.h>

namespace Reader {
namespace {

constexpr UChar32 REPLACEMENT = 0xFFFD;

void check(UErrorCode status) {
    if (U_FAILURE(status))
        throw std::runtime_error(std::string("Unicode conversion failed: ") + u_errorName(status));
}

std::int32_t lengthOf(std::size_t length) {
    if (length > static_cast<std::size_t>(std::numeric_limits<std::int32_t>::max()))
        throw std::bad_alloc();
    return static_cast<std::int32_t>(length);
}

/// Runs an ICU operation that writes into a buffer and says how long its result is.
template<typename Operation>
std::u16string written(std::size_t guess, Operation const& operation) {
    std::u16string result(guess, u'\0');
    UErrorCode status = U_ZERO_ERROR;
    std::int32_t length = operation(result.data(), lengthOf(result.size()), &status);
    if (status == U_BUFFER_OVERFLOW_ERROR) {
        status = U_ZERO_ERROR;
        result.resize(static_cast<std::size_t>(length));
        length = operation(result.data(), lengthOf(result.size()), &status);
    }
    check(status);
    result.resize(static_cast<std::size_t>(length));
    return result;
}

std::u16string normalized(UNormalizer2 const* normalizer, std::u16string_view text) {
    return written(text.size() + 8, [&](char16_t* to, std::int32_t capacity, UErrorCode* status) {
        return unorm2_normalize(normalizer, text.data(), lengthOf(text.size()), to, capacity, status);
    });
}

UNormalizer2 const* nfc() {
    UErrorCode status = U_ZERO_ERROR;
    UNormalizer2 const* const normalizer = unorm2_getNFCInstance(&status);
    check(status);
    return normalizer;
}

UNormalizer2 const* nfkc() {
    UErrorCode status = U_ZERO_ERROR;
    UNormalizer2 const* const normalizer = unorm2_getNFKCInstance(&status);
    check(status);
    return normalizer;
}

/// Ligatures, and the shapes of Arabic letters: how a letter is drawn, not which one it is.
bool isPresentationForm(UChar32 c) { return (c >= 0xFB00 && c <= 0xFDFF) || (c >= 0xFE70 && c <= 0xFEFE); }

/// The joiners U+200C and U+200D stay: in some scripts they make another word.
bool isUnseen(UChar32 c) {
    return c == 0x00AD || c == 0x200B || c == 0x2060 || c == 0xFEFF || u_charType(c) == U_CONTROL_CHAR;
}

/// Hyphens of typography look like the one that people type; dashes are wider and stay.
bool isHyphen(UChar32 c) { return c == 0x2010 || c == 0x2011; }

void append(std::u16string& text, UChar32 c) {
    char16_t units[2];
    std::size_t length = 0;
    U16_APPEND_UNSAFE(units, length, c);
    text.append(units, length);
}

void appendClean(std::u16string& text, UChar32 c) {
    if (U_IS_SURROGATE(c))
        append(text, REPLACEMENT);
    else if (u_isUWhiteSpace(c)) {
        if (!text.empty() && text.back() != u' ')
            text += u' ';
    } else if (isHyphen(c)) {
        text += u'-';
    } else if (isPresentationForm(c)) {
        std::u16string one;
        append(one, c);
        text += normalized(nfkc(), one);
    } else if (!isUnseen(c))
        append(text, c);
}

std::string utf8Of(std::u16string_view text) {
    std::string result(text.size() * 3, '\0');
    std::int32_t length = 0;
    UErrorCode status = U_ZERO_ERROR;
    u_strToUTF8WithSub(result.data(), lengthOf(result.size()), &length, text.data(), lengthOf(text.size()),
                       REPLACEMENT, nullptr, &status);
    check(status);
    result.resize(static_cast<std::size_t>(length));
    return result;
}

using Converter = std::unique_ptr<UConverter, decltype(&ucnv_close)>;

Converter windows1252() {
    UErrorCode status = U_ZERO_ERROR;
    Converter converter(ucnv_open("windows-1252", &status), &ucnv_close);
    check(status);
    return converter;
}

bool isPlain(std::u16string_view text) {
    return std::all_of(text.begin(), text.end(), [](char16_t c) { return c > 0x20 && c < 0x7F; });
}

} // namespace

std::string cleanText(std::u16string_view text) {
    if (isPlain(text))
        return std::string(text.begin(), text.end());
    std::u16string clean;
    for (std::size_t i = 0; i < text.size();) {
        UChar32 c = 0;
        U16_NEXT(text.data(), i, text.size(), c);
        appendClean(clean, c);
    }
    if (!clean.empty() && clean.back() == u' ')
        clean.pop_back();
    return utf8Of(normalized(nfc(), clean));
}

std::optional<std::u16string> utf16Of(std::string_view utf8) {
    std::u16string result(utf8.size(), u'\0');
    std::int32_t length = 0;
    UErrorCode status = U_ZERO_ERROR;
    u_strFromUTF8(result.data(), lengthOf(result.size()), &length, utf8.data(), lengthOf(utf8.size()),
                  &status);
    if (status == U_INVALID_CHAR_FOUND)
        return std::nullopt;
    check(status);
    result.resize(static_cast<std::size_t>(length));
    return result;
}

std::u16string utf16OfWindows1252(std::string_view text) {
    Converter const converter = windows1252();
    return written(text.size(), [&](char16_t* to, std::int32_t capacity, UErrorCode* status) {
        return ucnv_toUChars(converter.get(), to, capacity, text.data(), lengthOf(text.size()), status);
    });
}

std::optional<std::string> windows1252Of(std::string_view utf8) {
    std::optional<std::u16string> const text = utf16Of(utf8);
    if (!text)
        return std::nullopt;
    Converter const converter = windows1252();
    UErrorCode status = U_ZERO_ERROR;
    ucnv_setFromUCallBack(converter.get(), UCNV_FROM_U_CALLBACK_STOP, nullptr, nullptr, nullptr, &status);
    check(status);
    std::string result(text->size(), '\0');
    std::int32_t const length = ucnv_fromUChars(converter.get(), result.data(), lengthOf(result.size()),
                                                text->data(), lengthOf(text->size()), &status);
    if (status == U_INVALID_CHAR_FOUND)
        return std::nullopt;
    check(status);
    result.resize(static_cast<std::size_t>(length));
    return result;
}

} // namespace Reader

#include "programs/reader/file_kind.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <string>

namespace Reader {
namespace {

using namespace std::string_view_literals;

/// A PDF may have other bytes in front of its header, up to here.
constexpr std::size_t PDF_HEADER_WITHIN = 1024;

constexpr std::string_view UTF8_MARK = "\xEF\xBB\xBF";

struct Kind {
    /// In lower case.
    std::string_view beginning;
    std::string_view words;
};

constexpr std::array KINDS{
    Kind{"<!doctype html", "a web page"},
    Kind{"<html", "a web page"},
    Kind{"<head", "a web page"},
    Kind{"<!--", "a web page"},
    Kind{"<?xml", "an XML document"},
    Kind{"{\\rtf", "a word processor's document"},
    Kind{"\xD0\xCF\x11\xE0", "a word processor's document"},
    Kind{"pk\3\4", "a word processor's document or another ZIP archive"},
    Kind{"%!ps", "PostScript"},
    Kind{"\x89png", "a picture"},
    Kind{"\xFF\xD8\xFF", "a picture"},
    Kind{"gif8", "a picture"},
    Kind{"ii*\0"sv, "a picture"},
    Kind{"mm\0*"sv, "a picture"},
    Kind{"\x1F\x8B", "a compressed file"},
};

/// Its first bytes behind a mark and white space, in lower case.
std::string beginningOf(std::string_view bytes) {
    if (bytes.starts_with(UTF8_MARK))
        bytes.remove_prefix(UTF8_MARK.size());
    bytes.remove_prefix(std::min(bytes.find_first_not_of(" \t\r\n"), bytes.size()));
    std::string beginning(bytes.substr(0, 16));
    for (char& c : beginning)
        if (c >= 'A' && c <= 'Z')
            c = static_cast<char>(c - 'A' + 'a');
    return beginning;
}

} // namespace

bool isPdf(std::string_view bytes) {
    return bytes.substr(0, PDF_HEADER_WITHIN).find("%PDF-") != std::string_view::npos;
}

std::string_view kindInWords(std::string_view bytes) {
    std::string const beginning = beginningOf(bytes);
    auto const kind = std::find_if(KINDS.begin(), KINDS.end(),
                                   [&](Kind const& one) { return beginning.starts_with(one.beginning); });
    if (kind != KINDS.end())
        return kind->words;
    return bytes.find('\0') == std::string_view::npos ? "plain text" : "something else";
}

} // namespace Reader

#include "programs/production/letter_digest.h"

#include "vlservice/json/json_text.h"

#include <algorithm>
#include <cmath>
#include <sstream>

namespace Production {
namespace {

/// Of 1/100 mm.
std::string inWholeMillimetres(int length) { return std::to_string(std::lround(length / 100.0)); }

/// No word holds a blank.
std::string lineOf(Reader::Word const& word) {
    std::string line;
    for (int const edge : {word.box.left, word.box.top, word.box.right, word.box.bottom})
        line += inWholeMillimetres(edge) + ' ';
    return line + word.text + '\n';
}

} // namespace

LetterDigest::LetterDigest(Cfg::ExtractedFields const& fields) {
    std::ostringstream recipient;
    if (Cfg::ExtractedField const* const address = fields.primaryAddressField())
        recipient << address->rawValue();
    digest_.add("letter 1\n" + recipient.str() + '\n');
}

void LetterDigest::add(Reader::Page const& page, std::vector<std::string> const& pictures) {
    std::vector<std::string> lines;
    for (Reader::Word const& word : page.words)
        lines.push_back(lineOf(word));
    std::ranges::sort(lines);
    std::string text = "page " + std::to_string(lines.size()) + ' ' + std::to_string(pictures.size()) + '\n';
    for (std::string const& line : lines)
        text += line;
    for (std::string const& picture : pictures)
        text += picture + '\n';
    digest_.add(text);
}

} // namespace Production

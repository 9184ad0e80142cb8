// What a document has that paper has not.
#include "programs/base/quoting.h"
#include "programs/production/checks.h"

#include <algorithm>
#include <cctype>

namespace Production {
namespace {

bool endsInXml(std::string const& name) {
    std::string ending = name.size() < 4 ? std::string() : name.substr(name.size() - 4);
    std::ranges::transform(ending, ending.begin(),
                           [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    return ending == ".xml";
}

/// Documents list fonts on pages that show nothing in them.
bool isUsed(std::string const& font, Reader::Page const& page) {
    return std::ranges::find(page.fonts, font, &Reader::Font::name) != page.fonts.end();
}

void checkFonts(std::vector<std::string> const& notEmbedded, Reader::Page const& page, Findings& findings) {
    for (std::string const& font : notEmbedded)
        if (isUsed(font, page))
            findings.add(Code::FontNotEmbedded, {page.number},
                         "the font " + Base::inQuotes(font) +
                             " is not in the document: another one may be printed",
                         "embed it when the document is exported");
}

void checkAnnotations(std::vector<Reader::LostAnnotation> const& annotations, int page, Findings& findings) {
    for (Reader::LostAnnotation const& lost : annotations)
        findings.add(Code::AnnotationLost, {page, lost.box}, lost.kind + " on the page is not printed",
                     "write it on the page itself, if the recipient is to have it");
}

} // namespace

void checkExtras(Reader::Document& document, Reader::Page const& page, Findings& findings) {
    Reader::PageExtras const extras = document.extrasOf(page.number);
    checkFonts(extras.fontsNotEmbedded, page, findings);
    checkAnnotations(extras.lostAnnotations, page.number, findings);
}

void checkEmbeddedFiles(Reader::Document& document, Findings& findings) {
    for (std::string const& file : document.embeddedFiles())
        findings.add(Code::EmbeddedFileLost, {},
                     "the file " + Base::inQuotes(file) + " inside the document is not printed" +
                         (endsInXml(file) ? "; it may be an electronic invoice" : ""),
                     "send it another way, if the recipient is to have it");
}

} // namespace Production

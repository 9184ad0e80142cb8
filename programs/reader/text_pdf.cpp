#include "programs/reader/text_pdf.h"

#include "programs/base/error.h"
#include "programs/reader/clean_text.h"
#include "programs/reader/pdf_page.h"
#include "programs/reader/true_type.h"
#include "programs/reader/typed_page.h"

#include <fstream>
#include <iterator>
#include <optional>
#include <set>
#include <unicode/utf16.h>

namespace Reader {
namespace {

constexpr char const* FONT_FILE = "/usr/share/fonts/truetype/dejavu/DejaVuSansMono.ttf";
constexpr char const* FONT_PACKAGE = "fonts-dejavu-core";
/// The six letters say that not all of the font is there.
constexpr char const* FONT_NAME = "TYPING+DejaVuSansMono";

TrueTypeFont const& wideFont() {
    static TrueTypeFont const font = [] {
        std::ifstream in(FONT_FILE, std::ios::binary);
        if (!in)
            throw Base::Error(std::string("there is no font ") + FONT_FILE + "; install the package " +
                              FONT_PACKAGE);
        return TrueTypeFont({std::istreambuf_iterator<char>(in), {}});
    }();
    return font;
}

/// A number with three places, whatever the locale.
std::string decimal(double value) {
    long const thousandths = std::lround(value * 1000);
    std::string places = std::to_string(std::abs(thousandths) % 1000);
    places.insert(0, 3 - places.size(), '0');
    return (thousandths < 0 ? "-" : "") + std::to_string(std::abs(thousandths) / 1000) + "." + places;
}

std::string inPoints(double hundredths) { return decimal(hundredths / POINT); }

std::string hex(unsigned value, int digits) {
    static constexpr char DIGITS[] = "0123456789ABCDEF";
    std::string text;
    for (int shift = 4 * (digits - 1); shift >= 0; shift -= 4)
        text += DIGITS[value >> shift & 0xF];
    return text;
}

std::string hex(std::string const& bytes) {
    std::string text;
    for (char const byte : bytes)
        text += hex(static_cast<unsigned char>(byte), 2);
    return text;
}

/// What a typed page shows.
class Content {
public:
    Content(Page const& page, std::string const& where) : page_(page), where_(where) {
        for (Word const& word : page.words)
            show(word);
    }

    std::string text() const { return "BT\n" + text_ + "ET\n"; }
    std::map<GlyphNumber, char32_t> const& wideCharacters() const { return wideCharacters_; }

private:
    void show(Word const& word) {
        int const baseline = page_.height - word.box.top - TypedPage::ASCENT;
        text_ += "1 0 0 1 " + inPoints(word.box.left) + " " + inPoints(baseline) + " Tm ";
        if (std::optional<std::string> const narrow = windows1252Of(word.text))
            text_ += font("/Courier", 100) + "<" + hex(*narrow) + "> Tj\n";
        else // Its letters are a little wider than a column.
            text_ += font("/Carried", 100.0 * TypedPage::LETTER / wideFont().advance()) + "<" + glyphs(word) +
                     "> Tj\n";
    }

    static std::string font(char const* name, double widthPerCent) {
        return name + (" " + decimal(TypedPage::POINTS)) + " Tf " + decimal(widthPerCent) + " Tz ";
    }

    std::string glyphs(Word const& word) {
        std::string numbers;
        std::u16string const text = utf16Of(word.text).value_or(u"");
        for (std::size_t i = 0; i < text.size();) {
            UChar32 c = 0;
            U16_NEXT(text.data(), i, text.size(), c);
            GlyphNumber const glyph = wideFont().glyphOf(static_cast<char32_t>(c));
            if (glyph == 0)
                throw Base::Error(where_ + ": page " + std::to_string(page_.number) + ": no font for \"" +
                                  word.text + "\"; export the document as PDF");
            wideCharacters_.emplace(glyph, c);
            numbers += hex(glyph, 4);
        }
        return numbers;
    }

    Page const& page_;
    std::string const& where_;
    std::string text_;
    std::map<GlyphNumber, char32_t> wideCharacters_;
};

CarriedFont carry(std::map<GlyphNumber, char32_t> const& characters) {
    std::set<GlyphNumber> glyphs;
    for (auto const& [glyph, character] : characters)
        glyphs.insert(glyph);
    TrueTypeFont const& font = wideFont();
    return {FONT_NAME, font.subset(glyphs), font.ascent(), font.descent(), font.advance(), characters};
}

} // namespace

std::string pdfOfTypedPage(Page const& page, std::string const& where) {
    Content const content(page, where);
    ShownPage shown{inPoints(page.width), inPoints(page.height), content.text(), nullptr};
    if (content.wideCharacters().empty())
        return pdfOf(shown);
    CarriedFont const font = carry(content.wideCharacters());
    shown.carried = &font;
    return pdfOf(shown);
}

} // namespace Reader

#include "programs/reader/text_pdf.h"

#include "programs/base/error.h"
#include "programs/base/hex.h"
#include "programs/base/read_file.h"
#include "programs/reader/clean_text.h"
#include "programs/reader/font_file.h"
#include "programs/reader/pdf_page.h"
#include "programs/reader/typed_page.h"

#include <filesystem>
#include <map>
#include <optional>
#include <set>
#include <unicode/utf16.h>
#include <utility>

namespace Reader {
namespace {

constexpr char const* FONT_FILE = "/usr/share/fonts/truetype/dejavu/DejaVuSansMono.ttf";
constexpr char const* FONT_PACKAGE = "fonts-dejavu-core";
/// The six letters say that not all of the font is there.
constexpr char const* FONT_NAME = "TYPING+DejaVuSansMono";

FontFile const& wideFont() {
    static FontFile const font = [] {
        if (!std::filesystem::exists(FONT_FILE))
            throw Base::Error(Base::Code::FontMissing, std::string("there is no font ") + FONT_FILE +
                                                           "; install the package " + FONT_PACKAGE);
        return FontFile(Base::readFile(FONT_FILE));
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

std::string inPoints(double hundredths) { return decimal(hundredths / PDF_POINT); }

template<typename Take>
void forEachCharacter(std::string const& utf8, Take const& take) {
    std::u16string const text = utf16Of(utf8).value_or(u"");
    for (std::size_t i = 0; i < text.size();) {
        UChar32 c = 0;
        U16_NEXT(text.data(), i, text.size(), c);
        take(static_cast<char32_t>(c));
    }
}

/// The characters of words that Courier cannot show.
std::set<char32_t> wideCharacters(Page const& page, std::string const& where) {
    std::set<char32_t> characters;
    for (Word const& word : page.words) {
        if (windows1252Of(word.text))
            continue;
        forEachCharacter(word.text, [&](char32_t c) {
            if (!wideFont().has(c))
                throw Base::Error(Base::Code::FontMissing, where + ": page " + std::to_string(page.number) +
                                                               ": no font for \"" + word.text +
                                                               "\"; export the document as PDF");
            characters.insert(c);
        });
    }
    return characters;
}

/// What a typed page shows.
class Content {
public:
    Content(Page const& page, std::map<char32_t, GlyphNumber> const& glyphs) : page_(page), glyphs_(glyphs) {
        for (Word const& word : page.words)
            show(word);
    }

    std::string text() const { return "BT\n" + text_ + "ET\n"; }

private:
    void show(Word const& word) {
        int const baseline = page_.height - word.box.top - TypedPage::ASCENT;
        text_ += "1 0 0 1 " + inPoints(word.box.left) + " " + inPoints(baseline) + " Tm ";
        if (std::optional<std::string> const narrow = windows1252Of(word.text))
            text_ += font("/Courier", 100) + "<" + Base::toHex(narrow->data(), narrow->size()) + "> Tj\n";
        else // Its letters are a little wider than a column.
            text_ += font("/Carried", 100.0 * TypedPage::LETTER / wideFont().advance()) + "<" +
                     glyphsOf(word) + "> Tj\n";
    }

    static std::string font(char const* name, double widthPerCent) {
        return name + (" " + decimal(TypedPage::POINTS)) + " Tf " + decimal(widthPerCent) + " Tz ";
    }

    std::string glyphsOf(Word const& word) const {
        std::string numbers;
        forEachCharacter(word.text, [&](char32_t c) { numbers += Base::hexNumber(glyphs_.at(c), 4); });
        return numbers;
    }

    Page const& page_;
    std::map<char32_t, GlyphNumber> const& glyphs_;
    std::string text_;
};

CarriedFont carried(FontSubset const& subset) {
    std::map<GlyphNumber, char32_t> characters;
    for (auto const& [character, glyph] : subset.glyphs)
        characters.emplace(glyph, character);
    FontFile const& font = wideFont();
    return {FONT_NAME, subset.file, font.ascent(), font.descent(), font.advance(), std::move(characters)};
}

} // namespace

std::string pdfOfTypedPage(Page const& page, std::string const& where) {
    ShownPage shown{inPoints(page.width), inPoints(page.height), {}, nullptr};
    std::set<char32_t> const wide = wideCharacters(page, where);
    if (wide.empty()) {
        shown.content = Content(page, {}).text();
        return pdfOf(shown);
    }
    FontSubset const subset = wideFont().subset(wide);
    CarriedFont const font = carried(subset);
    shown.content = Content(page, subset.glyphs).text();
    shown.carried = &font;
    return pdfOf(shown);
}

} // namespace Reader

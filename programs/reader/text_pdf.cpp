#include "programs/reader/text_pdf.h"

#include "programs/reader/clean_text.h"
#include "programs/reader/error.h"
#include "programs/reader/pdf_page.h"
#include "programs/reader/true_type.h"
#include "programs/reader/typed_page.h"

#include <qpdf/QPDF.hh>
#include <qpdf/QPDFObjectHandle.hh>
#include <qpdf/QPDFPageDocumentHelper.hh>
#include <qpdf/QUtil.hh>

#include <fstream>
#include <iterator>
#include <map>
#include <optional>
#include <unicode/utf16.h>

namespace Reader {
namespace {

constexpr char const* FONT_FILE = "/usr/share/fonts/truetype/dejavu/DejaVuSansMono.ttf";
constexpr char const* FONT_PACKAGE = "fonts-dejavu-core";

std::string inPoints(double hundredths) { return QUtil::double_to_string(hundredths / POINT, 3); }

std::string hex(unsigned value) {
    static constexpr char DIGITS[] = "0123456789ABCDEF";
    std::string text;
    for (int shift = 12; shift >= 0; shift -= 4)
        text += DIGITS[value >> shift & 0xF];
    return text;
}

TrueTypeFont const& wideFont() {
    static TrueTypeFont const font = [] {
        std::ifstream in(FONT_FILE, std::ios::binary);
        if (!in)
            throw Error(std::string("there is no font ") + FONT_FILE + "; install the package " +
                        FONT_PACKAGE);
        return TrueTypeFont({std::istreambuf_iterator<char>(in), {}});
    }();
    return font;
}

/// Words in the font that is embedded, and what of it they use.
class WideText {
public:
    bool isUsed() const { return !used_.empty(); }

    /// The glyphs as the content of a page shows them; nothing when the font lacks one.
    std::optional<std::string> glyphs(std::u16string const& text) {
        std::string shown;
        for (std::size_t i = 0; i < text.size();) {
            UChar32 c = 0;
            U16_NEXT(text.data(), i, text.size(), c);
            GlyphNumber const glyph = wideFont().glyphOf(static_cast<char32_t>(c));
            if (glyph == 0)
                return std::nullopt;
            used_.emplace(glyph, c);
            shown += hex(glyph);
        }
        return "<" + shown + ">";
    }

    QPDFObjectHandle addFont(QPDF& pdf) const {
        TrueTypeFont const& font = wideFont();
        std::set<GlyphNumber> glyphs;
        for (auto const& [glyph, c] : used_)
            glyphs.insert(glyph);
        QPDFObjectHandle descriptor = QPDFObjectHandle::parse(
            "<< /Type /FontDescriptor /FontName /TYPING+DejaVuSansMono /Flags 5 /ItalicAngle 0 /StemV 80 "
            "/FontBBox [0 " +
            std::to_string(font.descent()) + " " + std::to_string(font.advance()) + " " +
            std::to_string(font.ascent()) + "] /Ascent " + std::to_string(font.ascent()) + " /Descent " +
            std::to_string(font.descent()) + " /CapHeight 729 >>");
        descriptor.replaceKey("/FontFile2", pdf.newStream(font.subset(glyphs)));
        QPDFObjectHandle descendant = QPDFObjectHandle::parse(
            "<< /Type /Font /Subtype /CIDFontType2 /BaseFont /TYPING+DejaVuSansMono /CIDToGIDMap /Identity "
            "/CIDSystemInfo << /Registry (Adobe) /Ordering (Identity) /Supplement 0 >> /DW " +
            std::to_string(font.advance()) + " >>");
        descendant.replaceKey("/FontDescriptor", pdf.makeIndirectObject(descriptor));
        QPDFObjectHandle whole = QPDFObjectHandle::parse(
            "<< /Type /Font /Subtype /Type0 /BaseFont /TYPING+DejaVuSansMono /Encoding /Identity-H >>");
        whole.replaceKey("/DescendantFonts",
                         QPDFObjectHandle::newArray({pdf.makeIndirectObject(descendant)}));
        whole.replaceKey("/ToUnicode", pdf.newStream(characterMap()));
        return pdf.makeIndirectObject(whole);
    }

private:
    /// Tells readers of the PDF which characters the glyphs are.
    std::string characterMap() const {
        std::string map = "/CIDInit /ProcSet findresource begin\n12 dict begin\nbegincmap\n"
                          "/CMapName /Typed def\n/CMapType 2 def\n"
                          "1 begincodespacerange\n<0000> <FFFF>\nendcodespacerange\n";
        for (auto const& [glyph, c] : used_) {
            map += "1 beginbfchar\n<" + hex(glyph) + "> <";
            if (c > 0xFFFF)
                map += hex(U16_LEAD(c)) + hex(U16_TRAIL(c));
            else
                map += hex(static_cast<unsigned>(c));
            map += ">\nendbfchar\n";
        }
        return map + "endcmap\nCMapName currentdict /CMap defineresource pop\nend\nend\n";
    }

    std::map<GlyphNumber, UChar32> used_;
};

/// The content of the page.
class Content {
public:
    Content(Page const& page, WideText& wide, std::string const& where)
        : page_(page), wide_(wide), where_(where) {
        for (Word const& word : page.words)
            show(word);
    }

    std::string text() const { return "BT\n" + text_ + "ET\n"; }

private:
    void show(Word const& word) {
        int const baseline = page_.height - word.box.top - TypedPage::ASCENT;
        text_ += "1 0 0 1 " + inPoints(word.box.left) + " " + inPoints(baseline) + " Tm ";
        if (std::optional<std::string> const narrow = windows1252Of(word.text))
            text_ += font("/Typed", 100) + QPDFObjectHandle::newString(*narrow).unparse();
        else if (std::optional<std::string> const wide = wide_.glyphs(utf16Of(word.text).value_or(u"")))
            // Its letters are a little wider than a column.
            text_ += font("/Wide", 100.0 * TypedPage::LETTER / wideFont().advance()) + *wide;
        else
            throw Error(where_ + ": page " + std::to_string(page_.number) + ": no font for \"" + word.text +
                        "\"; export the document as PDF");
        text_ += " Tj\n";
    }

    static std::string font(char const* name, double widthPerCent) {
        return name + (" " + inPoints(TypedPage::POINTS * POINT) + " Tf ") +
               QUtil::double_to_string(widthPerCent, 3) + " Tz ";
    }

    Page const& page_;
    WideText& wide_;
    std::string const& where_;
    std::string text_;
};

} // namespace

std::string pdfOfTypedPage(Page const& page, std::string const& where) {
    QPDF pdf;
    pdf.emptyPDF();
    WideText wide;
    QPDFObjectHandle sheet = QPDFObjectHandle::parse("<< /Type /Page /MediaBox [0 0 " + inPoints(page.width) +
                                                     " " + inPoints(page.height) + "] >>");
    sheet.replaceKey("/Contents", pdf.newStream(Content(page, wide, where).text()));
    QPDFObjectHandle fonts = QPDFObjectHandle::parse(
        "<< /Typed << /Type /Font /Subtype /Type1 /BaseFont /Courier /Encoding /WinAnsiEncoding >> >>");
    if (wide.isUsed())
        fonts.replaceKey("/Wide", wide.addFont(pdf));
    sheet.replaceKey("/Resources", QPDFObjectHandle::newDictionary({{"/Font", fonts}}));
    QPDFPageDocumentHelper(pdf).addPage(QPDFPageObjectHelper(pdf.makeIndirectObject(sheet)), false);
    return bytesOf(pdf);
}

} // namespace Reader

#pragma once
// A TrueType font file: which glyphs show which characters, and a smaller file with only some of them.

#include <cstdint>
#include <map>
#include <set>
#include <string>
#include <string_view>

namespace Reader {

using GlyphNumber = std::uint16_t;

/// Throws std::runtime_error when the file is no TrueType font or damaged.
class TrueTypeFont {
public:
    explicit TrueTypeFont(std::string file);

    /// 0 when the font lacks the character.
    GlyphNumber glyphOf(char32_t character) const;

    /// A font file with these glyphs, and those that they are made of, under their own numbers; it holds what
    /// a PDF needs of a font and no more. The same glyphs give the same bytes.
    std::string subset(std::set<GlyphNumber> glyphs) const;

    // In thousandths of the font size.

    int ascent() const { return thousandths(ascent_); }
    int descent() const { return thousandths(descent_); }
    /// Of the widest letter, which in a font for typing is each.
    int advance() const { return thousandths(advance_); }

private:
    std::string_view table(char const* tag) const;
    std::string_view outline(GlyphNumber glyph) const;
    std::set<GlyphNumber> partsOf(GlyphNumber glyph) const;
    void readCharacters();
    int thousandths(int units) const { return units * 1000 / unitsPerSize_; }

    std::string file_;
    std::map<std::string, std::string_view> tables_;
    std::map<char32_t, GlyphNumber> glyphs_;
    std::size_t glyphCount_ = 0;
    bool hasLongOffsets_ = false;
    int unitsPerSize_ = 0;
    int ascent_ = 0;
    int descent_ = 0;
    int advance_ = 0;
};

} // namespace Reader

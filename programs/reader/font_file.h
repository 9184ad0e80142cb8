#pragma once
// A TrueType font file in which all letters are equally wide: which characters it has, and a smaller file
// with only some of them.

#include <cstdint>
#include <map>
#include <memory>
#include <set>
#include <string>

struct hb_font_t;

namespace Reader {

using GlyphNumber = std::uint16_t;

/// A font file with the glyphs of some characters, and the numbers that they have in it.
struct FontSubset {
    std::string file;
    std::map<char32_t, GlyphNumber> glyphs;
};

class FontFile {
public:
    /// Throws std::runtime_error when the file is no TrueType font or damaged.
    explicit FontFile(std::string file);

    bool has(char32_t character) const;

    /// Holds what a PDF needs of a font and no more; characters that the font lacks are left out. The same
    /// characters give the same bytes. Throws std::runtime_error when the font turns out to be damaged.
    FontSubset subset(std::set<char32_t> const& characters) const;

    // In thousandths of the font size.

    int ascent() const { return ascent_; }
    int descent() const { return descent_; }
    /// Of each letter.
    int advance() const { return advance_; }

private:
    struct Destroy {
        void operator()(hb_font_t* font) const;
    };

    std::string file_;
    std::unique_ptr<hb_font_t, Destroy> font_;
    int ascent_ = 0;
    int descent_ = 0;
    int advance_ = 0;
};

} // namespace Reader

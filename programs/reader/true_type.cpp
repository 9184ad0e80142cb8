#include "programs/reader/true_type.h"

#include <array>
#include <stdexcept>
#include <utility>
#include <vector>

namespace Reader {
namespace {

constexpr std::uint32_t TRUE_TYPE = 0x00010000;

// Places in the tables.
constexpr std::size_t HEAD_UNITS = 18;
constexpr std::size_t HEAD_OFFSET_FORMAT = 50;
constexpr std::size_t MAXP_GLYPHS = 4;
constexpr std::size_t HHEA_ASCENT = 4;
constexpr std::size_t HHEA_DESCENT = 6;
constexpr std::size_t HHEA_ADVANCE = 10;

/// What a PDF needs of a font, in the order in which the tables stand in a file.
constexpr std::array KEPT = {"cvt ", "fpgm", "glyf", "head", "hhea", "hmtx", "loca", "maxp", "prep"};

// Flags of a part of a glyph that is made of others.
constexpr unsigned WORD_ARGUMENTS = 0x0001;
constexpr unsigned HAS_SCALE = 0x0008;
constexpr unsigned MORE_PARTS = 0x0020;
constexpr unsigned HAS_TWO_SCALES = 0x0040;
constexpr unsigned HAS_MATRIX = 0x0080;

[[noreturn]] void fail() { throw std::runtime_error("The font file is damaged."); }

std::string_view part(std::string_view bytes, std::size_t offset, std::size_t length) {
    if (offset > bytes.size() || length > bytes.size() - offset)
        fail();
    return bytes.substr(offset, length);
}

std::uint32_t number(std::string_view bytes, std::size_t offset, std::size_t length) {
    std::uint32_t value = 0;
    for (char const byte : part(bytes, offset, length))
        value = value << 8 | static_cast<unsigned char>(byte);
    return value;
}

std::uint16_t u16(std::string_view bytes, std::size_t offset) {
    return static_cast<std::uint16_t>(number(bytes, offset, 2));
}

std::int16_t i16(std::string_view bytes, std::size_t offset) {
    return static_cast<std::int16_t>(u16(bytes, offset));
}

std::uint32_t u32(std::string_view bytes, std::size_t offset) { return number(bytes, offset, 4); }

void put(std::string& bytes, std::uint32_t value, int length) {
    for (int shift = 8 * (length - 1); shift >= 0; shift -= 8)
        bytes += static_cast<char>(value >> shift & 0xFF);
}

void fillToWord(std::string& bytes) { bytes.resize((bytes.size() + 3) / 4 * 4); }

std::uint32_t checksum(std::string const& filled) {
    std::uint32_t sum = 0;
    for (std::size_t i = 0; i < filled.size(); i += 4)
        sum += u32(filled, i);
    return sum;
}

std::string fileOf(std::vector<std::pair<std::string, std::string>> tables) {
    constexpr std::size_t DIRECTORY = 12;
    constexpr std::size_t ENTRY = 16;
    std::string file;
    put(file, TRUE_TYPE, 4);
    put(file, static_cast<std::uint32_t>(tables.size()), 2);
    // Hints for a binary search, which no reader of a PDF makes.
    file.append(6, '\0');
    std::string bodies;
    for (auto& [tag, body] : tables) {
        std::size_t const length = body.size();
        fillToWord(body);
        file += tag;
        put(file, checksum(body), 4);
        put(file, static_cast<std::uint32_t>(DIRECTORY + ENTRY * tables.size() + bodies.size()), 4);
        put(file, static_cast<std::uint32_t>(length), 4);
        bodies += body;
    }
    return file + bodies;
}

} // namespace

TrueTypeFont::TrueTypeFont(std::string file) : file_(std::move(file)) {
    if (u32(file_, 0) != TRUE_TYPE)
        fail();
    for (std::size_t i = 0; i < u16(file_, 4); ++i) {
        std::string_view const entry = part(file_, 12 + 16 * i, 16);
        tables_[std::string(entry.substr(0, 4))] = part(file_, u32(entry, 8), u32(entry, 12));
    }
    glyphCount_ = u16(table("maxp"), MAXP_GLYPHS);
    hasLongOffsets_ = u16(table("head"), HEAD_OFFSET_FORMAT) != 0;
    unitsPerSize_ = u16(table("head"), HEAD_UNITS);
    if (unitsPerSize_ == 0)
        fail();
    ascent_ = i16(table("hhea"), HHEA_ASCENT);
    descent_ = i16(table("hhea"), HHEA_DESCENT);
    advance_ = u16(table("hhea"), HHEA_ADVANCE);
    readCharacters();
}

GlyphNumber TrueTypeFont::glyphOf(char32_t character) const {
    auto const found = glyphs_.find(character);
    return found == glyphs_.end() ? GlyphNumber{0} : found->second;
}

std::string TrueTypeFont::subset(std::set<GlyphNumber> glyphs) const {
    // What a glyph without a character looks like; every font must have it.
    glyphs.insert(0);
    for (std::set<GlyphNumber> found = glyphs; !found.empty();) {
        std::set<GlyphNumber> parts;
        for (GlyphNumber const glyph : found)
            for (GlyphNumber const one : partsOf(glyph))
                if (glyphs.insert(one).second)
                    parts.insert(one);
        found = std::move(parts);
    }

    std::string outlines;
    std::string offsets;
    for (std::size_t glyph = 0; glyph < glyphCount_; ++glyph) {
        put(offsets, static_cast<std::uint32_t>(outlines.size()), 4);
        if (glyphs.count(static_cast<GlyphNumber>(glyph)) == 0)
            continue;
        outlines += outline(static_cast<GlyphNumber>(glyph));
        fillToWord(outlines);
    }
    put(offsets, static_cast<std::uint32_t>(outlines.size()), 4);

    std::vector<std::pair<std::string, std::string>> tables;
    for (char const* const tag : KEPT) {
        if (tables_.count(tag) == 0)
            continue;
        std::string body(table(tag));
        if (std::string_view(tag) == "glyf")
            body = outlines;
        else if (std::string_view(tag) == "loca")
            body = offsets;
        else if (std::string_view(tag) == "head")
            body.replace(HEAD_OFFSET_FORMAT, 2, std::string("\0\1", 2));
        tables.emplace_back(tag, std::move(body));
    }
    return fileOf(std::move(tables));
}

std::string_view TrueTypeFont::table(char const* tag) const {
    auto const found = tables_.find(tag);
    if (found == tables_.end())
        fail();
    return found->second;
}

std::string_view TrueTypeFont::outline(GlyphNumber glyph) const {
    auto const offset = [&](std::size_t index) -> std::size_t {
        return hasLongOffsets_ ? u32(table("loca"), 4 * index) : 2U * u16(table("loca"), 2 * index);
    };
    if (glyph >= glyphCount_ || offset(glyph + 1U) < offset(glyph))
        fail();
    return part(table("glyf"), offset(glyph), offset(glyph + 1U) - offset(glyph));
}

std::set<GlyphNumber> TrueTypeFont::partsOf(GlyphNumber glyph) const {
    std::set<GlyphNumber> parts;
    std::string_view const shape = outline(glyph);
    bool const isMadeOfOthers = !shape.empty() && i16(shape, 0) < 0;
    for (std::size_t at = 10; isMadeOfOthers;) {
        unsigned const flags = u16(shape, at);
        parts.insert(u16(shape, at + 2));
        at += 4 + (flags & WORD_ARGUMENTS ? 4U : 2U);
        at += flags & HAS_SCALE ? 2U : flags & HAS_TWO_SCALES ? 4U : flags & HAS_MATRIX ? 8U : 0U;
        if (!(flags & MORE_PARTS))
            break;
    }
    return parts;
}

/// From the table of all Unicode characters in its form of runs.
void TrueTypeFont::readCharacters() {
    constexpr std::uint16_t RUNS = 12;
    std::string_view const maps = table("cmap");
    for (std::size_t i = 0; i < u16(maps, 2); ++i) {
        std::uint32_t const offset = u32(maps, 4 + 8 * i + 4);
        if (u16(maps, offset) != RUNS)
            continue;
        std::string_view const map = part(maps, offset, u32(maps, offset + 4));
        for (std::size_t run = 0; run < u32(map, 12); ++run) {
            std::uint32_t const first = u32(map, 16 + 12 * run);
            std::uint32_t const last = u32(map, 16 + 12 * run + 4);
            std::uint32_t const glyph = u32(map, 16 + 12 * run + 8);
            if (last < first || last - first >= glyphCount_ || glyph + (last - first) >= glyphCount_)
                fail();
            for (std::uint32_t c = first; c <= last; ++c)
                glyphs_.emplace(c, static_cast<GlyphNumber>(glyph + (c - first)));
        }
        return;
    }
    fail();
}

} // namespace Reader

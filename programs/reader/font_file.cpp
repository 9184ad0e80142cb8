#include "programs/reader/font_file.h"

#include <array>
#include <hb-subset.h>
#include <optional>
#include <stdexcept>
#include <utility>

namespace Reader {
namespace {

// HarfBuzz's handles.
using Blob = std::unique_ptr<hb_blob_t, decltype(&hb_blob_destroy)>;
using Face = std::unique_ptr<hb_face_t, decltype(&hb_face_destroy)>;
using Input = std::unique_ptr<hb_subset_input_t, decltype(&hb_subset_input_destroy)>;
using Plan = std::unique_ptr<hb_subset_plan_t, decltype(&hb_subset_plan_destroy)>;

/// Tables that help a writer find glyphs and place them; a PDF names and places each glyph itself.
constexpr std::array NOT_FOR_PDF = {
    HB_TAG('c', 'm', 'a', 'p'), HB_TAG('n', 'a', 'm', 'e'), HB_TAG('p', 'o', 's', 't'),
    HB_TAG('O', 'S', '/', '2'), HB_TAG('G', 'S', 'U', 'B'), HB_TAG('G', 'P', 'O', 'S'),
    HB_TAG('G', 'D', 'E', 'F'), HB_TAG('k', 'e', 'r', 'n'), HB_TAG('g', 'a', 's', 'p'),
};

[[noreturn]] void fail() { throw std::runtime_error("The font file is damaged."); }

template<typename Handle>
Handle* required(Handle* handle) {
    if (!handle)
        fail();
    return handle;
}

std::optional<hb_codepoint_t> glyphOf(hb_font_t* font, char32_t character) {
    hb_codepoint_t glyph = 0;
    if (!hb_font_get_nominal_glyph(font, character, &glyph))
        return std::nullopt;
    return glyph;
}

Input inputFor(hb_set_t const* glyphs) {
    Input input(required(hb_subset_input_create_or_fail()), &hb_subset_input_destroy);
    hb_set_union(hb_subset_input_glyph_set(input.get()), glyphs);
    hb_set_t* const dropped = hb_subset_input_set(input.get(), HB_SUBSET_SETS_DROP_TABLE_TAG);
    for (hb_tag_t const table : NOT_FOR_PDF)
        hb_set_add(dropped, table);
    hb_subset_input_set_flags(input.get(), HB_SUBSET_FLAGS_NO_HINTING | HB_SUBSET_FLAGS_NOTDEF_OUTLINE);
    return input;
}

std::string fileOf(hb_face_t* face) {
    Blob const blob(hb_face_reference_blob(face), &hb_blob_destroy);
    unsigned length = 0;
    char const* const bytes = hb_blob_get_data(blob.get(), &length);
    if (length == 0)
        fail();
    return {bytes, length};
}

} // namespace

void FontFile::Destroy::operator()(hb_font_t* font) const { hb_font_destroy(font); }

FontFile::FontFile(std::string file) : file_(std::move(file)) {
    Blob const blob(hb_blob_create(file_.data(), static_cast<unsigned>(file_.size()), HB_MEMORY_MODE_READONLY,
                                   nullptr, nullptr),
                    &hb_blob_destroy);
    Face const face(hb_face_create(blob.get(), 0), &hb_face_destroy);
    font_.reset(hb_font_create(face.get()));
    hb_font_set_scale(font_.get(), 1000, 1000);
    hb_font_extents_t extents{};
    std::optional<hb_codepoint_t> const capital = glyphOf(font_.get(), U'M');
    if (!capital || !hb_font_get_h_extents(font_.get(), &extents))
        fail();
    ascent_ = extents.ascender;
    descent_ = extents.descender;
    advance_ = hb_font_get_glyph_h_advance(font_.get(), *capital);
    if (advance_ <= 0)
        fail();
}

bool FontFile::has(char32_t character) const { return glyphOf(font_.get(), character).has_value(); }

FontSubset FontFile::subset(std::set<char32_t> const& characters) const {
    std::map<char32_t, hb_codepoint_t> kept;
    std::unique_ptr<hb_set_t, decltype(&hb_set_destroy)> const glyphs(hb_set_create(), &hb_set_destroy);
    for (char32_t const character : characters)
        if (auto const glyph = glyphOf(font_.get(), character)) {
            kept.emplace(character, *glyph);
            hb_set_add(glyphs.get(), *glyph);
        }
    Input const input = inputFor(glyphs.get());
    Plan const plan(required(hb_subset_plan_create_or_fail(hb_font_get_face(font_.get()), input.get())),
                    &hb_subset_plan_destroy);
    Face const face(required(hb_subset_plan_execute_or_fail(plan.get())), &hb_face_destroy);
    FontSubset subset{fileOf(face.get()), {}};
    hb_map_t const* const numbers = hb_subset_plan_old_to_new_glyph_mapping(plan.get());
    for (auto const& [character, glyph] : kept)
        subset.glyphs.emplace(character, static_cast<GlyphNumber>(hb_map_get(numbers, glyph)));
    return subset;
}

} // namespace Reader

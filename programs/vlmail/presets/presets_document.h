#pragma once
// A settings document as its writer sees it: each preset, zone and field with its place, also where the
// settings as a whole could not be used.

#include "programs/vlmail/presets/place.h"
#include "vlservice/extract/extract_preset.h"
#include "vlservice/presets/presets.h"

#include <memory>
#include <string>
#include <vector>

namespace VlMail {

struct ListedField {
    Place place;
    json::Object json;
    std::string name;
    /// Null when the field cannot be read.
    std::shared_ptr<Cfg::ExtractField const> field;
};

struct ListedZone {
    Place place;
    json::Object json;
    std::string name;
    Cfg::Rect location;
    /// As stored: both 0 when the default point holds.
    Cfg::Point point;
    std::vector<ListedField> fields;

    bool hasLocation() const { return !location.isZeroes(); }
};

struct ListedExtractPreset {
    Place place;
    json::Object json;
    /// Comes from a parent node.
    bool inherited = false;
    /// Without its zones, so that it is there even when they cannot be read.
    Cfg::ExtractPreset preset;
    std::vector<ListedZone> zones;

    std::string const& match() const { return preset.strRegex(); }
};

/// Its name and expression for people.
std::string inWords(Cfg::ExtractPreset const& preset);

struct ListedPackPreset {
    Place place;
    json::Object json;
    bool inherited = false;
    std::string name;
};

/// A settings document: parts under their names, or the part "presets" alone. What is not of the type that
/// stands there is left out of the lists.
class PresetsDocument {
public:
    /// Presets of a part that is inherited and not in the text stand behind those that are, at
    /// places that the text does not have. Throws json::Exc when the text is no JSON object.
    explicit PresetsDocument(std::string const& text, json::Object const& above = {});

    json::Object const& json() const { return document_; }
    bool isPartAlone() const { return isPartAlone_; }
    /// The parser's words on the first key that stands twice in one object; empty when none does.
    std::string const& duplicateKey() const { return duplicateKey_; }

    /// In the order in which presets are tried: by rising order, those of the same order as they stand.
    std::vector<ListedExtractPreset> const& extractPresets() const { return extractPresets_; }
    /// As they stand.
    std::vector<ListedPackPreset> const& packPresets() const { return packPresets_; }

    /// The settings part with what matching needs and nothing else, and with what is added by default.
    Cfg::Presets matchingPart() const;

private:
    void addInherited(json::Object const& part, std::size_t ownExtract, std::size_t ownPack);

    json::Object document_;
    bool isPartAlone_;
    Place partPlace_;
    std::string duplicateKey_;
    std::vector<ListedExtractPreset> extractPresets_;
    std::vector<ListedPackPreset> packPresets_;
};

/// The member, as an array without elements when it is none.
json::Array arrayOf(json::Object const& object, char const* key);

/// An element of a settings list: what is wrapped as inherited, or the element itself.
struct Unwrapped {
    json::Value node;
    Place place;
    bool inherited;
};
Unwrapped unwrap(json::Value const& node, Place const& place);

} // namespace VlMail

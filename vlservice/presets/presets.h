#pragma once
// The presets of a configuration node: from a document's name to how it is read and how it is sent.

#include "vlservice/cfg/part.h"
#include "vlservice/export.h"
#include "vlservice/extract/extract_preset.h"
#include "vlservice/json/json_form.h"
#include "vlservice/presets/pack_preset.h"

#include <string>
#include <tuple>
#include <utility>

/// As elements of a settings list pack presets stand in their configuration form.
template<>
struct json::Form<Cfg::PackPreset> {
    static Cfg::PackPreset read(Value const& node) { return Cfg::PackPreset(node.toObject(), {}); }
    static Value write(Cfg::PackPreset const& preset) { return preset.serialize(false); }
    static KeyForm describe() { return {KeyType::Record, &Cfg::PackPreset::keys()}; }
};

namespace Cfg {

enum class VLSERVICE_EXPORT PresetFieldIdxs { ExtractPresets, PackPresets };

using PresetFields =
    std::tuple<Field<ExtractPreset, ArrValue<ExtractPreset>>, Field<PackPreset, ArrValue<PackPreset>>>;

extern template class VLSERVICE_EXPORT Part<PresetFieldIdxs, PresetFields>;

/// The part "presets". Presets are tried in list order, which is decided when the list is built: own presets
/// stand in front of inherited ones, whatever their order. Presets of one name, or of one expression, all
/// stay in the lists, and the first of them answers. An erase mark changes nothing but the written form.
///
/// Matching fills caches in the presets without a lock. Copies start without compiled expressions; assigning
/// a part over one that was matched leaves the compiled expressions of the presets in their places, so that
/// they go on answering for the former ones: build a new part instead.
class VLSERVICE_EXPORT Presets : public Part<PresetFieldIdxs, PresetFields> {
public:
    static std::string const PART_NAME;
    static json::RecordKeys const& keys();
    /// The text of the expression that makes an extraction preset the catch-all.
    static std::string const CATCH_ALL_PATTERN;
    /// The name of the default pack preset.
    static std::string const CATCH_ALL_PACK_PRES_NAME;

    /// A global part gets a catch-all extraction preset and a default pack preset, both inherited, where the
    /// configuration lacks them. A catch-all of the configuration that names a missing pack preset stays
    /// without one: deliberately, no other preset is put in the place of the one that was meant.
    Presets(json::Value const& j, bool global, bool sorted);

    /// Whether both lists are empty.
    bool empty() const;

    /// The first extraction preset whose expression matches the whole name, without regard to case; valid
    /// until the part is changed. Throws std::runtime_error "Failed to find extraction preset for <docName>",
    /// and what ExtractPreset::match throws for a preset that it reaches, though a later one might have
    /// matched.
    ExtractPreset const& matchExtrPreset(std::string const& docName) const;
    /// The same, and the first pack preset of the name that it gives. Throws std::runtime_error as well when
    /// there is none: "Failed to find pack preset for extraction preset for <docName>".
    std::pair<ExtractPreset const&, PackPreset const&> findMatch(std::string const& docName) const;

private:
    static PresetFields const FLDS_INIT;

    void addCatchAll();
    ExtractPreset const* findCatchAll() const;
    PackPreset const* findPackPreset(std::string const& name) const;
};

} // namespace Cfg

#pragma once
// Finds a document's presets, as Cfg::Presets does and fast among many: whoever has a name asks here.

#include "vlservice/extract/match_time.h"
#include "vlservice/presets/presets.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>
#include <vector>

namespace VlMail {

/// What the patterns of presets have for the name of a document, together.
constexpr std::chrono::milliseconds NAME_PATTERNS_TIME{5'000};

/// An index by three-letter pieces of what must stand in a name, in front of the presets' own matching.
/// Whatever it does not understand is tried in its place: a preset with such an expression, and every preset
/// for such a name. The part must outlive it and stay as it is. Not for use on several threads, as presets
/// are not.
class PresetIndex {
public:
    using Match = std::pair<Cfg::ExtractPreset const&, Cfg::PackPreset const&>;

    explicit PresetIndex(Cfg::Presets const& presets, std::chrono::milliseconds time = NAME_PATTERNS_TIME);
    PresetIndex(PresetIndex const&) = delete;
    PresetIndex& operator=(PresetIndex const&) = delete;

    Cfg::Presets const& presets() const { return presets_; }
    /// Gives and throws what Cfg::Presets::findMatch() does, and Base::Error when the patterns' time is up.
    Match findMatch(std::string const& name) const;

private:
    using Positions = std::vector<std::uint32_t>;

    void add(std::vector<std::vector<std::vector<std::string>>> const& wordsOfPresets);
    Positions candidates(std::string const& name) const;
    bool fits(Cfg::ExtractPreset const& preset, std::string const& name, Cfg::MatchTime const& time) const;
    /// Nothing also when the first that fits has no pack preset.
    std::optional<Match> firstOf(Positions const& positions, std::string const& name,
                                 Cfg::MatchTime const& time) const;
    std::optional<Match> findInTime(std::string const& name) const;

    Cfg::Presets const& presets_;
    std::chrono::milliseconds time_;
    std::vector<Cfg::ExtractPreset const*> extractPresets_;
    Positions all_;
    bool isIndexed_;
    /// Few presets, none of which needs a limit of time.
    bool isWalked_ = false;
    /// Of presets that are tried for every name; rising.
    Positions always_;
    std::unordered_map<std::uint32_t, Positions> byPiece_;
    std::unordered_map<std::string_view, Cfg::PackPreset const*> packPresets_;
};

/// The one that findMatch() gives where a preset names it: the first of the name; none is nullptr.
Cfg::PackPreset const* packPresetNamed(std::string const& name, Cfg::Presets const& presets);

} // namespace VlMail

#pragma once
// By which other channels a letter may go when the first has failed: "fallback" of "production" in its pack
// preset.

#include "programs/mailing/metadata.h"

#include <string>
#include <vector>

namespace Mailing {

/// Key of the object "production".
inline constexpr char const* FALLBACK = "fallback";
inline constexpr std::size_t MAX_FALLBACKS = 16;

/// What the pack preset names, in its order; what cannot be used counts as not said.
std::vector<std::string> fallbackIn(Cfg::PackPreset const& preset);

struct OtherWay {
    std::string channel;
    /// Whether the letter has a valid address of that name.
    bool hasAddress = false;

    bool operator==(OtherWay const&) const = default;
};

/// Those ways of a letter, each once, without the channel that it goes by first.
std::vector<OtherWay> otherWaysOf(MailedLetter const& letter, Cfg::PackPreset const& preset);

} // namespace Mailing

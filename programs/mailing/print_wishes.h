#pragma once
// How a pack preset wants its letters printed, as far as a printer is told, and how often.

#include "vlservice/presets/pack_preset.h"

namespace Mailing {

/// What "colour_model" says; 0 is as the pages are.
constexpr PackColorModel GREY{1};
constexpr PackColorModel COLOURED{2};

struct PrintWishes {
    // Keys of the object "production" of a pack preset, and of "sheet" within it.
    static constexpr char const* PRODUCTION = "production";
    static constexpr char const* SHEET = "sheet";
    static constexpr char const* WIDTH = "width";
    static constexpr char const* HEIGHT = "height";
    static constexpr char const* COPIES = "copies";
    static constexpr char const* DUPLICATE_DAYS = "duplicate_days";
    static constexpr int MAX_COPIES = 99;
    static constexpr int MAX_DUPLICATE_DAYS = 3650;
    static constexpr int DUPLICATE_DAYS_UNLESS_SET = 90;

    /// Of the sheet, in 1/100 mm; 0 where the preset says nothing.
    int width = 0;
    int height = 0;
    int copies = 1;
    /// For how long a letter does not go out a second time; 0 is not at all.
    int duplicateDays = DUPLICATE_DAYS_UNLESS_SET;

    /// What cannot be used counts as not said.
    static PrintWishes of(Cfg::PackPreset const& preset);
};

} // namespace Mailing

#pragma once
// What becomes of a mailing once it is accepted, as its pack preset says.

#include "programs/policy/slots.h"
#include "vlservice/presets/pack_preset.h"

namespace Policy {

/// Bits of a pack preset's "process_mode". A container is always made; bits beside these are carried.
enum class ProcessBit : std::uint32_t { Produce = 1, HandOver = 2, Hold = 8, Trial = 128 };

bool has(Cfg::ProcessMode mode, ProcessBit bit);

struct Course {
    /// It is handed over without being asked to.
    bool handsOver = false;
    /// It waits until a person releases it.
    bool holds = false;
    /// Nothing is handed over.
    bool isTrial = false;
    /// Until when it waits, seconds since the epoch; 0 for no wait.
    long long due = 0;
};

/// The course of a mailing that is accepted at `moment`. A delay that never ends is none: refusalsOf() tells.
Course courseOf(Cfg::PackPreset const& mailing, Moment const& moment);

} // namespace Policy

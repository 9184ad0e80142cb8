#pragma once
// What a pack says of itself, and whether and how it becomes a job.

#include "programs/mailing/pack_source.h"
#include "programs/policy/limits.h"
#include "programs/vlserviced/store/job.h"

#include <string>

namespace VlServiced {

struct PackSummary {
    std::string cfgId;
    std::string title;
    long long documents = 0;
    long long pages = 0;
    Cfg::PackPreset packPreset = {};
    /// Of its letter with the most.
    long long sheets = 0;
};

/// Throws Error when it can be no job, or cannot be read.
PackSummary summaryOf(Mailing::PackSource& pack);
/// The part of it that its metadata tells: what decides whether and how it goes out.
void addOutline(PackSummary& summary, Mailing::PackSource& pack);

/// Throws Error with the lines of what the node's settings do not allow. The client has decided by the same
/// rules, unless it is an older one or had others.
void requireAllowed(std::string const& packId, PackSummary const& summary, Policy::Rules const& rules,
                    Policy::Moment const& moment, Policy::PresetSource const& sourceOf);

/// The job of a pack that is accepted at that moment.
Job jobFor(PackLocation const& pack, PackSummary const& summary, Policy::Moment const& moment);

} // namespace VlServiced

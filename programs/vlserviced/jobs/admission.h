#pragma once
// What a pack says of itself, and whether and how it becomes a job.

#include "programs/base/error.h"
#include "programs/mailing/mailing_outline.h"
#include "programs/mailing/pack_source.h"
#include "programs/policy/limits.h"
#include "programs/vlserviced/store/job.h"
#include "programs/vlserviced/store/letter_register.h"

#include <string>
#include <vector>

namespace VlServiced {

struct PackSummary {
    std::string cfgId;
    std::string title;
    long long documents = 0;
    long long pages = 0;
    Cfg::PackPreset packPreset = {};
    /// Of its letter with the most.
    long long sheets = 0;
    std::vector<Mailing::LetterDigest> digests = {};
    /// Why its letters go out although they did before; empty where they are not to.
    std::string again = {};
};

/// Throws Error when it can be no job, or cannot be read.
PackSummary summaryOf(Mailing::PackSource& pack);
/// The part of it that its metadata tells: what decides whether and how it goes out.
void addOutline(PackSummary& summary, Mailing::PackSource& pack);

/// Throws Error with the lines of what the node's settings do not allow. The client has decided by the same
/// rules, unless it is an older one or had others.
void requireAllowed(std::string const& packId, PackSummary const& summary, Policy::Rules const& rules,
                    Policy::Moment const& moment, Policy::PresetSource const& sourceOf);

/// Why a pack is not taken of which letters went out before.
class SentBefore : public Base::Error {
public:
    SentBefore(std::string const& says, std::size_t letters)
        : Error(Base::Code::SentBefore, says), letters_(letters) {}

    /// How many.
    std::size_t letters() const { return letters_; }

private:
    std::size_t letters_;
};

/// Enters its letters in the register, for as long as its pack preset says; a trial run sends none. Within
/// the transaction that accepts the job. Throws SentBefore with the numbers of those that went out before.
void enterLetters(LetterRegister& letterRegister, Job const& job, PackSummary const& summary);

/// The job of a pack that is accepted at that moment.
Job jobFor(PackLocation const& pack, PackSummary const& summary, Policy::Moment const& moment);

} // namespace VlServiced

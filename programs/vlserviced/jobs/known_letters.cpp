#include "programs/vlserviced/jobs/known_letters.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"

#include <algorithm>
#include <optional>

namespace VlServiced {
namespace {

std::string stateOf(RegisteredLetter const& known, JobStore const& jobs, LetterStore const& letters) {
    std::optional<Job> const job = jobs.find(known.mailing.pack);
    if (!job)
        return {};
    std::optional<StoredLetter> const letter = letters.find({known.mailing.pack, known.number});
    return letter && letter->byCarrier ? Protocol::letterStateName(letter->state)
                                       : Protocol::stateName(job->state);
}

void requireDigests(std::vector<std::string> const& digests) {
    for (std::string const& digest : digests)
        if (!Base::isSha256(digest))
            throw Base::Error(Base::Code::RequestInvalid, "a digest of a letter has 64 hexadecimal digits");
}

} // namespace

Protocol::RegisterAnswer knownLetters(Protocol::RegisterQuery const& query,
                                      LetterRegister const& letterRegister, JobStore const& jobs,
                                      LetterStore const& letters, long long now, Policy::Grant const& by) {
    requireDigests(query.digests);
    Protocol::RegisterAnswer answer;
    for (RegisteredLetter const& known : letterRegister.find(query.digests, now)) {
        if (std::ranges::find(query.besides, known.mailing.pack) != query.besides.end())
            continue;
        Protocol::RegisteredLetter& told = answer.letters.emplace_back();
        told.digest = known.digest;
        told.at = known.mailing.at;
        if (!by.covers(known.mailing.node))
            continue;
        told.pack = known.mailing.pack;
        told.state = stateOf(known, jobs, letters);
    }
    return answer;
}

} // namespace VlServiced

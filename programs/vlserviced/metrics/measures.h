#pragma once
// What the service counts and times while it works. Labels are names of its own: none says anything of a
// person, a mailing or a node, and of each there are few.

#include "programs/protocol/letter.h"
#include "programs/vlserviced/jobs/step.h"

#include <prometheus/counter.h>
#include <prometheus/histogram.h>
#include <prometheus/registry.h>

#include <chrono>
#include <cstddef>
#include <string>
#include <vector>

namespace VlServiced {

/// Why a command was not carried out.
enum class Refusal {
    /// Its token was revoked.
    Token,
    /// Its token does not allow it.
    Rights,
    /// What it asked for cannot be done; the answer says why.
    Request,
};

/// What came of letters that were sent before.
enum class LeftOut {
    /// A client that asked was told, and leaves them out.
    Told,
    /// Their mailing was not accepted.
    Refused,
};

/// May be used by any thread.
class Measures {
public:
    using Duration = std::chrono::duration<double>;

    Measures();

    void noteStep(Step step, Duration took);
    /// The name is one of those that the service answers by.
    void noteCommand(std::string const& name, Duration took);
    void noteRefusal(Refusal reason);
    /// "query", "change" or "commit".
    void noteDatabase(char const* operation, Duration took);
    /// What became of letters that were handed over, or were to be.
    void noteLetters(std::string const& channel, Protocol::LetterState outcome, std::size_t count);

    void noteSentBefore(LeftOut which, std::size_t count);

    std::vector<prometheus::MetricFamily> collect() const { return registry_.Collect(); }

private:
    prometheus::Registry registry_;
    prometheus::Family<prometheus::Histogram>& steps_;
    prometheus::Family<prometheus::Histogram>& commands_;
    prometheus::Family<prometheus::Counter>& refusals_;
    prometheus::Family<prometheus::Histogram>& database_;
    prometheus::Family<prometheus::Counter>& letters_;
    prometheus::Family<prometheus::Counter>& sentBefore_;
};

} // namespace VlServiced

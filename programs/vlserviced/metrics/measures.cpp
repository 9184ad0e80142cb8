#include "programs/vlserviced/metrics/measures.h"

namespace VlServiced {
namespace {

using prometheus::Counter;
using prometheus::Family;
using prometheus::Histogram;

/// Seconds. A commit takes a few milliseconds, a container some seconds, a carrier minutes at worst.
Histogram::BucketBoundaries const STEP_BOUNDS{0.01, 0.05, 0.25, 1, 5, 30, 120, 600};
Histogram::BucketBoundaries const COMMAND_BOUNDS{0.001, 0.005, 0.025, 0.1, 0.5, 2.5, 10};
Histogram::BucketBoundaries const DATABASE_BOUNDS{0.0001, 0.0005, 0.0025, 0.01, 0.05, 0.25, 1};

char const* nameOf(Refusal reason) {
    switch (reason) {
    case Refusal::Token:
        return "token";
    case Refusal::Rights:
        return "rights";
    case Refusal::Request:
        break;
    }
    return "request";
}

char const* nameOf(LeftOut which) { return which == LeftOut::Told ? "told" : "refused"; }

Family<Histogram>& times(prometheus::Registry& registry, char const* name, char const* help) {
    return prometheus::BuildHistogram().Name(name).Help(help).Register(registry);
}

Family<Counter>& counts(prometheus::Registry& registry, char const* name, char const* help) {
    return prometheus::BuildCounter().Name(name).Help(help).Register(registry);
}

} // namespace

Measures::Measures()
    : steps_(times(registry_, "vlserviced_step_seconds", "How long the steps of mailings and letters took.")),
      commands_(times(registry_, "vlserviced_command_seconds", "How long commands of clients took.")),
      refusals_(counts(registry_, "vlserviced_commands_refused",
                       "Commands of clients that were not carried out, by the reason.")),
      database_(times(registry_, "vlserviced_database_seconds",
                      "How long the service's thread waited for the database.")),
      letters_(counts(registry_, "vlserviced_letters",
                      "What became of letters that were handed over to carriers.")),
      sentBefore_(counts(registry_, "vlserviced_letters_sent_before",
                         "Letters that were not accepted since they went out before.")) {
    // What has not happened yet is 0, and not missing.
    for (Step const step : ALL_STEPS)
        steps_.Add({{"step", stepName(step)}}, STEP_BOUNDS);
    for (Refusal const reason : {Refusal::Token, Refusal::Rights, Refusal::Request})
        refusals_.Add({{"reason", nameOf(reason)}});
    for (LeftOut const which : {LeftOut::Told, LeftOut::Refused})
        sentBefore_.Add({{"outcome", nameOf(which)}});
}

void Measures::noteStep(Step step, Duration took) {
    steps_.Add({{"step", stepName(step)}}, STEP_BOUNDS).Observe(took.count());
}

void Measures::noteCommand(std::string const& name, Duration took) {
    commands_.Add({{"command", name}}, COMMAND_BOUNDS).Observe(took.count());
}

void Measures::noteRefusal(Refusal reason) { refusals_.Add({{"reason", nameOf(reason)}}).Increment(); }

void Measures::noteDatabase(char const* operation, Duration took) {
    database_.Add({{"operation", operation}}, DATABASE_BOUNDS).Observe(took.count());
}

void Measures::noteLetters(std::string const& channel, Protocol::LetterState outcome, std::size_t count) {
    letters_.Add({{"channel", channel}, {"outcome", Protocol::letterStateName(outcome)}})
        .Increment(static_cast<double>(count));
}

void Measures::noteSentBefore(LeftOut which, std::size_t count) {
    sentBefore_.Add({{"outcome", nameOf(which)}}).Increment(static_cast<double>(count));
}

} // namespace VlServiced

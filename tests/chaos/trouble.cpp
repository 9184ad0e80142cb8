#include "tests/chaos/trouble.h"

#include <algorithm>
#include <thread>

namespace Chaos {
namespace {

/// As often on each machine.
std::size_t below(std::mt19937& random, std::size_t limit) { return random() % limit; }

constexpr std::chrono::milliseconds LEASE = std::chrono::seconds(Installation::LEASE_SECONDS);

Fault randomFault(std::mt19937& random) {
    constexpr int MAX_PIECES = 60;
    Fault fault;
    fault.kind = ALL_KINDS[below(random, ALL_KINDS.size())];
    fault.service = below(random, Installation::SERVICES);
    fault.pieces = static_cast<int>(below(random, MAX_PIECES));
    return fault;
}

/// A server that starts on a full disk may have no room for what it has to do then.
bool isOfDatabase(Fault const& fault) {
    return fault.kind == Kind::FullDisk || fault.kind == Kind::DatabaseCrash;
}

bool goTogether(Fault const& one, Fault const& other) {
    return one.kind != other.kind && one.service != other.service &&
           !(isOfDatabase(one) && isOfDatabase(other));
}

/// Mostly short of the lease, now and then longer.
std::chrono::milliseconds randomTime(std::mt19937& random) {
    auto const part = below(random, 100);
    return std::chrono::milliseconds(20) + (below(random, 3) == 0 ? LEASE * part / 60 : LEASE * part / 600);
}

} // namespace

void Fault::begin(Installation& installation) const {
    switch (kind) {
    case Kind::FullDisk:
        return installation.fillDisk();
    case Kind::DatabaseCrash:
        return installation.crashDatabase();
    case Kind::DatabaseStall:
        return installation.toDatabase(service).stall();
    case Kind::DatabaseCut:
        return installation.toDatabase(service).cutBehind(pieces);
    case Kind::ServiceKill:
        return installation.kill(service);
    case Kind::ServiceFreeze:
        return installation.freeze(service);
    case Kind::ClientCut:
        return installation.toService(service).cutBehind(pieces);
    }
}

void Fault::end(Installation& installation) const {
    switch (kind) {
    case Kind::FullDisk:
        return installation.emptyDisk();
    case Kind::DatabaseCrash:
        return installation.startDatabase();
    case Kind::DatabaseStall:
    case Kind::DatabaseCut:
        return installation.toDatabase(service).calm();
    case Kind::ServiceKill:
        installation.start(service);
        return;
    case Kind::ServiceFreeze:
        return installation.thaw(service);
    case Kind::ClientCut:
        return installation.toService(service).calm();
    }
}

std::string Fault::text() const {
    std::string const of = " service " + std::to_string(service);
    switch (kind) {
    case Kind::FullDisk:
        return "the disk of the database is full";
    case Kind::DatabaseCrash:
        return "the database is ended at once";
    case Kind::DatabaseStall:
        return "the database does not answer" + of;
    case Kind::DatabaseCut:
        return "the connection of" + of + " to the database is cut behind " + std::to_string(pieces) +
               " pieces";
    case Kind::ServiceKill:
        return "kill" + of;
    case Kind::ServiceFreeze:
        return "freeze" + of;
    case Kind::ClientCut:
        break;
    }
    return "a connection of clients to" + of + " is cut behind " + std::to_string(pieces) + " pieces";
}

Step Step::random(std::mt19937& random) {
    Step step{{randomFault(random)}, randomTime(random)};
    if (Fault const other = randomFault(random); goTogether(step.faults.front(), other))
        step.faults.push_back(other);
    std::ranges::sort(step.faults, {}, &Fault::kind);
    return step;
}

void Step::run(Installation& installation) const {
    // A database that is gone is filled no more.
    for (Fault const& fault : faults)
        fault.begin(installation);
    std::this_thread::sleep_for(time);
    for (Fault const& fault : faults)
        fault.end(installation);
}

std::string Step::text() const {
    std::string text;
    for (Fault const& fault : faults)
        text += (text.empty() ? "" : ", ") + fault.text();
    return text + ", for " + std::to_string(time.count()) + " ms";
}

} // namespace Chaos

#pragma once
// "vlmail mail --send" while its calls fail and the service's do not: what it says was sent is there, what it
// says was not may be resumed, and nothing is lost or there twice.

#include "tests/faults/service_at_hand.h"

#include <set>
#include <string>
#include <vector>

namespace Faults {

/// The service runs as long as the object lives.
class SentMail {
public:
    static constexpr char const* NAME = "mail_send";

    long callsOf(std::string const& call) { return send({call, 1, 0, false}).calls; }
    /// What was promised and not kept; empty when all was.
    std::vector<std::string> run(Fault const& fault);

private:
    Ended send(Fault const& fault);
    void writeNewLetter();
    void check(Ended const& ended);
    void resumeStranded();
    /// The ids of all mailings, once the service has fetched them.
    std::multiset<std::string> mailings();
    /// A line of those that were not there before.
    std::string newOnes(std::multiset<std::string> const& after) const;
    void find(std::string const& what) { findings_.push_back(what); }

    ServiceAtHand service_;
    /// Those of the runs before.
    std::multiset<std::string> before_;
    std::vector<std::string> findings_;
    /// As it was at first.
    std::string letter_;
    long letters_ = 0;
};

} // namespace Faults

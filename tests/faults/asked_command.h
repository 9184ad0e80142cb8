#pragma once
// A command of vlmail that asks a service for one thing, while its calls fail: it is done or not, and never
// said to be done when it is not.

#include "tests/faults/service_at_hand.h"

#include <functional>

namespace Faults {

enum class Expected { Done, Refused };

/// What is asked.
struct Question {
    std::string name;
    /// "{}" stands for the mailing at hand.
    std::vector<std::string> arguments;
    /// Brings the service to what the command finds; gives the mailing at hand, if there is one.
    std::function<std::string(ServiceAtHand const& service)> prepare = {};
    /// What tells whether it is done. None where nothing is changed.
    std::vector<std::string> look = {};
    /// What the service does when nothing fails.
    Expected expected = Expected::Done;
};

inline void PrintTo(Question const& question, std::ostream* out) { *out << question.name; }

std::vector<Question> const& questions();

class AskedCommand {
public:
    /// The service runs as long as the object lives.
    explicit AskedCommand(Question question);

    long callsOf(std::string const& call) { return runOnce({call, 1, 0, false}).calls; }
    /// What was promised and not kept; empty when all was.
    std::vector<std::string> run(Fault const& fault);

private:
    /// Failures that change nothing are many, and looking takes as long as they do.
    static constexpr int LOOK_EVERY = 8;

    void prepare();
    Ended runOnce(Fault const& fault);
    std::vector<std::string> named(std::vector<std::string> arguments) const;
    /// What the service says, once it has fetched what it accepted, and which files there are.
    std::string state() const;
    void checkState(bool isDone);
    void find(std::string const& what) { findings_.push_back(what); }

    Question const question_;
    ServiceAtHand service_;
    bool isPrepared_ = false;
    std::string mailing_;
    std::string state_;
    /// Runs since the state was looked at.
    int unseen_ = 0;
    /// Without a fault.
    std::string before_;
    std::string after_;
    Ended clean_;
    std::vector<std::string> findings_;
};

} // namespace Faults

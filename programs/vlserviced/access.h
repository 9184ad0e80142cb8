#pragma once
// The gate in front of the commands: what each wants, held against what the token allows that it came by.

#include "programs/policy/rights.h"
#include "vlservice/platform/cmd.h"

#include <functional>
#include <string>

namespace VlServiced {

/// Tells the log of attempts that were refused: one line a minute, with how many more there were.
class RefusedAttempts {
public:
    /// Seconds; may begin anywhere.
    explicit RefusedAttempts(std::function<long long()> now);

    void note(std::string const& line);
    /// Tells of those that came since the last line, when that is a minute ago.
    void tellWhatWasLeftOut();
    long long count() const { return count_; }
    /// Whether that line is the last that was noted.
    bool isLast(std::string const& line) const { return count_ > 0 && line == last_; }

private:
    bool isTime() const;

    std::function<long long()> now_;
    long long toldAt_ = 0;
    bool hasTold_ = false;
    long long leftOut_ = 0;
    long long count_ = 0;
    std::string last_;
};

/// Lets commands through, or refuses them with a line.
class Access {
public:
    /// The clock is that of RefusedAttempts.
    explicit Access(std::function<long long()> now) : refused_(std::move(now)) {}

    /// Throws Error unless the grant suffices for the command, as far as the command itself tells.
    void require(Ipc::CmdI const& cmd, Policy::Grant const& by);
    /// The same for what turned out to be about that node.
    void require(Policy::Role role, std::string const& node, Policy::Grant const& by);

    RefusedAttempts& refused() { return refused_; }

private:
    void require(Policy::Right const& right, std::string const& node, Policy::Grant const& by);

    RefusedAttempts refused_;
};

} // namespace VlServiced

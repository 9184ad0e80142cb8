#pragma once
// A command of vlmail that has to keep its promises whatever call fails: all or nothing under final names, a
// truthful status, a line that says what failed, nothing hidden left behind, inputs as they were.

#include "tests/faults/process.h"
#include "tests/support/temporary_folder.h"

#include <functional>
#include <memory>

namespace Faults {

struct Command {
    std::string name;
    std::vector<std::string> arguments;
    /// Puts into the folder what the command finds there.
    std::function<void(std::filesystem::path const& folder)> prepare;
};

/// For the names of tests.
inline void PrintTo(Command const& command, std::ostream* out) { *out << command.name; }

/// The commands of vlmail that need no service.
std::vector<Command> const& commands();

/// A command that is run again and again in the same folder, each time made anew.
class Scenario {
public:
    explicit Scenario(Command const& command);

    /// How many calls of a kind a run makes in which nothing fails.
    long callsOf(std::string const& call);
    /// Runs it with the fault; gives what was promised and not kept, empty when all was.
    std::vector<std::string> run(Fault const& fault);
    /// Only runs it with the fault.
    Ended look(Fault const& fault) { return runOnce(fault); }

private:
    using Files = std::map<std::string, std::string>;

    Ended runOnce(Fault const& fault);
    /// Names as they are by names without the ids of mailings, and contents by those.
    Files names() const;
    Files files() const;
    void checkEnd(Fault const& fault, Ended const& ended, Files const& after);
    void checkInputs(Files const& after);
    void checkOutputs(Fault const& fault, Ended const& ended, Files const& after);
    void checkOutput(Fault const& fault, Ended const& ended, std::string const& name,
                     std::string const& content);
    bool isSame(std::string const& name, std::string const& content) const;
    void find(std::string const& what) { findings_.push_back(what); }

    Command command_;
    TemporaryFolder root_;
    std::filesystem::path folder_ = root_ / "work";
    /// A run in which nothing fails: what was there before it, and what behind it.
    Files before_;
    Files after_;
    Ended clean_;
    /// What "pack verify" says of mailings then.
    Files verdicts_;
    /// Files that come out differently each time.
    std::map<std::string, bool> changing_;
    std::vector<std::string> findings_;
};

} // namespace Faults

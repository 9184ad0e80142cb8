// scripts/torture: commands of vlmail in which calls fail, at random and for as long as one likes.
//     torture MINUTES [SEED]           says each finding, and how to repeat it; status 1 when there was one
//     torture --repeat COMMAND FAULT   runs one, such as "mail write:28:3+"
#include "tests/faults/scenario.h"

#include <algorithm>
#include <chrono>
#include <iostream>
#include <random>

namespace {

using namespace Faults;
using Clock = std::chrono::steady_clock;

bool say(std::string const& command, Fault const& fault, std::vector<std::string> const& findings) {
    for (std::string const& finding : findings)
        std::cout << command << " with " << fault.text() << ' ' << finding
                  << "\n    to repeat: scripts/torture --repeat " << command << ' ' << fault.text()
                  << std::endl;
    return !findings.empty();
}

int repeat(std::string const& name, std::string const& text) {
    auto const command = std::ranges::find(commands(), name, &Command::name);
    auto const fault = Fault::parse(text);
    if (command == commands().end() || !fault) {
        std::cerr << "torture: there is no command " << name << " or no fault " << text << '\n';
        return 1;
    }
    return say(name, *fault, Scenario(*command).run(*fault)) ? 1 : 0;
}

/// A command and how often it makes calls of each kind.
struct Subject {
    explicit Subject(Command const& command) : name(command.name), scenario(command) {
        for (std::string const& call : CALLS)
            calls[call] = scenario.callsOf(call);
    }

    std::string name;
    Scenario scenario;
    std::map<std::string, long> calls;
};

class Sweep {
public:
    explicit Sweep(unsigned seed) : random_(seed) {
        for (Command const& command : commands())
            subjects_.push_back(std::make_unique<Subject>(command));
    }

    /// One run; whether there was a finding.
    bool step() {
        Subject& subject = *subjects_[upTo(subjects_.size())];
        std::string const& call = CALLS[upTo(CALLS.size())];
        std::vector<Fault> const faults = faultsOf(call);
        Fault fault = faults[upTo(faults.size())];
        fault.number = 1 + static_cast<long>(upTo(static_cast<std::size_t>(subject.calls[call]) + 1));
        return say(subject.name, fault, subject.scenario.run(fault));
    }

private:
    std::size_t upTo(std::size_t count) { return random_() % std::max<std::size_t>(count, 1); }

    std::mt19937 random_;
    std::vector<std::unique_ptr<Subject>> subjects_;
};

int torture(double minutes, unsigned seed) {
    std::cout << "torture for " << minutes << " minutes with the seed " << seed << std::endl;
    auto const end = Clock::now() + std::chrono::duration<double>(minutes * 60);
    Sweep sweep(seed);
    long runs = 0;
    long findings = 0;
    for (; Clock::now() < end; ++runs)
        findings += sweep.step() ? 1 : 0;
    std::cout << runs << " runs, " << findings << " with findings\n";
    return findings == 0 ? 0 : 1;
}

} // namespace

int main(int argc, char** argv) {
    std::vector<std::string> const words(argv + 1, argv + argc);
    if (words.size() == 3 && words[0] == "--repeat")
        return repeat(words[1], words[2]);
    double const minutes = words.empty() ? 0 : std::atof(words[0].c_str());
    if (minutes <= 0 || words.size() > 2) {
        std::cerr << "usage: torture MINUTES [SEED] | torture --repeat COMMAND FAULT\n";
        return 1;
    }
    return torture(minutes,
                   words.size() == 2 ? static_cast<unsigned>(std::stoul(words[1])) : std::random_device{}());
}

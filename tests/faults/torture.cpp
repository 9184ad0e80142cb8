// scripts/torture: commands of vlmail, and vlserviced with one job ("service"), in which calls fail, at
// random and for as long as one likes.
//     torture MINUTES [SEED]           says each finding, and how to repeat it; status 1 when there was one
//     torture --repeat COMMAND FAULT   runs one, such as "mail write:28:3+"
//     torture --each COMMAND CALL [STEP]   each call of a kind, or each so many, in each way that it can fail
#include "tests/faults/asked_command.h"
#include "tests/faults/one_job.h"
#include "tests/faults/scenario.h"
#include "tests/faults/sent_mail.h"

#include <algorithm>
#include <chrono>
#include <iostream>
#include <random>

namespace {

using namespace Faults;
using Clock = std::chrono::steady_clock;

constexpr char const* SERVICE = "service";

bool say(std::string const& command, Fault const& fault, std::vector<std::string> const& findings) {
    for (std::string const& finding : findings)
        std::cout << command << " with " << fault.text() << ' ' << finding
                  << "\n    to repeat: scripts/torture --repeat " << command << ' ' << fault.text()
                  << std::endl;
    return !findings.empty();
}

/// What may be run with a fault, and how often it makes calls of each kind.
struct Subject {
    std::string name;
    std::function<long(std::string const& call)> count;
    std::function<std::vector<std::string>(Fault const& fault)> run;
    std::map<std::string, long> calls = {};
};

/// Made when it is first run: each makes a run of its own first, or starts a service.
template<typename Runner, typename... Arguments>
Subject subjectOf(std::string const& name, Arguments... arguments) {
    auto const runner = std::make_shared<std::shared_ptr<Runner>>();
    auto const made = [=]() -> Runner& {
        if (!*runner)
            *runner = std::make_shared<Runner>(arguments...);
        return **runner;
    };
    return {name, [=](std::string const& call) { return made().callsOf(call); },
            [=](Fault const& fault) { return made().run(fault); }};
}

std::vector<Subject> allSubjects() {
    std::vector<Subject> subjects;
    for (Command const& command : commands())
        subjects.push_back(subjectOf<Scenario>(command.name, command));
    for (Question const& question : questions())
        subjects.push_back(subjectOf<AskedCommand>(question.name, question));
    subjects.push_back(subjectOf<SentMail>(SentMail::NAME));
    subjects.push_back(subjectOf<OneJob>(SERVICE));
    return subjects;
}

/// The one of that name, or none.
std::vector<Subject> subjectsOf(std::string const& name) {
    std::vector<Subject> subjects = allSubjects();
    std::erase_if(subjects, [&](Subject const& subject) { return subject.name != name; });
    return subjects;
}

int repeat(std::string const& name, std::string const& text) {
    std::vector<Subject> const subjects = subjectsOf(name);
    auto const fault = Fault::parse(text);
    if (subjects.empty() || !fault) {
        std::cerr << "torture: there is no command " << name << " or no fault " << text << '\n';
        return 1;
    }
    return say(name, *fault, subjects.front().run(*fault)) ? 1 : 0;
}

class Sweep {
public:
    explicit Sweep(unsigned seed) : random_(seed) {}

    /// One run; whether there was a finding.
    bool step() {
        Subject& subject = subjects_[below(subjects_.size())];
        std::string const& call = CALLS[below(CALLS.size())];
        if (!subject.calls.contains(call))
            subject.calls[call] = subject.count(call);
        std::vector<Fault> const faults = faultsOf(call);
        Fault fault = faults[below(faults.size())];
        fault.number = 1 + static_cast<long>(below(static_cast<std::size_t>(subject.calls[call]) + 1));
        return say(subject.name, fault, subject.run(fault));
    }

private:
    std::size_t below(std::size_t limit) { return random_() % limit; }

    std::mt19937 random_;
    std::vector<Subject> subjects_ = allSubjects();
};

int each(std::string const& name, std::string const& call, long step) {
    std::vector<Subject> const subjects = subjectsOf(name);
    if (subjects.empty() || std::ranges::find(CALLS, call) == CALLS.end() || step < 1) {
        std::cerr << "torture: there is no command " << name << " or no call " << call << '\n';
        return 1;
    }
    bool isFound = false;
    long const calls = subjects.front().count(call);
    std::cout << name << " makes " << calls << " calls of " << call << std::endl;
    for (long number = 1; number <= calls; number += step)
        for (Fault fault : faultsOf(call)) {
            fault.number = number;
            isFound = say(name, fault, subjects.front().run(fault)) || isFound;
        }
    return isFound ? 1 : 0;
}

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
    if ((words.size() == 3 || words.size() == 4) && words[0] == "--each")
        return each(words[1], words[2], words.size() == 4 ? std::atol(words[3].c_str()) : 1);
    double const minutes = words.empty() ? 0 : std::atof(words[0].c_str());
    if (minutes <= 0 || words.size() > 2) {
        std::cerr << "usage: torture MINUTES [SEED] | torture --repeat COMMAND FAULT | torture --each "
                     "COMMAND CALL [STEP]\n";
        return 1;
    }
    return torture(minutes,
                   words.size() == 2 ? static_cast<unsigned>(std::stoul(words[1])) : std::random_device{}());
}

// scripts/chaos: services on one database, under a load, while they are killed and frozen, the database is
// ended at once, stalls, or has no room, and connections are cut, at random and for as long as one likes.
//     chaos MINUTES [SEED]        says each finding, and how to repeat its round; status 1 when there was one
//     chaos --repeat SEED ROUND   runs one round
#include "tests/chaos/round.h"

#include <chrono>
#include <cstdlib>
#include <exception>
#include <iostream>
#include <random>
#include <string>
#include <vector>

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::size_t STEPS = 20;
constexpr int CLIENTS = 4;

unsigned seedOf(unsigned seed, unsigned round) { return seed * 1000 + round; }

void tell(std::vector<Chaos::Step> const& steps) {
    for (std::size_t step = 0; step < steps.size(); ++step)
        std::cout << "    step " << step + 1 << ": " << steps[step].text() << '\n';
}

void tellHowToRepeat(std::vector<Chaos::Step> const& steps, unsigned seed, unsigned number) {
    tell(steps);
    std::cout << "  to repeat: scripts/chaos --repeat " << seed << ' ' << number << std::endl;
}

/// What was found; where not even that can be had, it says in which round.
std::vector<std::string> findingsOf(Chaos::Round& round, std::vector<Chaos::Step> const& steps, unsigned seed,
                                    unsigned number) {
    try {
        return round.run(steps, CLIENTS);
    } catch (std::exception const& failure) {
        std::cout << "round " << number << " has no end: " << failure.what() << '\n';
        tellHowToRepeat(steps, seed, number);
        throw;
    }
}

/// Whether there was a finding.
bool runRound(Chaos::Installation& installation, unsigned seed, unsigned number) {
    unsigned const own = seedOf(seed, number);
    std::vector<Chaos::Step> const steps = Chaos::randomSteps(own, STEPS);
    Chaos::Round round(installation, "m" + std::to_string(seed) + '-' + std::to_string(number), own);
    std::vector<std::string> const findings = findingsOf(round, steps, seed, number);
    std::cout << "round " << number << ": " << round.answered() << " mailings answered, " << round.decided()
              << " letters decided by a person, " << findings.size() << " findings" << std::endl;
    for (std::string const& finding : findings)
        std::cout << "  FOUND: " << finding << '\n';
    if (!findings.empty())
        tellHowToRepeat(steps, seed, number);
    return !findings.empty();
}

int chaos(Chaos::Installation& installation, double minutes, unsigned seed) {
    std::cout << "chaos for " << minutes << " minutes with the seed " << seed << std::endl;
    auto const end = Clock::now() + std::chrono::duration<double>(minutes * 60);
    unsigned findings = 0;
    unsigned round = 0;
    while (Clock::now() < end)
        findings += runRound(installation, seed, ++round) ? 1 : 0;
    std::cout << round << " rounds, " << findings << " with findings\n";
    return findings == 0 ? 0 : 1;
}

unsigned numberIn(std::string const& text) {
    return static_cast<unsigned>(std::strtoul(text.c_str(), nullptr, 10));
}

int run(std::vector<std::string> const& words, bool repeats, double minutes) {
    Chaos::Installation installation;
    if (!installation.whyNot().empty()) {
        std::cerr << "chaos: " << installation.whyNot() << '\n';
        return 1;
    }
    if (!installation.whyNoSmallDisk().empty())
        std::cout << "no disk is ever full: " << installation.whyNoSmallDisk() << std::endl;
    if (!installation.whyNoRelay().empty())
        std::cout << "no connection of clients is cut: " << installation.whyNoRelay() << std::endl;
    if (repeats)
        return runRound(installation, numberIn(words[1]), numberIn(words[2])) ? 1 : 0;
    return chaos(installation, minutes, words.size() == 2 ? numberIn(words[1]) : std::random_device{}());
}

} // namespace

int main(int argc, char** argv) {
    std::vector<std::string> const words(argv + 1, argv + argc);
    bool const repeats = words.size() == 3 && words[0] == "--repeat";
    double const minutes = words.empty() ? 0 : std::atof(words[0].c_str());
    if (!repeats && (minutes <= 0 || words.size() > 2)) {
        std::cerr << "usage: chaos MINUTES [SEED] | chaos --repeat SEED ROUND\n";
        return 1;
    }
    try {
        return run(words, repeats, minutes);
    } catch (std::exception const& failure) {
        std::cerr << "chaos: " << failure.what() << '\n';
        return 1;
    }
}

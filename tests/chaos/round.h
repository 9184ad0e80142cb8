#pragma once
// A load on an installation while things go wrong; and what was promised, when all is well again.

#include "tests/chaos/load.h"
#include "tests/chaos/trouble.h"

#include <cstddef>
#include <map>
#include <string>
#include <vector>

namespace Chaos {

/// Each answered mailing is to be handed over once, whole, by carrier or in a container, and nothing of it is
/// to be left behind. Names of mailings are those of the round.
class Round {
public:
    Round(Installation& installation, std::string name, unsigned seed)
        : installation_(installation), name_(std::move(name)), seed_(seed) {}

    /// What was promised and not kept; empty when all was.
    std::vector<std::string> run(std::vector<Step> const& steps, int clients);
    /// The same of mailings that were answered otherwise, with all services going on.
    std::vector<std::string> check(std::map<std::string, SentMailing> answered);
    /// How many mailings were answered, and how many letters a person had to decide about.
    std::size_t answered() const { return answered_.size(); }
    std::size_t decided() const { return decided_; }

private:
    void find(std::string const& what) { findings_.push_back(what); }
    void findAll(std::vector<std::string> const& all);
    void awaitRest();
    bool isAtRest();
    void tellOfUnrest();
    void decideUncertain();
    void checkContainers();
    void checkLetters();
    void checkCount(std::string const& what, int times, int wanted);
    void checkLeftBehind();

    Installation& installation_;
    std::string name_;
    unsigned seed_;
    std::map<std::string, SentMailing> answered_;
    std::size_t decided_ = 0;
    std::vector<std::string> findings_;
};

/// So many steps of chance.
std::vector<Step> randomSteps(unsigned seed, std::size_t count);

} // namespace Chaos

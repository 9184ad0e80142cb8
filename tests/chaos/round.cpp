#include "tests/chaos/round.h"

#include <chrono>
#include <thread>
#include <utility>

namespace Chaos {
namespace {

using Clock = std::chrono::steady_clock;

/// For what waits for a lease, a poll and a look each minute.
constexpr std::chrono::seconds PATIENCE{150};
constexpr std::chrono::milliseconds BETWEEN_LOOKS{200};

constexpr char const* AT_WORK =
    "SELECT pack, state, letters_state, problem FROM jobs WHERE state NOT IN ('submitted', 'lodged', "
    "'delivered') OR letters_state NOT IN ('', 'lodged', 'delivered') ORDER BY pack";

template<typename Condition>
bool within(std::chrono::seconds limit, Condition condition) {
    auto const end = Clock::now() + limit;
    while (!condition()) {
        if (Clock::now() >= end)
            return false;
        std::this_thread::sleep_for(BETWEEN_LOOKS);
    }
    return true;
}

int timesOf(std::map<std::string, int> const& counts, std::string const& name) {
    auto const found = counts.find(name);
    return found == counts.end() ? 0 : found->second;
}

std::string letterFile(std::string const& mailing, long long letter) {
    return mailing + '-' + std::to_string(letter) + ".json";
}

} // namespace

std::vector<std::string> Round::run(std::vector<Step> const& steps, int clients) {
    Load load(installation_, name_, seed_, clients);
    for (Step const& step : steps)
        step.run(installation_);
    load.stop();
    findAll(load.unanswered());
    return check(load.answered());
}

std::vector<std::string> Round::check(std::map<std::string, SentMailing> answered) {
    answered_ = std::move(answered);
    findAll(installation_.restartAll());
    awaitRest();
    // What earlier processes have left is looked for at a start.
    findAll(installation_.restartAll());
    checkContainers();
    checkLetters();
    checkLeftBehind();
    return std::exchange(findings_, {});
}

void Round::findAll(std::vector<std::string> const& all) {
    for (std::string const& one : all)
        find(one);
}

void Round::awaitRest() {
    if (!within(PATIENCE, [this] { return isAtRest(); }))
        tellOfUnrest();
}

bool Round::isAtRest() {
    decideUncertain();
    return !installation_.database()->query(AT_WORK).next();
}

void Round::tellOfUnrest() {
    auto const database = installation_.database();
    Database::Rows jobs = database->query(AT_WORK);
    while (jobs.next())
        find("mailing " + jobs.text(0) + " stays " + jobs.text(1) + ' ' + jobs.text(2) + ": " + jobs.text(3));
}

/// As a person does who asks the print shop.
void Round::decideUncertain() {
    auto const database = installation_.database();
    Database::Rows letters =
        database->query("SELECT pack, number FROM letters WHERE state = 'uncertain' AND by_carrier = 1");
    while (letters.next()) {
        std::string const mailing = letters.text(0);
        std::string const number = std::to_string(letters.number(1));
        bool const isThere = timesOf(installation_.letters(), letterFile(mailing, letters.number(1))) > 0;
        std::vector<std::string> const arguments =
            isThere ? std::vector<std::string>{"settle", mailing, number, "delivered"}
                    : std::vector<std::string>{"resend", mailing, number};
        ++decided_;
        if (ClientRun const run = installation_.vlmail(0, arguments); run.status != 0)
            find("letter " + number + " of " + mailing + " cannot be decided about: " + run.err);
    }
}

void Round::checkCount(std::string const& what, int times, int wanted) {
    if (times < wanted)
        find(what + " is lost");
    else if (times > wanted)
        find(what + " was handed over " + std::to_string(times) + " times in place of " +
             std::to_string(wanted));
}

void Round::checkContainers() {
    auto const handedOver = installation_.containers();
    for (auto const& [id, mailing] : answered_) {
        checkCount("mailing " + id, timesOf(handedOver, id + ".mailing"), mailing.hasContainer() ? 1 : 0);
        if (!mailing.hasContainer())
            continue;
        std::string const fault = mailing.faultIn(installation_.takenContainers() / (id + ".mailing"));
        if (!fault.empty())
            find("the container of mailing " + id + " is not whole: " + fault);
    }
}

void Round::checkLetters() {
    auto const handedOver = installation_.letters();
    for (auto const& [id, mailing] : answered_)
        for (int const letter : mailing.carried())
            checkCount("letter " + std::to_string(letter) + " of mailing " + id,
                       timesOf(handedOver, letterFile(id, letter)), 1);
}

void Round::checkLeftBehind() {
    within(PATIENCE, [this] { return installation_.leftBehind().empty(); });
    for (std::string const& name : installation_.leftBehind())
        find(name + " is left behind");
    auto const pieces = [this] { return installation_.database()->number("SELECT count(*) FROM pieces"); };
    if (!within(PATIENCE, [&] { return pieces() == 0; }))
        find(std::to_string(pieces()) + " pieces of pages are left in the database");
}

std::vector<Step> randomSteps(unsigned seed, std::size_t count) {
    std::mt19937 random(seed);
    std::vector<Step> steps;
    while (steps.size() < count)
        steps.push_back(Step::random(random));
    return steps;
}

} // namespace Chaos

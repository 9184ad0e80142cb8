// Each command of vlmail, and vlserviced with one job, while their calls fail, one after the other.
// scripts/torture goes through all of them.
#include "programs/mailing/pack_database.h"
#include "programs/vlmail/commands/command.h"
#include "tests/faults/asked_command.h"
#include "tests/faults/one_job.h"
#include "tests/faults/scenario.h"
#include "tests/faults/sent_mail.h"
#include "tests/faults/service_at_hand.h"
#include "tests/support/sanitized.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <cerrno>
#include <set>

namespace {

using namespace Faults;

/// Every call is tried up to that one; of what comes behind it, so many at even distances up to the last.
constexpr long EVERY_UP_TO = 100;
constexpr long BEHIND = 8;

constexpr char const* SERVICE = "service";

std::vector<long> pointsOf(long calls) {
    std::vector<long> points;
    for (long point = 1; point <= std::min(calls, EVERY_UP_TO); ++point)
        points.push_back(point);
    for (long i = 1; i <= std::min(BEHIND, calls - EVERY_UP_TO); ++i)
        points.push_back(EVERY_UP_TO + i * (calls - EVERY_UP_TO) / std::min(BEHIND, calls - EVERY_UP_TO));
    return points;
}

/// What takes longest: of these each call fails in one way, which is another for the next call.
std::set<std::string> const IN_TURN{"letter_report", "mail",         "mail_plan",
                                    "documents_put", SentMail::NAME, SERVICE};

std::vector<Fault> faultsAt(long point, std::string const& call, std::string const& name) {
    std::vector<Fault> faults = faultsOf(call);
    if (IN_TURN.contains(name))
        faults = {faults[static_cast<std::size_t>(point) % faults.size()]};
    for (Fault& fault : faults)
        fault.number = point;
    return faults;
}

/// Fails each of those calls. Gives how many there were.
template<typename Subject>
long failEach(Subject& subject, std::string const& name, std::string const& call) {
    long tried = 0;
    for (long const point : pointsOf(subject.callsOf(call)))
        for (Fault const& fault : faultsAt(point, call, name)) {
            ++tried;
            EXPECT_THAT(subject.run(fault), testing::IsEmpty())
                << "to repeat: scripts/torture --repeat " << name << ' ' << fault.text();
        }
    return tried;
}

template<typename Subject>
void failAll(Subject& subject, std::string const& name) {
    long tried = 0;
    for (std::string const& call : CALLS)
        tried += failEach(subject, name, call);
    // Every command opens and reads something at least.
    EXPECT_GT(tried, 3);
}

class CommandsWhoseCallsFail : public testing::TestWithParam<Command> {};

TEST_P(CommandsWhoseCallsFail, KeepTheirPromises) {
    Scenario scenario(GetParam());
    failAll(scenario, GetParam().name);
}

INSTANTIATE_TEST_SUITE_P(OfVlMail, CommandsWhoseCallsFail, testing::ValuesIn(commands()),
                         [](auto const& each) { return each.param.name; });

class CommandsThatAskAService : public testing::TestWithParam<Question> {};

TEST_P(CommandsThatAskAService, AreDoneOrNotAndSayWhich) {
    AskedCommand command(GetParam());
    failAll(command, GetParam().name);
}

INSTANTIATE_TEST_SUITE_P(OfVlMail, CommandsThatAskAService, testing::ValuesIn(questions()),
                         [](auto const& each) { return each.param.name; });

class MailThatIsSent : public testing::TestWithParam<std::string> {};

TEST_P(MailThatIsSent, IsNotLostAndNotDoubledWhenItsCallsFail) {
    SentMail mail;
    failEach(mail, SentMail::NAME, GetParam());
}

INSTANTIATE_TEST_SUITE_P(OfAKind, MailThatIsSent, testing::ValuesIn(CALLS),
                         [](auto const& each) { return each.param; });

/// The same letters again, when what was left of them could not be sent: both packs could be sent then.
TEST(MailThatIsSentAgain, LeavesNoSecondPackOfTheSameLettersWhereverItIsKilled) {
    ServiceAtHand const service;
    std::vector<std::string> const mail{"mail", "letter.txt", "--send", "--node", "a=acme", "--jobs", "1"};
    auto const left = [&] {
        std::vector<std::string> ids;
        for (Mailing::StoredPack const& pack : Mailing::finishedPacks(service.packDatabase()))
            ids.push_back(pack.info.id);
        return ids;
    };
    service.vlmail({"settings", "service", R"(disabled=["a=acme"])"});
    EXPECT_EQ(service.vlmail(mail).status, 1);
    std::vector<std::string> const first = left();
    ASSERT_EQ(first.size(), 1u);
    Fault killed{"sync", 0, 1};
    for (bool isKilled = true; isKilled && !testing::Test::HasFailure(); ++killed.number) {
        isKilled = service.vlmail(mail, killed).status < 0;
        EXPECT_EQ(left(), first) << killed.text();
    }
    EXPECT_GT(killed.number, 5);
    service.vlmail({"settings", "service", "disabled="});
    EXPECT_THAT(service.vlmail(mail).out, testing::HasSubstr(first.front() + ", "));
}

/// The names of the commands that do something, as they are typed.
void leavesOf(Base::CommandInfo const& command, std::string const& before, std::set<std::string>& names) {
    if (command.commands.empty())
        names.insert(before);
    for (Base::CommandInfo const& each : command.commands)
        leavesOf(each, before.empty() ? each.name : before + ' ' + each.name, names);
}

TEST(TheCommandsWhoseCallsFail, AreAllOfVlMail) {
    std::set<std::string> all;
    leavesOf(VlMail::commandInfo(), "", all);
    std::set<std::string> missing = all;
    auto const strike = [&](std::vector<std::string> const& arguments) {
        missing.erase(arguments.front());
        if (arguments.size() > 1)
            missing.erase(arguments[0] + ' ' + arguments[1]);
    };
    for (Command const& command : commands())
        strike(command.arguments);
    for (Question const& question : questions())
        strike(question.arguments);
    // What it does of its own is reading, as pack verify does; its way to the service is that of
    // MailThatIsSent.
    missing.erase("send");
    // It serves until it is ended, by workers that read as those of a batch do.
    missing.erase("workbench");
    EXPECT_GT(all.size(), 20u);
    EXPECT_THAT(missing, testing::IsEmpty());
}

TEST(ACheckOfAMailing, DoesNotTakeADiskThatFailsForDamage) {
    Scenario scenario(*std::ranges::find(commands(), "pack_verify", &Command::name));
    long const calls = scenario.callsOf("read");
    EXPECT_GT(calls, 3);
    for (long number = 1; number <= calls; ++number) {
        Ended const ended = scenario.look({"read", EIO, number, true});
        bool const isTold = (ended.out + ended.err).find("Input/output error") != std::string::npos;
        EXPECT_EQ(ended.status != 0, isTold) << number << ": " << ended.out << ended.err;
    }
}

class AServiceWhoseCallsFail : public testing::TestWithParam<std::string> {};

TEST_P(AServiceWhoseCallsFail, LosesNothingAndDoublesNothing) {
    if (VLServiceTest::SANITIZED && GetParam() == "memory")
        GTEST_SKIP() << "a sanitizer brings an allocator of its own";
    OneJob job;
    EXPECT_GT(failEach(job, SERVICE, GetParam()), 0);
}

INSTANTIATE_TEST_SUITE_P(OfAKind, AServiceWhoseCallsFail,
                         testing::Values("write", "sync", "rename", "remove", "open", "read", "memory",
                                         "send", "receive"),
                         [](auto const& each) { return each.param; });

} // namespace

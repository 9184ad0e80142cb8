#include "programs/carriers/command_carrier.h"

#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <csignal>
#include <fcntl.h>
#include <fstream>
#include <unistd.h>

namespace {

namespace fs = std::filesystem;

using Carriers::Outcome;

Carriers::Parcel smsOf(std::string const& number, std::string const& text = "Hello") {
    Carriers::Parcel parcel;
    parcel.key = "p1-2";
    parcel.mailing = "p1";
    parcel.document = "%PDF of p1-2";
    Carriers::OutgoingLetter& letter = parcel.letters.emplace_back();
    letter.key = "p1-2";
    letter.address = number;
    letter.pages = 1;
    letter.fields = {{"sms", number}, {"text", text}};
    return parcel;
}

class CommandCarrierTest : public testing::Test {
protected:
    /// A shell script, which runs in the folder.
    Outcome handOver(std::string const& script, std::vector<std::string> const& arguments = {}) {
        settings_.program = (folder_ / "program").string();
        settings_.arguments = arguments;
        std::ofstream(settings_.program)
            << "#!/bin/sh\ncd '" + folder_.path().string() + "'\n" + script + "\n";
        fs::permissions(settings_.program, fs::perms::owner_all);
        return Carriers::CommandCarrier(settings_).handOver(
            parcel_, [this] { std::ofstream(folder_ / "record") << fs::exists(folder_ / "ran"); });
    }
    std::string told(std::string const& script, std::vector<std::string> const& arguments = {}) {
        constexpr char const* KINDS[] = {"accepted", "refused", "failed", "uncertain"};
        Outcome const outcome = handOver(script, arguments);
        std::string says = outcome.says;
        if (auto const at = says.find(settings_.program); at != std::string::npos)
            says.replace(at, settings_.program.size(), "PROGRAM");
        return KINDS[static_cast<int>(outcome.kind)] + std::string(": ") + says;
    }
    std::string fileText(char const* name) {
        std::ifstream in(folder_ / name);
        return {std::istreambuf_iterator<char>(in), {}};
    }

    /// What was killed may not be reaped yet.
    static bool isAlive(std::string const& processStat) {
        std::ifstream stat(processStat);
        std::string state;
        stat >> state >> state >> state;
        return stat && state != "Z" && state != "X";
    }

    TemporaryFolder folder_;
    Protocol::CarrierSettings settings_;
    Carriers::Parcel parcel_ = smsOf("+49 30 1");
};

TEST_F(CommandCarrierTest, TellsByItsStatusAndItsFirstLineWhatBecameOfTheLetter) {
    EXPECT_EQ(told("echo queued as 17; echo more"), "accepted: queued as 17");
    EXPECT_EQ(told("exit 0"), "accepted: ");
    EXPECT_EQ(told("echo no credit; exit 75"), "failed: PROGRAM ended with status 75: no credit");
    EXPECT_EQ(told("echo no such number; exit 1"), "refused: PROGRAM ended with status 1: no such number");
    EXPECT_EQ(told("kill -9 $$"), "uncertain: PROGRAM was ended by a signal");
    EXPECT_EQ(told("printf 'a\\033[31mb'"), "accepted: a\\u001b[31mb");
}

TEST_F(CommandCarrierTest, GivesTheDocumentAndTheFields) {
    int const ofTheService = ::fcntl(0, F_DUPFD, 200);
    handOver("cat >document; cat <&3 >fields; env >environment; [ -e /proc/self/fd/" +
             std::to_string(ofTheService) + " ] && touch ran");
    ::close(ofTheService);
    EXPECT_FALSE(fs::exists(folder_ / "ran"));
    EXPECT_EQ(fileText("document"), "%PDF of p1-2");
    EXPECT_EQ(fileText("fields"), R"({"key":"p1-2","id":"p1","address":"+49 30 1","pages":1,)"
                                  R"("fields":{"sms":"+49 30 1","text":"Hello"}})");
    EXPECT_THAT(fileText("environment"), testing::Not(testing::HasSubstr("HOME=")));
}

TEST_F(CommandCarrierTest, GivesATextWhereTheSettingsHaveOne) {
    settings_.text = "Invoice {id}: {text} {key}, {}\nYours";
    parcel_ = smsOf("+49 30 1", "due {key}\r\ntoday");
    handOver("cat >document");
    EXPECT_EQ(fileText("document"), "Invoice p1: due {key}  today p1-2, {}\nYours");
    settings_.text = "{fax}";
    EXPECT_EQ(told("touch ran"), "refused: the letter has no field \"fax\", which its carrier needs");
    EXPECT_FALSE(fs::exists(folder_ / "ran"));
}

TEST_F(CommandCarrierTest, PutsOnRecordThatTheOtherSideMayHaveTheLetterBeforeTheProgramRuns) {
    EXPECT_EQ(told("touch ran"), "accepted: ");
    EXPECT_EQ(fileText("record"), "0");
    fs::remove(folder_ / "ran");
    Carriers::CommandCarrier carrier(settings_);
    EXPECT_EQ(
        failureOf([&] { carrier.handOver(parcel_, [] { throw std::runtime_error("the disk is full"); }); }),
        "the disk is full");
    EXPECT_FALSE(fs::exists(folder_ / "ran"));
}

TEST_F(CommandCarrierTest, KeepsEachArgumentOne) {
    parcel_ = smsOf("+49 30 1", "two words; rm -rf \"$HOME\" {key}\nline");
    handOver("for a; do echo \"[$a]\"; done >arguments",
             {"--to", "{sms}", "{id}/{key}", "say {text}", "{}", "{a b}"});
    EXPECT_EQ(fileText("arguments"),
              "[--to]\n[+49 30 1]\n[p1/p1-2]\n[say two words; rm -rf \"$HOME\" {key} line]\n[{}]\n[{a b}]\n");
}

TEST_F(CommandCarrierTest, GivesNoValueThatWouldBeAnOption) {
    parcel_ = smsOf("--config=/tmp/evil");
    EXPECT_EQ(told("touch ran", {"{sms}"}),
              "refused: a field of the letter begins with \"-\", which a program would take for an option");
    EXPECT_EQ(told("touch ran", {"{fax}"}),
              "refused: the letter has no field \"fax\", which its carrier needs");
    EXPECT_FALSE(fs::exists(folder_ / "ran"));
}

TEST_F(CommandCarrierTest, IsEndedWithItsGroupWhenItHangs) {
    settings_.timeLimit = 1;
    EXPECT_EQ(told("sleep 1000 & echo $! >child; echo dialling; wait"),
              "uncertain: PROGRAM took more than 1 s and was ended: dialling");
    auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(30);
    std::string const child = "/proc/" + std::to_string(std::stoi(fileText("child"))) + "/stat";
    while (isAlive(child) && std::chrono::steady_clock::now() < end) {
    }
    EXPECT_FALSE(isAlive(child));
}

TEST_F(CommandCarrierTest, IsEndedWhenItFloods) {
    settings_.outputLimit = 1000;
    EXPECT_EQ(told("exec yes"), "uncertain: PROGRAM wrote more than 1000 bytes and was ended");
    EXPECT_EQ(told("yes >&2 & echo $! >child; exit 0"), "accepted: ");
    ::kill(std::stoi(fileText("child")), SIGKILL);
}

TEST_F(CommandCarrierTest, IsNotHeldUpByWhatItLeavesBehind) {
    EXPECT_EQ(told("sleep 1000 & echo $! >child; echo done"), "accepted: done");
    ::kill(std::stoi(fileText("child")), SIGKILL);
}

TEST_F(CommandCarrierTest, FailsWhereTheProgramCannotBeRun) {
    settings_.program = (folder_ / "gone").string();
    Carriers::CommandCarrier carrier(settings_);
    EXPECT_EQ(failureOf([&] { carrier.handOver(parcel_, [] {}); }),
              "cannot start " + settings_.program + ": No such file or directory");
    EXPECT_EQ(failureOf([&] { carrier.test(); }),
              "there is no program " + settings_.program + " that may be run");
    settings_.user = "no such user";
    EXPECT_EQ(failureOf([&] { Carriers::CommandCarrier(settings_).handOver(parcel_, [] {}); }),
              "there is no user no such user that a program could run as");
}

TEST_F(CommandCarrierTest, RunsAsAnotherUserWhereItIsTold) {
    if (::geteuid() != 0)
        GTEST_SKIP() << "only root can do that";
    settings_.user = "nobody";
    fs::permissions(folder_.path(), fs::perms::all);
    settings_.program = "/usr/bin/id";
    settings_.arguments = {"-un"};
    EXPECT_EQ(Carriers::CommandCarrier(settings_).handOver(parcel_, [] {}).says, "nobody");
}

} // namespace

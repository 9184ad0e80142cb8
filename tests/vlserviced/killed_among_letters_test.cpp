// A service that is killed while a letter that goes by a carrier is in each of its states, and what becomes
// of the letter where the same service goes on, or another one of its database.
#include "programs/database/postgres_connection.h"
#include "programs/protocol/carrier.h"
#include "programs/protocol/job.h"
#include "programs/protocol/letter.h"
#include "programs/vlmail/mailings/pack_upload.h"
#include "programs/vlmail/service/service_client.h"
#include "tests/support/failure_of.h"
#include "tests/support/postgres_server.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/letter_help.h"
#include "tests/vlserviced/service_process.h"
#include "vlservice/ipc/set_svc_cfg.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <csignal>
#include <fstream>
#include <iterator>
#include <memory>
#include <optional>

namespace {

namespace fs = std::filesystem;

using Protocol::JobAction;
using Protocol::LetterAction;

enum class GoesOn { OnSqlite, OnPostgres, AnotherOnPostgres };

class ServiceKilledWithALetter : public testing::TestWithParam<GoesOn> {
protected:
    ServiceKilledWithALetter() {
        if (GetParam() != GoesOn::OnSqlite)
            postgres_.emplace();
        write("program",
              "#!/bin/sh\ncd '" + folder_.path().string() +
                  "'\nif [ -e 'kill in front' ]; then rm 'kill in front'; kill -9 $PPID; exit 1; fi\n"
                  "[ -e refuses ] && exit 1\nif [ -e fails ]; then echo >>failed; exit 75; fi\n"
                  "echo $1 >>had\nif [ -e 'kill behind' ]; then rm 'kill behind'; kill -9 $PPID; fi\n");
        fs::permissions(folder_ / "program", fs::perms::owner_all);
    }
    void SetUp() override {
        if (postgres_ && !postgres_->whyNot().empty())
            GTEST_SKIP() << postgres_->whyNot();
        begin(first_);
        client()->call<Ipc::SetSvcCfg>(json::Object{{"carriers", json::Object{{"sms", carrier()}}}});
    }

    /// The service's, which is killed first and then goes on.
    fs::path data(char const* name) const { return folder_ / name; }
    void begin(char const* name) {
        std::vector<std::string> arguments{"--data", data(name).string(), "--no-discovery"};
        if (postgres_)
            arguments.insert(arguments.end(), {"--database", postgres_->address(), "--lease", "2"});
        if (name != first_)
            arguments.insert(arguments.end(), {"--token", (data(first_) / "token").string()});
        service_ = std::make_unique<ServiceProcess>(arguments);
    }
    void goOn() {
        service_->signal(SIGKILL);
        service_->wait();
        begin(GetParam() == GoesOn::AnotherOnPostgres ? "second" : first_);
        ASSERT_NE(service_->port(), 0) << service_->errors();
    }
    std::unique_ptr<Channel::Client> client() const { return clientOf(*service_, data(first_)); }
    template<typename Question>
    json::Object ask(Question const& question) const {
        auto const asker = client();
        return VlMail::ask(*asker, question);
    }

    json::Object carrier() const {
        return {{"type", "command"},
                {"retry_seconds", 1},
                {"program", (folder_ / "program").string()},
                {"arguments", parse(R"({"all":["{key}"]})").get("all")}};
    }
    void write(char const* name, std::string const& text = "") const {
        std::ofstream(folder_ / name) << text;
    }
    void setPaused(bool isPaused) const {
        using Protocol::CarrierAction;
        ask(Protocol::CarrierChange(isPaused ? CarrierAction::Pause : CarrierAction::Resume, "sms"));
    }
    /// The mailing m of one letter, which is accepted when this returns.
    void send(std::string const& preset = "") {
        storeLetters(folder_ / "packs.db", "m", {"sms"}, preset);
        Mailing::OwnPackReader pack(folder_ / "packs.db", "m");
        VlMail::ServiceLine line([this] { return client(); },
                                 {std::chrono::seconds(10), std::chrono::milliseconds(1)});
        VlMail::uploadPack(line, pack);
    }
    /// Has the letter go on its way, on which the service may die.
    void hand() const {
        try {
            ask(Protocol::JobsChange(JobAction::Upload, {"m"}));
        } catch (std::exception const&) {
            // It died before it had answered.
        }
    }
    /// Until it was killed by what it hands the letter to.
    void awaitDeath() { EXPECT_EQ(service_->wait(), -SIGKILL); }

    /// "delivering: waiting", or the job's state alone.
    std::string state() const {
        Protocol::JobsQuery query;
        query.letters = true;
        Protocol::JobReport const job = Protocol::JobsAnswer(ask(query)).jobs.at(0);
        std::string text = Protocol::stateName(job.state);
        for (Protocol::LetterReport const& letter : job.letters)
            text += ": " + std::string(Protocol::letterStateName(letter.state));
        return text;
    }
    /// In its own time: others take up what a service has left when its lease is over.
    void await(std::string const& wanted) const {
        auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(60);
        std::string now = state();
        for (; now != wanted && std::chrono::steady_clock::now() < end; now = state())
            if (postgres_)
                database()->run("SELECT pg_sleep(0.1)");
        EXPECT_EQ(now, wanted);
    }
    std::unique_ptr<Database::Connection> database() const {
        return std::make_unique<Database::PostgresConnection>(postgres_->address());
    }
    /// What the other side was given, by the letters' keys.
    std::string had() const {
        std::ifstream in(folder_ / "had");
        return {std::istreambuf_iterator<char>(in), {}};
    }
    void decide(LetterAction action) const { ask(Protocol::LetterChange(action, "m", 1)); }
    /// Once another letter was handed over, all that the service has to do by itself is done.
    void expectNothingMore(std::string const& stateOfAll) {
        std::string const before = had();
        storeLetters(folder_ / "packs.db", "other", {"sms"});
        Mailing::OwnPackReader pack(folder_ / "packs.db", "other");
        VlMail::ServiceLine line([this] { return client(); },
                                 {std::chrono::seconds(10), std::chrono::milliseconds(1)});
        VlMail::uploadPack(line, pack);
        ask(Protocol::JobsChange(JobAction::Upload, {"other"}));
        auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(60);
        while (had() != before + "other-1\n" && std::chrono::steady_clock::now() < end)
            if (postgres_)
                database()->run("SELECT pg_sleep(0.1)");
        EXPECT_EQ(had(), before + "other-1\n");
        EXPECT_EQ(state(), stateOfAll);
    }

    /// Kills the service where it changes the letter to that state, which is not on record then.
    void killWhereItBecomes(std::string const& wanted) {
        auto const inTheWay = database();
        inTheWay->run("CREATE FUNCTION stand_still() RETURNS trigger LANGUAGE plpgsql AS $$ BEGIN PERFORM "
                      "pg_advisory_xact_lock(1); RETURN NEW; END $$; CREATE TRIGGER stand_still BEFORE "
                      "UPDATE ON letters FOR EACH ROW WHEN (new.state = '" +
                      wanted + "' AND old.state <> new.state) EXECUTE FUNCTION stand_still()");
        inTheWay->run("SELECT pg_advisory_lock(1)");
        hand();
        std::string const waiting =
            " FROM pg_locks WHERE locktype = 'advisory' AND NOT granted AND database = "
            "(SELECT oid FROM pg_database WHERE datname = current_database())";
        while (inTheWay->number("SELECT count(*)" + waiting) == 0)
            inTheWay->run("SELECT pg_sleep(0.02)");
        service_->signal(SIGKILL);
        service_->wait();
        // The server would go on with a statement whose client is gone.
        inTheWay->run("SELECT pg_terminate_backend(pid)" + waiting);
        while (inTheWay->number("SELECT count(*)" + waiting) > 0)
            inTheWay->run("SELECT pg_sleep(0.02)");
        inTheWay->run("DROP TRIGGER stand_still ON letters");
    }

    char const* const first_ = "first";
    TemporaryFolder folder_;
    std::optional<VLServiceTest::PostgresDatabase> postgres_;
    std::unique_ptr<ServiceProcess> service_;
};

std::string killedNameOf(testing::TestParamInfo<GoesOn> const& info) {
    constexpr char const* NAMES[] = {"OnSqlite", "OnPostgres", "LeftToAnotherOnPostgres"};
    return NAMES[static_cast<int>(info.param)];
}

INSTANTIATE_TEST_SUITE_P(GoesOn, ServiceKilledWithALetter,
                         testing::Values(GoesOn::OnSqlite, GoesOn::OnPostgres, GoesOn::AnotherOnPostgres),
                         killedNameOf);

TEST_P(ServiceKilledWithALetter, ThatWaitsHasItHandedOver) {
    setPaused(true);
    send();
    hand();
    await("delivering: waiting");
    goOn();
    EXPECT_EQ(state(), "delivering: waiting");
    setPaused(false);
    await("lodged: accepted");
    EXPECT_EQ(had(), "m-1\n");
}

TEST_P(ServiceKilledWithALetter, ThatItIsAboutToHandOverHasItHandedOver) {
    if (GetParam() == GoesOn::OnSqlite)
        GTEST_SKIP() << "each call that changes SQLite's file is one of ServiceThatIsKilledAtEachCall";
    send();
    killWhereItBecomes("handed over");
    goOn();
    await("lodged: accepted");
    EXPECT_EQ(had(), "m-1\n");
}

TEST_P(ServiceKilledWithALetter, ThatTheOtherSideDidNotTakeLeavesItToAPerson) {
    send();
    write("kill in front");
    hand();
    awaitDeath();
    goOn();
    await("delivering: uncertain");
    expectNothingMore("delivering: uncertain");
    decide(LetterAction::Resend);
    await("lodged: accepted");
    EXPECT_EQ(had(), "other-1\nm-1\n");
}

TEST_P(ServiceKilledWithALetter, ThatTheOtherSideHasTakenLeavesItToAPersonAndNeverHandsItOverAgain) {
    send();
    write("kill behind");
    hand();
    awaitDeath();
    goOn();
    await("delivering: uncertain");
    decide(LetterAction::SettleDelivered);
    await("delivered: delivered");
    goOn();
    await("delivered: delivered");
    expectNothingMore("delivered: delivered");
}

TEST_P(ServiceKilledWithALetter, WhoseOutcomeItNotesLeavesItToAPerson) {
    if (GetParam() == GoesOn::OnSqlite)
        GTEST_SKIP() << "each call that changes SQLite's file is one of ServiceThatIsKilledAtEachCall";
    send();
    killWhereItBecomes("accepted");
    EXPECT_EQ(had(), "m-1\n");
    goOn();
    await("delivering: uncertain");
    expectNothingMore("delivering: uncertain");
}

TEST_P(ServiceKilledWithALetter, ThatIsLodgedLeavesItSo) {
    send();
    hand();
    await("lodged: accepted");
    goOn();
    await("lodged: accepted");
    expectNothingMore("lodged: accepted");
}

TEST_P(ServiceKilledWithALetter, ThatIsToBeTriedAgainTriesItAgain) {
    send();
    write("fails");
    hand();
    auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(60);
    while (!fs::exists(folder_ / "failed") && std::chrono::steady_clock::now() < end) {
    }
    // Not while it is tried.
    setPaused(true);
    await("delivering: waiting");
    goOn();
    fs::remove(folder_ / "fails");
    setPaused(false);
    await("lodged: accepted");
    EXPECT_EQ(had(), "m-1\n");
}

TEST_P(ServiceKilledWithALetter, ThatHasFailedSendsItAgainWhenAPersonSaysSoAlone) {
    send();
    write("refuses");
    hand();
    await("failed: failed");
    goOn();
    fs::remove(folder_ / "refuses");
    expectNothingMore("failed: failed");
    if (GetParam() == GoesOn::AnotherOnPostgres) {
        EXPECT_EQ(failureOf([&] { decide(LetterAction::Resend); }),
                  "the pages of letter 1 of mailing m are not here: ask the service that has had it, or mail "
                  "it anew");
        return;
    }
    setPaused(true);
    decide(LetterAction::Resend);
    goOn();
    EXPECT_EQ(state(), "delivering: waiting");
    setPaused(false);
    await("lodged: accepted");
    EXPECT_EQ(had(), "other-1\nm-1\n");
}

TEST_P(ServiceKilledWithALetter, ThatWasCalledBackNeverHandsItOver) {
    send(R"("process_mode": 8, )");
    hand();
    await("held");
    ask(Protocol::JobsChange(JobAction::Cancel, {"m"}));
    goOn();
    EXPECT_EQ(state(), "cancelled");
    expectNothingMore("cancelled");
    EXPECT_EQ(had(), "other-1\n");
}

} // namespace

// Several services on one PostgreSQL database, whatever becomes of them.
#include "programs/base/error.h"
#include "programs/channel/stream.h"
#include "programs/database/postgres_connection.h"
#include "programs/protocol/carrier.h"
#include "programs/protocol/job.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/mailings/pack_delivery.h"
#include "programs/vlmail/mailings/pack_upload.h"
#include "programs/vlmail/service/service_client.h"
#include "tests/channel/test_certificate.h"
#include "tests/faults/fault.h"
#include "tests/support/failure_of.h"
#include "tests/support/postgres_server.h"
#include "tests/support/taking_carrier.h"
#include "tests/support/temporary_folder.h"
#include "tests/support/two_networks.h"
#include "tests/vlserviced/letter_help.h"
#include "tests/vlserviced/pack_help.h"
#include "tests/vlserviced/service_process.h"
#include "vlservice/ipc/get_svc_cfg.h"
#include "vlservice/ipc/process_pack.h"
#include "vlservice/ipc/set_svc_cfg.h"
#include "vlservice/ipc/update_status.h"
#include "vlservice/ipc/upload_queued.h"

#include <SQLiteCpp/Database.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <csignal>
#include <fstream>
#include <iterator>
#include <map>
#include <memory>
#include <mutex>
#include <set>
#include <sstream>
#include <thread>

namespace {

namespace fs = std::filesystem;

using testing::HasSubstr;
using VLServiceTest::TakingCarrier;

class SharedDatabaseTest : public testing::Test {
protected:
    SharedDatabaseTest() {
        fs::create_directory(upload_);
        fs::create_directory(taken_);
    }
    void SetUp() override {
        if (!server_.whyNot().empty())
            GTEST_SKIP() << server_.whyNot();
    }

    fs::path data(std::size_t number) const { return folder_.path() / std::to_string(number); }
    /// Starts the one of that number, anew when it was there.
    void start(std::size_t number) {
        std::vector<std::string> arguments{
            "--data", data(number).string(), "--database", database_.address(), "--lease",
            "2",      "--no-discovery"};
        if (number > 0)
            arguments.insert(arguments.end(), {"--token", (data(0) / "token").string()});
        std::scoped_lock const lock(mutex_);
        services_[number].reset();
        services_[number] = std::make_unique<ServiceProcess>(arguments);
    }
    void signal(std::size_t number, int what) {
        std::scoped_lock const lock(mutex_);
        services_[number]->signal(what);
    }
    std::unique_ptr<Channel::Client> client(std::size_t number) {
        Channel::ClientSettings settings;
        std::scoped_lock const lock(mutex_);
        return clientOf(*services_.at(number), data(0));
    }
    void setUploadFolder() {
        client(0)->call<Ipc::SetSvcCfg>(json::Object{{"upload_folder", upload_.string()}});
    }
    /// That the second one knows in the end what is set by the first.
    void expectToldOfSettings() {
        auto const overview = [this] { return print(client(1)->call<Ipc::GetSvcCfg>()->resp()); };
        EXPECT_THAT(overview(), testing::Not(HasSubstr(upload_.string())));
        setUploadFolder();
        Database::PostgresConnection database(database_.address());
        for (int i = 0; i < 300 && overview().find(upload_.string()) == std::string::npos; ++i)
            pass(database, "0.1");
        EXPECT_THAT(overview(), HasSubstr(upload_.string()));
    }
    VlMail::ServiceLine lineTo(std::size_t number) {
        return VlMail::ServiceLine([this, number] { return client(number); },
                                   {std::chrono::seconds(60), std::chrono::milliseconds(1)});
    }
    /// One that goes to the next service each time that it was lost.
    VlMail::ServiceLine lineToAny() {
        return VlMail::ServiceLine([this] { return client(next_++ % services_.size()); },
                                   {std::chrono::seconds(60), std::chrono::milliseconds(20)});
    }
    /// A pack of its own database, until a service has answered that it has it.
    void send(std::string const& id) {
        fs::path const packs = folder_.path() / (id + ".db");
        storePack(packs, id);
        while (!Mailing::finishedPacks(packs).empty())
            try {
                auto toService = lineToAny();
                VlMail::deliverPack(toService, packs, id, true);
                return;
            } catch (std::exception const& failure) {
                // What was answered with a failure may be on its way; the same id says that it is the same.
                ASSERT_THAT(failure.what(), testing::Not(HasSubstr("another pack")));
            }
    }
    /// On the database's clock.
    static void pass(Database::Connection& database, std::string const& seconds) {
        database.run("SELECT pg_sleep(" + seconds + ")");
    }

    TemporaryFolder folder_;
    fs::path upload_ = folder_ / "upload";
    fs::path taken_ = folder_ / "taken";
    VLServiceTest::PostgresServer server_;
    VLServiceTest::PostgresDatabase database_{server_.folder()};
    std::mutex mutex_;
    std::map<std::size_t, std::unique_ptr<ServiceProcess>> services_;
    std::atomic<std::size_t> next_{0};
};

TEST_F(SharedDatabaseTest, HasTheTokenWithTheServiceThatMadeIt) {
    start(0);
    ASSERT_NE(services_[0]->port(), 0);
    EXPECT_TRUE(fs::exists(data(0) / "token"));
    ServiceProcess second({"--data", data(1).string(), "--database", database_.address(), "--no-discovery"});
    EXPECT_EQ(second.wait(), 1);
    EXPECT_EQ(
        second.errors(),
        "vlserviced: the token of this database lies with the service that has made it: copy that file to " +
            (data(1) / "token").string() + " or name it by --token [token-invalid]\n");
    EXPECT_FALSE(fs::exists(data(1) / "token"));
}

TEST_F(SharedDatabaseTest, MakesAContainerAnewWhoseMachineIsGone) {
    start(0);
    start(1);
    setUploadFolder();
    storePack(folder_ / "p1.db", "p1");
    auto toFirst = lineTo(0);
    EXPECT_EQ(VlMail::deliverPack(toFirst, folder_ / "p1.db", "p1", false).state, Protocol::JobState::Queued);
    signal(0, SIGKILL);
    fs::path const made = data(0) / "outbox" / "p1.mailing";
    std::string const content = contentOf(fs::exists(made) ? made : data(1) / "outbox" / "p1.mailing");
    fs::remove_all(data(0) / "outbox");
    fs::remove_all(data(1) / "outbox" / "p1.mailing");
    auto toSecond = lineTo(1);
    storePack(folder_ / "again.db", "p1");
    VlMail::deliverPack(toSecond, folder_ / "again.db", "p1", true);
    Database::PostgresConnection database(database_.address());
    for (int i = 0; i < 100 && !fs::exists(upload_ / "p1.mailing"); ++i)
        pass(database, "0.1");
    EXPECT_EQ(contentOf(upload_ / "p1.mailing"), content);
}

TEST_F(SharedDatabaseTest, TellsTheOthersOfSettingsThatHaveChanged) {
    start(0);
    start(1);
    expectToldOfSettings();
}

TEST_F(SharedDatabaseTest, HasTheOthersLookForSettingsThatNoNoticeTellsOf) {
    start(0);
    start(1);
    Database::PostgresConnection(database_.address())
        .run("DROP TRIGGER service_settings_changed ON service_settings");
    expectToldOfSettings();
}

TEST_F(SharedDatabaseTest, HandsEachAnsweredPackOverOnceWhateverDiesOrStandsStill) {
    constexpr int CLIENTS = 3;
    constexpr int PACKS = 6;
    for (std::size_t i : {0, 1, 2})
        start(i);
    setUploadFolder();
    TakingCarrier const carrier(upload_, taken_);
    std::vector<std::thread> clients;
    std::atomic<int> sent{0};
    for (int c = 0; c < CLIENTS; ++c)
        clients.emplace_back([this, c, &sent] {
            for (int i = 0; i < PACKS; ++i, ++sent)
                send("p" + std::to_string(c) + "-" + std::to_string(i));
        });
    auto database = std::make_unique<Database::PostgresConnection>(database_.address());
    for (std::size_t round = 0; round < 2 || (round < 4 && sent < CLIENTS * PACKS); ++round) {
        // Longer than the lease, in the middle of whatever it does.
        signal(round % 3, SIGSTOP);
        pass(*database, "2.5");
        signal(round % 3, SIGCONT);
        signal((round + 1) % 3, SIGKILL);
        start((round + 1) % 3);
        if (round % 2 == 1) {
            database.reset();
            server_.crash();
            server_.startAgain();
            database = std::make_unique<Database::PostgresConnection>(database_.address());
        }
    }
    for (std::thread& client : clients)
        client.join();
    for (int i = 0; i < 600 && carrier.taken().size() < CLIENTS * PACKS; ++i)
        pass(*database, "0.1");
    std::map<std::string, int> const taken = carrier.taken();
    EXPECT_EQ(taken.size(), static_cast<std::size_t>(CLIENTS * PACKS)) << "none is lost";
    for (auto const& [id, times] : taken)
        EXPECT_EQ(times, 1) << id;
}

/// A timer that is over again when its handler returns is not stopped by a cancel.
TEST_F(SharedDatabaseTest, EndsWhenItIsToldToHoweverMuchSlowerTheDatabaseIsThanItsTimers) {
    start(0);
    Database::PostgresConnection database(database_.address());
    // Each look for jobs takes longer than the time from one look to the next, a fourth of the lease.
    database.run("CREATE FUNCTION slow() RETURNS trigger LANGUAGE plpgsql AS $$ BEGIN PERFORM "
                 "pg_sleep(0.7); RETURN NULL; END $$; CREATE TRIGGER slow BEFORE UPDATE ON jobs FOR EACH "
                 "STATEMENT EXECUTE FUNCTION slow()");
    auto const isSlow = [&] {
        return database.number("SELECT count(*) FROM pg_stat_activity WHERE wait_event = 'PgSleep' AND "
                               "datname = current_database() AND pid <> pg_backend_pid()") > 0;
    };
    for (int looks = 0; looks < 3; ++looks) {
        while (!isSlow())
            pass(database, "0.01");
        while (isSlow())
            pass(database, "0.01");
    }
    signal(0, SIGTERM);
    for (int i = 0; i < 300 && services_[0]->isRunning(); ++i)
        pass(database, "0.1");
    ASSERT_FALSE(services_[0]->isRunning());
    EXPECT_EQ(services_[0]->wait(), 0) << services_[0]->errors();
}

// --- on the way to them

/// Two services in a network, and a client in another one that knows the first alone.
/// A service that has its database in its folder, with a mailing that waits.
TEST_F(SharedDatabaseTest, GoesOnWithWhatAFolderHeldThatWasMovedThere) {
    {
        ServiceProcess const service(
            {"--data", data(0).string(), "--no-discovery", "--local-packs", folder_.path().string()});
        auto const owner = clientOf(service, data(0));
        owner->call<Ipc::SetSvcCfg>(json::Object{{"upload_folder", upload_.string()}});
        storePack(folder_ / "packs.db", "p1");
        owner->call<Ipc::ProcessPack>(folder_.path().string(), "packs.db", "p1");
        EXPECT_NE(ServiceProcess({"--data", data(0).string(), "--migrate-to", database_.address()}).wait(),
                  0);
    }
    ServiceProcess tooEarly(
        {"--data", data(0).string(), "--no-discovery", "--database", database_.address()});
    EXPECT_EQ(tooEarly.wait(), 1);
    EXPECT_THAT(tooEarly.errors(), HasSubstr("service.db: move it by --migrate-to in place of --database"));
    ServiceProcess moving({"--data", data(0).string(), "--migrate-to", database_.address()});
    EXPECT_EQ(moving.wait(), 0) << moving.errors();
    EXPECT_THAT(moving.firstLine(),
                testing::MatchesRegex(
                    "[0-9]+ rows of [0-9]+ tables are the same there, and the files here are called "
                    "service.db.moved and packs.db.moved; start the service with --database"));
    ServiceProcess without({"--data", data(0).string(), "--no-discovery"});
    EXPECT_EQ(without.wait(), 1);
    EXPECT_THAT(without.errors(), HasSubstr("was moved to PostgreSQL: name that one by --database"));
    ServiceProcess const service({"--data", data(0).string(), "--no-discovery", "--local-packs",
                                  folder_.path().string(), "--database", database_.address()});
    TakingCarrier const carrier(upload_, taken_);
    auto const owner = clientOf(service, data(0));
    owner->call<Ipc::UploadQueued>("", "");
    while (carrier.taken().empty())
        owner->call<Ipc::GetSvcCfg>();
    EXPECT_EQ(carrier.taken(), (std::map<std::string, int>{{"p1.mailing", 1}}));
}

/// A data folder whose service has brought a mailing, or a letter, into each state, and was killed then.
class FolderWithMailingsInEachState : public SharedDatabaseTest {
protected:
    void SetUp() override {
        SharedDatabaseTest::SetUp();
        if (IsSkipped())
            return;
        write("program",
              "#!/bin/sh\ncd '" + folder_.path().string() + "'\n[ -e refuses ] && exit 1\necho $1 >>had\n");
        fs::permissions(folder_ / "program", fs::perms::owner_all);
        startOnFile();
        setUploadFolder();
    }

    /// Without the database, on the folder's own.
    void startOnFile(ServiceProcess::Environment const& more = {}) {
        services_[0].reset();
        services_[0] = std::make_unique<ServiceProcess>(
            std::vector<std::string>{"--data", data(0).string(), "--no-discovery"}, more);
    }
    void write(char const* name, std::string const& text) const { std::ofstream(folder_ / name) << text; }
    void add(std::string const& id, std::string const& preset = "", bool upload = false) {
        storePack(folder_ / "packs.db", id, "a=acme", preset);
        auto line = lineTo(0);
        VlMail::deliverPack(line, folder_ / "packs.db", id, upload);
    }
    void report(std::string const& id, std::string const& state) {
        add(id, "", true);
        await(id, "submitted");
        std::ofstream(upload_ / (id + ".mailing.status")) << "{\"state\": \"" << state << "\"}";
    }
    void addLetters(std::string const& id, std::vector<std::string> const& channels) {
        storeLetters(folder_ / "packs.db", id, channels);
        auto line = lineTo(0);
        Mailing::OwnPackReader pack(folder_ / "packs.db", id);
        VlMail::uploadPack(line, pack);
        VlMail::ask(*client(0), Protocol::JobsChange(Protocol::JobAction::Upload, {id}));
    }
    void setCarrier() {
        json::Object const sms{{"type", "command"},
                               {"program", (folder_ / "program").string()},
                               {"arguments", parse(R"({"all":["{key}"]})").get("all")}};
        client(0)->call<Ipc::SetSvcCfg>(json::Object{{"carriers", json::Object{{"sms", sms}, {"fax", sms}}}});
        VlMail::ask(*client(0), Protocol::CarrierChange(Protocol::CarrierAction::Pause, "fax"));
    }
    /// "submitted", or of letters "delivering: accepted: waiting".
    std::map<std::string, std::string> states() {
        Protocol::JobsQuery query;
        query.letters = true;
        std::map<std::string, std::string> states;
        for (Protocol::JobReport const& job : Protocol::JobsAnswer(VlMail::ask(*client(0), query)).jobs) {
            std::string& state = states[job.id] = Protocol::stateName(job.state);
            for (Protocol::LetterReport const& letter : job.letters)
                state += std::string(": ") + Protocol::letterStateName(letter.state);
        }
        return states;
    }
    void await(std::string const& id, std::string const& state) {
        Database::PostgresConnection clock(database_.address());
        for (int i = 0; i < 300 && states()[id] != state; ++i)
            pass(clock, "0.1");
        EXPECT_EQ(states()[id], state) << id;
    }
    void change(Protocol::JobAction action, std::string const& id) {
        VlMail::ask(*client(0), Protocol::JobsChange(action, {id}));
    }
    /// Killed in front of the renaming that publishes it.
    void killWhileItSubmits(std::string const& id) {
        add(id);
        await(id, "queued");
        signal(0, SIGKILL);
        services_[0]->wait();
        startOnFile(Faults::environmentOf({"rename", 0, 1}, folder_ / "calls"));
        try {
            change(Protocol::JobAction::Upload, id);
        } catch (std::exception const&) {
            // It dies of that.
        }
        EXPECT_EQ(services_[0]->wait(), -SIGKILL);
    }
};

TEST_F(FolderWithMailingsInEachState, IsGoneOnWithWhereItWasOnceItWasMoved) {
    using Protocol::JobAction;
    add("held", R"("process_mode": 8, )");
    add("tried", R"("process_mode": 128, )");
    add("cancelled");
    change(JobAction::Cancel, "cancelled");
    add("queued");
    for (char const* const id : {"held", "tried", "queued"})
        await(id, id);
    report("delivered", "delivered");
    report("failed", "failed");
    add("submitted", "", true);
    add("lodged", "", true);
    for (char const* const id : {"submitted", "lodged"})
        await(id, "submitted");
    fs::remove(upload_ / "lodged.mailing");
    client(0)->call<Ipc::UpdateStatus>("", "");
    for (char const* const id : {"delivered", "failed", "lodged"})
        await(id, id);
    setCarrier();
    write("refuses", "");
    addLetters("refused", {"sms"});
    await("refused", "failed: failed");
    fs::remove(folder_ / "refuses");
    addLetters("taken", {"sms", "fax"});
    await("taken", "delivering: accepted: waiting");
    addLetters("waiting", {"fax"});
    await("waiting", "delivering: waiting");
    killWhileItSubmits("submitting");
    {
        SQLite::Database database((data(0) / "service.db").string(), SQLite::OPEN_READWRITE);
        EXPECT_EQ(database.execAndGet("SELECT state FROM jobs WHERE pack = 'submitting'").getString(),
                  "submitting");
        // As the end of a process leaves it that had begun with it.
        database.exec("UPDATE letters SET state = 'handed over' WHERE pack = 'taken' AND number = 2");
    }
    ServiceProcess moving({"--data", data(0).string(), "--migrate-to", database_.address()});
    ASSERT_EQ(moving.wait(), 0) << moving.errors();
    start(0);
    await("submitting", "submitted");
    await("taken", "delivering: accepted: uncertain");
    EXPECT_EQ(states(), (std::map<std::string, std::string>{{"held", "held"},
                                                            {"tried", "tried"},
                                                            {"cancelled", "cancelled"},
                                                            {"queued", "queued"},
                                                            {"delivered", "delivered"},
                                                            {"failed", "failed"},
                                                            {"lodged", "lodged"},
                                                            {"submitted", "submitted"},
                                                            {"submitting", "submitted"},
                                                            {"refused", "failed: failed"},
                                                            {"taken", "delivering: accepted: uncertain"},
                                                            {"waiting", "delivering: waiting"}}));
    change(JobAction::Release, "held");
    for (char const* const id : {"held", "queued"})
        change(JobAction::Upload, id);
    VlMail::ask(*client(0), Protocol::CarrierChange(Protocol::CarrierAction::Resume, "fax"));
    for (char const* const id : {"held", "queued"})
        await(id, "submitted");
    await("waiting", "lodged: accepted");
    std::set<std::string> containers;
    for (fs::directory_entry const& entry : fs::directory_iterator(upload_))
        if (entry.path().extension() == ".mailing")
            containers.insert(entry.path().stem().string());
    EXPECT_EQ(containers,
              (std::set<std::string>{"delivered", "failed", "held", "queued", "submitted", "submitting"}));
    std::ifstream had(folder_ / "had");
    EXPECT_EQ(std::string(std::istreambuf_iterator<char>(had), {}), "taken-1\nwaiting-1\n");
}

class ServicesOnAnotherMachine : public testing::Test {
protected:
    void SetUp() override {
        if (!server_.whyNot().empty())
            GTEST_SKIP() << server_.whyNot();
        if (!networks_.whyNot().empty())
            GTEST_SKIP() << "There is no right to make network namespaces: " << networks_.whyNot();
        certificate_ = ChannelTest::makeCertificate(folder_.path().string(), "service");
        for (char const* const name : {"first", "second"})
            start(name);
    }

    void start(char const* name) {
        TwoNetworks::Inside const inside(networks_.service());
        std::vector<std::string> arguments{
            "--data",   (folder_ / name).string(), "--database",    database_.address(),
            "--listen", TwoNetworks::SERVICE_IP4,  "--certificate", certificate_.certificateFile,
            "--key",    certificate_.keyFile};
        if (!services_.empty())
            arguments.insert(arguments.end(), {"--token", token()});
        services_[name] = std::make_unique<ServiceProcess>(arguments);
    }
    std::string token() const { return (folder_ / "first" / "token").string(); }
    std::string addressOf(char const* name) {
        return std::string(TwoNetworks::SERVICE_IP4) + ':' + std::to_string(services_.at(name)->port());
    }
    VlMail::ServiceOptions options() {
        VlMail::ServiceOptions options;
        options.service = addressOf("first");
        options.tokenFile = token();
        options.pinFile = (folder_ / "pins").string();
        options.certificate = Channel::fingerprintOf(
            *Channel::makeServiceContext(certificate_.certificateFile, certificate_.keyFile));
        return options;
    }
    void kill(char const* name) {
        services_.at(name)->signal(SIGKILL);
        services_.at(name)->wait();
    }

    TwoNetworks networks_;
    TemporaryFolder folder_;
    VLServiceTest::PostgresServer server_;
    VLServiceTest::PostgresDatabase database_{server_.folder()};
    ChannelTest::TestCertificate certificate_;
    std::map<std::string, std::unique_ptr<ServiceProcess>> services_;
    std::ostringstream said_;
    VlMail::Terminal const terminal_{said_, said_};
};

TEST_F(ServicesOnAnotherMachine, TakeOverAClientThatLosesItsService) {
    TwoNetworks::Inside const inside(networks_.client());
    VlMail::ServiceOptions const wanted = options();
    VlMail::ServiceLine line = VlMail::lineToService(wanted, terminal_);
    std::string const lost = addressOf("first");
    kill("first");
    storePack(folder_ / "p1.db", "p1");
    EXPECT_EQ(VlMail::deliverPack(line, folder_ / "p1.db", "p1", false).state, Protocol::JobState::Queued);
    EXPECT_THAT(said_.str(), HasSubstr("note: the service " + lost + " was lost; going on with " +
                                       addressOf("second") + "\n"));
}

TEST_F(ServicesOnAnotherMachine, AreNotTakenForOneThatWasNeverReached) {
    TwoNetworks::Inside const inside(networks_.client());
    VlMail::ServiceOptions const wanted = options();
    kill("first");
    EXPECT_THAT(failureOf([&] { VlMail::lineToService(wanted, terminal_); }),
                HasSubstr(wanted.service + ": Nobody answers there"));
}

} // namespace

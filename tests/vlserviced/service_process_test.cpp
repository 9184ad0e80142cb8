// The program as people run it: started, asked, ended, killed.
#include "tests/vlserviced/service_process.h"

#include "programs/base/error.h"
#include "tests/faults/fault.h"
#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/json_help.h"
#include "tests/vlserviced/pack_help.h"
#include "vlservice/ipc/cs_config_ids_list.h"
#include "vlservice/ipc/get_svc_cfg.h"
#include "vlservice/ipc/process_pack.h"
#include "vlservice/ipc/set_part_tmpl.h"
#include "vlservice/ipc/set_svc_cfg.h"
#include "vlservice/ipc/upload_queued.h"

#include <SQLiteCpp/Database.h>
#include <boost/asio/io_context.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <boost/asio/read.hpp>
#include <boost/asio/write.hpp>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <csignal>
#include <fstream>
#include <set>
#include <stdexcept>
#include <thread>

namespace {

namespace fs = std::filesystem;

class ServiceProcessTest : public testing::Test {
protected:
    std::vector<std::string> arguments(std::vector<std::string> const& more = {}) const {
        std::vector<std::string> all{"--data", data_.string(), "--no-discovery", "--local-packs",
                                     folder_.path().string()};
        all.insert(all.end(), more.begin(), more.end());
        return all;
    }
    /// The error of a start that fails.
    std::string startFailure(std::vector<std::string> const& all) {
        ServiceProcess service(all);
        EXPECT_EQ(service.firstLine(), "");
        EXPECT_EQ(service.wait(), 1);
        return service.errors();
    }

    TemporaryFolder folder_;
    fs::path data_ = folder_ / "data";
};

TEST_F(ServiceProcessTest, SaysWhereItListensAndAnswersWhoHasTheToken) {
    ServiceProcess const service(arguments());
    EXPECT_TRUE(service.firstLine().starts_with("listening on 127.0.0.1:")) << service.firstLine();
    EXPECT_NE(service.port(), 0);
    EXPECT_EQ(fs::status(data_ / "token").permissions(), fs::perms(0600));
    auto const client = clientOf(service, data_);
    EXPECT_EQ(client->call<Ipc::GetSvcCfg>()->resp().get("outbox"), json::Value((data_ / "outbox").string()));
}

TEST_F(ServiceProcessTest, EndsCleanlyOnATermSignalAndKeepsWhatItHas) {
    for (int const number : {SIGTERM, SIGINT}) {
        ServiceProcess service(arguments());
        auto const client = clientOf(service, data_);
        Cfg::PO part(json::Value(), false, false);
        part.setOwn<Cfg::POFieldIdxs::Code>("signal " + std::to_string(number));
        EXPECT_EQ(client->call<Ipc::SetPO>(Cfg::Id("a=acme", false), part)->respErrMsg(), "");
        service.signal(number);
        EXPECT_EQ(service.wait(), 0);
        EXPECT_EQ(service.errors(), "");
        ServiceProcess const next(arguments());
        json::Object const answer =
            clientOf(next, data_)
                ->call<Ipc::CSConfigIdsList>(parse(R"({"query":"settings","id":"a=acme"})"))
                ->resp();
        EXPECT_NE(print(answer).find("signal " + std::to_string(number)), std::string::npos);
    }
}

TEST_F(ServiceProcessTest, ForgetsAtItsStartWhatTheTimeIsUpOf) {
    {
        ServiceProcess const service(arguments());
        storePack(folder_ / "packs.db", "p1");
        auto const client = clientOf(service, data_);
        client->call<Ipc::ProcessPack>(folder_.path().string(), "packs.db", "p1");
        client->call<Ipc::CSConfigIdsList>(
            parse(R"({"query":"change_jobs","action":"cancel","ids":["p1"]})"));
    }
    SQLite::Database database((data_ / "service.db").string(), SQLite::OPEN_READWRITE);
    database.setBusyTimeout(10'000);
    EXPECT_EQ(database.execAndGet("SELECT state FROM jobs").getString(), "cancelled");
    database.exec("UPDATE jobs SET accepted_at = 1, changed_at = 1");
    database.exec("INSERT INTO registered_mailings (id, pack, node, at, ends_at) VALUES (1, 'p0', '', 1, 2)");
    ServiceProcess const next(arguments());
    auto const left = [&] {
        return database
            .execAndGet("SELECT (SELECT count(*) FROM jobs) + (SELECT count(*) FROM registered_mailings)")
            .getInt();
    };
    auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(60);
    while (left() > 0 && std::chrono::steady_clock::now() < end) {
    }
    EXPECT_EQ(left(), 0);
}

TEST_F(ServiceProcessTest, TellsErrorsOfCommandsWithoutAnAnswerAsErrors) {
    ServiceProcess const service(arguments());
    auto const client = clientOf(service, data_);
    std::string const text =
        failureOf([&] { client->call<Ipc::ProcessPack>(folder_.path().string(), "packs.db", "p1"); });
    EXPECT_NE(text.find("there is no pack database " + (folder_ / "packs.db").string()), std::string::npos)
        << text;
}

TEST_F(ServiceProcessTest, AnswersAtOnceWhileOthersNameAPackDatabaseThatSomebodyHolds) {
    constexpr int WAITING = 20, QUESTIONS = 200;
    fs::path const database = folder_ / "packs.db";
    storePack(database, "p1");
    SQLite::Database holder(database.string(), SQLite::OPEN_READWRITE);
    holder.exec("BEGIN EXCLUSIVE");
    ServiceProcess const service(arguments());
    std::atomic<int> answered = 0;
    std::vector<std::thread> others;
    for (int i = 0; i < WAITING; ++i)
        others.emplace_back([&] {
            failureOf([&] {
                clientOf(service, data_)->call<Ipc::ProcessPack>(folder_.path().string(), "packs.db", "p1");
                throw std::runtime_error("taken");
            });
            ++answered;
        });
    auto const client = clientOf(service, data_);
    for (int i = 0; i < QUESTIONS; ++i)
        client->call<Ipc::GetSvcCfg>();
    // Each of the others waits for some seconds: had they been waited for, all would be through.
    EXPECT_LT(answered, WAITING);
    holder.exec("COMMIT");
    for (std::thread& other : others)
        other.join();
}

TEST_F(ServiceProcessTest, RefusesASecondProcessOnItsFolder) {
    ServiceProcess const first(arguments());
    std::string const text = startFailure(arguments());
    EXPECT_TRUE(text.starts_with("vlserviced: the data folder " + data_.string() +
                                 " is in use by another vlserviced"))
        << text;
}

TEST_F(ServiceProcessTest, RefusesOtherAddressesWithoutACertificate) {
    for (char const* address : {"0.0.0.0", "::"}) {
        std::string const text = startFailure(arguments({"--listen", address}));
        EXPECT_TRUE(text.starts_with("vlserviced: ")) << text;
        EXPECT_NE(text.find("certificate"), std::string::npos) << text;
    }
}

TEST_F(ServiceProcessTest, FailsWithOneLineThatSaysWhatIsWrong) {
    std::ofstream(folder_ / "file") << "x";
    EXPECT_EQ(startFailure({"--data", (folder_ / "file").string()}),
              "vlserviced: cannot write into the folder " + (folder_ / "file").string() +
                  ": Not a directory; give this user the right to, or name another folder "
                  "[data-folder-unusable]\n");
    fs::create_directory(data_);
    std::ofstream(data_ / "service.db") << std::string(5000, 'x');
    EXPECT_EQ(startFailure(arguments()), "vlserviced: " + (data_ / "service.db").string() +
                                             " is not a service database [database-unusable]\n");
    fs::remove(data_ / "service.db");
    std::string const text = startFailure(arguments({"--listen", "nowhere"}));
    EXPECT_TRUE(text.starts_with("vlserviced: ")) << text;
    EXPECT_EQ(std::count(text.begin(), text.end(), '\n'), 1) << text;
}

TEST_F(ServiceProcessTest, EndsWhereItsPortIsTakenAndLeavesWhoeverListensThereAlone) {
    ServiceProcess const first(arguments());
    std::string const port = std::to_string(first.port());
    EXPECT_EQ(
        startFailure({"--data", (folder_ / "second").string(), "--no-discovery", "--port", port}),
        "vlserviced: Cannot listen on 127.0.0.1:" + port +
            ": Address already in use; end what listens there, or listen elsewhere. [address-unusable]\n");
    EXPECT_NO_THROW(clientOf(first, data_)->call<Ipc::GetSvcCfg>());
}

TEST_F(ServiceProcessTest, EndsOverADatabaseOfANewerVersionAndLeavesItAsItIs) {
    { ServiceProcess const first(arguments()); }
    fs::path const file = data_ / "service.db";
    SQLite::Database database(file.string(), SQLite::OPEN_READWRITE);
    int const known = database.execAndGet("PRAGMA user_version").getInt();
    database.exec("PRAGMA user_version = 1000000");
    EXPECT_EQ(startFailure(arguments()),
              "vlserviced: the service database " + file.string() +
                  " was written by a newer version of this program (schema 1000000, known is " +
                  std::to_string(known) + "): use that version [database-newer]\n");
    EXPECT_EQ(database.execAndGet("PRAGMA user_version").getInt(), 1000000);
}

/// The page of metrics behind a socket.
std::string metricsAt(fs::path const& file) {
    boost::asio::io_context io;
    boost::asio::local::stream_protocol::socket socket(io);
    socket.connect(file.string());
    boost::asio::write(socket, boost::asio::buffer(std::string("GET /metrics HTTP/1.1\r\n\r\n")));
    std::string page;
    boost::system::error_code end;
    boost::asio::read(socket, boost::asio::dynamic_buffer(page), end);
    return page;
}

TEST_F(ServiceProcessTest, TellsWhoeverWatchesItWhatItDoes) {
    using testing::HasSubstr;
    fs::path const socket = folder_ / "metrics";
    ServiceProcess service(arguments({"--metrics", "unix:" + socket.string()}));
    auto const client = clientOf(service, data_);
    client->call<Ipc::GetSvcCfg>();
    client->call<Ipc::CSConfigIdsList>(parse(R"({"query":"settings","id":"a=acme"})"));
    client->call<Ipc::CSConfigIdsList>(parse(R"({"query":"who is jane"})"));
    std::string const page = metricsAt(socket);
    EXPECT_THAT(page, HasSubstr("vlserviced_command_seconds_count{command=\"settings\"} 1\n"));
    EXPECT_THAT(page, HasSubstr("vlserviced_command_seconds_count{command=\"unknown question\"} 1\n"));
    EXPECT_THAT(page, HasSubstr("vlserviced_commands_refused_total{reason=\"request\"} 1\n"));
    EXPECT_THAT(page, HasSubstr("vlserviced_connections 1\n"));
    EXPECT_THAT(page, HasSubstr("vlserviced_responsive 1\n"));
    EXPECT_THAT(page, HasSubstr("vlserviced_database_up 1\n"));
    EXPECT_THAT(page, HasSubstr("vlserviced_database_seconds_count{operation=\"query\"} "));
    EXPECT_THAT(page, HasSubstr("vlserviced_jobs{state=\"accepted\"} 0\n"));
    EXPECT_THAT(page, testing::Not(HasSubstr("jane")));
    service.signal(SIGTERM);
    EXPECT_EQ(service.wait(), 0);
    EXPECT_FALSE(fs::exists(socket));
}

TEST_F(ServiceProcessTest, TellsOfRefusalsByTheirReason) {
    using testing::HasSubstr;
    fs::path const socket = folder_ / "metrics";
    ServiceProcess const service(arguments({"--metrics", "unix:" + socket.string()}));
    auto const owner = clientOf(service, data_);
    json::Object const token = owner
                                   ->call<Ipc::CSConfigIdsList>(parse(
                                       R"({"query":"add_token","name":"desk","role":"read","id":"a=acme"})"))
                                   ->resp();
    Channel::ClientSettings settings;
    settings.host = "127.0.0.1";
    settings.port = service.port();
    settings.token = token.get("token").textOrEmpty();
    Channel::Client desk(std::move(settings));
    failureOf([&] { desk.call<Ipc::CSConfigIdsList>(parse(R"({"query":"carriers"})")); });
    owner->call<Ipc::CSConfigIdsList>(parse(R"({"query":"revoke_token","name":"desk"})"));
    failureOf([&] { desk.call<Ipc::GetSvcCfg>(); });
    std::string const page = metricsAt(socket);
    EXPECT_THAT(page, HasSubstr("vlserviced_commands_refused_total{reason=\"rights\"} 1\n"));
    EXPECT_THAT(page, HasSubstr("vlserviced_commands_refused_total{reason=\"token\"} 1\n"));
}

TEST_F(ServiceProcessTest, RefusesToTellOthersThanThisMachine) {
    EXPECT_EQ(startFailure(arguments({"--metrics", "0.0.0.0:9117"})),
              "vlserviced: --metrics takes a loopback address with a port, such as 127.0.0.1:9117, or "
              "unix:PATH, and got \"0.0.0.0:9117\" [usage]\n");
}

/// What the program prints when it is run for something else than to serve, and its status in front.
std::string carriedOut(std::vector<std::string> const& arguments) {
    ServiceProcess task(arguments);
    int const status = task.wait();
    return std::to_string(status) + ' ' + task.firstLine() + task.errors();
}

/// A service with two mailings that wait, and a backup of it that is made while it runs.
class RestoredService : public ServiceProcessTest {
protected:
    RestoredService() {
        fs::create_directory(upload_);
        ServiceProcess const service(arguments());
        auto const client = clientOf(service, data_);
        client->call<Ipc::SetSvcCfg>(json::Object{{"upload_folder", upload_.string()}});
        for (char const* const id : {"p1", "p2"}) {
            storePack(folder_ / "packs.db", id);
            client->call<Ipc::ProcessPack>(folder_.path().string(), "packs.db", id);
        }
        await(*client, "p1", "queued");
        await(*client, "p2", "queued");
        EXPECT_EQ(carriedOut({"backup", file_.string(), "--data", data_.string()}), "0 ");
    }

    static std::string stateOf(Channel::Client& client, std::string const& id) {
        json::Object const answer =
            client.call<Ipc::CSConfigIdsList>(parse(R"({"query":"jobs","states":["held"]})"))->resp();
        for (json::Value const& job : answer.get("jobs").toArray())
            if (job.toObject().get("id").textOrEmpty() == id)
                return job.toObject().get("state").textOrEmpty();
        return "none";
    }
    void await(Channel::Client& client, std::string const& id, std::string const& state) {
        auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(60);
        while (std::chrono::steady_clock::now() < end)
            if (stateOf(client, id) == state)
                return;
        ADD_FAILURE() << id << " is not " << state << " but " << stateOf(client, id);
    }
    static void change(Channel::Client& client, char const* action, std::string const& id) {
        client.call<Ipc::CSConfigIdsList>(parse(R"({"query":"change_jobs","action":")" + std::string(action) +
                                                R"(","ids":[")" + id + "\"]}"));
    }
    std::string restored(std::vector<std::string> const& more = {}) {
        std::vector<std::string> all{"restore", file_.string(), "--data", new_.string()};
        all.insert(all.end(), more.begin(), more.end());
        return carriedOut(all);
    }
    std::vector<std::string> argumentsOfNew() const {
        return {"--data", new_.string(), "--no-discovery", "--local-packs", folder_.path().string()};
    }

    fs::path upload_ = folder_ / "upload";
    fs::path file_ = folder_ / "backup";
    fs::path new_ = folder_ / "new";
};

TEST_F(RestoredService, GoesOnWithWhatWaitedAndHandsItOverOnce) {
    EXPECT_THAT(restored({"--nothing-since"}),
                testing::EndsWith("0 mailings were found in the upload folder, 0 mailings are "
                                  "held and 0 letters are uncertain until a person decides"));
    // The pages that the client has erased are in the container that came with the backup.
    fs::remove(folder_ / "packs.db");
    ServiceProcess const service(argumentsOfNew());
    auto const client = clientOf(service, new_);
    client->call<Ipc::UploadQueued>("", "");
    for (char const* const id : {"p1", "p2"}) {
        await(*client, id, "submitted");
        EXPECT_EQ(contentOf(upload_ / (std::string(id) + ".mailing")), contentOfPack(id));
    }
}

TEST_F(RestoredService, HandsNothingOverTwiceThatTheFormerOneHasHandedOver) {
    {
        ServiceProcess const former(arguments());
        auto const client = clientOf(former, data_);
        change(*client, "upload", "p1");
        await(*client, "p1", "submitted");
        change(*client, "upload", "p2");
        await(*client, "p2", "submitted");
    }
    // Of one the carrier has left nothing.
    fs::rename(upload_ / "p1.mailing", folder_ / "taken");
    EXPECT_THAT(
        restored(),
        testing::EndsWith("1 mailing was found in the upload folder, 1 mailing is held and 0 letters are "
                          "uncertain until a person decides"));
    ServiceProcess const service(argumentsOfNew());
    auto const client = clientOf(service, new_);
    client->call<Ipc::UploadQueued>("", "");
    EXPECT_EQ(stateOf(*client, "p1"), "held");
    EXPECT_EQ(stateOf(*client, "p2"), "submitted");
    EXPECT_FALSE(fs::exists(upload_ / "p1.mailing"));
    change(*client, "release", "p1");
    await(*client, "p1", "submitted");
    EXPECT_EQ(contentOf(upload_ / "p1.mailing"), contentOfPack("p1"));
}

TEST_F(RestoredService, IsNotMadeWhereOneRunsOrHasRun) {
    EXPECT_THAT(
        carriedOut({"restore", file_.string(), "--data", data_.string()}),
        testing::StartsWith("1 vlserviced: there is " + (data_ / "service.db").string() + " already: "));
    ServiceProcess const service(arguments());
    EXPECT_THAT(
        carriedOut({"restore", file_.string(), "--data", data_.string()}),
        testing::StartsWith("1 vlserviced: the data folder " + data_.string() + " is in use by another "));
}

TEST_F(RestoredService, IsMadeInADataFolderAlone) {
    EXPECT_EQ(
        restored({"--database", "postgresql:///x"}),
        "1 vlserviced: restore makes the database of a data folder; --migrate-to takes that to PostgreSQL; "
        "--help explains [usage]\n");
    EXPECT_EQ(
        carriedOut(
            {"--migrate-to", "postgresql:///x", "--database", "postgresql:///x", "--data", data_.string()}),
        "1 vlserviced: --migrate-to moves the data folder's own database: leave --database out until that is "
        "done; --help explains [usage]\n");
}

TEST_F(ServiceProcessTest, TakesAFreePortOfItsOwnOrTheOneItIsGiven) {
    std::uint16_t port = 0;
    {
        ServiceProcess service(arguments());
        port = service.port();
        service.signal(SIGTERM);
        service.wait();
    }
    ServiceProcess const again(arguments({"--port", std::to_string(port)}));
    EXPECT_EQ(again.port(), port);
}

/// A mailing on its way while the process is killed; whatever was acknowledged has to be there afterwards,
/// and each container is handed on once.
class KilledService : public ServiceProcessTest {
protected:
    KilledService() {
        fs::create_directories(upload_);
        fs::create_directories(taken_);
        fs::copy_file(packsOfAll(), folder_ / "packs.db");
    }

    /// Made once: syncing it takes its time.
    static fs::path packsOfAll() {
        static TemporaryFolder const folder;
        static bool const stored = [] {
            for (char const* id : {"p1", "p2"})
                storePack(folder / "packs.db", id);
            return true;
        }();
        return stored ? folder / "packs.db" : fs::path();
    }
    /// A service that is killed at its call of that number; 0 lets it live.
    ServiceProcess::Environment killingAt(int call) const {
        return Faults::environmentOf({"durable", 0, call}, folder_ / "calls");
    }

    void acknowledge(std::string const& what) {
        acknowledged_.insert(what);
        ++answers_;
        answers_.notify_one();
    }
    /// Waits until a sender on another thread has had so many answers, or is through.
    void awaitAnswers(int wanted) const {
        for (int seen = answers_; seen < wanted; seen = answers_)
            answers_.wait(seen);
    }

    /// Sends settings and packs until the service is no longer there.
    void sendAll(ServiceProcess const& service) {
        try {
            auto const client = clientOf(service, data_);
            client->call<Ipc::SetSvcCfg>(json::Object{{"upload_folder", upload_.string()}});
            acknowledge("upload folder");
            Cfg::PO part(json::Value(), false, false);
            part.setOwn<Cfg::POFieldIdxs::Code>("kept");
            client->call<Ipc::SetPO>(Cfg::Id("u=bob/a=acme", false), part);
            acknowledge("settings");
            for (char const* id : {"p1", "p2"}) {
                client->call<Ipc::ProcessPack>(folder_.path().string(), "packs.db", id);
                acknowledge(id);
            }
            client->call<Ipc::UploadQueued>(folder_.path().string(), "packs.db");
            acknowledge("upload");
            awaitStates(*client, {"submitted"});
            acknowledge("end");
        } catch (std::exception const&) {
            // It was killed in the middle of a command.
        }
        answers_ = ALL_ANSWERS;
        answers_.notify_one();
    }

    std::map<std::string, std::string> states(Channel::Client& client) {
        std::map<std::string, std::string> states;
        json::Object const answer =
            client.call<Ipc::CSConfigIdsList>(json::Object{{"query", "jobs"}})->resp();
        for (json::Value const& job : answer.get("jobs").toArray())
            states[job.toObject().get("id").textOrEmpty()] = job.toObject().get("state").textOrEmpty();
        return states;
    }

    /// Polls until all jobs are in one of the states.
    void awaitStates(Channel::Client& client, std::set<std::string> const& wanted) {
        auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(60);
        while (std::chrono::steady_clock::now() < end) {
            bool settled = true;
            for (auto const& [id, state] : states(client))
                settled &= wanted.contains(state);
            if (settled)
                return;
        }
        FAIL() << "the jobs do not settle";
    }

    /// What the carrier does: takes every container that is there.
    void takeContainers(std::string const& when) {
        std::vector<fs::path> there;
        for (fs::directory_entry const& entry : fs::directory_iterator(upload_))
            if (!entry.path().filename().string().starts_with('.'))
                there.push_back(entry.path());
        for (fs::path const& container : there) {
            fs::path const target = taken_ / container.filename();
            EXPECT_FALSE(fs::exists(target)) << container << " was handed on twice, " << when;
            fs::rename(container, target);
        }
    }

    void requireAcknowledged(Channel::Client& client, std::string const& when) {
        std::map<std::string, std::string> const known = states(client);
        for (char const* id : {"p1", "p2"})
            EXPECT_TRUE(!acknowledged_.contains(id) || known.contains(id)) << id << " was lost, " << when;
        json::Value const upload = client.call<Ipc::GetSvcCfg>()->resp().get("upload_folder");
        EXPECT_TRUE(!acknowledged_.contains("upload folder") || upload) << "a setting was lost, " << when;
        std::string const settings =
            print(client
                      .call<Ipc::CSConfigIdsList>(
                          parse(R"({"query":"settings","id":"u=bob/a=acme","parts":["po"]})"))
                      ->resp());
        bool const isThere = settings.find(R"("own":{"code":"kept"})") != std::string::npos;
        EXPECT_TRUE(!acknowledged_.contains("settings") || isThere) << "settings were lost, " << when;
    }

    /// Everything is sent again, as a client does that had no answer, and all of it arrives once.
    void finish(std::string const& when) {
        ServiceProcess service(arguments(), killingAt(0));
        ASSERT_NE(service.port(), 0) << service.errors() << when;
        {
            auto const client = clientOf(service, data_);
            requireAcknowledged(*client, when);
        }
        sendAll(service);
        takeContainers(when);
        for (char const* id : {"p1", "p2"})
            EXPECT_EQ(contentOf(taken_ / (id + std::string(".mailing"))), contentOfPack(id)) << when;
        EXPECT_TRUE(fs::is_empty(data_ / "outbox")) << when;
        for (fs::directory_entry const& left : fs::directory_iterator(upload_))
            EXPECT_EQ(left.path().filename(), ".vlserviced") << when;
        service.signal(SIGTERM);
        EXPECT_EQ(service.wait(), 0) << when;
    }

    fs::path upload_ = folder_ / "upload";
    fs::path taken_ = folder_ / "taken";
    std::set<std::string> acknowledged_;
    static constexpr int ALL_ANSWERS = 6;
    std::atomic<int> answers_ = 0;
};

/// A run that is cut short in front of one of the calls that make something durable or visible.
class OneKill : public KilledService {
public:
    /// False when the service got to the end alive.
    bool killedAt(int call) {
        std::string const when = "killed at call " + std::to_string(call);
        ServiceProcess service(arguments(), killingAt(call));
        if (service.port() != 0)
            sendAll(service);
        bool const survived = acknowledged_.contains("end");
        service.signal(SIGKILL);
        service.wait();
        takeContainers(when);
        finish(when);
        return !survived;
    }

private:
    void TestBody() override {}
};

/// Every fourth call, from the parameter on.
class ServiceThatIsKilled : public testing::TestWithParam<int> {};

TEST_P(ServiceThatIsKilled, LosesNothingThatItAcknowledgedAndHandsEachContainerOnOnce) {
    int call = GetParam();
    while (OneKill().killedAt(call) && !HasFailure())
        call += 4;
    // The start, five commands and the way of two jobs make something durable at least this often.
    EXPECT_GT(call, 30);
}

INSTANTIATE_TEST_SUITE_P(AtEveryCall, ServiceThatIsKilled, testing::Range(1, 5));

TEST_F(KilledService, GoesOnAfterAKillAtAnyMoment) {
    // Moments, not calls: wherever it is with the next command, or with the jobs.
    for (int wanted = 0; wanted < ALL_ANSWERS; ++wanted) {
        ServiceProcess service(arguments());
        answers_ = 0;
        std::thread sender([&] { sendAll(service); });
        awaitAnswers(wanted);
        service.signal(SIGKILL);
        sender.join();
        service.wait();
    }
    takeContainers("killed at moments");
    finish("killed at moments");
}

} // namespace

// A service that hands letters over to carriers, ended at any of the calls that make something durable or
// visible: what the other side has of them is counted.
#include "tests/carriers/ipp_printer.h"
#include "tests/carriers/smtp_server.h"
#include "tests/carriers/ssh_server.h"
#include "tests/faults/fault.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/letter_help.h"
#include "tests/vlserviced/service_process.h"
#include "vlservice/ipc/cs_config_ids_list.h"
#include "vlservice/ipc/process_pack.h"
#include "vlservice/ipc/set_svc_cfg.h"
#include "vlservice/ipc/upload_queued.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <fstream>
#include <future>
#include <initializer_list>
#include <set>
#include <sstream>

namespace {

namespace fs = std::filesystem;

using testing::ElementsAre;

/// Two mailings of which letters go to a print shop and others in containers.
class CarriedLetters : public testing::Test {
protected:
    CarriedLetters() {
        for (fs::path const& made : {shop_, upload_, taken_})
            fs::create_directories(made);
        fs::copy_file(storedPacks(), folder_ / "packs.db");
    }

    /// Made once: syncing it takes its time.
    static fs::path storedPacks() {
        static TemporaryFolder const folder;
        static bool const isStored = [] {
            storeLetters(folder / "packs.db", "p1", {"postal", "email", "postal"});
            storeLetters(folder / "packs.db", "p2", {"postal", "postal"});
            return true;
        }();
        return isStored ? folder / "packs.db" : fs::path();
    }

    std::vector<std::string> arguments() const {
        return {"--data", data_.string(), "--no-discovery", "--local-packs", folder_.path().string()};
    }

    virtual json::Object shopCarrier() const { return {{"type", "folder"}, {"folder", shop_.string()}}; }

    /// Says what is wanted, as a client does that had no answer.
    std::unique_ptr<Channel::Client> begin(ServiceProcess const& service) {
        auto client = clientOf(service, data_);
        client->call<Ipc::SetSvcCfg>(json::Object{{"upload_folder", upload_.string()},
                                                  {"carriers", json::Object{{"postal", shopCarrier()}}}});
        for (char const* const id : {"p1", "p2"})
            client->call<Ipc::ProcessPack>(folder_.path().string(), "packs.db", id);
        client->call<Ipc::UploadQueued>(folder_.path().string(), "packs.db");
        return client;
    }
    /// The same, and waits for its end. False when the service was gone before.
    bool sendAll(ServiceProcess const& service) {
        try {
            awaitEnd(*begin(service));
            return true;
        } catch (std::exception const&) {
            return false;
        }
    }

    /// The states of jobs and of their letters, as one text.
    static std::string told(Channel::Client& client) {
        json::Object const answer =
            client.call<Ipc::CSConfigIdsList>(parse(R"({"query":"jobs","letters":true})"))->resp();
        std::string text;
        for (json::Value const& one : answer.get("jobs").toArray()) {
            json::Object const job = one.toObject();
            text += job.get("id").textOrEmpty() + ' ' + job.get("state").textOrEmpty() + ':';
            if (job.get("letters"))
                for (json::Value const& letter : job.get("letters").toArray())
                    text += ' ' + letter.toObject().get("state").textOrEmpty();
            if (job.get("notices"))
                for (json::Value const& notice : job.get("notices").toArray())
                    text += " notice " + notice.toObject().get("state").textOrEmpty();
            text += '\n';
        }
        return text;
    }

    void awaitEnd(Channel::Client& client) {
        auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(60);
        while (told(client) != ENDED && std::chrono::steady_clock::now() < end) {
        }
        EXPECT_EQ(told(client), ENDED);
    }

    /// What the print shop does: takes everything that is whole. A key that comes once more has to be the
    /// same.
    void takeLetters(std::string const& when) {
        for (fs::directory_entry const& entry : fs::directory_iterator(shop_)) {
            fs::path const file = entry.path();
            if (file.extension() != ".json")
                continue;
            for (char const* const ending : {".json", ".csv", ".pdf"}) {
                fs::path const found = fs::path(file).replace_extension(ending);
                ASSERT_TRUE(fs::exists(found)) << found << ' ' << when;
                std::string const text = textOf(found);
                auto const [known, isNew] = letters_.try_emplace(found.filename().string(), text);
                EXPECT_EQ(known->second, text) << when;
            }
        }
    }
    void takeContainers(std::string const& when) {
        for (fs::directory_entry const& entry : fs::directory_iterator(upload_)) {
            std::string const name = entry.path().filename().string();
            if (name.starts_with('.'))
                continue;
            EXPECT_TRUE(containers_.insert(name).second) << name << " was handed on twice, " << when;
            fs::rename(entry.path(), taken_ / name);
        }
    }
    static std::string textOf(fs::path const& file) {
        std::ifstream in(file, std::ios::binary);
        return {std::istreambuf_iterator<char>(in), {}};
    }

    void finish(std::string const& when) {
        ServiceProcess service(arguments(), Faults::environmentOf({"durable", 0, 0}, folder_ / "calls"));
        ASSERT_NE(service.port(), 0) << service.errors() << when;
        EXPECT_TRUE(sendAll(service)) << when;
        takeLetters(when);
        takeContainers(when);
        std::vector<std::string> keys;
        for (auto const& [name, text] : letters_)
            if (name.ends_with(".json"))
                keys.push_back(name);
        EXPECT_THAT(keys, ElementsAre("p1-1.json", "p1-3.json", "p2-1.json", "p2-2.json")) << when;
        EXPECT_THAT(containers_, ElementsAre("p1.mailing")) << when;
        service.signal(SIGTERM);
        EXPECT_EQ(service.wait(), 0) << when;
        for (fs::path const& folder : {data_ / "outbox", data_ / "outbox" / "rest", shop_, upload_})
            for (fs::directory_entry const& left : fs::directory_iterator(folder))
                EXPECT_FALSE(left.path().extension() == ".part" || left.path().extension() == ".mailing")
                    << left.path() << ' ' << when;
    }

    static constexpr char const* ENDED =
        "p1 submitted: accepted handed over accepted\np2 lodged: accepted accepted\n";

    TemporaryFolder folder_;
    fs::path data_ = folder_ / "data";
    fs::path shop_ = folder_ / "shop";
    fs::path upload_ = folder_ / "upload";
    fs::path taken_ = folder_ / "taken";
    /// What the print shop has, by its files' names.
    std::map<std::string, std::string> letters_;
    std::set<std::string> containers_;
};

class OneKillAmongLetters : public CarriedLetters {
public:
    /// False when the service got to the end alive.
    bool killedAt(int call) {
        std::string const when = "killed at call " + std::to_string(call);
        ServiceProcess service(arguments(), Faults::environmentOf({"durable", 0, call}, folder_ / "calls"));
        bool const survived = service.port() != 0 && sendAll(service);
        service.signal(SIGKILL);
        service.wait();
        takeLetters(when);
        finish(when);
        return !survived;
    }

private:
    void TestBody() override {}
};

/// A print shop that files are put to over ssh.
class LettersOverSsh : public CarriedLetters {
public:
    LettersOverSsh() {
        fs::permissions(shop_, fs::perms(0777));
        server_.emplace(folder_ / "ssh", shop_);
    }

    /// False when the service got to the end alive.
    bool killedAt(int piece) {
        std::string const when = "killed at piece " + std::to_string(piece);
        bool survived = false;
        {
            ServiceProcess service(arguments());
            server_->relay().onPiece([&](int number) {
                if (number == piece)
                    service.signal(SIGKILL);
                return true;
            });
            survived = sendAll(service);
            server_->relay().onPiece({});
            service.signal(SIGKILL);
            service.wait();
        }
        takeLetters(when);
        finish(when);
        return !survived;
    }

    /// The other machine says nothing more in the middle of a letter.
    void endWhileItHangs() {
        std::promise<void> isHanging;
        std::promise<void> isOver;
        ServiceProcess service(arguments());
        server_->relay().onPiece([&](int number) {
            if (number == AMONG_FILES) {
                isHanging.set_value();
                isOver.get_future().wait();
            }
            return true;
        });
        begin(service);
        isHanging.get_future().wait();
        service.signal(SIGTERM);
        EXPECT_EQ(service.wait(), 0);
        isOver.set_value();
        server_->relay().onPiece({});
        takeLetters("ended");
        finish("ended");
    }

private:
    /// A piece that is one of a file: what goes before are a greeting, keys and a user.
    static constexpr int AMONG_FILES = 60;

    void TestBody() override {}

    json::Object shopCarrier() const override {
        return {{"type", "sftp"},
                {"url", server_->url()},
                {"host_key", server_->hostKey()},
                {"identity_file", server_->identityFile().string()}};
    }

    std::optional<SshServer> server_;
};

/// Letters that another side counts, which never has one twice.
class CountedLetters : public CarriedLetters {
public:
    explicit CountedLetters(std::string const& channel)
        : CountedLetters(channel, lettersOf("s1", {channel, channel, channel, channel})) {}
    CountedLetters(std::string channel, Mailing::Metadata const& mailing) : channel_(std::move(channel)) {
        storeMailing(folder_ / "counted.db", mailing);
    }

    /// False when the service got to the end alive.
    virtual bool killedAt(int call) {
        std::string const when = "killed at call " + std::to_string(call);
        bool survived = false;
        {
            ServiceProcess service(arguments(),
                                   Faults::environmentOf({"durable", 0, call}, folder_ / "calls"));
            survived = service.port() != 0 && send(service);
            service.signal(SIGKILL);
            service.wait();
        }
        ServiceProcess const service(arguments(),
                                     Faults::environmentOf({"durable", 0, 0}, folder_ / "calls"));
        EXPECT_TRUE(send(service)) << when;
        requireOnce(told(*clientOf(service, data_)), when);
        return !survived;
    }

protected:
    /// The settings of the channel's carrier.
    virtual json::Object carrier() const = 0;
    virtual json::Object carriers() const { return json::Object{{channel_.c_str(), carrier()}}; }
    /// How often the other side has had each, by its key.
    virtual std::map<std::string, int> times() const = 0;

    void begin(Channel::Client& client) const {
        client.call<Ipc::SetSvcCfg>(json::Object{{"carriers", carriers()}});
        client.call<Ipc::ProcessPack>(folder_.path().string(), "counted.db", "s1");
        client.call<Ipc::UploadQueued>(folder_.path().string(), "counted.db");
    }
    /// Whether nothing is under way any more.
    testing::AssertionResult send(ServiceProcess const& service) const {
        try {
            auto const client = clientOf(service, data_);
            begin(*client);
            auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(60);
            while (isUnderWay(told(*client)) && std::chrono::steady_clock::now() < end) {
            }
            std::string const states = told(*client);
            return (isUnderWay(states) ? testing::AssertionFailure() : testing::AssertionSuccess()) << states;
        } catch (std::exception const& failure) {
            return testing::AssertionFailure() << failure.what();
        }
    }
    static bool isUnderWay(std::string const& states) {
        return std::ranges::any_of(
            std::initializer_list<char const*>{"accepted:", "queued:", " waiting", "handed over", " held"},
            [&](char const* state) { return states.find(state) != states.npos; });
    }

    virtual void requireOnce(std::string const& states, std::string const& when) const {
        std::map<std::string, int> const had = times();
        std::istringstream words(states);
        std::string state;
        words >> state >> state;
        int uncertain = 0;
        for (int letter = 1; words >> state; ++letter) {
            auto const found = had.find("s1-" + std::to_string(letter));
            int const known = found == had.end() ? 0 : found->second;
            uncertain += state == "uncertain" ? 1 : 0;
            EXPECT_TRUE(known == 1 || (known == 0 && state == "uncertain"))
                << letter << ' ' << state << ' ' << known << ' ' << when;
        }
        EXPECT_LE(uncertain, 1) << when;
    }

private:
    void TestBody() override {}

    std::string channel_;
};

/// By a program.
class CommandedLetters : public CountedLetters {
public:
    CommandedLetters() : CountedLetters("sms") { setProgram("echo $1 >>had"); }

    /// Ends the service while the program has the first letter.
    void endWithALetterOnItsWay() {
        setProgram("echo $1 >>had; until [ -e go ]; do :; done");
        ServiceProcess service(arguments());
        auto const client = clientOf(service, data_);
        begin(*client);
        while (textOf(folder_ / "had").empty()) {
        }
        service.signal(SIGTERM);
        std::ofstream(folder_ / "go").close();
        EXPECT_EQ(service.wait(), 0);
    }
    void goOn() {
        ServiceProcess const service(arguments());
        EXPECT_TRUE(send(service));
        EXPECT_EQ(told(*clientOf(service, data_)), "s1 lodged: accepted accepted accepted accepted\n");
        EXPECT_EQ(textOf(folder_ / "had"), "s1-1\ns1-2\ns1-3\ns1-4\n");
    }

private:
    json::Object carrier() const override {
        return {{"type", "command"},
                {"program", program_.string()},
                {"arguments", parse(R"({"all":["{key}"]})").get("all")}};
    }
    std::map<std::string, int> times() const override {
        std::map<std::string, int> times;
        std::istringstream had(textOf(folder_ / "had"));
        for (std::string key; had >> key;)
            ++times[key];
        return times;
    }
    void setProgram(std::string const& script) const {
        std::ofstream(program_) << "#!/bin/sh\ncd '" + folder_.path().string() + "'\n" + script + '\n';
        fs::permissions(program_, fs::perms::owner_all);
    }

    fs::path program_ = folder_ / "program";
};

/// By a server of e-mail.
class MailedLetters : public CountedLetters {
public:
    explicit MailedLetters(std::string const& server = "{}")
        : CountedLetters("email"), server_(folder_ / "mails", parse(server)) {}

    std::string missing() const { return server_.missing(); }

    /// The server takes the first letter and says nothing.
    void killWhileTheServerHasALetter() {
        ServiceProcess service(arguments());
        auto const client = clientOf(service, data_);
        begin(*client);
        server_.awaitMessage();
        service.signal(SIGKILL);
        service.wait();
    }
    /// The same, and the service is to end.
    void endWhileTheServerHasALetter() {
        ServiceProcess service(arguments());
        auto const client = clientOf(service, data_);
        begin(*client);
        server_.awaitMessage();
        service.signal(SIGTERM);
        EXPECT_EQ(service.wait(), 0);
    }
    void goOn() {
        ServiceProcess const service(arguments());
        EXPECT_TRUE(send(service));
        // As clients are told that do not ask for the state "delivering".
        EXPECT_EQ(told(*clientOf(service, data_)), "s1 submitted: uncertain accepted accepted accepted\n");
        EXPECT_EQ(server_.messages().size(), 4U);
    }

private:
    json::Object carrier() const override {
        return {{"type", "smtp"},     {"url", server_.url()},      {"from", "bills@acme.example"},
                {"subject", "{key}"}, {"to", "{key}@example.com"}, {"starttls", false}};
    }
    std::map<std::string, int> times() const override {
        std::map<std::string, int> times;
        for (std::string const& message : server_.messages())
            ++times[message.substr(message.find('\n') + 1, 4)];
        return times;
    }

    VLServiceTest::SmtpServer server_;
};

/// Letters that go to a print shop, of which somebody is told by e-mail, and their sender.
class LettersWithNotices : public CountedLetters {
public:
    LettersWithNotices() : CountedLetters("postal", mailing()), server_(folder_ / "mails", {}) {}

    std::string missing() const { return server_.missing(); }

private:
    static Mailing::Metadata mailing() {
        Mailing::Metadata mailing =
            lettersOf("s1", {"postal", "postal"},
                      R"("confirmation_email": true, "customer_email": "office@acme.example", )");
        addField(mailing.letters.at(1), "notify", "ada@example.org", -1);
        return mailing;
    }
    json::Object carrier() const override { return shopCarrier(); }
    json::Object carriers() const override {
        return {{"postal", carrier()},
                {"email", json::Object{{"type", "smtp"},
                                       {"url", server_.url()},
                                       {"from", "bills@acme.example"},
                                       {"subject", "{key}"},
                                       {"starttls", false}}}};
    }
    /// By their Message-IDs.
    std::map<std::string, int> times() const override {
        constexpr std::string_view ID = "Message-Id: <";
        std::map<std::string, int> times;
        for (std::string const& message : server_.messages()) {
            std::size_t const at = message.find(ID) + ID.size();
            ++times[message.substr(at, message.find('@', at) - at)];
        }
        return times;
    }
    void requireOnce(std::string const& states, std::string const& when) const override {
        EXPECT_THAT(states, testing::StartsWith("s1 lodged: accepted accepted notice ")) << when;
        std::map<std::string, int> const had = times();
        int uncertain = 0;
        int number = 0;
        for (std::size_t at = 0; (at = states.find("notice ", at)) != states.npos; ++at) {
            auto const found = had.find("s1-n" + std::to_string(++number));
            int const known = found == had.end() ? 0 : found->second;
            bool const isUncertain = states.substr(at).starts_with("notice uncertain");
            uncertain += isUncertain ? 1 : 0;
            EXPECT_TRUE(known == 1 || (known == 0 && isUncertain)) << states << known << ' ' << when;
        }
        EXPECT_EQ(number, 2) << when;
        EXPECT_LE(uncertain, 1) << when;
    }

    VLServiceTest::SmtpServer server_;
};

/// That a server of e-mail refuses, so that a program gets them.
class LettersThatFellBack : public CountedLetters {
public:
    LettersThatFellBack()
        : CountedLetters("email", mailing()),
          server_(folder_ / "mails", parse(R"({"replies":{"RCPT":"550 no"}})")) {
        std::ofstream(program_) << "#!/bin/sh\necho $1 >>'" + (folder_ / "had").string() + "'\n";
        fs::permissions(program_, fs::perms::owner_all);
    }

    std::string missing() const { return server_.missing(); }

private:
    static Mailing::Metadata mailing() {
        Mailing::Metadata mailing =
            lettersOf("s1", {"email", "email", "email", "email"}, R"("production": {"fallback": ["sms"]}, )");
        for (Mailing::MailedLetter& letter : mailing.letters)
            addField(letter, "sms", "+49 341 1", 1);
        return mailing;
    }
    json::Object carrier() const override {
        return {{"type", "smtp"},     {"url", server_.url()},      {"from", "bills@acme.example"},
                {"subject", "{key}"}, {"to", "{key}@example.com"}, {"starttls", false}};
    }
    json::Object carriers() const override {
        return {{"email", carrier()},
                {"sms", json::Object{{"type", "command"},
                                     {"program", program_.string()},
                                     {"arguments", parse(R"({"all":["{key}"]})").get("all")}}}};
    }
    std::map<std::string, int> times() const override {
        std::map<std::string, int> times;
        std::istringstream had(textOf(folder_ / "had"));
        for (std::string key; had >> key;)
            ++times[key];
        return times;
    }

    fs::path program_ = folder_ / "program";
    VLServiceTest::SmtpServer server_;
};

/// By a printer.
class PrintedLetters : public CountedLetters {
public:
    PrintedLetters() : CountedLetters("postal") {}

    /// False when the service got to the end alive.
    bool killedAt(int piece) override {
        std::string const when = "killed at piece " + std::to_string(piece);
        bool survived = false;
        {
            ServiceProcess service(arguments());
            printer_.relay().onPiece([&](int number) {
                if (number == piece)
                    service.signal(SIGKILL);
                return true;
            });
            survived = send(service);
            printer_.relay().onPiece({});
            service.signal(SIGKILL);
            service.wait();
        }
        ServiceProcess const service(arguments());
        EXPECT_TRUE(send(service)) << when;
        std::string const states = settled(service);
        awaitPrints(states);
        requireOnce(states, when);
        return !survived;
    }

protected:
    json::Object carrier() const override {
        return {{"type", "printer"}, {"uri", printer_.uri()}, {"retry_seconds", 1}};
    }
    std::map<std::string, int> times() const override {
        std::map<std::string, int> times;
        std::istringstream had(printer_.had());
        for (std::string word; had >> word;)
            ++times[word];
        return times;
    }

    /// A letter whose job never got its document goes on its way again once the printer has said so.
    std::string settled(ServiceProcess const& service) const {
        auto const client = clientOf(service, data_);
        auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(60);
        std::string states = told(*client);
        while (isUnderWay(states) && std::chrono::steady_clock::now() < end)
            states = told(*client);
        return states;
    }

    /// What the printer has taken it prints soon.
    void awaitPrints(std::string const& states) const {
        std::istringstream words(states);
        std::string state;
        words >> state >> state;
        auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(30);
        for (int letter = 1; words >> state; ++letter)
            while (state == "accepted" && !times().contains("s1-" + std::to_string(letter)) &&
                   std::chrono::steady_clock::now() < end) {
            }
    }

    IppPrinter printer_{folder_ / "printer", ""};
};

/// All of a mailing in one job.
class PrintedMailing : public PrintedLetters {
public:
    void printAtOnce() {
        ServiceProcess const service(arguments());
        EXPECT_TRUE(send(service));
        std::istringstream words(told(*clientOf(service, data_)));
        std::string state;
        words >> state >> state;
        int letters = 0;
        for (; words >> state; ++letters)
            EXPECT_TRUE(state == "accepted" || state == "delivered") << state;
        EXPECT_EQ(letters, 4);
        auto const end = std::chrono::steady_clock::now() + std::chrono::seconds(30);
        while (!times().contains("s1-postal") && std::chrono::steady_clock::now() < end) {
        }
        EXPECT_EQ(times()["s1-postal"], 1);
        EXPECT_FALSE(times().contains("s1-1"));
    }

private:
    json::Object carrier() const override {
        json::Object carrier = PrintedLetters::carrier();
        carrier.set("unit", "mailing");
        return carrier;
    }
};

TEST(ServiceThatIsEndedAmongLetters, FinishesThoseThatAreOnTheirWayAndPutsThemOnRecord) {
    CommandedLetters letters;
    letters.endWithALetterOnItsWay();
    letters.goOn();
}

TEST(ServiceThatIsEndedAmongLetters, GivesUpAServerOfEMailThatHangsAndTellsTheLetterAsUncertain) {
    MailedLetters letters(R"({"behind":{".":"hang once"}})");
    if (!letters.missing().empty())
        GTEST_SKIP() << letters.missing();
    auto const begin = std::chrono::steady_clock::now();
    letters.endWhileTheServerHasALetter();
    EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::seconds(120))
        << "far below the server's time";
    letters.goOn();
}

TEST(ServiceThatIsEndedAmongLetters, GivesUpAnotherMachineThatHangsAndPutsItsLettersThereLater) {
    if (!SshServer::whyNot().empty())
        GTEST_SKIP() << SshServer::whyNot();
    LettersOverSsh().endWhileItHangs();
}

TEST(LettersOfAMailing, ArePrintedAsOneJobWhereThatIsTheUnit) {
    if (!IppPrinter::whyNot().empty())
        GTEST_SKIP() << IppPrinter::whyNot();
    PrintedMailing().printAtOnce();
}

TEST(ServiceThatIsKilledAmongLetters, TellsOneAsUncertainThatAServerOfEMailHasTakenAndNotAnswered) {
    MailedLetters letters(R"({"behind":{".":"hang once"}})");
    if (!letters.missing().empty())
        GTEST_SKIP() << letters.missing();
    letters.killWhileTheServerHasALetter();
    letters.goOn();
}

/// Every fourth call, from the parameter on.
class ServiceThatIsKilledAtEachCall : public testing::TestWithParam<int> {
protected:
    /// Until one gets to the end alive, which is behind `least` calls.
    template<typename Letters>
    void killEachOf(int least) {
        int call = GetParam();
        for (bool isKilled = true; isKilled && !HasFailure(); call += 4) {
            Letters letters;
            if constexpr (requires { letters.missing(); })
                if (!letters.missing().empty())
                    GTEST_SKIP() << letters.missing();
            isKilled = letters.killedAt(call);
        }
        EXPECT_GT(call, least);
    }
};

TEST_P(ServiceThatIsKilledAtEachCall, HandsEachOverUnderItsKeyAndLosesNone) {
    // Each letter is three files, which are synced, renamed and put on record.
    killEachOf<OneKillAmongLetters>(100);
}

TEST_P(ServiceThatIsKilledAtEachCall, PutsEachToAnotherMachineUnderItsKeyAndLosesNone) {
    if (!SshServer::whyNot().empty())
        GTEST_SKIP() << SshServer::whyNot();
    // A greeting, keys, a user, and three files of each letter.
    killEachOf<LettersOverSsh>(100);
}

TEST_P(ServiceThatIsKilledAtEachCall, GivesNoneToAProgramTwiceAndTellsOfOneAsUncertainAtMost) {
    killEachOf<CommandedLetters>(40);
}

TEST_P(ServiceThatIsKilledAtEachCall, MailsNoneTwiceAndTellsOfOneAsUncertainAtMost) {
    killEachOf<MailedLetters>(40);
}

TEST_P(ServiceThatIsKilledAtEachCall, GivesThoseThatAreRefusedToTheNextChannelOnce) {
    killEachOf<LettersThatFellBack>(40);
}

TEST_P(ServiceThatIsKilledAtEachCall, TellsOfWhatWasHandedOverOnceAtMost) {
    killEachOf<LettersWithNotices>(40);
}

TEST_P(ServiceThatIsKilledAtEachCall, PrintsNoneTwiceAndTellsOfOneAsUncertainAtMost) {
    if (!IppPrinter::whyNot().empty())
        GTEST_SKIP() << IppPrinter::whyNot();
    killEachOf<PrintedLetters>(40);
}

INSTANTIATE_TEST_SUITE_P(AmongLetters, ServiceThatIsKilledAtEachCall, testing::Range(1, 5));

} // namespace

// Pages on their way to the service: from any machine, through broken connections and killed programs.
#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/base/read_file.h"
#include "programs/channel/stream.h"
#include "programs/mailing/container_writer.h"
#include "programs/mailing/metadata.h"
#include "programs/protocol/letter_register.h"
#include "programs/vlmail/mailings/pack_delivery.h"
#include "programs/vlmail/service/service_client.h"
#include "tests/channel/test_certificate.h"
#include "tests/faults/fault.h"
#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"
#include "tests/support/two_networks.h"
#include "tests/vlmail/run_vlmail.h"
#include "tests/vlserviced/sent_pack.h"
#include "tests/vlserviced/service_process.h"
#include "vlservice/ipc/cs_config_ids_list.h"
#include "vlservice/ipc/process_pack.h"
#include "vlservice/ipc/set_svc_cfg.h"
#include "vlservice/platform/local_time.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <csignal>
#include <ctime>
#include <fstream>
#include <map>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>
#include <utility>

namespace {

namespace fs = std::filesystem;

using testing::HasSubstr;
using testing::StartsWith;

/// A page that does not compress.
std::string noise(std::size_t size, unsigned seed) {
    std::string text(size, '\0');
    for (char& byte : text)
        byte = static_cast<char>((seed = seed * 1'664'525 + 1'013'904'223) >> 24);
    return text;
}

class Upload : public testing::Test {
protected:
    static constexpr int PAGES = 12;
    static constexpr std::size_t PAGE_SIZE = 700'000;

    Upload() { fs::create_directory(folder_ / "upload"); }

    std::vector<std::string> arguments() const { return {"--data", data_.string(), "--no-discovery"}; }
    void restart() {
        service_->signal(SIGKILL);
        service_->wait();
        service_.emplace(arguments());
    }
    VlMail::ServiceLine line(std::chrono::milliseconds patience = std::chrono::seconds(60)) {
        return VlMail::ServiceLine([this] { return clientOf(*service_, data_); },
                                   {patience, std::chrono::milliseconds(1)});
    }
    Ran vlmail(std::vector<std::string> arguments) {
        arguments.insert(arguments.end(), {"--service", "127.0.0.1:" + std::to_string(service_->port()),
                                           "--token", (data_ / "token").string()});
        return runVlMail(arguments);
    }
    std::string output(std::vector<std::string> const& arguments) {
        Ran const ran = vlmail(arguments);
        EXPECT_EQ(ran.status, VlMail::FINE) << ran.err;
        return ran.out;
    }

    /// Stores a pack of some MiB.
    void storeLarge(std::string const& id) {
        Mailing::PackDatabaseWriter writer(database_, {id, "a=acme", "Title of " + id});
        for (int i = 0; i < PAGES; ++i)
            writer.savePage("one.pdf", std::to_string(i + 1),
                            zipped(noise(PAGE_SIZE, static_cast<unsigned>(i))));
        writer.finish(zipped(R"({"pack_preset": "Bills", "id": ")" + id +
                             R"(", "created": 1, "letters": [{"documents": [{"name": "one.pdf", "pages": )"
                             R"([1, 2, 3]}], "fields": []}]})"));
    }
    /// That the container in the outbox is the pack, whole.
    void expectWhole(std::string const& id) const {
        PackWrapper container((data_ / "outbox" / (id + ".mailing")).string(), PackWrapper::PURPOSE_IMPORT,
                              "");
        ASSERT_EQ(container.szBins(), PAGES + 1u);
        for (int i = 0; i < PAGES; ++i)
            EXPECT_TRUE(unzipped(container.binData(static_cast<unsigned>(i))) ==
                        noise(PAGE_SIZE, static_cast<unsigned>(i)))
                << i;
    }
    std::size_t jobs() {
        auto const client = clientOf(*service_, data_);
        return Protocol::JobsAnswer(VlMail::ask(*client, Protocol::JobsQuery())).jobs.size();
    }
    /// How many pages of a pack the service has.
    long long have(std::string const& id) {
        Mailing::OwnPackReader pack(database_, id);
        Protocol::BeginPack question = VlMail::beginningOf(pack);
        question.asks = true;
        auto const client = clientOf(*service_, data_);
        return Protocol::BeginPackAnswer(VlMail::ask(*client, question)).have;
    }

    TemporaryFolder folder_;
    fs::path data_ = folder_ / "data";
    fs::path database_ = folder_ / "packs.db";
    std::optional<ServiceProcess> service_{std::in_place, arguments()};
};

TEST_F(Upload, BringsAPackToAServiceThatReadsNoPaths) {
    storeLarge("p1");
    auto toService = line();
    EXPECT_EQ(VlMail::deliverPack(toService, database_, "p1", false).state, Protocol::JobState::Queued);
    expectWhole("p1");
    EXPECT_TRUE(Mailing::finishedPacks(database_).empty()) << "it stays with the client";
    EXPECT_THAT(failureOf([&] {
                    storePack(database_, "p2");
                    VlMail::sendPack(toService.client(), database_, "p2", false);
                }),
                HasSubstr("start vlserviced with --local-packs FOLDER"));
}

TEST_F(Upload, GoesOnWhereItWasWhenTheServiceIsKilledAtAnyPage) {
    storeLarge("p1");
    auto toService = line();
    long long restarts = 0;
    VlMail::deliverPack(toService, database_, "p1", false, [&](long long done, long long all) {
        // Each time that a sixth of it is under way.
        if (done > (restarts + 1) * all / 6 && restarts < 5) {
            ++restarts;
            restart();
        }
    });
    // What was under way may be there behind a restart, so that several sixths are done at once.
    EXPECT_GE(restarts, 2);
    expectWhole("p1");
    EXPECT_EQ(jobs(), 1u);
}

TEST_F(Upload, GoesOnWhereItWasWhenTheConnectionIsCutAtAnyMessage) {
    for (int cutAt = 0; cutAt <= PAGES; ++cutAt) {
        std::string const id = "p" + std::to_string(cutAt);
        storeLarge(id);
        auto toService = line();
        int messages = 0;
        VlMail::deliverPack(toService, database_, id, false, [&](long long, long long) {
            if (messages++ == cutAt)
                throw Base::Error(Base::Code::ConnectionLost, "cut");
        });
        EXPECT_GT(messages, PAGES) << "nothing was cut";
        expectWhole(id);
    }
    EXPECT_EQ(jobs(), PAGES + 1u);
}

TEST_F(Upload, IsGoneOnWithWhenTheClientWasKilled) {
    storeLarge("p1");
    pid_t const child = ::fork();
    if (child == 0) {
        auto toService = line();
        VlMail::deliverPack(toService, database_, "p1", false, [&](long long done, long long all) {
            if (done > all / 2 && have("p1") > 0)
                ::raise(SIGKILL);
        });
        ::_exit(0);
    }
    int status = 0;
    ::waitpid(child, &status, 0);
    ASSERT_TRUE(WIFSIGNALED(status));
    long long const there = have("p1");
    EXPECT_GT(there, 0);
    EXPECT_LT(there, PAGES);
    long long sent = 0;
    auto toService = line();
    VlMail::deliverPack(toService, database_, "p1", false, [&](long long done, long long) { sent = done; });
    EXPECT_LT(sent, static_cast<long long>((PAGES - there + 1) * PAGE_SIZE * 1.1)) << "pages went twice";
    expectWhole("p1");
    EXPECT_EQ(jobs(), 1u);
}

TEST_F(Upload, GivesUpWhenTheServiceStaysAwayAndSaysSoOnce) {
    storeLarge("p1");
    auto toService = line(std::chrono::milliseconds(50));
    service_->signal(SIGKILL);
    service_->wait();
    EXPECT_THAT(
        failureOf([&] { VlMail::deliverPack(toService, database_, "p1", false); }),
        StartsWith("mailing p1: 127.0.0.1:" + std::to_string(service_->port()) + ": Nobody answers there"));
    EXPECT_EQ(Mailing::finishedPacks(database_).size(), 1u);
}

TEST_F(Upload, AsksWhetherAPackWasAcceptedBeforeItSaysThatItFailed) {
    storeLarge("p1");
    Mailing::OwnPackReader pack(database_, "p1");
    // Another one has brought it there meanwhile.
    auto toService = line(std::chrono::milliseconds(0));
    bool isBrought = false;
    VlMail::uploadPack(toService, pack, [&](long long, long long) {
        if (!std::exchange(isBrought, true)) {
            auto other = line();
            Mailing::OwnPackReader same(database_, "p1");
            VlMail::uploadPack(other, same);
        }
    });
    EXPECT_TRUE(isBrought);
    EXPECT_EQ(jobs(), 1u);
}

TEST_F(Upload, OfTwoClientsWithOnePackIsMadeOnce) {
    storeLarge("p1");
    fs::copy_file(database_, folder_ / "copy.db");
    std::vector<std::thread> clients;
    std::atomic<int> delivered = 0;
    for (fs::path const& database : {database_, folder_ / "copy.db"})
        clients.emplace_back([&, database] {
            auto toService = line();
            for (int attempt = 0; attempt < 100; ++attempt) {
                try {
                    VlMail::deliverPack(toService, database, "p1", false);
                    ++delivered;
                    return;
                } catch (Base::Error const& failure) {
                    EXPECT_THAT(failure.what(), HasSubstr("another one goes on with it"));
                }
            }
        });
    for (std::thread& client : clients)
        client.join();
    EXPECT_EQ(delivered, 2);
    EXPECT_EQ(jobs(), 1u);
    expectWhole("p1");
}

TEST_F(Upload, RefusesAPackOfTheSameIdWithOtherPages) {
    storeLarge("p1");
    auto toService = line();
    VlMail::deliverPack(toService, database_, "p1", false);
    storePack(database_, "p1");
    EXPECT_THAT(failureOf([&] { VlMail::deliverPack(toService, database_, "p1", false); }),
                HasSubstr("there is another pack p1 with other pages"));
    EXPECT_EQ(Mailing::finishedPacks(database_).size(), 1u);
}

TEST_F(Upload, HoldsTheQuotaOfTheNodesSettings) {
    clientOf(*service_, data_)->call<Ipc::SetSvcCfg>(parse(R"({"quota":{"a=acme":1}})"));
    storeLarge("p1");
    auto toService = line();
    EXPECT_THAT(
        failureOf([&] { VlMail::deliverPack(toService, database_, "p1", false); }),
        HasSubstr("node a=acme may have 1 MiB of packs with the service at once, and has 0 MiB: pack p1 "
                  "of 9 MiB is not taken before some of them were handed over"));
}

TEST_F(Upload, LeavesNothingOfALetterWhenItIsHandedOver) {
    clientOf(*service_, data_)
        ->call<Ipc::SetSvcCfg>(json::Object{{"upload_folder", (folder_ / "upload").string()}});
    storeLarge("p1");
    auto toService = line();
    VlMail::deliverPack(toService, database_, "p1", true);
    while (output({"status", "p1", "--json"}).find(R"("state":"submitted")") == std::string::npos)
        std::this_thread::yield();
    service_->signal(SIGTERM);
    EXPECT_EQ(service_->wait(), 0);
    // The next start finishes what the end of the first one has left.
    service_.emplace(arguments());
    auto const bytesOf = [](fs::path const& file) {
        std::ifstream in(file, std::ios::binary);
        return std::string(std::istreambuf_iterator<char>(in), {});
    };
    std::string const letter = noise(PAGE_SIZE, 3).substr(1000, 40);
    SharedMemBuffer const blob = zipped(noise(PAGE_SIZE, 3));
    std::string const stored(reinterpret_cast<char const*>(blob.data()) + 5000, 40);
    EXPECT_THAT(bytesOf(folder_ / "upload/p1.mailing"), HasSubstr(stored)) << "it is what would be found";
    auto const isThere = [&] {
        for (fs::directory_entry const& entry : fs::recursive_directory_iterator(data_))
            if (entry.is_regular_file()) {
                std::string const bytes = bytesOf(entry.path());
                if (bytes.find(stored) != std::string::npos || bytes.find(letter) != std::string::npos)
                    return true;
            }
        return false;
    };
    for (auto const end = std::chrono::steady_clock::now() + std::chrono::minutes(1);
         isThere() && std::chrono::steady_clock::now() < end;)
        std::this_thread::yield();
    EXPECT_FALSE(isThere());
}

// --- the commands

class SendingFiles : public Upload {
protected:
    std::string container(std::string const& id) {
        fs::path const file = folder_.path() / (id + ".mailing");
        Mailing::ContainerWriter writer(file, id);
        writer.savePage("one.pdf", "1", zipped("first page of " + id));
        writer.savePage("one.pdf", "2", zipped("second page of " + id));
        writer.savePage("two.pdf", "1", zipped("third page of " + id));
        writer.finish(zipped(metadataText(id)), "");
        return file.string();
    }
};

TEST_F(SendingFiles, BringsThemOnTheirWayOnce) {
    std::string const one = container("m1");
    std::string const two = container("m2");
    EXPECT_EQ(output({"send", one, two, "--node", "bob/acme"}), "m1, queued\nm2, queued\n");
    EXPECT_EQ(contentOf(data_ / "outbox/m1.mailing"), contentOfPack("m1"));
    EXPECT_EQ(output({"send", one, "--node", "bob/acme", "--json"}),
              R"({"mailings":[{"file":")" + one +
                  R"(","id":"m1","state":"queued"}],"failures":[]})"
                  "\n");
    EXPECT_EQ(jobs(), 2u);
    std::string const status = output({"status", "m1", "--json"});
    EXPECT_THAT(
        status,
        HasSubstr(
            R"("title":"metadata of m1","cfg_id":"u=bob/a=acme","db_host":"channel","db_name":"packs")"));
}

TEST_F(SendingFiles, HandsOnTheirOwnJobAlone) {
    clientOf(*service_, data_)
        ->call<Ipc::SetSvcCfg>(json::Object{{"upload_folder", (folder_ / "upload").string()}});
    EXPECT_EQ(output({"send", container("m1")}), "m1, queued\n");
    output({"send", container("m2"), "--upload"});
    while (!fs::exists(folder_ / "upload/m2.mailing"))
        std::this_thread::yield();
    EXPECT_FALSE(fs::exists(folder_ / "upload/m1.mailing"));
}

TEST_F(SendingFiles, TellsEachThatCannotBeSent) {
    std::string const good = container("m1");
    std::string const bad = container("m2");
    {
        std::fstream file(bad, std::ios::in | std::ios::out | std::ios::binary);
        file.seekp(100);
        file << "XXXX";
    }
    Ran const ran = vlmail({"send", bad, "/missing.mailing", good});
    EXPECT_EQ(ran.status, VlMail::FAILED);
    EXPECT_EQ(ran.out, "m1, queued\n");
    EXPECT_THAT(ran.err, HasSubstr("vlmail: cannot send \"" + bad + "\": "));
    EXPECT_THAT(ran.err, HasSubstr("; \"vlmail pack verify\" tells all that is damaged [mailing-damaged]\n"));
    EXPECT_THAT(ran.err, HasSubstr("vlmail: cannot read \"/missing.mailing\": "));
    EXPECT_THAT(vlmail({"send", good, "--node", "other"}).err,
                HasSubstr("there is another pack m1 with other pages: give this one an id of its own"));
}

/// Letters that are mailed straight from documents.
class SendingLetters : public Upload {
protected:
    SendingLetters() {
        ::setenv("XDG_DATA_HOME", (folder_ / "home").c_str(), 1);
        std::ofstream(folder_ / "presets.json")
            << R"({"presets": {"extract_presets": [{"match": ".*", "pack_preset": "Bills", "zones": [)"
               R"({"name": "Page", "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, )"
               R"("fields": [{"name": "postal", "value_extract": "^To: (?<VAL>.*)$", "priority": 1, )"
               R"("send_to_server": true}]}]}], "pack_presets": [{"name": "Bills", "title": "Bills"}]}})";
        std::ofstream(folder_ / "a.txt") << "To: Ada\n";
    }
    ~SendingLetters() override { ::unsetenv("XDG_DATA_HOME"); }

    std::vector<std::string> mailing(char const* file = "a.txt") {
        return {"mail",       (folder_ / file).string(),           "--send", "--node", "a=acme",
                "--settings", (folder_ / "presets.json").string(), "--jobs", "1",      "--json"};
    }
    static std::string idIn(std::string const& mailed) {
        return parse(mailed).get("mailings").toArray().at(0).toObject().get("id").textOrEmpty();
    }
    fs::path ownPacks() const { return folder_ / "home/vlmail/packs.db"; }
};

TEST_F(SendingLetters, GoesOnWithARunThatWasNotFinished) {
    // A service that takes nothing is one that the first run does not reach.
    clientOf(*service_, data_)->call<Ipc::SetSvcCfg>(parse(R"({"disabled":["a=acme"]})"));
    EXPECT_EQ(vlmail(mailing()).status, VlMail::FAILED);
    auto const left = Mailing::finishedPacks(ownPacks());
    ASSERT_EQ(left.size(), 1u);
    clientOf(*service_, data_)->call<Ipc::SetSvcCfg>(parse(R"({"disabled":null})"));
    EXPECT_EQ(idIn(output(mailing())), left.front().info.id);
    EXPECT_TRUE(Mailing::finishedPacks(ownPacks()).empty());
    EXPECT_EQ(jobs(), 1u);
    EXPECT_EQ(vlmail(mailing()).status, VlMail::INCOMPLETE) << "a run that was finished is no such run";
    EXPECT_EQ(jobs(), 1u);
}

TEST_F(SendingLetters, SendsNothingTwiceWhenTheClientDiedBeforeItLearnedOfItsSuccess) {
    clientOf(*service_, data_)->call<Ipc::SetSvcCfg>(parse(R"({"disabled":["a=acme"]})"));
    EXPECT_EQ(vlmail(mailing()).status, VlMail::FAILED);
    clientOf(*service_, data_)->call<Ipc::SetSvcCfg>(parse(R"({"disabled":null})"));
    std::string const id = Mailing::finishedPacks(ownPacks()).front().info.id;
    {
        // What the service takes here, the client never marks as taken.
        Mailing::OwnPackReader pack(ownPacks(), id);
        auto toService = line();
        VlMail::uploadPack(toService, pack);
    }
    std::ofstream(folder_ / "b.txt") << "To: Bob\n";
    output(mailing("b.txt"));
    EXPECT_EQ(jobs(), 2u);
    EXPECT_EQ(idIn(output(mailing())), id);
    EXPECT_EQ(jobs(), 2u);
}

TEST_F(SendingLetters, MailsOtherLettersUnderAnIdOfTheirOwn) {
    clientOf(*service_, data_)->call<Ipc::SetSvcCfg>(parse(R"({"disabled":["a=acme"]})"));
    vlmail(mailing());
    std::string const left = Mailing::finishedPacks(ownPacks()).front().info.id;
    clientOf(*service_, data_)->call<Ipc::SetSvcCfg>(parse(R"({"disabled":null})"));
    std::ofstream(folder_ / "a.txt") << "To: Eve\n";
    EXPECT_NE(idIn(output(mailing())), left);
    EXPECT_EQ(Mailing::finishedPacks(ownPacks()).front().info.id, left) << "it waits to be resumed";
}

// --- letters that were sent before

class LettersSentBefore : public SendingLetters {
protected:
    /// As a person reads it.
    std::vector<std::string> mailed(std::vector<std::string> const& more = {}) {
        std::vector<std::string> arguments = mailing();
        arguments.pop_back();
        arguments.insert(arguments.end(), more.begin(), more.end());
        return arguments;
    }
    static std::string today() {
        std::string date = LocalTime::toText(std::time(nullptr)).substr(0, 10);
        std::ranges::replace(date, '/', '-');
        return date;
    }
    static std::string digest(int letter) { return Base::sha256("letter " + std::to_string(letter)); }
    /// A pack whose letters have one page each, and these digests.
    void storeLetters(std::string const& id, std::vector<int> const& letters,
                      std::string const& preset = "") {
        Mailing::PackDatabaseWriter writer(database_, {id, "a=acme", "Title"});
        std::string texts;
        int page = 0;
        for (int const letter : letters) {
            ++page;
            writer.savePage("a.pdf", std::to_string(page), zipped("letter " + std::to_string(letter)));
            texts += std::string(texts.empty() ? "" : ", ") +
                     R"({"documents": [{"name": "a.pdf", "pages": [)" + std::to_string(page) +
                     R"(]}], "fields": [], "digests": [")" + digest(letter) + "\"]}";
        }
        writer.finish(zipped("{\"pack_preset\": \"Bills\", " + preset + "\"id\": \"" + id +
                             "\", \"created\": 1, \"letters\": [" + texts + "]}"));
    }
    /// Delivers it; what stayed behind.
    std::vector<std::string> deliver(std::string const& id) {
        std::vector<std::string> left;
        auto toService = line();
        try {
            VlMail::deliverPack(toService, database_, id, false, {},
                                [&](long long number, std::string const& why) {
                                    left.push_back(std::to_string(number) + ": " + why);
                                });
        } catch (VlMail::NothingToSend const&) {
            left.push_back("nothing is sent");
        }
        return left;
    }
};

TEST_F(LettersSentBefore, StayBehindWithTheirDayTheirMailingAndItsState) {
    std::string const id = idIn(output(mailing()));
    Ran const again = vlmail(mailed());
    EXPECT_EQ(again.status, VlMail::INCOMPLETE);
    EXPECT_EQ(again.out, "left out: a.txt, page 1: sent-before: " + today() + " in " + id +
                             ", queued\n1 document, 1 letter: 0 ready, 1 cannot go out\n");
    EXPECT_EQ(again.err, "");
    EXPECT_EQ(jobs(), 1u);
}

TEST_F(LettersSentBefore, GoOutAgainForAReasonThatIsOnRecord) {
    output(mailing());
    output(mailed({"--again", "lost in the post"}));
    EXPECT_EQ(jobs(), 2u);
    EXPECT_THAT(output({"history"}), HasSubstr("accepted, again: lost in the post"));
}

TEST_F(LettersSentBefore, AreOthersWhenTheySaySomethingElse) {
    output(mailing());
    std::ofstream(folder_ / "a.txt") << "To: Ada\n2026-11-20\n";
    output(mailing());
    EXPECT_EQ(jobs(), 2u);
}

TEST_F(LettersSentBefore, StayBehindTheSecondTimeInOneBatch) {
    std::ofstream(folder_ / "b.txt") << "To: Ada\n";
    Ran const ran = vlmail(mailed({(folder_ / "b.txt").string()}));
    EXPECT_EQ(ran.status, VlMail::INCOMPLETE);
    EXPECT_THAT(ran.out, HasSubstr("left out: b.txt, page 1: sent-before: in this batch, a.txt, page 1\n"));
    EXPECT_EQ(jobs(), 1u);
}

TEST_F(LettersSentBefore, MayGoOutOnceTheirMailingWasCalledBack) {
    output({"cancel", idIn(output(mailing()))});
    output(mailing());
    EXPECT_EQ(jobs(), 2u);
}

TEST_F(LettersSentBefore, AreNotLookedForWithoutAReach) {
    std::string presets = Base::readFile(folder_ / "presets.json");
    presets.replace(presets.find(R"("title": "Bills")"), 0, R"("production": {"duplicate_days": 0}, )");
    std::ofstream(folder_ / "presets.json") << presets;
    output(mailing());
    output(mailing());
    EXPECT_EQ(jobs(), 2u);
}

TEST_F(LettersSentBefore, AreLeftOutOfAPackOfWhichTheOthersGo) {
    storeLetters("p1", {1, 2});
    storeLetters("p2", {2, 3, 3});
    EXPECT_TRUE(deliver("p1").empty());
    EXPECT_THAT(deliver("p2"), testing::ElementsAre("1: sent-before: " + today() + " in p1, queued",
                                                    "3: sent-before: letter 2 of the same mailing"));
    PackWrapper container((data_ / "outbox/p2.mailing").string(), PackWrapper::PURPOSE_IMPORT, "");
    EXPECT_EQ(Mailing::Metadata::fromBlob(container.inputFullMeta()).letters.size(), 1U);
    storeLetters("p3", {3, 1});
    EXPECT_EQ(deliver("p3").back(), "nothing is sent");
    EXPECT_EQ(jobs(), 2u);
}

TEST_F(LettersSentBefore, AreRefusedByTheServiceToAClientThatDoesNotAsk) {
    storeLetters("p1", {1, 2});
    storeLetters("p2", {3, 2});
    deliver("p1");
    Mailing::OwnPackReader pack(database_, "p2");
    auto toService = line();
    EXPECT_THAT(failureOf([&] { VlMail::uploadPack(toService, pack); }),
                HasSubstr("letter 2 of pack p2 went out before: send the others without them, or all "
                          "of them with \"--again REASON\""));
    EXPECT_EQ(jobs(), 1u);
    EXPECT_EQ(deliver("p2").size(), 1U) << "the same id comes with other letters";
    EXPECT_EQ(jobs(), 2u);
}

TEST_F(LettersSentBefore, AreNoneOfMailingsThatAnOlderClientHasMade) {
    for (char const* id : {"p1", "p2"}) {
        storePack(database_, id);
        EXPECT_TRUE(deliver(id).empty());
    }
    EXPECT_EQ(jobs(), 2u);
}

TEST_F(LettersSentBefore, AreNotThoseOfThePackItself) {
    storeLetters("p1", {1});
    {
        Mailing::OwnPackReader pack(database_, "p1");
        auto toService = line();
        VlMail::uploadPack(toService, pack);
    }
    EXPECT_TRUE(deliver("p1").empty());
    EXPECT_EQ(jobs(), 1u);
}

TEST_F(LettersSentBefore, AreNoneThatWereOnlyTried) {
    storeLetters("p1", {1}, "\"process_mode\": 128, ");
    storeLetters("p2", {1});
    EXPECT_TRUE(deliver("p1").empty());
    EXPECT_TRUE(deliver("p2").empty());
    EXPECT_EQ(jobs(), 2u);
}

TEST_F(LettersSentBefore, StayBehindInMailingFilesToo) {
    std::vector<std::string> const toFolder{"mail",       (folder_ / "a.txt").string(),
                                            "--settings", (folder_ / "presets.json").string(),
                                            "-o",         (folder_ / "out").string()};
    output(mailing());
    ASSERT_EQ(runVlMail(toFolder).status, VlMail::FINE);
    fs::path const file = fs::directory_iterator(folder_ / "out")->path();
    Ran const sent = vlmail({"send", file.string(), "--node", "a=acme"});
    EXPECT_EQ(sent.status, VlMail::INCOMPLETE);
    EXPECT_THAT(sent.out,
                testing::StartsWith("left out: " + file.stem().string() + ", letter 1: sent-before: "));
    EXPECT_EQ(output({"send", file.string(), "--node", "a=acme", "--again", "he asked for it"}),
              file.stem().string() + ", queued\n");
}

class KilledAmongSentLetters : public LettersSentBefore {
protected:
    fs::path counter() const { return folder_ / "calls"; }
    /// Starts a service that is killed at its call of that number; 0 lets it live.
    void start(long call) {
        service_.reset();
        service_.emplace(arguments(), Faults::environmentOf({"durable", 0, call}, counter()));
    }
    /// Between which of its calls a service takes a mailing.
    std::pair<long, long> callsOfADelivery() {
        start(0);
        long const before = Faults::callsIn(counter());
        storeLetters("p0", {-1, -2});
        EXPECT_TRUE(deliver("p0").empty());
        return {before, Faults::callsIn(counter())};
    }
    void deliverToADyingService(std::string const& id, long call) {
        start(call);
        try {
            // The pack stays with the client, even where it has arrived and been written.
            Mailing::OwnPackReader pack(database_, id);
            auto toService = line(std::chrono::milliseconds(0));
            VlMail::uploadPack(toService, pack);
        } catch (std::exception const&) {
            // It died too early.
        }
        service_->signal(SIGKILL);
        service_->wait();
    }
    bool isOnRecord(std::string const& id) {
        auto const client = clientOf(*service_, data_);
        auto const all = Protocol::JobsAnswer(VlMail::ask(*client, Protocol::JobsQuery())).jobs;
        return std::ranges::any_of(all, [&](auto const& job) { return job.id == id; });
    }
    std::size_t known(std::vector<int> const& letters) {
        Protocol::RegisterQuery query;
        query.id = "a=acme";
        for (int const letter : letters)
            query.digests.push_back(digest(letter));
        auto const client = clientOf(*service_, data_);
        return Protocol::RegisterAnswer(VlMail::ask(*client, query)).letters.size();
    }
};

TEST_F(KilledAmongSentLetters, HasThemRegisteredWithTheirMailingOrNotAtAll) {
    auto const [first, last] = callsOfADelivery();
    ASSERT_GT(last, first);
    std::map<bool, int> rounds;
    for (int call = static_cast<int>(first) + 1; call <= last; ++call) {
        std::string const id = "p" + std::to_string(call);
        std::vector<int> const letters{2 * call, 2 * call + 1};
        storeLetters(id, letters);
        deliverToADyingService(id, call);
        start(0);
        bool const isThere = isOnRecord(id);
        ++rounds[isThere];
        EXPECT_EQ(known(letters), isThere ? letters.size() : 0) << "killed at call " << call;
        EXPECT_TRUE(deliver(id).empty()) << "killed at call " << call;
        EXPECT_EQ(known(letters), letters.size()) << "killed at call " << call;
        storeLetters("again-" + id, letters);
        EXPECT_EQ(deliver("again-" + id).back(), "nothing is sent") << "killed at call " << call;
    }
    EXPECT_EQ(rounds.size(), 2U) << "it has to die before it has the mailing, and after that";
    EXPECT_EQ(jobs(), static_cast<std::size_t>(last - first) + 1);
}

// --- another machine

/// Client and service in networks of their own, with nothing in common but the cable.
class SendingFromAnotherMachine : public testing::Test {
protected:
    void SetUp() override {
        if (!networks_.whyNot().empty())
            GTEST_SKIP() << "There is no right to make network namespaces: " << networks_.whyNot();
        TwoNetworks::Inside const inside(networks_.service());
        auto const certificate = ChannelTest::makeCertificate(there_.path().string(), "service");
        service_.emplace(std::vector<std::string>{"--data", (there_ / "data").string(), "--listen",
                                                  TwoNetworks::SERVICE_IP4, "--certificate",
                                                  certificate.certificateFile, "--key", certificate.keyFile});
        fingerprint_ = Channel::fingerprintOf(
            *Channel::makeServiceContext(certificate.certificateFile, certificate.keyFile));
        // The person carries the token over.
        fs::copy_file(there_ / "data/token", here_ / "token");
    }
    /// As a person there would type it: without naming the service.
    Ran vlmail(std::vector<std::string> arguments) {
        TwoNetworks::Inside const inside(networks_.client());
        ::setenv("XDG_DATA_HOME", (here_ / "home").c_str(), 1);
        arguments.insert(arguments.end(), {"--token", (here_ / "token").string(), "--pins",
                                           (here_ / "pins").string(), "--accept-certificate", fingerprint_});
        Ran const ran = runVlMail(arguments);
        ::unsetenv("XDG_DATA_HOME");
        return ran;
    }

    TwoNetworks networks_;
    TemporaryFolder here_;
    TemporaryFolder there_;
    std::optional<ServiceProcess> service_;
    std::string fingerprint_;
};

TEST_F(SendingFromAnotherMachine, FindsTheServiceAndUsesIt) {
    EXPECT_EQ(
        vlmail(
            {"settings", "set", "a=acme", "presets",
             R"(extract_presets=[{"match": ".*", "pack_preset": "Bills", "zones": [{"name": "Page", )"
             R"("location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": )"
             R"([{"name": "postal", "value_extract": "^To: (?<VAL>.*)$", "priority": 1, "send_to_server": true}]}]}])",
             R"(pack_presets=[{"name": "Bills"}])"})
            .err,
        "");
    std::ofstream(here_ / "a.txt") << "To: Ada\n";
    Ran const mailed =
        vlmail({"mail", (here_ / "a.txt").string(), "--send", "--node", "a=acme", "--jobs", "1"});
    EXPECT_EQ(mailed.status, VlMail::FINE) << mailed.err;
    EXPECT_THAT(mailed.out, HasSubstr(", queued\n"));
    fs::path container;
    for (fs::directory_entry const& entry : fs::directory_iterator(there_ / "data/outbox"))
        container = entry.path();
    fs::copy_file(container, here_ / "again.mailing");
    PackWrapper file(container.string(), PackWrapper::PURPOSE_IMPORT, "");
    EXPECT_EQ(file.szBins(), 2u);
    Ran const sent = vlmail({"send", (here_ / "again.mailing").string(), "--node", "a=acme"});
    EXPECT_EQ(sent.err, "");
    EXPECT_THAT(mailed.out, HasSubstr(sent.out)) << "it is there already";
}

} // namespace

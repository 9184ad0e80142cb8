// What the service keeps on record of what people have changed.

#include "tests/vlserviced/pack_help.h"
#include "tests/vlserviced/processor_fixture.h"

#include <gmock/gmock.h>

using namespace testing;
using Policy::Role;

namespace {

class HistoryTest : public ProcessorFixture {
protected:
    HistoryTest() { by_ = {"ada", Role::Admin, {}}; }

    std::string ask(std::string const& question) { return send(29, question); }
    /// "WHO NODE WHAT: WAS -> IS", one line each.
    std::string entries(std::string const& node = {}) {
        std::string lines;
        for (Protocol::HistoryEntry const& entry : history_.of(node, 1000))
            lines +=
                entry.who + ' ' + entry.id + ' ' + entry.what + ": " + entry.was + " -> " + entry.is + '\n';
        return lines;
    }
};

TEST_F(HistoryTest, TellsWhoChangedSettingsAndWhatTheyWere) {
    send(15, R"({"cfg_id":"a=acme","part":{"code":"R-1","expiry":5}})");
    by_.name = "bob";
    send(15, R"({"cfg_id":"a=acme","part":{"code":"R-2","expiry":5}})");
    send(15, R"({"cfg_id":"a=acme"})");
    send(22, R"({"cfg_id":"u=eve/a=acme"})");
    send(17, R"({"id":"u=eve/a=acme"})");
    EXPECT_EQ(entries(), "ada a=acme node:  -> added\n"
                         "ada a=acme settings po:  -> {\"code\":\"R-1\",\"expiry\":5}\n"
                         "bob a=acme settings po: {\"code\":\"R-1\"} -> {\"code\":\"R-2\"}\n"
                         "bob a=acme settings po: {\"code\":\"R-2\",\"expiry\":5} -> \n"
                         "bob u=eve/a=acme node:  -> added\n"
                         "bob u=eve/a=acme node: there -> \n");
}

TEST_F(HistoryTest, TellsOfSettingsThatWereReplacedTogether) {
    ask(R"({"query":"replace_settings","id":"a=acme","was":{},"own":{"po":{"code":"R-1"},"app":{"descr":"A"}}})");
    by_.name = "bob";
    ask(R"({"query":"replace_settings","id":"a=acme","was":{},"own":{"po":{"code":"R-2"}}})");
    ask(R"({"query":"replace_settings","id":"a=acme","was":{"po":{"code":"R-1"},"app":{"descr":"A"}},)"
        R"("own":{"po":{"code":"R-1"}}})");
    EXPECT_EQ(entries(), "ada a=acme node:  -> added\n"
                         "ada a=acme settings app:  -> {\"descr\":\"A\"}\n"
                         "ada a=acme settings po:  -> {\"code\":\"R-1\"}\n"
                         "bob a=acme settings app: {\"descr\":\"A\"} -> \n");
}

TEST_F(HistoryTest, TellsOfSettingsThatWentWithTheirNode) {
    send(15, R"({"cfg_id":"a=acme","part":{"code":"R-1"}})");
    send(22, R"({"cfg_id":"a=acme","reset_cfg":true})");
    send(15, R"({"cfg_id":"a=acme","part":{"code":"R-2"}})");
    send(17, R"({"id":"a=acme"})");
    EXPECT_THAT(entries(), AllOf(HasSubstr("ada a=acme settings po: {\"code\":\"R-1\"} -> \n"),
                                 HasSubstr("ada a=acme settings po: {\"code\":\"R-2\"} -> \n"),
                                 HasSubstr("ada a=acme node: there -> \n")));
}

TEST_F(HistoryTest, TellsOfTheServicesOwnSettings) {
    send(27, R"({"disabled":["a=old"]})");
    send(30, R"({"susp_type":2})");
    EXPECT_EQ(entries(), "ada  service settings:  -> {\"disabled\":[\"a=old\"]}\n"
                         "ada  what is held back:  -> {\"suspended\":2}\n");
}

TEST_F(HistoryTest, TellsOfTokensAndNeverWhatTheyAre) {
    std::string const answer = ask(R"({"query":"add_token","name":"office","role":"send","id":"a=acme"})");
    ask(R"({"query":"revoke_token","name":"office"})");
    EXPECT_EQ(entries(), "ada a=acme token office:  -> send\nada a=acme token office: send -> \n");
    std::string const token = parse(answer).get("token").toString();
    EXPECT_THAT(ask(R"({"query":"history"})"), Not(HasSubstr(token.substr(0, 16))));
}

TEST_F(HistoryTest, TellsOfDocuments) {
    store_.add("a=acme");
    ask(R"({"query":"put_document","id":"a=acme","document":"terms.txt","sha256":)"
        R"("5a405b2218e2dd97bd33c87af5a4c21ed6b3fa09d855d7d4b817b9d122cc9d59","bytes":8,"data":"RGVhciBhbGw="})");
    ask(R"({"query":"remove_document","id":"a=acme","document":"terms"})");
    std::string const digest = "5a405b2218e2dd97bd33c87af5a4c21ed6b3fa09d855d7d4b817b9d122cc9d59";
    EXPECT_EQ(entries(), "ada a=acme document terms.txt:  -> " + digest +
                             "\nada a=acme document terms.txt: " + digest + " -> \n");
}

TEST_F(HistoryTest, TellsOfMailingsAndOfNothingInThem) {
    storePack(folder_ / "packs.db", "p1", "u=bob/a=acme");
    EXPECT_EQ(processPack("p1"), "{}");
    by_.name = "bob";
    for (char const* const action : {"hold", "release", "cancel"})
        ask(std::string(R"({"query":"change_jobs","action":")") + action + R"(","ids":["p1"]})");
    EXPECT_EQ(entries(), "ada u=bob/a=acme mailing p1:  -> accepted\n"
                         "bob u=bob/a=acme mailing p1: queued -> held, to be held\n"
                         "bob u=bob/a=acme mailing p1: held, to be held -> queued\n"
                         "bob u=bob/a=acme mailing p1: queued -> cancelled\n");
}

TEST_F(HistoryTest, TellsOfMailingsThatAreHandedOnTogether) {
    settings_.changeService(parse(R"({"upload_folder":")" + upload_.string() + "\"}"));
    EXPECT_EQ(send(20, R"({"db_host":"","db_name":""})"), "{}");
    EXPECT_EQ(entries(), "ada  mailings that wait:  -> to be handed on\n");
}

TEST_F(HistoryTest, TellsOfLettersThatAreSettled) {
    VlServiced::Job job;
    job.pack = {folder_.path().string(), "packs.db", "p1"};
    job.cfgId = "a=acme";
    jobs_.accept(job);
    jobs_.advance("p1", VlServiced::JobState::Accepted, VlServiced::JobState::Queued, 1000);
    ASSERT_TRUE(letters_.divide("p1", {{1, "postal", true}}, 1000));
    letters_.finish({{"p1", 1}}, VlServiced::LetterState::Uncertain, "lost", 1000);
    ask(R"({"query":"change_letter","id":"p1","letter":1,"action":"delivered"})");
    ask(R"({"query":"change_letter","id":"p1","letter":1,"action":"failed"})");
    EXPECT_EQ(entries(), "ada a=acme letter 1 of mailing p1: uncertain -> delivered\n");
}

TEST_F(HistoryTest, TellsOfCarriersThatArePaused) {
    send(27, R"({"carriers":{"postal":{"type":"folder","folder":")" + upload_.string() + "\"}}}");
    by_.name = "bob";
    for (char const* const action : {"pause", "pause", "resume"})
        ask(std::string(R"({"query":"change_carrier","action":")") + action + R"(","channel":"postal"})");
    EXPECT_THAT(entries(), EndsWith("bob  carrier postal: not paused -> paused\n"
                                    "bob  carrier postal: paused -> not paused\n"));
}

TEST_F(HistoryTest, IsToldToAdministratorsOfTheNodeAlone) {
    send(15, R"({"cfg_id":"u=bob/a=acme","part":{"code":"R"}})");
    send(15, R"({"cfg_id":"a=other","part":{"code":"R"}})");
    std::string const ofAcme = R"("id":"u=bob/a=acme")";
    std::string const ofOther = R"("id":"a=other")";
    by_ = {"boss", Role::Admin, "a=acme"};
    EXPECT_THAT(ask(R"({"query":"history"})"), AllOf(HasSubstr(ofAcme), Not(HasSubstr(ofOther))));
    EXPECT_THAT(ask(R"({"query":"history","id":"u=bob/a=acme"})"), HasSubstr(ofAcme));
    EXPECT_THAT(
        ask(R"({"query":"history","id":"a=other"})"),
        HasSubstr("this needs the role admin at a=other, and the token boss has the role admin at a=acme"));
    by_ = {"clerk", Role::Settings, "a=acme"};
    EXPECT_THAT(ask(R"({"query":"history"})"), StartsWith("failed: this needs the role admin"));
}

TEST_F(HistoryTest, TellsTheYoungestInTheirOrder) {
    for (int i = 0; i < 5; ++i)
        send(15, R"({"cfg_id":"a=acme","part":{"code":"R-)" + std::to_string(i) + "\"}}");
    EXPECT_EQ(ask(R"({"query":"history","limit":1})"),
              R"({"entries":[{"at":1000,"who":"ada","id":"a=acme","what":"settings po",)"
              R"("was":"{\"code\":\"R-3\"}","is":"{\"code\":\"R-4\"}"}]})");
    EXPECT_EQ(
        ask(R"({"query":"history","limit":0})"),
        R"({"err":"\"limit\" of a query for the history has to be an integer from 1 to 1000 [request-invalid]"})");
}

TEST_F(HistoryTest, TellsOfNothingThatTheServiceDoesOfItsOwn) {
    by_ = Policy::Grant::ofService();
    send(15, R"({"cfg_id":"a=acme","part":{"code":"R"}})");
    settings_.removeUnusedPresets();
    EXPECT_EQ(entries(), "");
}

TEST_F(HistoryTest, TellsOfNothingThatWasRefused) {
    send(15, R"({"cfg_id":"a=acme","part":{"cod":"R"}})");
    send(17, R"({"id":"a=acme"})");
    ask(R"({"query":"change_jobs","action":"cancel","ids":["p1"]})");
    by_.role = Role::Read;
    send(15, R"({"cfg_id":"a=acme","part":{"code":"R"}})");
    EXPECT_EQ(entries(), "");
}

TEST_F(HistoryTest, HasNoSecretsAndNoLongValues) {
    VlServiced::Recorder const recorder(history_);
    VlServiced::History::Person const acting(history_, "ada");
    recorder.note(
        "a=acme", "settings x",
        parse(
            R"({"smtp_password":"hush","carriers":{"email":{"password":"hush","password_file":"/etc/p"}}})"),
        json::Object{{"long", std::string(600, 'x')}});
    std::string const told = entries();
    EXPECT_THAT(told, Not(HasSubstr("hush")));
    EXPECT_THAT(told, HasSubstr("/etc/p"));
    EXPECT_THAT(told, HasSubstr("{\"long\":\"602 bytes, SHA-256 "));
}

TEST_F(HistoryTest, IsWrittenWithTheChangeOrNeither) {
    database_->run("DROP TABLE history");
    EXPECT_THAT(send(15, R"({"cfg_id":"a=acme","part":{"code":"R"}})"), HasSubstr("no such table: history"));
    EXPECT_FALSE(store_.contains("a=acme"));
    storePack(folder_ / "packs.db", "p1");
    EXPECT_THAT(processPack("p1"), HasSubstr("no such table: history"));
    EXPECT_FALSE(jobs_.find("p1"));
    EXPECT_THAT(ask(R"({"query":"add_token","name":"office","role":"send","id":"a=acme"})"),
                HasSubstr("no such table: history"));
    EXPECT_TRUE(tokenStore_.all().empty());
}

TEST_F(HistoryTest, IsKeptForTenYears) {
    VlServiced::History::Person const acting(history_, "ada");
    history_.note("a=acme", "node", "", "added");
    long long now = 1000 + 3650LL * 24 * 60 * 60;
    VlServiced::History later(*database_, [&] { return now; });
    later.removeOld();
    EXPECT_NE(entries(), "");
    ++now;
    later.removeOld();
    EXPECT_EQ(entries(), "");
}

TEST_F(HistoryTest, OfJobsIsToldToListenersWhenItIsOnRecord) {
    storePack(folder_ / "packs.db", "p1");
    processPack("p1");
    std::vector<std::string> told;
    jobs_.onChange([&](std::string const& packId) {
        told.push_back(packId + ' ' + Protocol::stateName(jobs_.find(packId)->state));
    });
    jobs_.together([&] {
        jobs_.cancel("p1", 2000);
        EXPECT_TRUE(told.empty());
    });
    EXPECT_THAT(told, ElementsAre("p1 cancelled"));
    EXPECT_THROW(jobs_.together([&] {
        jobs_.fail("p1", "x", 3000);
        throw std::runtime_error("no room");
    }),
                 std::runtime_error);
    EXPECT_THAT(told, SizeIs(1));
    EXPECT_EQ(jobs_.find("p1")->state, VlServiced::JobState::Cancelled);
}

class ImpactTest : public HistoryTest {
protected:
    std::string impact(std::string const& node, std::string const& part, std::string const& own) {
        return ask(R"({"query":"settings_impact","id":")" + node + R"(","part":")" + part + R"(","own":)" +
                   own + '}');
    }
};

TEST_F(ImpactTest, OfSettingsIsToldBeforeTheyAreSet) {
    store_.setPart("a=acme", "po", parse(R"({"code":"R-1"})"));
    store_.setPart("u=bob/a=acme", "po", parse(R"({"code":"R-9"})"));
    store_.add("u=eve/a=acme");
    store_.add("u=eve/a=other");
    EXPECT_EQ(impact("a=acme", "po", R"({"code":"R-2","expiry":7})"),
              R"({"nodes":[{"id":"a=acme","keys":["code","expiry"]},{"id":"u=bob/a=acme","keys":["expiry"]},)"
              R"({"id":"u=eve/a=acme","keys":["code","expiry"]}]})");
    EXPECT_EQ(impact("a=acme", "po", R"({"code":"R-1"})"), R"({"nodes":[]})");
    EXPECT_EQ(impact("u=bob/a=acme", "po", "{}"), R"({"nodes":[{"id":"u=bob/a=acme","keys":["code"]}]})");
    EXPECT_EQ(impact("a=new", "po", R"({"code":"R-1"})"), R"({"nodes":[{"id":"a=new","keys":["code"]}]})");
    EXPECT_EQ(print(store_.parts("a=acme")), R"({"po":{"code":"R-1"}})");
}

TEST_F(ImpactTest, OfListsReachesThoseWhoAddToThem) {
    store_.setPart("u=bob/a=acme", "profiles", parse(R"({"vals":[{"name":"Own"}]})"));
    EXPECT_EQ(impact("a=acme", "profiles", R"({"vals":[{"name":"Letters"}]})"),
              R"({"nodes":[{"id":"a=acme","keys":["vals"]},{"id":"u=bob/a=acme","keys":["vals"]}]})");
}

TEST_F(ImpactTest, OfWhatCannotBeSetIsRefused) {
    EXPECT_EQ(impact("a=acme", "po", R"({"cod":"R"})"),
              R"({"err":"the settings \"po\" have no key \"cod\" [setting-unknown]"})");
    EXPECT_EQ(
        impact("a=acme", "po", "1"),
        R"({"err":"\"own\" of a query for what settings would change has to be an object [request-invalid]"})");
    EXPECT_THAT(impact("a=acme", "x", "{}"), StartsWith(R"({"err":"there are no settings \"x\")"));
}

TEST_F(ImpactTest, IsThatOfTheNodeAboveWhereANodeHasNoValuesOfItsOwn) {
    for (int i = 0; i < 300; ++i)
        store_.add("u=user" + std::to_string(i) + "/a=acme");
    json::Array const nodes = parse(impact("a=acme", "po", R"({"code":"R"})")).get("nodes").toArray();
    EXPECT_EQ(nodes.size(), 301u);
}

} // namespace

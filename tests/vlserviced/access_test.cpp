// What the holders of tokens may do with a service, command by command.

#include "programs/policy/rights.h"
#include "tests/vlserviced/pack_help.h"
#include "tests/vlserviced/processor_fixture.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <map>

using namespace testing;
using Policy::Role;

namespace {

class AccessTest : public ProcessorFixture {
protected:
    void actAs(Role role, std::string const& node, std::string const& name = "office") {
        by_ = {name, role, node};
    }
    std::string ask(std::string const& question) { return send(29, question); }
    /// Jobs of nodes by their pack ids.
    void accept(std::string const& packId, std::string const& node) {
        VlServiced::Job job;
        job.pack = {"/srv/" + packId, "packs.db", packId};
        job.cfgId = node;
        job.title = "Bills";
        jobs_.accept(job);
    }
    std::string jobsTold() {
        std::string ids;
        json::Array const jobs = parse(ask(R"({"query":"jobs"})")).get("jobs").toArray();
        for (json::Value const& job : jobs)
            ids.append(job.toObject().get("id").toString()).append(" ");
        return ids;
    }
    std::size_t refusedLines() const {
        return static_cast<std::size_t>(std::ranges::count_if(log_, [](std::string const& line) {
            return line.find("An attempt was refused") != std::string::npos;
        }));
    }
};

TEST(QuestionsOfTheService, HaveARightEach) {
    for (std::string const& question : VlServiced::Processor::questions())
        EXPECT_TRUE(Policy::rightFor(question)) << question;
    std::vector<std::string> const answered = VlServiced::Processor::questions();
    for (std::string const& question : Policy::knownQuestions())
        EXPECT_THAT(answered, Contains(question));
}

/// What asks for something at a node, where it names one.
std::string requestFor(int command, std::string const& node) {
    std::string const id = '"' + node + '"';
    if (command == 17)
        return "{\"id\":" + id + '}';
    return R"({"db_host":"","db_conn":"","db_name":"","id":"","cfg_id":)" + id + '}';
}

std::string questionFor(std::string const& kind, std::string const& node) {
    std::string const id = kind == "begin_pack" ? R"(","id":"p1","cfg_id":")" : R"(","id":")";
    return R"({"query":")" + kind + id + node + "\"}";
}

TEST_F(AccessTest, IsAskedForEachCommandAndEachRoleAtEachPlace) {
    std::vector<std::string> const nodes{"", "a=acme", "ou=sales/a=acme", "u=bob/ou=sales/a=acme", "a=other"};
    auto const isRefused = [](std::string const& answer) {
        return answer.starts_with("failed: this needs the role ");
    };
    std::vector<int> commands;
    for (int number = 0; number < 256; ++number)
        if (Policy::rightFor(static_cast<unsigned char>(number)))
            commands.push_back(number);
    auto const isShort = [&](int command, std::string const& node) {
        auto const right = Policy::rightFor(static_cast<unsigned char>(command));
        return !Policy::refusalOf(by_, right.value(), node).empty();
    };
    for (Role const role : Protocol::ALL_ROLES)
        for (std::string const& at : nodes)
            for (std::string const& node : nodes) {
                actAs(role, at);
                for (int const command : commands)
                    EXPECT_EQ(isRefused(send(command, requestFor(command, node))), isShort(command, node))
                        << command << ' ' << Protocol::roleName(role) << " at " << at << " for " << node;
                for (std::string const& question : Policy::knownQuestions())
                    EXPECT_EQ(isRefused(ask(questionFor(question, node))),
                              !Policy::refusalOf(by_, *Policy::rightFor(question), node).empty())
                        << question << ' ' << Protocol::roleName(role) << " at " << at << " for " << node;
            }
}

TEST_F(AccessTest, ThatIsRefusedChangesNothing) {
    actAs(Role::Send, "a=acme");
    EXPECT_EQ(
        send(10, R"({"cfg_id":"u=bob/a=acme","part":{"descr":"Bob"}})"),
        "failed: this needs the role settings at u=bob/a=acme, and the token office has the role send at "
        "a=acme: ask for a token that may (\"vlmail token add\") [not-allowed]");
    actAs(Role::Admin, "a=acme");
    EXPECT_THAT(send(30, R"({"susp_type":3})"), StartsWith("failed: this needs the role admin at the root"));
    EXPECT_FALSE(store_.contains("u=bob/a=acme"));
    EXPECT_FALSE(settings_.service().isSuspended(VlServiced::Suspended::Jobs));
}

TEST_F(AccessTest, ToJobsOfOtherNodesIsNone) {
    accept("p1", "a=acme");
    accept("p2", "u=bob/a=acme");
    accept("p3", "a=other");
    accept("p4", "ou=A=ACME/a=other");
    EXPECT_EQ(jobsTold(), "p1 p2 p3 p4 ");
    actAs(Role::Send, "a=acme");
    EXPECT_EQ(jobsTold(), "p1 p2 ");
    actAs(Role::Send, "u=bob/a=acme");
    EXPECT_EQ(jobsTold(), "p2 ");
    EXPECT_EQ(ask(R"({"query":"change_jobs","action":"cancel","ids":["p1","p9"]})"),
              R"({"jobs":[],"refused":[{"id":"p1","why":"there is no mailing p1 [mailing-unknown]"},)"
              R"({"id":"p9","why":"there is no mailing p9 [mailing-unknown]"}]})");
    EXPECT_EQ(ask(R"({"query":"change_letter","id":"p1","letter":1,"action":"resend"})"),
              R"({"err":"there is no mailing p1 [mailing-unknown]"})");
    EXPECT_EQ(jobs_.find("p1")->state, VlServiced::JobState::Accepted);
}

TEST_F(AccessTest, ToLettersOfOtherNodesIsTheirDayAlone) {
    std::string const own(64, '1');
    std::string const others(64, '2');
    accept("p1", "a=acme");
    accept("p2", "a=other");
    auto const refused = VlServiced::LetterRegister::Known::Refused;
    EXPECT_TRUE(register_.enter({"p1", "a=acme", 1000, 2000}, {{own, 1}}, refused).empty());
    EXPECT_TRUE(register_.enter({"p2", "a=other", 1000, 2000}, {{others, 1}}, refused).empty());
    actAs(Role::Send, "a=acme");
    EXPECT_EQ(ask(R"({"query":"register","id":"a=acme","digests":[")" + own + R"(",")" + others + "\"]}"),
              R"({"letters":[{"digest":")" + own + R"(","at":1000,"pack":"p1","state":"accepted"},)" +
                  R"({"digest":")" + others + R"(","at":1000,"pack":"","state":""}]})");
}

TEST_F(AccessTest, ToUploadingReachesTheJobsOfCoveredNodes) {
    settings_.changeService(parse(R"({"upload_folder":")" + upload_.string() + "\"}"));
    accept("p1", "a=acme");
    accept("p2", "a=other");
    actAs(Role::Send, "a=acme");
    EXPECT_EQ(send(20, R"({"db_host":"","db_name":""})"), "{}");
    EXPECT_TRUE(jobs_.find("p1")->toUpload);
    EXPECT_FALSE(jobs_.find("p2")->toUpload);
}

TEST_F(AccessTest, ToNodesBesideOnesOwnIsNone) {
    for (char const* const node : {"u=bob/ou=sales/a=acme", "u=eve/ou=it/a=acme", "a=other"})
        store_.add(node);
    store_.setPart("a=acme", "app", parse(R"({"descr":"Acme Ltd"})"));
    actAs(Role::Read, "ou=sales/a=acme");
    EXPECT_EQ(
        send(19, "{}"),
        R"({"id":"","descr":"","parts":[],"children":[{"id":"a=acme","descr":"","parts":[],"children":[)"
        R"({"id":"ou=sales/a=acme","descr":"","parts":[],"children":[)"
        R"({"id":"u=bob/ou=sales/a=acme","descr":"","parts":[],"children":[]}]}]}]})");
    EXPECT_EQ(
        send(18, R"({"inc_usr":"bob"})"),
        R"({"id_dtas":[{"id":"ou=sales/a=acme","descr":""},{"id":"u=bob/ou=sales/a=acme","descr":""}]})");
    EXPECT_EQ(send(18, R"({"inc_usr":"eve"})"), R"({"id_dtas":[]})");
}

TEST_F(AccessTest, ToAPackIsDecidedByTheNodeThatThePackNames) {
    storePack(folder_ / "packs.db", "p1", "a=other");
    storePack(folder_ / "packs.db", "p2", "u=bob/a=acme");
    actAs(Role::Send, "a=acme");
    EXPECT_THAT(processPack("p1"), StartsWith("failed: this needs the role send at a=other, and the token "));
    EXPECT_FALSE(jobs_.find("p1"));
    EXPECT_EQ(processPack("p2"), "{}");
    actAs(Role::Send, "a=other");
    EXPECT_THAT(processPack("p2"), StartsWith("failed: this needs the role send at u=bob/a=acme, and the "));
}

TEST_F(AccessTest, ToDocumentsIsGivenWhereTheyCount) {
    for (char const* const node : {"u=bob/ou=sales/a=acme", "a=other"})
        store_.add(node);
    auto const put = [&](std::string const& node) {
        return ask(R"({"query":"put_document","id":")" + node +
                   R"(","document":"terms.txt","sha256":)"
                   R"("5a405b2218e2dd97bd33c87af5a4c21ed6b3fa09d855d7d4b817b9d122cc9d59",)"
                   R"("bytes":8,"data":"RGVhciBhbGw="})");
    };
    std::string const piece =
        R"({"query":"document_piece","sha256":"5a405b2218e2dd97bd33c87af5a4c21ed6b3fa09d855d7d4b817b9d122cc9d59"})";
    EXPECT_THAT(put("a=acme"), HasSubstr("\"complete\":true"));
    for (auto const& [node, isTold] : std::map<std::string, bool>{{"", true},
                                                                  {"a=acme", true},
                                                                  {"u=bob/ou=sales/a=acme", true},
                                                                  {"ou=sales/a=acme", true},
                                                                  {"a=other", false}}) {
        actAs(Role::Read, node);
        EXPECT_EQ(ask(piece).find("RGVhciBhbGw=") != std::string::npos, isTold) << node;
    }
}

TEST_F(AccessTest, ThatIsRefusedIsInTheLogOnceAMinuteAndCounted) {
    long long now = 0;
    VlServiced::RefusedAttempts refused([&] { return now; });
    for (int i = 0; i < 5; ++i)
        refused.note("no");
    EXPECT_EQ(log_, std::vector<std::string>{"An attempt was refused: no"});
    now = 59;
    refused.tellWhatWasLeftOut();
    EXPECT_THAT(log_, SizeIs(1));
    now = 60;
    refused.tellWhatWasLeftOut();
    refused.tellWhatWasLeftOut();
    EXPECT_THAT(log_, ElementsAre("An attempt was refused: no",
                                  "Of attempts that were refused there were 4 more, 5 since the start"));
    now = 200;
    refused.note("nor this");
    EXPECT_THAT(log_.back(), "An attempt was refused: nor this");
    EXPECT_EQ(refused.count(), 6);
}

TEST_F(AccessTest, ThatIsRefusedOftenFillsNoLog) {
    actAs(Role::Read, "a=acme");
    for (int i = 0; i < 100; ++i)
        send(27, R"({"disabled":[]})");
    EXPECT_EQ(refusedLines(), 1u);
    EXPECT_THAT(log_, SizeIs(1));
    EXPECT_EQ(access_.refused().count(), 100);
}

TEST_F(AccessTest, WithAnIdThatIsNoneIsRefusedBeforeItsTokensAreLookedAt) {
    actAs(Role::Admin, "a=acme");
    EXPECT_THAT(send(17, "{\"id\":\"" + std::string(100'000, '/') + "\"}"),
                AllOf(StartsWith("failed: node id "), Not(HasSubstr("role"))));
}

} // namespace

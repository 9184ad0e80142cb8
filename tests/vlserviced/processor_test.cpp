#include "programs/vlserviced/processor.h"

#include "tests/vlserviced/pack_help.h"
#include "tests/vlserviced/processor_fixture.h"

namespace {

namespace fs = std::filesystem;

class ProcessorTest : public ProcessorFixture {};

TEST_F(ProcessorTest, SetsEachPartOfANode) {
    std::pair<int, char const*> const commands[] = {
        {10, R"({"max_letter_sheets":7})"},
        {12, R"({"status_update_hours":3})"},
        {13, R"({"pack_presets":[{"name":"A"},{"name":"B","erase_me":true}]})"},
        {14, R"({"vals":[{"name":"P"}]})"},
        {15, R"({"code":"C"})"},
        {16, R"({"vals":["D"]})"},
    };
    for (auto const& [id, part] : commands)
        EXPECT_EQ(send(id, R"({"cfg_id":"a=acme","part":)" + std::string(part) + "}"), "{}") << id;
    EXPECT_EQ(
        print(store_.parts("a=acme")),
        R"({"app":{"max_letter_sheets":7},"deps":{"vals":["D"]},"inet":{"status_update_hours":3},)"
        R"("po":{"code":"C"},"presets":{"pack_presets":[{"name":"A"}]},"profiles":{"vals":[{"name":"P"}]}})");
    EXPECT_EQ(send(10, R"({"cfg_id":"a=acme"})"), "{}");
    EXPECT_FALSE(store_.parts("a=acme").get("app"));
}

TEST_F(ProcessorTest, TellsUnderErrWhyAPartWasNotSet) {
    EXPECT_EQ(
        send(10, R"({"cfg_id":"acme","part":{}})"),
        R"({"err":"node id \"acme\" is not valid: wanted is a path like u=NAME/ou=GROUP/a=ACCOUNT, or the )"
        R"(same without its front [node-invalid]"})");
    EXPECT_EQ(send(10, R"({"cfg_id":"a=acme","part":{"max":1}})"),
              R"({"err":"the settings \"app\" have no key \"max\" [setting-unknown]"})");
    EXPECT_EQ(log_.back(), "Command \"Set app\" was refused: the settings \"app\" have no key \"max\"");
}

TEST_F(ProcessorTest, NeverTakesTheRootForAMissingId) {
    send(15, R"({"cfg_id":"","part":{"code":"R"}})");
    EXPECT_TRUE(send(10, R"({"part":{}})").starts_with("failed: JSON error"));
    EXPECT_EQ(send(17, "{}"), R"({"err":"the root cannot be removed [node-in-use]"})");
    EXPECT_EQ(send(17, R"({"id":7})"), R"({"err":"the root cannot be removed [node-in-use]"})");
    EXPECT_EQ(
        send(22, R"({"reset_cfg":true})"),
        R"({"err":"the root cannot be reset as a whole: set its parts to nothing one by one [request-invalid]"})");
    EXPECT_EQ(send(29, R"({"query":"settings"})"),
              R"({"err":"\"id\" of a query for settings has to be the id of a node [request-invalid]"})");
    EXPECT_EQ(print(store_.parts("")), R"({"po":{"code":"R"}})");
}

TEST_F(ProcessorTest, UpdatesResetsAndRemovesNodes) {
    EXPECT_EQ(send(22, R"({"cfg_id":"u=bob/a=acme"})"), "{}");
    EXPECT_EQ(
        send(17, R"({"id":"a=acme"})"),
        R"({"err":"node a=acme has 1 child (u=bob/a=acme): remove what is below it first [node-in-use]"})");
    send(15, R"({"cfg_id":"u=bob/a=acme","part":{"code":"C"}})");
    EXPECT_EQ(send(22, R"({"cfg_id":"u=bob/a=acme","reset_cfg":true})"), "{}");
    EXPECT_EQ(print(store_.parts("u=bob/a=acme")), "{}");
    EXPECT_EQ(send(17, R"({"id":"u=bob/a=acme"})"), "{}");
    EXPECT_EQ(send(17, R"({"id":"u=bob/a=acme"})"),
              R"({"err":"there is no node u=bob/a=acme [node-unknown]"})");
    EXPECT_EQ(send(17, R"({"id":"a=acme"})"), "{}");
    EXPECT_EQ(send(19, "{}"), R"({"id":"","descr":"","parts":[],"children":[]})");
}

TEST_F(ProcessorTest, ListsTheIdsOfAUser) {
    send(22, R"({"cfg_id":"u=bob/a=acme"})");
    send(10, R"({"cfg_id":"a=acme","part":{"descr":"Acme Ltd"}})");
    send(27, R"({"disabled":["u=bob/a=acme"]})");
    EXPECT_EQ(
        send(18, R"({"inc_usr":"bob"})"),
        R"({"id_dtas":[{"id":"a=acme","descr":"Acme Ltd"},{"id":"u=bob/a=acme","descr":"","disabled":true}]})");
    EXPECT_EQ(send(18, "{}"), R"({"id_dtas":[{"id":"a=acme","descr":"Acme Ltd"}]})");
}

TEST_F(ProcessorTest, AnswersQueriesForSettings) {
    send(15, R"({"cfg_id":"","part":{"code":"R"}})");
    EXPECT_EQ(send(29, R"({"query":"settings","id":"a=acme","parts":["po"]})"),
              R"({"id":"a=acme","known":false,"chain":["a=acme",""],"parts":{"po":{"own":{},)"
              R"("values":{"code":"R","expiry":0},"origins":{"code":"","expiry":null}}}})");
    EXPECT_EQ(
        send(29, R"({"query":"settings","id":"a=acme","parts":["p"]})"),
        R"({"err":"there are no settings \"p\"; there are app, inet, po, deps, profiles, presets [setting-unknown]"})");
    EXPECT_EQ(
        send(29, R"({"query":"settings","id":"a=acme","parts":"po"})"),
        R"({"err":"\"parts\" of a query for settings has to be an array of at most 20 texts [request-invalid]"})");
    EXPECT_EQ(
        send(29, R"({"query":"x"})"),
        R"({"err":"there is no query \"x\"; there are settings, jobs, change_jobs, documents, )"
        R"(document_piece, put_document, remove_document, change_letter, delivery_report, carriers, change_carrier, add_token, tokens, revoke_token, health, history, settings_impact, replace_settings, register, begin_pack [service-outdated]"})");
    EXPECT_EQ(
        send(29, "{}"),
        R"({"err":"there is no query \"\"; there are settings, jobs, change_jobs, documents, )"
        R"(document_piece, put_document, remove_document, change_letter, delivery_report, carriers, change_carrier, add_token, tokens, revoke_token, health, history, settings_impact, replace_settings, register, begin_pack [service-outdated]"})");
}

TEST_F(ProcessorTest, KeepsTheServicesSettings) {
    EXPECT_EQ(send(26, "{}"), R"({"outbox":")" + outbox_.string() + R"(","jobs":{}})");
    EXPECT_EQ(send(27, R"({"tariff":{"currency":"EUR","sheet":10}})"), "{}");
    EXPECT_EQ(
        send(27, R"({"x":1})"),
        R"(failed: the service has no setting "x"; there are upload_folder, tariff, carriers, disabled, quota, retention_days [setting-unknown])");
    EXPECT_EQ(send(26, "{}"),
              R"({"tariff":{"currency":"EUR","sheet":10},"outbox":")" + outbox_.string() + R"(","jobs":{}})");
}

TEST_F(ProcessorTest, EstimatesPrices) {
    EXPECT_TRUE(
        send(24, R"({"letters":[{"pages":3}]})").starts_with(R"({"err":"the service has no tariff yet)"));
    send(27, R"({"tariff":{"currency":"EUR","sheet":10}})");
    EXPECT_EQ(send(24, R"({"letters":[{"pages":3}]})"),
              R"({"currency":"EUR","total":30,"letters":[{"sheets":3,"price":30}]})");
}

TEST_F(ProcessorTest, BringsAPackFromTheDatabaseToTheUploadFolder) {
    storePack(folder_ / "packs.db", "p1");
    EXPECT_EQ(processPack("p1"), "{}");
    EXPECT_EQ(contentOf(outbox_ / "p1.mailing"), contentOfPack("p1"));
    send(27, R"({"upload_folder":")" + upload_.string() + "\"}");
    std::string const database = R"({"db_host":")" + folder_.path().string() + R"(","db_name":"packs.db"})";
    EXPECT_EQ(send(20, database), "{}");
    EXPECT_EQ(contentOf(upload_ / "p1.mailing"), contentOfPack("p1"));
    std::filesystem::remove(upload_ / "p1.mailing");
    EXPECT_EQ(send(21, database), "{}");
    EXPECT_NE(send(29, R"({"query":"jobs"})").find(R"("id":"p1","state":"lodged")"), std::string::npos);
    EXPECT_NE(send(26, "{}").find(R"("jobs":{"lodged":1})"), std::string::npos);
}

TEST_F(ProcessorTest, FailsCommandsWhoseResponseHasNoRoomForAnError) {
    EXPECT_EQ(processPack("p1"),
              "failed: there is no pack database " + (folder_ / "packs.db").string() + " [database-missing]");
    EXPECT_TRUE(
        send(20, R"({"db_host":"","db_name":""})").starts_with("failed: the service has no upload folder"));
    EXPECT_TRUE(send(25, "{}").starts_with("failed: JSON error"));
    EXPECT_TRUE(send(30, R"({"susp_type":8})").starts_with("failed: the service cannot be suspended"));
}

TEST_F(ProcessorTest, HoldsJobsBackUntilTheyMayGoOn) {
    storePack(folder_ / "packs.db", "p1");
    EXPECT_EQ(send(30, R"({"susp_type":2})"), "{}");
    EXPECT_EQ(processPack("p1"), "{}");
    EXPECT_FALSE(std::filesystem::exists(outbox_ / "p1.mailing"));
    EXPECT_EQ(send(30, "{}"), "{}");
    EXPECT_TRUE(std::filesystem::exists(outbox_ / "p1.mailing"));
}

TEST_F(ProcessorTest, HoldsReleasesAndCancelsJobs) {
    storePack(folder_ / "packs.db", "p1");
    storePack(folder_ / "packs.db", "p2");
    processPack("p1");
    processPack("p2");
    auto const change = [&](std::string const& action, std::string const& ids) {
        json::Object const answer =
            parse(send(29, R"({"query":"change_jobs","action":")" + action + R"(","ids":[)" + ids + "]}"));
        std::string told;
        for (json::Value const& job : answer.get("jobs").toArray())
            told += job.toObject().get("id").textOrEmpty() + ' ' + job.toObject().get("state").textOrEmpty() +
                    ';';
        for (json::Value const& refused : answer.get("refused").toArray())
            told += refused.toObject().get("id").textOrEmpty() + ": " +
                    refused.toObject().get("why").textOrEmpty() + ';';
        return told;
    };
    EXPECT_EQ(change("hold", R"("p1","none","p2")"),
              "p1 held;p2 held;none: there is no mailing none [mailing-unknown];");
    EXPECT_EQ(change("release", R"("p2")"), "p2 queued;");
    EXPECT_EQ(change("cancel", R"("p1")"), "p1 cancelled;");
    EXPECT_EQ(change("hold", R"("p1")"),
              "p1: it is too late to hold mailing p1: it was cancelled [state-refused];");
    EXPECT_EQ(
        send(29, R"({"query":"change_jobs","action":"stop","ids":["p1"]})"),
        R"({"err":"\"action\" of a change of jobs has to be \"hold\", \"release\", \"cancel\" or \"upload\" [request-invalid]"})");
}

} // namespace

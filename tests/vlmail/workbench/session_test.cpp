#include "programs/vlmail/workbench/session.h"

#include "programs/vlmail/workbench/document_list.h"
#include "tests/support/temporary_folder.h"
#include "tests/support/without_rights.h"
#include "tests/vlmail/workbench/session_answers.h"
#include "vlservice/json/json_text.h"

#include <boost/asio/io_context.hpp>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <gmock/gmock.h>
#include <iterator>
#include <memory>
#include <regex>
#include <string>
#include <system_error>
#include <vector>

namespace {

namespace fs = std::filesystem;
using namespace VlMail::Workbench;
using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr char const* INVOICES = R"({
  "extract_presets": [
    {"match": "invoice.*", "pack_preset": "P", "zones": [
      {"name": "All", "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": [
        {"name": "total", "value_extract": "^Total: (?<VAL>[\\d.]+) EUR$", "obligatory": true}]}]}],
  "pack_presets": [{"name": "P"}]
}
)";

class WorkbenchSession : public testing::Test {
protected:
    WorkbenchSession() { write("node.json", INVOICES); }

    fs::path path(std::string const& name) const { return folder_.path() / name; }
    void write(std::string const& name, std::string const& text) const {
        std::ofstream(path(name), std::ios::binary) << text;
    }
    std::string read(std::string const& name) const {
        std::ifstream in(path(name), std::ios::binary);
        return {std::istreambuf_iterator<char>(in), {}};
    }

    Answer answer(std::string const& what, json::Object const& query) {
        if (!session_)
            session_ = std::make_unique<Session>(io_, Folders{folder_.path()}, VlMail::JobLimits(),
                                                 settingsInFile(path("node.json")));
        return answerOf(io_, *session_, what, query);
    }
    json::Object ask(std::string const& what, json::Object const& query) {
        Answer const got = answer(what, query);
        return json::strToObject(got.body.data(), got.body.size());
    }
    std::string versionNow() { return ask("reload", {}).get("version").textOrEmpty(); }

private:
    TemporaryFolder const folder_;
    boost::asio::io_context io_{1};
    std::unique_ptr<Session> session_;
};

std::string codeIn(json::Object const& answer) {
    json::Value const error = answer.get("error");
    return error.isObject() ? error.toObject().get("code").textOrEmpty() : "";
}

TEST_F(WorkbenchSession, TellsTheDocumentsAndTheSettings) {
    fs::create_directory(path("b"));
    write("b/two.PDF", "x");
    write("one.txt", "x");
    write("one.txt.expected.json", "{}");
    json::Object const state = ask("state", {});
    EXPECT_EQ(std::regex_replace(json::toText(state.get("documents")), std::regex(R"("[\d-]+")"), "\"V\""),
              R"([{"name":"b/two.PDF","size":1,"version":"V","golden":false},)"
              R"({"name":"one.txt","size":1,"version":"V","golden":true}])");
    json::Object const settings = state.get("settings").toObject();
    EXPECT_EQ(settings.get("kind").textOrEmpty(), "file");
    EXPECT_EQ(settings.get("text").textOrEmpty(), INVOICES);
}

TEST_F(WorkbenchSession, SavesWhatStillIsWhatWasRead) {
    fs::permissions(path("node.json"), fs::perms::owner_read | fs::perms::owner_write);
    json::Object const saved = ask("save", {{"text", "{\"app\": {}}\n"}, {"version", versionNow()}});
    EXPECT_EQ(read("node.json"), "{\"app\": {}}\n");
    EXPECT_EQ(saved.get("version").textOrEmpty(), versionNow());
    EXPECT_EQ(fs::status(path("node.json")).permissions(), fs::perms::owner_read | fs::perms::owner_write);
}

TEST_F(WorkbenchSession, ShowsBothWhenSomebodyElseHasSaved) {
    std::string const version = versionNow();
    write("node.json", "{\"theirs\": 1}");
    Answer const refused = answer("save", {{"text", "{}"}, {"version", version}});
    EXPECT_EQ(refused.status, 409);
    json::Object const conflict = json::strToObject(refused.body.data(), refused.body.size());
    EXPECT_EQ(codeIn(conflict), "settings-changed");
    EXPECT_EQ(conflict.get("theirs").textOrEmpty(), "{\"theirs\": 1}");
    EXPECT_EQ(read("node.json"), "{\"theirs\": 1}");
    EXPECT_EQ(answer("save", {{"text", "{}"}, {"version", conflict.get("version")}}).status, 200);
    EXPECT_EQ(read("node.json"), "{}");
}

TEST_F(WorkbenchSession, SavesNothingThatIsNoJson) {
    EXPECT_EQ(codeIn(ask("save", {{"text", "{"}, {"version", versionNow()}})), "json-malformed");
    EXPECT_EQ(read("node.json"), INVOICES);
}

TEST_F(WorkbenchSession, KeepsTheEndsOfLinesAndFollowsALink) {
    write("real.json", "{\r\n}\r\n");
    fs::remove(path("node.json"));
    fs::create_symlink(path("real.json"), path("node.json"));
    json::Object const stored = ask("reload", {});
    EXPECT_EQ(stored.get("text").textOrEmpty(), "{\n}\n");
    ask("save", {{"text", "{\n\n}\n"}, {"version", stored.get("version")}});
    EXPECT_EQ(read("real.json"), "{\r\n\r\n}\r\n");
    EXPECT_TRUE(fs::is_symlink(path("node.json")));
}

TEST_F(WorkbenchSession, SaysThatTheFileIsGone) {
    std::string const version = versionNow();
    fs::remove(path("node.json"));
    EXPECT_EQ(codeIn(ask("save", {{"text", "{}"}, {"version", version}})), "file-unreadable");
    EXPECT_FALSE(fs::exists(path("node.json")));
}

TEST_F(WorkbenchSession, NeverLeadsOutOfTheFolder) {
    write("one.txt", "x");
    for (char const* const name :
         {"", ".", "..", "../one.txt", "./one.txt", "a/../one.txt", "/etc/passwd", "node.json", "none.txt"})
        EXPECT_EQ(codeIn(ask("blocks", {{"document", name}, {"page", 1}})), "document-unknown") << name;
    EXPECT_EQ(codeIn(ask("blocks", {{"document", "one.txt"}, {"page", 1}})), "");
}

TEST_F(WorkbenchSession, TellsWhichDocumentsBecomeBetterOrWorse) {
    write("invoice 1.txt", "\n\nTotal: 12.30 EUR\n");
    write("invoice 2.txt", "\n\nTotal: 4.00 USD\n");
    write("other.txt", "\n\nHello\n");
    std::string after = INVOICES;
    after.replace(after.find("EUR"), 3, "USD");
    json::Array documents;
    for (char const* const name : {"invoice 1.txt", "invoice 2.txt", "other.txt", "gone.txt"})
        documents.append(name);
    json::Array verdicts;
    while (verdicts.size() < 4) {
        json::Array rest;
        for (std::size_t i = verdicts.size(); i < 4; ++i)
            rest.append(documents.at(i));
        json::Object const told =
            ask("verdicts", {{"settings", after}, {"before", INVOICES}, {"documents", rest}});
        for (json::Value const& one : told.get("verdicts").toArray())
            verdicts.append(one);
    }
    std::vector<std::string> changes;
    for (json::Value const& one : verdicts)
        changes.push_back(one.toObject().get("change").textOrEmpty() + ' ' +
                          json::toText(one.toObject().get("changes")));
    EXPECT_THAT(changes, ElementsAre("worse [\"total: 12.30 \u2192 nothing\"]",
                                     "better [\"total: nothing \u2192 4.00\"]", "same []", " []"));
    EXPECT_EQ(verdicts.at(0).toObject().get("missing").toInt(), 1);
    EXPECT_EQ(codeIn(verdicts.at(3).toObject()), "document-unknown");
}

TEST_F(WorkbenchSession, KeepsWhatIsShownAsAGoldenCaseAndHoldsLaterSettingsAgainstIt) {
    write("invoice 1.txt", "\n\nTotal: 12.30 EUR\n");
    json::Object query{{"document", "invoice 1.txt"}, {"settings", INVOICES}};
    EXPECT_EQ(ask("golden", query).get("file").textOrEmpty(), "invoice 1.txt.expected.json");
    EXPECT_THAT(read("invoice 1.txt.expected.json"), HasSubstr("\"total\": \"12.30\""));
    EXPECT_EQ(codeIn(ask("golden", query)), "file-exists");
    json::Array documents;
    documents.append("invoice 1.txt");
    auto const golden = [&](std::string const& settings) {
        return json::toText(ask("verdicts", {{"settings", settings}, {"documents", documents}})
                                .get("verdicts")
                                .toArray()
                                .at(0)
                                .toObject()
                                .get("golden"));
    };
    EXPECT_EQ(golden(INVOICES), R"({"verdict":"ok","differences":[]})");
    std::string after = INVOICES;
    after.replace(after.find("EUR"), 3, "USD");
    EXPECT_THAT(golden(after), HasSubstr("\"differs\""));
    query.set("settings", after);
    query.set("replace", json::Value(json_true()));
    EXPECT_EQ(codeIn(ask("golden", query)), "");
    EXPECT_THAT(golden(after), HasSubstr("\"ok\""));
}

TEST_F(WorkbenchSession, ReadsLettersAsTheTextsOfTheirZonesLikeOtherDocuments) {
    write("invoice 3.zones", "[All]\nDear Ms Roe\nTotal: 9.90 EUR\n");
    json::Object const listed = ask("state", {}).get("documents").toArray().at(0).toObject();
    EXPECT_EQ(listed.get("name").textOrEmpty(), "invoice 3.zones");
    json::Object query{{"document", "invoice 3.zones"}, {"settings", INVOICES}};
    auto const field = [&](std::string const& settings, char const* key) {
        json::Object const read = ask("evaluate", {{"document", "invoice 3.zones"}, {"settings", settings}});
        json::Object const zone =
            read.get("letters").toArray().at(0).toObject().get("zones").toArray().at(0).toObject();
        return zone.get("fields").toArray().at(0).toObject().get(key).textOrEmpty();
    };
    EXPECT_EQ(ask("evaluate", query).get("page_count").toInt(), 0);
    EXPECT_EQ(field(INVOICES, "value"), "9.90");
    EXPECT_EQ(field(INVOICES, "state"), "found");
    EXPECT_EQ(field(INVOICES, "pointer"), "/extract_presets/0/zones/0/fields/0");
    EXPECT_EQ(ask("golden", query).get("file").textOrEmpty(), "invoice 3.zones.expected.json");
    std::string after = INVOICES;
    after.replace(after.find("EUR"), 3, "USD");
    EXPECT_EQ(field(after, "state"), "missing");
    json::Array documents;
    documents.append("invoice 3.zones");
    json::Object const verdict =
        ask("verdicts", {{"settings", after}, {"before", INVOICES}, {"documents", documents}})
            .get("verdicts")
            .toArray()
            .at(0)
            .toObject();
    EXPECT_EQ(verdict.get("change").textOrEmpty(), "worse");
    EXPECT_EQ(verdict.get("golden").toObject().get("verdict").textOrEmpty(), "differs");
}

TEST_F(WorkbenchSession, SaysWhyALetterAsTheTextsOfItsZonesCannotBeReadOrDrawn) {
    write("invoice 3.zones", "Total: 9.90 EUR\n");
    json::Object const read = ask("evaluate", {{"document", "invoice 3.zones"}, {"settings", INVOICES}});
    EXPECT_EQ(read.get("verdict").textOrEmpty(), "failed");
    EXPECT_EQ(read.get("error").toObject().get("line").textOrEmpty(),
              "it does not begin with the name of a zone; put [Name] in front");
    for (char const* const what : {"blocks", "picture"}) {
        json::Object const refused = ask(what, {{"document", "invoice 3.zones"}, {"page", 1}, {"dots", 50}});
        EXPECT_EQ(refused.get("error").toObject().get("line").textOrEmpty(),
                  "a letter as the texts of its zones has no pages");
    }
    json::Array documents;
    documents.append("invoice 3.zones");
    EXPECT_EQ(codeIn(ask("propose", {{"documents", documents}})), "file-unsuitable");
}

TEST_F(WorkbenchSession, GivesTheSchemaOfSettings) {
    EXPECT_THAT(answer("schema", {}).body, HasSubstr("extract_presets"));
}

TEST_F(WorkbenchSession, RefusesWhatItDoesNotKnow) {
    EXPECT_EQ(answer("nothing", {}).status, 404);
    EXPECT_EQ(answer("save", {}).status, 400);
    EXPECT_EQ(answer("verdicts", {{"settings", "{}"}, {"documents", json::Array()}}).status, 400);
}

TEST(DocumentsOfAFolder, WithoutRightsAreAProblemThatIsSaid) {
    TemporaryFolder const folder;
    fs::create_directory(folder.path() / "closed");
    fs::permissions(folder.path(), fs::perms(0755));
    fs::permissions(folder.path() / "closed", fs::perms::none);
    VLServiceTest::WithoutRights const nobody;
    DocumentList const list = documentsIn(folder.path());
    EXPECT_THAT(list.documents, IsEmpty());
    EXPECT_THAT(list.problems, ElementsAre(EndsWith(std::generic_category().message(EACCES))));
}

} // namespace

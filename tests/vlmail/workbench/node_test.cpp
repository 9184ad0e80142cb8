// The workbench at a node of a service that runs.
#include "programs/vlmail/commands/batch_sources.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/workbench/session.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlmail/run_vlmail.h"
#include "tests/vlmail/workbench/session_answers.h"
#include "tests/vlserviced/json_help.h"
#include "tests/vlserviced/service_process.h"
#include "vlservice/json/json_text.h"

#include <boost/asio/io_context.hpp>

#include <csignal>
#include <filesystem>
#include <fstream>
#include <gmock/gmock.h>
#include <iostream>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace {

namespace fs = std::filesystem;
using namespace VlMail::Workbench;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

constexpr char const* NODE = "u=bob/a=acme";

/// A preset for documents whose names begin so; its field is what follows the label.
std::string presetFor(std::string const& name, std::string const& pack, std::string const& field) {
    return R"({"match":")" + name + R"(.*","pack_preset":")" + pack +
           R"(","zones":[{"name":"All","location":{"left":0,"top":0,"right":21000,"bottom":29700},)" +
           R"("fields":[{"name":")" + field + R"(","value_extract":"^Total: (?<VAL>[\\d.]+) EUR$"}]}]})";
}

class WorkbenchAtANode : public testing::Test {
protected:
    WorkbenchAtANode() {
        fs::create_directory(folder_ / "letters");
        write("letters/invoice 1.txt", "\n\nTotal: 12.30 EUR\n");
        write("letters/letter 1.txt", "\n\nTotal: 4.50 EUR\n");
        set("", "presets",
            R"({"extract_presets":[)" + presetFor("letter", "Common", "above") + ',' +
                presetFor("invoice", "Common", "above") + R"(],"pack_presets":[{"name":"Common"}]})");
        set(NODE, "presets", R"({"extract_presets":[)" + presetFor("invoice", "Common", "own") + "]}");
        port_ = service_.port();
    }

    void write(std::string const& name, std::string const& text) const {
        std::ofstream(folder_ / name.c_str(), std::ios::binary) << text;
    }
    /// As somebody else does it, with another program.
    std::string vlmail(std::vector<std::string> arguments) const {
        for (std::string const& more : {std::string("--service"), address(), std::string("--token"),
                                        (folder_ / "data" / "token").string()})
            arguments.push_back(more);
        Ran const ran = runVlMail(arguments);
        EXPECT_EQ(ran.status, 0) << ran.err;
        return ran.out;
    }
    void set(std::string const& node, std::string const& part, std::string const& own) const {
        write("part.json", own);
        vlmail({"settings", "set", node.empty() ? "/" : node, part, (folder_ / "part.json").string()});
    }
    std::string ownOf(std::string const& part) const {
        json::Object const shown = parse(vlmail({"settings", "show", NODE, part, "--json"}));
        return print(shown.get("parts").toObject().get(part).toObject().get("own"));
    }
    std::string address() const { return "127.0.0.1:" + std::to_string(port_ ? port_ : service_.port()); }

    void begin() {
        options_.service = address();
        if (options_.tokenFile.empty())
            options_.tokenFile = (folder_ / "data" / "token").string();
        VlMail::ServiceLine::Connect const connect = VlMail::routeToService(options_, terminal_);
        session_ = std::make_unique<Session>(
            io_, Folders{folder_ / "letters", {}, VlMail::documentsAnew(connect, NODE)}, VlMail::JobLimits(),
            settingsOfNode(NODE, NODE, connect));
    }
    Answer answer(std::string const& what, json::Object const& query) {
        if (!session_)
            begin();
        return answerOf(io_, *session_, what, query);
    }
    json::Object ask(std::string const& what, json::Object const& query) {
        Answer const got = answer(what, query);
        return json::strToObject(got.body.data(), got.body.size());
    }
    /// The text and the version of the settings.
    json::Object stored() { return ask("reload", {}); }
    json::Object save(std::string const& text) {
        return ask("save", {{"text", text}, {"version", stored().get("version")}});
    }
    json::Object read(std::string const& document, std::string const& settings) {
        return ask("evaluate", {{"document", document}, {"settings", settings}});
    }

    TemporaryFolder folder_;
    std::optional<ServiceProcess> process_{
        std::in_place, std::vector<std::string>{"--data", (folder_ / "data").string(), "--no-discovery"}};
    ServiceProcess& service_ = *process_;
    VlMail::ServiceOptions options_;

private:
    VlMail::Terminal terminal_{std::cout, std::cerr};
    boost::asio::io_context io_{1};
    std::unique_ptr<Session> session_;
    /// The port stays known when the service has gone.
    std::uint16_t port_ = 0;
};

/// The line of a failure.
std::string lineIn(json::Object const& answer) {
    json::Value const error = answer.get("error");
    return error.isObject() ? error.toObject().get("line").textOrEmpty() : "";
}

std::string codeOf(json::Object const& answer) {
    json::Value const error = answer.get("error");
    return error.isObject() ? error.toObject().get("code").textOrEmpty() : "";
}

/// The fields of the only letter, with their values.
std::string fieldsIn(json::Object const& evaluation) {
    std::string fields;
    for (json::Value const& zone :
         evaluation.get("letters").toArray().at(0).toObject().get("zones").toArray())
        for (json::Value const& field : zone.toObject().get("fields").toArray())
            fields += field.toObject().get("name").textOrEmpty() + '=' +
                      field.toObject().get("value").textOrEmpty() + ' ';
    return fields;
}

json::Value placeIn(json::Object const& evaluation, char const* preset) {
    return evaluation.get(preset).toObject().get("pointer");
}

TEST(WorkbenchOptions, NameAFileOrANodeAndNotBoth) {
    Ran const ran = runVlMail({"workbench", ".", "--settings", "node.json", "--node", NODE});
    EXPECT_EQ(ran.status, 1);
    EXPECT_EQ(ran.err, "vlmail: --settings excludes --node; --help explains [usage]\n");
}

TEST_F(WorkbenchAtANode, EditsWhatTheNodeHasOfItsOwn) {
    set(NODE, "app", R"({"descr":"Bob"})");
    json::Object const settings = ask("state", {}).get("settings").toObject();
    EXPECT_EQ(settings.get("kind").textOrEmpty(), "node");
    EXPECT_EQ(settings.get("name").textOrEmpty(), NODE);
    std::string const text = settings.get("text").textOrEmpty();
    EXPECT_THAT(text, StartsWith("{\n  \"app\": {\n    \"descr\": \"Bob\"\n  },\n  \"presets\": {\n"));
    EXPECT_THAT(text, HasSubstr("\"own\""));
    EXPECT_THAT(text, Not(HasSubstr("above")));
    EXPECT_FALSE(settings.get("inherited"));
}

TEST_F(WorkbenchAtANode, BeginsWithNothingWhereTheNodeHasNothing) {
    set(NODE, "presets", "{}");
    EXPECT_EQ(stored().get("text").textOrEmpty(),
              "{\n  \"presets\": {\n    \"extract_presets\": [],\n    \"pack_presets\": []\n  }\n}\n");
}

TEST_F(WorkbenchAtANode, ReadsDocumentsByOwnPresetsAndThenByThoseThatAreInherited) {
    std::string const text = stored().get("text").toString();
    json::Object const invoice = read("invoice 1.txt", text);
    EXPECT_EQ(fieldsIn(invoice), "own=12.30 ");
    EXPECT_EQ(placeIn(invoice, "extract_preset").textOrEmpty(), "/presets/extract_presets/0");
    EXPECT_FALSE(placeIn(invoice, "pack_preset").isString());
    json::Object const letter = read("letter 1.txt", text);
    EXPECT_EQ(fieldsIn(letter), "above=4.50 ");
    EXPECT_FALSE(placeIn(letter, "extract_preset").isString());
    // What is taken out of the text is inherited again.
    EXPECT_EQ(fieldsIn(read("invoice 1.txt", "{}")), "above=12.30 ");
    json::Array documents;
    documents.append("invoice 1.txt");
    json::Object const judged =
        ask("verdicts", {{"settings", "{}"}, {"before", text}, {"documents", documents}});
    EXPECT_EQ(print(judged.get("verdicts").toArray().at(0).toObject().get("changes")),
              "[\"above: nothing \u2192 12.30\",\"own: 12.30 \u2192 nothing\"]");
}

TEST_F(WorkbenchAtANode, KnowsOfLaterChangesAboveItWhenSettingsAreReadAnew) {
    std::string const text = stored().get("text").toString();
    EXPECT_EQ(fieldsIn(read("letter 1.txt", text)), "above=4.50 ");
    set("a=acme", "presets", R"({"extract_presets":[)" + presetFor("letter", "Common", "nearer") + "]}");
    stored();
    EXPECT_EQ(fieldsIn(read("letter 1.txt", text)), "nearer=4.50 ");
}

TEST_F(WorkbenchAtANode, FindsNoFaultWithWhatIsInherited) {
    std::string const text = stored().get("text").toString();
    json::Array const findings = ask("lint", {{"settings", text}}).get("lint").toArray();
    for (json::Value const& one : findings)
        EXPECT_NE(one.toObject().get("severity").textOrEmpty(), "error") << print(one);
    std::string unknown = text;
    unknown.replace(unknown.find("Common"), 6, "Unknown");
    json::Object const found = ask("lint", {{"settings", unknown}}).get("lint").toArray().at(0).toObject();
    EXPECT_EQ(found.get("severity").textOrEmpty(), "error");
    EXPECT_EQ(found.get("pointer").textOrEmpty(), "/presets/extract_presets/0/pack_preset");
}

TEST_F(WorkbenchAtANode, SavesByTheServiceWhatStillIsWhatWasRead) {
    set(NODE, "app", R"({"descr":"Bob"})");
    std::string const text = R"({"po": {"code": "R-7"}, "presets": {"pack_presets": [{"name": "Mine"}]}})";
    json::Object const saved = save(text);
    EXPECT_EQ(lineIn(saved), "");
    EXPECT_EQ(saved.get("text").textOrEmpty(), text);
    EXPECT_EQ(saved.get("version").textOrEmpty(), stored().get("version").textOrEmpty());
    EXPECT_EQ(ownOf("po"), R"({"code":"R-7"})");
    EXPECT_EQ(ownOf("app"), "{}");
    EXPECT_THAT(ownOf("presets"), StartsWith(R"({"pack_presets":[{"name":"Mine")"));
    // The part presets may stand alone, as in a file.
    EXPECT_EQ(lineIn(save(R"({"pack_presets": [{"name": "Alone"}]})")), "");
    EXPECT_THAT(ownOf("presets"), HasSubstr("Alone"));
}

TEST_F(WorkbenchAtANode, ShowsBothWhenSomebodyElseHasSavedAtTheNode) {
    json::Value const version = stored().get("version");
    set(NODE, "po", R"({"code":"theirs"})");
    json::Object const mine{{"text", R"({"po": {"code": "mine"}})"}, {"version", version}};
    Answer const refused = answer("save", mine);
    EXPECT_EQ(refused.status, 409);
    json::Object const conflict = json::strToObject(refused.body.data(), refused.body.size());
    EXPECT_EQ(codeOf(conflict), "settings-changed");
    EXPECT_THAT(conflict.get("theirs").textOrEmpty(), HasSubstr("\"code\": \"theirs\""));
    EXPECT_EQ(ownOf("po"), R"({"code":"theirs"})");
    EXPECT_EQ(answer("save", {{"text", mine.get("text")}, {"version", conflict.get("version")}}).status, 200);
    EXPECT_EQ(ownOf("po"), R"({"code":"mine"})");
}

TEST_F(WorkbenchAtANode, SaysWhatTheServiceRefusesAndSavesNothing) {
    std::string const before = ownOf("presets");
    for (auto const& one : std::vector<std::pair<std::string, std::string>>{
             {R"({"po": {"cod": "R"}})", "the settings \"po\" have no key \"cod\""},
             {R"({"apps": {}})",
              "cannot use the settings in \"u=bob/a=acme\": \"apps\" is no settings part; name the "
              "parts \"presets\", \"app\", \"inet\", \"po\", \"deps\" or \"profiles\""},
             {R"({"po": {"code": "R"}, "app": {"descr": 7}})",
              "the settings \"app\" were not changed: JSON error: Wrong type: integer. Expected type: "
              "string"}})
        EXPECT_EQ(lineIn(save(one.first)), one.second);
    EXPECT_EQ(ownOf("presets"), before);
    EXPECT_EQ(ownOf("po"), "{}");
}

TEST_F(WorkbenchAtANode, SavesNothingWithATokenThatMayOnlyRead) {
    json::Object const added =
        parse(vlmail({"token", "add", "reader", "--role", "read", "--node", NODE, "--json"}));
    write("reader", added.get("token").textOrEmpty() + '\n');
    fs::permissions(folder_ / "reader", fs::perms(0600));
    options_.tokenFile = (folder_ / "reader").string();
    EXPECT_EQ(fieldsIn(read("letter 1.txt", stored().get("text").toString())), "above=4.50 ");
    json::Object const refused = save("{}");
    EXPECT_EQ(codeOf(refused), "not-allowed");
    EXPECT_EQ(lineIn(refused), "The service refuses: this needs the role settings at u=bob/a=acme, and the "
                               "token reader has the role read at "
                               "u=bob/a=acme: ask for a token that may (\"vlmail token add\")");
    EXPECT_THAT(ownOf("presets"), HasSubstr("own"));
}

TEST_F(WorkbenchAtANode, GoesOnReadingWhenTheServiceHasGone) {
    json::Object const before = stored();
    service_.signal(SIGTERM);
    EXPECT_EQ(service_.wait(), 0);
    json::Object const refused = ask("save", {{"text", "{}"}, {"version", before.get("version")}});
    EXPECT_EQ(codeOf(refused), "service-unreachable");
    EXPECT_THAT(lineIn(refused), Not(HasSubstr("\n")));
    EXPECT_THAT(lineIn(refused), HasSubstr(address()));
    EXPECT_EQ(codeOf(ask("state", {})), "service-unreachable");
    EXPECT_EQ(fieldsIn(read("letter 1.txt", before.get("text").toString())), "above=4.50 ");
}

TEST_F(WorkbenchAtANode, UsesLetterheadsThatTheServiceKeeps) {
    write("head.txt", "\nAcme\n");
    std::string const text = R"({"presets": {"extract_presets": [)" + presetFor("invoice", "P", "own") +
                             R"(], "pack_presets": [{"name": "P", "letterheads": [{"id": "head"}]}]}})";
    json::Object const query{
        {"document", "invoice 1.txt"}, {"settings", text}, {"checks", json::Value(json_true())}};
    auto const complaints = [&] {
        std::string all;
        for (json::Value const& one :
             ask("evaluate", query).get("letters").toArray().at(0).toObject().get("findings").toArray())
            all += one.toObject().get("says").textOrEmpty() + '\n';
        return all;
    };
    EXPECT_THAT(complaints(), HasSubstr("there is no document \"head\""));
    vlmail({"documents", "put", "head", (folder_ / "head.txt").string(), "--node", "a=acme"});
    EXPECT_THAT(complaints(), Not(HasSubstr("head")));
}

} // namespace

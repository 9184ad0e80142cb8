// What the reading process of a workbench answers, without the process.
#include "programs/vlmail/workbench/desk.h"

#include "tests/support/temporary_folder.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <gmock/gmock.h>
#include <iterator>
#include <string>
#include <vector>

namespace {

namespace fs = std::filesystem;
using namespace VlMail::Workbench;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::StartsWith;

std::string bytesOf(fs::path const& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

json::Object objectIn(Answer const& answer) {
    return json::strToObject(answer.body.data(), answer.body.size());
}

/// What of the fields of all letters a call gives, "name: ...".
template<typename Tell>
void forEachField(json::Object const& evaluation, Tell tell) {
    for (json::Value const& letter : evaluation.get("letters").toArray())
        for (json::Value const& zone : letter.toObject().get("zones").toArray())
            for (json::Value const& field : zone.toObject().get("fields").toArray())
                tell(zone.toObject(), field.toObject());
}

std::string fieldState(json::Object const& evaluation, std::string const& name) {
    std::string state = "not there";
    forEachField(evaluation, [&](json::Object const&, json::Object const& field) {
        if (field.get("name").textOrEmpty() == name)
            state = field.get("state").textOrEmpty();
    });
    return state;
}

std::size_t offsetOf(std::string const& text, json::Object const& position) {
    std::size_t at = 0;
    for (long long line = position.get("line").toInt(); line > 0; --line)
        at = text.find('\n', at) + 1;
    for (long long units = position.get("ch").toInt(); units > 0; ++at) {
        auto const byte = static_cast<unsigned char>(text.at(at));
        bool const isInside = (byte & 0xC0U) == 0x80U;
        units -= isInside ? 0 : byte >= 0xF0U ? 2 : 1;
    }
    while (at < text.size() && (static_cast<unsigned char>(text[at]) & 0xC0U) == 0x80U)
        ++at;
    return at;
}

std::string edited(std::string text, json::Value const& edits) {
    for (json::Value const& one : edits.toArray()) {
        json::Object const edit = one.toObject();
        std::size_t const from = offsetOf(text, edit.get("from").toObject());
        std::size_t const to = offsetOf(text, edit.get("to").toObject());
        text.replace(from, to - from, edit.get("text").toString());
    }
    return text;
}

class WorkbenchDesk : public testing::Test {
protected:
    json::Object ask(std::string const& what, json::Object const& query) {
        return objectIn(desk.answer(what, json::toText(query)));
    }
    json::Object evaluate(std::string const& document, std::string const& settings) {
        return ask("evaluate", {{"document", document}, {"settings", settings}});
    }

    TemporaryFolder const folder;
    Desk desk{{folder.path()}};
};

constexpr char const* WORKBENCH_LETTER = "\n\nInvoice 17\nTotal: 12.30 EUR\n";
constexpr char const* TOTAL_SETTINGS = R"({
  "extract_presets": [
    {"match": "invoice.*", "pack_preset": "P", "zones": [
      {"name": "All", "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": [
        {"name": "total", "value_extract": "^Total: (?<VAL>[\\d.]+) EUR$"}]}]}],
  "pack_presets": [{"name": "P"}]
}
)";

std::string totalWith(std::string const& pattern) {
    std::string text = TOTAL_SETTINGS;
    std::string const old = R"(^Total: (?<VAL>[\\d.]+) EUR$)";
    return text.replace(text.find(old), old.size(), pattern);
}

TEST_F(WorkbenchDesk, TellsWhereTheSettingsHaveWhatItShows) {
    std::ofstream(folder.path() / "invoice 17.txt") << WORKBENCH_LETTER;
    json::Object const told = evaluate("invoice 17.txt", TOTAL_SETTINGS);
    EXPECT_EQ(told.get("extract_preset").toObject().get("pointer").textOrEmpty(), "/extract_presets/0");
    EXPECT_EQ(told.get("pack_preset").toObject().get("pointer").textOrEmpty(), "/pack_presets/0");
    std::vector<std::string> pointers;
    forEachField(told, [&](json::Object const& zone, json::Object const& field) {
        pointers.push_back(zone.get("location_pointer").textOrEmpty());
        pointers.push_back(field.get("pointer").textOrEmpty());
        EXPECT_EQ(field.get("value").textOrEmpty(), "12.30");
        EXPECT_EQ(field.get("state").textOrEmpty(), "found");
    });
    EXPECT_THAT(pointers,
                ElementsAre("/extract_presets/0/zones/0/location", "/extract_presets/0/zones/0/fields/0"));
    json::Object const sheet =
        told.get("letters").toArray().at(0).toObject().get("sheets").toArray().at(0).toObject();
    EXPECT_EQ(sheet.get("width").toInt(), 21000);
    json::Array const shapes = sheet.get("shapes").toArray();
    ASSERT_EQ(shapes.size(), 2U);
    EXPECT_EQ(shapes.at(0).toObject().get("look").textOrEmpty(), "zone high");
    EXPECT_EQ(shapes.at(1).toObject().get("tag").textOrEmpty(), "total");
    EXPECT_EQ(shapes.at(1).toObject().get("label").textOrEmpty(), "field total: \u2713 found");
}

TEST_F(WorkbenchDesk, FollowsAFileThatChanges) {
    fs::path const file = folder.path() / "invoice 17.txt";
    std::ofstream(file) << WORKBENCH_LETTER;
    EXPECT_EQ(fieldState(evaluate("invoice 17.txt", TOTAL_SETTINGS), "total"), "found");
    std::ofstream(file) << "\n\nSomething else altogether\n";
    EXPECT_EQ(fieldState(evaluate("invoice 17.txt", TOTAL_SETTINGS), "total"), "not_found");
    fs::remove(file);
    json::Object const told = evaluate("invoice 17.txt", TOTAL_SETTINGS);
    EXPECT_EQ(told.get("verdict").textOrEmpty(), "failed");
    EXPECT_EQ(told.get("error").toObject().get("code").textOrEmpty(), "file-unreadable");
}

TEST_F(WorkbenchDesk, NamesTheLineOfABrokenText) {
    std::ofstream(folder.path() / "invoice 17.txt") << WORKBENCH_LETTER;
    json::Object const told = evaluate("invoice 17.txt", "{\n \"a\": ,\n}");
    json::Object const broken = told.get("broken").toObject();
    EXPECT_THAT(broken.get("line").textOrEmpty(), StartsWith("line 2: "));
    EXPECT_EQ(broken.get("from").toObject().get("line").toInt(), 1);
    EXPECT_FALSE(told.get("letters"));
}

TEST_F(WorkbenchDesk, SaysWhatLintSaysAndWhere) {
    json::Object const told = ask("lint", {{"settings", totalWith("^Total: (EUR$")}});
    json::Object const finding = told.get("lint").toArray().at(0).toObject();
    EXPECT_EQ(finding.get("kind").textOrEmpty(), "broken-pattern");
    EXPECT_EQ(finding.get("severity").textOrEmpty(), "error");
    EXPECT_EQ(finding.get("from").toObject().get("line").toInt(), 4);
    EXPECT_EQ(finding.get("pointer").textOrEmpty(), "/extract_presets/0/zones/0/fields/0/value_extract");
}

TEST_F(WorkbenchDesk, LooksSettingsOverBehindTheFirstAnswer) {
    std::ofstream(folder.path() / "invoice 17.txt") << WORKBENCH_LETTER;
    json::Object query{{"document", "invoice 17.txt"}, {"settings", TOTAL_SETTINGS}};
    EXPECT_FALSE(ask("evaluate", query).get("lint"));
    query.set("checks", json::Value(json_true()));
    json::Object const whole = ask("evaluate", query);
    EXPECT_TRUE(whole.get("lint").isArray());
    EXPECT_EQ(fieldState(whole, "total"), "found");
    query.set("checks", json::Value(json_false()));
    EXPECT_EQ(json::toText(ask("evaluate", query).get("lint")), json::toText(whole.get("lint")));
}

TEST_F(WorkbenchDesk, ShowsTheEnginesRefusalOfARunawayPattern) {
    std::ofstream(folder.path() / "invoice 17.txt") << "\n\n" << std::string(60, 'a') << "!\n";
    json::Object const told = evaluate("invoice 17.txt", totalWith("^(?<VAL>(a|aa)+)$"));
    EXPECT_THAT(json::toText(told), HasSubstr("cannot be searched in this text"));
}

TEST_F(WorkbenchDesk, ChangesATextByPointers) {
    json::Object const change{{"pointer", "/extract_presets/0/zones/0/location/bottom"}, {"value", 100}};
    json::Array changes;
    changes.append(change);
    json::Object const told = ask("edit", {{"settings", TOTAL_SETTINGS}, {"changes", changes}});
    EXPECT_THAT(told.get("settings").textOrEmpty(), HasSubstr("\"bottom\": 100}"));
    EXPECT_EQ(edited(TOTAL_SETTINGS, told.get("edits")), told.get("settings").textOrEmpty());
}

TEST_F(WorkbenchDesk, DrawsPagesAndTellsTheirBlocks) {
    std::ofstream(folder.path() / "invoice 17.txt") << WORKBENCH_LETTER;
    json::Object query{{"document", "invoice 17.txt"}, {"page", 1}, {"dots", 40}};
    Answer const picture = desk.answer("picture", json::toText(query));
    EXPECT_EQ(picture.type, "image/png");
    EXPECT_THAT(picture.body, StartsWith("\x89PNG"));
    json::Object const told = ask("blocks", query);
    EXPECT_EQ(told.get("lines").toArray().at(0).toObject().get("text").textOrEmpty(), "Invoice 17");
    EXPECT_EQ(told.get("blocks").toArray().size(), 1U);
    query.set("page", 2);
    EXPECT_EQ(desk.answer("picture", json::toText(query)).status, 400);
}

TEST_F(WorkbenchDesk, RefusesParametersThatAreNone) {
    for (char const* const query : {"", "[]", "{}", "{\"document\": 1, \"settings\": 2}"})
        for (char const* const what : {"evaluate", "lint", "edit", "picture", "blocks"})
            EXPECT_EQ(desk.answer(what, query).status, 400) << what << query;
    EXPECT_EQ(desk.answer("nothing", "{}").status, 404);
}

/// Proposals are taken into settings of every form.
class AProposal : public testing::TestWithParam<char const*> {};

TEST_P(AProposal, IsAPresetThatReadsItsDocumentAndThatLintFindsNoFaultWith) {
    Desk office({fs::path(SOURCE_FOLDER) / "examples/office"});
    auto const ask = [&](char const* what, json::Object const& query) {
        return objectIn(office.answer(what, json::toText(query)));
    };
    json::Array documents;
    documents.append("Invoice 17.pdf");
    documents.append("Invoice 19.pdf");
    json::Object proposal = ask("propose", {{"documents", documents}});
    EXPECT_EQ(proposal.get("match").toObject().get("proposal").textOrEmpty(), "Invoice \\d+\\.pdf");
    EXPECT_THAT(proposal.get("address").toObject().get("says").textOrEmpty(),
                StartsWith("\"Ms Ada Brook / "));
    json::Array const fields = proposal.get("fields").toArray();
    ASSERT_EQ(fields.size(), 3U);
    EXPECT_EQ(fields.at(0).toObject().get("value").textOrEmpty(), "2024-17");
    EXPECT_EQ(fields.at(0).toObject().get("page").toInt(), 1);
    EXPECT_THAT(fields.at(2).toObject().get("says").textOrEmpty(), HasSubstr("behind \"Email\""));
    json::Array taken;
    json::Object renamed = fields.at(0).toObject();
    renamed.set("name", "bill");
    taken.append(renamed);
    proposal.set("fields", taken);
    json::Object const after = ask("adopt", {{"settings", GetParam()}, {"proposal", proposal}});
    json::Object const told =
        ask("evaluate", {{"document", "Invoice 17.pdf"}, {"settings", after.get("settings")}});
    EXPECT_EQ(json::toText(ask("lint", {{"settings", after.get("settings")}}).get("lint")), "[]");
    EXPECT_EQ(told.get("extract_preset").toObject().get("pointer").textOrEmpty(),
              after.get("pointer").textOrEmpty());
    EXPECT_EQ(told.get("verdict").textOrEmpty(), "ready");
    EXPECT_EQ(fieldState(told, "bill"), "found");
    EXPECT_EQ(fieldState(told, "email"), "not there");
    EXPECT_EQ(edited(GetParam(), after.get("edits")), after.get("settings").textOrEmpty());
}

INSTANTIATE_TEST_SUITE_P(TakenInto, AProposal,
                         testing::Values("{}", "{\n  \"extract_presets\": [],\n  \"pack_presets\": []\n}\n",
                                         R"({"presets": {
 "extract_presets": [
  {"match": "Letter .*", "pack_preset": "Draft", "zones": [{"name": "_Address", "fields": [
    {"name": "postal", "value_extract": "\\A(?<VAL>(.{1,72}\\n){1,8}.{1,72})\\Z", "priority": 1, "send_to_server": true}]}]}
 ],
 "pack_presets": [{"name": "Draft"}]
}})"));

TEST_F(WorkbenchDesk, ProposesNothingFromWhatIsNoProposal) {
    EXPECT_EQ(desk.answer("propose", R"({"documents": []})").status, 400);
    EXPECT_EQ(desk.answer("adopt", R"({"settings": "{}", "proposal": {"fields": 1}})").status, 400);
}

class RepairedExamples : public WorkbenchDesk, public testing::WithParamInterface<std::string> {};

std::vector<std::string> brokenLetters() {
    std::vector<std::string> names;
    for (fs::directory_entry const& entry :
         fs::directory_iterator(fs::path(SOURCE_FOLDER) / "examples/broken"))
        if (fs::exists(entry.path() / "settings.json"))
            names.push_back(entry.path().filename().string());
    std::sort(names.begin(), names.end());
    return names;
}

/// The first near miss of a letter that proposes a change.
json::Object firstProposal(json::Object const& evaluation, std::string& field) {
    json::Object first;
    forEachField(evaluation, [&](json::Object const&, json::Object const& one) {
        json::Array const misses = one.get("near_misses").toArray();
        for (json::Value const& miss : misses)
            if (first.empty() && miss.toObject().get("edits").isArray()) {
                first = miss.toObject();
                field = one.get("name").textOrEmpty();
            }
    });
    return first;
}

TEST_P(RepairedExamples, FindTheFieldByWhatANearMissProposes) {
    fs::path const example = fs::path(SOURCE_FOLDER) / "examples/broken" / GetParam();
    std::string const settings = bytesOf(example / "settings.json");
    Desk reader({example});
    std::string const document = fs::exists(example / "invoice 17.pdf") ? "invoice 17.pdf" : "invoice 17.txt";
    auto const evaluate = [&](std::string const& text) {
        return objectIn(reader.answer(
            "evaluate", json::toText(json::Object{{"document", document}, {"settings", text}})));
    };
    std::string field;
    json::Object const miss = firstProposal(evaluate(settings), field);
    ASSERT_FALSE(miss.empty());
    std::string const repaired = edited(settings, miss.get("edits"));
    json::Object const after = evaluate(repaired);
    EXPECT_EQ(fieldState(after, field), "found") << miss.get("change").textOrEmpty();
    Answer const linted = reader.answer("lint", json::toText(json::Object{{"settings", repaired}}));
    EXPECT_EQ(linted.body, "{\"broken\":null,\"lint\":[]}\n") << repaired;
}

INSTANTIATE_TEST_SUITE_P(OfBrokenLetters, RepairedExamples, testing::ValuesIn(brokenLetters()),
                         [](auto const& test) {
                             std::string name = test.param;
                             std::replace(name.begin(), name.end(), '-', '_');
                             return name;
                         });

} // namespace

// The schemas of vlmail, held by a validator of others against what the programs read and write.
#include "programs/base/json_schema.h"
#include "programs/base/read_file.h"
#include "programs/production/production_rules.h"
#include "programs/protocol/carrier.h"
#include "programs/protocol/price.h"
#include "programs/protocol/service_settings.h"
#include "programs/reader/reading_rules.h"
#include "programs/vlmail/schema/schemas.h"
#include "tests/support/json_literal.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlmail/run_vlmail.h"
#include "vlservice/json/json_text.h"
#include "vlservice/presets/settings_parts.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <functional>
#include <set>
#include <sstream>

namespace {

namespace fs = std::filesystem;
using namespace VLServiceTest;
using testing::AllOf;
using testing::Each;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::IsSupersetOf;
using testing::Not;
using testing::StartsWith;

std::vector<std::string> linesOf(std::string const& text) {
    std::istringstream in(text);
    std::vector<std::string> lines;
    for (std::string line; std::getline(in, line);)
        lines.push_back(line);
    return lines;
}

/// What the schema of that name says of each document; the empty text when it takes it.
std::vector<std::string> saysOf(std::string const& schema, std::vector<std::string> const& documents) {
    TemporaryFolder const folder;
    std::ofstream(folder / "schema.json") << runVlMail({"schema", schema}).out;
    std::ofstream in(folder / "documents");
    for (std::string document : documents) {
        std::ranges::replace(document, '\n', ' ');
        in << document << '\n';
    }
    in.close();
    std::string const command = std::string(CHECK_JSON) + ' ' + (folder / "schema.json").string() + " <" +
                                (folder / "documents").string() + " >" + (folder / "says").string();
    if (std::system(command.c_str()) != 0)
        throw std::runtime_error("the schema " + schema + " cannot be checked; run scripts/setup tests");
    return linesOf(Base::readFile(folder / "says"));
}

std::string saysOfOne(std::string const& schema, std::string const& document) {
    return saysOf(schema, std::vector{document}).at(0);
}

/// The document on one line.
std::string documentIn(fs::path const& file) {
    std::string const document = Base::readFile(file);
    return text(json::strToObject(document.data(), document.size()));
}

std::vector<fs::path> exampleSettings(fs::path const& folder) {
    std::vector<fs::path> files;
    for (fs::directory_entry const& entry : fs::recursive_directory_iterator(folder))
        if (entry.path().extension() == ".json" && entry.path().filename() != "expected.json")
            files.push_back(entry.path());
    std::ranges::sort(files);
    return files;
}

std::vector<fs::path> exampleDocuments(fs::path const& folder) {
    std::vector<fs::path> files;
    for (fs::directory_entry const& entry : fs::directory_iterator(folder))
        if (entry.path().extension() == ".pdf" || entry.path().extension() == ".PDF")
            files.push_back(entry.path());
    std::ranges::sort(files);
    return files;
}

/// The command on all documents of an example folder, with its settings.
Ran runOnExample(std::vector<std::string> arguments, fs::path const& folder) {
    arguments.insert(arguments.end(), {"--settings", (folder / "presets.json").string()});
    if (fs::exists(folder / "documents"))
        arguments.insert(arguments.end(), {"--documents", (folder / "documents").string()});
    for (fs::path const& document : exampleDocuments(folder))
        arguments.push_back(document.string());
    return runVlMail(arguments);
}

/// The value at each place in a document, replaced by each of some others.
class Mutations {
public:
    static std::vector<json::Value> of(json::Value const& document) {
        Mutations all;
        all.walk(document, [](json::Value value) { return value; });
        return std::move(all.documents_);
    }

private:
    using Place = std::function<json::Value(json::Value)>;

    void walk(json::Value const& node, Place const& place) {
        for (char const* other : {"null", "true", "\"de\"", "1000000000000000", "1.5", "[]", "{}", "[7]"})
            documents_.push_back(place(operator""_json(other, std::strlen(other))));
        if (node.isObject())
            for (auto const& [key, member] : node.toObject())
                walk(member, [&, name = std::string(key)](json::Value const& value) {
                    return place(Base::Schema::with(node.toObject(), name.c_str(), value));
                });
        if (node.isArray())
            for (std::size_t i = 0; i < node.toArray().size(); ++i)
                walk(node.toArray().at(i), [&, i](json::Value const& value) {
                    return place(withElement(node.toArray(), i, value));
                });
    }

    static json::Array withElement(json::Array const& array, std::size_t at, json::Value const& value) {
        json::Array changed;
        for (std::size_t i = 0; i < array.size(); ++i)
            changed.append(i == at ? value : array.at(i));
        return changed;
    }

    std::vector<json::Value> documents_;
};

/// Of the documents that the program refuses those that the schema takes.
std::vector<std::string> takenThough(std::string const& schema, std::vector<json::Value> const& documents,
                                     bool (*refuses)(json::Value const&)) {
    std::vector<std::string> refused;
    for (json::Value const& document : documents)
        if (refuses(document))
            refused.push_back(text(document));
    EXPECT_GT(refused.size(), documents.size() / 10);
    std::vector<std::string> const says = saysOf(schema, refused);
    std::vector<std::string> taken;
    for (std::size_t i = 0; i < refused.size(); ++i)
        if (says.at(i).empty())
            taken.push_back(refused[i]);
    return taken;
}

bool hasFaults(Cfg::PackPreset const& preset) {
    std::vector<Reader::RulesFault> faults;
    json::Value const additional = preset.jAdditional();
    if (additional.isObject())
        Reader::ReadingRules::from(additional.toObject().get(Reader::ReadingRules::KEY), faults);
    Production::ProductionRules::of(preset, faults);
    return !faults.empty();
}

/// Parts of the root, as programs read them.
bool refusesSettings(json::Value const& document) {
    try {
        json::Object const& parts = document.toObject();
        Cfg::App const app(parts.get("app"), true, true);
        Cfg::Inet const inet(parts.get("inet"), true, true);
        Cfg::PO const po(parts.get("po"), true, true);
        Cfg::Departments const departments(parts.get("deps"), true, true);
        Cfg::Profiles const profiles(parts.get("profiles"), true, true);
        Cfg::Presets const presets(parts.get("presets"), true, true);
        return std::ranges::any_of(presets.elements<Cfg::PresetFieldIdxs::PackPresets>(),
                                   [](auto const& element) { return hasFaults(element.value); });
    } catch (std::exception const&) {
        return true;
    }
}

bool refusesCarriers(json::Value const& document) {
    try {
        Protocol::carriersIn(document.toObject());
        return false;
    } catch (std::exception const&) {
        return true;
    }
}

bool refusesTariff(json::Value const& document) {
    try {
        Protocol::Tariff const tariff(document.toObject());
        return false;
    } catch (std::exception const&) {
        return true;
    }
}

constexpr char const* WHOLE_SETTINGS = R"json({
    "app": {"descr": {"inh": true, "v": "Acme"}, "max_letter_sheets": 5, "auto_save_preset": false,
            "print_area": {"left": 1, "top": 2, "right": 3, "bottom": 4}, "show_ctrls": [-1, 3]},
    "inet": {"status_update_hours": 3, "help_url": "x"},
    "po": {"code": "R-7", "expiry": 1924988400},
    "deps": {"vals": ["Sales", {"name": "IT", "descrip": "computers"}]},
    "profiles": {"vals": [{"name": "Invoices"}, {"inh": true, "v": {"name": "Letters", "descrip": "d"}}]},
    "presets": {
        "extract_presets": [{"match": "invoice.*", "order": 3, "pack_preset": "Bills", "type": 0,
            "zones": [{"name": "Page", "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700},
                       "most_probable_point": {"x": 1, "y": 2},
                       "fields": [{"name": "number", "value_extract": "(?<VAL>\\d+)", "value_type": 1,
                                   "value_min": 0, "priority": 0, "obligatory": true}]}]}],
        "pack_presets": [{"name": "Bills", "duplex": true, "process_mode": 3,
            "delay": {"week_days": [1, 2], "mins": [3]},
            "attachments": ["terms", {"id": "more", "preferred_pos": -1}],
            "letterheads": [{"id": "blue", "on_top": true}],
            "reading": {"decimal": ",", "grouping": ".' ", "months": "de",
                        "zones": {"Page": {"page": "last", "anchor": "^Sum", "column": true}}},
            "production": {"sheet": {"width": 21000, "height": 29700},
                "window": {"left": 2000, "top": 4500, "right": 10500, "bottom": 9000},
                "clear_zones": [{"left": 0, "top": 28000, "right": 21000, "bottom": 29700, "pages": "all"}],
                "tolerance": 50, "address_lines": {"min": 3, "max": 6}, "postcode": "\\d{5}",
                "repair": ["cover-page"], "copies": 2, "duplicate_days": 30}}]}})json";

constexpr char const* WHOLE_CARRIERS = R"({
    "postal": {"type": "folder", "folder": "/srv/shop", "unit": "mailing", "hours": "06:00-17:30",
               "per_minute": 5, "at_once": 2, "retry_seconds": 3, "give_up_hours": 4},
    "far": {"type": "sftp", "url": "sftp://me@host:22/in/", "identity_file": "key",
            "host_key": "SHA256:AAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAA"},
    "paper": {"type": "printer", "uri": "ipp://host:631/printers/a", "at_once": 1},
    "sms": {"type": "command", "program": "/bin/send", "arguments": ["--to", "{sms}"], "time_limit": 9,
            "output_limit": 100, "user": "nobody", "text": "{key}"},
    "email": {"type": "smtp", "url": "smtps://host:465", "from": "a@example.com", "subject": "s",
              "user": "u", "password_file": "/etc/secret", "starttls": true, "to": "{email}"}})";

constexpr char const* WHOLE_TARIFF = R"({"currency": "EUR", "letter": 85, "sheet": 10, "colour_page": 7,
                                         "duplex_sheet": -3, "priority_letter": 150, "channels": {"email": {"letter": 5}}})";

TEST(Schemas, AreListedAndSchemasOfTheirDraft) {
    Ran const list = runVlMail({"schema"});
    EXPECT_EQ(list.status, VlMail::FINE);
    for (VlMail::NamedSchema const& each : VlMail::schemas()) {
        EXPECT_THAT(list.out, AllOf(HasSubstr(each.name), HasSubstr(each.title)));
        EXPECT_THAT(runVlMail({"schema", each.name}).out,
                    StartsWith(R"({"$schema":"https://json-schema.org/draft/2020-12/schema","title":")"));
        EXPECT_THAT(saysOfOne(each.name, "[]"), Not(IsEmpty())) << each.name;
    }
}

TEST(Schemas, OfOtherNamesAreRefused) {
    Ran const ran = runVlMail({"schema", "letters"});
    EXPECT_EQ(ran.status, VlMail::FAILED);
    EXPECT_EQ(ran.err, "vlmail: there is no schema \"letters\"; vlmail schema lists what there is; "
                       "--help explains [usage]\n");
}

TEST(Schemas, TakeAllSettingsAmongTheExamplesButThoseWithValuesOfAnotherType) {
    std::vector<fs::path> const files = exampleSettings(EXAMPLES);
    ASSERT_GT(files.size(), 20u);
    std::vector<std::string> documents;
    for (fs::path const& file : files)
        documents.push_back(documentIn(file));
    std::vector<std::string> const says = saysOf("settings", documents);
    for (std::size_t i = 0; i < files.size(); ++i) {
        std::string const lint = runVlMail({"presets", "lint", files[i].string(), "--json"}).out;
        bool const hasWrongTypes = lint.find("\"wrong-type\"") != lint.npos;
        EXPECT_EQ(says[i].empty(), !hasWrongTypes) << files[i] << ": " << says[i];
    }
}

TEST(Schemas, TakeWhatLettersAreReadAs) {
    std::vector<std::string> lines;
    for (fs::directory_entry const& folder : fs::directory_iterator(EXAMPLE_LETTERS))
        for (std::string const& line : linesOf(runOnExample({"letter", "--json", "--explain"}, folder).out))
            lines.push_back(line);
    lines.push_back(runVlMail({"letter", "--json", "/nowhere/letter.pdf"}).out);
    lines.back().pop_back();
    ASSERT_GT(lines.size(), 15u);
    EXPECT_THAT(saysOf("letter", lines), Each(IsEmpty()));
}

TEST(Schemas, TakePlansAndTheMetadataOfMailings) {
    std::vector<std::string> plans;
    std::vector<std::string> metadata;
    for (fs::directory_entry const& example : fs::directory_iterator(EXAMPLE_LETTERS)) {
        TemporaryFolder const folder;
        runOnExample({"plan", "-o", (folder / "plan.json").string()}, example);
        plans.push_back(documentIn(folder / "plan.json"));
        runOnExample({"mail", "-o", (folder / "out").string()}, example);
        for (fs::directory_entry const& mailing : fs::directory_iterator(folder / "out")) {
            fs::path const pages = folder / mailing.path().stem().c_str();
            runVlMail({"pack", "extract", mailing.path().string(), "-o", pages.string()});
            metadata.push_back(documentIn(pages / "metadata.json"));
        }
    }
    EXPECT_THAT(saysOf("plan", plans), Each(IsEmpty()));
    ASSERT_GT(metadata.size(), 4u);
    EXPECT_THAT(saysOf("metadata", metadata), Each(IsEmpty()));
}

TEST(Schemas, OfPlansAndLettersRefuseOtherKeysAndTypes) {
    EXPECT_THAT(
        saysOf("letter", {R"({"document": "a", "error": "e", "other": 1})",
                          R"({"document": 5, "error": "e"})", R"({"document": "a"})",
                          R"({"document": "a", "extract_preset": "", "pack_preset": "", "letters": 1})",
                          R"({"document": "a", "extract_preset": "", "pack_preset": "", "letters": [{}]})"}),
        Each(Not(IsEmpty())));
    EXPECT_THAT(saysOf("plan", {R"({"plan": 2})", R"({})"}), Each(Not(IsEmpty())));
    EXPECT_THAT(saysOf("metadata", {R"({"pack_preset": "A"})",
                                    R"({"pack_preset": "A", "id": "i", "created": "x", "letters": []})"}),
                Each(Not(IsEmpty())));
}

TEST(Schemas, RefuseSettingsWhereTheProgramDoes) {
    json::Value const whole = operator""_json(WHOLE_SETTINGS, std::strlen(WHOLE_SETTINGS));
    ASSERT_FALSE(refusesSettings(whole));
    EXPECT_EQ(saysOfOne("settings", text(whole)), "");
    EXPECT_THAT(takenThough("settings", Mutations::of(whole), &refusesSettings), IsEmpty());
}

TEST(Schemas, RefuseCarriersAndTariffsWhereTheServiceDoes) {
    json::Value const carriers = operator""_json(WHOLE_CARRIERS, std::strlen(WHOLE_CARRIERS));
    ASSERT_FALSE(refusesCarriers(carriers));
    EXPECT_EQ(saysOfOne("carriers", text(carriers)), "");
    EXPECT_THAT(takenThough("carriers", Mutations::of(carriers), &refusesCarriers), IsEmpty());
    json::Value const tariff = operator""_json(WHOLE_TARIFF, std::strlen(WHOLE_TARIFF));
    ASSERT_FALSE(refusesTariff(tariff));
    EXPECT_EQ(saysOfOne("tariff", text(tariff)), "");
    EXPECT_THAT(takenThough("tariff", Mutations::of(tariff), &refusesTariff), IsEmpty());
}

TEST(Schemas, RefuseKeysThatCarriersDoNotHaveAndMiss) {
    EXPECT_THAT(
        saysOf(
            "carriers",
            {R"({"Postal": {"type": "folder", "folder": "/a"}})", R"({"postal": {"type": "pigeon"}})",
             R"({"postal": {"type": "folder"}})",
             R"({"postal": {"type": "folder", "folder": "/a", "url": "x"}})",
             R"({"postal": {"type": "printer", "uri": "ipp://h/p", "at_once": 2}})",
             R"({"email": {"type": "smtp", "url": "smtp://h", "from": "a@b.c", "subject": "s", "user": "u"}})"}),
        Each(Not(IsEmpty())));
}

TEST(Schemas, KnowTheServicesOwnSettings) {
    EXPECT_THAT(
        saysOf(
            "service-settings",
            {R"({"upload_folder": "/up", "disabled": ["a=b"], "quota": {"": 5}, "retention_days": 0,
                            "suspended": 3, "outbox": "/out", "jobs": {"accepted": 1}})",
             R"({"carriers": {"fax": {"type": "folder", "folder": "/f"}}, "tariff": {"currency": "EUR"}})"}),
        Each(IsEmpty()));
    EXPECT_THAT(saysOf("service-settings",
                       {R"({"upload_folder": "up"})", R"({"disabled": [""]})", R"({"quota": {"a=b": -1}})",
                        R"({"quota": {"a=b": 1073741825}})", R"({"retention_days": 36501})",
                        R"({"retention": 3})", R"({"tariff": {"currency": "euro"}})"}),
                Each(Not(IsEmpty())));
}

/// "app/descr" of each key of a part, zone, field and so on that has a description, or has none.
std::set<std::string> keysOf(json::Object const& schema, bool described) {
    std::set<std::string> keys;
    for (auto const& [name, definition] : schema.get("$defs").toObject()) {
        json::Value const either = definition.toObject().get("anyOf");
        json::Object const object = either ? either.toArray().at(1).toObject() : definition.toObject();
        for (auto const& [key, member] : object.get("properties").toObject())
            if (bool(member.toObject().get("description")) == described &&
                !member.toObject().get("deprecated"))
                keys.insert(name + std::string("/") + key);
    }
    return keys;
}

TEST(Schemas, TellOfKeysWhatTheDocumentsDo) {
    json::Object const schema = VlMail::documentOf(*VlMail::schemaNamed("settings"));
    EXPECT_THAT(keysOf(schema, true), IsSupersetOf({"app/descr", "field/value_min", "pack_preset/duplex",
                                                    "extract_preset/match", "letterhead/id", "po/code"}));
    // Their names say it, or the text around the table.
    EXPECT_THAT(keysOf(schema, false),
                testing::UnorderedElementsAre("area/bottom", "area/left", "area/right", "area/top",
                                              "department/descrip", "department/name",
                                              "pack_preset/production", "pack_preset/reading", "point/x",
                                              "point/y", "profile/descrip", "profile/name"));
    json::Object const carriers = VlMail::documentOf(*VlMail::schemaNamed("carriers"));
    EXPECT_THAT(text(carriers), AllOf(HasSubstr("the pause behind the first attempt that failed"),
                                      HasSubstr("the absolute path of the program")));
}

TEST(SchemaKey, StandsInSettingsAndSaysNothing) {
    TemporaryFolder const folder;
    for (char const* document : {R"({"$schema": "./s.json", "presets": {"pack_presets": [{"name": "A"}]}})",
                                 R"({"$schema": "./s.json", "pack_presets": [{"name": "A"}]})"}) {
        std::ofstream(folder / "node.json") << document;
        std::string const file = (folder / "node.json").string();
        EXPECT_EQ(saysOfOne("settings", document), "");
        EXPECT_EQ(runVlMail({"presets", "match", "a.pdf", "--settings", file}).err, "");
        EXPECT_THAT(runVlMail({"presets", "lint", file}).out, Not(HasSubstr("$schema")));
    }
}

TEST(SchemaKey, StandsInAPlanThatGoesOutAllTheSame) {
    TemporaryFolder const folder;
    fs::path const file = folder / "plan.json";
    runOnExample({"plan", "-o", file.string()}, fs::path(EXAMPLE_LETTERS) / "post-in-english");
    std::string const plan = documentIn(file);
    std::ofstream(file) << R"({"$schema": "./plan.schema.json",)" << plan.substr(1);
    EXPECT_EQ(saysOfOne("plan", documentIn(file)), "");
    EXPECT_EQ(runVlMail({"mail", "--plan", file.string(), "-o", (folder / "out").string()}).err, "");
    std::ofstream(file) << R"({"schema": "./plan.schema.json",)" << plan.substr(1);
    EXPECT_THAT(runVlMail({"mail", "--plan", file.string(), "-o", (folder / "out").string()}).err,
                HasSubstr("it was changed since it was made"));
}

} // namespace

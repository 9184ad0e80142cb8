// Whole letters: every folder of examples/letters holds documents, the presets to read them with and what
// must be found in them. With UPDATE_GOLDEN=1 in the environment, what is found is written into expected.json
// instead.
#include "programs/reader/letters.h"

#include "tests/support/time_zone.h"
#include "vlservice/json/json_text.h"
#include "vlservice/presets/presets.h"

#include <gmock/gmock.h>

#include <cstdlib>
#include <fstream>
#include <future>
#include <iterator>

namespace Reader {
namespace {

namespace fs = std::filesystem;

fs::path const EXAMPLES = fs::path(VLSERVICE_EXAMPLES) / "letters";

json::Object readJson(fs::path const& path) {
    std::ifstream in(path, std::ios::binary);
    if (!in)
        throw std::runtime_error(path.string() + " is missing");
    std::string const text{std::istreambuf_iterator<char>(in), {}};
    return json::strToObject(text.data(), text.size());
}

json::Object told(Cfg::ExtractedFields const& fields) {
    json::Object result;
    for (auto const& [priority, field] : fields)
        result.set(field.name(),
                   json::Object{{"value", field.rawValue()}, {"state", static_cast<int>(field.valueType())}});
    return result;
}

json::Object told(Letter const& letter) {
    json::Array pages;
    for (int page : letter.pages)
        pages.append(page);
    std::string message;
    bool const isReady = letter.fields.isProductionReady(message);
    Cfg::ExtractedField const* const address = letter.fields.primaryAddressField();
    return {{"pages", pages},
            {"fields", told(letter.fields)},
            {"production_ready", isReady},
            {"message", message},
            {"primary_address", address ? json::Value(address->name()) : json::Value(json_null())}};
}

json::Object told(Document& document, Cfg::Presets const& presets) {
    auto const& [extractPreset, packPreset] = presets.findMatch(document.name());
    json::Value letters(json_null());
    if (extractPreset.isForLetters()) {
        json::Array list;
        for (Letter const& letter : readLetters(document, extractPreset))
            list.append(told(letter));
        letters = list;
    }
    return {{"document", document.name()},
            {"extract_preset", extractPreset.strRegex()},
            {"pack_preset", packPreset.name()},
            {"letters", letters}};
}

std::string printed(json::Value const& value) {
    char* const text = json_dumps(value.node(), JSON_INDENT(2));
    std::string const result = text;
    std::free(text);
    return result;
}

/// The folders that hold examples; a test fails when there are none.
std::vector<std::string> collections() {
    std::vector<std::string> names;
    for (fs::directory_entry const& entry : fs::directory_iterator(EXAMPLES))
        if (entry.is_directory())
            names.push_back(entry.path().filename().string());
    std::sort(names.begin(), names.end());
    return names;
}

class Examples : public testing::TestWithParam<std::string> {
    VLServiceTest::TimeZone const zone_{"UTC"};
};

TEST_P(Examples, AreReadAsTheyShould) {
    fs::path const folder = EXAMPLES / GetParam();
    Cfg::Presets const presets(readJson(folder / "presets.json"), true, true);
    json::Array found;
    json::Object const golden = readJson(folder / "expected.json");
    for (json::Value const& expected : golden.get("documents").toArray()) {
        std::string const name = expected.toObject().get("document").toString();
        SCOPED_TRACE(name);
        Document document = openDocument(folder / name);
        json::Object const seen = told(document, presets);
        EXPECT_EQ(printed(seen), printed(expected));
        found.append(seen);
    }
    EXPECT_FALSE(found.empty());
    if (std::getenv("UPDATE_GOLDEN"))
        std::ofstream(folder / "expected.json") << printed(json::Object{{"documents", found}}) << '\n';
}

TEST(Threads, ReadDocumentsOfTheirOwnSideBySide) {
    auto const wordsOfAll = [] {
        std::vector<std::string> words;
        for (fs::directory_entry const& entry : fs::recursive_directory_iterator(EXAMPLES)) {
            if (entry.path().extension() == ".json" || !entry.is_regular_file())
                continue;
            Document document = openDocument(entry.path());
            for (Word const& word : document.page(1).words)
                words.push_back(word.text);
            words.push_back(document.singlePagePdf(1));
        }
        return words;
    };
    std::future<std::vector<std::string>> other = std::async(std::launch::async, wordsOfAll);
    std::vector<std::string> const own = wordsOfAll();
    EXPECT_GT(own.size(), 1000U);
    EXPECT_EQ(other.get(), own);
}

INSTANTIATE_TEST_SUITE_P(Letters, Examples, testing::ValuesIn(collections()), [](auto const& test) {
    std::string name = test.param;
    std::replace(name.begin(), name.end(), '-', '_');
    return name;
});

} // namespace
} // namespace Reader

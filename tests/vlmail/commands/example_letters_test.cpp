// The example letters as they would be printed: nothing is found wrong with them that is not.
#include "tests/support/json_literal.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlmail/run_vlmail.h"
#include "vlservice/json/json_text.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>

namespace {

namespace fs = std::filesystem;
using namespace VLServiceTest;
using testing::ElementsAre;
using testing::IsEmpty;

fs::path const LETTERS = EXAMPLE_LETTERS;

std::vector<fs::path> inOrder(fs::path const& folder) {
    std::vector<fs::path> entries{fs::directory_iterator(folder), fs::directory_iterator()};
    std::ranges::sort(entries);
    return entries;
}

bool isLetter(fs::path const& file) { return file.extension() == ".pdf" || file.extension() == ".PDF"; }

/// "document: code" for each finding that `vlmail check` has on these files.
std::vector<std::string> findingsOn(std::vector<fs::path> const& files, fs::path const& settings,
                                    fs::path const& documents) {
    std::vector<std::string> arguments{"check", "--json", "--settings", settings.string()};
    if (fs::exists(documents))
        arguments.insert(arguments.end(), {"--documents", documents.string()});
    for (fs::path const& file : files)
        arguments.push_back(file.string());
    Ran const ran = runVlMail(arguments);
    EXPECT_EQ(ran.err, "");
    std::vector<std::string> found;
    std::istringstream lines(ran.out);
    for (std::string line; std::getline(lines, line);) {
        json::Object const document = json::strToObject(line.data(), line.size());
        if (json::Value const letters = document.get("letters"); letters.isArray())
            for (json::Value const& letter : letters.toArray())
                for (json::Value const& finding : letter.toObject().get("findings").toArray())
                    found.push_back(document.get("document").textOrEmpty() + ": " +
                                    finding.toObject().get("code").textOrEmpty());
    }
    return found;
}

/// The presets of an example folder, each of whose pack presets says that of its carrier.
std::string settingsForCarrier(json::Value const& production, fs::path const& settings) {
    std::ifstream in(settings, std::ios::binary);
    std::string const text{std::istreambuf_iterator<char>(in), {}};
    json::Object document = json::strToObject(text.data(), text.size());
    bool const isPart = !document.get("presets");
    json::Object presets = isPart ? document : document.get("presets").toObject();
    json::Array packs;
    for (json::Value const& pack : presets.get("pack_presets").toArray()) {
        json::Object object = pack.toObject();
        object.set("production", production);
        packs.append(object);
    }
    presets.set("pack_presets", packs);
    std::ostringstream written;
    written << (isPart ? presets : json::Object{{"presets", presets}});
    return written.str();
}

class ExampleLetters : public testing::Test {
protected:
    std::vector<std::string> foundIn(char const* folder, std::vector<std::string> const& names,
                                     json::Value const& production) const {
        std::ofstream(folder_ / "node.json", std::ios::binary)
            << settingsForCarrier(production, LETTERS / folder / "presets.json");
        std::vector<fs::path> files;
        for (fs::path const& file : inOrder(LETTERS / folder))
            if (isLetter(file) && (names.empty() || std::ranges::count(names, file.filename().string()) > 0))
                files.push_back(file);
        EXPECT_TRUE(names.empty() || files.size() == names.size());
        return findingsOn(files, folder_ / "node.json", LETTERS / folder / "documents");
    }

    TemporaryFolder folder_;
};

TEST_F(ExampleLetters, HaveNothingWrongOnPaperAsTheirPresetsSendThem) {
    std::size_t looked = 0;
    for (fs::path const& folder : inOrder(LETTERS)) {
        std::vector<fs::path> files = inOrder(folder);
        std::erase_if(files, [](fs::path const& file) { return !isLetter(file); });
        EXPECT_THAT(findingsOn(files, folder / "presets.json", folder / "documents"), IsEmpty()) << folder;
        looked += files.size();
    }
    EXPECT_GT(looked, 15U);
}

TEST_F(ExampleLetters, HaveTheWrongSizeOrLackAFontWhereACarrierMindsAndNothingElse) {
    for (char const* const folder : {"german-office", "mail-merge", "other-scripts", "swiss-windows"})
        EXPECT_THAT(foundIn(folder, {}, "{}"_json), IsEmpty()) << folder;
    EXPECT_THAT(foundIn("post-in-english", {}, "{}"_json),
                ElementsAre("NOTICE 10.pdf: page-size", "Order by fax 55.pdf: font-not-embedded",
                            "Order by fax 55.pdf: font-not-embedded"));
}

TEST_F(ExampleLetters, ShowTheirAddressesInTheWindowsThatTheyWereMadeFor) {
    json::Value const formA =
        R"({"window": {"left": 2000, "top": 2700, "right": 10500, "bottom": 7200}, "postcode": "\\b\\d{5} "})"_json;
    json::Value const formB =
        R"({"window": {"left": 2000, "top": 4500, "right": 10500, "bottom": 9000}, "postcode": "\\b\\d{5} "})"_json;
    EXPECT_THAT(foundIn("german-office", {"Mahnung_88.pdf"}, formA), IsEmpty());
    EXPECT_THAT(foundIn("german-office", {"Mahnung_88.pdf"}, formB),
                ElementsAre("Mahnung_88.pdf: address-outside-window"));
    // With the terms that their pack preset attaches.
    std::vector<std::string> const bills{"AGB 2024.pdf", "RECHNUNG 2024-0315.PDF",
                                         "Rechnung_Müller & Söhne.pdf"};
    EXPECT_THAT(foundIn("german-office", bills, formB), IsEmpty());
    EXPECT_THAT(foundIn("german-office", bills, formA),
                ElementsAre("RECHNUNG 2024-0315.PDF: address-outside-window",
                            "Rechnung_Müller & Söhne.pdf: address-outside-window"));
    json::Value const swissRight =
        R"({"window": {"left": 11700, "top": 4900, "right": 19800, "bottom": 9400}})"_json;
    EXPECT_THAT(foundIn("swiss-windows", {"Offerte Zürich 7.pdf"}, swissRight), IsEmpty());
}

} // namespace

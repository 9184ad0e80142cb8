// docs/settings.md is kept in step with the code: its tables name every key in order with its default, its
// examples are read, and its completed paths are what comes out.
#include "vlservice/cfg/app.h"
#include "vlservice/cfg/departments.h"
#include "vlservice/cfg/id.h"
#include "vlservice/cfg/inet.h"
#include "vlservice/cfg/po.h"
#include "vlservice/cfg/profiles.h"

#include "tests/support/json_literal.h"

#include <gmock/gmock.h>

#include <fstream>
#include <iterator>
#include <regex>
#include <string>
#include <utility>
#include <vector>

namespace {

using namespace VLServiceTest;
using DocumentedField = std::pair<std::string, std::string>;

std::string document() {
    std::ifstream in(VLSERVICE_DOCS "/settings.md");
    return {std::istreambuf_iterator<char>(in), {}};
}

/// From a heading to the next one of its level.
std::string section(std::string const& heading) {
    std::string const text = document();
    auto const begin = text.find("\n## " + heading + "\n");
    return begin == std::string::npos ? std::string()
                                      : text.substr(begin, text.find("\n## ", begin + 1) - begin);
}

/// What the expression's two groups hold, line by line.
std::vector<DocumentedField> rows(std::string const& text, std::regex const& expression) {
    std::vector<DocumentedField> rows;
    for (std::sregex_iterator at(text.begin(), text.end(), expression), end; at != end; ++at)
        rows.emplace_back((*at)[1], (*at)[2]);
    return rows;
}

std::vector<DocumentedField> describedFields(std::string const& part) {
    static std::regex const ROW(R"(\n\| `(\w+)` \| \w+ \| `([^`]*)` \|)");
    return rows(section(part), ROW);
}

template<typename Part>
std::vector<DocumentedField> fields() {
    std::vector<DocumentedField> fields;
    for (json::KeyRow const& row : Part::keys().rows)
        fields.emplace_back(row.name, row.missing);
    return fields;
}

template<typename Part>
class SettingsDocument : public testing::Test {};

using DocumentedParts = testing::Types<Cfg::App, Cfg::Inet, Cfg::PO, Cfg::Departments, Cfg::Profiles>;
TYPED_TEST_SUITE(SettingsDocument, DocumentedParts);

TYPED_TEST(SettingsDocument, NamesEveryKeyWithTheDefaultOfTheRoot) {
    EXPECT_EQ(describedFields(TypeParam::PART_NAME), fields<TypeParam>());
}

template<typename Part>
void expectReadAndWrittenBack(json::Value const& example) {
    // A global part writes the wrappers of an example too.
    json::Value const written = Part(example, true, false).serialize();
    for (auto const& [key, value] : example.toObject())
        EXPECT_EQ(written.toObject().get(key), value) << Part::PART_NAME << ": " << text(example);
}

TEST(SettingsDocumentExamples, AreReadAndWrittenBack) {
    static std::regex const BLOCK(R"(```json\n([^`]*)(`)``)");
    std::string const text = document();
    std::vector<std::string> parts;
    for (auto const& [block, end] : rows(text, BLOCK)) {
        json::Value const example = operator""_json(block.data(), block.size());
        for (auto const& [name, part] : example.toObject()) {
            parts.push_back(name);
            if (name == Cfg::App::PART_NAME)
                expectReadAndWrittenBack<Cfg::App>(part);
            else if (name == Cfg::PO::PART_NAME)
                expectReadAndWrittenBack<Cfg::PO>(part);
            else if (name == Cfg::Departments::PART_NAME)
                expectReadAndWrittenBack<Cfg::Departments>(part);
            else if (name == Cfg::Profiles::PART_NAME)
                expectReadAndWrittenBack<Cfg::Profiles>(part);
            else
                ADD_FAILURE() << "no part: " << name;
        }
    }
    EXPECT_THAT(parts, testing::UnorderedElementsAre("app", "po", "profiles", "app", "deps", "profiles"));
}

TEST(SettingsDocumentPaths, AreCompletedAsItSays) {
    static std::regex const ROW(R"(\n\| `([^`]+)` \| `([^`]+)` \|)");
    auto const paths = rows(section("Nodes and their names"), ROW);
    EXPECT_GT(paths.size(), 5u);
    for (auto const& [typed, completed] : paths)
        EXPECT_EQ(Cfg::Id(typed, true).str(), completed);
}

} // namespace

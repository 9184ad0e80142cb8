// docs/presets.md is kept in step with the code: its examples are read, and its tables name every key.
#include "vlservice/presets/presets.h"

#include "tests/support/json_helpers.h"

#include <fstream>
#include <iterator>
#include <regex>
#include <set>
#include <string>
#include <vector>

namespace Cfg {
namespace {

std::string document() {
    std::ifstream in(VLSERVICE_DOCS "/presets.md");
    return {std::istreambuf_iterator<char>(in), {}};
}

std::vector<json::Object> jsonBlocks(std::string const& text) {
    std::string const start = "```json\n";
    std::vector<json::Object> blocks;
    for (auto at = text.find(start); at != std::string::npos; at = text.find(start, at)) {
        at += start.size();
        blocks.push_back(parse(text.substr(at, text.find("```", at) - at)));
    }
    return blocks;
}

/// Those of the inner records too, without what is read by nobody.
void collectKeys(json::RecordKeys const& keys, std::set<std::string>& names) {
    for (json::KeyRow const& row : keys.rows) {
        if (row.use == json::KeyUse::Dropped)
            continue;
        names.insert(row.name);
        if (row.form.record)
            collectKeys(*row.form.record, names);
    }
}

TEST(PresetsDocument, GivesExamplesThatAreReadAndWrittenBack) {
    auto const blocks = jsonBlocks(document());
    ASSERT_EQ(blocks.size(), 2U);
    for (json::Object const& block : blocks)
        EXPECT_EQ(print(Presets(block, false, true).serialize()), print(block));
}

TEST(PresetsDocument, GivesAnExampleThatMatches) {
    Presets const presets(jsonBlocks(document()).back(), true, true);
    auto const [extractPreset, packPreset] = presets.findMatch("Rechnung 17.pdf");
    EXPECT_EQ(extractPreset.name(), "Bills");
    EXPECT_EQ(packPreset.title(), "Monthly bills");
    EXPECT_EQ(presets.findMatch("letter.pdf").second.name(), "GLOBAL");
}

TEST(PresetsDocument, NamesEveryKey) {
    std::set<std::string> keys;
    collectKeys(Presets::keys(), keys);
    EXPECT_GT(keys.size(), 60U);
    std::string const text = document();
    for (std::string const& key : keys)
        EXPECT_NE(text.find("`" + key + "`"), std::string::npos) << key;
}

TEST(PresetsDocument, TellsWhatExpressionsFit) {
    // | `expression` | `fits` | `does not fit` |
    std::regex const row(R"(\| `([^`]+)` \| `([^`]+)` \| `([^`]+)` \|)");
    std::string const text = document();
    auto const section = text.substr(text.find("| `match` | fits |"), 600);
    int rows = 0;
    for (std::sregex_iterator at(section.begin(), section.end(), row), end; at != end; ++at, ++rows) {
        std::string const expression = std::regex_replace((*at)[1].str(), std::regex(R"(\\\|)"), "|");
        EXPECT_TRUE(ExtractPreset::match(expression, (*at)[2])) << expression;
        EXPECT_FALSE(ExtractPreset::match(expression, (*at)[3])) << expression;
    }
    EXPECT_EQ(rows, 4);
}

} // namespace
} // namespace Cfg

// docs/presets.md is kept in step with the code: its examples are read, and its tables name every key that is
// written.
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

void collectKeys(json::Value const& value, std::set<std::string>& keys) {
    if (value.isObject()) {
        for (auto const& [key, member] : value.toObject()) {
            keys.insert(key);
            collectKeys(member, keys);
        }
    } else if (value.isArray()) {
        for (json::Value const& element : value.toArray())
            collectKeys(element, keys);
    }
}

/// Every key that presets write, each with a value other than its default.
constexpr char const* EVERY_KEY = R"({
    "extract_presets": [{"match": "m", "order": 1, "pack_preset": "p", "name": "n", "type": 1, "use_only_fields": true,
        "ocr_mode": 1, "ocr_test_pages": 1, "tet_granularity": 1, "space_adjust_perc": 1, "no_spaces_in_frags": true,
        "trim_frags": true, "skip_images": true, "signature_adjust": 1, "retry_on_repeated": 1, "skip_first_page": true,
        "last_used": 1, "max_spaces_between_fragments": 1.0, "max_line_distance": 1.0, "zones": [{"name": "z",
            "fields": [
                {"name": "f", "value_extract": "x", "mark": 1, "ignore_font_metrics": true, "priority": -1,
                 "obligatory": true, "make_one_line": true, "send_to_server": true, "width": 1, "ignore_on_group": 1,
                 "name_is_redirect_match": true, "postal_match": 1, "value_match": "v", "value_type": 1, "value_min": 1,
                 "value_max": 2, "default_value": 1}],
            "location": {"left": 1, "top": 1, "right": 1, "bottom": 1}, "most_probable_point": {"x": 1, "y": 1},
            "combine_blocks": 1, "restrict_to_location": 1}]},
        {"match": "m", "erase_me": true}],
    "pack_presets": [{"name": "p", "title": "t", "colour_model": 1, "duplex": true, "orientation": 1, "department": "d",
        "no_group": true, "process_mode": 1, "process_mode_client": 1, "profile": "p", "priority_delivery": true,
        "confirmation_email": true, "customer_email": "c", "lock_pack_ui": true, "last_used": 1,
        "delay": {"count": 1, "week_days": [1], "month_days": [1], "mins": [1]},
        "attachments": [{"id": "a", "preferred_pos": 0}],
        "letterheads": [{"id": "l", "skip_letters": true, "skip_attachments": true, "repeat_last_page": true,
            "apply_first_grouped_only": true, "on_top": true, "which_attachments": ["a"]}]}]})";

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

TEST(PresetsDocument, NamesEveryKeyThatIsWritten) {
    json::Value const written = Presets(parse(EVERY_KEY), false, false).serialize();
    ASSERT_EQ(print(written), print(parse(EVERY_KEY)));
    std::set<std::string> keys;
    collectKeys(written, keys);
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

// What docs/check.md tells, against the tables that the program goes by.
#include "programs/base/read_file.h"
#include "programs/production/finding.h"
#include "programs/production/production_rules.h"
#include "vlservice/json/json_text.h"

#include <gmock/gmock.h>

#include <regex>
#include <string>
#include <vector>

namespace {

using Production::ProductionRules;
using testing::IsEmpty;

std::string const& document() {
    static std::string const text = Base::readFile(VLSERVICE_DOCS "/check.md");
    return text;
}

/// What the first group fits, in each place behind `heading` up to the next one.
std::vector<std::string> allIn(std::string const& heading, std::string const& pattern) {
    std::size_t const begin = document().find("\n## " + heading);
    std::string const section = document().substr(begin, document().find("\n## ", begin + 1) - begin);
    std::regex const searched(pattern);
    std::vector<std::string> all;
    for (std::sregex_iterator match(section.begin(), section.end(), searched), end; match != end; ++match)
        all.push_back(match->str(1));
    return all;
}

TEST(CheckDocument, HasTheCodesInTheirOrderWithTheirSeverity) {
    std::vector<std::string> codes;
    for (Production::CodeRow const& row : Production::codes())
        codes.push_back('`' + std::string(row.name) + "` | " + inWords(row.severity));
    EXPECT_EQ(allIn("Codes", "\n\\| (`[a-z-]+` \\| [a-z]+) \\|"), codes);
}

TEST(CheckDocument, HasTheKeysInTheirOrder) {
    EXPECT_EQ(allIn("What a carrier wants", "\n\\| `([a-z_]+)` \\|"), Production::productionKeys());
}

TEST(CheckDocument, HasWindowsThatCanBeUsed) {
    std::vector<std::string> const examples = allIn("Windows to begin with", "```json\n([^`]+)```");
    EXPECT_EQ(examples.size(), 6U);
    for (std::string const& example : examples) {
        std::vector<Reader::RulesFault> faults;
        ProductionRules const rules =
            ProductionRules::from(json::strToObject(example.data(), example.size()), faults);
        EXPECT_THAT(faults, IsEmpty()) << example;
        EXPECT_TRUE(rules.window) << example;
        EXPECT_NE(rules.postcode, "") << example;
    }
}

} // namespace

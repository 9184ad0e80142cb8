// Letters and settings that are broken in exactly one way: the first near miss must name it.
#include "tests/vlmail/explain/explain_fixture.h"

#include <set>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

struct Broken {
    char const* folder;
    char const* field;
    char const* firstNearMiss;
};

Broken const BROKEN[]{
    {"address-far-from-the-point", "postal",
     "block: would match in the text block 80 mm away from the point of the zone \"_Address\": move the "
     "point "
     "from (45 mm, 62 mm) to (133 mm, 96 mm)"},
    {"address-wider-than-allowed", "postal",
     "width: the match is 168.01 mm wide and the field allows 140 mm: raise \"width\" to 16801 or more, or "
     "let "
     "the pattern or the zone take less text"},
    {"address-window-too-high", "postal",
     "zone: would match 18 mm below the zone \"Address\": move its bottom from 45 mm to 63 mm or more"},
    {"address-window-too-wide", "postal",
     "zone: would match with the zone \"Address\" 70 mm smaller at its right: move its right from 200 mm to "
     "130 mm or less"},
    {"decomposed-umlaut-in-the-pattern", "fee",
     "normalisation: would match \"Mahngeb\u00FChr: 5.00 EUR\" after Unicode normalisation: the pattern has "
     "decomposed letters (NFD) and documents are read with composed ones (NFC); type it anew as "
     "\"^Mahngeb\u00FChr: (?<VAL>[\\d.]+) EUR$\""},
    {"field-in-the-wrong-zone", "total",
     "other_zone: would match \"Total: 12.30 EUR\" in the zone \"Info\": move the field there"},
    {"field-on-the-second-page", "total",
     "other_page: would match \"Total: 12.30 EUR\" on page 2 outside the zone \"Text\"; fields are searched "
     "on "
     "the first page of a letter: set the zone's \"page\" in \"reading\" to 2, or move the text, or set "
     "\"skip_first_page\" if page 1 is a cover "
     "sheet"},
    {"no-value-group", "total",
     "value_group: the pattern matches \"Total: 12.30 EUR\", but has no group (?<VAL>...): put one round the "
     "part that is the value"},
    {"other-letter-case", "total",
     "letter_case: would match \"TOTAL: 12.30 EUR\" with another letter case: begin the pattern with (?i)"},
    {"pattern-stops-short", "total",
     "rest: \"Total: 12.30\" fits \"^Total: (?<VAL>[\\d.]+)\", but \" USD\" behind it does not fit \" "
     "EUR$\""},
    {"taken-by-an-earlier-field", "total",
     "earlier_field: would match \"Total: 12.30 EUR\", but the field \"subject\", which is searched before "
     "it, "
     "takes that line: put this field in front of it, or into a zone of its own"},
    {"typographic-dash", "reference",
     "look_alike: would match \"Our reference: AB\u20131704\" if characters that look alike were the same: "
     "the "
     "letter has \"\u2013\" (U+2013) where the pattern has \"-\": let the pattern take both"},
    {"value-broken-over-two-lines", "reference",
     "joined_lines: would match with the lines \"Our reference: AB-17\" and \"04\" joined: let the "
     "pattern take a line break there, \\s in the place of a blank or \\h"},
    {"value-out-of-range", "total",
     "limit: 12.30 is above the maximum 10: raise \"value_max\", or correct the letter"},
    {"wide-gap-in-the-line", "fax",
     "gaps: would match \"Fax: 01632 960017\" with \"max_spaces_between_fragments\" at 60 or more instead of "
     "3"},
    {"wrong-literal", "customer",
     "literal: \"Kunden-Nr.:\" of the pattern occurs nowhere in the letter; the nearest is \"Kundennr.:\" on "
     "page 1: correct the pattern"},
    {"zone-ends-too-high", "total",
     "zone: would match 7 mm below the zone \"Text\": move its bottom from 134 mm to 141 mm or more"},
};

fs::path const EXAMPLES = fs::path(VLSERVICE_EXAMPLES) / "broken";

fs::path documentIn(fs::path const& folder) {
    for (char const* const name : {"invoice 17.txt", "invoice 17.pdf"})
        if (fs::exists(folder / name))
            return folder / name;
    throw std::runtime_error("there is no document in " + folder.string());
}

class BrokenExamples : public ExplainTest, public testing::WithParamInterface<Broken> {};

TEST_P(BrokenExamples, HaveTheirCauseAsTheFirstNearMiss) {
    fs::path const folder = EXAMPLES / GetParam().folder;
    json::Object const reading = explained(documentIn(folder), folder / "settings.json");
    std::vector<std::string> const told = nearMisses(reading, GetParam().field);
    ASSERT_FALSE(told.empty());
    EXPECT_EQ(told.front(), GetParam().firstNearMiss);
    EXPECT_LE(told.size(), 3U);
}

TEST_P(BrokenExamples, TellTheCauseToPeopleToo) {
    fs::path const folder = EXAMPLES / GetParam().folder;
    vlmail({"letter", "--explain", "--settings", (folder / "settings.json").string(),
            documentIn(folder).string()});
    std::string const told = GetParam().firstNearMiss;
    EXPECT_THAT(out_, testing::HasSubstr("\n            1. " + told.substr(told.find(": ") + 2) + "\n"));
    EXPECT_EQ(err_, "");
}

INSTANTIATE_TEST_SUITE_P(Letters, BrokenExamples, testing::ValuesIn(BROKEN), [](auto const& test) {
    std::string name = test.param.folder;
    std::replace(name.begin(), name.end(), '-', '_');
    return name;
});

TEST(BrokenExamplesFolder, HasNoLetterWithoutATest) {
    std::set<std::string> tested;
    for (Broken const& broken : BROKEN)
        tested.insert(broken.folder);
    for (fs::directory_entry const& entry : fs::directory_iterator(EXAMPLES)) {
        bool const isLetter = fs::exists(entry.path() / "settings.json");
        EXPECT_TRUE(!isLetter || tested.count(entry.path().filename().string())) << entry.path();
    }
}

} // namespace
} // namespace VlMail

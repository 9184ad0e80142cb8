#include "tests/vlmail/presets/settings_file.h"
#include "tests/vlmail/run_vlmail.h"

#include <gmock/gmock.h>

#include <string>

using namespace VlMail;

namespace {

std::string const OFFICE = R"({"presets": {
    "extract_presets": [
        {"match": "invoice.*\\.pdf", "order": 20, "pack_preset": "Bills", "name": "Invoices"},
        {"match": "reminder.*", "order": 10, "pack_preset": "Reminders"}],
    "pack_presets": [{"name": "Bills"}]}})";

Ran match(std::string const& json, std::vector<std::string> const& arguments) {
    SettingsFile const file(json);
    std::vector<std::string> all{"presets", "match", "--settings", file.path()};
    all.insert(all.end(), arguments.begin(), arguments.end());
    return runVlMail(all);
}

} // namespace

TEST(MatchCommand, SaysWhichPresetAndWhyNotTheEarlierOnes) {
    Ran const ran = match(OFFICE, {"Invoice 17.PDF", "letters/note.txt"});
    EXPECT_EQ(ran.status, FINE);
    EXPECT_EQ(ran.err, "");
    EXPECT_EQ(ran.out, R"(Invoice 17.PDF
  1. "reminder.*": no, the name does not begin with "reminder"
  2. "Invoices" ("invoice.*\.pdf"): yes, /presets/extract_presets/0
  sent by the pack preset "Bills", /presets/pack_presets/0
note.txt
  1. "reminder.*": no, the name does not begin with "reminder"
  2. "Invoices" ("invoice.*\.pdf"): no, the name does not begin with "invoice"
  3. ".*": yes, added by default
  sent by the pack preset "GLOBAL", added by default
)");
}

TEST(MatchCommand, HasDefaultsWithoutSettings) {
    Ran const ran = runVlMail({"presets", "match", "a.pdf"});
    EXPECT_EQ(ran.status, FINE);
    EXPECT_EQ(ran.out, R"(a.pdf
  1. ".*": yes, added by default
  sent by the pack preset "GLOBAL", added by default
)");
}

TEST(MatchCommand, PrintsAnObjectANameForMachines) {
    Ran const ran = match(OFFICE, {"--json", "invoice.pdf", "x"});
    EXPECT_EQ(ran.status, FINE);
    EXPECT_EQ(
        ran.out,
        R"({"name":"invoice.pdf","extract_preset":{"number":2,"name":"Invoices","match":"invoice.*\\.pdf",)"
        R"("place":"/presets/extract_presets/0"},"pack_preset":{"name":"Bills","place":"/presets/pack_presets/0"},)"
        R"("earlier":[{"number":1,"name":"","match":"reminder.*","place":"/presets/extract_presets/1",)"
        R"("why":"the name does not begin with \"reminder\"","failed_part":"reminder","fitted":""}]})"
        "\n"
        R"({"name":"x","extract_preset":{"number":3,"name":"","match":".*","place":null},)"
        R"("pack_preset":{"name":"GLOBAL","place":null},)"
        R"("earlier":[{"number":1,"name":"","match":"reminder.*","place":"/presets/extract_presets/1",)"
        R"("why":"the name does not begin with \"reminder\"","failed_part":"reminder","fitted":""},)"
        R"({"number":2,"name":"Invoices","match":"invoice.*\\.pdf","place":"/presets/extract_presets/0",)"
        R"("why":"the name does not begin with \"invoice\"","failed_part":"invoice","fitted":""}]})"
        "\n");
}

TEST(MatchCommand, SaysThatThePackPresetIsMissing) {
    Ran const ran = match(OFFICE, {"reminder.pdf"});
    EXPECT_EQ(ran.status, FAILED);
    EXPECT_EQ(ran.out, "reminder.pdf\n  1. \"reminder.*\": yes, /presets/extract_presets/1\n");
    EXPECT_EQ(
        ran.err,
        "vlmail: \"reminder.pdf\": there is no pack preset \"Reminders\"; add it, or name another one in "
        "\"reminder.*\" [preset-missing]\n");
}

TEST(MatchCommand, StopsAtABrokenExpressionAsReadingDoes) {
    std::string const json =
        R"({"extract_presets": [{"match": "a.*"}, {"match": "b(", "name": "B"}, {"match": ".*"}]})";
    Ran ran = match(json, {"b.pdf"});
    EXPECT_EQ(ran.status, FAILED);
    EXPECT_EQ(ran.out, "b.pdf\n  1. \"a.*\": no, the name does not begin with \"a\"\n");
    EXPECT_THAT(ran.err, testing::StartsWith(
                             "vlmail: \"b.pdf\": preset 2, \"B\" (\"b(\"), cannot be tried: Unmatched"));
    EXPECT_THAT(ran.err,
                testing::EndsWith("; correct it, or no later preset is reached [pattern-invalid]\n"));
    ran = match(json, {"--json", "b.pdf"});
    EXPECT_THAT(ran.out, testing::HasSubstr(R"("error":"preset 2, \"B\" (\"b(\"), cannot be tried: )"));
}

TEST(MatchCommand, TriesPresetsInTheOrderOfReading) {
    std::string const json = R"({"extract_presets": [
        {"match": "c", "order": 5, "pack_preset": "P"},
        {"inh": true, "v": {"match": "b", "order": 5, "pack_preset": "P"}},
        {"match": "a", "pack_preset": "P"}], "pack_presets": [{"name": "P"}]})";
    Ran const ran = match(json, {"b"});
    EXPECT_EQ(ran.out, R"(b
  1. "a": no, the name does not begin with "a"
  2. "c": no, the name does not begin with "c"
  3. "b": yes, /extract_presets/1/v
  sent by the pack preset "P", /pack_presets/0
)");
}

TEST(MatchCommand, ShowsNamesThatAreNoUtf8) {
    Ran const ran = runVlMail({"presets", "match", "a\xFF.pdf"});
    EXPECT_EQ(ran.status, FINE);
    EXPECT_THAT(ran.out, testing::StartsWith("a\xEF\xBF\xBD.pdf\n"));
}

TEST(MatchCommand, RefusesSettingsThatCannotBeUsed) {
    SettingsFile const file(R"({"presets": {"extract_presets": 5}})");
    Ran const ran = runVlMail({"presets", "match", "--settings", file.path(), "a"});
    EXPECT_EQ(ran.status, FAILED);
    EXPECT_EQ(ran.err, "vlmail: cannot use the presets in \"" + file.path() +
                           "\": JSON error: Wrong type: integer. Expected type: array; correct them there "
                           "[settings-malformed]\n");
}

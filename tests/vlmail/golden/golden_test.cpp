#include "tests/vlmail/run_vlmail.h"

#include "tests/support/temporary_folder.h"
#include "tests/support/time_zone.h"

#include <gmock/gmock.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <system_error>

using namespace VlMail;
using testing::HasSubstr;

namespace {

std::string const SETTINGS = R"_({
    "extract_presets": [
        {"match": "terms.*", "order": 1, "type": 1, "pack_preset": "Bills"},
        {"match": ".*", "order": 2, "pack_preset": "Bills", "zones": [
            {"name": "Page", "location": {"left": 1, "top": 1, "right": 21000, "bottom": 29700}, "fields": [
                {"name": "to", "value_extract": "^To: (?<VAL>.*)$", "priority": 1, "send_to_server": true,
                 "mark": 1},
                {"name": "total", "value_extract": "^Total: (?<VAL>.*)$", "value_type": 2,
                 "value_min": 0, "value_max": 5000},
                {"name": "due", "value_extract": "^Due: (?<VAL>.*)$", "value_type": 3, "value_min": 0},
                {"name": "currency", "default_value": "EUR"},
                {"name": "note", "value_extract": "^Note: (?<VAL>.*)$", "obligatory": true}]}]}],
    "pack_presets": [{"name": "Bills"}]})_";

std::string const LETTER = "To: Jane\nTotal: 1,234.50\nDue: 05/03/2021\nNote: x\n";

std::string const EXPECTATION = R"_({
  "extract_preset": ".*",
  "pack_preset": "Bills",
  "letters": [
    {
      "pages": [
        1
      ],
      "goes_to": "to",
      "fields": {
        "to": "Jane",
        "total": 1234.5,
        "due": {
          "date": "2021/03/05 00:00:00"
        },
        "currency": "EUR",
        "note": "x"
      }
    }
  ]
}
)_";

/// A folder of test cases.
class GoldenTests : public testing::Test {
protected:
    GoldenTests() { write("node.json", SETTINGS); }

    void write(std::string const& name, std::string const& text) const {
        std::ofstream(folder_ / name.c_str()) << text;
    }
    std::string read(std::string const& name) const {
        std::ifstream file(folder_ / name.c_str());
        return {std::istreambuf_iterator<char>(file), {}};
    }
    std::string path() const { return folder_.path().string(); }

    Ran test(std::vector<std::string> const& options = {}) const {
        std::vector<std::string> arguments{"presets", "test", path()};
        arguments.insert(arguments.end(), options.begin(), options.end());
        return runVlMail(arguments);
    }
    /// The report on LETTER with that expectation.
    std::string reportOn(std::string const& letter, std::string const& expectation) const {
        write("a.txt", letter);
        write("a.txt.expected.json", expectation);
        return test().out;
    }

private:
    TemporaryFolder folder_;
};

} // namespace

TEST_F(GoldenTests, FailWithoutAnExpectation) {
    write("a.txt", LETTER);
    Ran const ran = test();
    EXPECT_EQ(ran.status, FAILED);
    EXPECT_EQ(ran.out, "new      a.txt: nothing is expected of it yet; --update writes what is found\n"
                       "1 case: 1 without an expectation\n");
    EXPECT_EQ(read("a.txt.expected.json"), "");
}

TEST_F(GoldenTests, WriteWhatIsFoundOnlyWhenAsked) {
    write("a.txt", LETTER);
    Ran ran = test({"--update"});
    EXPECT_EQ(ran.status, FINE);
    EXPECT_EQ(ran.out, "written  a.txt\n1 case: 1 written\n");
    EXPECT_EQ(read("a.txt.expected.json"), EXPECTATION);
    ran = test();
    EXPECT_EQ(ran.status, FINE);
    EXPECT_EQ(ran.out, "ok       a.txt\n1 case: 1 ok\n");
}

TEST_F(GoldenTests, SayWhatAnUpdateChanges) {
    write("a.txt", LETTER);
    write("a.txt.expected.json", R"({"letters": [], "pack_preset": "Bills"})");
    Ran const ran = test({"--update"});
    EXPECT_EQ(ran.status, FINE);
    EXPECT_EQ(ran.out, "written  a.txt\n    letter 1: not expected, found on page 1\n1 case: 1 written\n");
    EXPECT_EQ(read("a.txt.expected.json"), EXPECTATION);
}

TEST_F(GoldenTests, SayInWordsWhatDiffers) {
    EXPECT_EQ(
        reportOn(
            "To: Jane\nTotal: 7812.4\nDue: never\n",
            R"_({"extract_preset": "a.*", "pack_preset": "bills", "letters": [{"pages": [1, 2], "goes_to": null,
                           "missing": [], "fields": {"to": "John", "total": 1234.5, "due": {"date": "2021/03/05 00:00:00"},
                           "note": "x"}}]})_"),
        R"(differs  a.txt
    extraction preset: expected "a.*", found ".*"
    pack preset: expected "bills", found "Bills"
    pages: expected [1,2], found [1]
    goes to: expected null, found "to"
    missing: expected [], found ["note"]
    to: expected "John", found "Jane"
    total: expected 1234.5, found "7812.4" (invalid: 7812.4 is above the maximum 5000)
    due: expected 2021/03/05 00:00:00, found "never" (invalid: "never" matches no date pattern: day/month/year is expected)
    note: expected "x", not found
    currency: not expected, found "EUR"
1 case: 1 different
)");
}

TEST_F(GoldenTests, TellLettersApartByTheirNumbers) {
    EXPECT_EQ(
        reportOn(
            "To: Jane\n\fTo: John\n",
            R"_({"letters": [{"fields": {"to": "Jane", "currency": "EUR"}}, {"fields": {"to": "J", "currency": "EUR"}},
                           {"fields": {}}]})_"),
        R"(differs  a.txt
    letter 2: to: expected "J", found "John"
    letter 3: expected, not found
1 case: 1 different
)");
}

TEST_F(GoldenTests, CompareOnlyWhatIsExpectedAroundTheFields) {
    EXPECT_THAT(reportOn("To: Jane\n", R"({"letters": [{"fields": {"to": "Jane", "currency": "EUR"}}]})"),
                HasSubstr("ok       a.txt\n"));
}

TEST_F(GoldenTests, ExpectInvalidValuesToo) {
    EXPECT_THAT(reportOn("Total: 6000\n",
                         R"({"letters": [{"fields": {"total": {"invalid": "6000"}, "currency": "EUR"}}]})"),
                HasSubstr("ok       a.txt\n"));
    EXPECT_THAT(reportOn("Total: 60\n",
                         R"({"letters": [{"fields": {"total": {"invalid": "6000"}, "currency": "EUR"}}]})"),
                HasSubstr("\n    total: expected \"6000\" (invalid), found 60\n"));
}

TEST_F(GoldenTests, TakeRealsThatDifferInTheLastDigitsForTheSame) {
    EXPECT_THAT(reportOn("Total: 0.30000000000000004\n",
                         R"({"letters": [{"fields": {"total": 0.3, "currency": "EUR"}}]})"),
                HasSubstr("ok       a.txt\n"));
    EXPECT_THAT(reportOn("Total: 3\n", R"({"letters": [{"fields": {"total": 3, "currency": "EUR"}}]})"),
                HasSubstr("ok       a.txt\n"));
}

TEST_F(GoldenTests, HoldInEveryTimeZone) {
    for (char const* zone : {"Europe/Berlin", "America/New_York", "Asia/Tokyo"}) {
        VLServiceTest::TimeZone const here(zone);
        EXPECT_THAT(reportOn(LETTER, EXPECTATION), HasSubstr("ok       a.txt\n")) << zone;
    }
}

TEST_F(GoldenTests, KnowAttachments) {
    write("terms.txt", "Terms\n");
    write("terms.txt.expected.json", R"({"letters": null})");
    EXPECT_EQ(test().out, "ok       terms.txt\n1 case: 1 ok\n");
    write("terms.txt.expected.json", R"({"letters": [{"fields": {}}]})");
    EXPECT_THAT(test().out, HasSubstr("    expected 1 letter, found an attachment\n"));
    EXPECT_THAT(reportOn("To: Jane\n", R"({"letters": null})"),
                HasSubstr("    expected an attachment, found 1 letter\n"));
}

TEST_F(GoldenTests, GoOnBehindADamagedDocument) {
    write("a.pdf", "%PDF-1.7 damaged");
    write("b.txt", LETTER);
    write("b.txt.expected.json", EXPECTATION);
    write("c.txt.expected.json", EXPECTATION);
    write("readme.md", "not a case");
    Ran const ran = test({"--update"});
    EXPECT_EQ(ran.status, FAILED);
    EXPECT_THAT(ran.out, testing::StartsWith("failed   a.pdf: "));
    EXPECT_THAT(ran.out, HasSubstr("\nok       b.txt\n"));
    EXPECT_THAT(ran.out,
                HasSubstr("\nfailed   c.txt.expected.json: its document is missing; bring it back, or remove "
                          "the expectation\n3 cases: 1 ok, 2 failed\n"));
}

TEST_F(GoldenTests, RefuseWhatIsNoExpectation) {
    struct {
        char const* expectation;
        char const* message;
    } const cases[] = {
        {"{",
         "JSON error: string or '}' expected near end of file (line 1, column 1); correct the file there"},
        {"{}", "\"letters\" is missing; write a list of letters, or null for an attachment"},
        {R"({"letters": {}})", "\"letters\" is no list; write a list of letters, or null for an attachment"},
        {R"({"lettres": []})",
         "\"lettres\" is nothing that can be expected there; write one of \"extract_preset\", "
         "\"pack_preset\", \"letters\""},
        {R"({"letters": [5]})", "a letter must be an object; write {\"fields\": {...}}"},
        {R"({"letters": [{}]})", "a letter has no object \"fields\"; write the fields that it is to have"},
        {R"({"letters": [{"fields": {}, "page": 1}]})",
         "\"page\" is nothing that can be expected there; write one of \"pages\", \"goes_to\", \"missing\", "
         "\"fields\""},
        {R"({"letters": [{"fields": {"a": {"dat": "1"}}}]})",
         "the value of \"a\" is none that a field can have; write a text, a number, {\"date\": \"...\"} or "
         "{\"invalid\": \"...\"}"},
    };
    for (auto const& [expectation, message] : cases)
        EXPECT_THAT(
            reportOn("To: Jane\n", expectation),
            HasSubstr(std::string("failed   a.txt: its expectation cannot be used: ") + message + '\n'))
            << expectation;
}

TEST_F(GoldenTests, ReadLettersWrittenAsTheTextsOfTheirZones) {
    write("Invoice 1.pdf.zones", "[Page]\r\nHello\nNote: y\nTotal: 9\nTotal: 10\n");
    EXPECT_EQ(test({"--update"}).out, "written  Invoice 1.pdf.zones\n1 case: 1 written\n");
    EXPECT_EQ(read("Invoice 1.pdf.zones.expected.json"), R"_({
  "extract_preset": ".*",
  "pack_preset": "Bills",
  "letters": [
    {
      "goes_to": null,
      "missing": [
        "to"
      ],
      "fields": {
        "total": 9.0,
        "currency": "EUR",
        "note": "y"
      }
    }
  ]
}
)_");
    EXPECT_EQ(test().status, FINE);
}

TEST_F(GoldenTests, RefuseZonesThatAreNotThere) {
    struct {
        char const* text;
        char const* message;
    } const cases[] = {
        {"", "it is empty; write [Name of a zone] and the zone's text"},
        {"Total: 9\n", "it does not begin with the name of a zone; put [Name] in front"},
        {"[page]\nTotal: 9\n", "the preset for \".*\" has no zone \"page\"; it has \"Page\""},
    };
    for (auto const& [text, message] : cases) {
        write("a.zones", text);
        EXPECT_THAT(test().out, HasSubstr(std::string("failed   a.zones: ") + message + '\n')) << text;
    }
}

TEST_F(GoldenTests, PrintAnObjectACaseForMachines) {
    write("a.txt", "To: Jane\n");
    write("a.txt.expected.json", R"({"letters": [{"fields": {"to": "Jane"}}]})");
    write("b.txt", LETTER);
    write("c.txt", LETTER);
    write("c.txt.expected.json", EXPECTATION);
    Ran const ran = test({"--json"});
    EXPECT_EQ(ran.status, FAILED);
    EXPECT_EQ(
        ran.out,
        R"({"case":"a.txt","verdict":"differs","differences":["currency: not expected, found \"EUR\""]})"
        "\n"
        R"({"case":"b.txt","verdict":"new","message":"nothing is expected of it yet; --update writes what is found"})"
        "\n"
        R"({"case":"c.txt","verdict":"ok"})"
        "\n");
}

TEST_F(GoldenTests, TakeOtherSettingsThanTheFolders) {
    write("a.txt", "To: Jane\n");
    write("a.txt.expected.json", R"({"extract_preset": "a.*", "letters": null})");
    write("other", R"({"extract_presets": [{"match": "a.*", "pack_preset": "GLOBAL", "type": 1}]})");
    EXPECT_EQ(test().status, FAILED);
    EXPECT_EQ(test({"--settings", path() + "/other"}).out, "ok       a.txt\n1 case: 1 ok\n");
}

TEST_F(GoldenTests, AreFoundInInnerFoldersAndNamedByThem) {
    std::filesystem::create_directory(path() + "/inner");
    write("inner/a.txt", LETTER);
    write("inner/a.txt.expected.json", EXPECTATION);
    EXPECT_EQ(test().out, "ok       inner/a.txt\n1 case: 1 ok\n");
}

TEST_F(GoldenTests, WantAFolderWithCases) {
    Ran ran = test();
    EXPECT_EQ(ran.status, FAILED);
    EXPECT_EQ(ran.err, "vlmail: there are no test cases in \"" + path() +
                           "\"; put PDF or text documents there [file-unsuitable]\n");
    ran = runVlMail({"presets", "test", path() + "/none"});
    EXPECT_EQ(ran.status, FAILED);
    // In the words of the system, which follow the person's language.
    std::string const reason = std::make_error_code(std::errc::no_such_file_or_directory).message();
    EXPECT_EQ(ran.err, "vlmail: cannot look into the folder \"" + path() + "/none\": " + reason +
                           "; name a folder with test cases [file-unreadable]\n");
}

// vlmail letter --report: from documents to the file, and what a browser makes of it.
#include "programs/reader/document.h"
#include "tests/vlmail/run_vlmail.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>

namespace {

namespace fs = std::filesystem;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

constexpr char const* SETTINGS = R"({
    "extract_presets": [
        {"match": "terms.*", "pack_preset": "Invoices", "type": 1},
        {"match": ".*", "pack_preset": "Invoices", "zones": [
            {"name": "Window", "location": {"left": 2000, "top": 800, "right": 12000, "bottom": 3000}, "fields": [
                {"name": "postal", "value_extract": "^To: (?<VAL>.*)$", "priority": 1, "send_to_server": true}]},
            {"name": "Rest", "location": {"left": 0, "top": 3000, "right": 21000, "bottom": 29700}, "fields": [
                {"name": "number", "value_extract": "^No (?<VAL>.*)$", "value_type": 1},
                {"name": "due", "value_extract": "^Due (?<VAL>.*)$", "obligatory": true},
                {"name": "wide", "value_extract": "^Wide (?<VAL>.*)$", "width": 1000},
                {"name": "postal", "value_extract": "^Or: (?<VAL>.*)$", "priority": 1, "send_to_server": true},
                {"name": "currency", "default_value": "EUR", "value_extract": "^Currency (?<VAL>.*)$"},
                {"name": "begin", "value_extract": "^No .*$", "mark": 1}]}]}],
    "pack_presets": [{"name": "Invoices"}]})";

constexpr char const* LETTER =
    "To: <script>alert(1)</script>\n\n\n\n\n\n\nNo twelve\n\nWide as a barn\n\nOr: Bob\n";

std::string contentOf(fs::path const& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

class ReportCommand : public testing::Test {
protected:
    ReportCommand() {
        std::string name = (fs::temp_directory_path() / "vlmail.XXXXXX").string();
        folder_ = ::mkdtemp(name.data());
        write("node.json", SETTINGS);
        write("one.txt", LETTER);
    }
    ~ReportCommand() override { fs::remove_all(folder_); }

    std::string path(std::string const& name) const { return (folder_ / name).string(); }
    void write(std::string const& name, std::string const& text) const {
        std::ofstream(folder_ / name, std::ios::binary) << text;
    }
    Ran report(std::vector<std::string> const& files, std::string const& target = "report.html") const {
        std::vector<std::string> arguments{"letter", "--settings", path("node.json"), "--jobs",
                                           "2",      "--report",   path(target)};
        for (std::string const& file : files)
            arguments.push_back(path(file));
        return runVlMail(arguments);
    }
    std::string html() const { return contentOf(folder_ / "report.html"); }

    fs::path folder_;
};

TEST_F(ReportCommand, ShowsZonesMatchesAndStates) {
    Ran const ran = report({"one.txt"});
    EXPECT_EQ(ran.status, 2) << ran.err;
    EXPECT_THAT(ran.out, StartsWith("one.txt\n"));
    std::string const page = html();
    EXPECT_THAT(page, HasSubstr("aria-label=\"address window Window\""));
    EXPECT_THAT(page, HasSubstr("style=\"left:9.52%;top:2.69%;width:47.62%;height:7.41%\""));
    EXPECT_THAT(page, HasSubstr("aria-label=\"field postal: \u2713 found\""));
    EXPECT_THAT(page, HasSubstr("aria-label=\"field number: \u2717 invalid\""));
    EXPECT_THAT(page, HasSubstr("<bdi>recipient, this one counts</bdi>"));
    EXPECT_THAT(page, HasSubstr("aria-label=\"field postal: \u2013 not used\""));
    EXPECT_THAT(page, HasSubstr("another field of this name counts"));
    EXPECT_THAT(page, HasSubstr("\u2717 missing</span><small><bdi>it is obligatory"));
    EXPECT_THAT(page, HasSubstr(" mm wide, allowed are 10 mm"));
    EXPECT_THAT(page, HasSubstr("<bdi>EUR</bdi></td><td><span class=\"state quiet\">= default"));
    EXPECT_THAT(page, HasSubstr("src=\"data:image/png;base64,iVBORw0KGgo"));
    EXPECT_THAT(page, Not(HasSubstr("<script")));
}

TEST_F(ReportCommand, HasEachDocumentInTheirOrderAlsoThoseWithoutLetters) {
    write("bad.pdf", "%PDF-1.7 and no more");
    write("terms.txt", "Terms\n");
    EXPECT_EQ(report({"bad.pdf", "one.txt", "terms.txt"}).status, 1);
    std::string const page = html();
    EXPECT_THAT(page,
                HasSubstr("<a href=\"#d1\"><bdi>bad.pdf</bdi></a> <span class=\"state bad\">\u2717 failed"));
    EXPECT_THAT(
        page, HasSubstr("<a href=\"#d2\"><bdi>one.txt</bdi></a> <span class=\"state bad\">\u2717 1 letter, 1 "
                        "cannot go out"));
    EXPECT_THAT(page, HasSubstr("<a href=\"#d3\"><bdi>terms.txt</bdi></a> <span class=\"state \">\u2713 an "
                                "attachment"));
    EXPECT_LT(page.find("<section class=\"document bare\" id=\"d1\""),
              page.find("<section class=\"document\" id=\"d2\""));
}

TEST_F(ReportCommand, PutsTheNameOfAMatchWhereItHidesNoText) {
    write("number.json", R"json({"extract_presets": [{"match": ".*", "pack_preset": "Invoices", "zones": [
        {"name": "Page", "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": [
            {"name": "number", "value_extract": "No (?<VAL>[0-9]+)"}]}]}],
        "pack_presets": [{"name": "Invoices"}]})json");
    struct Case {
        char const* line;
        char const* look;
    };
    for (Case const& expected : {Case{"No 5", "match "}, Case{"No 5   behind", "match  front"},
                                 Case{"stands in front   No 5   behind", "match  above"}}) {
        write("number.txt", std::string("First line\n\n\n") + expected.line + "\n");
        runVlMail({"letter", "--settings", path("number.json"), "--report", path("report.html"),
                   path("number.txt")});
        EXPECT_THAT(html(), HasSubstr(std::string("<a class=\"") + expected.look + "\"")) << expected.line;
    }
}

TEST_F(ReportCommand, DrawsWhatMakesAPageLookLikeTheFirstOfALetter) {
    write("node.json", R"({"extract_presets": [{"match": ".*", "pack_preset": "P", "zones": [
        {"name": "All", "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": [
            {"name": "number", "mark": 1, "value_extract": "^No (?<VAL>.*)$"}]}]}], "pack_presets": [{"name": "P"}]})");
    write("two.txt", "No 1\n\fNO 2\n");
    report({"two.txt"});
    std::string const page = contentOf(path("report.html"));
    EXPECT_THAT(page, HasSubstr("letter-not-separated"));
    EXPECT_THAT(page, HasSubstr("may begin another letter: &quot;NO 2&quot; nearly is the mark "
                                "&quot;number&quot;, with another letter case"));
    EXPECT_THAT(page, HasSubstr("<figcaption>Page 2, on which something is wrong.</figcaption>"));
    EXPECT_THAT(page, HasSubstr("<a class=\"fault\" id=\"d1l1p1\""));
}

TEST_F(ReportCommand, DrawsJoinedLinesWithAnInvalidValueLikeSureOnes) {
    write("apart.txt", "To: Ada\n\n\n\n\n\n\nNo             twelve\n");
    report({"apart.txt"});
    EXPECT_THAT(contentOf(path("report.html")), HasSubstr("joined with the line to the right"));
}

TEST_F(ReportCommand, IsTheSameOnOneProcessAndOnTwo) {
    write("two.txt", LETTER);
    report({"one.txt", "two.txt"});
    std::string const onTwo = html();
    runVlMail({"letter", "--settings", path("node.json"), "--jobs", "1", "--report", path("report.html"),
               path("one.txt"), path("two.txt")});
    EXPECT_EQ(html(), onTwo);
}

TEST_F(ReportCommand, RefusesToOverwriteWhatIsNoPage) {
    Ran const ran = report({"one.txt"}, "node.json");
    EXPECT_EQ(ran.status, 1);
    EXPECT_EQ(ran.err, "vlmail: cannot write a report to \"" + path("node.json") +
                           "\": its name must end in .html; give --report another name [usage]\n");
    EXPECT_EQ(contentOf(path("node.json")), SETTINGS);
}

TEST_F(ReportCommand, FailsBeforeReadingWhenItCannotBeWritten) {
    Ran const ran = report({"one.txt"}, "none/report.html");
    EXPECT_EQ(ran.status, 1);
    EXPECT_EQ(ran.out, "");
    EXPECT_THAT(ran.err, HasSubstr("cannot write into " + path("none")));
}

/// Runs a browser on the page without a network. It is the system's; without one there is nothing to see.
class ReportInABrowser : public ReportCommand {
protected:
    void SetUp() override {
        if (std::system("command -v chromium >/dev/null") != 0)
            GTEST_SKIP() << "chromium is not installed";
        report({"one.txt"});
    }
    void browse(std::string const& what) const {
        std::string const command =
            "timeout 120 chromium --headless --no-sandbox --disable-gpu --disable-quic --no-first-run "
            "--disable-background-networking --disable-component-update --disable-sync "
            "--host-resolver-rules='MAP * ~NOTFOUND' --user-data-dir=" +
            path("profile") + ' ' + what + " file://" + path("report.html") + " >" + path("dom") + " 2>" +
            path("log");
        ASSERT_EQ(std::system(command.c_str()), 0) << contentOf(path("log"));
    }
};

TEST_F(ReportInABrowser, IsReadAsItWasWritten) {
    browse("--dump-dom");
    std::string const dom = contentOf(path("dom"));
    EXPECT_THAT(dom, HasSubstr("&lt;script&gt;alert(1)&lt;/script&gt;"));
    EXPECT_THAT(dom, Not(HasSubstr("<script")));
    EXPECT_THAT(dom, HasSubstr("</main>"));
}

TEST_F(ReportInABrowser, PrintsASheetForTheOverviewAndOneForTheLetter) {
    browse("--no-pdf-header-footer --print-to-pdf=" + path("print.pdf"));
    EXPECT_THAT(contentOf(path("print.pdf")), HasSubstr("/Subtype /Image"));
    Reader::Document print = Reader::openDocument(path("print.pdf"));
    ASSERT_EQ(print.pageCount(), 2);
    Reader::Page const& sheet = print.page(2);
    EXPECT_GT(sheet.width, sheet.height);
    for (char const* word : {"one.txt", "Window", "Rest", "number", "missing"})
        EXPECT_TRUE(std::any_of(sheet.words.begin(), sheet.words.end(), [&](Reader::Word const& seen) {
            return seen.text == word;
        })) << word;
}

TEST_F(ReportInABrowser, PutsTheTagOfAZoneOverThePicture) {
    browse("--no-pdf-header-footer --print-to-pdf=" + path("print.pdf"));
    Reader::Document print = Reader::openDocument(path("print.pdf"));
    Reader::Page const& sheet = print.page(2);
    auto const tag = std::find_if(sheet.words.begin(), sheet.words.end(), [&](Reader::Word const& word) {
        return word.text == "Window" && word.box.left < sheet.width / 2;
    });
    ASSERT_NE(tag, sheet.words.end());
    EXPECT_LT(tag->box.bottom, sheet.height / 3);
}

} // namespace

// What would go wrong with letters on paper, as the commands tell it.
#include "programs/base/read_file.h"
#include "tests/support/json_literal.h"
#include "tests/support/raw_pdf.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlmail/run_vlmail.h"

#include <gmock/gmock.h>

#include <filesystem>
#include <fstream>
#include <iterator>

namespace {

using namespace VLServiceTest;
using testing::ElementsAre;
using testing::HasSubstr;

/// The address in the window of DIN 5008, form B.
constexpr char const* ADDRESS = "BT /F 11 Tf 71 650 Td (Lena Brandt) Tj 0 -14 Td (Lange Str. 12) Tj 0 -14 Td "
                                "(04109 Leipzig) Tj ET ";
constexpr char const* PRESETS = R"({
    "extract_presets": [{"match": "bill.*", "pack_preset": "Bills", "zones": [
        {"name": "Address", "location": {"left": 2000, "top": 4500, "right": 10500, "bottom": 9000}, "fields": [
            {"name": "postal", "value_extract": "\\A(?<VAL>(.+\\n?){2,7})\\Z", "priority": 1,
             "send_to_server": true}]}]}],
    "pack_presets": [{"name": "Bills")";

class PrintReadiness : public testing::Test {
protected:
    PrintReadiness() {
        settings("");
        write("bill 1.pdf", onePage(ADDRESS).bytes());
        write("bill 2.pdf", onePage(std::string(ADDRESS) + "1 400 50 50 re f").bytes());
    }

    std::string path(std::string const& name) const { return (folder_.path() / name).string(); }
    void write(std::string const& name, std::string const& text) const {
        std::ofstream(path(name), std::ios::binary) << text;
    }
    void settings(std::string const& production, std::string const& app = "{}") const {
        write("node.json",
              "{\"presets\": " + std::string(PRESETS) + production + "}]}, \"app\": " + app + "}");
    }
    Ran run(std::vector<std::string> arguments) const {
        arguments.insert(arguments.begin() + 1, {"--settings", path("node.json")});
        return runVlMail(arguments);
    }

    TemporaryFolder const folder_;
};

std::vector<std::string> linesOf(std::string const& text) {
    std::istringstream in(text);
    std::vector<std::string> lines;
    for (std::string line; std::getline(in, line);)
        lines.push_back(line);
    return lines;
}

json::Value findingsIn(std::string const& line) {
    json::Object const document = json::strToObject(line.data(), line.size());
    return document.get("letters").toArray().at(0).toObject().get("findings");
}

TEST_F(PrintReadiness, CountsSheetsAgainstTheLimitOfTheSettings) {
    settings("", R"({"max_letter_sheets": 1})");
    EXPECT_EQ(run({"check", path("bill 1.pdf")}).status, VlMail::FINE);
    settings(R"(, "attachments": ["terms"])", R"({"max_letter_sheets": 1})");
    write("terms.pdf", onePage("").bytes());
    for (char const* const command : {"check", "letter"}) {
        Ran const ran = run({command, "--documents", folder_.path().string(), path("bill 1.pdf")});
        EXPECT_EQ(ran.status, VlMail::INCOMPLETE) << command;
        EXPECT_THAT(ran.out, HasSubstr("too-many-sheets")) << command;
        EXPECT_THAT(ran.out, HasSubstr("2 sheets, 1 allowed by " + path("node.json"))) << command;
        EXPECT_THAT(ran.out, HasSubstr("raise \"max_letter_sheets\" there")) << command;
    }
    settings(R"(, "attachments": ["terms"])", R"({"max_letter_sheets": 2})");
    EXPECT_EQ(run({"check", "--documents", folder_.path().string(), path("bill 1.pdf")}).status,
              VlMail::FINE);
}

TEST_F(PrintReadiness, IsToldOfEachLetterWithRemediesAndAnExitStatus) {
    Ran const ran = run({"check", path("bill 1.pdf"), path("bill 2.pdf")});
    EXPECT_EQ(ran.status, 2);
    EXPECT_EQ(ran.err, "");
    EXPECT_THAT(ran.out,
                testing::MatchesRegex("bill 1.pdf\n  letter 1 of 1, page 1: ready\n"
                                      "bill 2.pdf\n  letter 1 of 1, page 1: cannot go out\n"
                                      "    error content-outside-print-area, page 1: something reaches "
                                      "[0-9.]+ mm beyond the print area on the left\n"
                                      "      move it [0-9.]+ mm right\n"
                                      "2 documents, 2 letters: 1 ready, 1 cannot go out\n"));
    EXPECT_EQ(run({"check", path("bill 1.pdf")}).status, 0);
    EXPECT_EQ(run({"check", path("bill 3.pdf")}).status, 1);
}

TEST_F(PrintReadiness, IsJsonAsThatOfLettersWithFindings) {
    Ran const ran = run({"check", "--json", path("bill 1.pdf"), path("bill 2.pdf")});
    std::vector<std::string> const lines = linesOf(ran.out);
    ASSERT_EQ(lines.size(), 2U);
    EXPECT_EQ(text(findingsIn(lines[0])), "[]");
    json::Object const finding = findingsIn(lines[1]).toArray().at(0).toObject();
    std::vector<std::string> keys;
    for (auto const& [key, value] : finding)
        keys.emplace_back(key);
    EXPECT_THAT(keys, ElementsAre("code", "severity", "pages", "box", "says", "fix"));
    EXPECT_EQ(finding.get("code").textOrEmpty(), "content-outside-print-area");
    EXPECT_EQ(finding.get("severity").textOrEmpty(), "error");
    EXPECT_EQ(text(finding.get("pages")), "[1]");
    std::vector<std::string> const plain = linesOf(run({"letter", "--json", path("bill 2.pdf")}).out);
    EXPECT_EQ(plain, std::vector{lines[1]});
}

TEST_F(PrintReadiness, KeepsLettersWithErrorsOutOfMailingsAndPlans) {
    Ran const mail = run({"mail", "-o", path("out"), path("bill 1.pdf"), path("bill 2.pdf")});
    EXPECT_EQ(mail.status, 2);
    EXPECT_THAT(mail.out, HasSubstr("content-outside-print-area: page 1: something reaches "));
    EXPECT_THAT(mail.out, HasSubstr(" mm right"));
    Ran const plan = run({"plan", "--json", "-o", path("plan.json"), path("bill 1.pdf"), path("bill 2.pdf")});
    EXPECT_EQ(plan.status, 2);
    json::Object const outcome = json::strToObject(plan.out.data(), plan.out.size());
    ASSERT_EQ(outcome.get("left_out").toArray().size(), 1U);
    json::Object const left = outcome.get("left_out").toArray().at(0).toObject();
    EXPECT_EQ(left.get("code").textOrEmpty(), "content-outside-print-area");
    EXPECT_THAT(left.get("reason").textOrEmpty(),
                testing::StartsWith("content-outside-print-area: page 1: "));
    Ran const planned = runVlMail({"mail", "--plan", path("plan.json"), "-o", path("planned")});
    EXPECT_EQ(planned.status, 2);
    EXPECT_THAT(planned.out, HasSubstr("content-outside-print-area: page 1: something reaches "));
}

TEST_F(PrintReadiness, LetsLettersWithWarningsGo) {
    settings("", R"({"loose_letter_deviation": true})");
    Ran const ran = run({"check", path("bill 2.pdf")});
    EXPECT_EQ(ran.status, 0);
    EXPECT_THAT(ran.out, HasSubstr("    warning content-outside-print-area, page 1: "));
    EXPECT_EQ(run({"mail", "-o", path("out"), path("bill 2.pdf")}).status, 0);
    EXPECT_THAT(run({"letter", path("bill 2.pdf")}).out,
                HasSubstr("    warning content-outside-print-area, page 1: "));
}

TEST_F(PrintReadiness, FindsTheAddressWhereTheLettersFieldWasRead) {
    settings(R"(, "production": {"window": {"left": 2000, "top": 4500, "right": 10500, "bottom": 9000}})");
    EXPECT_EQ(run({"check", path("bill 1.pdf")}).status, 0);
    settings(R"(, "production": {"window": {"left": 11000, "top": 4500, "right": 20000, "bottom": 9000}})");
    Ran const ran = run({"check", path("bill 1.pdf")});
    EXPECT_EQ(ran.status, 2);
    EXPECT_THAT(ran.out, HasSubstr("error address-outside-window, page 1: the address stands at 25.05 to "));
    EXPECT_THAT(ran.out, HasSubstr("      move it 85 mm right\n"));
}

TEST_F(PrintReadiness, SaysWhichRulesOfACarrierCannotBeUsedAndLetsOtherLettersGo) {
    settings(R"(, "production": {"window": {"left": 9000, "top": 0, "right": 100, "bottom": 100}})");
    write("other.txt", "Lena Brandt\nLange Str. 12\n04109 Leipzig\n");
    Ran const ran = run({"mail", "-o", path("out"), path("bill 1.pdf"), path("other.txt")});
    EXPECT_EQ(ran.status, 2);
    EXPECT_THAT(ran.out, HasSubstr("production-refused: page 1: \"production/window\" of the pack preset "
                                   "\"Bills\" has no area: it goes from 90 to 1 mm across and from 0 to 1 mm "
                                   "down; write \"left\" less than \"right\", and \"top\" less than "
                                   "\"bottom\""));
    EXPECT_FALSE(std::filesystem::is_empty(path("out")));
}

TEST_F(PrintReadiness, WithoutAReadablePartAppIsAFailureOfTheDocument) {
    settings("", R"({"print_area": 5})");
    Ran const ran = run({"check", path("bill 1.pdf")});
    EXPECT_EQ(ran.status, 1);
    EXPECT_THAT(ran.err, HasSubstr("cannot use the part \"app\" in \"" + path("node.json") + "\": "));
}

TEST_F(PrintReadiness, NamesPagesThatCannotBeReadAndLetsOtherLettersGo) {
    write("bill 3.pdf",
          onePage(ADDRESS).object(2, "<< /Type /Pages /Kids [3 0 R 99 0 R] /Count 2 >>").bytes());
    for (std::string const command : {"check", "letter"})
        EXPECT_THAT(run({command, path("bill 3.pdf")}).out, HasSubstr("    error page-unreadable, page 2: "));
    Ran const mail = run({"mail", "-o", path("out"), path("bill 1.pdf"), path("bill 3.pdf")});
    EXPECT_EQ(mail.status, 2);
    EXPECT_THAT(mail.out, HasSubstr("left out: bill 3.pdf, pages 1-2: page-unreadable: page 2: "));
    EXPECT_THAT(mail.out, HasSubstr("2 letters: 1 ready, 1 cannot go out"));
}

/// A page whose contents end early, behind the address.
std::string damagedBill() {
    std::string content = ADDRESS;
    for (int line = 0; line < 30; ++line)
        content += "BT /F 10 Tf 72 " + std::to_string(500 - 12 * line) + " Td (" +
                   std::to_string(line * 7919 % 1000) + ") Tj ET ";
    std::string const packed = deflated(content);
    return onePage("").stream(5, "/Filter /FlateDecode", packed.substr(0, packed.size() * 2 / 3)).bytes();
}

constexpr char const* REDRAWN = "contents are damaged: what can be shown of them is written anew";
constexpr char const* LOOK = "look whether all is there, or export the document again";

TEST_F(PrintReadiness, NamesPagesWhoseContentsAreWrittenAnewAndLetsThemGo) {
    write("bill 3.pdf", damagedBill());
    for (std::string const command : {"check", "letter"}) {
        Ran const ran = run({command, path("bill 3.pdf")});
        EXPECT_EQ(ran.status, 0);
        EXPECT_THAT(ran.out, HasSubstr(std::string("    warning page-redrawn, page 1: ") + REDRAWN +
                                       "\n      " + LOOK + '\n'));
    }
    EXPECT_EQ(text(findingsIn(run({"letter", "--json", path("bill 3.pdf")}).out)),
              std::string(R"([{"code":"page-redrawn","severity":"warning","pages":[1],"box":{},"says":")") +
                  REDRAWN + R"(","fix":")" + LOOK + "\"}]");
    run({"letter", "--report", path("report.html"), path("bill 3.pdf")});
    EXPECT_THAT(Base::readFile(path("report.html")), HasSubstr(REDRAWN));
}

TEST_F(PrintReadiness, NotesPagesWhoseContentsAreWrittenAnewInMailingsAndPlans) {
    write("bill 3.pdf", damagedBill());
    std::string const note = std::string("bill 3.pdf: page-redrawn: page 1: ") + REDRAWN + "; " + LOOK;
    Ran const mail = run({"mail", "-o", path("out"), path("bill 1.pdf"), path("bill 3.pdf")});
    EXPECT_EQ(mail.status, 0);
    EXPECT_THAT(mail.out, HasSubstr("note: " + note + "\n2 documents, 2 letters: 2 ready"));
    for (std::vector<std::string> const& command :
         {std::vector<std::string>{"mail", "--json", "-o", path("out"), path("bill 3.pdf")},
          {"plan", "--json", "-o", path("plan.json"), path("bill 3.pdf")}}) {
        Ran const ran = run(command);
        json::Object const outcome = json::strToObject(ran.out.data(), ran.out.size());
        EXPECT_EQ(text(outcome.get("notes")), "[\"" + note + "\"]");
    }
    EXPECT_THAT(runVlMail({"mail", "--plan", path("plan.json"), "-o", path("planned")}).out,
                HasSubstr("note: " + note + '\n'));
}

TEST_F(PrintReadiness, NotesOnceWhatIsWrittenAnewOfAttachments) {
    settings(R"(, "attachments": ["terms"])");
    std::filesystem::create_directory(path("docs"));
    write("docs/terms.pdf", damagedBill());
    write("bill 3.pdf", onePage(ADDRESS).bytes());
    std::string const said = std::string("page 1 of \"terms\": ") + REDRAWN;
    EXPECT_THAT(run({"check", "--documents", path("docs"), path("bill 1.pdf")}).out,
                HasSubstr("    warning page-redrawn: " + said + "\n      " + LOOK + '\n'));
    Ran const mail =
        run({"mail", "--documents", path("docs"), "-o", path("out"), path("bill 1.pdf"), path("bill 3.pdf")});
    EXPECT_EQ(mail.status, 0);
    std::string const note = "note: page-redrawn: " + said + "; " + LOOK + '\n';
    EXPECT_THAT(mail.out, HasSubstr(note));
    EXPECT_EQ(mail.out.find("page-redrawn"), mail.out.rfind("page-redrawn"));
}

constexpr char const* COVERED =
    R"(, "duplex": true, "production": {"window": {"left": 3000, "top": 4500, "right": 10500, "bottom": 9000},
        "repair": ["cover-page"]})";

TEST_F(PrintReadiness, IsReachedByACoverPageOnRequest) {
    settings(COVERED);
    Ran const check = run({"check", path("bill 1.pdf")});
    EXPECT_EQ(check.status, 0);
    EXPECT_THAT(check.out, HasSubstr("    a cover page with the address goes in front\n"));
    EXPECT_EQ(check.out.find("address-outside-window"), check.out.npos);
    Ran const mail = run({"mail", "--json", "-o", path("out"), path("bill 1.pdf")});
    EXPECT_EQ(mail.status, 0);
    EXPECT_THAT(mail.out, HasSubstr("\"pages\":1,\"sheets\":2,"));
    std::string const mailing = std::filesystem::directory_iterator(path("out"))->path().string();
    EXPECT_EQ(runVlMail({"pack", "verify", mailing}).status, 0);
    EXPECT_EQ(runVlMail({"pack", "extract", mailing, "-o", path("pages")}).status, 0);
    std::ifstream in(path("pages/metadata.json"));
    std::string const metadata{std::istreambuf_iterator<char>(in), {}};
    json::Object const letter =
        json::strToObject(metadata.data(), metadata.size()).get("letters").toArray().at(0).toObject();
    std::vector<std::string> parts;
    for (json::Value const& part : letter.get("documents").toArray())
        parts.push_back(part.toObject().get("name").textOrEmpty() + ": " +
                        part.toObject().get("role").textOrEmpty());
    EXPECT_THAT(parts, ElementsAre("cover page: letter", "blank: blank", "bill 1.pdf: letter"));
}

TEST_F(PrintReadiness, IsReachedByACoverPageInPlansToo) {
    settings(COVERED);
    Ran const plan = run({"plan", "--json", "-o", path("plan.json"), path("bill 1.pdf")});
    EXPECT_THAT(plan.out, HasSubstr("\"sheets\":2,"));
    Ran const mail = runVlMail({"mail", "--json", "--plan", path("plan.json"), "-o", path("out")});
    EXPECT_EQ(mail.status, 0);
    EXPECT_THAT(mail.out, HasSubstr("\"sheets\":2,"));
}

TEST_F(PrintReadiness, PutsOneCoverPageInFrontOfLettersThatGoOutAsOne) {
    settings(COVERED);
    write("bill 4.pdf", onePage(ADDRESS).bytes());
    Ran const mail = run({"mail", "--json", "-o", path("out"), path("bill 1.pdf"), path("bill 4.pdf")});
    EXPECT_EQ(mail.status, 0);
    EXPECT_THAT(mail.out, HasSubstr("\"letters\":2,\"sent_as\":1,\"pages\":2,\"sheets\":3,"));
}

} // namespace

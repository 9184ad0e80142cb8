#include "programs/base/read_file.h"
#include "programs/manual/man_page.h"

#include <gmock/gmock.h>

#include <cstdlib>
#include <filesystem>
#include <string>

using namespace testing;
namespace fs = std::filesystem;

namespace {

Base::CommandInfo const SHOW{"show",
                             "Shows what counts at a node",
                             {{{"-h", "--help"}, "", "Print this help"},
                              {{"NODE"}, "TEXT", "A node", "", true},
                              {{"PART"}, "TEXT", "Parts [all]", "", false, true},
                              {{"-o", "--output"}, "FILE", ".hidden \\n and -dashes", "x.json"}}};

TEST(ManPage, TellsNameSynopsisAndOptions) {
    EXPECT_EQ(Manual::manPage({"vlmail", "show"}, SHOW, {}, {"libVLService 1.2", 1}),
              ".TH VLMAIL\\-SHOW 1 \"\" \"libVLService 1.2\"\n"
              ".SH NAME\n"
              "vlmail\\-show \\- Shows what counts at a node\n"
              ".SH SYNOPSIS\n"
              "\\fBvlmail show\\fR\n"
              "\\fINODE\\fR\n"
              "[\\fIPART\\fR...]\n"
              "[\\fB\\-\\-output\\fR \\fIFILE\\fR]\n"
              ".SH OPTIONS\n"
              ".TP\n\\fB\\-h\\fR, \\fB\\-\\-help\\fR\nPrint this help\n"
              ".TP\n\\fINODE\\fR\nA node\n"
              ".TP\n\\fIPART\\fR\nParts [all]\n"
              ".TP\n\\fB\\-o\\fR, \\fB\\-\\-output\\fR \\fIFILE\\fR\n\\&.hidden \\en and \\-dashes [x.json]\n"
              ".SH SEE ALSO\n"
              "\\fBvlmail\\fR(1)\n");
}

TEST(ManPage, ListsTheCommandsBelowAndWhatIsExplained) {
    std::string const page =
        Manual::manPage({"vlmail"}, {"vlmail", "Sends letters", {}, {SHOW}},
                        {{"Exit status", "`0`: done.\n\n| Key | Holds |\n|---|---|\n| a | b |\n"}}, {"x", 1});
    EXPECT_THAT(page,
                HasSubstr(".SH COMMANDS\n.TP\n\\fBvlmail\\-show\\fR(1)\nShows what counts at a node\n"));
    EXPECT_THAT(page, HasSubstr(".SH EXIT STATUS\n.PP\n\\fB0\\fR: done.\n.TP\na\nb\n"));
    EXPECT_THAT(page, Not(HasSubstr("SEE ALSO")));
}

TEST(ManPages, AreSetWithoutAWarning) {
    if (std::system("groff --version >/dev/null 2>&1") != 0)
        GTEST_SKIP() << "groff is not installed";
    int pages = 0;
    for (fs::directory_entry const& entry : fs::recursive_directory_iterator(WRITTEN_MANUAL)) {
        if (entry.path().parent_path().filename() != "man")
            continue;
        ++pages;
        std::string const command = "test -z \"$(groff -k -man -Tutf8 -ww -z '" + entry.path().string() +
                                    "' 2>&1 | tee /dev/stderr)\"";
        EXPECT_EQ(std::system(command.c_str()), 0) << entry.path();
    }
    EXPECT_GT(pages, 30);
}

TEST(ManPages, HaveTheJsonFormsAndTheExitStatuses) {
    std::string const page = Base::readFile(WRITTEN_MANUAL "/vlmail/man/vlmail-letter.1");
    EXPECT_THAT(page, HasSubstr("\n\"production_ready\"\nwhether the letter can go out\n"));
    EXPECT_THAT(page, HasSubstr("\n.SH EXIT STATUS\n.PP\n0: done."));
    EXPECT_THAT(Base::readFile(WRITTEN_MANUAL "/vlserviced/man/vlserviced.8"),
                AllOf(HasSubstr(".SH DESCRIPTION\n"), HasSubstr("\\fB\\-\\-data\\fR \\fIFOLDER\\fR")));
}

} // namespace

// The road of letters as a person walks it: documents and settings in a folder, the program, what it says.
#include "programs/mailing/metadata.h"
#include "programs/vlmail/commands/command.h"
#include "tests/support/small_disk.h"
#include "vlservice/json/json_text.h"
#include "vlservice/pack/pack_wrapper.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <vector>

namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::MatchesRegex;
using testing::StartsWith;

constexpr char const* SETTINGS = R"({
    "extract_presets": [
        {"match": "invoice.*", "pack_preset": "Invoices", "zones": [
            {"name": "Page", "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": [
                {"name": "number", "value_extract": "^No (?<VAL>\\d+)$", "value_type": 1, "obligatory": true},
                {"name": "postal", "value_extract": "^To: (?<VAL>.*)$", "priority": 1, "send_to_server": true},
                {"name": "copy", "value_extract": "^Copy: (?<VAL>.*)$", "priority": -1}]}]},
        {"match": "terms.*", "pack_preset": "Invoices", "type": 1},
        {"match": "broken.*", "pack_preset": "Invoices", "zones": [
            {"name": "Page", "fields": [{"name": "total", "value_extract": "(", "priority": 0}]}]},
        {"match": "homeless.*", "pack_preset": "Nowhere"}],
    "pack_presets": [{"name": "Invoices", "duplex": true}]})";

class VlMailTest : public testing::Test {
protected:
    VlMailTest() {
        std::string name = (fs::temp_directory_path() / "vlmail.XXXXXX").string();
        folder_ = ::mkdtemp(name.data());
        write("node.json", SETTINGS);
    }
    ~VlMailTest() override { fs::remove_all(folder_); }

    std::string path(std::string const& name) const { return (folder_ / name).string(); }
    void write(std::string const& name, std::string const& text) {
        fs::create_directories((folder_ / name).parent_path());
        std::ofstream(folder_ / name, std::ios::binary) << text;
    }

    /// Runs the program; what it printed is in out_ and err_.
    int vlmail(std::vector<std::string> arguments) {
        arguments.insert(arguments.begin(), "vlmail");
        std::vector<char const*> argv;
        for (std::string const& argument : arguments)
            argv.push_back(argument.c_str());
        std::ostringstream out;
        std::ostringstream err;
        int const status =
            VlMail::run(static_cast<int>(argv.size()), argv.data(), VlMail::Terminal{out, err});
        out_ = out.str();
        err_ = err.str();
        return status;
    }
    int vlmail(std::string const& command, std::vector<std::string> const& documents,
               std::vector<std::string> more = {}) {
        std::vector<std::string> arguments{command, "--settings", path("node.json")};
        arguments.insert(arguments.end(), more.begin(), more.end());
        for (std::string const& document : documents)
            arguments.push_back(path(document));
        return vlmail(arguments);
    }

    std::vector<fs::path> mailings() const {
        std::vector<fs::path> files;
        for (auto const& entry : fs::directory_iterator(folder_ / "out"))
            files.push_back(entry.path());
        return files;
    }
    Mailing::Metadata metadataOf(fs::path const& file) {
        PackWrapper container(file.string(), PackWrapper::PURPOSE_IMPORT, {});
        return Mailing::Metadata::fromBlob(container.inputFullMeta());
    }

    fs::path folder_;
    std::string out_;
    std::string err_;
};

TEST_F(VlMailTest, ShowsPresetsFieldsAndWhetherALetterCanGoOut) {
    write("invoice 1.txt", "No 17\nTo: Ada\n");
    EXPECT_EQ(vlmail("letter", {"invoice 1.txt"}), VlMail::FINE);
    EXPECT_EQ(out_, "invoice 1.txt\n"
                    "  read by the preset for  invoice.*\n"
                    "  sent by the pack preset Invoices\n"
                    "  letter 1 of 1, page 1: ready\n"
                    "    field   value  state  address\n"
                    "    postal  Ada    ok     recipient, this one counts\n"
                    "    number  17     ok\n"
                    "\n");
    EXPECT_EQ(err_, "");
}

TEST_F(VlMailTest, GivesOneJsonObjectADocument) {
    write("invoice 1.txt", "No 17\nTo: Ada\n");
    write("terms.txt", "Terms\n");
    EXPECT_EQ(vlmail("letter", {"invoice 1.txt", "terms.txt"}, {"--json"}), VlMail::FINE);
    EXPECT_EQ(
        out_,
        R"({"document":"invoice 1.txt","extract_preset":"invoice.*","pack_preset":"Invoices","letters":[)"
        R"({"pages":[1],"fields":[{"name":"postal","value":"Ada","priority":1,"send_to_server":true},)"
        R"({"name":"number","value":17}],"production_ready":true,"message":"",)"
        R"("primary_address":"postal"}]})"
        "\n"
        R"({"document":"terms.txt","extract_preset":"terms.*","pack_preset":"Invoices","letters":null})"
        "\n");
}

TEST_F(VlMailTest, SaysWhyALetterCannotGoOut) {
    write("invoice 1.txt", "To: nobody in particular\n");
    write("invoice 2.txt", "No 17\n");
    write("invoice 3.txt", "No 99999999999999999999999\nTo: Ada\n");
    EXPECT_EQ(vlmail("letter", {"invoice 1.txt"}), VlMail::FINE);
    EXPECT_THAT(out_, HasSubstr("    missing, although obligatory: number\n"));
    EXPECT_EQ(vlmail("letter", {"invoice 2.txt"}), VlMail::INCOMPLETE);
    EXPECT_THAT(out_, HasSubstr("letter 1 of 1, page 1: cannot go out: no address to go to\n"));
    EXPECT_EQ(vlmail("letter", {"invoice 3.txt"}), VlMail::INCOMPLETE);
    EXPECT_THAT(out_, HasSubstr("cannot go out: Field name: \"number\"\n"));
    EXPECT_THAT(out_, HasSubstr("number  99999999999999999999999  INVALID\n"));
}

TEST_F(VlMailTest, AppliesTheGlobalDefaultsWithoutSettings) {
    write("some letter.txt", "Ada Lovelace\n12 St James's Square\nLondon\n");
    EXPECT_EQ(vlmail({"letter", path("some letter.txt")}), VlMail::FINE);
    EXPECT_THAT(out_, HasSubstr("sent by the pack preset GLOBAL"));
    EXPECT_THAT(out_, HasSubstr("postal  Ada Lovelace / 12 St James's Square / London"));
}

TEST_F(VlMailTest, SaysInOneLineWhatCannotBeReadAndGoesOnWithTheRest) {
    write("invoice 1.txt", "To: Ada\n");
    write("empty.txt", "");
    write("noise.bin", std::string("\0\1\2\3\xFF\xFE\0\0", 8));
    write("cut.pdf", "%PDF-1.5\nnothing more");
    write("broken.txt", "x\n");
    write("homeless.txt", "x\n");
    EXPECT_EQ(vlmail("letter", {"missing.pdf", "empty.txt", "noise.bin", "cut.pdf", "broken.txt",
                                "homeless.txt", "", "invoice 1.txt"}),
              VlMail::FAILED);
    EXPECT_THAT(out_, StartsWith("invoice 1.txt\n"));
    EXPECT_THAT(out_, HasSubstr("8 documents, 1 letter: 1 ready, 0 cannot go out; 7 documents failed\n"));
    std::vector<std::string> lines;
    std::istringstream err(err_);
    for (std::string line; std::getline(err, line);)
        lines.push_back(line);
    EXPECT_THAT(
        lines,
        ElementsAre(
            HasSubstr("missing.pdf: there is no such file"), HasSubstr("empty.txt"), HasSubstr("noise.bin"),
            HasSubstr("cut.pdf"),
            MatchesRegex(
                "vlmail: the pattern \"\\(\" of field \"total\" in zone \"Page\" of the "
                "preset for \"broken.\\*\" cannot be used: .*; correct it in \".*\" \\[pattern-invalid\\]"),
            HasSubstr("Failed to find pack preset for extraction preset for homeless.txt"),
            HasSubstr("folder")));
}

TEST_F(VlMailTest, RefusesACommandLineInOneLine) {
    EXPECT_EQ(vlmail({"mail", "x.pdf"}), VlMail::FAILED);
    EXPECT_EQ(err_, "vlmail: --output or --send is required; --help explains [usage]\n");
    EXPECT_EQ(vlmail({"mail", "-o", path("out")}), VlMail::FAILED);
    EXPECT_EQ(err_, "vlmail: FILE or --plan is required; --help explains [usage]\n");
    EXPECT_EQ(vlmail({"letter", "--settings", path("gone.json"), "x.pdf"}), VlMail::FAILED);
    EXPECT_EQ(err_,
              "vlmail: " + path("gone.json") + ": there is no such file; check the name [file-unreadable]\n");
}

TEST_F(VlMailTest, WritesOneMailingAPackPreset) {
    write("invoice 1.txt", "No 1\nTo: Ada\n");
    write("invoice 2.txt", "No 2\nTo: Ada\n");
    write("other.txt", "Charles Babbage\n1 Dorset Street\nLondon\n");
    EXPECT_EQ(vlmail("mail", {"invoice 1.txt", "invoice 2.txt", "other.txt"}, {"-o", path("out")}),
              VlMail::FINE)
        << err_;
    ASSERT_EQ(mailings().size(), 2u);
    for (fs::path const& file : mailings()) {
        Mailing::Metadata const metadata = metadataOf(file);
        EXPECT_EQ(file.filename().string(), metadata.id + ".mailing");
        PackWrapper container(file.string(), PackWrapper::PURPOSE_IMPORT, {});
        EXPECT_EQ(container.packId(), metadata.id);
        EXPECT_EQ(metadata.packPreset.duplex(), metadata.packPreset.name() == "Invoices");
        for (Mailing::MailedLetter const& letter : metadata.letters) {
            for (Mailing::DocumentPages const& document : letter.documents) {
                SharedMemBuffer page;
                container.requestPageData(document.document, "1", [&](SharedMemBuffer data) {
                    page = PageLoaderI::unzipDbData(data);
                });
                ASSERT_GT(page.size(), 5u);
                EXPECT_EQ(std::string(page.data(), page.data() + 5), "%PDF-");
            }
        }
    }
}

TEST_F(VlMailTest, GroupsLettersThatAgree) {
    write("a/invoice 1.txt", "No 1\nTo: Ada\n");
    write("b/invoice 1.txt", "No 1\nTo: Ada\n");
    EXPECT_EQ(vlmail("mail", {"a/invoice 1.txt", "b/invoice 1.txt"}, {"-o", path("out")}), VlMail::FINE);
    ASSERT_EQ(mailings().size(), 1u);
    Mailing::Metadata const metadata = metadataOf(mailings()[0]);
    ASSERT_EQ(metadata.letters.size(), 1u);
    ASSERT_EQ(metadata.letters[0].documents.size(), 3u);
    EXPECT_EQ(metadata.letters[0].documents[0].document, "invoice 1.txt");
    EXPECT_EQ(metadata.letters[0].documents[1].document, "blank") << "the preset says duplex";
    EXPECT_EQ(metadata.letters[0].documents[2].document, "invoice 1 (2).txt");
}

TEST_F(VlMailTest, LeavesOutWhatIsNotReadyAndLosesNothingElse) {
    write("invoice 1.txt", "No 1\nTo: Ada\n");
    write("invoice 2.txt", "No 2\n");
    write("terms.txt", "Terms\n");
    EXPECT_EQ(vlmail("mail", {"invoice 2.txt", "terms.txt", "invoice 1.txt"}, {"-o", path("out")}),
              VlMail::INCOMPLETE);
    EXPECT_THAT(out_, HasSubstr("left out: invoice 2.txt, page 1: no address to go to\n"));
    EXPECT_THAT(out_, HasSubstr("not a letter: terms.txt, an attachment\n"));
    ASSERT_EQ(mailings().size(), 1u);
    EXPECT_EQ(metadataOf(mailings()[0]).letters.size(), 1u);
    EXPECT_EQ(vlmail("mail", {"invoice 2.txt", "invoice 1.txt"}, {"-o", path("out"), "--json"}),
              VlMail::INCOMPLETE);
    json::Object const outcome = json::strToObject(out_.data(), out_.size());
    std::ostringstream leftOut;
    leftOut << outcome.get("left_out").toArray();
    EXPECT_EQ(leftOut.str(), R"([{"name":"invoice 2.txt","pages":[1],"reason":"no address to go to"}])");
}

TEST_F(VlMailTest, SaysAtTheDocumentThatAMailingCannotHoldItsName) {
    write("invoice 1.txt", "No 1\nTo: Ada\n");
    write("invoice 2\x01.txt", "No 2\nTo: Bob\n");
    write("invoice 3\uFFFE.txt", "No 3\nTo: Eve\n");
    EXPECT_EQ(
        vlmail("mail", {"invoice 1.txt", "invoice 2\x01.txt", "invoice 3\uFFFE.txt"}, {"-o", path("out")}),
        VlMail::FAILED);
    EXPECT_EQ(err_, "vlmail: cannot mail \"invoice 2\\u0001.txt\": its name has a character that a mailing "
                    "cannot hold; rename the document [name-invalid]\n"
                    "vlmail: cannot mail \"invoice 3\uFFFE.txt\": its name has a character that a mailing "
                    "cannot hold; rename the document [name-invalid]\n");
    ASSERT_EQ(mailings().size(), 1u);
    EXPECT_EQ(metadataOf(mailings()[0]).letters.size(), 1u);
    EXPECT_NE(metadataOf(mailings()[0]).entriesDigest, "");
}

TEST_F(VlMailTest, RefusesAFolderThatCannotBeMade) {
    write("invoice 1.txt", "No 1\nTo: Ada\n");
    write("out", "a file where the folder should be");
    EXPECT_EQ(vlmail("mail", {"invoice 1.txt"}, {"-o", path("out")}), VlMail::FAILED);
    EXPECT_THAT(
        err_,
        MatchesRegex(
            "vlmail: cannot make the folder \".*out\": .*; name another with -o \\[file-unwritable\\]\n"));
}

TEST_F(VlMailTest, LeavesNoHalfFileOnAFullDisk) {
    VLServiceTest::SmallDisk const disk;
    if (!disk.whyNot().empty())
        GTEST_SKIP() << "no right to make a small disk: " << disk.whyNot();
    std::string pages;
    for (int i = 0; i < 20; ++i)
        pages += "No 1\nTo: Ada\n\f";
    write("invoice 1.txt", pages);
    EXPECT_EQ(vlmail("mail", {"invoice 1.txt"}, {"-o", disk.path()}), VlMail::FAILED);
    EXPECT_THAT(err_, HasSubstr("make room on the disk and mail again [file-unwritable]\n"));
    EXPECT_TRUE(fs::is_empty(disk.path()));
}

TEST_F(VlMailTest, GivesTheSameOutputOnAnyNumberOfProcesses) {
    std::vector<std::string> documents;
    for (int i = 0; i < 12; ++i) {
        documents.push_back("invoice " + std::to_string(i) + ".txt");
        write(documents.back(), "No " + std::to_string(i) + "\nTo: Ada\n");
    }
    vlmail("letter", documents, {"--json", "--jobs", "1"});
    std::string const alone = out_;
    vlmail("letter", documents, {"--json", "--jobs", "4"});
    EXPECT_EQ(out_, alone);
}

/// Two letters of two pages and one of one; the second has its mark in capitals.
constexpr char const* BATCH = "No 1\nTo: Ada\fmore\fNO 2\nTo: Bob\fmore\fNo 3\nTo: Eve\n";
constexpr char const* BATCH_SETTINGS = R"({
    "extract_presets": [{"match": "batch.*", "pack_preset": "Invoices", "zones": [
        {"name": "Page", "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": [
            {"name": "number", "value_extract": "^No (?<VAL>\\d+)$", "value_type": 1, "mark": 1},
            {"name": "postal", "value_extract": "^To: (?<VAL>.*)$", "priority": 1, "send_to_server": true}]}]}],
    "pack_presets": [{"name": "Invoices"}]})";
constexpr char const* NOT_SEPARATED =
    "letter-not-separated: pages 1-2 and pages 3-4 may be two letters: on page 3 \"NO 2\" nearly is the "
    "mark \"number\", with another letter case; correct the mark or the "
    "document, or mail them as one letter with "
    "--accept-joined";

TEST_F(VlMailTest, DoubtsALetterThatMayBeTwo) {
    write("node.json", BATCH_SETTINGS);
    write("batch 1.txt", BATCH);
    EXPECT_EQ(vlmail("letter", {"batch 1.txt"}), VlMail::INCOMPLETE);
    EXPECT_THAT(out_,
                HasSubstr("  letter 1 of 2, pages 1-4: cannot go out: " + std::string(NOT_SEPARATED) + "\n"));
    EXPECT_THAT(out_, HasSubstr("  letter 2 of 2, page 5: ready\n"));
    EXPECT_EQ(vlmail("letter", {"batch 1.txt"}, {"--json"}), VlMail::INCOMPLETE);
    EXPECT_THAT(out_,
                HasSubstr(R"("not_separated":[{"page":3,"says":"\"NO 2\" nearly is the mark \"number\", )"
                          R"(with another letter case"}])"));
}

TEST_F(VlMailTest, LeavesOutBothLettersThatMayBeTwoUntilAPersonAcceptsThem) {
    write("node.json", BATCH_SETTINGS);
    write("batch 1.txt", BATCH);
    EXPECT_EQ(vlmail("mail", {"batch 1.txt"}, {"-o", path("out")}), VlMail::INCOMPLETE);
    EXPECT_THAT(out_, HasSubstr("left out: batch 1.txt, pages 1-4: " + std::string(NOT_SEPARATED) + "\n"));
    ASSERT_EQ(mailings().size(), 1u);
    Mailing::Metadata const metadata = metadataOf(mailings()[0]);
    ASSERT_EQ(metadata.letters.size(), 1u);
    EXPECT_THAT(metadata.letters[0].documents[0].pages, ElementsAre(5));

    fs::remove_all(folder_ / "out");
    EXPECT_EQ(vlmail("mail", {"batch 1.txt"}, {"-o", path("out"), "--accept-joined"}), VlMail::FINE) << err_;
    ASSERT_EQ(mailings().size(), 1u);
    ASSERT_EQ(metadataOf(mailings()[0]).letters.size(), 2u);
    EXPECT_THAT(metadataOf(mailings()[0]).letters[0].documents[0].pages, ElementsAre(1, 2, 3, 4));
}

TEST_F(VlMailTest, TellsWhoIsToBeNotified) {
    write("invoice 1.txt", "No 1\nTo: Ada\nCopy: office@acme.example\n");
    write("invoice 2.txt", "No 2\nCopy: nobody@acme.example\n");
    EXPECT_EQ(vlmail("plan", {"invoice 1.txt", "invoice 2.txt"}, {"-o", path("plan.json"), "--json"}),
              VlMail::INCOMPLETE);
    EXPECT_THAT(out_, HasSubstr(R"("notifications":[{"name":"invoice 1.txt","pages":[1],)"
                                R"("field":"copy","address":"office@acme.example"}]})"));
    EXPECT_EQ(vlmail("mail", {"invoice 1.txt"}, {"-o", path("out")}), VlMail::FINE);
    EXPECT_THAT(out_, HasSubstr("to be notified: \"office@acme.example\" of invoice 1.txt, page 1, by its "
                                "field \"copy\"\n"));
}

TEST_F(VlMailTest, DecidesOnDoubtfulJoinsInThePlan) {
    write("node.json", BATCH_SETTINGS);
    write("batch 1.txt", BATCH);
    EXPECT_EQ(vlmail("plan", {"batch 1.txt"}, {"-o", path("plan.json")}), VlMail::INCOMPLETE);
    EXPECT_THAT(out_, HasSubstr(NOT_SEPARATED));
    EXPECT_EQ(vlmail({"mail", "--plan", path("plan.json"), "-o", path("out")}), VlMail::INCOMPLETE) << err_;
    EXPECT_THAT(out_, HasSubstr(NOT_SEPARATED));
    EXPECT_EQ(vlmail({"mail", "--plan", path("plan.json"), "-o", path("out"), "--accept-joined"}),
              VlMail::FAILED);
    EXPECT_THAT(err_, HasSubstr("--accept-joined"));

    fs::remove_all(folder_ / "out");
    EXPECT_EQ(vlmail("plan", {"batch 1.txt"}, {"-o", path("plan.json"), "--accept-joined"}), VlMail::FINE);
    EXPECT_EQ(vlmail({"mail", "--plan", path("plan.json"), "-o", path("out")}), VlMail::FINE) << err_;
    ASSERT_EQ(mailings().size(), 1u);
    EXPECT_EQ(metadataOf(mailings()[0]).letters.size(), 2u);
}

TEST_F(VlMailTest, CountsTheFurtherPagesThatMayBeginLetters) {
    write("node.json", BATCH_SETTINGS);
    write("batch 1.txt", "No 1\nTo: Ada\fNO 2\fNO 3\fNO 4\n");
    EXPECT_EQ(vlmail("letter", {"batch 1.txt"}), VlMail::INCOMPLETE);
    EXPECT_THAT(
        out_,
        HasSubstr("letter-not-separated: pages 1-4 may be 4 letters, from pages 1-4 on: on page 2 \"NO 2\" "
                  "nearly is the mark \"number\", with another letter case; correct"));
}

TEST_F(VlMailTest, CarriesOutAPlan) {
    write("invoice 1.txt", "No 1\nTo: Ada\n");
    write("invoice 2.txt", "No 2\n");
    EXPECT_EQ(vlmail("plan", {"invoice 1.txt", "invoice 2.txt"}, {"-o", path("plan.json")}),
              VlMail::INCOMPLETE);
    EXPECT_FALSE(fs::exists(path("out"))) << "a plan has no effect";
    EXPECT_EQ(vlmail({"mail", "--plan", path("plan.json"), "-o", path("out")}), VlMail::INCOMPLETE) << err_;
    ASSERT_EQ(mailings().size(), 1u);
    EXPECT_EQ(metadataOf(mailings()[0]).letters.size(), 1u);
}

TEST_F(VlMailTest, RefusesAPlanWhoseInputsHaveChangedAndSaysWhich) {
    write("invoice 1.txt", "No 1\nTo: Ada\n");
    write("invoice 2.txt", "No 2\nTo: Ada\n");
    write("invoice 3.txt", "No 3\nTo: Ada\n");
    vlmail("plan", {"invoice 1.txt", "invoice 2.txt", "invoice 3.txt"}, {"-o", path("plan.json")});
    write("invoice 2.txt", "No 2\nTo: Bob\n");
    fs::remove(path("invoice 3.txt"));
    write("node.json", std::string(SETTINGS) + '\n');
    EXPECT_EQ(vlmail({"mail", "--plan", path("plan.json"), "-o", path("out")}), VlMail::FAILED);
    EXPECT_EQ(err_, "vlmail: cannot carry out the plan: \"" + path("node.json") + "\" has changed, \"" +
                        path("invoice 2.txt") + "\" has changed, \"" + path("invoice 3.txt") +
                        "\" cannot be read any more; make it again with vlmail plan [plan-outdated]\n");
    EXPECT_FALSE(fs::exists(path("out")));
}

TEST_F(VlMailTest, RefusesAPlanThatWasEdited) {
    write("invoice 1.txt", "No 1\nTo: Ada\n");
    vlmail("plan", {"invoice 1.txt"}, {"-o", path("plan.json")});
    std::ifstream in(path("plan.json"));
    std::string text{std::istreambuf_iterator<char>(in), {}};
    text.replace(text.find("Ada"), 3, "Bob");
    write("plan.json", text);
    EXPECT_EQ(vlmail({"mail", "--plan", path("plan.json"), "-o", path("out")}), VlMail::FAILED);
    EXPECT_EQ(err_,
              "vlmail: cannot use the plan \"" + path("plan.json") +
                  "\": it was changed since it was made; make it again with vlmail plan [plan-malformed]\n");
}

/// The settings with further parts, and further keys of the pack preset.
std::string settingsWith(std::string const& parts, std::string const& keys = "") {
    std::string presets = SETTINGS;
    std::string const duplex = R"("duplex": true)";
    presets.replace(presets.find(duplex), duplex.size(), duplex + keys);
    return R"({"presets": )" + presets + ", " + parts + "}";
}

TEST_F(VlMailTest, LeavesALetterOutThatHasMoreSheetsThanTheSettingsAllow) {
    write("node.json", settingsWith(R"("app": {"max_letter_sheets": 1})"));
    write("invoice 1.txt", "No 1\nTo: Ada\n\fmore\n\fmore\n");
    write("invoice 2.txt", "No 2\nTo: Bob\n\fmore\n");
    std::string const line = "left out: invoice 1.txt, pages 1-3: too-many-sheets: 2 sheets, 1 allowed by " +
                             path("node.json") + '\n';
    EXPECT_EQ(vlmail("plan", {"invoice 1.txt", "invoice 2.txt"}, {"-o", path("plan.json")}),
              VlMail::INCOMPLETE);
    EXPECT_THAT(out_, HasSubstr(line));
    EXPECT_THAT(out_, HasSubstr("2 documents, 2 letters: 1 ready, 1 cannot go out\n"));
    EXPECT_EQ(vlmail("mail", {"invoice 1.txt", "invoice 2.txt"}, {"-o", path("out")}), VlMail::INCOMPLETE);
    EXPECT_THAT(out_, HasSubstr(line));
    ASSERT_EQ(mailings().size(), 1u);
    ASSERT_EQ(metadataOf(mailings()[0]).letters.size(), 1u);
    EXPECT_EQ(metadataOf(mailings()[0]).letters[0].documents[0].document, "invoice 2.txt");
    fs::remove_all(folder_ / "out");
    EXPECT_EQ(vlmail({"mail", "--plan", path("plan.json"), "-o", path("out")}), VlMail::INCOMPLETE);
    EXPECT_THAT(out_, HasSubstr(line));
    EXPECT_EQ(metadataOf(mailings().at(0)).letters.size(), 1u);
}

TEST_F(VlMailTest, CountsTheSheetsOfAttachmentsWithEachLetter) {
    write("node.json", settingsWith(R"("app": {"max_letter_sheets": 2})", R"(, "attachments": ["terms"])"));
    write("documents/terms.txt", "Terms\n\fmore\n");
    write("invoice 1.txt", "No 1\nTo: Ada\n\fmore\n\fmore\n");
    write("invoice 2.txt", "No 2\nTo: Bob\n\fmore\n");
    EXPECT_EQ(vlmail("mail", {"invoice 1.txt", "invoice 2.txt"},
                     {"-o", path("out"), "--documents", path("documents")}),
              VlMail::INCOMPLETE);
    EXPECT_THAT(out_,
                HasSubstr("left out: invoice 1.txt, pages 1-3: too-many-sheets: 3 sheets, 2 allowed by " +
                          path("node.json") + '\n'))
        << err_;
    EXPECT_EQ(metadataOf(mailings().at(0)).letters.size(), 1u);
}

TEST_F(VlMailTest, PutsNoLettersTogetherThatHaveTooManySheetsAsOne) {
    std::vector<std::string> letters;
    for (char const* const name : {"invoice 1.txt", "invoice 2.txt", "invoice 3.txt"}) {
        write(name, "No 1\nTo: Ada\n");
        letters.emplace_back(name);
    }
    write("node.json", settingsWith(R"("app": {"max_letter_sheets": 2})"));
    EXPECT_EQ(vlmail("mail", letters, {"-o", path("out")}), VlMail::FINE);
    Mailing::Metadata const metadata = metadataOf(mailings().at(0));
    ASSERT_EQ(metadata.letters.size(), 2u);
    EXPECT_EQ(metadata.letters[0].sheets, 2);
    EXPECT_EQ(metadata.letters[1].sheets, 1);
}

TEST_F(VlMailTest, LeavesAllLettersOfAMailingOutThatTheSettingsDoNotAllow) {
    write("invoice 1.txt", "No 1\nTo: Ada\n");
    write("invoice 2.txt", "No 2\n");
    struct {
        std::string parts;
        std::string keys;
        std::string line;
    } const cases[] = {
        {R"("app": {"enfoce_dep": true}, "deps": {"vals": ["IT"]})", R"(, "department": "Sales")",
         "department-not-listed: department \"Sales\", \"IT\" allowed by NODE"},
        {R"("app": {"enforce_profile": true}, "profiles": {"vals": [{"name": "A"}]})", "",
         "profile-not-listed: no profile, \"A\" allowed by NODE"},
        {R"("app": {"enforce_po": true})", "",
         "purchase-order-missing: no purchase order, one wanted by NODE"},
        {R"("app": {})", R"(, "customer_email": "ada")",
         "email-malformed: \"customer_email\" \"ada\", one address NAME@HOST possible, as set by NODE"},
        {R"("app": {})", R"(, "delay": {"mins": [9999]})",
         "delay-impossible: 9999 in \"mins\", 0 to 1439 possible, as set by NODE"},
    };
    for (auto const& [parts, keys, line] : cases) {
        write("node.json", settingsWith(parts, keys));
        std::string wanted = line;
        wanted.replace(wanted.find("NODE"), 4, path("node.json"));
        EXPECT_EQ(vlmail("mail", {"invoice 1.txt", "invoice 2.txt"}, {"-o", path("out")}),
                  VlMail::INCOMPLETE);
        EXPECT_THAT(out_, HasSubstr("left out: invoice 1.txt, page 1: " + wanted + "\n"));
        EXPECT_THAT(out_, HasSubstr("left out: invoice 2.txt, page 1: no address to go to\n"));
        EXPECT_TRUE(mailings().empty());
        EXPECT_EQ(err_, "");
    }
}

TEST_F(VlMailTest, WritesThePurchaseOrderAndThePriorityThatTheSettingsDecide) {
    write("invoice 1.txt", "No 1\nTo: Ada\n");
    write("node.json", settingsWith(R"("app": {"priority_delivery": 1}, "po": {"code": "P-1"})",
                                    R"(, "priority_delivery": true)"));
    EXPECT_EQ(vlmail("mail", {"invoice 1.txt"}, {"-o", path("out")}), VlMail::FINE);
    Mailing::Metadata const metadata = metadataOf(mailings().at(0));
    EXPECT_EQ(metadata.purchaseOrder, "P-1");
    EXPECT_FALSE(metadata.packPreset.priorityDelivery());
}

TEST_F(VlMailTest, SaysWhoSendsAnEmailOnceAMailingIsHandedOver) {
    write("invoice 1.txt", "No 1\nTo: Ada\n");
    write("node.json",
          settingsWith(R"("app": {})", R"(, "confirmation_email": true, "customer_email": "a@b.example")"));
    EXPECT_EQ(vlmail("plan", {"invoice 1.txt"}, {"-o", path("plan.json")}), VlMail::FINE);
    std::string const wanted =
        "pack preset \"Invoices\" wants an e-mail when its mailing is handed over, which ";
    EXPECT_THAT(out_, HasSubstr("note: " + wanted + "a service sends that has a carrier of e-mail\n"));
    write("node.json", settingsWith(R"("app": {})", R"(, "confirmation_email": true)"));
    EXPECT_EQ(vlmail("plan", {"invoice 1.txt"}, {"-o", path("plan.json")}), VlMail::FINE);
    std::string const note = wanted + "nobody gets: it has no \"customer_email\"";
    EXPECT_THAT(out_, HasSubstr("note: " + note + "\n"));
    EXPECT_EQ(vlmail("plan", {"invoice 1.txt"}, {"-o", path("plan.json"), "--json"}), VlMail::FINE);
    json::Array const notes = json::strToObject(out_.data(), out_.size()).get("notes").toArray();
    ASSERT_EQ(notes.size(), 1u);
    EXPECT_EQ(notes.at(0), json::Value(note));
}

TEST_F(VlMailTest, SaysThatItsSettingsCannotBeUsed) {
    write("invoice 1.txt", "No 1\nTo: Ada\n");
    write("node.json", settingsWith(R"("app": {"max_letter_sheets": "5"})"));
    EXPECT_EQ(vlmail("mail", {"invoice 1.txt"}, {"-o", path("out")}), VlMail::FAILED);
    EXPECT_EQ(
        err_,
        "vlmail: cannot use the settings: JSON error: Wrong type: string. Expected type: integer; correct "
        "them there [settings-malformed]\n");
}

} // namespace

// Letters on their way to sheets: letterheads, attachments, blank sides, as a person sees them in a mailing.
#include "programs/mailing/metadata.h"
#include "programs/reader/document.h"
#include "tests/support/raw_pdf.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlmail/run_vlmail.h"
#include "vlservice/json/json_text.h"
#include "vlservice/pack/pack_wrapper.h"
#include "vlservice/pack/page_loader.h"

#include <gmock/gmock.h>

#include <fstream>
#include <map>
#include <sstream>

namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;
using Role = Mailing::DocumentPages::Role;

/// Text documents throughout: typed pages are of one size, and each says in its lines what it is.
class MakeReadyTest : public testing::Test {
protected:
    MakeReadyTest() {
        fs::create_directories(folder_ / "docs");
        writeSettings("");
    }

    std::string path(std::string const& name) const { return (folder_.path() / name).string(); }
    void write(std::string const& name, std::string const& text) const {
        std::ofstream(path(name), std::ios::binary) << text;
    }
    /// `keys` are those of the pack preset.
    void writeSettings(std::string const& keys) const {
        write("node.json", R"({"extract_presets": [
            {"match": "terms.*", "pack_preset": "P", "type": 1},
            {"match": ".*", "pack_preset": "P", "zones": [{"name": "Page",
             "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": [
              {"name": "postal", "value_extract": "^To: (?<VAL>.*)$", "priority": 1, "send_to_server": true},
              {"name": "letter", "value_extract": "^(?<VAL>Letter)$", "mark": 1, "ignore_on_group": 4}]}]}],
            "pack_presets": [{"name": "P")" +
                               keys + "}]}");
    }
    /// A page that says its name and nothing that a letter says; further down than letters do.
    static std::string page(std::string const& name) { return "\n\n\n\n\n\n" + name; }
    static std::string pages(std::string const& name, int count) {
        std::string text;
        for (int number = 1; number <= count; ++number)
            text += (number > 1 ? "\f" : "") + page(name + std::to_string(number));
        return text;
    }

    Ran mail(std::vector<std::string> const& documents, std::vector<std::string> more = {}) {
        std::vector<std::string> arguments{"mail",       "--settings", path("node.json"), "--documents",
                                           path("docs"), "-o",         path("out")};
        arguments.insert(arguments.end(), more.begin(), more.end());
        for (std::string const& document : documents)
            arguments.push_back(path(document));
        fs::remove_all(folder_ / "out");
        return runVlMail(arguments);
    }

    fs::path mailing() const {
        std::vector<fs::path> files;
        for (auto const& entry : fs::directory_iterator(folder_ / "out"))
            files.push_back(entry.path());
        EXPECT_EQ(files.size(), 1U);
        return files.at(0);
    }

    static std::string wordsIn(SharedMemBuffer blob) {
        SharedMemBuffer const pdf = PageLoaderI::unzipDbData(std::move(blob));
        Reader::Document document =
            Reader::openDocument(std::string(pdf.data(), pdf.data() + pdf.size()), "page.pdf");
        std::map<int, std::string> words;
        for (Reader::Word const& word : document.page(1).words)
            words[word.box.top * 100 + word.box.left / 100] = word.text;
        std::string text;
        for (auto const& [place, word] : words)
            text += (text.empty() ? "" : " ") + word;
        return text;
    }

    /// The sides of each letter, as "role: words".
    static std::vector<std::vector<std::string>> sidesIn(fs::path const& file) {
        PackWrapper container(file.string(), PackWrapper::PURPOSE_IMPORT, {});
        Mailing::Metadata const metadata = Mailing::Metadata::fromBlob(container.inputFullMeta());
        std::map<Role, std::string> const roles{
            {Role::Letter, ""}, {Role::Attachment, "attachment: "}, {Role::Blank, "blank"}};
        std::vector<std::vector<std::string>> letters;
        for (Mailing::MailedLetter const& letter : metadata.letters) {
            std::vector<std::string>& sides = letters.emplace_back();
            for (Mailing::DocumentPages const& document : letter.documents)
                for (int const number : document.pages)
                    container.requestPageData(
                        document.document, std::to_string(number), [&](SharedMemBuffer data) {
                            sides.push_back(roles.at(document.role) + wordsIn(std::move(data)));
                        });
        }
        return letters;
    }
    std::vector<std::vector<std::string>> sides() const { return sidesIn(mailing()); }

    Mailing::Metadata metadata() const {
        PackWrapper container(mailing().string(), PackWrapper::PURPOSE_IMPORT, {});
        return Mailing::Metadata::fromBlob(container.inputFullMeta());
    }
    std::vector<std::string> storedPages() const {
        PackWrapper container(mailing().string(), PackWrapper::PURPOSE_IMPORT, {});
        std::vector<std::string> names;
        for (unsigned long long i = 0; i < container.szBins(); ++i)
            if (container.bin(i).role == "page")
                names.push_back(container.bin(i).document + ':' + container.bin(i).name);
        return names;
    }

    TemporaryFolder folder_;
};

using Sides = std::vector<std::string>;

TEST_F(MakeReadyTest, LaysLetterheadsOnThePagesOfEachLetter) {
    write("docs/blue.txt", pages("blue", 2));
    write("docs/stamp.txt", "\n\n\n\n\n\n\nstamp1");
    writeSettings(R"(, "letterheads": [{"id": "blue", "repeat_last_page": true}, "stamp.txt"])");
    write("a.txt", "Letter\nTo: Ada\fmore\fand more\fLetter\nTo: Bob");
    Ran const ran = mail({"a.txt"});
    EXPECT_EQ(ran.status, 0) << ran.err;
    EXPECT_THAT(sides(), ElementsAre(Sides{"Letter To: Ada blue1 stamp1", "more blue2", "and more blue2"},
                                     Sides{"Letter To: Bob blue1 stamp1"}));
    EXPECT_TRUE(metadata().madeReady);
}

TEST_F(MakeReadyTest, ReadsFieldsBeforeAnythingIsLaidOn) {
    write("docs/blue.txt", "\n\n\n\nTo: Nobody");
    writeSettings(R"(, "letterheads": ["blue"])");
    write("a.txt", "Letter\nTo: Ada");
    EXPECT_EQ(mail({"a.txt"}).status, 0);
    EXPECT_EQ(metadata().letters.at(0).fields.primaryAddressField()->valueToStr(), "Ada");
    EXPECT_THAT(sides(), ElementsAre(Sides{"Letter To: Ada To: Nobody"}));
}

TEST_F(MakeReadyTest, AddsAttachmentsOnceToAGroupInFrontAndBehind) {
    write("docs/front.txt", page("front"));
    write("docs/last.txt", page("last"));
    write("docs/middle.txt", page("middle"));
    writeSettings(R"(, "attachments": ["last", {"id": "middle", "preferred_pos": 0},
        {"id": "front", "preferred_pos": -1}])");
    write("a.txt", "Letter\nTo: Ada\fLetter\nTo: Bob\fLetter\nTo: Ada");
    EXPECT_EQ(mail({"a.txt"}).status, 0);
    std::string const letter = "Letter To: ";
    EXPECT_THAT(sides(), ElementsAre(Sides{"attachment: front", letter + "Ada", letter + "Ada",
                                           "attachment: middle", "attachment: last"},
                                     Sides{"attachment: front", letter + "Bob", "attachment: middle",
                                           "attachment: last"}));
}

TEST_F(MakeReadyTest, StoresOnceWhatLettersShare) {
    write("docs/prices.txt", pages("prices", 2));
    writeSettings(R"(, "no_group": true, "attachments": ["prices"])");
    write("a.txt", "Letter\nTo: Ada\fLetter\nTo: Bob\fmore");
    EXPECT_EQ(mail({"a.txt"}).status, 0);
    EXPECT_THAT(storedPages(), ElementsAre("a.txt:1", "a.txt:2", "a.txt:3", "prices.txt:1", "prices.txt:2"));
    EXPECT_EQ(sides().at(1), (Sides{"Letter To: Bob", "more", "attachment: prices1", "attachment: prices2"}));
    Ran const verified = runVlMail({"pack", "verify", mailing().string()});
    EXPECT_EQ(verified.status, 0) << verified.out << verified.err;
}

TEST_F(MakeReadyTest, BeginsEachPartOnAFrontSideWithDuplex) {
    write("docs/one.txt", page("one"));
    write("docs/two.txt", pages("two", 2));
    std::string const letters = "Letter\nTo: Ada\fLetter\nTo: Ada\fmore\fLetter\nTo: Ada";
    write("a.txt", letters);
    std::string const letter = "Letter To: Ada";
    writeSettings(R"(, "duplex": true)");
    EXPECT_EQ(mail({"a.txt"}).status, 0);
    EXPECT_THAT(sides(), ElementsAre(Sides{letter, "blank", letter, "more", letter}));
    EXPECT_EQ(metadata().letters.at(0).sheets, 3);
    writeSettings(R"(, "duplex": true, "attachments": ["two", {"id": "one", "preferred_pos": -3}])");
    EXPECT_EQ(mail({"a.txt"}).status, 0);
    EXPECT_THAT(sides(), ElementsAre(Sides{"attachment: one", "blank", letter, "blank", letter, "more",
                                           letter, "blank", "attachment: two1", "attachment: two2"}));
    EXPECT_EQ(metadata().letters.at(0).sheets, 5);
    EXPECT_EQ(storedPages().back(), "blank:1");
    writeSettings(R"(, "attachments": ["two", {"id": "one", "preferred_pos": -3}])");
    EXPECT_EQ(mail({"a.txt"}).status, 0);
    EXPECT_EQ(metadata().letters.at(0).sheets, 7);
    EXPECT_THAT(sides().at(0), testing::Not(testing::Contains("blank")));
}

/// What lies on the two letters of a group and on the attachment behind them, by the flags of a letterhead.
TEST_F(MakeReadyTest, ObeysTheFlagsOfLetterheadsInGroupsAndAttachments) {
    write("docs/blue.txt", page("blue"));
    write("docs/prices.txt", "prices");
    write("a.txt", "Letter\nTo: Ada\fLetter\nTo: Ada");
    struct {
        char const* flags;
        bool first, second, attachment;
    } const table[] = {
        {"", true, true, true},
        {R"(, "on_top": true)", true, true, true},
        {R"(, "skip_letters": true)", false, false, true},
        {R"(, "skip_attachments": true)", true, true, false},
        {R"(, "apply_first_grouped_only": true)", true, false, true},
        {R"(, "apply_first_grouped_only": true, "skip_attachments": true)", true, false, false},
        {R"(, "apply_first_grouped_only": true, "skip_letters": true)", false, false, true},
        {R"(, "which_attachments": ["prices"], "on_top": true)", true, true, true},
        {R"(, "which_attachments": ["others"], "on_top": true)", true, true, false},
        {R"(, "which_attachments": ["prices"], "skip_attachments": true)", true, true, false},
        {R"(, "which_attachments": ["others"], "skip_letters": true)", false, false, false},
    };
    for (auto const& row : table) {
        writeSettings(R"(, "attachments": ["prices"], "letterheads": [{"id": "blue")" +
                      std::string(row.flags) + "}]");
        EXPECT_EQ(mail({"a.txt"}).status, 0) << row.flags;
        auto const with = [](bool lies) { return lies ? " blue" : ""; };
        std::string const letter = "Letter To: Ada";
        EXPECT_THAT(sides(), ElementsAre(Sides{letter + with(row.first), letter + with(row.second),
                                               std::string("attachment: prices") + with(row.attachment)}))
            << row.flags;
    }
}

TEST_F(MakeReadyTest, TakesAnUngroupedLetterForAFirstOne) {
    write("docs/blue.txt", page("blue"));
    std::string const letterheads = R"(, "letterheads": [{"id": "blue", "apply_first_grouped_only": true}])";
    write("a.txt", "Letter\nTo: Ada\fLetter\nTo: Ada\fLetter\nTo: Bob");
    std::string const ada = "Letter To: Ada";
    writeSettings(letterheads + R"(, "no_group": true)");
    EXPECT_EQ(mail({"a.txt"}).status, 0);
    EXPECT_THAT(sides(),
                ElementsAre(Sides{ada + " blue"}, Sides{ada + " blue"}, Sides{"Letter To: Bob blue"}));
    writeSettings(letterheads);
    EXPECT_EQ(mail({"a.txt"}).status, 0);
    EXPECT_THAT(sides(), ElementsAre(Sides{ada + " blue", ada}, Sides{"Letter To: Bob blue"}));
}

TEST_F(MakeReadyTest, FindsAttachmentsAmongTheDocumentsOfTheBatch) {
    write("docs/terms 1.txt", page("old"));
    write("terms 1.txt", page("new"));
    writeSettings(R"(, "attachments": ["terms 1"])");
    write("a.txt", "Letter\nTo: Ada");
    Ran const ran = mail({"a.txt", "terms 1.txt"});
    EXPECT_EQ(ran.status, 0) << ran.err;
    EXPECT_THAT(ran.out, HasSubstr("not a letter: terms 1.txt, an attachment\n"));
    EXPECT_THAT(sides(), ElementsAre(Sides{"Letter To: Ada", "attachment: new"}));
}

TEST_F(MakeReadyTest, GivesTheSameBytesForTheSameInput) {
    write("docs/blue.txt", page("blue"));
    write("docs/prices.txt", pages("prices", 3));
    writeSettings(R"(, "duplex": true, "attachments": ["prices"], "letterheads": ["blue"])");
    write("a.txt", "Letter\nTo: Ada\fLetter\nTo: Bob\nmore");
    auto const blobs = [&] {
        PackWrapper container(mailing().string(), PackWrapper::PURPOSE_IMPORT, {});
        std::vector<std::uint32_t> sums;
        for (unsigned long long i = 0; i < container.szBins(); ++i)
            if (container.bin(i).role == "page")
                sums.push_back(container.bin(i).crc);
        return sums;
    };
    EXPECT_EQ(mail({"a.txt"}, {"--jobs", "1"}).status, 0);
    std::vector<std::uint32_t> const once = blobs();
    EXPECT_EQ(once.size(), 6U) << "two letters, three pages and a blank side";
    EXPECT_EQ(mail({"a.txt"}, {"--jobs", "3"}).status, 0);
    EXPECT_EQ(blobs(), once);
}

TEST_F(MakeReadyTest, RecordsWhichDocumentsItUsed) {
    write("docs/blue.txt", "blue");
    writeSettings(R"(, "letterheads": ["blue"])");
    write("a.txt", "Letter\nTo: Ada");
    EXPECT_EQ(mail({"a.txt"}).status, 0);
    ASSERT_EQ(metadata().usedDocuments.size(), 1U);
    EXPECT_EQ(metadata().usedDocuments[0].id, "blue");
    // printf blue | sha256sum
    EXPECT_EQ(metadata().usedDocuments[0].sha256,
              "16477688c0e00699c6cfa4497a3612d7e83c532062b64b250fed8908128ed548");
}

class UnusableDocuments : public MakeReadyTest {
protected:
    /// One letter needs the document, another is sent by another pack preset.
    Ran mailWith(std::string const& keys, std::vector<std::string> const& more = {}) {
        write("node.json", R"({"extract_presets": [
            {"match": "plain.*", "pack_preset": "Plain", "zones": [{"name": "Page",
             "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": [
              {"name": "postal", "value_extract": "^To: (?<VAL>.*)$", "priority": 1, "send_to_server": true}]}]},
            {"match": ".*", "pack_preset": "P", "zones": [{"name": "Page",
             "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": [
              {"name": "postal", "value_extract": "^To: (?<VAL>.*)$", "priority": 1, "send_to_server": true}]}]}],
            "pack_presets": [{"name": "Plain"}, {"name": "P", )" +
                               keys + "}]}");
        write("a.txt", "To: Ada");
        write("plain.txt", "To: Bob");
        return mail({"a.txt", "plain.txt"}, more);
    }
    /// What is said of the letter that stays behind.
    std::string whyNot(std::string const& keys, std::vector<std::string> const& more = {}) {
        Ran const ran = mailWith(keys, more);
        EXPECT_EQ(ran.status, 2) << ran.err;
        EXPECT_THAT(sides(), ElementsAre(Sides{"To: Bob"}));
        std::string const begin = "left out: a.txt, page 1: ";
        std::size_t const at = ran.out.find(begin);
        return at == std::string::npos
                   ? ran.out
                   : ran.out.substr(at + begin.size(), ran.out.find('\n', at) - at - begin.size());
    }
};

TEST_F(UnusableDocuments, LeaveOnlyTheLettersBehindThatNeedThem) {
    write("docs/cut.pdf", "%PDF-1.7 nothing");
    fs::create_symlink(folder_ / "a.txt", folder_ / "docs" / "out.txt");
    std::string const docs = path("docs");
    EXPECT_EQ(whyNot(R"("letterheads": ["gone"])"), "document-unknown: there is no document \"gone\" in \"" +
                                                        docs +
                                                        "\"; put it there, or correct the pack preset");
    EXPECT_EQ(whyNot(R"("attachments": ["../a.txt"])"),
              "document-unknown: \"../a.txt\" cannot be the name of a document; correct the pack preset");
    EXPECT_EQ(whyNot(R"("letterheads": [""])"),
              "document-unknown: \"\" cannot be the name of a document; correct the pack preset");
    EXPECT_EQ(whyNot(R"("letterheads": ["out"])"),
              "document-unknown: \"out\" in \"" + docs +
                  "\" is a link out of the folder; put the document there "
                  "itself");
    EXPECT_EQ(whyNot(R"("attachments": ["cut"])"),
              "document-damaged: " + docs + "/cut.pdf: is a damaged PDF; export the document again");
    EXPECT_EQ(whyNot(R"("letterheads": ["cut.pdf"])"),
              "document-damaged: " + docs + "/cut.pdf: is a damaged PDF; export the document again");
}

TEST_F(UnusableDocuments, AreTooLargeBeforeTheyAreRead) {
    write("docs/large.pdf", "");
    fs::resize_file(folder_ / "docs" / "large.pdf", (std::uintmax_t{64} << 20) + 1);
    EXPECT_EQ(whyNot(R"("letterheads": ["large"])"),
              "document-size: " + path("docs") +
                  "/large.pdf: has more than 64 MiB; leave out what is not to be printed");
}

/// Forms that draw each other without end, in a colour, for which they are drawn.
std::string slowPdf() {
    std::string pdf = VLServiceTest::formTree(40, 10);
    std::string const black = "72 700 Td (Hello)";
    std::string const red = "1 0 0 rg 9 9 Td()";
    EXPECT_EQ(black.size(), red.size());
    for (std::size_t at = pdf.find(black); at != std::string::npos; at = pdf.find(black, at))
        pdf.replace(at, black.size(), red);
    return pdf;
}

TEST_F(UnusableDocuments, ThatTakeTooMuchTimeAreEndedOnce) {
    write("docs/slow.pdf", slowPdf());
    EXPECT_EQ(whyNot(R"("letterheads": ["slow"], "attachments": ["slow"])", {"--document-seconds", "1"}),
              "document-damaged: " + path("docs") +
                  "/slow.pdf: it took more than 1 s of processor time; print it to a new PDF, or give "
                  "--document-seconds a larger number");
}

TEST_F(UnusableDocuments, OfOtherSizesAreTold) {
    write("docs/wide.txt", std::string(120, 'x'));
    EXPECT_THAT(whyNot(R"("letterheads": ["wide"])"), EndsWith("give both the same size, nothing is scaled"));
}

TEST_F(UnusableDocuments, DoNotMatterWhereTheyAreNotNeeded) {
    Ran const ran = mailWith(R"("letterheads": [{"id": "gone", "skip_letters": true}])");
    EXPECT_EQ(ran.status, 0) << ran.out;
}

TEST_F(UnusableDocuments, AreToldByLetterAndPlanToo) {
    EXPECT_EQ(mailWith(R"("letterheads": ["gone"])").status, 2);
    Ran const letter = runVlMail({"letter", "--settings", path("node.json"), path("a.txt")});
    EXPECT_EQ(letter.status, 2);
    std::string const why =
        "document-unknown: there is no document \"gone\"; name the folder that it lies in "
        "with --documents, or correct the pack preset";
    EXPECT_THAT(letter.out, HasSubstr("letter 1 of 1, page 1: cannot go out: " + why + "\n"));
    Ran const plan =
        runVlMail({"plan", "--settings", path("node.json"), "-o", path("plan.json"), path("a.txt")});
    EXPECT_EQ(plan.status, 2);
    EXPECT_THAT(plan.out, HasSubstr("left out: a.txt, page 1: " + why + "\n"));
}

TEST_F(UnusableDocuments, MayBeAFolderThatIsNone) {
    Ran const ran = runVlMail({"mail", "--documents", path("nowhere"), "-o", path("out"), path("a.txt")});
    EXPECT_EQ(ran.status, 1);
    EXPECT_EQ(ran.err,
              "vlmail: cannot list the folder \"" + path("nowhere") +
                  "\": No such file or directory; name another with --documents [file-unreadable]\n");
}

class PlansOfSheets : public MakeReadyTest {
protected:
    PlansOfSheets() {
        write("docs/blue.txt", page("blue"));
        write("docs/prices.txt", pages("prices", 3));
        writeSettings(R"(, "duplex": true, "attachments": ["prices"],
            "letterheads": [{"id": "blue", "apply_first_grouped_only": true}])");
        write("a.txt", "Letter\nTo: Ada\fLetter\nTo: Ada");
    }
    Ran plan() const {
        return runVlMail({"plan", "--settings", path("node.json"), "--documents", path("docs"), "-o",
                          path("plan.json"), path("a.txt"), "--json"});
    }
    Ran carryOut() const {
        fs::remove_all(folder_ / "out");
        return runVlMail({"mail", "--plan", path("plan.json"), "-o", path("out")});
    }
};

TEST_F(PlansOfSheets, TellTheSheetsAndAreCarriedOutAsTheMailingWouldBe) {
    Ran const planned = plan();
    EXPECT_EQ(planned.status, 0) << planned.err;
    EXPECT_THAT(planned.out, HasSubstr(R"("pages":2,"sheets":4)"));
    EXPECT_EQ(mail({"a.txt"}).status, 0);
    auto const mailed = sides();
    EXPECT_EQ(metadata().letters.at(0).sheets, 4);
    Ran const ran = carryOut();
    EXPECT_EQ(ran.status, 0) << ran.err;
    EXPECT_EQ(sides(), mailed);
    EXPECT_THAT(mailed.at(0), testing::Contains("Letter To: Ada blue").Times(1));
}

TEST_F(PlansOfSheets, AreRefusedWhenADocumentHasChangedOrIsGone) {
    EXPECT_EQ(plan().status, 0);
    write("docs/blue.txt", "green");
    Ran const changed = carryOut();
    EXPECT_EQ(changed.status, 1);
    EXPECT_EQ(changed.err, "vlmail: cannot carry out the plan: \"" + path("docs/blue.txt") +
                               "\" has changed; make it again with vlmail plan [plan-outdated]\n");
    fs::remove(folder_ / "docs" / "prices.txt");
    EXPECT_THAT(carryOut().err, HasSubstr("prices.txt\" cannot be read any more"));
}

} // namespace

#include "programs/reader/document.h"

#include "programs/base/error.h"
#include "programs/reader/layout.h"
#include "tests/reader/line_texts.h"
#include "tests/support/without_rights.h"

#include <gmock/gmock.h>

#include <fstream>
#include <map>
#include <set>

namespace Reader {
namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::SizeIs;
using testing::StartsWith;

/// A folder that disappears with the test.
class Documents : public testing::Test {
protected:
    Documents() {
        std::string name = (fs::temp_directory_path() / "reader-XXXXXX").string();
        if (!::mkdtemp(name.data()))
            std::abort();
        folder_ = name;
    }
    ~Documents() override { fs::remove_all(folder_); }

    fs::path file(std::string const& name, std::string const& bytes) const {
        std::ofstream(folder_ / name, std::ios::binary) << bytes;
        return folder_ / name;
    }

    /// What opening it says is wrong, without the path in front.
    std::string complaint(fs::path const& path) const {
        try {
            openDocument(path);
        } catch (Base::Error const& error) {
            std::string const text = error.what();
            EXPECT_THAT(text, StartsWith(path.string() + ": "));
            return text.substr(std::min(text.size(), path.string().size() + 2));
        }
        return "nothing";
    }

    fs::path folder_;
};

/// A PDF of one page, made out of text.
std::string pdfOf(std::string const& text) { return openDocument(text, "made.txt").singlePagePdf(1); }

TEST_F(Documents, ThatCannotBeOpenedSayWhyAndWhatToDo) {
    EXPECT_EQ(complaint(folder_ / "none.pdf"), "there is no such file; check the name");
    EXPECT_EQ(complaint(folder_), "is a folder; name the files in it");
    EXPECT_EQ(complaint("/dev/null"), "is no ordinary file; save it to one");
    EXPECT_EQ(complaint(file("empty.pdf", "")), "is empty; export the document again");
    EXPECT_EQ(complaint(file("picture.pdf", std::string("GIF89a\0\0", 8))),
              "is named .pdf but seems to be a picture; get the document again");
    EXPECT_EQ(complaint(file("damaged.pdf", "%PDF-1.5\nand nothing more")),
              "is a damaged PDF; export the document again");
    EXPECT_EQ(complaint(file("a.txt", "x") / "b.txt"), "there is no such file; check the name");
}

TEST_F(Documents, WithoutTheRightToReadSaySo) {
    fs::path const path = file("secret.pdf", "%PDF-");
    fs::permissions(path, fs::perms::none);
    fs::permissions(folder_, fs::perms::all);
    VLServiceTest::WithoutRights const guard;
    EXPECT_EQ(complaint(path), "no right to read it; change its permissions");
}

TEST_F(Documents, AreNamedAfterTheirFilesWithoutFolders) {
    EXPECT_EQ(openDocument(file("Brief an Müller.txt", "x")).name(), "Brief an Müller.txt");
}

TEST_F(Documents, PagesCountFromOne) {
    Document document = openDocument(std::string("eins\fzwei"), "a.txt");
    EXPECT_EQ(document.pageCount(), 2);
    EXPECT_EQ(document.page(2).number, 2);
    EXPECT_THROW(document.page(0), std::out_of_range);
    EXPECT_THROW(document.page(3), std::out_of_range);
    EXPECT_THROW(document.singlePagePdf(3), std::out_of_range);
    EXPECT_THROW(document.renderPage(-1, 72), std::out_of_range);
}

TEST(TextFiles, StandOnATypedPage) {
    Document document = openDocument(std::string("Herrn\n  Olaf  Strößner\n\n\tTab"), "a.txt");
    Page const& page = document.page(1);
    EXPECT_EQ(page.width, 21000);
    EXPECT_EQ(page.height, 29700);
    ASSERT_EQ(page.words.size(), 4U);
    EXPECT_EQ(page.words[0].box, (Box{2500, 1000, 3558, 1353}));
    EXPECT_EQ(page.words[1].box, (Box{2923, 1423, 3770, 1776}));
    EXPECT_EQ(page.words[3].box, (Box{4193, 2270, 4828, 2623}));
    EXPECT_THAT(linesOf(page), ElementsAre("Herrn", "Olaf Strößner", "Tab"));
}

TEST(TextFiles, PagesEndAtFormFeeds) {
    auto const pages = [](std::string const& text) { return openDocument(text, "a.txt").pageCount(); };
    EXPECT_EQ(pages("a"), 1);
    EXPECT_EQ(pages("a\f"), 1);
    EXPECT_EQ(pages("a\fb"), 2);
    EXPECT_EQ(pages("a\f\fb\f"), 3);
    EXPECT_EQ(pages("\f"), 1);
}

TEST(TextFiles, TakeEveryKindOfLineBreak) {
    Document document = openDocument(std::string("a\r\nb\rc\nd"), "a.txt");
    EXPECT_THAT(linesOf(document.page(1)), ElementsAre("a", "b", "c", "d"));
    EXPECT_EQ(document.page(1).words[3].box.top, 1000 + 1270);
}

TEST(TextFiles, AreUtf8OrElseWindows1252) {
    EXPECT_EQ(openDocument(std::string("\xEF\xBB\xBFGr\xC3\xBCn"), "a.txt").page(1).words[0].text, "Grün");
    EXPECT_EQ(openDocument(std::string("Gr\xFCn"), "a.txt").page(1).words[0].text, "Grün");
}

TEST(TextFiles, AccentsOfTheirOwnTakeNoColumn) {
    Document document = openDocument(std::string("Cafe\xCC\x81 x"), "a.txt");
    EXPECT_EQ(document.page(1).words[0].text, "Caf\xC3\xA9");
    EXPECT_EQ(document.page(1).words[1].box.left, 2500 + 1058);
}

TEST(TextFiles, HaveALargerSheetWhereTheyNeedIt) {
    Document document = openDocument(std::string(100, '\n') + std::string(200, 'x'), "a.txt");
    EXPECT_EQ(document.page(1).height, 1000 + 42333 + 353 + 1000);
    EXPECT_EQ(document.page(1).width, 2500 + 42333 + 2500);
}

TEST(TextFiles, ThatAreNoLettersSaySo) {
    auto const complaint = [](std::string text) -> std::string {
        try {
            openDocument(std::move(text), "a.txt");
        } catch (Base::Error const& error) {
            return error.what();
        }
        return "nothing";
    };
    EXPECT_EQ(complaint(std::string(10000, '\n')), "nothing");
    EXPECT_EQ(complaint(std::string(10001, '\n')),
              "a.txt: has a page of more than 10000 lines; end its pages with form feeds");
    EXPECT_EQ(complaint(std::string(10000, 'x')), "nothing");
    EXPECT_EQ(complaint(std::string(10001, 'x')),
              "a.txt: has a line of more than 10000 characters; break its lines");
    EXPECT_EQ(complaint(std::string(100001, '\f')), "a.txt: has more than 100000 pages; split it");
    EXPECT_EQ(complaint(std::string((std::size_t{64} << 20) + 1, ' ')),
              "a.txt: has more than 64 MiB of text; split it");
}

TEST(TextFiles, BecomePdfsThatReadTheSame) {
    for (std::string const text :
         {"Herrn (Olaf) \\ Strößner\n04109 Leipzig €", "Pan Stanisław Żółkiewski\nul. Świętej Gertrudy 26/8",
          "Γεώργιο Παπαδόπουλο\n105 63 ΑΘΗΝΑ", "Щербакову Алексею\nг. Москва № 5"}) {
        Document typed = openDocument(text, "a.txt");
        Document printed = openDocument(typed.singlePagePdf(1), "a.pdf");
        ASSERT_EQ(printed.pageCount(), 1);
        EXPECT_EQ(linesOf(printed.page(1)), linesOf(typed.page(1)));
        EXPECT_EQ(printed.page(1).width, typed.page(1).width);
        std::vector<Word> const& words = typed.page(1).words;
        ASSERT_EQ(printed.page(1).words.size(), words.size());
        for (std::size_t i = 0; i < words.size(); ++i) {
            EXPECT_NEAR(printed.page(1).words[i].box.left, words[i].box.left, 2);
            EXPECT_NEAR(printed.page(1).words[i].box.right, words[i].box.right, 2);
        }
    }
}

TEST(TextFiles, EmbedOnlyTheLettersThatAreUsed) {
    EXPECT_LT(openDocument(std::string("Leipzig"), "a.txt").singlePagePdf(1).size(), 1500U);
    EXPECT_LT(openDocument(std::string("ΑΘΗΝΑ"), "a.txt").singlePagePdf(1).size(), 4000U);
}

TEST(TextFiles, DrawTheLettersThatTheyEmbed) {
    auto const picture = [](char const* text) {
        return openDocument(std::string(text), "a.txt").renderPage(1, 36);
    };
    std::set<std::string> const pictures{picture(" "), picture("Ω"), picture("Ж"), picture("ΩЖ")};
    EXPECT_THAT(pictures, SizeIs(4));
    EXPECT_EQ(picture("Ω"), picture("Ω"));
}

TEST(TextFiles, GiveTheSameSinglePageEveryTime) {
    auto const page = [] { return openDocument(std::string("Ж Ω"), "a.txt").singlePagePdf(1); };
    EXPECT_EQ(page(), page());
}

TEST(TextFiles, WithLettersThatNoFontHasSaySo) {
    try {
        openDocument(std::string("a\f中文"), "a.txt").singlePagePdf(2);
        FAIL();
    } catch (Base::Error const& error) {
        EXPECT_STREQ(error.what(), "a.txt: page 2: no font for \"中文\"; export the document as PDF");
    }
}

TEST(FilesNamedPdf, ThatAreNoneSayWhatTheySeemToBe) {
    auto const complaint = [](std::string bytes, char const* name) -> std::string {
        try {
            openDocument(std::move(bytes), name);
        } catch (Base::Error const& error) {
            return error.what();
        }
        return "nothing";
    };
    std::map<std::string, std::string> const kinds{
        {"<!DOCTYPE HTML><title>404</title>", "a web page"},
        {"\xEF\xBB\xBF\r\n  <html lang=en>", "a web page"},
        {"<?xml version=\"1.0\"?>", "an XML document"},
        {"{\\rtf1", "a word processor's document"},
        {"PK\3\4abc", "a word processor's document or another ZIP archive"},
        {"\x89PNG\r\n", "a picture"},
        {"%!PS-Adobe", "PostScript"},
        {"\x1F\x8B", "a compressed file"},
        {"Not found", "plain text"},
        {std::string("\0x", 2), "something else"},
    };
    for (auto const& [bytes, kind] : kinds)
        for (char const* const name : {"a.pdf", "a.PDF"})
            EXPECT_EQ(complaint(bytes, name), std::string(name) + ": is named .pdf but seems to be " + kind +
                                                  "; get the document again");
    EXPECT_EQ(complaint("<!DOCTYPE HTML><title>404</title>", "a.txt"), "nothing");
}

TEST(Pdfs, GiveTheSameSinglePageEveryTime) {
    Document document = openDocument(pdfOf("Brief"), "a.pdf");
    std::string const once = document.singlePagePdf(1);
    EXPECT_EQ(document.singlePagePdf(1), once);
    EXPECT_EQ(openDocument(pdfOf("Brief"), "b.pdf").singlePagePdf(1), once);
}

TEST(Pdfs, AreDrawnAsPng) {
    Document document = openDocument(pdfOf("Brief"), "a.pdf");
    EXPECT_THAT(document.renderPage(1, 36), StartsWith("\x89PNG\r\n\x1A\n"));
    EXPECT_THROW(document.renderPage(1, 1e9), Base::Error);
}

TEST(Pdfs, CutOffAnywhereFailCleanlyOrAreRead) {
    std::string const whole = pdfOf("Herrn Olaf");
    for (std::size_t length = 1; length < whole.size(); ++length) {
        try {
            Document document = openDocument(whole.substr(0, length), "cut.pdf");
            document.page(1);
        } catch (Base::Error const& error) {
            EXPECT_THAT(error.what(), HasSubstr("; "));
        }
    }
}

} // namespace
} // namespace Reader

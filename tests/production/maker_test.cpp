#include "programs/production/maker.h"

#include "programs/reader/document.h"
#include "tests/support/pdf_maker.h"
#include "vlservice/json/json_text.h"

#include <gmock/gmock.h>

#include <set>
#include <sstream>

namespace Production {
namespace {

using testing::ElementsAre;

constexpr PageSize A4{21000, 29700};
Part const A_LETTER{Part::Kind::FirstLetter};
Part const A_LATER{Part::Kind::LaterLetter};

/// A document whose pages say their name and number.
std::string documentOf(std::string const& name, int pages, PageSize size = A4, std::string const& more = "") {
    Reader::PdfMaker pdf;
    for (int page = 1; page <= pages; ++page) {
        std::ostringstream keys;
        keys << "/MediaBox [0 0 " << size.width / 2540.0 * 72 << ' ' << size.height / 2540.0 * 72 << ']';
        pdf.page(more + " BT /F 10 Tf 100 100 Td (" + name + std::to_string(page) + ") Tj ET", keys.str());
    }
    return pdf.bytes();
}

class MakerTest : public testing::Test {
protected:
    void give(std::string const& id, std::string const& bytes) { documents_[id] = prepare(bytes, id); }

    Maker maker(std::string const& keys) const {
        std::string const text = R"({"name": "P", )" + keys + "}";
        return {Cfg::PackPreset(json::strToObject(text.data(), text.size()), {}), documents_};
    }

    /// What stands on the pages of a part of so many pages, a set of words each.
    static std::vector<std::set<std::string>> made(Maker& maker, Part const& part, int pages) {
        PreparedDocument const content = prepare(documentOf("c", pages), "content.pdf");
        std::vector<std::set<std::string>> all;
        for (int number = 1; number <= pages; ++number) {
            PreparedPage const page =
                maker.make(content.pages.at(static_cast<std::size_t>(number - 1)), part, number);
            Reader::Document document = Reader::openDocument(page.pdf, "a.pdf");
            std::set<std::string>& words = all.emplace_back();
            for (Reader::Word const& word : document.page(1).words)
                words.insert(word.text);
        }
        return all;
    }

    PreparedDocuments documents_;
};

using Words = std::set<std::string>;

TEST_F(MakerTest, LaysLetterheadsOnTheirPages) {
    give("a", documentOf("a", 1));
    give("b", documentOf("b", 2));
    Maker both = maker(R"("letterheads": ["a", {"id": "b", "repeat_last_page": true, "on_top": true}])");
    EXPECT_THAT(made(both, A_LETTER, 3),
                ElementsAre(Words{"a1", "b1", "c1"}, Words{"b2", "c2"}, Words{"b2", "c3"}));
    EXPECT_EQ(both.whyNot(A_LETTER, {A4, A4, A4}, "the letter"), "");
}

TEST_F(MakerTest, TellsFirstLettersFromLaterOnesAndAttachments) {
    give("a", documentOf("a", 1));
    give("b", documentOf("b", 1));
    Maker some = maker(R"("letterheads": [{"id": "a", "apply_first_grouped_only": true},
        {"id": "b", "skip_letters": true, "which_attachments": ["terms"]}])");
    EXPECT_THAT(made(some, A_LETTER, 1), ElementsAre(Words{"a1", "c1"}));
    EXPECT_THAT(made(some, A_LATER, 1), ElementsAre(Words{"c1"}));
    EXPECT_THAT(made(some, {Part::Kind::Attachment, "terms"}, 1), ElementsAre(Words{"a1", "b1", "c1"}));
    EXPECT_THAT(made(some, {Part::Kind::Attachment, "prices"}, 1), ElementsAre(Words{"a1", "c1"}));
}

TEST_F(MakerTest, KnowsWhetherFirstLettersDiffer) {
    give("a", documentOf("a", 1));
    std::string const first = R"({"id": "a", "apply_first_grouped_only": true)";
    EXPECT_TRUE(maker(R"("letterheads": [)" + first + "}]").tellsFirstLetters());
    EXPECT_FALSE(maker(R"("letterheads": [)" + first + R"(, "skip_letters": true}])").tellsFirstLetters());
    EXPECT_FALSE(maker(R"("no_group": true, "letterheads": [)" + first + "}]").tellsFirstLetters());
    EXPECT_FALSE(maker(R"("letterheads": ["a"])").tellsFirstLetters());
}

TEST_F(MakerTest, LeavesPagesAloneWithoutAnythingToDo) {
    PreparedPage const page = prepare(documentOf("c", 1), "c.pdf").pages.at(0);
    EXPECT_EQ(maker(R"("orientation": 1)").make(page, A_LETTER, 1).pdf, page.pdf);
    give("a", documentOf("a", 1));
    EXPECT_EQ(maker(R"("letterheads": ["a"])").make(page, A_LETTER, 2).pdf, page.pdf);
}

TEST_F(MakerTest, RefusesSizesThatAreOffByMoreThanTwoMillimetres) {
    give("fits", documentOf("a", 1, {21200, 29500}));
    give("wide", documentOf("a", 1, {21201, 29700}));
    give("low", documentOf("a", 2, {21000, 29499}));
    EXPECT_EQ(maker(R"("letterheads": ["fits"])").whyNot(A_LETTER, {A4}, "the letter"), "");
    EXPECT_EQ(
        maker(R"("letterheads": ["wide"])").whyNot(A_LETTER, {A4}, "the letter"),
        "document-size: page 1 of the letterhead \"wide\" is 212.01 x 297 mm, page 1 of the letter 210 x "
        "297 mm; give both the same size, nothing is scaled");
    EXPECT_EQ(maker(R"("letterheads": [{"id": "low", "on_top": true}])")
                  .whyNot(A_LETTER, {{21000, 29499}, A4}, "the attachment \"x\""),
              "document-size: page 2 of the letterhead \"low\" is 210 x 294.99 mm, page 2 of the attachment "
              "\"x\" 210 x 297 mm; give both the same size, nothing is scaled");
    EXPECT_EQ(maker(R"("letterheads": ["wide"])").whyNot(A_LETTER, {}, "the letter"), "");
}

TEST_F(MakerTest, LooksOnlyAtLetterheadsThatApply) {
    documents_["gone"].error = "document-unknown: gone";
    EXPECT_EQ(maker(R"("letterheads": ["gone"])").whyNot(A_LETTER, {A4}, "the letter"),
              "document-unknown: gone");
    EXPECT_EQ(maker(R"("letterheads": [{"id": "gone", "skip_letters": true}])")
                  .whyNot(A_LETTER, {A4}, "the letter"),
              "");
}

TEST_F(MakerTest, LaysLetterheadsOnTheSheetThatIsPrintedOrTurnsThemAlong) {
    give("a", documentOf("a", 1));
    give("across", documentOf("a", 1, A4.turned()));
    Maker upright = maker(R"("orientation": 1, "letterheads": ["a"])");
    EXPECT_EQ(upright.whyNot(A_LETTER, {A4.turned()}, "the letter"), "");
    Maker const across = maker(R"("orientation": 2, "letterheads": ["a"])");
    EXPECT_EQ(across.whyNot(A_LETTER, {A4}, "the letter"), "");
    EXPECT_NE(maker(R"("letterheads": ["across"])").whyNot(A_LETTER, {A4}, "the letter"), "");
    PreparedPage const page = prepare(documentOf("c", 1, A4.turned()), "c.pdf").pages.at(0);
    PreparedPage const turned = upright.make(page, A_LETTER, 1);
    EXPECT_EQ(turned.size, A4);
    Reader::Document document = Reader::openDocument(turned.pdf, "a.pdf");
    for (Reader::Word const& word : document.page(1).words)
        EXPECT_EQ(word.turn, word.text == "a1" ? Reader::Turn::Upright : Reader::Turn::Up) << word.text;
}

TEST_F(MakerTest, CountsPagesWithColourOnThemOrOnWhatIsLaidOnThem) {
    give("red", documentOf("a", 1, A4, "1 0 0 rg 100 400 50 50 re f"));
    give("grey", documentOf("a", 1));
    PreparedPage const page = prepare(documentOf("c", 1), "c.pdf").pages.at(0);
    PreparedPage const blue = prepare(documentOf("c", 1, A4, "0 0 1 rg 9 9 50 50 re f"), "c.pdf").pages.at(0);
    EXPECT_TRUE(maker(R"("letterheads": ["red"])").make(page, A_LETTER, 1).isColoured);
    EXPECT_FALSE(maker(R"("letterheads": ["grey"])").make(page, A_LETTER, 1).isColoured);
    EXPECT_TRUE(maker(R"("letterheads": ["grey"])").make(blue, A_LETTER, 1).isColoured);
    EXPECT_FALSE(maker(R"("letterheads": ["red"])").make(page, A_LETTER, 2).isColoured);
}

} // namespace
} // namespace Production

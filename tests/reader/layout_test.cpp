#include "programs/reader/layout.h"

#include "tests/reader/line_texts.h"
#include "tests/support/typesetter.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <random>

namespace Reader {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

std::vector<std::vector<std::string>> blocksOf(Page const& page, LayoutRules const& rules = {}) {
    Layout const layout = layOut(page, rules);
    std::vector<std::vector<std::string>> blocks;
    for (Block const& block : layout.blocks) {
        blocks.emplace_back();
        for (std::size_t i = block.firstLine; i < block.endLine; ++i)
            blocks.back().push_back(textOf(page, layout.lines[i]));
    }
    return blocks;
}

TEST(Lines, AnEmptyPageHasNone) {
    Layout const layout = layOut(Page{});
    EXPECT_THAT(layout.lines, IsEmpty());
    EXPECT_THAT(layout.blocks, IsEmpty());
    EXPECT_EQ(layout.nearestBlock({4500, 6200}), nullptr);
}

TEST(Lines, JoinWordsOfOneHeightByOneBlank) {
    Typesetter set;
    set.line(2500, 6000, "Herrn Olaf Strößner");
    set.line(2500, 6500, "04109 Leipzig");
    EXPECT_THAT(linesOf(set.page), ElementsAre("Herrn Olaf Strößner", "04109 Leipzig"));
}

TEST(Lines, DoNotDependOnTheOrderOfTheWords) {
    Typesetter set;
    set.line(2500, 6000, "eins zwei drei vier");
    set.line(2500, 6500, "fünf sechs sieben");
    set.line(12500, 6050, "acht neun zehn");
    std::vector<std::vector<std::string>> const blocks = blocksOf(set.page);
    std::mt19937 random(7);
    for (int i = 0; i < 20; ++i) {
        std::shuffle(set.page.words.begin(), set.page.words.end(), random);
        EXPECT_EQ(blocksOf(set.page), blocks);
    }
}

TEST(Lines, EndAtAGapOfMoreThanThreeBlanks) {
    Typesetter set;
    int const right = set.line(2500, 6000, "Menge Preis");
    // A blank counts as at least a third of the font size.
    set.word(right + 399, 6000, "nah");
    set.word(right + 2000, 6000, "fern");
    EXPECT_THAT(linesOf(set.page), ElementsAre("Menge Preis nah", "fern"));
}

TEST(Lines, TheWidestGapIsThePresetsAffair) {
    Typesetter set;
    int const right = set.word(2500, 6000, "Datum:");
    set.word(right + 1000, 6000, "12.03.2024");
    EXPECT_THAT(linesOf(set.page), ElementsAre("Datum:", "12.03.2024"));
    EXPECT_THAT(linesOf(set.page, {.maxSpaces = 10}), ElementsAre("Datum: 12.03.2024"));
}

TEST(Lines, JustifiedTextMakesItsBlanksWider) {
    Typesetter set;
    for (int row = 0; row < 4; ++row)
        set.line(2500, 6000 + row * 500, "die Ware verlässt unser Lager", Typesetter::SIZE, 200);
    int const right = set.line(2500, 8000, "und ist");
    set.word(right + 550, 8000, "weit");
    EXPECT_THAT(linesOf(set.page), testing::Contains("und ist weit"));
}

TEST(Lines, TypedTextHasBlanksAsWideAsLetters) {
    Typesetter set;
    set.line(2500, 6000, "Dear Mrs Hughes", Typesetter::SIZE, 240);
    int const right = set.line(2500, 6500, "We have changed the bank.", Typesetter::SIZE, 240);
    set.line(right + 480, 6500, "Please note.", Typesetter::SIZE, 240);
    EXPECT_THAT(linesOf(set.page), ElementsAre("Dear Mrs Hughes", "We have changed the bank. Please note."));
}

TEST(Lines, TakeInRaisedAndSmallerWords) {
    Typesetter set;
    int const right = set.word(2500, 6000, "4");
    set.page.words.back().blankBehind = false;
    int const after = set.word(right + 10, 5870, "th", 280);
    set.line(after + 100, 6000, "June 2024");
    EXPECT_THAT(linesOf(set.page), ElementsAre("4th June 2024"));
}

TEST(Lines, WordsThatTouchAreOne) {
    Typesetter set;
    int const right = set.word(2500, 6000, "Kra");
    set.page.words.back().blankBehind = false;
    set.word(right + 5, 6000, "ków");
    EXPECT_THAT(linesOf(set.page), ElementsAre("Kraków"));
    // A blank of the document counts, however narrow it is.
    set.page.words.front().blankBehind = true;
    EXPECT_THAT(linesOf(set.page), ElementsAre("Kra ków"));
}

TEST(Lines, TheGapThatMakesABlankIsAdjustable) {
    Typesetter set;
    int const right = set.word(2500, 6000, "Kra");
    set.page.words.back().blankBehind = false;
    set.word(right + 60, 6000, "ków");
    EXPECT_THAT(linesOf(set.page), ElementsAre("Kra ków"));
    EXPECT_THAT(linesOf(set.page, {.spaceAdjustPerc = 100}), ElementsAre("Kraków"));
}

TEST(Lines, AWordPrintedTwiceToLookBoldIsReadOnce) {
    Typesetter set;
    set.line(2500, 6000, "Firma Müller");
    set.line(2510, 6005, "Firma Müller");
    EXPECT_THAT(linesOf(set.page), ElementsAre("Firma Müller"));
}

TEST(Lines, WordsUponOneAnotherAreLinesOfTheirOwn) {
    Typesetter set;
    set.word(2500, 6000, "BEZAHLT");
    set.word(2600, 6010, "Rechnung");
    EXPECT_THAT(linesOf(set.page), SizeIs(2));
}

TEST(Lines, OfColumnsWithOtherHeightsDoNotMix) {
    Typesetter set;
    for (int row = 0; row < 4; ++row)
        set.line(2500, 6000 + row * 480, "Anschrift Zeile");
    for (int row = 0; row < 5; ++row)
        set.line(12500, 5900 + row * 400, "Datum heute", 320);
    EXPECT_THAT(blocksOf(set.page), ElementsAre(SizeIs(5), SizeIs(4)));
}

TEST(Lines, WordsWithoutAnExtentAreRead) {
    Typesetter set;
    int const right = set.word(2500, 6000, "Kontor");
    set.page.words.push_back({"·", {right + 100, 5600, right + 100, 6080}, 400, 0, Turn::Upright, true});
    set.word(right + 200, 6000, "Hamburg");
    EXPECT_THAT(linesOf(set.page), ElementsAre("Kontor · Hamburg"));
}

TEST(Lines, RunEveryWay) {
    // The same two lines of two words, turned by quarters about the middle of a square page.
    Typesetter set;
    set.line(2500, 6000, "erste Zeile");
    set.line(2500, 6500, "zweite Zeile");
    for (Turn turn : {Turn::Upright, Turn::Down, Turn::UpsideDown, Turn::Up}) {
        Page page{1, 20000, 20000, set.page.words, set.page.fonts};
        for (Word& word : page.words) {
            word.turn = turn;
            for (int quarter = 0; quarter < static_cast<int>(turn); ++quarter)
                word.box = {20000 - word.box.bottom, word.box.left, 20000 - word.box.top, word.box.right};
        }
        EXPECT_THAT(blocksOf(page), ElementsAre(ElementsAre("erste Zeile", "zweite Zeile")))
            << static_cast<int>(turn);
        EXPECT_EQ(layOut(page).mainTurn, turn);
        EXPECT_NE(layOut(page).nearestBlock({10000, 10000}), nullptr);
    }
}

TEST(Blocks, EndWhereTheLineDistanceGrows) {
    Typesetter set;
    for (int row = 0; row < 3; ++row)
        set.line(2500, 6000 + row * 480, "Anschrift");
    set.line(2500, 6960 + 720, "nahe");
    set.line(2500, 7680 + 721, "fern");
    EXPECT_THAT(blocksOf(set.page),
                ElementsAre(ElementsAre("Anschrift", "Anschrift", "Anschrift", "nahe"), ElementsAre("fern")));
}

TEST(Blocks, TheLargestLineDistanceIsThePresetsAffair) {
    Typesetter set;
    set.line(2500, 6000, "oben");
    set.line(2500, 6960, "unten");
    EXPECT_THAT(blocksOf(set.page), SizeIs(2));
    EXPECT_THAT(blocksOf(set.page, {.maxLineDistance = 2.4}), SizeIs(1));
}

TEST(Blocks, TheSmallLineOfTheSenderIsNotOfTheAddress) {
    Typesetter set;
    set.line(2500, 5600, "Weingut Pfeiffer · Kellergasse 1 · 67433 Neustadt", 240);
    set.line(2500, 6000, "Herrn Jürgen Übelhör");
    set.line(2500, 6480, "Weinstraße 8");
    EXPECT_THAT(blocksOf(set.page),
                ElementsAre(SizeIs(1), ElementsAre("Herrn Jürgen Übelhör", "Weinstraße 8")));
}

TEST(Blocks, AWordInAnotherSizeDoesNotMakeItsLineAnother) {
    Typesetter set;
    set.line(2500, 6000, "Firma");
    int const right = set.line(2500, 6480, "Müller Metallbau");
    set.word(right + 100, 6480, "OHG", 280);
    set.line(2500, 6960, "Stuttgart");
    EXPECT_THAT(blocksOf(set.page), ElementsAre(SizeIs(3)));
}

TEST(Blocks, ColumnsUnderOneHeadingStayApart) {
    Typesetter set;
    set.line(2500, 6000, "Eine Überschrift über beide Spalten hinweg gesetzt und lang genug");
    for (int row = 1; row < 4; ++row) {
        set.line(2500, 6000 + row * 480, "links steht dies");
        set.line(9500, 6000 + row * 480, "rechts steht das");
    }
    EXPECT_THAT(blocksOf(set.page), ElementsAre(SizeIs(4), SizeIs(3)));
}

TEST(Blocks, StandInTheOrderFromTheTopAndFromTheLeft) {
    Typesetter set;
    set.line(2500, 9000, "drei");
    set.line(12500, 6000, "zwei");
    set.line(2500, 6000, "eins");
    EXPECT_THAT(linesOf(set.page), ElementsAre("eins", "zwei", "drei"));
}

TEST(Blocks, ThatRunAnotherWayComeLastAndAreNotNearest) {
    Typesetter set;
    set.page.words.push_back({"Rand", {4400, 6100, 4600, 6500}, 200, 0, Turn::Up, true});
    set.line(9000, 9000, "Im Text");
    Layout const layout = layOut(set.page);
    ASSERT_THAT(layout.blocks, SizeIs(2));
    EXPECT_EQ(layout.blocks.back().turn, Turn::Up);
    EXPECT_EQ(layout.nearestBlock({4500, 6200}), &layout.blocks.front());
}

TEST(NearestBlock, IsTheOneThatHoldsThePointOrElseTheClosest) {
    Typesetter set;
    set.line(2500, 6000, "Anschrift hier");
    set.line(12500, 6000, "Datum dort");
    set.line(2500, 9000, "Betreff unten");
    Layout const layout = layOut(set.page);
    auto const nearest = [&](Point point) {
        return textOf(set.page, layout.lines[layout.nearestBlock(point)->firstLine]);
    };
    EXPECT_EQ(nearest({3000, 5900}), "Anschrift hier");
    EXPECT_EQ(nearest({0, 0}), "Anschrift hier");
    EXPECT_EQ(nearest({20000, 100}), "Datum dort");
    EXPECT_EQ(nearest({100, 29000}), "Betreff unten");
}

// Made to cost time; the time limit of the test is what fails when every word is held against every line.
TEST(HostilePages, DoNotCostTheSquareOfTheirWords) {
    constexpr int WORDS = 5000;
    using Place = Box (*)(int);
    Place const places[] = {
        [](int) {
            return Box{1000, 1000, 1000, 1000};
        },
        [](int i) {
            return Box{i * 90, 1000, i * 90 + 1, 1010};
        },
        [](int i) {
            return Box{1000, i, 1000, i};
        },
        [](int i) {
            return Box{1000 + i % 7, i % 1000, 9000, i % 1000 + 1 + i % 900};
        },
        [](int i) {
            return Box{-i, -i * 3, i, i * 3};
        },
    };
    for (Place place : places) {
        Page page{1, 21000, 29700, {}, {{"Serif"}}};
        for (int i = 0; i < WORDS; ++i)
            page.words.push_back({std::to_string(i), place(i), 1 + i % 5000, 0, Turn::Upright, false});
        EXPECT_THAT(layOut(page).lines, testing::Not(IsEmpty()));
    }
}

} // namespace
} // namespace Reader

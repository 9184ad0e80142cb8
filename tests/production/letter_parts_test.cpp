#include "programs/production/letter_parts.h"

#include <gmock/gmock.h>

namespace Production {
namespace {

using Cfg::LetterheadInf;
using testing::ElementsAre;
using testing::IsEmpty;

Part const FIRST{Part::Kind::FirstLetter};
Part const LATER{Part::Kind::LaterLetter};
Part const TERMS{Part::Kind::Attachment, "terms"};
Part const PRICES{Part::Kind::Attachment, "prices"};

struct Flags {
    char const* what;
    LetterheadInf letterhead;
    bool first, later, terms, prices;
};

LetterheadInf letterhead(bool skipLetters, bool skipAttachments, std::vector<std::string> which,
                         bool firstOnly) {
    LetterheadInf made("blue", skipLetters, skipAttachments, false, firstOnly, false);
    made.whichAttachments = std::move(which);
    return made;
}

TEST(Letterheads, ApplyToThePartsThatTheirFlagsLeave) {
    std::vector<std::string> const terms{"terms"};
    std::vector<std::string> const others{"others", "more"};
    Flags const table[] = {
        //                                                                 first  later  terms  prices
        {"none", letterhead(false, false, {}, false), true, true, true, true},
        {"one attachment", letterhead(false, false, terms, false), true, true, true, false},
        {"other attachments", letterhead(false, false, others, false), true, true, false, false},
        {"first only", letterhead(false, false, {}, true), true, false, true, true},
        {"first only, one attachment", letterhead(false, false, terms, true), true, false, true, false},
        {"first only, others", letterhead(false, false, others, true), true, false, false, false},
        {"no attachments", letterhead(false, true, {}, false), true, true, false, false},
        {"no attachments, one", letterhead(false, true, terms, false), true, true, false, false},
        {"no attachments, others", letterhead(false, true, others, false), true, true, false, false},
        {"no attachments, first only", letterhead(false, true, {}, true), true, false, false, false},
        {"no attachments, one, first", letterhead(false, true, terms, true), true, false, false, false},
        {"no attachments, others, first", letterhead(false, true, others, true), true, false, false, false},
        {"no letters", letterhead(true, false, {}, false), false, false, true, true},
        {"no letters, one", letterhead(true, false, terms, false), false, false, true, false},
        {"no letters, others", letterhead(true, false, others, false), false, false, false, false},
        {"no letters, first only", letterhead(true, false, {}, true), false, false, true, true},
        {"no letters, one, first", letterhead(true, false, terms, true), false, false, true, false},
        {"no letters, others, first", letterhead(true, false, others, true), false, false, false, false},
        {"neither", letterhead(true, true, {}, false), false, false, false, false},
        {"neither, one", letterhead(true, true, terms, false), false, false, false, false},
        {"neither, others", letterhead(true, true, others, false), false, false, false, false},
        {"neither, first only", letterhead(true, true, {}, true), false, false, false, false},
        {"neither, one, first", letterhead(true, true, terms, true), false, false, false, false},
        {"neither, others, first", letterhead(true, true, others, true), false, false, false, false},
    };
    for (Flags const& row : table) {
        EXPECT_EQ(appliesTo(FIRST, row.letterhead), row.first) << row.what;
        EXPECT_EQ(appliesTo(LATER, row.letterhead), row.later) << row.what;
        EXPECT_EQ(appliesTo(TERMS, row.letterhead), row.terms) << row.what;
        EXPECT_EQ(appliesTo(PRICES, row.letterhead), row.prices) << row.what;
    }
}

/// The pages of a letterhead of `count` pages on the first four pages of a letter, 0 for none.
std::vector<int> pagesOnLetter(int count, bool lastRepeats) {
    std::vector<int> pages;
    for (int number = 1; number <= 4; ++number) {
        Layers const layers =
            layersOn(number, FIRST, {{"blue", false, false, lastRepeats, false, false}}, {count});
        pages.push_back(layers.under.empty() ? 0 : layers.under.front().page);
    }
    return pages;
}

TEST(Letterheads, LiePageOnPageAndGoOnWithTheLastOneWhereItRepeats) {
    EXPECT_THAT(pagesOnLetter(1, false), ElementsAre(1, 0, 0, 0));
    EXPECT_THAT(pagesOnLetter(1, true), ElementsAre(1, 1, 1, 1));
    EXPECT_THAT(pagesOnLetter(2, false), ElementsAre(1, 2, 0, 0));
    EXPECT_THAT(pagesOnLetter(2, true), ElementsAre(1, 2, 2, 2));
    EXPECT_THAT(pagesOnLetter(5, true), ElementsAre(1, 2, 3, 4));
    EXPECT_THAT(pagesOnLetter(0, true), ElementsAre(0, 0, 0, 0));
}

TEST(Letterheads, LieInListOrderUnderAndOverThePage) {
    LetterheadInf const under{"a", false, false, false, false, false};
    LetterheadInf const over{"b", false, false, false, false, true};
    Layers const layers = layersOn(1, FIRST, {over, under, over, under}, {1, 1, 1, 1});
    EXPECT_EQ(layers, (Layers{{{1, 1}, {3, 1}}, {{0, 1}, {2, 1}}}));
    EXPECT_TRUE(layersOn(2, FIRST, {over, under}, {1, 1}).empty());
}

TEST(Letterheads, EachCountThePagesOfAPartBySelf) {
    LetterheadInf const firstPages{"a", false, false, false, false, false};
    LetterheadInf const allPages{"b", false, false, true, false, false};
    EXPECT_EQ(layersOn(2, FIRST, {firstPages, allPages}, {1, 3}), (Layers{{{1, 2}}, {}}));
    EXPECT_EQ(layersOn(9, FIRST, {firstPages, allPages}, {1, 3}), (Layers{{{1, 3}}, {}}));
}

Cfg::PackPreset::Attachment at(int position) { return {"x", position, {}}; }

TEST(Attachments, GoInFrontOrBehindByTheirPositions) {
    Cfg::PackPreset::Attachment const nowhere = at(Cfg::PackPreset::Attachment::NO_PREFERRED_POS);
    AttachmentOrder const order = orderOf({nowhere, at(5), at(-1), at(0), at(-7), nowhere, at(5), at(-1)});
    EXPECT_THAT(order.inFront, ElementsAre(4, 2, 7));
    EXPECT_THAT(order.behind, ElementsAre(3, 1, 6, 0, 5));
    EXPECT_THAT(orderOf({}).inFront, IsEmpty());
    EXPECT_THAT(orderOf({}).behind, IsEmpty());
    EXPECT_THAT(orderOf({at(Cfg::PackPreset::Attachment::NO_PREFERRED_POS + 1)}).inFront, ElementsAre(0));
}

TEST(Sheets, AreSumsOfPartsOfWhichEachBeginsAFrontSide) {
    EXPECT_EQ(sheetsOf({}, Sides::Both), 0);
    EXPECT_EQ(sheetsOf({1, 2, 3}, Sides::One), 6);
    EXPECT_EQ(sheetsOf({1, 2, 3}, Sides::Both), 4);
    EXPECT_EQ(sheetsOf({1, 1, 1}, Sides::Both), 3);
    EXPECT_EQ(sheetsOf({2, 2}, Sides::Both), 2);
    EXPECT_EQ(sheetsOf({4, 499}, Sides::Both), 252);
}

TEST(BlankSides, FillTheSheetsOfOddPartsThatArePrintedOnBothSides) {
    EXPECT_TRUE(endsWithBlank(1, Sides::Both));
    EXPECT_TRUE(endsWithBlank(3, Sides::Both));
    EXPECT_FALSE(endsWithBlank(2, Sides::Both));
    EXPECT_FALSE(endsWithBlank(1, Sides::One));
}

TEST(PageSizes, AreAlikeWithinTwoMillimetresEitherWay) {
    PageSize const a4{21000, 29700};
    EXPECT_TRUE(areAlike(a4, {21200, 29500}));
    EXPECT_TRUE(areAlike({20800, 29900}, a4));
    EXPECT_FALSE(areAlike(a4, {21201, 29700}));
    EXPECT_FALSE(areAlike(a4, {20799, 29700}));
    EXPECT_FALSE(areAlike(a4, {21000, 29901}));
    EXPECT_FALSE(areAlike(a4, {21000, 29499}));
}

TEST(Orientations, TurnPagesThatLieTheOtherWay) {
    PageSize const upright{21000, 29700};
    PageSize const across = upright.turned();
    PageSize const square{20000, 20000};
    struct {
        int orientation;
        int upright, across, square;
    } const table[] = {{0, 0, 0, 0}, {1, 0, 3, 0}, {2, 1, 0, 0}, {3, 0, 0, 0}};
    for (auto const& row : table) {
        PackForcedOrientation const orientation{row.orientation};
        EXPECT_EQ(quarterTurnsFor(orientation, upright), row.upright) << row.orientation;
        EXPECT_EQ(quarterTurnsFor(orientation, across), row.across) << row.orientation;
        EXPECT_EQ(quarterTurnsFor(orientation, square), row.square) << row.orientation;
    }
}

} // namespace
} // namespace Production

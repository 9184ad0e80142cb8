#include "programs/production/cover_page.h"

#include "programs/base/error.h"
#include "tests/production/paper.h"

#include <gmock/gmock.h>

#include <algorithm>

namespace {

using namespace VLServiceTest;
using Production::Code;
using Production::coverPage;
using Production::Finding;
using Production::ProductionRules;
using Production::Severity;
using testing::ElementsAre;
using testing::IsEmpty;

ProductionRules rulesOf(json::Value const& production) {
    std::vector<Reader::RulesFault> faults;
    return ProductionRules::from(production, faults);
}

json::Value const& dinFormB() {
    static json::Value const rules = R"({
        "window": {"left": 2000, "top": 4500, "right": 10500, "bottom": 9000},
        "repair": ["cover-page"]})"_json;
    return rules;
}

constexpr char const* ADDRESS = "Jördis Müller-Łęcka\nLange Straße 12\n\n04109 Leipzig";

TEST(CoverPages, ShowTheAddressInTheWindowAndNothingElse) {
    Reader::Document document = Reader::openDocument(coverPage(ADDRESS, rulesOf(dinFormB())), "cover.pdf");
    ASSERT_EQ(document.pageCount(), 1);
    Reader::Page const& page = document.page(1);
    EXPECT_NEAR(page.width, 21000, 1);
    EXPECT_NEAR(page.height, 29700, 1);
    std::vector<std::string> words;
    Production::PlacedAddress address{ADDRESS, 1};
    for (Reader::Word const& word : page.words) {
        words.push_back(word.text);
        address.parts.push_back(word.box);
    }
    EXPECT_THAT(words, testing::UnorderedElementsAre("Jördis", "Müller-Łęcka", "Lange", "Straße", "12",
                                                     "04109", "Leipzig"));
    std::vector<Finding> found = findingsIn(document, printRules(dinFormB()), address);
    std::erase_if(found, [](Finding const& finding) { return finding.code == Code::FontNotEmbedded; });
    EXPECT_THAT(codesOf(found), IsEmpty());
}

TEST(CoverPages, AreOfTheCarriersSheet) {
    ProductionRules rules = rulesOf(dinFormB());
    rules.sheet = Production::LETTER_SHEET;
    Reader::Document document = Reader::openDocument(coverPage("Bob", rules), "cover.pdf");
    EXPECT_NEAR(document.page(1).width, 21590, 1);
    EXPECT_NEAR(document.page(1).height, 27940, 1);
}

TEST(CoverPages, OfTheSameAddressAreTheSameBytes) {
    EXPECT_EQ(coverPage(ADDRESS, rulesOf(dinFormB())), coverPage(ADDRESS, rulesOf(dinFormB())));
}

TEST(CoverPages, AreNotMadeOfAnAddressThatHasNoRoomOrNoFont) {
    ProductionRules const rules = rulesOf(dinFormB());
    std::string const widest(40, 'w');
    EXPECT_NO_THROW(coverPage(widest, rules));
    EXPECT_THROW(coverPage(widest + 'w', rules), Base::Error);
    EXPECT_NO_THROW(coverPage("1\n2\n3\n4\n5\n6\n7\n8\n9\n0", rules));
    EXPECT_THROW(coverPage("1\n2\n3\n4\n5\n6\n7\n8\n9\n0\n1", rules), Base::Error);
    EXPECT_THROW(coverPage("", rules), Base::Error);
    EXPECT_THROW(coverPage("\xE6\x9D\x8E", rules), Base::Error);
    EXPECT_THROW(coverPage("Bob", {}), Base::Error);
}

Finding found(Code code) { return {code, Severity::Error, {1}, {}, "it is wrong", "mend it"}; }

TEST(CoverPages, PutRightWhatShowsInTheWindowAndNothingElse) {
    std::vector<Finding> findings{found(Code::PageSize), found(Code::AddressOutsideWindow),
                                  found(Code::TextInWindow)};
    EXPECT_TRUE(repairByCoverPage(findings, ADDRESS, rulesOf(dinFormB())));
    EXPECT_THAT(codesOf(findings), ElementsAre("page-size"));
    EXPECT_FALSE(repairByCoverPage(findings, ADDRESS, rulesOf(dinFormB())));
}

TEST(CoverPages, ArePutInFrontOnRequestAlone) {
    std::vector<Finding> findings{found(Code::TextInWindow)};
    ProductionRules rules = rulesOf(dinFormB());
    rules.makesCoverPage = false;
    EXPECT_FALSE(repairByCoverPage(findings, ADDRESS, rules));
    EXPECT_FALSE(repairByCoverPage(findings, std::string(41, 'w'), rulesOf(dinFormB())));
    EXPECT_EQ(findings.size(), 1U);
}

} // namespace

#include "programs/production/finding.h"

#include "vlservice/json/json_text.h"

#include <gmock/gmock.h>

#include <sstream>

namespace {

using namespace Production;
using testing::ElementsAre;
using testing::SizeIs;

std::string textOf(json::Object const& object) {
    std::ostringstream text;
    text << object;
    return text.str();
}

TEST(FindingsOfALetter, AreJsonThatReadsBack) {
    Finding const finding{Code::ClearZone, Severity::Warning, {1, 3},
                          {1, 2, 3, 4},    "it stands there", "move it"};
    EXPECT_EQ(textOf(finding.toJson()),
              R"({"code":"clear-zone","severity":"warning","pages":[1,3],"box":{"left":1,"top":2,"right":3,)"
              R"("bottom":4},"says":"it stands there","fix":"move it"})");
    EXPECT_EQ(Finding::fromJson(finding.toJson()), finding);
    Finding const nowhere{Code::EmbeddedFileLost, Severity::Warning, {}, {}, "a", "b"};
    EXPECT_EQ(
        textOf(nowhere.toJson()),
        R"({"code":"embedded-file-lost","severity":"warning","pages":[],"box":{},"says":"a","fix":"b"})");
    EXPECT_EQ(Finding::fromJson(nowhere.toJson()), nowhere);
}

TEST(FindingsOfALetter, AreNotReadFromJsonThatIsNone) {
    json::Object const fine = Finding{Code::PageSize, Severity::Error, {}, {}, "a", "b"}.toJson();
    EXPECT_NO_THROW(Finding::fromJson(fine));
    for (char const* const key : {"code", "severity", "pages", "says", "fix"}) {
        json::Object broken = fine;
        broken.set(key, 17);
        EXPECT_THROW(Finding::fromJson(broken), json::Exc) << key;
    }
    for (char const* const key : {"code", "severity", "pages"}) {
        json::Object broken = fine;
        broken.set(key, "none");
        EXPECT_THROW(Finding::fromJson(broken), json::Exc) << key;
    }
}

TEST(FindingsOfALetter, OfSeveralPagesAreOneWhenNothingElseDiffers) {
    Findings findings;
    findings.add(Code::PageEmpty, {1}, "it is empty", "fill it");
    findings.add(Code::PageEmpty, {2, {0, 0, 1, 1}}, "it is empty", "fill it");
    findings.add(Code::PageEmpty, {3}, "it is empty", "fill it");
    findings.add(Code::PageEmpty, {3}, "it is empty", "fill it");
    std::vector<Finding> const all = findings.take();
    ASSERT_THAT(all, SizeIs(2));
    EXPECT_THAT(all[0].pages, ElementsAre(1, 3));
    EXPECT_THAT(all[1].pages, ElementsAre(2));
}

TEST(FindingsOfALetter, AreAHundredAtMostErrorsFirst) {
    Findings findings;
    for (int page = 1; page <= 150; ++page)
        findings.add(Code::PageEmpty, {page}, std::to_string(page), "");
    findings.add(Code::PageSize, {151}, "too large", "");
    std::vector<Finding> const all = findings.take();
    ASSERT_THAT(all, SizeIs(100));
    EXPECT_EQ(all[0].code, Code::PageSize);
    EXPECT_EQ(all[1].says, "1");
    EXPECT_EQ(all[99].says, "99");
}

TEST(FindingsOfALetter, SayTextsOfDocumentsPlainly) {
    Findings findings;
    findings.add(Code::FontNotEmbedded, {1}, "the font \"\x80\x1B[31m\"" + std::string(2000, 'x'), "");
    std::string const says = findings.take().front().says;
    EXPECT_EQ(says.find('\x1B'), says.npos);
    EXPECT_LE(says.size(), 500U);
    EXPECT_NO_THROW(textOf(json::Object{{"says", says}}));
}

TEST(CodesOfFindings, AreWarningsWhereNothingKeepsALetterFromGoingOut) {
    std::vector<std::string> warnings;
    std::vector<std::string> loose;
    for (CodeRow const& row : codes()) {
        if (row.severity == Severity::Warning)
            warnings.emplace_back(row.name);
        if (row.isLoose)
            loose.emplace_back(row.name);
    }
    EXPECT_THAT(warnings, ElementsAre("page-empty", "page-redrawn", "font-not-embedded", "annotation-lost",
                                      "embedded-file-lost"));
    EXPECT_THAT(loose, ElementsAre("content-outside-print-area", "address-outside-window", "text-in-window",
                                   "clear-zone"));
}

} // namespace

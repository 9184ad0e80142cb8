// Codes of failures and findings, and docs/errors.md, which explains them.
#include "programs/base/error_code.h"
#include "programs/manual/markdown.h"
#include "programs/manual/topic.h"
#include "programs/production/finding.h"
#include "programs/vlmail/presets/finding.h"
#include "tests/vlmail/run_vlmail.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::StartsWith;
using testing::UnorderedElementsAreArray;

std::vector<std::vector<std::string>> explainedRows() {
    std::vector<std::vector<std::string>> rows;
    for (Manual::Table const& table : Manual::tablesOf(Manual::textOf({"", "errors.md", ""})))
        rows.insert(rows.end(), table.rows.begin(), table.rows.end());
    return rows;
}

TEST(ErrorCodes, AreThoseThatThePageExplains) {
    std::vector<std::string> known;
    for (Base::CodeRow const& row : Base::codes())
        known.push_back('`' + std::string(row.name) + '`');
    std::vector<std::string> explained;
    for (std::vector<std::string> const& row : explainedRows())
        explained.push_back(row.front());
    EXPECT_THAT(explained, UnorderedElementsAreArray(known));
}

TEST(ErrorCodes, AreExplainedByWhatHappenedAndWhatToDo) {
    for (std::vector<std::string> const& row : explainedRows()) {
        ASSERT_EQ(row.size(), 3U) << row.front();
        EXPECT_THAT(row[1], Not(IsEmpty())) << row.front();
        EXPECT_THAT(row[2], Not(IsEmpty())) << row.front();
    }
}

TEST(ErrorCodes, AreShortWordsJoinedByHyphens) {
    for (Base::CodeRow const& row : Base::codes()) {
        EXPECT_THAT(row.name, testing::MatchesRegex("[a-z]+(-[a-z]+)*")) << row.name;
        EXPECT_EQ(Base::codeNamed(row.name), row.code);
    }
    EXPECT_EQ(Base::codeNamed("no-such-code"), std::nullopt);
}

TEST(Help, ExplainsTheCodeOfAnError) {
    Ran const ran = runVlMail({"help", "file-not-private"});
    EXPECT_EQ(ran.status, VlMail::FINE);
    EXPECT_EQ(ran.out, "file-not-private\n"
                       "\nWhat happened, and why: a file with a secret is open to others, or belongs to "
                       "another user\n"
                       "\nWhat to do: chmod 600 FILE as its owner\n");
}

TEST(Help, ExplainsEveryCode) {
    for (Base::CodeRow const& row : Base::codes())
        EXPECT_THAT(runVlMail({"help", row.name}).out,
                    AllOf(StartsWith(std::string(row.name) + "\n"), HasSubstr("What to do")))
            << row.name;
}

TEST(Help, ExplainsTheCodesOfFindings) {
    for (Production::CodeRow const& row : Production::codes())
        EXPECT_THAT(runVlMail({"help", row.name}).out, StartsWith(std::string(row.name) + "\n")) << row.name;
    for (VlMail::FindingWords const& row : VlMail::findingWords())
        EXPECT_THAT(runVlMail({"help", row.id}).out, StartsWith(std::string(row.id) + "\n")) << row.id;
    for (char const* code : {"department-not-listed", "purchase-order-expired", "email-malformed"})
        EXPECT_THAT(runVlMail({"help", code}).out, HasSubstr("Refused is")) << code;
}

} // namespace

#include "vlservice/presets/letterhead_inf.h"

#include "tests/support/json_helpers.h"

#include <string>
#include <utility>

namespace Cfg {
namespace {

using testing::ElementsAre;

constexpr char const* EVERY_LETTERHEAD_KEY =
    R"({"id":"head","skip_letters":true,"skip_attachments":true,"repeat_last_page":true,)"
    R"("apply_first_grouped_only":true,"on_top":true,"which_attachments":["a","b"],"colour":5})";

LetterheadInf letterhead(std::string const& text) { return LetterheadInf(valueOf(text)); }

TEST(LetterheadConstruction, StartsEmpty) {
    LetterheadInf const l;
    EXPECT_TRUE(l.empty());
    EXPECT_FALSE(l.skipLetters || l.skipAttachments || l.repeatLastPage || l.applyFirstGroupedOnly ||
                 l.onTop);
    EXPECT_THAT(l.whichAttachments, ElementsAre());
    EXPECT_FALSE(l.additional);
}

TEST(LetterheadConstruction, TakesTheFlagsInOrder) {
    for (int flag = 0; flag < 5; ++flag) {
        LetterheadInf const l("x", flag == 0, flag == 1, flag == 2, flag == 3, flag == 4);
        EXPECT_EQ(l.id, "x");
        EXPECT_EQ(l.skipLetters, flag == 0);
        EXPECT_EQ(l.skipAttachments, flag == 1);
        EXPECT_EQ(l.repeatLastPage, flag == 2);
        EXPECT_EQ(l.applyFirstGroupedOnly, flag == 3);
        EXPECT_EQ(l.onTop, flag == 4);
        EXPECT_FALSE(l.additional);
    }
}

TEST(LetterheadConstruction, IsEmptyByTheIdAlone) {
    EXPECT_TRUE(LetterheadInf("", true, true, true, true, true).empty());
    EXPECT_FALSE(LetterheadInf("x", false, false, false, false, false).empty());
}

TEST(LetterheadConstruction, SharesTheAdditionalNodeWithCopies) {
    LetterheadInf const l = letterhead(EVERY_LETTERHEAD_KEY);
    LetterheadInf const copy = l;
    EXPECT_EQ(copy.additional.node(), l.additional.node());
}

TEST(LetterheadReading, TakesAStringAsTheId) {
    LetterheadInf const l = letterhead(R"("head")");
    EXPECT_EQ(l, LetterheadInf("head", false, false, false, false, false));
    EXPECT_EQ(print(l.serialize()), R"("head")");
}

TEST(LetterheadReading, TakesEveryKeyOfAnObject) {
    LetterheadInf const l = letterhead(EVERY_LETTERHEAD_KEY);
    EXPECT_EQ(l.id, "head");
    EXPECT_TRUE(l.skipLetters && l.skipAttachments && l.repeatLastPage && l.applyFirstGroupedOnly && l.onTop);
    EXPECT_THAT(l.whichAttachments, ElementsAre("a", "b"));
    EXPECT_EQ(print(l.additional), R"({"colour":5})");
}

TEST(LetterheadReading, CountsOnlyJsonTrueAsAFlag) {
    for (char const* value : {R"("true")", "1", "false", "null", "[true]"}) {
        for (char const* key :
             {"skip_letters", "skip_attachments", "repeat_last_page", "apply_first_grouped_only", "on_top"}) {
            LetterheadInf const l = letterhead(std::string(R"({"id":"x",")") + key + "\":" + value + "}");
            EXPECT_EQ(l, LetterheadInf("x", false, false, false, false, false)) << key << value;
            EXPECT_FALSE(l.additional) << key;
        }
    }
}

TEST(LetterheadReading, RefusesWrongTypes) {
    struct {
        char const* text;
        char const* actual;
        char const* wanted;
    } const rows[] = {
        {"", "empty", "object"},
        {"5", "integer", "object"},
        {"null", "null", "object"},
        {"[]", "array", "object"},
        {"{}", "empty", "string"},
        {R"({"id":5})", "integer", "string"},
        {R"({"id":"x","which_attachments":"a"})", "string", "array"},
        {R"({"id":"x","which_attachments":null})", "null", "array"},
        {R"({"id":"x","which_attachments":["a",5]})", "integer", "string"},
        {R"({"which_attachments":5})", "empty", "string"},
    };
    for (auto const& row : rows)
        expectWrongType([&] { letterhead(row.text); }, row.actual, row.wanted);
}

TEST(LetterheadReading, DropsFileNames) {
    LetterheadInf const l = letterhead(R"({"id":"x","file_name":"f","pdf_file_name":"p","on_top":true})");
    EXPECT_FALSE(l.additional);
    EXPECT_EQ(print(l.serialize()), R"({"id":"x","on_top":true})");
}

TEST(LetterheadWriting, LeavesOutWhatIsNotSet) {
    std::pair<char const*, char const*> const rows[] = {
        {EVERY_LETTERHEAD_KEY, EVERY_LETTERHEAD_KEY},
        {R"({"id":"x"})", R"("x")"},
        {R"({"on_top":true,"unknown":1,"id":"x"})", R"({"id":"x","on_top":true,"unknown":1})"},
        {R"({"id":"x","skip_letters":true,"which_attachments":[]})", R"({"id":"x","skip_letters":true})"},
        {R"({"id":"x","repeat_last_page":true})", R"({"id":"x","repeat_last_page":true})"},
        {R"({"id":"x","skip_attachments":true})", R"({"id":"x","skip_attachments":true})"},
        {R"({"id":"x","apply_first_grouped_only":true})", R"({"id":"x","apply_first_grouped_only":true})"},
    };
    for (auto const& [read, written] : rows)
        EXPECT_EQ(print(letterhead(read).serialize()), written);
}

TEST(LetterheadWriting, LosesListAndUnknownKeysWithoutAFlag) {
    EXPECT_EQ(print(letterhead(R"({"id":"x","which_attachments":["a"]})").serialize()), R"("x")");
    EXPECT_EQ(print(letterhead(R"({"id":"x","unknown":1})").serialize()), R"("x")");
}

TEST(LetterheadWriting, LetsAdditionalKeysReplaceItsOwn) {
    LetterheadInf l("x", true, false, false, false, false);
    l.additional = json::Object{{"unknown", 1}, {"id", "y"}};
    EXPECT_EQ(print(l.serialize()), R"({"id":"y","skip_letters":true,"unknown":1})");
    l.additional = json::Value(5);
    expectWrongType([&] { l.serialize(); }, "integer", "object");
}

TEST(LetterheadComparison, SeesEveryMemberButTheAdditionalOnes) {
    LetterheadInf const l = letterhead(EVERY_LETTERHEAD_KEY);
    LetterheadInf other = l;
    other.additional = {};
    EXPECT_EQ(l, other);
    void (*const changes[])(LetterheadInf&) = {
        [](LetterheadInf& x) { x.id = "other"; },
        [](LetterheadInf& x) { x.skipLetters = false; },
        [](LetterheadInf& x) { x.skipAttachments = false; },
        [](LetterheadInf& x) {
            x.whichAttachments = {"b", "a"};
        },
        [](LetterheadInf& x) { x.whichAttachments.pop_back(); },
        [](LetterheadInf& x) { x.repeatLastPage = false; },
        [](LetterheadInf& x) { x.applyFirstGroupedOnly = false; },
        [](LetterheadInf& x) { x.onTop = false; },
    };
    for (auto const change : changes) {
        LetterheadInf changed = l;
        change(changed);
        EXPECT_NE(l, changed);
        EXPECT_FALSE(l == changed);
    }
}

} // namespace
} // namespace Cfg

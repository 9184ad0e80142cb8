#include "vlservice/presets/pack_preset.h"

#include "tests/support/json_helpers.h"

#include <climits>
#include <string>
#include <utility>

namespace Cfg {
namespace {

using Attachment = PackPreset::Attachment;
using DelayInfo = PackPreset::DelayInfo;
using testing::ElementsAre;

Attachment attachment(std::string const& text) { return Attachment(valueOf(text)); }

DelayInfo delay(std::string const& text) { return DelayInfo(parse(text)); }

TEST(AttachmentConstruction, TakesItsMembers) {
    json::Value const additional = parse(R"({"a":1})");
    Attachment const a("doc", 7, additional);
    EXPECT_EQ(a.id, "doc");
    EXPECT_EQ(a.preferredPos, 7);
    EXPECT_EQ(a.additional.node(), additional.node());
    EXPECT_EQ(Attachment(a).additional.node(), additional.node());
}

TEST(AttachmentReading, TakesAStringAsTheId) {
    Attachment const a = attachment(R"("doc")");
    EXPECT_EQ(a.id, "doc");
    EXPECT_EQ(a.preferredPos, INT_MIN);
    EXPECT_FALSE(a.additional);
}

TEST(AttachmentReading, TakesEveryKeyOfAnObject) {
    Attachment const a = attachment(R"({"id":"doc","preferred_pos":-3,"unknown":[1]})");
    EXPECT_EQ(a.id, "doc");
    EXPECT_EQ(a.preferredPos, -3);
    EXPECT_EQ(print(a.additional), R"({"unknown":[1]})");
    EXPECT_EQ(attachment(R"({"id":"doc","preferred_pos":4294967297})").preferredPos, 1);
}

TEST(AttachmentReading, RefusesWrongTypes) {
    struct {
        char const* text;
        char const* actual;
        char const* wanted;
    } const rows[] = {
        {"", "empty", "object"},
        {"5", "integer", "object"},
        {"[]", "array", "object"},
        {"{}", "empty", "string"},
        {R"({"id":5,"preferred_pos":1.5})", "integer", "string"},
        {R"({"id":"x","preferred_pos":1.5})", "float", "integer"},
        {R"({"id":"x","preferred_pos":null})", "null", "integer"},
    };
    for (auto const& row : rows)
        expectWrongType([&] { attachment(row.text); }, row.actual, row.wanted);
}

TEST(AttachmentWriting, IsAStringUnlessThereIsMoreThanTheId) {
    std::pair<char const*, char const*> const rows[] = {
        {R"("x")", R"("x")"},
        {R"({"id":"x"})", R"("x")"},
        {R"({"id":"x","doc_name":"d","is_letter":true,"pdf_file_name":"p"})", R"("x")"},
        {R"({"id":"x","preferred_pos":-2147483648})", R"("x")"},
        {R"({"id":"x","preferred_pos":0})", R"({"id":"x","preferred_pos":0})"},
        {R"({"id":"x","unknown":1})", R"({"id":"x","unknown":1})"},
        {R"({"unknown":1,"id":"x","preferred_pos":2,"more":{}})",
         R"({"id":"x","preferred_pos":2,"unknown":1,"more":{}})"},
    };
    for (auto const& [read, written] : rows)
        EXPECT_EQ(print(attachment(read).serialize()), written);
}

TEST(AttachmentWriting, LetsAdditionalKeysReplaceItsOwn) {
    EXPECT_EQ(print(Attachment("x", 1, parse(R"({"preferred_pos":"first"})")).serialize()),
              R"({"id":"x","preferred_pos":"first"})");
    EXPECT_EQ(print(Attachment("x", INT_MIN, json::Object()).serialize()), R"({"id":"x"})");
    expectWrongType([] { Attachment("x", 1, json::Value("text")).serialize(); }, "string", "object");
}

TEST(AttachmentComparison, SeesEveryMember) {
    Attachment const a("x", 1, parse(R"({"a":1})"));
    EXPECT_EQ(a, Attachment("x", 1, parse(R"({"a":1})")));
    EXPECT_NE(a, Attachment("y", 1, parse(R"({"a":1})")));
    EXPECT_NE(a, Attachment("x", 2, parse(R"({"a":1})")));
    EXPECT_NE(a, Attachment("x", 1, parse(R"({"a":2})")));
    EXPECT_NE(a, Attachment("x", 1, {}));
    EXPECT_EQ(Attachment("x", 1, {}), Attachment("x", 1, {}));
}

TEST(DelayReading, TakesEveryKey) {
    DelayInfo const d = delay(R"({"count":2,"week_days":[3,1,3],"month_days":[31],"mins":[-1,4294967297]})");
    EXPECT_EQ(d.count, 2);
    EXPECT_THAT(d.weekDays, ElementsAre(1, 3));
    EXPECT_THAT(d.monthDays, ElementsAre(31));
    EXPECT_THAT(d.mins, ElementsAre(-1, 1));
}

TEST(DelayReading, StartsFromNothing) {
    EXPECT_EQ(delay("{}"), DelayInfo());
    EXPECT_EQ(delay(R"({"count":"2"})").count, 0);
    EXPECT_THAT(DelayInfo::jArrToInts({}), ElementsAre());
}

TEST(DelayReading, RefusesWhatIsNoListOfIntegers) {
    for (char const* key : {"week_days", "month_days", "mins"}) {
        auto const reading = [key](char const* value) {
            return [=] { delay(std::string("{\"") + key + "\":" + value + "}"); };
        };
        expectWrongType(reading("5"), "integer", "array");
        expectWrongType(reading("null"), "null", "array");
        expectWrongType(reading(R"([1,"2"])"), "string", "integer");
        expectWrongType(reading("[1.5]"), "float", "integer");
    }
}

TEST(DelayWriting, SortsAndLeavesOutWhatIsEmpty) {
    EXPECT_EQ(print(DelayInfo().serialize()), "{}");
    EXPECT_EQ(print(delay(R"({"mins":[30,0],"month_days":[],"week_days":[3,1,3],"count":2})").serialize()),
              R"({"count":2,"week_days":[1,3],"mins":[0,30]})");
    EXPECT_EQ(print(delay(R"({"month_days":[31]})").serialize()), R"({"month_days":[31]})");
}

TEST(DelayComparison, SeesEveryMember) {
    DelayInfo const d = delay(R"({"count":2,"week_days":[1],"month_days":[2],"mins":[3]})");
    EXPECT_EQ(d, DelayInfo(d));
    EXPECT_NE(d, delay(R"({"week_days":[1],"month_days":[2],"mins":[3]})"));
    EXPECT_NE(d, delay(R"({"count":2,"month_days":[2],"mins":[3]})"));
    EXPECT_NE(d, delay(R"({"count":2,"week_days":[1],"mins":[3]})"));
    EXPECT_NE(d, delay(R"({"count":2,"week_days":[1],"month_days":[2]})"));
}

} // namespace
} // namespace Cfg

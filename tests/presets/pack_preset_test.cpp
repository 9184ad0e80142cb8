#include "vlservice/presets/pack_preset.h"

#include "tests/support/json_helpers.h"

#include <ctime>
#include <stdexcept>
#include <string>
#include <type_traits>
#include <utility>

namespace Cfg {
namespace {

using DelayInfo = PackPreset::DelayInfo;
using testing::SizeIs;

/// Every key that is read, in wire order, with a value other than its default.
constexpr char const* EVERY_KEY =
    R"({"name":"n","title":"t","colour_model":2,"duplex":true,"orientation":-1,"department":"d","no_group":true,)"
    R"("process_mode":3,"process_mode_client":16,"profile":"p","priority_delivery":true,)"
    R"("confirmation_email":true,"customer_email":"e","lock_pack_ui":true,"last_used":4294967296,)"
    R"("delay":{"count":1},"attachments":["a",{"id":"b","preferred_pos":0}],"letterheads":["l"],"unknown":null})";

PackPreset preset(std::string const& text, std::unordered_set<std::string> const& extraFields = {}) {
    return PackPreset(parse(text), extraFields);
}

/// A preset of that name with one more member.
PackPreset presetWith(std::string const& member) { return preset(R"({"name":"n",)" + member + "}"); }

std::string rewritten(std::string const& text) { return print(preset(text).serialize(false)); }

TEST(PackPresetConstruction, StartsFromTheDefaults) {
    PackPreset const p;
    EXPECT_EQ(print(p.serialize(false)), R"({"name":""})");
    EXPECT_EQ(p.colorModel(), PackColorModel::Default);
    EXPECT_EQ(p.orientationForced(), PackForcedOrientation::Default);
    EXPECT_EQ(p.processMode(), ProcessMode(0));
    EXPECT_EQ(p.processModeClient(), ProcessModeClient());
    EXPECT_EQ(p.pDelayInfo(), nullptr);
    EXPECT_FALSE(p.jAdditional());
    EXPECT_FALSE(p.eraseMe());
}

TEST(PackPresetConstants, NameTheKeys) {
    EXPECT_EQ(PackPreset::NAME_FLD_NAME, "name");
    EXPECT_EQ(PackPreset::PROC_MODE_FLD_NAME, "process_mode");
}

TEST(PackPresetReading, TakesEveryKey) {
    PackPreset const p = preset(EVERY_KEY);
    EXPECT_EQ(p.name(), "n");
    EXPECT_EQ(p.title(), "t");
    EXPECT_EQ(p.colorModel(), PackColorModel{2});
    EXPECT_TRUE(p.duplex());
    EXPECT_EQ(p.orientationForced(), PackForcedOrientation{-1});
    EXPECT_EQ(p.department(), "d");
    EXPECT_TRUE(p.noGroup());
    EXPECT_EQ(p.processMode().bits(), 3U);
    EXPECT_EQ(p.processModeClient().bits(), 16U);
    EXPECT_EQ(p.profile(), "p");
    EXPECT_TRUE(p.priorityDelivery());
    EXPECT_TRUE(p.confirmReceipt());
    EXPECT_EQ(p.userEmailOverride(), "e");
    EXPECT_TRUE(p.lockPackUI());
    ASSERT_NE(p.pDelayInfo(), nullptr);
    EXPECT_EQ(p.pDelayInfo()->count, 1);
    ASSERT_THAT(p.attachments(), SizeIs(2));
    EXPECT_EQ(p.attachments()[1].id, "b");
    ASSERT_THAT(p.letterheads(), SizeIs(1));
    EXPECT_EQ(p.letterheads()[0].id, "l");
    EXPECT_EQ(print(p.jAdditional()), R"({"lock_pack_ui":true,"unknown":null})");
    EXPECT_FALSE(p.eraseMe());
}

TEST(PackPresetReading, PassesOverKeysOfAnotherType) {
    PackPreset const p = preset(
        R"({"name":"n","title":5,"colour_model":"2","duplex":1,"orientation":true,"department":[],"no_group":"true",)"
        R"("process_mode":"3","process_mode_client":2.0,"profile":null,"priority_delivery":0,)"
        R"("confirmation_email":{},"customer_email":false,"last_used":1.5,"erase_me":1})");
    EXPECT_EQ(p, preset(R"({"name":"n"})"));
    EXPECT_EQ(print(p.serialize(false)), R"({"name":"n"})");
}

TEST(PackPresetReading, CutsNumbersTo32Bits) {
    EXPECT_EQ(presetWith(R"("colour_model":4294967298)").colorModel(), PackColorModel{2});
    EXPECT_EQ(presetWith(R"("orientation":4294967295)").orientationForced(), PackForcedOrientation{-1});
    EXPECT_EQ(presetWith(R"("process_mode":4294967299)").processMode(), ProcessMode(3));
}

TEST(PackPresetReading, WantsTheNameOfItsForm) {
    for (char const* text : {"{}", R"({"pack_preset":"p"})"})
        expectWrongType([&] { preset(text); }, "empty", "string");
    expectWrongType([] { preset(R"({"name":5})"); }, "integer", "string");
    expectWrongType([] { preset(R"({"name":"n"})", {"x"}); }, "empty", "string");
    expectWrongType([] { preset(R"({"name":"n","pack_preset":null})", {"x"}); }, "null", "string");
}

TEST(PackPresetReading, TakesTheEmbeddedNameWithExtraFields) {
    PackPreset const p =
        preset(R"({"name":5,"pack_preset":"p","mine":1,"other":2})", {"other", "pack_preset"});
    EXPECT_EQ(p.name(), "p");
    EXPECT_EQ(print(p.jAdditional()), R"({"mine":1})");
    EXPECT_EQ(print(preset(R"({"pack_preset":"p"})", {"x"}).jAdditional()), R"({"pack_preset":"p"})");
}

TEST(PackPresetReading, KeepsTheEmbeddedNameOfAConfigurationFormAsAdditional) {
    EXPECT_EQ(rewritten(R"({"pack_preset":"p","name":"n"})"), R"({"name":"n","pack_preset":"p"})");
}

TEST(PackPresetReading, AcceptsProcessModes) {
    for (unsigned const bits : {0U, 1U, 2U, 3U, 8U, 9U, 0x80U, 0x83U, 0xF5U})
        EXPECT_EQ(presetWith("\"process_mode\":" + std::to_string(bits)).processMode().bits(), bits);
    for (unsigned const bits : {0U, 1U, 2U, 0x10U, 0x13U, 0xFFU})
        EXPECT_EQ(presetWith("\"process_mode_client\":" + std::to_string(bits)).processModeClient().bits(),
                  bits);
}

TEST(PackPresetReading, RefusesProcessModes) {
    char const* const message = "Invalid value for process_mode!";
    for (int const bits : {10, 4, 0x100, -1, 0x8A, 0x70, 0x101})
        expectFailure<std::runtime_error>([&] { presetWith("\"process_mode\":" + std::to_string(bits)); },
                                          message);
    for (int const bits : {4, 8, 0x80, 0x100, 0x101, -1})
        expectFailure<std::runtime_error>(
            [&] { presetWith("\"process_mode_client\":" + std::to_string(bits)); }, message);
}

TEST(PackPresetReading, ReportsTheFirstFailureInOrder) {
    char const* const mode = "Invalid value for process_mode!";
    expectWrongType([] { preset(R"({"delay":1,"process_mode":4})"); }, "empty", "string");
    expectFailure<std::runtime_error>([] { presetWith(R"("letterheads":1,"delay":1,"process_mode":4)"); },
                                      mode);
    expectFailure<std::runtime_error>([] { presetWith(R"("delay":1,"process_mode_client":4)"); }, mode);
    expectWrongType([] { presetWith(R"("letterheads":"l","attachments":1.5,"delay":true)"); }, "boolean",
                    "object");
    expectWrongType([] { presetWith(R"("letterheads":"l","attachments":1.5)"); }, "float", "array");
}

TEST(PackPresetReading, RefusesWrongTypesInItsLists) {
    struct {
        char const* member;
        char const* actual;
        char const* wanted;
    } const rows[] = {
        {R"("delay":null)", "null", "object"},
        {R"("delay":{"mins":["1"]})", "string", "integer"},
        {R"("attachments":{})", "object", "array"},
        {R"("attachments":null)", "null", "array"},
        {R"("attachments":["a",5])", "integer", "object"},
        {R"("attachments":[{"id":"a","preferred_pos":"1"}])", "string", "integer"},
        {R"("letterheads":"l")", "string", "array"},
        {R"("letterheads":[{}])", "empty", "string"},
    };
    for (auto const& row : rows)
        expectWrongType([&] { presetWith(row.member); }, row.actual, row.wanted);
}

TEST(PackPresetReading, DropsReservedKeysThatNobodyReads) {
    for (char const* key :
         {"purchase_order", "add_docs", "account", "user", "_id", "draft", "version", "covert"}) {
        PackPreset const p = presetWith(std::string("\"") + key + "\":1");
        EXPECT_FALSE(p.jAdditional()) << key;
        EXPECT_EQ(print(p.serialize(false)), R"({"name":"n"})") << key;
    }
}

TEST(PackPresetReading, SharesAdditionalValuesWithTheObject) {
    json::Object const object = parse(R"({"name":"n","unknown":[1]})");
    PackPreset const p(object, {});
    EXPECT_EQ(p.jAdditional().toObject().get("unknown").node(), object.get("unknown").node());
}

TEST(PackPresetWriting, GivesBackWhatWasRead) {
    // "lock_pack_ui" is an additional key too, and is set in its own place again.
    EXPECT_EQ(rewritten(EVERY_KEY), EVERY_KEY);
    for (char const* text : {R"({"name":"n"})", R"({"name":""})", R"({"name":"n","delay":{}})",
                             R"({"name":"n","a":1,"b":{"c":[]}})"})
        EXPECT_EQ(rewritten(text), text);
}

TEST(PackPresetWriting, LeavesOutEachDefault) {
    for (char const* member :
         {R"("title":"")", R"("colour_model":0)", R"("duplex":false)", R"("orientation":0)",
          R"("department":"")", R"("no_group":false)", R"("process_mode":0)", R"("process_mode_client":0)",
          R"("profile":"")", R"("priority_delivery":false)", R"("confirmation_email":false)",
          R"("customer_email":"")", R"("last_used":0)", R"("attachments":[])", R"("letterheads":[])",
          R"("erase_me":false)"})
        EXPECT_EQ(print(presetWith(member).serialize(false)), R"({"name":"n"})") << member;
}

TEST(PackPresetWriting, NamesThePresetByItsForm) {
    EXPECT_EQ(print(presetWith(R"("duplex":true)").serialize(true)), R"({"pack_preset":"n","duplex":true})");
    EXPECT_EQ(print(PackPreset().serialize(true)), R"({"pack_preset":""})");
}

TEST(PackPresetWriting, ShrinksToATombstoneInTheConfigurationFormOnly) {
    PackPreset const p = presetWith(R"("title":"t","erase_me":true,"unknown":1)");
    EXPECT_TRUE(p.eraseMe());
    EXPECT_EQ(print(p.serialize(false)), R"({"name":"n","erase_me":true})");
    EXPECT_EQ(print(p.serialize(true)), R"({"pack_preset":"n","title":"t","unknown":1})");
    PackPreset const unnamed;
    unnamed.setEraseMe(true);
    EXPECT_EQ(print(unnamed.serialize(false)), R"({"name":"","erase_me":true})");
}

TEST(PackPresetWriting, LetsAdditionalKeysReplaceItsOwn) {
    PackPreset p = presetWith(R"("title":"own","duplex":true)");
    p.setAdditional(parse(R"({"z":1,"title":"additional","name":5})"));
    EXPECT_EQ(print(p.serialize(false)), R"({"name":5,"title":"additional","duplex":true,"z":1})");
}

TEST(PackPresetWriting, RefusesAdditionalValuesThatAreNoObject) {
    PackPreset p = presetWith(R"("duplex":true)");
    p.setAdditional("text");
    expectWrongType([&] { p.serialize(false); }, "string", "object");
    expectWrongType([&] { p.serialize(true); }, "string", "object");
    expectWrongType([&] { p.jObjAdditional(); }, "string", "object");
    p.setAdditional(json::Value(json_null()));
    expectWrongType([&] { p.serialize(false); }, "null", "object");
    p.setEraseMe(true);
    EXPECT_EQ(print(p.serialize(false)), R"({"name":"n","erase_me":true})");
}

TEST(PackPresetWriting, LetsTheLockThatWasReadStandTwice) {
    PackPreset p = presetWith(R"("lock_pack_ui":true)");
    p.setLockPackUI(false);
    EXPECT_FALSE(p.lockPackUI());
    EXPECT_EQ(print(p.serialize(false)), R"({"name":"n","lock_pack_ui":true})");
    PackPreset fresh = preset(R"({"name":"n"})");
    fresh.setLockPackUI(true);
    EXPECT_EQ(print(fresh.serialize(false)), R"({"name":"n","lock_pack_ui":true})");
    fresh.setLockPackUI(false);
    EXPECT_EQ(print(fresh.serialize(false)), R"({"name":"n"})");
}

TEST(PackPresetWriting, GivesFlagWordsAsUnsignedNumbers) {
    PackPreset p;
    p.setProcessMode(ProcessMode(0xFFFFFFFF));
    p.setProcessModeClient(ProcessModeClient(0x80000000));
    EXPECT_EQ(print(p.serialize(false)),
              R"({"name":"","process_mode":4294967295,"process_mode_client":2147483648})");
}

TEST(PackPresetChanges, AreSeenByTheGetters) {
    PackPreset p;
    p.setName("n");
    p.setTitle("t");
    p.setColourMode(PackColorModel{2});
    p.setDuplex(true);
    p.setOrientationForced(PackForcedOrientation{-1});
    p.setDepartment("d");
    p.setNoGroup(true);
    p.setProcessMode(ProcessMode(3));
    p.setProcessModeClient(ProcessModeClient(16));
    p.setProfile("p");
    p.setPriorityDelivery(true);
    p.setConfirmReceipt(true);
    p.setUserEmailOverride("e");
    p.setLockPackUI(true);
    p.setDelayInfo(DelayInfo(parse(R"({"count":1})")));
    p.attachments() = preset(EVERY_KEY).attachments();
    p.letterheads() = preset(EVERY_KEY).letterheads();
    p.setAdditional(parse(R"({"lock_pack_ui":true,"unknown":null})"));
    EXPECT_EQ(p, preset(EVERY_KEY));
}

TEST(PackPresetChanges, MakeAdditionalKeysOnDemand) {
    PackPreset p = preset(R"({"name":"n"})");
    EXPECT_EQ(print(p.jObjAdditional()), "{}");
    EXPECT_TRUE(p.jAdditional().isObject());
    EXPECT_EQ(print(p.serialize(false)), R"({"name":"n"})");
    PackPreset const copy = p;
    p.jObjAdditional().set("a", 1);
    EXPECT_EQ(print(p.serialize(false)), R"({"name":"n","a":1})");
    EXPECT_EQ(print(copy.jAdditional()), "{}");
}

TEST(PackPresetChanges, ReplaceTheDelayThatCopiesShare) {
    PackPreset p = presetWith(R"("delay":{"count":1})");
    PackPreset const copy = p;
    EXPECT_EQ(copy.pDelayInfo(), p.pDelayInfo());
    DelayInfo changed = *p.pDelayInfo();
    changed.count = 2;
    p.setDelayInfo(changed);
    EXPECT_EQ(p.pDelayInfo()->count, 2);
    EXPECT_EQ(copy.pDelayInfo()->count, 1);
}

TEST(PackPresetChanges, SetAndDeleteTheTimeOfUse) {
    PackPreset p = preset(R"({"name":"n"})");
    long long const before = std::time(nullptr);
    p.resetLastUsed();
    long long const lastUsed = p.serialize(false).get("last_used").toInt();
    EXPECT_GE(lastUsed, before);
    EXPECT_LE(lastUsed, std::time(nullptr));
    p.deleteLastUsed();
    EXPECT_EQ(print(p.serialize(false)), R"({"name":"n"})");
}

TEST(PackPresetComparison, SeesEverySetting) {
    std::pair<char const*, char const*> const rows[] = {
        {R"("colour_model":1)", R"("colour_model":2)"},
        {R"("duplex":true)", R"("duplex":false)"},
        {R"("orientation":1)", R"("orientation":2)"},
        {R"("no_group":true)", R"("no_group":false)"},
        {R"("process_mode":1)", R"("process_mode":2)"},
        {R"("process_mode_client":1)", R"("process_mode_client":2)"},
        {R"("priority_delivery":true)", R"("priority_delivery":false)"},
        {R"("confirmation_email":true)", R"("confirmation_email":false)"},
        {R"("lock_pack_ui":true)", R"("lock_pack_ui":false)"},
        {R"("title":"a")", R"("title":"b")"},
        {R"("department":"a")", R"("department":"b")"},
        {R"("profile":"a")", R"("profile":"b")"},
        {R"("customer_email":"a")", R"("customer_email":"b")"},
        {R"("attachments":["a","b"])", R"("attachments":["b","a"])"},
        {R"("attachments":["a"])", R"("attachments":["a","a"])"},
        {R"("letterheads":["a"])", R"("letterheads":["b"])"},
        {R"("letterheads":["a"])", R"("letterheads":[])"},
        {R"("unknown":1)", R"("unknown":2)"},
        {R"("unknown":1)", R"("other":1)"},
        {R"("unknown":1)", R"("title":"")"},
        {R"("delay":{})", R"("delay":{"count":1})"},
        {R"("delay":{})", R"("title":"")"},
        {R"("erase_me":true)", R"("erase_me":false)"},
    };
    for (auto const& [a, b] : rows) {
        EXPECT_TRUE(presetWith(a).compareSettings(presetWith(a))) << a;
        EXPECT_FALSE(presetWith(a).compareSettings(presetWith(b))) << a << b;
        EXPECT_FALSE(presetWith(b).compareSettings(presetWith(a))) << a << b;
        EXPECT_NE(presetWith(a), presetWith(b)) << a << b;
    }
}

TEST(PackPresetComparison, SeesTheLockWithoutItsAdditionalCopy) {
    PackPreset locked = preset(R"({"name":"n"})");
    locked.setLockPackUI(true);
    EXPECT_FALSE(locked.compareSettings(preset(R"({"name":"n"})")));
}

TEST(PackPresetComparison, PassesOverTheTimeOfUseAndTheName) {
    EXPECT_EQ(presetWith(R"("last_used":1)"), presetWith(R"("last_used":2)"));
    PackPreset const a = preset(R"({"name":"a"})");
    PackPreset const b = preset(R"({"name":"b"})");
    EXPECT_TRUE(a.compareSettings(b));
    EXPECT_TRUE(a != b);
    EXPECT_FALSE(a == b);
}

TEST(PackPresetCopies, AreEqualAndMovable) {
    PackPreset const p = preset(EVERY_KEY);
    PackPreset copy = p;
    EXPECT_EQ(copy, p);
    EXPECT_EQ(copy.jAdditional().node(), p.jAdditional().node());
    PackPreset const moved = std::move(copy);
    EXPECT_EQ(moved, p);
    static_assert(std::is_nothrow_move_constructible_v<PackPreset> &&
                  std::is_nothrow_move_assignable_v<PackPreset>);
}

TEST(ProcessModes, AreWordsOfBits) {
    static_assert(!std::is_convertible_v<std::uint32_t, ProcessMode>);
    static_assert(!std::is_convertible_v<std::uint32_t, ProcessModeClient>);
    EXPECT_EQ(ProcessMode(0x1234).bits(), 0x1234U);
    EXPECT_TRUE(ProcessMode() == ProcessMode(0));
    EXPECT_TRUE(ProcessMode(1) != ProcessMode(2));
    EXPECT_TRUE(ProcessModeClient(1) != ProcessModeClient(2));
}

} // namespace
} // namespace Cfg

#include "programs/policy/auto_presets.h"

#include "tests/vlserviced/json_help.h"

#include <gtest/gtest.h>

namespace {

constexpr long long A_DAY = 86'400;
constexpr long long DAY_1000 = 1'000 * A_DAY;

std::string withoutUnused(std::string const& presets) {
    json::Value const left = Policy::withoutUnused(parse(presets), DAY_1000);
    return left ? print(left) : "unchanged";
}

std::string usedAt(long long day) { return "\"last_used\":" + std::to_string(day * A_DAY); }

TEST(PresetsThatExpire, AreThoseOfProgramsAlone) {
    EXPECT_TRUE(Policy::expiresUnused("#auto_bill.pdf"));
    EXPECT_TRUE(Policy::expiresUnused("#auto_"));
    EXPECT_FALSE(Policy::expiresUnused("Bills #auto_"));
    EXPECT_FALSE(Policy::expiresUnused("#AUTO_bill.pdf"));
    EXPECT_FALSE(Policy::expiresUnused(""));
}

TEST(PresetsThatExpire, BearTheTimeOfTheirLastUse) {
    json::Object const presets = parse(
        R"({"extract_presets":[{"match":"a","pack_preset":"#auto_a"},{"match":"b","pack_preset":"#auto_b"}],)"
        R"("pack_presets":[{"name":"Bills"},{"name":"#auto_a","last_used":5}]})");
    EXPECT_EQ(
        print(Policy::withUse(presets, "#auto_a", 77)),
        R"({"extract_presets":[{"match":"a","pack_preset":"#auto_a","last_used":77},{"match":"b","pack_preset":"#auto_b"}],)"
        R"("pack_presets":[{"name":"Bills"},{"name":"#auto_a","last_used":77}]})");
    EXPECT_FALSE(Policy::withUse(presets, "#auto_c", 77));
    EXPECT_FALSE(Policy::withUse(presets, "Bills", 77));
    EXPECT_FALSE(Policy::withUse({}, "#auto_a", 77));
}

TEST(PresetsThatExpire, GoWhenNobodyHasUsedThemForNinetyDays) {
    EXPECT_EQ(
        withoutUnused(R"({"pack_presets":[{"name":"#auto_a",)" + usedAt(909) + R"(},{"name":"#auto_b",)" +
                      usedAt(910) + R"(},{"name":"Bills",)" + usedAt(1) + "}]}"),
        R"({"pack_presets":[{"name":"#auto_b",)" + usedAt(910) + R"(},{"name":"Bills",)" + usedAt(1) + "}]}");
    EXPECT_EQ(withoutUnused(R"({"pack_presets":[{"name":"Bills"},7]})"), "unchanged");
}

TEST(PresetsThatExpire, GoAndStayWithThoseThatNameThem) {
    EXPECT_EQ(withoutUnused(R"({"extract_presets":[{"match":"a","pack_preset":"#auto_a",)" + usedAt(950) +
                            R"(}],"pack_presets":[{"name":"#auto_a",)" + usedAt(100) + "}]}"),
              "unchanged");
    EXPECT_EQ(withoutUnused(R"({"extract_presets":[{"match":"a","pack_preset":"#auto_a",)" + usedAt(100) +
                            R"(}],"pack_presets":[{"name":"#auto_a",)" + usedAt(101) + "}]}"),
              R"({"extract_presets":[],"pack_presets":[]})");
}

TEST(PresetsThatExpire, BeginToCountWhereTheyBearNoTime) {
    EXPECT_EQ(withoutUnused(R"({"pack_presets":[{"name":"#auto_a"}]})"),
              R"({"pack_presets":[{"name":"#auto_a",)" + usedAt(1000) + "}]}");
}

} // namespace

// What an account and the nodes below it set up: endpoints and hours, the code, departments, profiles.
#include "vlservice/cfg/departments.h"
#include "vlservice/cfg/inet.h"
#include "vlservice/cfg/po.h"
#include "vlservice/cfg/profiles.h"

#include "tests/support/json_literal.h"

#include <gtest/gtest.h>

#include <string>
#include <type_traits>
#include <vector>

namespace {

using namespace VLServiceTest;
using Cfg::Department;
using Cfg::Departments;
using Cfg::DepFieldIdxs;
using Cfg::Inet;
using Cfg::InetFieldIdxs;
using Cfg::PO;
using Cfg::POFieldIdxs;
using Cfg::ProfFieldIdxs;
using Cfg::Profile;
using Cfg::Profiles;

static_assert(std::is_convertible_v<json::Value, Department> &&
              std::is_convertible_v<json::Object, Department>);
static_assert(!std::is_constructible_v<Department, char const*>);
static_assert(!std::is_constructible_v<Department, std::string>);
static_assert(!std::is_constructible_v<Department, int>);
static_assert(!std::is_constructible_v<Profile, json::Value>);
static_assert(std::is_constructible_v<Profile, json::Object>);
static_assert(!std::is_default_constructible_v<Inet> && !std::is_default_constructible_v<PO>);
static_assert(std::is_same_v<decltype(Profile().serialize()), json::Object>);
static_assert(std::is_same_v<decltype(Department().serialize()), json::Value>);

TEST(AccountParts, HaveTheirNames) {
    EXPECT_EQ(Inet::PART_NAME, "inet");
    EXPECT_EQ(PO::PART_NAME, "po");
    EXPECT_EQ(Departments::PART_NAME, "deps");
    EXPECT_EQ(Profiles::PART_NAME, "profiles");
}

TEST(InetPart, OfTheRootHasTheDefaultsStillInherited) {
    Inet const inet(json::Value(), true, false);
    EXPECT_EQ(text(inet.serialize()),
              R"({"help_url":{"inh":true,"v":"https://help.vlservice.example/"},)"
              R"("contact_url":{"inh":true,"v":"https://vlservice.example/contact"},)"
              R"("status_update_hours":{"inh":true,"v":2},"submitted_alarm_hours":{"inh":true,"v":4},)"
              R"("lodged_alarm_hours":{"inh":true,"v":168},"wizard_image":{"inh":true,"v":""}})");
    EXPECT_EQ(inet.value<InetFieldIdxs::StatusUpdateHours>(), Inet::DEF_STATUS_UPDATE_HOURS);
    EXPECT_TRUE(inet.isInherited<InetFieldIdxs::HelpUrl>());
}

TEST(InetPart, BelowTheRootHasZeroesAndEmptyTexts) {
    Inet const inet(json::Value(), false, false);
    EXPECT_EQ(inet.value<InetFieldIdxs::HelpUrl>(), "");
    EXPECT_EQ(inet.value<InetFieldIdxs::ContactUrl>(), "");
    EXPECT_EQ(inet.value<InetFieldIdxs::StatusUpdateHours>(), 0);
    EXPECT_EQ(inet.value<InetFieldIdxs::SubmittedAlarmHours>(), 0);
    EXPECT_EQ(inet.value<InetFieldIdxs::LodgedAlarmHours>(), 0);
    EXPECT_EQ(text(inet.serialize()), "#absent#");
}

TEST(InetPart, OfTheRootKeepsItsOwnValue) {
    Inet const inet(R"({"lodged_alarm_hours": 24})"_json, true, false);
    EXPECT_EQ(inet.value<InetFieldIdxs::LodgedAlarmHours>(), 24);
    EXPECT_FALSE(inet.isInherited<InetFieldIdxs::LodgedAlarmHours>());
    EXPECT_EQ(inet.value<InetFieldIdxs::SubmittedAlarmHours>(), 4);
    EXPECT_EQ(inet.value<InetFieldIdxs::StatusUpdateHours>(), 2);
    EXPECT_EQ(inet.value<InetFieldIdxs::HelpUrl>(), "https://help.vlservice.example/");
    EXPECT_EQ(inet.value<InetFieldIdxs::ContactUrl>(), "https://vlservice.example/contact");
}

TEST(InetPart, OfTheRootReplacesAWrappedValueByTheDefault) {
    Inet const inet(R"({"help_url": {"inh": true, "v": "https://old.example/"}})"_json, true, false);
    EXPECT_EQ(inet.value<InetFieldIdxs::HelpUrl>(), "https://help.vlservice.example/");
}

TEST(POPart, OfTheRootWritesBothKeysAsWrappers) {
    EXPECT_EQ(text(PO(json::Value(), true, false).serialize()),
              R"({"code":{"inh":true,"v":""},"expiry":{"inh":true,"v":0}})");
}

TEST(POPart, KeepsAnExpiryOfSixtyFourBits) {
    PO const po(R"({"code": "P-1", "expiry": 9223372036854775807})"_json, false, false);
    EXPECT_EQ(po.value<POFieldIdxs::Expiry>(), 9223372036854775807LL);
    EXPECT_EQ(po.value<POFieldIdxs::Code>(), "P-1");
    EXPECT_EQ(text(po.serialize()), R"({"code":"P-1","expiry":9223372036854775807})");
}

TEST(DepartmentValue, ShowsNameAndDescription) {
    EXPECT_EQ(Department("A", "B").valForUI(), "A = B");
    EXPECT_EQ(Department("A", "").valForUI(), "A");
    EXPECT_EQ(Department().valForUI(), "");
}

TEST(DepartmentValue, IsWrittenAsATextWithoutADescription) {
    EXPECT_EQ(text(Department("A", "B").serialize()), R"({"name":"A","descrip":"B"})");
    EXPECT_EQ(text(Department("A", "").serialize()), R"("A")");
}

TEST(DepartmentValue, IsReadFromBothForms) {
    EXPECT_EQ(Department(R"({"name": "A", "descrip": "B"})"_json), Department("A", "B"));
    EXPECT_EQ(Department(R"({"name": "A"})"_json), Department("A", ""));
    EXPECT_EQ(Department(R"({"name": "A", "descrip": 5})"_json), Department("A", ""));
    EXPECT_EQ(Department(R"("A")"_json), Department("A", ""));
    EXPECT_EQ(Department(json::Object{{"name", "A"}}), Department("A", ""));
}

TEST(DepartmentValue, WantsAName) {
    EXPECT_EQ(messageOf([] { Department{json::Value()}; }),
              "JSON error: Wrong type: empty. Expected type: string");
    EXPECT_EQ(messageOf([] { Department("[]"_json); }),
              "JSON error: Wrong type: array. Expected type: string");
    EXPECT_EQ(messageOf([] { Department("{}"_json); }),
              "JSON error: Wrong type: empty. Expected type: string");
    EXPECT_EQ(messageOf([] { Department(R"({"name": 1})"_json); }),
              "JSON error: Wrong type: integer. Expected type: string");
}

TEST(DepartmentValue, ComparesBothFieldsAndChangesItsName) {
    EXPECT_NE(Department("A", "B"), Department("A", "C"));
    EXPECT_NE(Department("A", "B"), Department("C", "B"));
    Department department("A", "B");
    department.changeName("C");
    EXPECT_EQ(department, Department("C", "B"));
    EXPECT_EQ(department.name(), "C");
    EXPECT_EQ(department.description(), "B");
}

TEST(DepartmentsPart, WithAnOwnEmptyArrayInheritsNothing) {
    Departments part(R"({"vals": []})"_json, false, false);
    EXPECT_FALSE(part.isInherited<DepFieldIdxs::Vals>());
    EXPECT_EQ(text(part.serialize()), R"({"vals":[]})");
    part.combineParent(Departments(R"({"vals": ["A"]})"_json, false, false));
    EXPECT_TRUE(part.empty());
    part.deserializeParent(R"({"vals": ["A"]})"_json, false);
    EXPECT_TRUE(part.empty());
}

TEST(DepartmentsPart, IsEmptyWithoutADepartmentOwnOrInherited) {
    EXPECT_TRUE(Departments(json::Value(), false, false).empty());
    EXPECT_TRUE(Departments(R"({"vals": []})"_json, false, false).empty());
    EXPECT_FALSE(Departments(R"({"vals": ["A"]})"_json, false, false).empty());
    Departments inherited(json::Value(), false, false);
    inherited.combineParent(Departments(R"({"vals": ["A"]})"_json, false, false));
    EXPECT_FALSE(inherited.empty());
}

TEST(DepartmentsPart, KeepsItsWholeListTogether) {
    Departments const part(R"({"vals": {"inh": true, "v": ["A", {"name": "B", "descrip": "C"}]}})"_json, true,
                           false);
    EXPECT_EQ(part.value<DepFieldIdxs::Vals>(), (std::vector{Department("A", ""), Department("B", "C")}));
    EXPECT_EQ(text(part.serialize()), R"({"vals":{"inh":true,"v":["A",{"name":"B","descrip":"C"}]}})");
}

TEST(DepartmentsPart, HasNoWrapperForAnElement) {
    EXPECT_EQ(messageOf([] { Departments(R"({"vals": [{"inh": true, "v": "A"}]})"_json, false, false); }),
              "JSON error: Wrong type: empty. Expected type: string");
}

TEST(DepartmentsPart, FailsAsAWholeOnADepartmentWithoutAName) {
    EXPECT_EQ(messageOf([] { Departments(R"({"vals": ["A", {"descrip": "B"}]})"_json, false, false); }),
              "JSON error: Wrong type: empty. Expected type: string");
}

TEST(ProfileValue, IsWrittenWithItsDescriptionOnlyWhenThereIsOne) {
    EXPECT_EQ(text(Profile("A", "B").serialize()), R"({"name":"A","descrip":"B"})");
    EXPECT_EQ(text(Profile("A", "").serialize()), R"({"name":"A"})");
    EXPECT_EQ(text(Profile().serialize()), R"({"name":""})");
}

TEST(ProfileValue, IsReadFromAnObject) {
    EXPECT_EQ(Profile(R"({"name": "A", "descrip": "B"})"_json.toObject()), Profile("A", "B"));
    EXPECT_EQ(Profile(R"({"name": "A", "descrip": false})"_json.toObject()), Profile("A", ""));
    EXPECT_EQ(messageOf([] { Profile{json::Object()}; }),
              "JSON error: Wrong type: empty. Expected type: string");
}

TEST(ProfileValue, ComparesBothFields) {
    EXPECT_NE(Profile("A", "B"), Profile("A", "C"));
    EXPECT_NE(Profile("A", "B"), Profile("C", "B"));
    EXPECT_EQ(Profile("A", "B").name(), "A");
    EXPECT_EQ(Profile("A", "B").descr(), "B");
}

TEST(ProfilesPart, WithInheritedProfilesIsNotEmptyAndWritesOnlyItsOwn) {
    Profiles part(R"({"vals": [{"name": "P"}]})"_json, false, false);
    part.combineParent(Profiles(R"({"vals": [{"name": "Q"}]})"_json, false, false));
    EXPECT_FALSE(part.empty());
    EXPECT_EQ(part.elements<ProfFieldIdxs::Vals>().size(), 2u);
    EXPECT_EQ(text(part.serialize()), R"({"vals":[{"name":"P"}]})");
}

TEST(ProfilesPart, IsEmptyWithoutAProfile) {
    Profiles const part(json::Value(), false, false);
    EXPECT_TRUE(part.empty());
    EXPECT_EQ(text(part.serialize()), "#absent#");
    EXPECT_EQ(text(Profiles(json::Value(), true, false).serialize()), R"({"vals":[]})");
}

TEST(ProfilesPart, WantsObjectsWithAName) {
    EXPECT_EQ(messageOf([] { Profiles(R"({"vals": ["P"]})"_json, false, false); }),
              "JSON error: Wrong type: string. Expected type: object");
    EXPECT_EQ(messageOf([] { Profiles(R"({"vals": [{"name": 5}]})"_json, false, false); }),
              "JSON error: Wrong type: integer. Expected type: string");
}

} // namespace

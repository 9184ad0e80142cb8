#include "programs/vlserviced/settings/service_settings.h"

#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/json_help.h"

#include <gtest/gtest.h>

namespace {

using VlServiced::ServiceSettings;
using VlServiced::Suspended;

ServiceSettings settings(std::string const& text) { return ServiceSettings(parse(text)); }

TEST(ServiceSettings, AreEmptyAtFirst) {
    ServiceSettings const empty = settings("{}");
    EXPECT_EQ(empty.uploadFolder(), "");
    EXPECT_FALSE(empty.isDisabled("a=acme"));
    EXPECT_FALSE(empty.isSuspended(Suspended::Jobs));
    EXPECT_EQ(failureOf([&] { empty.tariff(); }),
              "the service has no tariff yet: set one with \"vlmail settings service tariff=FILE\"");
}

TEST(ServiceSettings, ReplaceTheKeysOfAChangeAlone) {
    TemporaryFolder folder;
    json::Object const change{{"upload_folder", folder.path().string()},
                              {"tariff", parse(R"({"currency":"EUR"})")}};
    ServiceSettings const changed = settings(R"({"disabled":["a=old"]})").withChanges(change);
    EXPECT_EQ(changed.uploadFolder(), folder.path().string());
    EXPECT_EQ(changed.tariff().currency, "EUR");
    EXPECT_TRUE(changed.isDisabled("a=old"));
    ServiceSettings const erased = changed.withChanges(parse(R"({"tariff":null,"disabled":[]})"));
    EXPECT_FALSE(erased.stored().get("tariff"));
    EXPECT_FALSE(erased.isDisabled("a=old"));
    EXPECT_EQ(erased.uploadFolder(), folder.path().string());
}

TEST(ServiceSettings, RefuseChangesThatMeanNothing) {
    struct {
        char const* change;
        char const* message;
    } const cases[] = {
        {R"({"colour":"red"})",
         R"(the service has no setting "colour"; there are upload_folder, tariff, carriers, disabled, quota, retention_days)"},
        {R"({"suspended":1})",
         R"(the service has no setting "suspended"; there are upload_folder, tariff, carriers, disabled, quota, retention_days)"},
        {R"({"upload_folder":"relative"})",
         R"("upload_folder" has to be the absolute path of a folder that is there)"},
        {R"({"upload_folder":"/missing/folder"})",
         R"("upload_folder" has to be the absolute path of a folder that is there)"},
        {R"({"upload_folder":7})",
         R"("upload_folder" has to be the absolute path of a folder that is there)"},
        {R"({"tariff":7})", R"("tariff" has to be an object)"},
        {R"({"tariff":{}})", R"("currency" of the tariff has to be three capital letters)"},
        {R"({"carriers":[]})", R"("carriers" has to be an object with the names of channels)"},
        {R"({"carriers":{"postal":{}}})",
         R"(the carrier of postal: "type" of a carrier has to be one of folder, sftp, printer, command, smtp)"},
        {R"({"disabled":"a=acme"})", R"("disabled" has to be an array of node ids)"},
        {R"({"disabled":[7]})",
         R"("disabled" has to be an array of node ids, and the root cannot be disabled)"},
        {R"({"disabled":[""]})",
         R"("disabled" has to be an array of node ids, and the root cannot be disabled)"},
        {R"({"disabled":["acme"]})", "node id \"acme\" is not valid: wanted is a path like "
                                     "u=NAME/ou=GROUP/a=ACCOUNT, or the same without its front"},
        {R"({"quota":5})", R"("quota" has to be an object of node ids and numbers of MiB)"},
        {R"({"quota":{"a=acme":-1}})",
         R"(the "quota" of node "a=acme" has to be an integer from 0 to 1073741824)"},
        {R"({"quota":{"a=acme":"5"}})",
         R"(the "quota" of node "a=acme" has to be an integer from 0 to 1073741824)"},
        {R"({"quota":{"acme":5}})", "node id \"acme\" is not valid: wanted is a path like "
                                    "u=NAME/ou=GROUP/a=ACCOUNT, or the same without its front"},
        {R"({"retention_days":-1})", R"("retention_days" has to be an integer from 0 to 36500)"},
        {R"({"retention_days":true})", R"("retention_days" has to be an integer from 0 to 36500)"},
    };
    for (auto const& [change, message] : cases)
        EXPECT_EQ(failureOf([&change = change] { settings("{}").withChanges(parse(change)); }), message);
}

TEST(ServiceSettings, DisableANodeWithAllBelowIt) {
    ServiceSettings const some = settings(R"({"disabled":["ou=sales/a=acme","a=x/"]})");
    EXPECT_TRUE(some.isDisabled("ou=sales/a=acme"));
    EXPECT_TRUE(some.isDisabled("u=bob/ou=sales/a=acme"));
    EXPECT_FALSE(some.isDisabled("a=acme"));
    EXPECT_FALSE(some.isDisabled("u=bob/a=acme"));
    EXPECT_FALSE(some.isDisabled("ou=presales/a=acme"));
    EXPECT_FALSE(some.isDisabled(""));
}

TEST(ServiceSettings, GiveANodeTheQuotaOfTheNearestNodeThatHasOne) {
    ServiceSettings const some = settings(R"({"quota":{"a=acme":3,"u=bob/ou=sales/a=acme":0}})");
    EXPECT_EQ(some.quotaOf("a=acme"), 3 << 20);
    EXPECT_EQ(some.quotaOf("ou=sales/a=acme"), 3 << 20);
    EXPECT_EQ(some.quotaOf("u=bob/ou=sales/a=acme"), 0);
    EXPECT_EQ(some.quotaOf("a=other"), std::nullopt);
    EXPECT_EQ(settings(R"({"quota":{"":5}})").quotaOf("a=other"), 5 << 20);
}

TEST(ServiceSettings, KeepJobsFor90DaysUnlessTheySayOtherwise) {
    EXPECT_EQ(settings("{}").retentionDays(), 90);
    EXPECT_EQ(settings("{}").withChanges(parse(R"({"retention_days":0})")).retentionDays(), 0);
}

TEST(ServiceSettings, AreSuspendedByBits) {
    EXPECT_TRUE(settings("{}").withSuspended(1).isSuspended(Suspended::SettingsChanges));
    EXPECT_FALSE(settings("{}").withSuspended(1).isSuspended(Suspended::Jobs));
    EXPECT_TRUE(settings("{}").withSuspended(3).isSuspended(Suspended::Jobs));
    EXPECT_FALSE(settings("{}").withSuspended(3).withSuspended(0).isSuspended(Suspended::Jobs));
    for (int const bits : {4, -1, 7})
        EXPECT_EQ(failureOf([&] { settings("{}").withSuspended(bits); }),
                  "the service cannot be suspended by the number " + std::to_string(bits) +
                      ": 1 holds back changes of settings, 2 holds back jobs, 3 both, 0 nothing");
}

} // namespace

#include "programs/vlserviced/settings/settings_service.h"

#include "programs/vlserviced/settings/upload_folder.h"
#include "programs/vlserviced/store/schema.h"
#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/json_help.h"
#include "vlservice/cfg/cfg_node_id.h"
#include "vlservice/cfg/id.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <ctime>
#include <limits>

namespace {

namespace fs = std::filesystem;

using testing::ElementsAre;
using testing::IsEmpty;
using VlServiced::SettingsService;

class SettingsServiceTest : public testing::Test {
protected:
    std::vector<std::string> usable(std::string const& user) {
        std::vector<std::string> ids;
        for (auto const& [id, description, disabled] : service_.usableNodes(user))
            ids.push_back(id + (disabled ? " (disabled)" : ""));
        return ids;
    }
    void add(std::initializer_list<char const*> ids) {
        for (char const* id : ids)
            service_.update(id, false);
    }

    TemporaryFolder folder_;
    std::unique_ptr<Database::Connection> database_ = VlServiced::openServiceDatabase(folder_ / "service.db");
    VlServiced::SettingsStore store_{*database_};
    SettingsService service_{store_};
};

TEST_F(SettingsServiceTest, ShowsTheTreeFromTheRoot) {
    EXPECT_EQ(print(service_.tree().serialize()), R"({"id":"","descr":"","parts":[],"children":[]})");
    service_.setPart("a=acme", "app", parse(R"({"descr":"Acme Ltd"})"));
    add({"u=bob/a=acme", "u=eve/"});
    service_.changeService(parse(R"({"disabled":["u=bob/a=acme"]})"));
    EXPECT_EQ(print(service_.tree().serialize()),
              R"({"id":"","descr":"","parts":[],"children":[)"
              R"({"id":"a=acme","descr":"Acme Ltd","parts":["app"],"children":[)"
              R"({"id":"u=bob/a=acme","descr":"","disabled":true,"parts":[],"children":[]}]},)"
              R"({"id":"u=eve/","descr":"","parts":[],"children":[]}]})");
}

TEST_F(SettingsServiceTest, AUserMayUseHisNodesAndThoseAboveThem) {
    add({"u=bob/ou=sales/a=acme", "u=bobby/ou=sales/a=acme", "ou=board/a=acme", "u=bob/a=other", "u=bob/"});
    EXPECT_THAT(usable("bob"), ElementsAre("a=acme", "a=other", "ou=sales/a=acme", "u=bob/", "u=bob/a=other",
                                           "u=bob/ou=sales/a=acme"));
    EXPECT_THAT(usable("bobby"), ElementsAre("a=acme", "ou=sales/a=acme", "u=bobby/ou=sales/a=acme"));
    EXPECT_THAT(usable("nobody"), IsEmpty());
    EXPECT_THAT(usable("bob/ou=sales"), IsEmpty());
}

TEST_F(SettingsServiceTest, WithoutAUserAllNodesButThoseOfUsersMayBeUsed) {
    add({"u=bob/ou=sales/a=acme"});
    service_.changeService(parse(R"({"disabled":["ou=sales/a=acme"]})"));
    EXPECT_THAT(usable(""), ElementsAre("a=acme", "ou=sales/a=acme (disabled)"));
}

TEST_F(SettingsServiceTest, TheEffectiveSettingsHaveChainValuesAndOrigins) {
    service_.setPart("", "po", parse(R"({"code":"R"})"));
    service_.setPart("u=bob/a=acme", "po", parse(R"({"expiry":5})"));
    EXPECT_EQ(print(service_.effective({"u=bob/a=acme", {"po"}}).serialize()),
              R"({"id":"u=bob/a=acme","known":true,"chain":["u=bob/a=acme","a=acme",""],"parts":{"po":{)"
              R"("own":{"expiry":5},"values":{"code":"R","expiry":5},)"
              R"("origins":{"code":"","expiry":"u=bob/a=acme"}}}})");
    json::Object const unknown = service_.effective({"u=eve/a=acme", {"po"}}).serialize();
    EXPECT_FALSE(unknown.get("known").isTrue());
    EXPECT_EQ(print(unknown.get("parts").toObject().get("po").toObject().get("values")),
              R"({"code":"R","expiry":0})");
    EXPECT_EQ(service_.effective({"", {}}).parts.size(), 6u);
}

TEST_F(SettingsServiceTest, TellsWhatWouldCountWithoutTheNodesOwnValues) {
    service_.setPart("", "po", parse(R"({"code":"R"})"));
    service_.setPart("a=acme", "profiles", parse(R"({"vals":[{"name":"Letters"}]})"));
    service_.setPart("u=bob/a=acme", "po", parse(R"({"code":"B","expiry":5})"));
    service_.setPart("u=bob/a=acme", "profiles", parse(R"({"vals":[{"name":"Faxes"}]})"));
    Protocol::SettingsQuery query("u=bob/a=acme", {"po", "profiles"});
    query.inherited = true;
    EXPECT_EQ(print(service_.effective(query).parts),
              R"({"po":{"own":{"code":"B","expiry":5},"values":{"code":"R","expiry":0},)"
              R"("origins":{"code":"","expiry":null}},"profiles":{"own":{"vals":[{"name":"Faxes"}]},)"
              R"("values":{"vals":[{"name":"Letters"}]},"origins":{"vals":["a=acme"]}}})");
    query.id = "";
    query.parts = {"po"};
    EXPECT_EQ(print(service_.effective(query).parts),
              R"({"po":{"own":{"code":"R"},"values":{"code":"","expiry":0},)"
              R"("origins":{"code":null,"expiry":null}}})");
}

TEST_F(SettingsServiceTest, ReplacesAllOwnValuesOfANodeThatStillAreWhatWasRead) {
    service_.setPart("a=acme", "po", parse(R"({"code":"A"})"));
    service_.setPart("a=acme", "app", parse(R"({"descr":"Acme"})"));
    auto const replaced = service_.replace({"a=acme", parse(R"({"po":{"code":"A"},"app":{"descr":"Acme"}})"),
                                            parse(R"({"po":{"expiry":5},"profiles":{"vals":[]}})")});
    EXPECT_EQ(print(replaced.own), R"({"po":{"expiry":5}})");
    EXPECT_EQ(print(store_.parts("a=acme")), R"({"po":{"expiry":5}})");
    service_.replace({"u=new/", parse("{}"), parse(R"({"po":{"code":"N"}})")});
    EXPECT_EQ(print(store_.parts("u=new/")), R"({"po":{"code":"N"}})");
}

TEST_F(SettingsServiceTest, ReplacesNothingThatSomebodyElseHasChanged) {
    service_.setPart("a=acme", "po", parse(R"({"code":"theirs"})"));
    for (char const* const was : {"{}", R"({"po":{}})", R"({"po":{"code":"A"}})", R"({"po":7})"})
        EXPECT_EQ(failureOf([&] {
                      service_.replace({"a=acme", parse(was), parse(R"({"po":{"code":"mine"}})")});
                  }),
                  "the settings \"po\" of node a=acme were changed by somebody else since they were read; "
                  "look at both and save what is to stay")
            << was;
    EXPECT_EQ(
        failureOf([&] {
            service_.replace({"", parse(R"({"app":{"descr":"x"}})"), parse(R"({"po":{"code":"mine"}})")});
        }),
        "the settings \"app\" of the root were changed by somebody else since they were read; look at "
        "both and save what is to stay");
    EXPECT_EQ(print(store_.parts("a=acme")), R"({"po":{"code":"theirs"}})");
    EXPECT_EQ(print(store_.parts("")), "{}");
}

TEST_F(SettingsServiceTest, ReplacesAllOrNothing) {
    auto const fails = [&](char const* own) {
        return failureOf([&] { service_.replace({"a=acme", parse("{}"), parse(own)}); });
    };
    EXPECT_EQ(
        fails(R"({"po":{"code":"A"},"app":{"descr":7}})"),
        "the settings \"app\" were not changed: JSON error: Wrong type: integer. Expected type: string");
    EXPECT_EQ(fails(R"({"po":{"code":"A"},"apps":{}})"),
              "there are no settings \"apps\"; there are app, inet, po, deps, profiles, presets");
    EXPECT_EQ(
        fails(R"({"po":{"code":"A"},"app":7})"),
        "the settings \"app\" were not changed: JSON error: Wrong type: integer. Expected type: object");
    EXPECT_FALSE(store_.contains("a=acme"));
}

TEST_F(SettingsServiceTest, APartThatIsSetToNothingIsInheritedAgain) {
    service_.setPart("a=acme", "po", parse(R"({"code":"A"})"));
    service_.setPart("a=acme", "po", json::Value());
    EXPECT_EQ(print(store_.parts("a=acme")), "{}");
    service_.setPart("a=acme", "po", parse(R"({"code":"A"})"));
    service_.setPart("a=acme", "po", parse(R"({"code":{"inh":true,"v":"A"}})"));
    EXPECT_EQ(print(store_.parts("a=acme")), "{}");
}

TEST_F(SettingsServiceTest, AnUpdateAddsTheNodeAndAResetErasesItsValues) {
    service_.setPart("a=acme", "po", parse(R"({"code":"A"})"));
    service_.update("a=acme", false);
    EXPECT_EQ(print(store_.parts("a=acme")), R"({"po":{"code":"A"}})");
    service_.update("a=acme", true);
    EXPECT_EQ(print(store_.parts("a=acme")), "{}");
    EXPECT_TRUE(store_.contains("a=acme"));
    service_.update("a=new", true);
    EXPECT_TRUE(store_.contains("a=new"));
}

TEST_F(SettingsServiceTest, AnUpdateTellsOfSettingsThatCannotBeRead) {
    store_.setPart("a=acme", "po", parse(R"({"code":7})"));
    EXPECT_EQ(failureOf([&] { service_.update("u=bob/a=acme", false); }),
              R"(the settings "po" of node a=acme cannot be read: )"
              "JSON error: Wrong type: integer. Expected type: string");
}

TEST_F(SettingsServiceTest, TheRootIsNeitherResetNorRemoved) {
    service_.setPart("", "po", parse(R"({"code":"R"})"));
    EXPECT_EQ(failureOf([&] { service_.update("", true); }),
              "the root cannot be reset as a whole: set its parts to nothing one by one");
    EXPECT_EQ(failureOf([&] { service_.remove(""); }), "the root cannot be removed");
    EXPECT_EQ(print(store_.parts("")), R"({"po":{"code":"R"}})");
}

TEST_F(SettingsServiceTest, IdsThatAreNotWellFormedReachNothing) {
    std::string const slashes(50000, '/');
    for (std::string const& id : {std::string("acme"), slashes}) {
        EXPECT_TRUE(failureOf([&] { service_.setPart(id, "po", {}); }).starts_with("node id \""));
        EXPECT_TRUE(failureOf([&] { service_.update(id, false); }).starts_with("node id \""));
        EXPECT_TRUE(failureOf([&] { service_.remove(id); }).starts_with("node id \""));
        EXPECT_TRUE(failureOf([&] { service_.effective({id, {}}); }).starts_with("node id \""));
    }
    EXPECT_EQ(store_.nodes().size(), 1u);
}

TEST_F(SettingsServiceTest, NothingIsChangedWhileChangesAreHeldBack) {
    add({"a=acme"});
    service_.suspend(1);
    std::string const held = "changes of settings are held back at the moment";
    EXPECT_EQ(failureOf([&] { service_.setPart("a=acme", "po", {}); }), held);
    EXPECT_EQ(failureOf([&] { service_.update("a=acme", true); }), held);
    EXPECT_EQ(failureOf([&] { service_.remove("a=acme"); }), held);
    EXPECT_EQ(failureOf([&] { service_.replace({"a=acme", {}, {}}); }), held);
    EXPECT_EQ(failureOf([&] { service_.changeService({}); }), held);
    EXPECT_EQ(failureOf([&] { service_.effective({"a=acme", {}}); }), "nothing was thrown");
    service_.suspend(0);
    EXPECT_EQ(failureOf([&] { service_.remove("a=acme"); }), "nothing was thrown");
}

/// As the rule on tokens says it, pair by pair.
TEST_F(SettingsServiceTest, ListsTheUsableNodesAsTheRuleOnTokensSays) {
    std::vector<std::string> const ids{"u=bob/ou=north/ou=sales/a=acme",
                                       "u=bob/ou=sales/a=acme",
                                       "u=bob/a=acme",
                                       "u=bob/ou=sales/",
                                       "u=bobby/ou=sales/a=acme",
                                       "ou=presales/a=acme",
                                       "u=eve/ou=north/ou=sales/a=acme",
                                       "u=bob/ou=sales/a=other"};
    for (std::string const& id : ids)
        service_.update(id, false);
    std::vector<std::string> expected;
    for (VlServiced::SettingsNode const& node : store_.nodes()) {
        Cfg::CfgNodeId const asked{Cfg::Id(node.id, false)};
        for (VlServiced::SettingsNode const& other : store_.nodes()) {
            Cfg::CfgNodeId const own{Cfg::Id(other.id, false)};
            if (!node.id.empty() && other.id.starts_with("u=bob/") &&
                (asked == own || asked.isParentOf(own))) {
                expected.push_back(node.id);
                break;
            }
        }
    }
    std::vector<std::string> found;
    for (auto const& node : service_.usableNodes("bob"))
        found.push_back(node.id);
    EXPECT_EQ(found, expected);
    EXPECT_EQ(found.size(), 11u);
}

/// Of this thread, in seconds: the best of some.
template<typename Work>
double processorTimeOf(Work const& work) {
    auto const now = [] {
        timespec time{};
        ::clock_gettime(CLOCK_THREAD_CPUTIME_ID, &time);
        return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) / 1e9;
    };
    double best = std::numeric_limits<double>::max();
    for (int i = 0; i < 5; ++i) {
        double const begin = now();
        work();
        best = std::min(best, now() - begin);
    }
    return best;
}

TEST_F(SettingsServiceTest, FindsTheNodesOfAUserAmongThousandsWithoutHoldingEachAgainstEach) {
    constexpr int FEW = 375;
    constexpr int MANY = 3000;
    Database::Transaction transaction(*database_);
    int count = 0;
    auto const addUpTo = [&](int nodes) {
        for (; count < nodes; ++count)
            store_.add("u=bob/ou=" + std::to_string(count) + "/a=acme");
    };
    addUpTo(FEW);
    double const few = processorTimeOf([&] { service_.usableNodes("bob"); });
    addUpTo(MANY);
    EXPECT_GE(usable("bob").size(), static_cast<std::size_t>(MANY));
    EXPECT_THAT(usable("eve"), IsEmpty());
    double const many = processorTimeOf([&] { service_.usableNodes("bob"); });
    // Eight times as many take some eight times as long; each held against each would take 64 times.
    EXPECT_LT(many, 32 * few);
    transaction.commit();
}

TEST_F(SettingsServiceTest, PutsTheIdentityOfTheUploadFolderOnRecord) {
    TemporaryFolder upload;
    service_.changeService({{"upload_folder", upload.path().string()}});
    std::string const identity = service_.service().uploadFolderIdentity();
    EXPECT_EQ(identity, VlServiced::UploadFolder(upload.path(), {}).identity().text());
    EXPECT_FALSE(service_.service().told().get("upload_folder_identity"));
    service_.changeService(parse(R"({"disabled":[]})"));
    EXPECT_EQ(service_.service().uploadFolderIdentity(), identity);
    service_.changeService(parse(R"({"upload_folder":null})"));
    EXPECT_EQ(service_.service().uploadFolderIdentity(), "");
}

TEST_F(SettingsServiceTest, RecognisesAnUploadFolderThatWasSetWithoutAnIdentity) {
    TemporaryFolder upload;
    store_.setServiceSettings({{"upload_folder", upload.path().string()}});
    service_.recogniseUploadFolder();
    std::string const identity = service_.service().uploadFolderIdentity();
    EXPECT_NE(identity, "");
    fs::remove(upload / ".vlserviced");
    service_.recogniseUploadFolder();
    EXPECT_EQ(service_.service().uploadFolderIdentity(), identity) << "what is on record stays";
}

TEST_F(SettingsServiceTest, PutsTheIdentitiesOfCarriersFoldersOnRecord) {
    TemporaryFolder const folder;
    fs::path const shop = folder / "shop";
    auto const identity = [&] { return service_.service().carriers().at("postal").folderIdentity; };
    auto const set = [&](int perMinute) {
        json::Object const postal{{"type", "folder"}, {"folder", shop.string()}, {"per_minute", perMinute}};
        service_.changeService({{"carriers", json::Object{{"postal", postal}}}});
    };
    set(1);
    EXPECT_EQ(identity(), "") << "there is no such folder yet";
    fs::create_directory(shop);
    set(1);
    std::string const known = identity();
    EXPECT_EQ(known, VlServiced::UploadFolder(shop, {}).identity().text());
    EXPECT_FALSE(service_.service().told().get("carrier_folder_identities"));
    fs::rename(shop, folder / "unmounted");
    fs::create_directory(shop);
    set(2);
    service_.recogniseCarrierFolders();
    EXPECT_EQ(identity(), known) << "what is on record stays";
    EXPECT_TRUE(fs::is_empty(shop));
    service_.changeService(parse(R"({"carriers":null})"));
    set(1);
    EXPECT_NE(identity(), known) << "it was taken out and set again";
}

TEST_F(SettingsServiceTest, RecognisesCarriersFoldersThatWereSetWithoutAnIdentity) {
    TemporaryFolder const shop;
    json::Object const postal{{"type", "folder"}, {"folder", shop.path().string()}};
    json::Object const gone{{"type", "folder"}, {"folder", (shop / "gone").string()}};
    store_.setServiceSettings({{"carriers", json::Object{{"postal", postal}, {"fax", gone}}}});
    service_.recogniseCarrierFolders();
    EXPECT_NE(service_.service().carriers().at("postal").folderIdentity, "");
    EXPECT_EQ(service_.service().carriers().at("fax").folderIdentity, "");
}

/// A settings service whose clock the test sets.
class PresetRules : public testing::Test {
protected:
    std::string set(std::string const& id, std::string const& presets) {
        return failureOf([&] { settings_.setPart(id, "presets", parse(presets)); });
    }
    std::string presetsOf(std::string const& id) { return print(store_.parts(id).get("presets")); }

    static constexpr long long DAY = 86'400;

    TemporaryFolder folder_;
    std::unique_ptr<Database::Connection> database_ = VlServiced::openServiceDatabase(folder_ / "service.db");
    VlServiced::SettingsStore store_{*database_};
    long long now_ = 20'000 * DAY;
    VlServiced::SettingsService settings_{store_, [this] {
                                              return Policy::Moment{now_, [](long long) { return 0LL; }};
                                          }};
};

TEST_F(PresetRules, NodesBelowCannotReplaceALockedPackPreset) {
    EXPECT_EQ(set("a=acme", R"({"pack_presets":[{"name":"Bills","lock_pack_ui":true},{"name":"Open"}]})"),
              "nothing was thrown");
    EXPECT_EQ(
        set("u=bob/ou=sales/a=acme", R"({"pack_presets":[{"name":"Open"},{"name":"Bills","duplex":true}]})"),
        "the settings \"presets\" were not changed: the pack preset \"Bills\" is locked by a=acme "
        "(\"lock_pack_ui\"): nodes below cannot replace it");
    EXPECT_EQ(presetsOf("u=bob/ou=sales/a=acme"), "#absent#");
    EXPECT_EQ(set("u=bob/a=acme", R"({"pack_presets":[{"name":"Open"},{"name":"bills"}]})"),
              "nothing was thrown");
    EXPECT_EQ(set("a=other", R"({"pack_presets":[{"name":"Bills"}]})"), "nothing was thrown");
    EXPECT_EQ(set("a=acme", R"({"pack_presets":[{"name":"Bills","lock_pack_ui":true,"duplex":true}]})"),
              "nothing was thrown");
    set("", R"({"pack_presets":[{"name":"Root's","lock_pack_ui":true}]})");
    EXPECT_EQ(set("a=acme", R"({"pack_presets":[{"name":"Root's"}]})"),
              "the settings \"presets\" were not changed: the pack preset \"Root's\" is locked by the root "
              "(\"lock_pack_ui\"): nodes below cannot replace it");
}

TEST_F(PresetRules, DelaysThatNeverEndAreRefusedWhenTheyAreSet) {
    EXPECT_EQ(
        set("a=acme", R"({"pack_presets":[{"name":"Bills","delay":{"week_days":[1,9]}}]})"),
        "the settings \"presets\" were not changed: the pack preset \"Bills\" has a delay that never ends: "
        "delay-impossible: 9 in \"week_days\", 0 to 6 possible");
    EXPECT_EQ(
        set("a=acme", R"({"pack_presets":[{"name":"Bills","delay":{"count":500}}]})"),
        "the settings \"presets\" were not changed: the pack preset \"Bills\" has a delay that never ends: "
        "delay-impossible: slot 500 is not reached within 400 days");
    EXPECT_EQ(set("a=acme", R"({"pack_presets":[{"name":"Bills","delay":{"week_days":[1],"mins":[480]}}]})"),
              "nothing was thrown");
}

TEST_F(PresetRules, ThoseThatExpireAreKeptAsLongAsTheyAreUsed) {
    set("", R"({"pack_presets":[{"name":"#auto_b.pdf"}]})");
    set("a=acme", R"({"extract_presets":[{"match":"a\\.pdf","pack_preset":"#auto_a.pdf"}],)"
                  R"("pack_presets":[{"name":"#auto_a.pdf"},{"name":"Bills"}]})");
    settings_.removeUnusedPresets();
    now_ += 80 * DAY;
    settings_.notePresetUse("u=bob/a=acme", "#auto_b.pdf");
    settings_.notePresetUse("u=bob/a=acme", "Bills");
    now_ += 11 * DAY;
    settings_.removeUnusedPresets();
    EXPECT_EQ(presetsOf(""), R"({"pack_presets":[{"name":"#auto_b.pdf","last_used":1734912000}]})");
    EXPECT_EQ(presetsOf("a=acme"), R"({"extract_presets":[],"pack_presets":[{"name":"Bills"}]})");
    settings_.suspend(1);
    now_ += 200 * DAY;
    settings_.removeUnusedPresets();
    settings_.notePresetUse("a=acme", "#auto_b.pdf");
    EXPECT_EQ(presetsOf(""), R"({"pack_presets":[{"name":"#auto_b.pdf","last_used":1734912000}]})");
}

TEST_F(PresetRules, TheRulesOfANodeNameWhereTheyComeFromAndFollowChanges) {
    EXPECT_EQ(settings_.rules("u=bob/a=acme").maxLetterSheets.source, "the built-in settings");
    settings_.setPart("a=acme", "app", parse(R"({"max_letter_sheets":5})"));
    EXPECT_EQ(settings_.rules("u=bob/a=acme").maxLetterSheets.value, 5);
    EXPECT_EQ(settings_.rules("u=bob/a=acme").maxLetterSheets.source, "a=acme");
    settings_.setPart("u=bob/a=acme", "app", parse(R"({"max_letter_sheets":7})"));
    EXPECT_EQ(settings_.rules("u=bob/a=acme").maxLetterSheets.source, "u=bob/a=acme");
    settings_.update("u=bob/a=acme", true);
    EXPECT_EQ(settings_.rules("u=bob/a=acme").maxLetterSheets.source, "a=acme");
    set("a=acme", R"({"pack_presets":[{"name":"Bills"}]})");
    EXPECT_EQ(settings_.sourceOfPackPreset("u=bob/a=acme", "Bills"), "a=acme");
}

} // namespace

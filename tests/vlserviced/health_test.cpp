#include "programs/vlserviced/health.h"

#include "programs/vlserviced/settings/upload_folder.h"
#include "tests/support/temporary_folder.h"
#include "tests/support/time_zone.h"

#include <gmock/gmock.h>

#include <stdexcept>

namespace {

namespace fs = std::filesystem;
using Protocol::CarrierReport;
using Protocol::HealthCheck;

constexpr long long NOW = 1'795'000'000;
constexpr long long DAY_SECONDS = 86'400;

class HealthTest : public testing::Test {
protected:
    /// "STATE: SAYS" or "STATE: SAYS | REMEDY", of the check of that name.
    std::string told(std::string const& name) const {
        for (HealthCheck const& check : VlServiced::healthOf(sources_).checks)
            if (check.name == name)
                return std::string(Protocol::healthStateName(check.state)) + ": " + check.says +
                       (check.remedy.empty() ? "" : " | " + check.remedy);
        return "none";
    }
    void addCarrier(char const* state, std::string says, long long uncertain = 0) {
        CarrierReport report;
        report.channel = "fax";
        report.type = "command";
        report.state = state;
        report.says = std::move(says);
        report.waiting = 3;
        report.uncertain = uncertain;
        carriers_.carriers.push_back(std::move(report));
    }

    VLServiceTest::TimeZone const utc_{"UTC"};
    TemporaryFolder const folder_;
    json::Object settings_;
    Protocol::CarriersAnswer carriers_;
    VlServiced::HealthSources sources_{[] {},
                                       (folder_ / "service.db").string(),
                                       folder_.path(),
                                       folder_.path(),
                                       [this] { return VlServiced::ServiceSettings(settings_); },
                                       [this] { return carriers_; },
                                       {},
                                       true,
                                       [] { return NOW; }};
};

TEST_F(HealthTest, TellsTheTimeAndThatAllIsWell) {
    settings_ = {{"upload_folder", folder_.path().string()}};
    Protocol::HealthAnswer const answer(VlServiced::healthOf(sources_).serialize());
    EXPECT_EQ(answer.now, NOW);
    EXPECT_EQ(answer.checks.size(), 8u);
    for (HealthCheck const& check : answer.checks)
        EXPECT_EQ(check.state, Protocol::HealthState::Well) << check.name << ": " << check.says;
}

TEST_F(HealthTest, TellsWhyTheDatabaseTakesNoChanges) {
    EXPECT_EQ(told("database"), "well: " + (folder_ / "service.db").string() + " takes changes");
    sources_.tryDatabase = [] { throw std::runtime_error("disk I/O error"); };
    EXPECT_EQ(
        told("database"),
        "bad: disk I/O error | see that it has room, rights and a server; the service goes on by itself");
}

TEST_F(HealthTest, TellsHowMuchRoomIsLeftAndThatAFolderIsGone) {
    EXPECT_THAT(told("data disk"),
                testing::MatchesRegex(".*: [0-9]+ MiB left in " + folder_.path().string() + ".*"));
    sources_.outbox = folder_ / "gone";
    EXPECT_THAT(told("outbox disk"), testing::StartsWith("bad: "));
    EXPECT_THAT(told("outbox disk"), testing::HasSubstr("No such file or directory [" +
                                                        (folder_ / "gone").string() + "] | make the folder"));
}

TEST_F(HealthTest, DoubtsThatMailingsAreToStayInTheOutbox) {
    EXPECT_EQ(told("upload folder"),
              "doubtful: none is set and there are no carriers: mailings stay in " + folder_.path().string() +
                  " | \"vlmail settings service upload_folder=PATH\" sets one, \"carriers=FILE\" carriers");
    settings_ = {
        {"carriers", json::Object{{"fax", json::Object{{"type", "command"}, {"program", "/bin/true"}}}}}};
    EXPECT_EQ(told("upload folder"), "well: none is set; letters go by carriers");
}

TEST_F(HealthTest, TellsThatAnotherFolderIsUnderTheNameOfTheUploadFolder) {
    fs::create_directory(folder_ / "share");
    settings_ = {{"upload_folder", (folder_ / "share").string()}};
    std::string const identity = VlServiced::UploadFolder(folder_ / "share", "").identity().text();
    settings_ = VlServiced::ServiceSettings(settings_).withFolderIdentity(identity).stored();
    EXPECT_THAT(told("upload folder"), testing::StartsWith("well: "));
    fs::rename(folder_ / "share", folder_ / "kept");
    fs::create_directory(folder_ / "share");
    EXPECT_THAT(told("upload folder"), testing::StartsWith("bad: "));
    EXPECT_THAT(told("upload folder"), testing::HasSubstr("mount the share again"));
}

TEST_F(HealthTest, TellsWhatIsHeldBack) {
    EXPECT_EQ(told("suspended"), "well: nothing is held back");
    settings_ = {{"suspended", 1}};
    EXPECT_EQ(told("suspended"), "doubtful: settings can be read and not changed | \"vlmail settings suspend "
                                 "nothing\" lets all go on");
    settings_ = {{"suspended", 3}};
    EXPECT_THAT(told("suspended"), testing::StartsWith("doubtful: mailings are accepted and wait"));
}

TEST_F(HealthTest, TellsInTimeThatTheCertificateEnds) {
    EXPECT_EQ(told("certificate"), "well: none is needed: the service listens on this machine alone");
    sources_.certificateEnds = NOW + 31 * DAY_SECONDS;
    EXPECT_EQ(told("certificate"), "well: holds until 2026/12/19 11:06:40");
    sources_.certificateEnds = NOW + DAY_SECONDS;
    EXPECT_THAT(told("certificate"),
                testing::StartsWith("doubtful: ends on 2026/11/19 11:06:40 | put a new one"));
    sources_.certificateEnds = NOW;
    EXPECT_THAT(told("certificate"),
                testing::StartsWith("bad: has ended on 2026/11/18 11:06:40 | put a new one"));
}

TEST_F(HealthTest, TellsHowEachCarrierIsDoing) {
    addCarrier("working", "");
    EXPECT_EQ(told("carrier fax"), "well: command, 3 waiting");
    carriers_ = {};
    addCarrier("failing", "no answer");
    EXPECT_EQ(told("carrier fax"),
              "bad: 3 waiting: no answer | \"vlmail carriers test fax\" tries it without sending");
    carriers_ = {};
    addCarrier("paused", "");
    EXPECT_EQ(told("carrier fax"),
              "doubtful: is paused, 3 waiting | \"vlmail carriers resume fax\" lets it go on");
    carriers_ = {};
    addCarrier("working", "", 2);
    EXPECT_EQ(told("carrier fax"), "doubtful: 2 letters may have been taken or not | find out at the other "
                                   "side, then \"vlmail settle\" or \"vlmail resend\" each");
}

TEST_F(HealthTest, TellsWhetherDiscoveryIsAnswered) {
    EXPECT_EQ(told("discovery"), "well: the service answers clients that look for it");
    sources_.answersDiscovery = false;
    EXPECT_EQ(told("discovery"), "well: is switched off: clients name the service with --service");
}

TEST(HealthChecks, AreDoubtfulInAStateThatIsNotKnown) {
    HealthCheck const check(json::Object{{"name", "x"}, {"state", "feverish"}, {"says", "y"}});
    EXPECT_EQ(check.state, Protocol::HealthState::Doubtful);
}

TEST_F(HealthTest, TellsOfTheLettersThatWereSent) {
    EXPECT_EQ(told("sent letters"), "well: none are known");
    VlServiced::RegisterState state{true, NOW - DAY_SECONDS + 1};
    sources_.letterRegister = [&] { return state; };
    EXPECT_EQ(told("sent letters"), "well: are known again, the next until 2026/11/17 11:06:41");
    state.nextEnd = NOW - DAY_SECONDS;
    EXPECT_EQ(told("sent letters"),
              "doubtful: some should have been forgotten by 2026/11/17 11:06:40 | the log says "
              "why they cannot be removed; the service looks each hour");
    state.hasItsSecret = false;
    EXPECT_EQ(told("sent letters"),
              "bad: the database has another secret: letters that were sent are not known again | start the "
              "service again, as the database was changed under it");
    sources_.letterRegister = []() -> VlServiced::RegisterState { throw std::runtime_error("gone"); };
    EXPECT_EQ(told("sent letters"),
              "bad: gone | see that the database answers; until then no mailing is accepted");
}

} // namespace

#include "programs/vlserviced/jobs/backup.h"

#include "programs/base/read_file.h"
#include "programs/database/sqlite_connection.h"
#include "programs/vlserviced/settings/service_settings.h"
#include "programs/vlserviced/settings/upload_folder.h"
#include "programs/vlserviced/store/backup_file.h"
#include "programs/vlserviced/store/data_folder.h"
#include "programs/vlserviced/store/letter_store.h"
#include "programs/vlserviced/store/pack_store.h"
#include "programs/vlserviced/store/schema.h"
#include "programs/vlserviced/store/settings_store.h"
#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"
#include "tests/support/time_zone.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <optional>
#include <set>

namespace {

namespace fs = std::filesystem;

using testing::ElementsAre;
using testing::HasSubstr;
using VlServiced::Job;
using VlServiced::JobState;
using VlServiced::LetterState;
using VlServiced::RestoredRecord;
using VlServiced::Since;

constexpr long long AT_BACKUP = 1'795'000'000;
constexpr char const* BACKUP_TIME = "2026/11/18 11:06:40";

/// A record with mailings in each state, its backup, and what a restored folder has of it.
class BackupTest : public testing::Test {
protected:
    BackupTest() {
        fs::create_directory(upload_);
        fs::create_directories(data_ / "outbox");
        fs::permissions(data_, fs::perms::owner_all);
        std::ofstream(data_ / "token") << "secret";
        database_ = VlServiced::openServiceDatabase(data_ / "service.db");
        packs_ = VlServiced::openSqlitePackStore(data_ / "packs.db");
        jobs_.emplace(*database_);
        VlServiced::UploadFolder const known(upload_, "");
        VlServiced::SettingsStore(*database_)
            .setServiceSettings(VlServiced::ServiceSettings(json::Object{})
                                    .withChanges({{"upload_folder", upload_.string()}})
                                    .withFolderIdentity(known.identity().text())
                                    .stored());
    }

    void add(std::string const& packId, JobState state, bool isWithService = true, bool isTrial = false) {
        Job job;
        job.pack = {isWithService ? Protocol::OVER_CONNECTION : "/srv", "packs.db", packId};
        job.toUpload = true;
        job.isTrial = isTrial;
        jobs_->accept(job);
        if (state != JobState::Accepted)
            jobs_->advance(packId, JobState::Accepted, state, 1);
    }
    void backUp() const { VlServiced::backUp({data_, data_ / "outbox"}, file_, AT_BACKUP); }
    RestoredRecord restore(Since since = Since::Unknown) const {
        return VlServiced::restoreBackup(file_, restored_, restored_ / "outbox", since, AT_BACKUP + 1000);
    }
    /// "held: PROBLEM", of a restored job.
    std::string state(std::string const& packId) {
        Job const job = restoredJob(packId);
        return std::string(Protocol::stateName(job.state)) + (job.problem.empty() ? "" : ": ") + job.problem;
    }
    Job restoredJob(std::string const& packId) {
        if (!opened_)
            opened_ = VlServiced::openServiceDatabase(restored_ / "service.db");
        return VlServiced::JobStore(*opened_).find(packId).value();
    }
    static std::string doubt(std::string const& packId) {
        return std::string("held: since the backup of ") + BACKUP_TIME +
               " it may have been handed over: find out, then \"vlmail release " + packId +
               "\" or \"vlmail cancel " + packId + '"';
    }

    VLServiceTest::TimeZone const utc_{"UTC"};
    TemporaryFolder folder_;
    fs::path data_ = folder_ / "data";
    fs::path restored_ = folder_ / "restored";
    fs::path upload_ = folder_ / "upload";
    fs::path file_ = folder_ / "backup";
    std::unique_ptr<Database::Connection> database_;
    std::shared_ptr<VlServiced::PackStore> packs_;
    std::optional<VlServiced::JobStore> jobs_;
    std::unique_ptr<Database::Connection> opened_;
};

TEST_F(BackupTest, HoldsWhatMayHaveBeenHandedOverSince) {
    add("accepted", JobState::Accepted);
    add("held", JobState::Held);
    add("queued", JobState::Queued);
    add("delivered", JobState::Delivered);
    add("failed", JobState::Failed);
    add("trial", JobState::Accepted, true, true);
    backUp();
    RestoredRecord const record = restore();
    EXPECT_EQ(record.madeAt, AT_BACKUP);
    EXPECT_EQ(record.doubtfulJobs, 3);
    EXPECT_EQ(record.foundJobs, 0);
    for (char const* const packId : {"accepted", "held", "queued"})
        EXPECT_EQ(state(packId), doubt(packId));
    EXPECT_TRUE(restoredJob("queued").toHold);
    EXPECT_EQ(state("delivered"), "delivered");
    EXPECT_EQ(state("failed"), "failed");
    EXPECT_EQ(state("trial"), "accepted");
    EXPECT_EQ(restoredJob("queued").changedAt, AT_BACKUP + 1000);
}

TEST_F(BackupTest, LetsMailingsGoOnWhenNothingWasDoneSince) {
    add("queued", JobState::Queued);
    add("accepted", JobState::Accepted);
    backUp();
    EXPECT_EQ(restore(Since::Nothing).doubtfulJobs, 0);
    EXPECT_EQ(state("queued"), "queued");
    EXPECT_EQ(state("accepted"), "accepted");
    EXPECT_TRUE(restoredJob("queued").toUpload);
}

TEST_F(BackupTest, FindsWhatWasHandedOverSinceInTheUploadFolder) {
    for (char const* const packId : {"lies there", "is reported", "is staged"})
        add(packId, JobState::Queued);
    backUp();
    std::ofstream(upload_ / "lies there.mailing") << "container";
    std::ofstream(upload_ / "is reported.mailing.status") << R"({"state":"delivered"})";
    std::ofstream(upload_ / ".is staged.mailing.1.part") << "container";
    for (Since const since : {Since::Unknown, Since::Nothing}) {
        EXPECT_EQ(restore(since).foundJobs, 2);
        EXPECT_EQ(state("lies there"), "submitted");
        EXPECT_EQ(restoredJob("lies there").uploadFolder, upload_.string());
        EXPECT_EQ(state("is reported"), "submitted");
        EXPECT_EQ(state("is staged"), since == Since::Nothing ? "queued" : doubt("is staged"));
        opened_.reset();
        fs::remove_all(restored_);
    }
}

TEST_F(BackupTest, ConcludesNothingFromAnotherUploadFolder) {
    add("p1", JobState::Queued);
    backUp();
    fs::rename(upload_, folder_ / "former");
    fs::create_directory(upload_);
    std::ofstream(upload_ / "p1.mailing") << "container";
    EXPECT_EQ(restore().foundJobs, 0);
    EXPECT_EQ(state("p1"), doubt("p1"));
}

TEST_F(BackupTest, MakesLettersUncertainThatCarriersMayHaveByNow) {
    add("p1", JobState::Queued);
    add("p2", JobState::Queued);
    VlServiced::LetterStore letters(*database_, *jobs_);
    letters.divide("p1", {{1, "fax", true}, {2, "fax", true}}, 1);
    letters.finish({{"p1", 1}}, LetterState::Delivered, "yes", 2);
    letters.divide("p2", {{1, "fax", true}, {2, "postal", false}}, 1);
    backUp();
    RestoredRecord const record = restore();
    EXPECT_EQ(record.doubtfulLetters, 2);
    EXPECT_EQ(state("p1"), "delivering");
    EXPECT_EQ(state("p2"), std::string("failed: since the backup of ") + BACKUP_TIME +
                               " it may have been handed over, as far as no carrier has its letters: find "
                               "out, and mail anew what is missing");
    VlServiced::JobStore jobs(*opened_);
    VlServiced::LetterStore const restored(*opened_, jobs);
    EXPECT_EQ(restored.find({"p1", 1})->state, LetterState::Delivered);
    EXPECT_EQ(restored.find({"p1", 2})->state, LetterState::Uncertain);
    EXPECT_EQ(restored.find({"p1", 2})->says,
              std::string("since the backup of ") + BACKUP_TIME + " it may have been handed over");
    EXPECT_EQ(restored.find({"p2", 1})->state, LetterState::Uncertain);
}

TEST_F(BackupTest, HasTheTokenPacksAndContainersThatNobodyCanMakeAgain) {
    add("of a client", JobState::Queued, false);
    add("with the service", JobState::Queued);
    for (char const* const packId : {"of a client", "with the service"})
        std::ofstream(data_ / "outbox" / (std::string(packId) + ".mailing")) << "container";
    backUp();
    restore();
    EXPECT_EQ(Base::readFile(restored_ / "token"), "secret");
    EXPECT_EQ(Base::readFile(restored_ / "outbox" / "of a client.mailing"), "container");
    EXPECT_FALSE(fs::exists(restored_ / "outbox" / "with the service.mailing"));
    EXPECT_TRUE(fs::exists(restored_ / "packs.db"));
    for (char const* const file : {"token", "packs.db", "service.db"})
        EXPECT_EQ(fs::status(restored_ / file).permissions(), fs::perms(0600)) << file;
}

TEST_F(BackupTest, IsMadeOfOneMomentWhileTheServiceWrites) {
    add("p1", JobState::Accepted);
    Database::Transaction unfinished(*database_);
    add("p2", JobState::Accepted);
    backUp();
    unfinished.commit();
    EXPECT_EQ(restore().doubtfulJobs, 1);
}

TEST_F(BackupTest, IsRestoredOverNothing) {
    backUp();
    restore();
    std::string const before = Base::readFile(restored_ / "service.db");
    EXPECT_EQ(failureOf([&] { restore(); }),
              "there is " + (restored_ / "service.db").string() +
                  " already: name an empty folder, or move away what a service has kept there");
    EXPECT_EQ(Base::readFile(restored_ / "service.db"), before);
}

TEST_F(BackupTest, LeavesNothingOfOneThatIsDamaged) {
    backUp();
    fs::resize_file(file_, fs::file_size(file_) - 1);
    EXPECT_EQ(failureOf([&] { restore(); }),
              "the backup " + file_.string() + " is damaged or cut off: take another one");
    for (fs::directory_entry const& entry : fs::directory_iterator(restored_))
        EXPECT_EQ(entry.path().filename(), "lock");
}

TEST_F(BackupTest, WithoutADatabaseIsRefused) {
    std::ofstream(folder_ / "x") << "x";
    VlServiced::writeBackup(file_, {{"token", folder_ / "x"}}, 1);
    EXPECT_EQ(failureOf([&] { restore(); }),
              "the backup " + file_.string() + " has no service database: take another one");
    fs::remove(file_);
    std::ofstream(folder_ / "x") << std::string(5000, 'x');
    VlServiced::writeBackup(file_, {{"service.db", folder_ / "x"}}, 1);
    EXPECT_THAT(failureOf([&] { restore(); }), HasSubstr("is not a service database"));
    EXPECT_FALSE(fs::exists(restored_ / "service.db"));
}

TEST_F(BackupTest, LeavesNoOtherFileBehind) {
    backUp();
    std::set<std::string> names;
    for (fs::directory_entry const& entry : fs::directory_iterator(folder_.path()))
        names.insert(entry.path().filename().string());
    EXPECT_THAT(names, ElementsAre("backup", "data", "upload"));
    EXPECT_EQ(fs::status(file_).permissions(), fs::perms(0600));
}

TEST_F(BackupTest, OfAFolderWithoutAServiceIsNotMade) {
    EXPECT_EQ(failureOf([&] { VlServiced::backUp({upload_, upload_}, file_, 1); }),
              "there is no service database in " + upload_.string() +
                  ": name the data folder of the service by --data");
    EXPECT_FALSE(fs::exists(file_));
}

/// As it is when the process was ended behind the one step from which on it counts.
TEST_F(BackupTest, IsAdoptedByTheNextOneWhenItsProcessWasEnded) {
    fs::create_directories(restored_ / "restored");
    fs::permissions(restored_, fs::perms::owner_all);
    for (char const* const file : {"service.db", "packs.db"})
        std::ofstream(restored_ / "restored" / file) << file;
    std::ofstream(restored_ / "token") << "moved already";
    VlServiced::DataFolder const folder(restored_);
    EXPECT_EQ(Base::readFile(restored_ / "service.db"), "service.db");
    EXPECT_EQ(Base::readFile(restored_ / "packs.db"), "packs.db");
    EXPECT_EQ(Base::readFile(restored_ / "token"), "moved already");
    EXPECT_FALSE(fs::exists(restored_ / "restored"));
}

} // namespace

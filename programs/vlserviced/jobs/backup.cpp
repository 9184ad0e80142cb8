#include "programs/vlserviced/jobs/backup.h"

#include "programs/base/error.h"
#include "programs/base/file_descriptor.h"
#include "programs/base/pending_file.h"
#include "programs/database/sqlite_connection.h"
#include "programs/vlserviced/jobs/hand_over.h"
#include "programs/vlserviced/settings/service_settings.h"
#include "programs/vlserviced/store/backup_file.h"
#include "programs/vlserviced/store/data_folder.h"
#include "programs/vlserviced/store/letter_store.h"
#include "programs/vlserviced/store/move_database.h"
#include "programs/vlserviced/store/pack_store.h"
#include "programs/vlserviced/store/schema.h"
#include "programs/vlserviced/store/settings_store.h"
#include "vlservice/platform/local_time.h"

#include <SQLiteCpp/Backup.h>
#include <sqlite3.h>

#include <memory>
#include <vector>

namespace VlServiced {
namespace {

namespace fs = std::filesystem;

constexpr char const* SERVICE = "service.db";
constexpr char const* PACKS = "packs.db";
constexpr char const* TOKEN = "token";
constexpr char const* OUTBOX = "outbox";
/// The service may be writing a large page.
constexpr int PATIENCE_MS = 60'000;

/// Jobs that are not handed over yet, or may not be.
constexpr JobState BEFORE_HANDING_OVER[] = {JobState::Accepted, JobState::Held, JobState::Queued};

/// The database as it is at one moment, as a single file.
void copyDatabase(fs::path const& file, Database::DatabaseKind const& kind, fs::path const& target) {
    try {
        SQLite::Database source(file.string(), SQLite::OPEN_READWRITE, PATIENCE_MS);
        Database::requireKind(source, kind, file);
        SQLite::Database copy(target.string(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE);
        if (SQLite::Backup(copy, source).executeStep() != SQLITE_DONE)
            throw Base::Error(Base::Code::DatabaseBusy,
                              Database::theFile(kind, file) + " is busy: try again");
        copy.exec("PRAGMA journal_mode = DELETE");
    } catch (SQLite::Exception const& failure) {
        Database::rethrow(failure, kind, file);
    }
}

/// Of jobs whose pages are not with the service, so that nobody can make them again.
void addContainers(std::vector<BackupMember>& members, fs::path const& database, fs::path const& outbox) {
    Database::SqliteConnection connection(SQLite::Database(database.string(), SQLite::OPEN_READWRITE));
    JobStore const jobs(connection);
    for (JobState const state : Protocol::ALL_JOB_STATES)
        for (Job const& job : jobs.inState(state))
            if (!isDoneWithPages(job) && !job.pack.isWithService() &&
                fs::exists(outbox / job.containerName()))
                members.push_back(
                    {std::string(OUTBOX) + '/' + job.containerName(), outbox / job.containerName()});
}

/// "since the backup of 2026/11/22 15:00 it may have been handed over"
std::string doubtOf(long long madeAt) {
    return "since the backup of " + LocalTime::toText(madeAt) + " it may have been handed over";
}

/// Opens the folder that was set, when it is there; nothing can be concluded from another one.
std::unique_ptr<UploadFolder> uploadFolderOf(Database::Connection& database) {
    ServiceSettings const settings(SettingsStore(database).serviceSettings());
    if (settings.uploadFolder().empty())
        return nullptr;
    try {
        return std::make_unique<UploadFolder>(settings.uploadFolder(), settings.uploadFolderIdentity());
    } catch (std::exception const&) {
        return nullptr;
    }
}

/// Brings the record up to what can be known of the time behind the backup.
class Reckoning {
public:
    Reckoning(Database::Connection& database, long long madeAt, long long now)
        : database_(database), now_(now), upload_(uploadFolderOf(database)) {
        record_.madeAt = madeAt;
    }

    RestoredRecord settle(Since since) {
        Database::Transaction transaction(database_);
        jobs_.freeAll();
        for (Job const& job : toHandOver())
            settle(job, since);
        if (since == Since::Unknown)
            record_.doubtfulLetters = letters_.doubtAll(doubtOf(record_.madeAt), now_);
        transaction.commit();
        return record_;
    }

private:
    /// Before any of them changes its state.
    std::vector<Job> toHandOver() const {
        std::vector<Job> all;
        for (JobState const state : BEFORE_HANDING_OVER)
            for (Job const& job : jobs_.inState(state))
                if (!job.isTrial)
                    all.push_back(job);
        return all;
    }

    void settle(Job const& job, Since since) {
        if (isHandedOver(job)) {
            jobs_.recogniseSubmitted(job.pack.packId, upload_->path().string(), upload_->identity().text(),
                                     now_);
            ++record_.foundJobs;
        } else if (since == Since::Unknown) {
            jobs_.doubt(job.pack.packId, doubtOf(record_.madeAt) + remedyFor(job), now_);
            ++record_.doubtfulJobs;
        }
    }

    bool isHandedOver(Job const& job) const {
        return upload_ && (liesIn(*upload_, job.containerName()) ||
                           carrierReport(*upload_, job.containerName()).has_value());
    }

    static std::string remedyFor(Job const& job) {
        if (job.lettersState)
            return ", as far as no carrier has its letters: find out, and mail anew what is missing";
        return ": find out, then \"vlmail release " + job.pack.packId + "\" or \"vlmail cancel " +
               job.pack.packId + '"';
    }

    Database::Connection& database_;
    long long now_;
    std::unique_ptr<UploadFolder> upload_;
    JobStore jobs_{database_};
    LetterStore letters_{database_, jobs_};
    RestoredRecord record_;
};

/// Makes the folder, and removes it unless it is given another name.
class NewFolder {
public:
    explicit NewFolder(fs::path folder) : folder_(std::move(folder)) {
        fs::remove_all(folder_);
        fs::create_directory(folder_);
        fs::permissions(folder_, fs::perms::owner_all);
    }
    ~NewFolder() {
        std::error_code ignored;
        fs::remove_all(folder_, ignored);
    }
    NewFolder(NewFolder const&) = delete;
    NewFolder& operator=(NewFolder const&) = delete;

    fs::path const& path() const { return folder_; }

private:
    fs::path folder_;
};

/// In front of the name of a file: for what it is made of.
fs::path hiddenBeside(fs::path const& target) {
    return Base::folderOf(target) / ('.' + target.filename().string() + ".parts");
}

/// Pages go when their job is done: all that a record needs are there still behind it.
void copyFiles(fs::path const& data, fs::path const& target) {
    copyDatabase(data / SERVICE, serviceDatabase(), target / SERVICE);
    if (fs::exists(data / PACKS))
        copyDatabase(data / PACKS, packStoreDatabase(), target / PACKS);
}

void requireNew(DataFolder const& data) {
    for (fs::path const& file : {data.database(), data.packs(), data.token()})
        if (fs::exists(file))
            throw Base::Error(
                Base::Code::FileExists,
                "there is " + file.string() +
                    " already: name an empty folder, or move away what a service has kept there");
}

/// Ahead of the record, which names them: what nobody names does no harm.
void placeContainers(fs::path const& from, fs::path const& outbox) {
    if (!fs::exists(from))
        return;
    for (fs::directory_entry const& entry : fs::directory_iterator(from)) {
        Base::PendingFile container(outbox / entry.path().filename());
        fs::copy_file(entry.path(), container.temporary(), fs::copy_options::overwrite_existing);
        container.commit();
    }
    fs::remove_all(from);
}

RestoredRecord settleIn(fs::path const& folder, long long madeAt, Since since, long long now) {
    auto const database = openServiceDatabase(folder / SERVICE);
    RestoredRecord const record = Reckoning(*database, madeAt, now).settle(since);
    database->emptyLog();
    if (fs::exists(folder / PACKS)) {
        SQLite::Database packs =
            Database::openDatabase(folder / PACKS, packStoreDatabase(), Database::Journal::Rollback);
        Database::requireUndamaged(packs, packStoreDatabase());
    }
    return record;
}

} // namespace

void backUp(KeptAt const& kept, fs::path const& target, long long now) {
    bool const isShared = !kept.database.empty();
    if (!isShared && !fs::exists(kept.data / SERVICE))
        throw Base::Error(Base::Code::DatabaseMissing, "there is no service database in " +
                                                           kept.data.string() +
                                                           ": name the data folder of the service by --data");
    if (fs::exists(target))
        throw Base::Error(Base::Code::FileExists, target.string() + " is there already: name another file");
    NewFolder const copies(hiddenBeside(target));
    isShared ? copyFromPostgres(kept.database, copies.path() / SERVICE, copies.path() / PACKS)
             : copyFiles(kept.data, copies.path());
    std::vector<BackupMember> members{{SERVICE, copies.path() / SERVICE}};
    addContainers(members, copies.path() / SERVICE, kept.outbox);
    if (fs::exists(copies.path() / PACKS))
        members.push_back({PACKS, copies.path() / PACKS});
    if (fs::exists(kept.data / TOKEN))
        members.push_back({TOKEN, kept.data / TOKEN});
    writeBackup(target, members, now);
}

RestoredRecord restoreBackup(fs::path const& file, fs::path const& data, fs::path const& outbox, Since since,
                             long long now) {
    DataFolder folder(data);
    requireNew(folder);
    NewFolder const restoring(folder.path() / ".restoring.part");
    long long const madeAt = extractBackup(file, restoring.path());
    if (!fs::exists(restoring.path() / SERVICE))
        throw Base::Error(Base::Code::FileUnsuitable,
                          "the backup " + file.string() + " has no service database: take another one");
    RestoredRecord const record = settleIn(restoring.path(), madeAt, since, now);
    makeWritableFolder(outbox);
    placeContainers(restoring.path() / OUTBOX, outbox);
    folder.adopt(restoring.path());
    return record;
}

} // namespace VlServiced

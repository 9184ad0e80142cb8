#include "programs/database/foreign_file.h"

#include <SQLiteCpp/Exception.h>
#include <SQLiteCpp/Statement.h>
#include <sqlite3.h>

#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <sys/stat.h>
#include <thread>
#include <unistd.h>
#include <utility>
#include <vector>

namespace Database {
namespace {

namespace fs = std::filesystem;
using namespace std::chrono_literals;

constexpr auto LOCK_TIME = 2s;
constexpr auto LOCK_PAUSE = 10ms;
/// Steps of the database between two looks at the clock.
constexpr int STEPS = 1000;

// Where SQLite's locks lie in a file, as its file format says.
constexpr off_t PENDING_BYTE = 0x40000000;
constexpr off_t RESERVED_BYTE = PENDING_BYTE + 1;
constexpr off_t SHARED_FIRST = PENDING_BYTE + 2;
constexpr off_t SHARED_SIZE = 510;

/// What no statement that reads a table of a known schema needs.
constexpr std::pair<int, int> LIMITS[] = {
    {SQLITE_LIMIT_SQL_LENGTH, 10'000},       {SQLITE_LIMIT_COLUMN, 30},
    {SQLITE_LIMIT_EXPR_DEPTH, 20},           {SQLITE_LIMIT_VDBE_OP, 10'000},
    {SQLITE_LIMIT_FUNCTION_ARG, 10},         {SQLITE_LIMIT_ATTACHED, 0},
    {SQLITE_LIMIT_TRIGGER_DEPTH, 1},         {SQLITE_LIMIT_WORKER_THREADS, 0},
    {SQLITE_LIMIT_VARIABLE_NUMBER, 10},      {SQLITE_LIMIT_COMPOUND_SELECT, 2},
    {SQLITE_LIMIT_LIKE_PATTERN_LENGTH, 100},
};

struct flock lockOf(short type, off_t start, off_t size) {
    struct flock lock {};
    lock.l_type = type;
    lock.l_whence = SEEK_SET;
    lock.l_start = start;
    lock.l_len = size;
    return lock;
}

struct stat statusOf(fs::path const& path, DatabaseKind const& kind, fs::path const& file) {
    struct stat status {};
    if (::lstat(path.c_str(), &status) != 0)
        throw DatabaseError(Base::Code::DatabaseMissing,
                            "there is no " + std::string(kind.name) + " " + file.string());
    return status;
}

/// What others may change is no ground to stand on while it is being read.
void requireOwn(fs::path const& path, DatabaseKind const& kind, fs::path const& file) {
    struct stat const status = statusOf(path, kind, file);
    if (status.st_uid != ::geteuid())
        throw DatabaseError(Base::Code::DatabaseUnusable, theFile(kind, file) + " is not read, because " +
                                                              path.string() + " belongs to another user");
    if ((status.st_mode & (S_IWGRP | S_IWOTH)) != 0)
        throw DatabaseError(Base::Code::DatabaseUnusable,
                            theFile(kind, file) + " is not read, because others may write " + path.string() +
                                ": take their right away (chmod go-w)");
}

/// The file's name in a form that takes options.
std::string uriOf(fs::path const& file) {
    std::string uri = "file:";
    for (unsigned char const c : fs::absolute(file).string()) {
        char text[4];
        if (std::isalnum(c) || c == '/' || c == '.' || c == '-' || c == '_')
            uri += static_cast<char>(c);
        else if (std::snprintf(text, sizeof text, "%%%02X", c) > 0)
            uri += text;
    }
    return uri + "?mode=ro&immutable=1";
}

using SchemaRow = std::vector<std::string>;

std::vector<SchemaRow> schemaOf(SQLite::Database& database, std::size_t most) {
    SQLite::Statement query(database,
                            "SELECT type, name, tbl_name, ifnull(sql, '') FROM sqlite_schema ORDER BY 1, 2 "
                            "LIMIT " +
                                std::to_string(most));
    std::vector<SchemaRow> rows;
    while (query.executeStep())
        rows.push_back({query.getColumn(0).getString(), query.getColumn(1).getString(),
                        query.getColumn(2).getString(), query.getColumn(3).getString()});
    return rows;
}

std::vector<SchemaRow> schemaOf(DatabaseKind const& kind) {
    constexpr std::size_t ALL = 1000;
    SQLite::Database model(":memory:", SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE);
    for (Migration const& migration : kind.migrations)
        model.exec(migration.scriptFor(Backend::Sqlite));
    return schemaOf(model, ALL);
}

} // namespace

/// The lock that a reader of SQLite's has, taken around it: a connection to an immutable file takes none. It
/// belongs to the open file, so that connections of this process do not drop it.
class ForeignFile::SharedLock {
public:
    SharedLock(fs::path const& file, DatabaseKind const& kind)
        : descriptor_(::open(file.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC)) {
        if (descriptor_ < 0)
            throw DatabaseError(Base::Code::DatabaseUnavailable,
                                "cannot open " + theFile(kind, file) + ": " + std::strerror(errno));
        try {
            wait(PENDING_BYTE, 1, kind, file);
            wait(SHARED_FIRST, SHARED_SIZE, kind, file);
            set(F_UNLCK, PENDING_BYTE, 1);
            requireSettled(kind, file);
        } catch (...) {
            ::close(descriptor_);
            throw;
        }
    }
    ~SharedLock() { ::close(descriptor_); }
    SharedLock(SharedLock const&) = delete;
    SharedLock& operator=(SharedLock const&) = delete;

private:
    bool set(short type, off_t start, off_t size) const {
        struct flock lock = lockOf(type, start, size);
        return ::fcntl(descriptor_, F_OFD_SETLK, &lock) == 0;
    }

    void wait(off_t start, off_t size, DatabaseKind const& kind, fs::path const& file) const {
        auto const end = std::chrono::steady_clock::now() + LOCK_TIME;
        while (!set(F_RDLCK, start, size)) {
            if (std::chrono::steady_clock::now() >= end)
                throw DatabaseError(Base::Code::DatabaseBusy,
                                    theFile(kind, file) + " is held by another program: try again later");
            std::this_thread::sleep_for(LOCK_PAUSE);
        }
    }

    /// A journal that nobody is writing belongs to a change that was broken off half way.
    void requireSettled(DatabaseKind const& kind, fs::path const& file) const {
        struct flock lock = lockOf(F_WRLCK, RESERVED_BYTE, 1);
        std::error_code ignored;
        bool const hasJournal = fs::exists(file.string() + "-journal", ignored);
        if (hasJournal && ::fcntl(descriptor_, F_OFD_GETLK, &lock) == 0 && lock.l_type == F_UNLCK)
            throw DatabaseError(
                Base::Code::DatabaseUnusable,
                theFile(kind, file) +
                    " was left in the middle of a change: let the program that wrote it open it "
                    "once more");
    }

    int descriptor_;
};

ForeignFile::ForeignFile(fs::path file, DatabaseKind const& kind, int maxValueBytes,
                         std::chrono::milliseconds operationTime)
    : path_(std::move(file)), operationTime_(operationTime) {
    // A pipe would hold up the opening, and a folder would fail with a misleading text.
    if (!S_ISREG(statusOf(path_, kind, path_).st_mode))
        throw DatabaseError(Base::Code::DatabaseMissing,
                            "there is no " + std::string(kind.name) + " " + path_.string());
    requireOwn(fs::absolute(path_).parent_path(), kind, path_);
    requireOwn(path_, kind, path_);
    lock_ = std::make_unique<SharedLock>(path_, kind);
    try {
        database_ =
            std::make_unique<SQLite::Database>(uriOf(path_), SQLite::OPEN_READONLY | SQLite::OPEN_URI);
        limit(maxValueBytes);
        begin();
        requireKind(*database_, kind, path_);
        requireSchema(kind);
    } catch (SQLite::Exception const& failure) {
        rethrow(failure, kind, path_);
    }
}

ForeignFile::~ForeignFile() = default;

SQLite::Database& ForeignFile::begin() {
    due_ = std::chrono::steady_clock::now() + operationTime_;
    return *database_;
}

void ForeignFile::limit(int maxValueBytes) {
    sqlite3* const handle = database_->getHandle();
    sqlite3_db_config(handle, SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr);
    sqlite3_db_config(handle, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
    sqlite3_db_config(handle, SQLITE_DBCONFIG_ENABLE_VIEW, 0, nullptr);
    sqlite3_db_config(handle, SQLITE_DBCONFIG_ENABLE_TRIGGER, 0, nullptr);
    sqlite3_limit(handle, SQLITE_LIMIT_LENGTH, maxValueBytes);
    for (auto const& [what, most] : LIMITS)
        sqlite3_limit(handle, what, most);
    sqlite3_progress_handler(handle, STEPS, &ForeignFile::onProgress, this);
    database_->exec("PRAGMA cell_size_check = ON");
}

void ForeignFile::requireSchema(DatabaseKind const& kind) {
    std::vector<SchemaRow> const wanted = schemaOf(kind);
    if (schemaOf(*database_, wanted.size() + 1) != wanted)
        failOther(kind, path_);
}

int ForeignFile::onProgress(void* self) {
    return std::chrono::steady_clock::now() >= static_cast<ForeignFile*>(self)->due_ ? 1 : 0;
}

} // namespace Database

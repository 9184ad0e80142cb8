#pragma once
// A database file that another program wrote, perhaps in bad faith: for reading alone.

#include "programs/database/failure.h"

#include <SQLiteCpp/Database.h>

#include <chrono>
#include <filesystem>
#include <memory>

namespace Database {

/// Nothing that the file says is run: its schema has to be that of the kind, word by word, no journal beside
/// it is played back, and every operation has a time. While the object lives, nobody changes the file.
class ForeignFile {
public:
    /// Values of more than `maxValueBytes` bytes fail to be read, and so does whatever takes longer than
    /// `operationTime`. Waits some seconds for whoever writes. Throws DatabaseError, also when the file or
    /// its folder belongs to somebody else or may be written by others.
    ForeignFile(std::filesystem::path file, DatabaseKind const& kind, int maxValueBytes,
                std::chrono::milliseconds operationTime);
    ~ForeignFile();
    ForeignFile(ForeignFile const&) = delete;
    ForeignFile& operator=(ForeignFile const&) = delete;

    /// Begins an operation: its time starts here.
    SQLite::Database& begin();
    std::filesystem::path const& path() const { return path_; }

private:
    class SharedLock;

    void limit(int maxValueBytes);
    void requireSchema(DatabaseKind const& kind);
    static int onProgress(void* self);

    std::filesystem::path path_;
    std::chrono::milliseconds operationTime_;
    std::chrono::steady_clock::time_point due_;
    std::unique_ptr<SharedLock> lock_;
    std::unique_ptr<SQLite::Database> database_;
};

} // namespace Database

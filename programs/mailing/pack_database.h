#pragma once
// The pack database: where a client leaves the pages of its mailings until the service has fetched them.

#include "programs/database/foreign_file.h"
#include "programs/database/sqlite_file.h"
#include "programs/mailing/pack_source.h"
#include "vlservice/pack/page_saver.h"

#include <SQLiteCpp/Statement.h>

#include <filesystem>
#include <string>
#include <utility>
#include <vector>

namespace Mailing {

/// Of the library that keeps it.
std::string databaseVersion();

// A database holds any number of packs. A pack is one row of `packs` (id, cfg_id, title, metadata, complete,
// created_at) and one row of `pages` for each page (pack, position from 0, document, page, data). Metadata
// and pages are products of PageSaverI::zipDbData. Readers see a pack only when `complete` is 1.
Database::DatabaseKind const& packDatabase();

/// Stores one pack. What was stored disappears with the object unless finish() was called. Every operation
/// throws Database::DatabaseError when the database cannot do its part.
class PackDatabaseWriter : public PageSaverI {
public:
    /// Opens the database, or creates it, and begins a pack. Throws Database::DatabaseError when the id is
    /// none or belongs to a finished pack already.
    PackDatabaseWriter(std::filesystem::path const& file, PackInfo const& pack);
    ~PackDatabaseWriter() override;
    PackDatabaseWriter(PackDatabaseWriter const&) = delete;
    PackDatabaseWriter& operator=(PackDatabaseWriter const&) = delete;

    /// `data` is a product of zipDbData, of 256 MiB at most. Pages are written some MiB at a time, and the
    /// database is not locked in between: several packs can be stored at once. A page of the same document
    /// and name must not be there yet, which is noticed when they are written.
    void savePage(std::string const& document, std::string const& page, SharedMemBuffer data) override;
    /// From here on readers see the pack, also after a crash or a power failure.
    void finish(SharedMemBuffer metadata);

    // The same in two steps, for who looks at the whole pack in between.

    /// The pack is whole, and for readers of unfinished packs alone.
    void store(SharedMemBuffer const& metadata);
    void finish();
    /// Erases what was stored, in place of finishing it.
    void drop();

private:
    struct Page {
        std::string document;
        std::string name;
        SharedMemBuffer data;
    };

    void begin(PackInfo const& pack);
    // Within a transaction.
    void insertBatch();
    void insertMetadata(SharedMemBuffer const& metadata);
    void markFinished();

    std::filesystem::path file_;
    SQLite::Database database_;
    long long position_ = 0;
    std::vector<Page> batch_;
    unsigned long long batchBytes_ = 0;
    bool finished_ = false;
};

/// The pages of one finished pack, each read when it is asked for. The database is taken for one that
/// somebody has forged; nobody can change it while it is being read. Every operation throws
/// Database::DatabaseError when the database cannot be read.
class PackDatabaseReader : public PackSource {
public:
    /// Throws Database::DatabaseError when there is no such finished pack.
    PackDatabaseReader(std::filesystem::path const& file, std::string const& packId);

    PackInfo const& info() const override { return info_; }
    std::vector<PageName> const& pages() const override { return pages_; }
    SharedMemBuffer metadata() override;

private:
    SharedMemBuffer load(std::string const& document, std::string const& page) override;

    Database::ForeignFile file_;
    PackInfo info_;
    std::vector<PageName> pages_;
};

/// The same of a database of the user's own, in which others may store packs meanwhile.
class OwnPackReader : public PackSource {
public:
    enum class Sees { Finished, Unfinished };

    /// Throws Database::DatabaseError when there is no such pack.
    OwnPackReader(std::filesystem::path const& file, std::string const& packId, Sees sees = Sees::Finished);

    PackInfo const& info() const override { return info_; }
    std::vector<PageName> const& pages() const override { return pages_; }
    SharedMemBuffer metadata() override;

private:
    SharedMemBuffer load(std::string const& document, std::string const& page) override;

    std::filesystem::path file_;
    SQLite::Database database_;
    PackInfo info_;
    std::vector<PageName> pages_;
};

/// A finished pack in a list of them.
struct StoredPack {
    PackInfo info;
    /// Seconds since the epoch.
    long long created = 0;
    long long pages = 0;
};

/// The finished packs of a database of the user's own, the oldest first; none when there is no such file.
/// Throws Database::DatabaseError.
std::vector<StoredPack> finishedPacks(std::filesystem::path const& file);

/// Erases a pack, whose bytes are overwritten, and gives its room back to the database. Nothing happens when
/// there is none of that id. Throws Database::DatabaseError.
void removePack(std::filesystem::path const& file, std::string const& packId);

} // namespace Mailing

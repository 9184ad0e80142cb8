#include "programs/mailing/pack_database.h"

#include <SQLiteCpp/Transaction.h>

#include <SQLiteCpp/Exception.h>

#include <chrono>
#include <ctime>
#include <utility>

namespace Mailing {
namespace {

namespace fs = std::filesystem;

/// "VLPK" as a number.
constexpr int APPLICATION_ID = 0x564C504B;

constexpr char const* SCHEMA_1 = R"sql(
CREATE TABLE packs (
    id         TEXT NOT NULL PRIMARY KEY,
    cfg_id     TEXT NOT NULL,
    title      TEXT NOT NULL,
    metadata   BLOB,
    complete   INTEGER NOT NULL DEFAULT 0,
    created_at INTEGER NOT NULL
);
CREATE TABLE pages (
    pack     TEXT NOT NULL REFERENCES packs (id) ON DELETE CASCADE,
    position INTEGER NOT NULL,
    document TEXT NOT NULL,
    page     TEXT NOT NULL,
    data     BLOB NOT NULL,
    PRIMARY KEY (pack, position),
    UNIQUE (pack, document, page)
);
)sql";

/// Pages wait in memory until they are this much.
constexpr unsigned long long BATCH_BYTES = 16ULL << 20;
/// What a client left unfinished so long ago is what a crash left.
constexpr long long UNFINISHED_SECONDS = 24 * 60 * 60;
/// The names of all pages of a pack together: a few million pages.
constexpr std::size_t MAX_NAMES_BYTES = 256 << 20;
/// For one page, or for the names of all.
constexpr std::chrono::seconds OPERATION_TIME{10};

template<typename Operation>
decltype(auto) orDatabaseError(fs::path const& file, Operation operation) {
    try {
        return operation();
    } catch (SQLite::Exception const& failure) {
        throw Database::DatabaseError(Base::Code::DatabaseFailed,
                                      "the pack database " + file.string() + " failed: " + failure.what());
    }
}

SharedMemBuffer bufferIn(SQLite::Column const& column) {
    // The pointer first: asking for it may convert the value, and the size is that of what it became.
    void const* const data = column.getBlob();
    return SharedMemBuffer::copyOf(data, static_cast<unsigned long long>(column.getBytes()));
}

PackInfo infoIn(SQLite::Database& database, fs::path const& file, std::string const& packId,
                bool isFinished = true) {
    SQLite::Statement query(database, "SELECT id, cfg_id, title FROM packs WHERE id = ? AND complete = ?");
    query.bind(1, packId);
    query.bind(2, isFinished ? 1 : 0);
    if (!query.executeStep())
        throw Database::DatabaseError(Base::Code::MailingUnknown, "the pack database " + file.string() +
                                                                      " has no finished pack " + packId);
    return {query.getColumn(0).getString(), query.getColumn(1).getString(), query.getColumn(2).getString()};
}

std::vector<PackSource::PageName> namesIn(SQLite::Database& database, std::string const& packId) {
    SQLite::Statement query(database, "SELECT document, page FROM pages WHERE pack = ? ORDER BY position");
    query.bind(1, packId);
    std::vector<PackSource::PageName> names;
    std::size_t bytes = 0;
    while (query.executeStep()) {
        PackSource::PageName const& name =
            names.emplace_back(query.getColumn(0).getString(), query.getColumn(1).getString());
        bytes += sizeof name + name.document.size() + name.page.size();
        if (bytes > MAX_NAMES_BYTES)
            throw Database::DatabaseError(Base::Code::TooLarge,
                                          "pack " + packId + " has more pages than a mailing can hold");
    }
    return names;
}

SharedMemBuffer pageIn(SQLite::Database& database, std::string const& packId, std::string const& document,
                       std::string const& page) {
    SQLite::Statement query(database, "SELECT data FROM pages WHERE pack = ? AND document = ? AND page = ?");
    query.bindNoCopy(1, packId);
    query.bindNoCopy(2, document);
    query.bindNoCopy(3, page);
    return query.executeStep() ? bufferIn(query.getColumn(0)) : SharedMemBuffer();
}

SharedMemBuffer metadataIn(SQLite::Database& database, std::string const& packId) {
    SQLite::Statement query(database, "SELECT metadata FROM packs WHERE id = ?");
    query.bindNoCopy(1, packId);
    return query.executeStep() ? bufferIn(query.getColumn(0)) : SharedMemBuffer();
}

} // namespace

std::string databaseVersion() { return SQLite::getLibVersion(); }

Database::DatabaseKind const& packDatabase() {
    static Database::DatabaseKind const kind{"pack database", APPLICATION_ID, {SCHEMA_1}};
    return kind;
}

PackDatabaseWriter::PackDatabaseWriter(fs::path const& file, PackInfo const& pack)
    : PageSaverI(pack.id), file_(file),
      database_(Database::openDatabase(file, packDatabase(), Database::Journal::Rollback)) {
    if (!isPackId(pack.id))
        throw Database::DatabaseError(Base::Code::MailingIdInvalid,
                                      "the pack id \"" + pack.id + "\" cannot name a file");
    orDatabaseError(file_, [&] { begin(pack); });
}

PackDatabaseWriter::~PackDatabaseWriter() {
    if (finished_)
        return;
    try {
        drop();
    } catch (std::exception const&) {
        // It stays unfinished, and whoever opens the database a day later erases it.
    }
}

void PackDatabaseWriter::begin(PackInfo const& pack) {
    SQLite::Transaction transaction(database_, SQLite::TransactionBehavior::IMMEDIATE);
    long long const now = std::time(nullptr);
    SQLite::Statement cleaning(database_,
                               "DELETE FROM packs WHERE complete = 0 AND (id = ? OR created_at < ?)");
    cleaning.bind(1, pack.id);
    cleaning.bind(2, static_cast<std::int64_t>(now - UNFINISHED_SECONDS));
    cleaning.exec();
    SQLite::Statement insertion(database_, "INSERT INTO packs (id, cfg_id, title, created_at) "
                                           "VALUES (?, ?, ?, ?) ON CONFLICT DO NOTHING");
    insertion.bind(1, pack.id);
    insertion.bind(2, pack.cfgId);
    insertion.bind(3, pack.title);
    insertion.bind(4, static_cast<std::int64_t>(now));
    if (insertion.exec() == 0)
        throw Database::DatabaseError(Base::Code::MailingExists, "the pack database " + file_.string() +
                                                                     " has a pack " + pack.id + " already");
    transaction.commit();
}

void PackDatabaseWriter::savePage(std::string const& document, std::string const& page,
                                  SharedMemBuffer data) {
    if (data.empty() || data.size() > MAX_BLOB_BYTES)
        throw Database::DatabaseError(Base::Code::TooLarge, "page \"" + page + "\" of \"" + document +
                                                                "\" cannot be stored: it has " +
                                                                std::to_string(data.size()) + " bytes");
    batchBytes_ += data.size();
    batch_.push_back({document, page, std::move(data)});
    if (batchBytes_ < BATCH_BYTES)
        return;
    orDatabaseError(file_, [&] {
        SQLite::Transaction transaction(database_, SQLite::TransactionBehavior::IMMEDIATE);
        insertBatch();
        transaction.commit();
    });
}

void PackDatabaseWriter::insertBatch() {
    SQLite::Statement insertion(database_, "INSERT INTO pages (pack, position, document, page, data) "
                                           "VALUES (?, ?, ?, ?, ?)");
    for (Page const& page : batch_) {
        insertion.bindNoCopy(1, savedPackId());
        insertion.bind(2, static_cast<std::int64_t>(position_++));
        insertion.bindNoCopy(3, page.document);
        insertion.bindNoCopy(4, page.name);
        insertion.bindNoCopy(5, page.data.data(), static_cast<int>(page.data.size()));
        insertion.exec();
        insertion.reset();
    }
    batch_.clear();
    batchBytes_ = 0;
}

void PackDatabaseWriter::insertMetadata(SharedMemBuffer const& metadata) {
    SQLite::Statement change(database_, "UPDATE packs SET metadata = ? WHERE id = ?");
    change.bindNoCopy(1, metadata.data(), static_cast<int>(metadata.size()));
    change.bindNoCopy(2, savedPackId());
    change.exec();
}

void PackDatabaseWriter::markFinished() {
    SQLite::Statement change(database_, "UPDATE packs SET complete = 1 WHERE id = ?");
    change.bindNoCopy(1, savedPackId());
    change.exec();
}

void PackDatabaseWriter::finish(SharedMemBuffer metadata) {
    orDatabaseError(file_, [&] {
        SQLite::Transaction transaction(database_, SQLite::TransactionBehavior::IMMEDIATE);
        insertBatch();
        insertMetadata(metadata);
        markFinished();
        transaction.commit();
        finished_ = true;
    });
}

void PackDatabaseWriter::store(SharedMemBuffer const& metadata) {
    orDatabaseError(file_, [&] {
        SQLite::Transaction transaction(database_, SQLite::TransactionBehavior::IMMEDIATE);
        insertBatch();
        insertMetadata(metadata);
        transaction.commit();
    });
}

void PackDatabaseWriter::finish() {
    orDatabaseError(file_, [&] { markFinished(); });
    finished_ = true;
}

void PackDatabaseWriter::drop() {
    orDatabaseError(file_, [&] {
        SQLite::Statement deletion(database_, "DELETE FROM packs WHERE id = ? AND complete = 0");
        deletion.bindNoCopy(1, savedPackId());
        deletion.exec();
    });
}

PackDatabaseReader::PackDatabaseReader(fs::path const& file, std::string const& packId)
    : PackSource(packId), file_(file, packDatabase(), MAX_BLOB_BYTES, OPERATION_TIME) {
    orDatabaseError(file, [&] {
        info_ = infoIn(file_.begin(), file, packId);
        pages_ = namesIn(file_.begin(), packId);
    });
}

SharedMemBuffer PackDatabaseReader::load(std::string const& document, std::string const& page) {
    return orDatabaseError(file_.path(), [&] { return pageIn(file_.begin(), packId(), document, page); });
}

SharedMemBuffer PackDatabaseReader::metadata() {
    return orDatabaseError(file_.path(), [&] { return metadataIn(file_.begin(), packId()); });
}

OwnPackReader::OwnPackReader(fs::path const& file, std::string const& packId, Sees sees)
    : PackSource(packId), file_(file),
      database_(Database::openDatabase(file, packDatabase(), Database::Journal::Rollback)) {
    orDatabaseError(file, [&] {
        info_ = infoIn(database_, file, packId, sees == Sees::Finished);
        pages_ = namesIn(database_, packId);
    });
}

SharedMemBuffer OwnPackReader::load(std::string const& document, std::string const& page) {
    return orDatabaseError(file_, [&] { return pageIn(database_, packId(), document, page); });
}

SharedMemBuffer OwnPackReader::metadata() {
    return orDatabaseError(file_, [&] { return metadataIn(database_, packId()); });
}

void removePack(fs::path const& file, std::string const& packId) {
    SQLite::Database database = Database::openDatabase(file, packDatabase(), Database::Journal::Rollback);
    orDatabaseError(file, [&] {
        SQLite::Statement deletion(database, "DELETE FROM packs WHERE id = ?");
        deletion.bind(1, packId);
        deletion.exec();
        if (database.execAndGet("SELECT count(*) FROM packs").getInt() == 0)
            database.exec("VACUUM");
    });
}

std::vector<StoredPack> finishedPacks(fs::path const& file) {
    std::error_code error;
    if (!fs::exists(file, error))
        return {};
    SQLite::Database database = Database::openDatabase(file, packDatabase(), Database::Journal::Rollback);
    return orDatabaseError(file, [&] {
        SQLite::Statement query(database, "SELECT id, cfg_id, title, created_at, (SELECT count(*) FROM pages "
                                          "WHERE pack = id) FROM packs WHERE complete = 1 "
                                          "ORDER BY created_at, id");
        std::vector<StoredPack> packs;
        while (query.executeStep())
            packs.push_back({{query.getColumn(0).getString(), query.getColumn(1).getString(),
                              query.getColumn(2).getString()},
                             query.getColumn(3).getInt64(),
                             query.getColumn(4).getInt64()});
        return packs;
    });
}

} // namespace Mailing

#include "programs/vlserviced/store/pack_store.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/database/sqlite_file.h"
#include "programs/mailing/page_blob.h"

#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Exception.h>
#include <SQLiteCpp/Statement.h>
#include <SQLiteCpp/Transaction.h>
#include <sqlite3.h>

#include <algorithm>
#include <cstdint>
#include <fcntl.h>
#include <system_error>
#include <unistd.h>
#include <utility>

namespace VlServiced {
namespace {

namespace fs = std::filesystem;

using State = KeptPack::State;

/// "VLSP" as a number.
constexpr int APPLICATION_ID = 0x564C5350;

/// Large pages suit what is long; what is freed goes back to the disk in steps.
constexpr char const* BEGINNING = "PRAGMA page_size = 32768; PRAGMA auto_vacuum = INCREMENTAL";

/// A pack's state is that of KeptPack. Of an erased one the title is empty.
constexpr char const* SCHEMA_1 = R"sql(
CREATE TABLE packs (
    number     INTEGER NOT NULL PRIMARY KEY,
    id         TEXT NOT NULL UNIQUE,
    cfg_id     TEXT NOT NULL,
    title      TEXT NOT NULL,
    pages      INTEGER NOT NULL,
    bytes      INTEGER NOT NULL,
    sha256     TEXT NOT NULL,
    state      TEXT NOT NULL,
    touched_at INTEGER NOT NULL
);
CREATE INDEX packs_by_node ON packs (cfg_id);
CREATE TABLE pages (
    pack     INTEGER NOT NULL REFERENCES packs (number),
    position INTEGER NOT NULL,
    document TEXT NOT NULL,
    page     TEXT NOT NULL,
    size     INTEGER NOT NULL,
    sha256   TEXT NOT NULL,
    PRIMARY KEY (pack, position),
    UNIQUE (pack, document, page)
);
CREATE TABLE pieces (
    pack     INTEGER NOT NULL REFERENCES packs (number),
    position INTEGER NOT NULL,
    number   INTEGER NOT NULL,
    data     BLOB NOT NULL,
    PRIMARY KEY (pack, position, number)
);
)sql";

constexpr std::pair<State, char const*> STATES[] = {
    {State::Open, "open"}, {State::Complete, "complete"}, {State::Erased, "erased"}};

State stateNamed(std::string const& name) {
    auto const found = std::ranges::find_if(STATES, [&](auto const& row) { return row.second == name; });
    if (found == std::end(STATES))
        throw Base::Error("the pack store has a pack in the state \"" + name +
                          "\", which this program does not know: use the version that wrote it");
    return found->first;
}

/// Rows that are erased in one go: pieces of a MiB at the most. One by one where there is no room on the disk
/// for taking that back.
constexpr int SOME_ROWS = 64;
/// Of the file, given back to the disk in one go.
constexpr char const* SOME_PAGES = "1024";
constexpr int BUSY_TIMEOUT_MS = 60'000;

std::string inWords(SQLite::Exception const& failure) {
    switch (failure.getErrorCode()) {
    case SQLITE_FULL:
        return "there is no room on the disk of the service: make room and send it again";
    case SQLITE_CONSTRAINT:
        return "a page of it comes twice";
    default:
        return std::string("the pack store of the service failed: ") + failure.what();
    }
}

template<typename Operation>
decltype(auto) orError(Operation operation) {
    try {
        return operation();
    } catch (SQLite::Exception const& failure) {
        throw Base::Error(inWords(failure));
    }
}

constexpr char const* SELECT_PACKS =
    "SELECT id, cfg_id, title, pages, bytes, sha256, state, touched_at FROM packs ";

KeptPack packIn(SQLite::Statement& row) {
    KeptPack pack;
    pack.head.info = {row.getColumn(0).getString(), row.getColumn(1).getString(),
                      row.getColumn(2).getString()};
    pack.head.pages = row.getColumn(3).getInt64();
    pack.head.bytes = row.getColumn(4).getInt64();
    pack.head.sha256 = row.getColumn(5).getString();
    pack.state = stateNamed(row.getColumn(6).getString());
    pack.touchedAt = row.getColumn(7).getInt64();
    return pack;
}

std::optional<KeptPack> packOf(SQLite::Database& database, std::string const& packId) {
    SQLite::Statement query(database, std::string(SELECT_PACKS) + "WHERE id = ?");
    query.bind(1, packId);
    return query.executeStep() ? std::optional(packIn(query)) : std::nullopt;
}

std::int64_t numberOf(SQLite::Database& database, std::string const& packId) {
    SQLite::Statement query(database, "SELECT number FROM packs WHERE id = ?");
    query.bind(1, packId);
    if (!query.executeStep())
        throw Base::Error("the service has no pack " + packId + ": send it again");
    return query.getColumn(0).getInt64();
}

/// A complete pack, read over a connection of its own.
class StoredPack : public Mailing::PackSource {
public:
    StoredPack(fs::path const& file, std::string const& packId)
        : PackSource(packId), database_(file, SQLite::OPEN_READONLY, BUSY_TIMEOUT_MS) {
        std::optional<KeptPack> const pack = packOf(database_, packId);
        if (!pack || pack->state != State::Complete)
            throw Base::Error("the service has no finished pack " + packId + ": send it again");
        info_ = pack->head.info;
        number_ = numberOf(database_, packId);
        readNames(pack->head.pages);
    }

    Mailing::PackInfo const& info() const override { return info_; }
    std::vector<PageName> const& pages() const override { return pages_; }
    SharedMemBuffer metadata() override { return load({}, {}); }

private:
    void readNames(long long metadataAt) {
        SQLite::Statement query(
            database_, "SELECT document, page FROM pages WHERE pack = ? AND position < ? ORDER BY position");
        query.bind(1, number_);
        query.bind(2, static_cast<std::int64_t>(metadataAt));
        while (query.executeStep())
            pages_.emplace_back(query.getColumn(0).getString(), query.getColumn(1).getString());
    }

    SharedMemBuffer load(std::string const& document, std::string const& page) override {
        return orError([&] {
            SQLite::Statement query(database_, "SELECT position, size, sha256 FROM pages WHERE pack = ? AND "
                                               "document = ? AND page = ?");
            query.bind(1, number_);
            query.bind(2, document);
            query.bind(3, page);
            if (!query.executeStep())
                return SharedMemBuffer();
            return whole(query.getColumn(0).getInt64(), query.getColumn(1).getInt64(),
                         query.getColumn(2).getString());
        });
    }

    SharedMemBuffer whole(std::int64_t position, std::int64_t size, std::string const& sha256) {
        SharedMemBuffer data;
        data.resize(static_cast<unsigned long long>(size));
        SQLite::Statement query(database_,
                                "SELECT data FROM pieces WHERE pack = ? AND position = ? ORDER BY number");
        query.bind(1, number_);
        query.bind(2, position);
        std::int64_t filled = 0;
        while (query.executeStep()) {
            SQLite::Column const piece = query.getColumn(0);
            auto const* const bytes = static_cast<unsigned char const*>(piece.getBlob());
            std::int64_t const length = std::min<std::int64_t>(piece.getBytes(), size - filled);
            std::copy_n(bytes, length, data.data() + filled);
            filled += length;
        }
        if (filled != size || Base::sha256(Mailing::viewOf(data)) != sha256)
            throw Base::Error("page " + std::to_string(position + 1) + " of pack " + packId() +
                              " is damaged in the pack store of the service");
        return data;
    }

    SQLite::Database database_;
    Mailing::PackInfo info_;
    std::int64_t number_ = 0;
    std::vector<PageName> pages_;
};

/// Room on the disk that is there when there is no other: erasing takes some.
class Reserve {
public:
    explicit Reserve(fs::path file) : file_(std::move(file)) { take(); }

    void giveUp() const {
        std::error_code ignored;
        fs::remove(file_, ignored);
    }
    /// Without it, erasing on a full disk waits until there is room.
    void take() const {
        if (file_.string().starts_with(":memory:"))
            return;
        int const file = ::open(file_.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
        bool const isTaken = file >= 0 && ::posix_fallocate(file, 0, SIZE) == 0;
        ::close(file);
        if (!isTaken)
            giveUp();
    }

private:
    static constexpr off_t SIZE = 4 << 20;

    fs::path file_;
};

class SqlitePackStore : public PackStore {
public:
    explicit SqlitePackStore(fs::path const& file)
        : file_(file),
          database_(Database::openDatabase(file, packStoreDatabase(), Database::Journal::Rollback)) {}

    std::optional<KeptPack> find(std::string const& packId) override {
        return orError([&] { return packOf(database_, packId); });
    }

    std::vector<KeptPack> all() override {
        return orError([&] {
            SQLite::Statement query(database_, SELECT_PACKS);
            std::vector<KeptPack> packs;
            while (query.executeStep())
                packs.push_back(packIn(query));
            return packs;
        });
    }

    long long bytesOf(std::string const& cfgId) override {
        return orError([&] {
            SQLite::Statement query(
                database_, "SELECT ifnull(sum(bytes), 0) FROM packs WHERE cfg_id = ? AND state <> 'erased'");
            query.bind(1, cfgId);
            query.executeStep();
            return static_cast<long long>(query.getColumn(0).getInt64());
        });
    }

    std::vector<KeptPage> pagesOf(std::string const& packId) override {
        return orError([&] {
            SQLite::Statement query(database_, "SELECT document, page, size, sha256 FROM pages WHERE pack = "
                                               "? ORDER BY position");
            query.bind(1, numberOf(database_, packId));
            std::vector<KeptPage> pages;
            while (query.executeStep())
                pages.push_back({query.getColumn(0).getString(), query.getColumn(1).getString(),
                                 query.getColumn(2).getInt64(), query.getColumn(3).getString()});
            return pages;
        });
    }

    void add(PackHead const& head, long long now) override {
        orError([&] {
            SQLite::Statement insertion(
                database_, "INSERT INTO packs (id, cfg_id, title, pages, bytes, sha256, state, touched_at) "
                           "VALUES (?, ?, ?, ?, ?, ?, 'open', ?)");
            insertion.bind(1, head.info.id);
            insertion.bind(2, head.info.cfgId);
            insertion.bind(3, head.info.title);
            insertion.bind(4, static_cast<std::int64_t>(head.pages));
            insertion.bind(5, static_cast<std::int64_t>(head.bytes));
            insertion.bind(6, head.sha256);
            insertion.bind(7, static_cast<std::int64_t>(now));
            insertion.exec();
        });
    }

    void dropUnfinishedPage(std::string const& packId) override {
        orError([&] {
            SQLite::Statement deletion(database_,
                                       "DELETE FROM pieces WHERE pack = ?1 AND position >= (SELECT "
                                       "ifnull(max(position) + 1, 0) FROM pages WHERE pack = ?1)");
            deletion.bind(1, numberOf(database_, packId));
            deletion.exec();
        });
    }

    void store(std::string const& packId, std::vector<PagePiece> const& pieces, long long now) override {
        orError([&] {
            SQLite::Transaction transaction(database_, SQLite::TransactionBehavior::IMMEDIATE);
            std::int64_t const number = numberOf(database_, packId);
            SQLite::Statement piece(database_, "INSERT INTO pieces VALUES (?, ?, ?, ?)");
            SQLite::Statement page(database_, "INSERT INTO pages VALUES (?, ?, ?, ?, ?, ?)");
            for (PagePiece const& each : pieces) {
                insertPiece(piece, number, each);
                if (each.completes)
                    insertPage(page, number, each.position, *each.completes);
            }
            touch(number, "state", now);
            transaction.commit();
        });
    }

    void complete(std::string const& packId, long long now) override {
        orError([&] { touch(numberOf(database_, packId), "'complete'", now); });
    }

    bool eraseSome(std::string const& packId) override {
        return orError([&] {
            std::int64_t const number = numberOf(database_, packId);
            try {
                return eraseRows(number, SOME_ROWS);
            } catch (SQLite::Exception const& failure) {
                if (failure.getErrorCode() != SQLITE_FULL)
                    throw;
                // What is overwritten is kept in a journal until that is done.
                reserve_.giveUp();
                return eraseRows(number, 1);
            }
        });
    }

    void forget(std::string const& packId) override {
        while (eraseSome(packId)) {
        }
        orError([&] {
            SQLite::Statement deletion(database_, "DELETE FROM packs WHERE id = ?");
            deletion.bind(1, packId);
            deletion.exec();
        });
    }

    std::unique_ptr<Mailing::PackSource> open(std::string const& packId) const override {
        return orError([&] { return std::make_unique<StoredPack>(file_, packId); });
    }

private:
    static void insertPiece(SQLite::Statement& insertion, std::int64_t pack, PagePiece const& piece) {
        insertion.reset();
        insertion.bind(1, pack);
        insertion.bind(2, static_cast<std::int64_t>(piece.position));
        insertion.bind(3, static_cast<std::int64_t>(piece.number));
        insertion.bindNoCopy(4, piece.bytes.data(), static_cast<int>(piece.bytes.size()));
        insertion.exec();
    }

    static void insertPage(SQLite::Statement& insertion, std::int64_t pack, long long position,
                           KeptPage const& page) {
        insertion.reset();
        insertion.bind(1, pack);
        insertion.bind(2, static_cast<std::int64_t>(position));
        insertion.bind(3, page.document);
        insertion.bind(4, page.page);
        insertion.bind(5, static_cast<std::int64_t>(page.size));
        insertion.bind(6, page.sha256);
        insertion.exec();
    }

    void touch(std::int64_t number, std::string const& state, long long now) {
        SQLite::Statement change(database_,
                                 "UPDATE packs SET state = " + state + ", touched_at = ? WHERE number = ?");
        change.bind(1, static_cast<std::int64_t>(now));
        change.bind(2, number);
        change.exec();
    }

    bool eraseRows(std::int64_t number, int rows) {
        SQLite::Transaction transaction(database_, SQLite::TransactionBehavior::IMMEDIATE);
        int changed = change("UPDATE packs SET state = 'erased', title = '' WHERE number = ? AND (state <> "
                             "'erased' OR title <> '')",
                             number);
        for (std::string const table : {"pieces", "pages"})
            changed += change("DELETE FROM " + table + " WHERE rowid IN (SELECT rowid FROM " + table +
                                  " WHERE pack = ? LIMIT " + std::to_string(rows) + ")",
                              number);
        transaction.commit();
        database_.exec(std::string("PRAGMA incremental_vacuum(") + SOME_PAGES + ")");
        if (changed == 0)
            reserve_.take();
        return changed > 0;
    }

    int change(std::string const& sql, std::int64_t number) {
        SQLite::Statement statement(database_, sql);
        statement.bind(1, number);
        return statement.exec();
    }

    fs::path file_;
    SQLite::Database database_;
    Reserve reserve_{file_.string() + ".reserve"};
};

} // namespace

PackStore::~PackStore() = default;

Database::DatabaseKind const& packStoreDatabase() {
    static Database::DatabaseKind const kind{"pack store", APPLICATION_ID, {SCHEMA_1}, BEGINNING};
    return kind;
}

std::unique_ptr<PackStore> openSqlitePackStore(fs::path const& file) {
    return std::make_unique<SqlitePackStore>(file);
}

} // namespace VlServiced

#include "programs/vlserviced/store/pack_store.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/database/postgres_connection.h"
#include "programs/database/sqlite_connection.h"
#include "programs/mailing/page_blob.h"

#include <algorithm>
#include <cstdint>
#include <fcntl.h>
#include <functional>
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
constexpr char const* BEGINNING = "PRAGMA page_size = 32768; PRAGMA auto_vacuum = INCREMENTAL; PRAGMA cache_size = -8192";

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

/// Who takes hold of a pack makes it greater.
constexpr char const* SCHEMA_2 = "ALTER TABLE packs ADD COLUMN fence INTEGER NOT NULL DEFAULT 0;";

/// Compressed pages are compressed no further.
constexpr char const* POSTGRES_1 = "ALTER TABLE pieces ALTER COLUMN data SET STORAGE EXTERNAL;";

constexpr std::pair<State, char const*> STATES[] = {
    {State::Open, "open"}, {State::Complete, "complete"}, {State::Erased, "erased"}};

State stateNamed(std::string const& name) {
    auto const found = std::ranges::find_if(STATES, [&](auto const& row) { return row.second == name; });
    if (found == std::end(STATES))
        throw Base::Error(Base::Code::VersionMismatch,
                          "the pack store has a pack in the state \"" + name +
                              "\", which this program does not know: use the version that wrote it");
    return found->first;
}

/// Rows that are erased in one go: pieces of a MiB at the most. One by one where there is no room on the disk
/// for taking that back.
constexpr int SOME_ROWS = 64;
/// Of the file, given back to the disk in one go.
constexpr char const* SOME_PAGES = "1024";
constexpr std::size_t MAX_PIECE_BYTES = 8 << 20;
constexpr int BUSY_TIMEOUT_MS = 60'000;

std::string inWords(Database::QueryError const& failure) {
    switch (failure.kind()) {
    case Database::QueryError::Kind::Full:
        return "there is no room on the disk of the service: make room and send it again";
    case Database::QueryError::Kind::Constraint:
        return "a page of it comes twice";
    default:
        return std::string("the pack store of the service failed: ") + failure.what();
    }
}

template<typename Operation>
decltype(auto) orError(Operation operation) {
    try {
        return operation();
    } catch (Database::QueryError const& failure) {
        throw Base::Error(failure.code(), inWords(failure));
    }
}

constexpr char const* SELECT_PACKS =
    "SELECT id, cfg_id, title, pages, bytes, sha256, state, touched_at, fence FROM packs ";

KeptPack packIn(Database::Rows const& row) {
    KeptPack pack;
    pack.head.info = {row.text(0), row.text(1), row.text(2)};
    pack.head.pages = row.number(3);
    pack.head.bytes = row.number(4);
    pack.head.sha256 = row.text(5);
    pack.state = stateNamed(row.text(6));
    pack.touchedAt = row.number(7);
    pack.fence = row.number(8);
    return pack;
}

std::optional<KeptPack> packOf(Database::Connection& database, std::string const& packId) {
    Database::Rows rows = database.query(std::string(SELECT_PACKS) + "WHERE id = $1", packId);
    return rows.next() ? std::optional(packIn(rows)) : std::nullopt;
}

long long numberOf(Database::Connection& database, std::string const& packId) {
    Database::Rows rows = database.query("SELECT number FROM packs WHERE id = $1", packId);
    if (!rows.next())
        throw Base::Error(Base::Code::MailingUnknown,
                          "the service has no pack " + packId + ": send it again");
    return rows.number(0);
}

/// A complete pack, read over a connection of its own.
class StoredPack : public Mailing::PackSource {
public:
    StoredPack(std::unique_ptr<Database::Connection> database, std::string const& packId)
        : PackSource(packId), database_(std::move(database)) {
        std::optional<KeptPack> const pack = packOf(*database_, packId);
        if (!pack || pack->state != State::Complete)
            throw Base::Error(Base::Code::MailingUnknown,
                              "the service has no finished pack " + packId + ": send it again");
        info_ = pack->head.info;
        number_ = numberOf(*database_, packId);
        readNames(pack->head.pages);
    }

    Mailing::PackInfo const& info() const override { return info_; }
    std::vector<PageName> const& pages() const override { return pages_; }
    SharedMemBuffer metadata() override { return load({}, {}); }

private:
    void readNames(long long metadataAt) {
        Database::Rows rows = database_->query(
            "SELECT document, page FROM pages WHERE pack = $1 AND position < $2 ORDER BY position", number_,
            metadataAt);
        while (rows.next())
            pages_.emplace_back(rows.text(0), rows.text(1));
    }

    SharedMemBuffer load(std::string const& document, std::string const& page) override {
        return orError([&] {
            Database::Rows rows = database_->query("SELECT position, size, sha256 FROM pages WHERE pack = $1 "
                                                   "AND document = $2 AND page = $3",
                                                   number_, document, page);
            return rows.next() ? whole(rows.number(0), rows.number(1), rows.text(2)) : SharedMemBuffer();
        });
    }

    /// A piece at a time: a database may give all rows of a query at once.
    SharedMemBuffer whole(long long position, long long size, std::string const& sha256) {
        SharedMemBuffer data;
        data.resize(static_cast<unsigned long long>(size));
        long long filled = 0;
        for (long long after = -1; filled < size;) {
            Database::Rows rows =
                database_->query("SELECT data, number FROM pieces WHERE pack = $1 AND position = $2 AND "
                                 "number > $3 ORDER BY number LIMIT 1",
                                 number_, position, after);
            if (!rows.next())
                break;
            std::string_view const piece = rows.bytes(0);
            auto const length = std::min(static_cast<long long>(piece.size()), size - filled);
            std::copy_n(piece.data(), length, reinterpret_cast<char*>(data.data()) + filled);
            filled += length;
            after = rows.number(1);
        }
        if (filled != size || Base::sha256(Mailing::viewOf(data)) != sha256)
            throw Base::Error(Base::Code::MailingDamaged, "page " + std::to_string(position + 1) +
                                                              " of pack " + packId() +
                                                              " is damaged in the pack store of the service");
        return data;
    }

    std::unique_ptr<Database::Connection> database_;
    Mailing::PackInfo info_;
    long long number_ = 0;
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

class DatabasePackStore : public PackStore {
public:
    /// `connect` opens further connections to the same database; `reserve` is null where the disk is not
    /// that of this machine.
    DatabasePackStore(std::unique_ptr<Database::Connection> database,
                      std::function<std::unique_ptr<Database::Connection>()> connect,
                      std::unique_ptr<Reserve> reserve)
        : database_(std::move(database)), connect_(std::move(connect)), reserve_(std::move(reserve)) {}

    std::optional<KeptPack> find(std::string const& packId) override {
        return orError([&] { return packOf(*database_, packId); });
    }

    std::vector<KeptPack> all() override {
        return orError([&] {
            Database::Rows rows = database_->query(SELECT_PACKS);
            std::vector<KeptPack> packs;
            while (rows.next())
                packs.push_back(packIn(rows));
            return packs;
        });
    }

    long long bytesOf(std::string const& cfgId) override {
        return orError([&] {
            return database_->number("SELECT sum(bytes) FROM packs WHERE cfg_id = $1 AND state <> 'erased'",
                                     cfgId);
        });
    }

    std::vector<KeptPage> pagesOf(std::string const& packId) override {
        return orError([&] {
            Database::Rows rows = database_->query(
                "SELECT document, page, size, sha256 FROM pages WHERE pack = $1 ORDER BY position",
                numberOf(*database_, packId));
            std::vector<KeptPage> pages;
            while (rows.next())
                pages.push_back({rows.text(0), rows.text(1), rows.number(2), rows.text(3)});
            return pages;
        });
    }

    void add(PackHead const& head, long long now) override {
        orError([&] {
            database_->change(
                "INSERT INTO packs (id, cfg_id, title, pages, bytes, sha256, state, touched_at) "
                "VALUES ($1, $2, $3, $4, $5, $6, 'open', $7) ON CONFLICT DO NOTHING",
                head.info.id, head.info.cfgId, head.info.title, head.pages, head.bytes, head.sha256, now);
        });
    }

    long long takeHold(std::string const& packId) override {
        return orError([&] {
            Database::Transaction transaction(*database_);
            if (database_->change("UPDATE packs SET fence = fence + 1 WHERE id = $1 AND state = 'open'",
                                  packId) == 0)
                refuseNotOpen(packId);
            database_->change("DELETE FROM pieces WHERE pack = $1 AND position >= (SELECT "
                              "coalesce(max(position) + 1, 0) FROM pages WHERE pack = $1)",
                              numberOf(*database_, packId));
            long long const fence = database_->number("SELECT fence FROM packs WHERE id = $1", packId);
            transaction.commit();
            return fence;
        });
    }

    void store(std::string const& packId, long long fence, std::vector<PagePiece> const& pieces,
               long long now) override {
        orError([&] {
            Database::Transaction transaction(*database_);
            // Before all else, so that nobody takes hold of it in between.
            changeHeld("touched_at = $1", packId, fence, now);
            long long const number = numberOf(*database_, packId);
            for (std::size_t at = 0; at < pieces.size();)
                at = insertPieces(number, pieces, at);
            transaction.commit();
        });
    }

    void complete(std::string const& packId, long long fence, long long now) override {
        orError([&] { changeHeld("state = 'complete', touched_at = $1", packId, fence, now); });
    }

    bool touch(std::string const& packId, long long now) override {
        return orError([&] {
            return database_->change("UPDATE packs SET touched_at = $1 WHERE id = $2 AND state = 'complete'",
                                     now, packId) == 1;
        });
    }

    void refuse(std::string const& packId, long long fence) override {
        orError([&] {
            database_->change(
                "UPDATE packs SET state = 'erased' WHERE id = $1 AND fence = $2 AND state = 'open'", packId,
                fence);
        });
    }

    void retire(std::string const& packId, long long touchedBefore) override {
        orError([&] {
            database_->change("UPDATE packs SET state = 'erased' WHERE id = $1 AND touched_at <= $2", packId,
                              touchedBefore);
        });
    }

    bool eraseSome(std::string const& packId) override {
        return eraseInRoom(packId, "(state <> 'erased' OR title <> '')");
    }

    bool eraseMore(std::string const& packId) override {
        return eraseInRoom(packId, "state = 'erased' AND title <> ''");
    }

    void forget(std::string const& packId) override {
        while (eraseMore(packId)) {
        }
        orError([&] { database_->change("DELETE FROM packs WHERE id = $1 AND state = 'erased'", packId); });
    }

    std::unique_ptr<Mailing::PackSource> open(std::string const& packId) const override {
        return orError([&] { return std::make_unique<StoredPack>(connect_(), packId); });
    }

private:
    /// Those of one page that come together are a piece, of 8 MiB at the most where others share the server;
    /// gives the place behind them.
    std::size_t insertPieces(long long pack, std::vector<PagePiece> const& pieces, std::size_t first) {
        PagePiece last = pieces[first];
        std::size_t end = first + 1;
        std::string joined;
        std::size_t const most = database_->isSqlite() ? 0 : MAX_PIECE_BYTES;
        for (; end < pieces.size() && pieces[end].position == last.position &&
               std::max(joined.size(), last.bytes.size()) + pieces[end].bytes.size() <= most;
             ++end) {
            if (joined.empty())
                joined = last.bytes;
            joined += pieces[end].bytes;
            last.completes = pieces[end].completes;
        }
        database_->change("INSERT INTO pieces (pack, position, number, data) VALUES ($1, $2, $3, $4)", pack,
                          last.position, last.number,
                          Database::Bytes{joined.empty() ? last.bytes : std::string_view(joined)});
        if (last.completes)
            insertPage(pack, last.position, *last.completes);
        return end;
    }

    void insertPage(long long pack, long long position, KeptPage const& page) {
        database_->change("INSERT INTO pages (pack, position, document, page, size, sha256) "
                          "VALUES ($1, $2, $3, $4, $5, $6)",
                          pack, position, page.document, page.page, page.size, page.sha256);
    }

    /// `marked` says of which packs the mark is to be made that they are erased.
    bool eraseInRoom(std::string const& packId, std::string const& marked) {
        return orError([&] {
            try {
                return eraseRows(packId, marked, SOME_ROWS);
            } catch (Database::QueryError const& failure) {
                if (failure.kind() != Database::QueryError::Kind::Full || !reserve_)
                    throw;
                // What is overwritten is kept in a journal until that is done.
                reserve_->giveUp();
                return eraseRows(packId, marked, 1);
            }
        });
    }

    bool eraseRows(std::string const& packId, std::string const& marked, int rows) {
        Database::Transaction transaction(*database_);
        long long changed = database_->change(
            "UPDATE packs SET state = 'erased', title = '' WHERE id = $1 AND " + marked, packId);
        std::string const row = database_->rowId();
        for (std::string const table : {"pieces", "pages"})
            changed += database_->change("DELETE FROM " + table + " WHERE " + row + " IN (SELECT " + row +
                                             " FROM " + table +
                                             " WHERE pack = (SELECT number FROM packs WHERE id = $1 AND "
                                             "state = 'erased') LIMIT " +
                                             std::to_string(rows) + ")",
                                         packId);
        transaction.commit();
        if (reserve_)
            giveRoomBack(changed == 0);
        return changed > 0;
    }

    /// Of a pack that nobody has taken hold of since.
    void changeHeld(std::string const& assignments, std::string const& packId, long long fence,
                    long long now) {
        if (database_->change("UPDATE packs SET " + assignments +
                                  " WHERE id = $2 AND fence = $3 AND state = 'open'",
                              now, packId, fence) == 0)
            refuseNotOpen(packId);
    }

    [[noreturn]] void refuseNotOpen(std::string const& packId) {
        if (packOf(*database_, packId))
            throw Base::Error(Base::Code::LeaseLost,
                              "pack " + packId +
                                  " is none that this connection sends: another one goes on with it");
        throw Base::Error(Base::Code::MailingUnknown,
                          "the service has no open pack " + packId + ": send it again");
    }

    void giveRoomBack(bool isDone) {
        database_->run(std::string("PRAGMA incremental_vacuum(") + SOME_PAGES + ")");
        if (isDone)
            reserve_->take();
    }

    std::unique_ptr<Database::Connection> database_;
    std::function<std::unique_ptr<Database::Connection>()> connect_;
    std::unique_ptr<Reserve> reserve_;
};

} // namespace

PackStore::~PackStore() = default;

Database::DatabaseKind const& packStoreDatabase() {
    static Database::DatabaseKind const kind{
        "pack store", APPLICATION_ID, {{SCHEMA_1, "", POSTGRES_1}, SCHEMA_2}, BEGINNING};
    return kind;
}

std::unique_ptr<PackStore> openSharedPackStore(std::string const& address) {
    auto const connect = [address] { return std::make_unique<Database::PostgresConnection>(address); };
    return std::make_unique<DatabasePackStore>(connect(), connect, nullptr);
}

std::unique_ptr<PackStore> openSqlitePackStore(fs::path const& file) {
    return std::make_unique<DatabasePackStore>(
        std::make_unique<Database::SqliteConnection>(
            Database::openDatabase(file, packStoreDatabase(), Database::Journal::Rollback)),
        [file] {
            return std::make_unique<Database::SqliteConnection>(
                SQLite::Database(file, SQLite::OPEN_READONLY, BUSY_TIMEOUT_MS));
        },
        std::make_unique<Reserve>(file.string() + ".reserve"));
}

} // namespace VlServiced

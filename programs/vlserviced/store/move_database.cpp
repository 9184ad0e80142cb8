#include "programs/vlserviced/store/move_database.h"

#include "programs/base/error.h"
#include "programs/base/file_descriptor.h"
#include "programs/database/postgres_connection.h"
#include "programs/database/sqlite_connection.h"
#include "programs/database/table_copy.h"
#include "programs/vlserviced/store/data_folder.h"
#include "programs/vlserviced/store/job_store.h"
#include "programs/vlserviced/store/pack_store.h"
#include "programs/vlserviced/store/schema.h"

#include <utility>
#include <vector>

namespace VlServiced {
namespace {

namespace fs = std::filesystem;

using Database::Table;
using Database::TableSum;

fs::path movedNameOf(fs::path const& file) { return file.string() + ".moved"; }

std::unique_ptr<Database::Connection> openPacks(fs::path const& file) {
    return std::make_unique<Database::SqliteConnection>(
        Database::openDatabase(file, packStoreDatabase(), Database::Journal::Rollback));
}

/// A new database has the root of the settings and nothing else.
void requireEmpty(Database::Connection& target, std::vector<Table> const& tables,
                  std::string const& inWords) {
    for (Table const& table : tables) {
        long long const rows = target.number("SELECT count(*) FROM " + table.name);
        if (rows > (table.name == "nodes" ? 1 : 0))
            throw Base::Error(Base::Code::DatabaseUnusable,
                              inWords + " holds something already: name an empty database");
    }
}

void copyAll(Database::Connection& from, Database::Connection& to, std::vector<Table> const& tables,
             MovedRecord& record) {
    for (Table const& table : tables) {
        TableSum const sum = Database::copyTable(from, to, table);
        if (!(Database::sumOf(to, table) == sum))
            throw Base::Error(Base::Code::DatabaseFailed,
                              "the table " + table.name +
                                  " is not the same in the new database: nothing was moved");
        Database::goOnNumbering(to, table);
        record.rows += sum.rows;
        ++record.tables;
    }
}

/// The files under their new names, and back unless it is to stay so.
class Renamed {
public:
    explicit Renamed(std::vector<fs::path> files) : files_(std::move(files)) {
        for (fs::path const& file : files_)
            fs::rename(file, movedNameOf(file));
        Base::syncFolder(Base::folderOf(files_.front()));
    }
    ~Renamed() {
        if (stays_)
            return;
        std::error_code ignored;
        for (fs::path const& file : files_)
            fs::rename(movedNameOf(file), file, ignored);
    }
    Renamed(Renamed const&) = delete;
    Renamed& operator=(Renamed const&) = delete;

    void stay() { stays_ = true; }

private:
    std::vector<fs::path> files_;
    bool stays_ = false;
};

/// Never in use at both places: when nobody knows whether it has arrived, at neither.
void commit(Database::Transaction& transaction, Renamed& renamed, std::string const& inWords) {
    try {
        transaction.commit();
        renamed.stay();
    } catch (Database::QueryError const& failure) {
        if (failure.kind() != Database::QueryError::Kind::Lost)
            throw;
        renamed.stay();
        throw Base::Error(
            Base::Code::DatabaseUnavailable,
            inWords + " was lost at the end: where it has tables by now all was moved; else give the files "
                      "service.db.moved and packs.db.moved their former names and try again");
    }
}

MovedRecord copyFolder(DataFolder const& data, Database::Connection& target, std::string const& inWords) {
    auto const database = openServiceDatabase(data.database());
    auto const packs = openPacks(data.packs());
    std::vector<Table> const tables = Database::tablesOf(*database);
    std::vector<Table> const ofPacks = Database::tablesOf(*packs);
    requireEmpty(target, ofPacks, inWords);
    requireEmpty(target, tables, inWords);
    target.change("DELETE FROM nodes");
    MovedRecord record;
    copyAll(*database, target, tables, record);
    copyAll(*packs, target, ofPacks, record);
    JobStore(target).freeAll();
    database->emptyLog();
    return record;
}

} // namespace

MovedRecord moveToPostgres(DataFolder const& data, std::string const& address) {
    requireNotMoved(data);
    if (!fs::exists(data.database()))
        throw Base::Error(Base::Code::DatabaseMissing, "there is no service database in " +
                                                           data.path().string() +
                                                           ": name the data folder of the service by --data");
    Database::requirePostgresAddress(address);
    std::string const inWords = "the database " + Database::shownPostgresAddress(address);
    Database::PostgresConnection target(address);
    Database::Transaction transaction(target);
    Database::migratePostgres(target, serviceDatabase(), address);
    Database::migratePostgres(target, packStoreDatabase(), address);
    MovedRecord const record = copyFolder(data, target, inWords);
    Renamed renamed({data.database(), data.packs()});
    commit(transaction, renamed, inWords);
    return record;
}

void requireNotMoved(DataFolder const& data) {
    fs::path const moved = movedNameOf(data.database());
    if (fs::exists(moved) && !fs::exists(data.database()))
        throw Base::Error(Base::Code::DatabaseUnusable,
                          "the database of " + data.path().string() +
                              " was moved to PostgreSQL: name that one by --database (" + moved.string() +
                              " is what was moved)");
}

void requireMoved(DataFolder const& data, std::string const& address) {
    if (fs::exists(data.database()))
        throw Base::Error(Base::Code::DatabaseUnusable,
                          "all that this service knows is in " + data.database().string() +
                              ": move it by --migrate-to in place of --database, or remove the file where "
                              "nothing of it is wanted");
    if (!fs::exists(movedNameOf(data.database())))
        return;
    Database::requirePostgresAddress(address);
    Database::PostgresConnection target(address);
    if (target.number("SELECT count(*) FROM pg_tables WHERE schemaname = current_schema() AND tablename = "
                      "'jobs'") == 0)
        throw Base::Error(Base::Code::DatabaseUnusable,
                          "the database " + Database::shownPostgresAddress(address) +
                              " has no tables, and the one of " + data.path().string() +
                              " was moved: name the one that it was moved to, or give the files "
                              "service.db.moved and packs.db.moved their former names and move them again");
}

void copyFromPostgres(std::string const& address, fs::path const& database, fs::path const& packs) {
    Database::requirePostgresAddress(address);
    Database::PostgresConnection source(address);
    Database::Transaction const moment(source, Database::Transaction::SNAPSHOT);
    MovedRecord ignored;
    auto const copyInto = [&](Database::Connection& target) {
        Database::Transaction transaction(target);
        std::vector<Table> const tables = Database::tablesOf(target);
        copyAll(source, target, tables, ignored);
        transaction.commit();
    };
    auto const record = openServiceDatabase(database);
    record->change("DELETE FROM nodes");
    copyInto(*record);
    record->run("PRAGMA journal_mode = DELETE");
    copyInto(*openPacks(packs));
}

} // namespace VlServiced

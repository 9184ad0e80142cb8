#pragma once
// The service's database of each kind, for tests of what is kept in it.

#include "programs/database/postgres_connection.h"
#include "programs/database/sqlite_connection.h"
#include "programs/vlserviced/store/schema.h"
#include "tests/support/postgres_server.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <memory>
#include <optional>
#include <string>

namespace VLServiceTest {

/// A test that is run once with SQLite and once with PostgreSQL.
class OnEachDatabase : public testing::TestWithParam<Database::Backend> {
public:
    static std::string nameOf(testing::TestParamInfo<Database::Backend> const& info) {
        return info.param == Database::Backend::Sqlite ? "Sqlite" : "PostgreSql";
    }

protected:
    OnEachDatabase() {
        if (GetParam() == Database::Backend::PostgreSql)
            postgres_.emplace();
        database_ = open();
    }
    void SetUp() override {
        if (postgres_ && !postgres_->whyNot().empty())
            GTEST_SKIP() << postgres_->whyNot();
    }

    bool isPostgres() const { return postgres_ && postgres_->whyNot().empty(); }
    /// A further connection to the same database.
    std::unique_ptr<Database::Connection> open() {
        return isPostgres() ? VlServiced::openSharedDatabase(postgres_->address()).connection
                            : VlServiced::openServiceDatabase(folder_ / "service.db");
    }

    TemporaryFolder folder_;
    std::optional<PostgresDatabase> postgres_;
    std::unique_ptr<Database::Connection> database_;
};

} // namespace VLServiceTest

/// Has the tests of a class that derives from OnEachDatabase run with both.
#define VLSERVICE_ON_EACH_DATABASE(Tests)                                                                    \
    INSTANTIATE_TEST_SUITE_P(On, Tests,                                                                      \
                             testing::Values(Database::Backend::Sqlite, Database::Backend::PostgreSql),      \
                             VLServiceTest::OnEachDatabase::nameOf)

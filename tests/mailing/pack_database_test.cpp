#include "programs/mailing/pack_database.h"

#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"

#include <SQLiteCpp/Exception.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>

namespace {

namespace fs = std::filesystem;

using Mailing::PackDatabaseReader;
using Mailing::PackDatabaseWriter;

SharedMemBuffer zipped(std::string const& text) { return PageSaverI::zipDbData(text.data(), text.size()); }

std::string text(SharedMemBuffer const& blob) {
    SharedMemBuffer const data = PageLoaderI::unzipDbData(blob);
    return data.empty() ? "" : std::string(reinterpret_cast<char const*>(data.data()), data.size());
}

class PackDatabase : public testing::Test {
protected:
    void storePack(std::string const& id) {
        PackDatabaseWriter writer(file_, {id, "u=bob/a=acme", "Bills"});
        writer.savePage("one.pdf", "1", zipped("page one"));
        writer.savePage("one.pdf", "2", zipped("page two"));
        writer.savePage("two.pdf", "1", zipped("page three"));
        writer.finish(zipped("metadata"));
    }
    std::string page(Mailing::PackSource& reader, std::string const& document, std::string const& name) {
        std::string result = "not called";
        reader.requestPageData(document, name, [&](SharedMemBuffer const& data) { result = text(data); });
        return result;
    }
    std::string readingFailure(std::string const& id) {
        return failureOf([&] { PackDatabaseReader(file_, id); });
    }
    std::string noSuchPack(std::string const& id) {
        return "the pack database " + file_.string() + " has no finished pack " + id;
    }
    void run(char const* sql) { SQLite::Database(file_, SQLite::OPEN_READWRITE).exec(sql); }

    TemporaryFolder folder_;
    fs::path file_ = folder_ / "packs.db";
};

TEST_F(PackDatabase, GivesBackWhatWasStored) {
    storePack("p1");
    PackDatabaseReader reader(file_, "p1");
    EXPECT_EQ(reader.packId(), "p1");
    EXPECT_EQ(reader.info().cfgId, "u=bob/a=acme");
    EXPECT_EQ(reader.info().title, "Bills");
    EXPECT_EQ(reader.documentCount(), 2u);
    ASSERT_EQ(reader.pages().size(), 3u);
    EXPECT_EQ(reader.pages()[1].document, "one.pdf");
    EXPECT_EQ(reader.pages()[1].page, "2");
    EXPECT_EQ(page(reader, "one.pdf", "2"), "page two");
    EXPECT_EQ(page(reader, "two.pdf", "1"), "page three");
    EXPECT_EQ(page(reader, "one.pdf", "1"), "page one");
    EXPECT_EQ(text(reader.metadata()), "metadata");
    EXPECT_TRUE(reader.nothingPening());
}

TEST_F(PackDatabase, AnswersWithNoDataForAPageThatItDoesNotHave) {
    storePack("p1");
    PackDatabaseReader reader(file_, "p1");
    EXPECT_EQ(page(reader, "one.pdf", "9"), "");
    EXPECT_EQ(page(reader, "nine.pdf", "1"), "");
}

TEST_F(PackDatabase, KeepsPagesInTheOrderInWhichTheyWereStored) {
    {
        PackDatabaseWriter writer(file_, {"p1", "", ""});
        for (int number = 12; number > 0; --number)
            writer.savePage("doc", std::to_string(number), zipped("x"));
        writer.finish(zipped(""));
    }
    PackDatabaseReader const reader(file_, "p1");
    EXPECT_EQ(reader.pages().front().page, "12");
    EXPECT_EQ(reader.pages().back().page, "1");
}

TEST_F(PackDatabase, ShowsAPackOnlyWhenItIsFinished) {
    storePack("other");
    PackDatabaseWriter writer(file_, {"p1", "", ""});
    writer.savePage("one.pdf", "1", zipped("page"));
    EXPECT_EQ(readingFailure("p1"), noSuchPack("p1"));
    writer.finish(zipped(""));
    EXPECT_EQ(readingFailure("p1"), "nothing was thrown");
    EXPECT_EQ(readingFailure("p2"), noSuchPack("p2"));
}

TEST_F(PackDatabase, ShowsAStoredPackToWhoLooksForUnfinishedOnesUntilItIsFinished) {
    using Sees = Mailing::OwnPackReader::Sees;
    PackDatabaseWriter writer(file_, {"p1", "", ""});
    writer.savePage("one.pdf", "1", zipped("page"));
    writer.store(zipped("metadata"));
    EXPECT_EQ(readingFailure("p1"), noSuchPack("p1"));
    {
        Mailing::OwnPackReader reader(file_, "p1", Sees::Unfinished);
        EXPECT_EQ(page(reader, "one.pdf", "1"), "page");
        EXPECT_EQ(text(reader.metadata()), "metadata");
    }
    writer.finish();
    EXPECT_EQ(readingFailure("p1"), "nothing was thrown");
    EXPECT_THROW(Mailing::OwnPackReader(file_, "p1", Sees::Unfinished), Database::DatabaseError);
}

TEST_F(PackDatabase, LeavesNothingOfAPackThatIsDropped) {
    PackDatabaseWriter writer(file_, {"p1", "", ""});
    writer.savePage("one.pdf", "1", zipped("page"));
    writer.store(zipped("metadata"));
    writer.drop();
    SQLite::Database database(file_);
    EXPECT_EQ(database.execAndGet("SELECT count(*) FROM packs").getInt(), 0);
    EXPECT_EQ(database.execAndGet("SELECT count(*) FROM pages").getInt(), 0);
}

TEST_F(PackDatabase, LeavesNothingOfAPackThatWasNotFinished) {
    {
        PackDatabaseWriter writer(file_, {"p1", "", ""});
        writer.savePage("one.pdf", "1", zipped("page"));
    }
    SQLite::Database database(file_);
    EXPECT_EQ(database.execAndGet("SELECT count(*) FROM packs").getInt(), 0);
    EXPECT_EQ(database.execAndGet("SELECT count(*) FROM pages").getInt(), 0);
}

TEST_F(PackDatabase, CanBeReadWhileALargePackIsStored) {
    storePack("p1");
    SharedMemBuffer blob;
    blob.resize(9 << 20);
    std::fill(blob.data(), blob.data() + blob.size(), static_cast<unsigned char>('x'));
    {
        PackDatabaseWriter writer(file_, {"large", "", ""});
        for (char const* name : {"1", "2", "3"}) {
            writer.savePage("doc", name, blob);
            EXPECT_EQ(readingFailure("p1"), "nothing was thrown");
            EXPECT_EQ(readingFailure("large"), noSuchPack("large"));
        }
        EXPECT_GT(SQLite::Database(file_).execAndGet("SELECT count(*) FROM pages").getInt(), 3);
    }
    EXPECT_EQ(SQLite::Database(file_).execAndGet("SELECT count(*) FROM pages").getInt(), 3);
}

TEST_F(PackDatabase, StoresSeveralPacksAtOnce) {
    PackDatabaseWriter one(file_, {"one", "", ""});
    PackDatabaseWriter two(file_, {"two", "", ""});
    one.savePage("doc", "1", zipped("x"));
    two.savePage("doc", "1", zipped("y"));
    one.finish(zipped("{}"));
    two.finish(zipped("{}"));
    EXPECT_EQ(PackDatabaseReader(file_, "one").pages().size(), 1u);
    EXPECT_EQ(PackDatabaseReader(file_, "two").pages().size(), 1u);
}

TEST_F(PackDatabase, ForgetsWhatACrashLeftADayAgo) {
    storePack("kept");
    run("INSERT INTO packs (id, cfg_id, title, created_at) VALUES ('old', '', '', 5)");
    run("INSERT INTO pages VALUES ('old', 0, 'd', 'p', x'00')");
    storePack("new");
    SQLite::Database database(file_);
    EXPECT_EQ(database.execAndGet("SELECT group_concat(id, ' ') FROM (SELECT id FROM packs ORDER BY id)")
                  .getString(),
              "kept new");
    EXPECT_EQ(database.execAndGet("SELECT count(*) FROM pages WHERE pack = 'old'").getInt(), 0);
}

TEST_F(PackDatabase, TakesAnIdThatWasNotFinishedOnceMoreAndAFinishedOneNever) {
    storePack("p1");
    run("UPDATE packs SET complete = 0");
    storePack("p1");
    EXPECT_EQ(failureOf([&] { storePack("p1"); }),
              "the pack database " + file_.string() + " has a pack p1 already");
    EXPECT_EQ(PackDatabaseReader(file_, "p1").pages().size(), 3u);
}

TEST_F(PackDatabase, RefusesPagesThatItCannotKeep) {
    PackDatabaseWriter writer(file_, {"p1", "", ""});
    writer.savePage("doc", "1", zipped("x"));
    EXPECT_EQ(failureOf([&] { writer.savePage("doc", "2", SharedMemBuffer()); }),
              "page \"2\" of \"doc\" cannot be stored: it has 0 bytes");
    EXPECT_EQ(failureOf([&] {
                  writer.savePage("doc", "1", zipped("y"));
                  writer.finish(zipped("{}"));
              }),
              "the pack database " + file_.string() +
                  " failed: UNIQUE constraint failed: pages.pack, pages.document, pages.page");
}

TEST_F(PackDatabase, RefusesIdsThatCannotNameAFile) {
    for (std::string const id : {"", "../x", "a/b", ".hidden", "a\nb", "\xFF"})
        EXPECT_EQ(failureOf([&] {
                      PackDatabaseWriter(file_, {id, "", ""});
                  }),
                  "the pack id \"" + id + "\" cannot name a file");
    EXPECT_TRUE(Mailing::isPackId(std::string(128, 'x')));
    EXPECT_FALSE(Mailing::isPackId(std::string(129, 'x')));
    EXPECT_TRUE(Mailing::isPackId("Bills of March, 2"));
}

TEST_F(PackDatabase, RemovesAPackWithItsPages) {
    storePack("p1");
    storePack("p2");
    Mailing::removePack(file_, "p1");
    Mailing::removePack(file_, "p9");
    EXPECT_EQ(readingFailure("p1"), noSuchPack("p1"));
    EXPECT_EQ(PackDatabaseReader(file_, "p2").pages().size(), 3u);
    EXPECT_EQ(SQLite::Database(file_).execAndGet("SELECT count(*) FROM pages").getInt(), 3);
}

TEST_F(PackDatabase, WithoutItsTablesIsNone) {
    storePack("p1");
    run("DROP TABLE pages");
    EXPECT_EQ(readingFailure("p1"), file_.string() + " is not a pack database");
}

TEST_F(PackDatabase, TellsWhenItCannotBeRead) {
    storePack("p1");
    // All but the first page, which holds the schema.
    std::string const bytes(fs::file_size(file_) - 4096, '\xFF');
    std::fstream(file_).seekp(4096) << bytes;
    EXPECT_TRUE(readingFailure("p1").starts_with("the pack database " + file_.string() + " failed: ") ||
                readingFailure("p1").starts_with("the pack database " + file_.string() + " is damaged"))
        << readingFailure("p1");
}

TEST_F(PackDatabase, IsForItsOwnerAlone) {
    storePack("p1");
    EXPECT_EQ(fs::status(file_).permissions(), fs::perms(0600));
}

TEST_F(PackDatabase, KeepsNothingOfThePacksThatWereRemoved) {
    {
        PackDatabaseWriter writer(file_, {"p1", "a=acme", "A secret title"});
        SharedMemBuffer page;
        page.resize(1 << 20);
        std::fill(page.data(), page.data() + page.size(), static_cast<unsigned char>('s'));
        writer.savePage("doc", "1", std::move(page));
        writer.finish(zipped("metadata"));
    }
    Mailing::removePack(file_, "p1");
    EXPECT_LT(fs::file_size(file_), 100'000u);
    std::ifstream in(file_, std::ios::binary);
    std::string const bytes{std::istreambuf_iterator<char>(in), {}};
    EXPECT_EQ(bytes.find("A secret title"), std::string::npos);
    EXPECT_EQ(bytes.find("ssssssss"), std::string::npos);
}

TEST_F(PackDatabase, ListsItsFinishedPacks) {
    EXPECT_TRUE(Mailing::finishedPacks(file_).empty());
    EXPECT_FALSE(fs::exists(file_));
    storePack("p1");
    PackDatabaseWriter const unfinished(file_, {"p2", "", ""});
    std::vector<Mailing::StoredPack> const packs = Mailing::finishedPacks(file_);
    ASSERT_EQ(packs.size(), 1u);
    EXPECT_EQ(packs[0].info.id, "p1");
    EXPECT_EQ(packs[0].info.cfgId, "u=bob/a=acme");
    EXPECT_EQ(packs[0].info.title, "Bills");
    EXPECT_EQ(packs[0].pages, 3);
    EXPECT_GT(packs[0].created, 0);
}

} // namespace

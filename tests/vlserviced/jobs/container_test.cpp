#include "programs/vlserviced/jobs/container.h"

#include "programs/base/pending_file.h"
#include "tests/support/failure_of.h"
#include "tests/support/small_disk.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/pack_help.h"

#include <SQLiteCpp/Database.h>
#include <gtest/gtest.h>

#include <fstream>
#include <iterator>

namespace {

namespace fs = std::filesystem;

class Container : public testing::Test {
protected:
    Container() { fs::create_directory(outbox_); }

    std::string writingFailure(std::string const& packId) {
        return failureOf([&] { write(packId); });
    }
    void write(std::string const& packId) {
        Mailing::PackDatabaseReader pages(file_, packId);
        VlServiced::writeContainer(pages, target_);
    }
    std::ptrdiff_t filesInOutbox() const { return std::distance(fs::directory_iterator(outbox_), {}); }
    void run(char const* sql) { SQLite::Database(file_, SQLite::OPEN_READWRITE).exec(sql); }

    TemporaryFolder folder_;
    fs::path file_ = folder_ / "packs.db";
    fs::path outbox_ = folder_ / "outbox";
    fs::path target_ = outbox_ / "p1.mailing";
};

TEST_F(Container, HoldsThePagesOfThePack) {
    storePack(file_, "p1");
    EXPECT_EQ(writingFailure("p1"), "nothing was thrown");
    EXPECT_EQ(contentOf(target_), contentOfPack("p1"));
    EXPECT_EQ(filesInOutbox(), 1);
}

TEST_F(Container, IsTheSameWhenItIsWrittenOnceMore) {
    storePack(file_, "p1");
    writingFailure("p1");
    EXPECT_EQ(writingFailure("p1"), "nothing was thrown");
    EXPECT_EQ(contentOf(target_), contentOfPack("p1"));
    EXPECT_EQ(filesInOutbox(), 1);
}

TEST_F(Container, IsNotWrittenOfPagesThatAreNotCompressed) {
    storePack(file_, "p1");
    for (char const* sql : {"UPDATE pages SET data = 'not compressed' WHERE position = 1",
                            "UPDATE pages SET data = x'54455A' WHERE position = 1",
                            "UPDATE pages SET data = 5 WHERE position = 1"}) {
        run(sql);
        EXPECT_EQ(writingFailure("p1"), "page 2 of the pack is not a compressed page") << sql;
        EXPECT_THROW(write("p1"), VlServiced::BadPack);
    }
    EXPECT_EQ(filesInOutbox(), 0);
}

TEST_F(Container, SaysWhyItCannotBeWritten) {
    VLServiceTest::SmallDisk const disk;
    if (!disk.whyNot().empty())
        GTEST_SKIP() << "no right to make a small disk: " << disk.whyNot();
    storePack(file_, "p1");
    target_ = fs::path(disk.path()) / "p1.mailing";
    std::ofstream(fs::path(disk.path()) / "full") << std::string(std::size_t{8} << 20, 'x');
    EXPECT_EQ(writingFailure("p1"),
              "cannot write \"" + target_.string() + "\": No space left on device; make room on the disk");
    EXPECT_FALSE(fs::exists(target_));
}

TEST_F(Container, IsNotWrittenWithoutMetadata) {
    storePack(file_, "p1");
    run("UPDATE packs SET metadata = NULL");
    EXPECT_EQ(writingFailure("p1"), "the metadata of pack p1 is not compressed");
    EXPECT_EQ(filesInOutbox(), 0);
}

TEST_F(Container, IsNotWrittenOfNamesThatItsIndexCannotHold) {
    storePack(file_, "p1");
    run("UPDATE pages SET page = char(1) WHERE position = 2");
    EXPECT_EQ(writingFailure("p1"), "page 3 of the pack has a name that a container cannot hold");
    EXPECT_EQ(filesInOutbox(), 0);
}

TEST_F(Container, IsNotWrittenIntoAFolderThatIsMissing) {
    storePack(file_, "p1");
    fs::remove(outbox_);
    EXPECT_EQ(writingFailure("p1"), "cannot write into " + outbox_.string() + ": No such file or directory");
    EXPECT_EQ(writingFailure("p2"), "the pack database " + file_.string() + " has no finished pack p2");
}

} // namespace

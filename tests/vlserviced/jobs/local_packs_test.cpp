#include "programs/vlserviced/jobs/local_packs.h"

#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/pack_help.h"

#include <gtest/gtest.h>

namespace {

namespace fs = std::filesystem;

using VlServiced::LocalPacks;

class LocalPacksTest : public testing::Test {
protected:
    LocalPacksTest() {
        fs::create_directories(packs_ / "acme");
        storePack(packs_ / "acme/packs.db", "p1");
        storePack(folder_ / "packs.db", "p1");
    }

    /// What is wrong with a database in that folder, or the pack's title.
    std::string opened(fs::path const& folder, std::string const& database = "packs.db") {
        std::string title;
        std::string const failure = failureOf([&] {
            title = LocalPacks(packs_).open({folder.string(), database, "p1"})->info().title;
        });
        return title.empty() ? failure : title;
    }
    std::string notBelow(fs::path const& file) const {
        return "the pack database " + file.string() + " does not lie below " +
               fs::canonical(packs_).string() + ", the folder of --local-packs";
    }

    TemporaryFolder folder_;
    fs::path packs_ = folder_ / "local";
};

TEST_F(LocalPacksTest, AreReadBelowTheirFolder) {
    EXPECT_EQ(opened(packs_ / "acme"), "Title of p1");
    EXPECT_EQ(opened(packs_ / "acme/../acme/"), "Title of p1");
    fs::create_directory_symlink(packs_ / "acme", packs_ / "inside");
    EXPECT_EQ(opened(packs_ / "inside"), "Title of p1") << "a link that stays inside";
}

TEST_F(LocalPacksTest, AreNotReadElsewhere) {
    EXPECT_EQ(opened(folder_.path()), notBelow(folder_ / "packs.db"));
    EXPECT_EQ(opened(packs_ / ".."), notBelow(packs_ / "../packs.db"));
    fs::create_directories(folder_ / "local2");
    storePack(folder_ / "local2/packs.db", "p1");
    EXPECT_EQ(opened(folder_ / "local2"), notBelow(folder_ / "local2/packs.db"));
    EXPECT_EQ(opened(packs_ / "none"), "there is no pack database " + (packs_ / "none/packs.db").string());
}

TEST_F(LocalPacksTest, AreNotReadThroughLinksThatLeadOut) {
    fs::create_directory_symlink(folder_.path(), packs_ / "out");
    EXPECT_EQ(opened(packs_ / "out"), notBelow(packs_ / "out/packs.db"));
    fs::create_symlink(folder_ / "packs.db", packs_ / "acme/link.db");
    EXPECT_EQ(opened(packs_ / "acme", "link.db"), notBelow(packs_ / "acme/link.db"));
}

TEST_F(LocalPacksTest, AreNotReadWithoutTheOption) {
    EXPECT_EQ(
        failureOf([&] {
            LocalPacks("").open({folder_.path().string(), "packs.db", "p1"});
        }),
        "this service takes pages over the connection alone and no pack database by its path: use a vlmail "
        "that sends them, or start vlserviced with --local-packs FOLDER on the machine of the client");
    EXPECT_EQ(failureOf([&] { LocalPacks const packs(folder_ / "none"); }),
              "the folder of --local-packs is not there: " + (folder_ / "none").string());
}

} // namespace

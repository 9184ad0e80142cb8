#include "programs/vlserviced/store/data_folder.h"

#include "programs/vlserviced/store/schema.h"
#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <fstream>
#include <unistd.h>

namespace {

namespace fs = std::filesystem;

using VlServiced::DataFolder;

TEST(DataFolder, IsMadeForItsOwnerAlone) {
    TemporaryFolder temporary;
    DataFolder const folder(temporary.path() / "a" / "b");
    EXPECT_EQ(fs::status(folder.path()).permissions(), fs::perms::owner_all);
}

TEST(DataFolder, KeepsTheRightsOfAFolderThatIsThere) {
    TemporaryFolder temporary;
    fs::permissions(temporary.path(), fs::perms(0750));
    DataFolder const folder(temporary.path());
    EXPECT_EQ(fs::status(folder.path()).permissions(), fs::perms(0750));
}

TEST(DataFolder, IsRefusedToASecondUser) {
    TemporaryFolder temporary;
    {
        DataFolder const first(temporary.path());
        EXPECT_EQ(failureOf([&] { DataFolder second(temporary.path()); }),
                  "the data folder " + temporary.path().string() +
                      " is in use by another vlserviced (process " + std::to_string(::getpid()) +
                      "): stop that one or name another folder");
    }
    EXPECT_NO_THROW(DataFolder third(temporary.path()));
}

TEST(DataFolder, ThatCannotBeMadeIsNamed) {
    TemporaryFolder temporary;
    fs::path const file = temporary / "file";
    std::ofstream(file) << "x";
    std::string const advice = "; give this user the right to, or name another folder";
    EXPECT_EQ(failureOf([&] { DataFolder folder(file); }),
              "cannot write into the folder " + file.string() + ": Not a directory" + advice);
    EXPECT_EQ(failureOf([&] { DataFolder folder(file / "below"); }),
              "cannot write into the folder " + (file / "below").string() + ": Not a directory" + advice);
}

TEST(DataFolder, ThatCannotBeWrittenIsNamed) {
    if (::geteuid() == 0 && !fs::exists("/proc/self"))
        GTEST_SKIP() << "runs as root, who may write everywhere, and there is no /proc";
    // Nobody can make files in /proc/self, not even root.
    fs::path const folder = ::geteuid() == 0 ? fs::path("/proc/self") : fs::path("/");
    std::string const text = failureOf([&] { DataFolder data(folder); });
    EXPECT_TRUE(text.starts_with("cannot write into the folder " + folder.string() + ": ")) << text;
}

TEST(DataFolder, ThatOthersMayWriteIsRefused) {
    for (auto const rights : {0777, 0770, 0702}) {
        TemporaryFolder temporary;
        fs::permissions(temporary.path(), fs::perms(rights));
        EXPECT_EQ(failureOf([&] { DataFolder folder(temporary.path()); }),
                  "others may write into the data folder " + temporary.path().string() +
                      ": take their right away (chmod go-w)");
    }
}

TEST(DataFolder, OfAnotherUserIsRefused) {
    if (::geteuid() != 0)
        GTEST_SKIP() << "only root can give a folder to another user";
    TemporaryFolder temporary;
    ASSERT_EQ(::chown(temporary.path().c_str(), 12345, 12345), 0);
    EXPECT_EQ(failureOf([&] { DataFolder folder(temporary.path()); }),
              "the data folder " + temporary.path().string() +
                  " belongs to another user: start vlserviced as that user or name another folder");
}

TEST(DataFolder, TakesNoEmptyDatabaseForANewOne) {
    TemporaryFolder temporary;
    fs::path const file = temporary / "service.db";
    std::ofstream(file).close();
    EXPECT_EQ(failureOf([&] { VlServiced::openServiceDatabase(file); }),
              "the service database " + file.string() +
                  " is damaged (it is empty): restore it from a backup, or move it away to begin anew");
    EXPECT_EQ(fs::file_size(file), 0u);
}

TEST(DataFolder, HoldsADatabaseForItsOwnerAlone) {
    TemporaryFolder temporary;
    fs::path const file = temporary / "service.db";
    auto const database = VlServiced::openServiceDatabase(file);
    EXPECT_EQ(fs::status(file).permissions(), fs::perms(0600));
    EXPECT_EQ(fs::status(file.string() + "-wal").permissions(), fs::perms(0600));
}

} // namespace

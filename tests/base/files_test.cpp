// Open files, files read whole, locks, and what is private.
#include "programs/base/error.h"
#include "programs/base/file_descriptor.h"
#include "programs/base/file_lock.h"
#include "programs/base/pending_file.h"
#include "programs/base/private_file.h"
#include "programs/base/read_file.h"
#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"
#include "tests/support/without_rights.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/stat.h>
#include <system_error>
#include <unistd.h>

namespace {

namespace fs = std::filesystem;

class FilesTest : public testing::Test {
protected:
    fs::path file(char const* name) const { return folder_ / name; }

    TemporaryFolder folder_holder_;
    fs::path folder_ = folder_holder_.path();
};

TEST_F(FilesTest, AreReadAndWrittenWhole) {
    Base::FileDescriptor out(file("a"), O_WRONLY | O_CREAT, 0600);
    out.writeAll("0123456789");
    out.sync();
    out.close();
    Base::FileDescriptor in(file("a"), O_RDONLY);
    char bytes[20] = {};
    EXPECT_EQ(in.readAt(7, bytes, 20), 3u);
    EXPECT_EQ(std::string(bytes), "789");
    EXPECT_EQ(in.read(bytes, 4), 4u);
    EXPECT_EQ(in.read(bytes, 20), 6u);
    EXPECT_EQ(in.read(bytes, 20), 0u);
}

TEST_F(FilesTest, SayWhichOneCannotBeOpened) {
    EXPECT_EQ(failureOf([&] { Base::FileDescriptor(file("b"), O_RDONLY); }),
              "cannot open " + file("b").string() + ": No such file or directory");
}

TEST_F(FilesTest, AreNotOpenedThroughALinkThatIsRefused) {
    Base::writeFile(file("a"), "x");
    fs::create_symlink(file("a"), file("link"));
    EXPECT_NO_THROW(Base::FileDescriptor(file("link"), O_RDONLY));
    EXPECT_THROW(Base::FileDescriptor(file("link"), O_RDONLY | O_NOFOLLOW), std::system_error);
}

TEST_F(FilesTest, AreClosedOnceThoughMoved) {
    Base::FileDescriptor first("/dev/null", O_RDONLY);
    int const number = first.number();
    {
        Base::FileDescriptor const second(std::move(first));
        EXPECT_EQ(second.number(), number);
    }
    EXPECT_EQ(::fcntl(number, F_GETFD), -1);
}

TEST_F(FilesTest, TellAFullDisk) {
    Base::FileDescriptor full("/dev/full", O_WRONLY);
    EXPECT_EQ(failureOf([&] { full.writeAll("x"); }), "cannot write /dev/full: No space left on device");
}

TEST_F(FilesTest, AreReadUpToALimit) {
    Base::writeFile(file("a"), std::string(200'000, 'x'));
    EXPECT_EQ(Base::readFile(file("a")), std::string(200'000, 'x'));
    EXPECT_EQ(Base::readFile(file("a"), 200'000).size(), 200'000u);
    EXPECT_EQ(failureOf([&] { Base::readFile(file("a"), 199'999); }),
              file("a").string() + ": is larger than 199999 bytes; name a smaller file");
    Base::writeFile(file("empty"), "");
    EXPECT_EQ(Base::readFile(file("empty"), 0), "");
}

TEST_F(FilesTest, ThatAreNoneAreNotRead) {
    EXPECT_EQ(failureOf([&] { Base::readFile(file("b")); }),
              file("b").string() + ": there is no such file; check the name");
    EXPECT_EQ(failureOf([&] { Base::readFile(folder_); }),
              folder_.string() + ": is a folder; name the files in it");
    ASSERT_EQ(::mkfifo(file("pipe").c_str(), 0600), 0);
    EXPECT_EQ(failureOf([&] { Base::readFile(file("pipe")); }),
              file("pipe").string() + ": is no ordinary file; save it to one");
}

TEST_F(FilesTest, AreLockedByOneAtATime) {
    auto lock = Base::FileLock::tryTake(file("lock"));
    ASSERT_TRUE(lock);
    EXPECT_FALSE(Base::FileLock::tryTake(file("lock")));
    EXPECT_EQ(Base::FileLock::holderOf(file("lock")), std::to_string(::getpid()));
    EXPECT_EQ(fs::status(file("lock")).permissions(), fs::perms::owner_read | fs::perms::owner_write);
    lock.reset();
    EXPECT_TRUE(Base::FileLock::tryTake(file("lock")));
}

TEST_F(FilesTest, AreNotLockedThroughALink) {
    Base::writeFile(file("precious"), "kept");
    fs::create_symlink(file("precious"), file("lock"));
    EXPECT_THROW(Base::FileLock::tryTake(file("lock")), std::system_error);
    EXPECT_EQ(Base::readFile(file("precious")), "kept");
}

TEST_F(FilesTest, ThatAreSecretBelongToOneUser) {
    std::string const name = file("token").string();
    EXPECT_TRUE(Base::createPrivateFile(name, "secret"));
    EXPECT_FALSE(Base::createPrivateFile(name, "other"));
    Base::appendToPrivateFile(name, "!");
    EXPECT_EQ(Base::readPrivateFile(name), "secret!");
    EXPECT_EQ(failureOf([&] { Base::readPrivateFile(name, 6); }),
              "The file \"" + name + "\" is larger than 6 bytes.");
    fs::permissions(name, fs::perms::group_read, fs::perm_options::add);
    std::string const refusal =
        "The file \"" + name + "\" is open to others (mode 0640); make it private with chmod 600.";
    EXPECT_EQ(failureOf([&] { Base::readPrivateFile(name); }), refusal);
    EXPECT_EQ(failureOf([&] { Base::appendToPrivateFile(name, "x"); }), refusal);
    EXPECT_EQ(failureOf([&] { Base::readPrivateFile(file("none").string()); }),
              "Cannot open \"" + file("none").string() + "\": No such file or directory.");
}

TEST_F(FilesTest, ThatAreSecretMayBeOpenedToAGroupByTheAdministratorAlone) {
    if (::geteuid() != 0)
        GTEST_SKIP() << "only root has files of the administrator";
    std::string const name = file("token").string();
    EXPECT_TRUE(Base::createPrivateFile(name, "secret"));
    fs::permissions(folder_, fs::perms::others_exec | fs::perms::owner_all);
    ASSERT_EQ(::chown(name.c_str(), 0, VLServiceTest::WithoutRights::NOBODY), 0);
    fs::permissions(name, fs::perms::owner_read | fs::perms::group_read);
    gid_t const before = ::getegid();
    ASSERT_EQ(::setegid(VLServiceTest::WithoutRights::NOBODY), 0);
    {
        VLServiceTest::WithoutRights const guard;
        EXPECT_EQ(Base::readPrivateFile(name), "secret");
    }
    fs::permissions(name, fs::perms::group_write, fs::perm_options::add);
    {
        VLServiceTest::WithoutRights const guard;
        EXPECT_EQ(failureOf([&] { Base::readPrivateFile(name); }),
                  "The file \"" + name + "\" is open to others (mode 0460); make it private with chmod 600.");
    }
    ASSERT_EQ(::setegid(before), 0);
}

} // namespace

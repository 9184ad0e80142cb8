#include "programs/base/pending_file.h"

#include "programs/base/log_capture.h"
#include "tests/support/failing_memory.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <new>
#include <optional>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <system_error>
#include <unistd.h>

namespace {

bool foldersFail = false;

/// While it lives, no folder can be synced.
struct FailingFolders {
    FailingFolders() { foldersFail = true; }
    ~FailingFolders() { foldersFail = false; }
};

} // namespace

/// In place of the system's.
extern "C" int fsync(int file) {
    struct stat status {};
    if (foldersFail && ::fstat(file, &status) == 0 && S_ISDIR(status.st_mode)) {
        errno = EIO;
        return -1;
    }
    return static_cast<int>(::syscall(SYS_fsync, file));
}

namespace {

namespace fs = std::filesystem;

class PendingFileTest : public testing::Test {
protected:
    PendingFileTest() {
        std::string name = (fs::temp_directory_path() / "pending.XXXXXX").string();
        folder_ = ::mkdtemp(name.data());
    }
    ~PendingFileTest() override { fs::remove_all(folder_); }

    void write(fs::path const& file, std::string const& text) { std::ofstream(file) << text; }
    std::string read(fs::path const& file) {
        std::ifstream in(file);
        return {std::istreambuf_iterator<char>(in), {}};
    }
    std::ptrdiff_t filesInFolder() { return std::distance(fs::directory_iterator(folder_), {}); }

    fs::path folder_;
};

TEST_F(PendingFileTest, AppearsUnderItsNameOnCommit) {
    fs::path const target = folder_ / "a.mailing";
    Base::PendingFile pending(target);
    write(pending.temporary(), "whole");
    EXPECT_FALSE(fs::exists(target));
    pending.commit();
    EXPECT_EQ(read(target), "whole");
    EXPECT_EQ(filesInFolder(), 1);
}

TEST_F(PendingFileTest, GoesThoughThereIsNoMemoryForIt) {
    auto pending = std::make_optional<Base::PendingFile>(folder_ / "a.mailing");
    {
        VLServiceTest::FailingMemory const memory(1, true);
        pending.reset();
    }
    EXPECT_EQ(filesInFolder(), 0);
}

TEST_F(PendingFileTest, LeavesNothingWhenMemoryRunsOutInTheMiddle) {
    fs::path const target = folder_ / "a.mailing";
    bool hasFailed = true;
    for (long call = 1; hasFailed; ++call) {
        try {
            VLServiceTest::FailingMemory const memory(call);
            Base::PendingFile const pending{fs::path(target)};
            hasFailed = memory.hasFailed();
            EXPECT_FALSE(hasFailed) << call;
        } catch (std::bad_alloc const&) {
        }
        EXPECT_EQ(filesInFolder(), 0) << call;
    }
}

TEST_F(PendingFileTest, LeavesNothingWithoutCommit) {
    {
        Base::PendingFile pending(folder_ / "a.mailing");
        write(pending.temporary(), "half");
    }
    EXPECT_EQ(filesInFolder(), 0);
}

TEST_F(PendingFileTest, KeepsTheFormerFileUntilCommit) {
    fs::path const target = folder_ / "a.mailing";
    write(target, "former");
    {
        Base::PendingFile pending(target);
        write(pending.temporary(), "half");
        EXPECT_EQ(read(target), "former");
    }
    EXPECT_EQ(read(target), "former");
    Base::writeFile(target, "new");
    EXPECT_EQ(read(target), "new");
}

TEST_F(PendingFileTest, NamesTheFolderThatIsMissing) {
    try {
        Base::PendingFile pending(folder_ / "missing" / "a.mailing");
        FAIL() << "made a file in a folder that is not there";
    } catch (std::system_error const& error) {
        EXPECT_EQ(error.what(),
                  "cannot write into " + (folder_ / "missing").string() + ": No such file or directory");
    }
}

TEST_F(PendingFileTest, LeavesATargetAloneThatCannotBeReplaced) {
    // A target that is a folder cannot be replaced by a file: the rename fails as it would for any other
    // reason.
    fs::create_directory(folder_ / "taken");
    write(folder_ / "taken" / "inside", "x");
    EXPECT_THROW(Base::writeFile(folder_ / "taken", "bytes"), std::system_error);
    EXPECT_EQ(read(folder_ / "taken" / "inside"), "x");
    EXPECT_EQ(filesInFolder(), 1);
}

TEST_F(PendingFileTest, IsThereThoughItsFolderCannotBeSynced) {
    Base::LogCapture const log;
    {
        FailingFolders const failing;
        Base::writeFile(folder_ / "a.mailing", "whole");
    }
    EXPECT_EQ(read(folder_ / "a.mailing"), "whole");
    EXPECT_THAT(log.lines(), testing::ElementsAre("cannot sync " + folder_.string() +
                                                  ": Input/output error; a power failure may still undo " +
                                                  (folder_ / "a.mailing").string()));
}

TEST_F(PendingFileTest, GoesWithTheProcessThatASignalEnds) {
    for (int const number : {SIGINT, SIGTERM, SIGHUP, SIGPIPE}) {
        pid_t const child = ::fork();
        if (child == 0) {
            Base::removePendingFilesOnSignals();
            Base::PendingFile const first(folder_ / "a.mailing"), second(folder_ / "b.mailing");
            std::raise(number);
            std::_Exit(1);
        }
        int status = 0;
        ::waitpid(child, &status, 0);
        EXPECT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == number) << number;
        EXPECT_EQ(filesInFolder(), 0) << number;
    }
}

TEST_F(PendingFileTest, StaysWhenASignalEndsAnotherProcess) {
    pid_t const child = ::fork();
    if (child == 0) {
        Base::removePendingFilesOnSignals();
        Base::PendingFile const pending(folder_ / "a.mailing");
        if (pid_t const grandchild = ::fork(); grandchild == 0) {
            std::raise(SIGTERM);
        } else {
            ::waitpid(grandchild, nullptr, 0);
            std::_Exit(fs::exists(pending.temporary()) ? 7 : 1);
        }
    }
    int status = 0;
    ::waitpid(child, &status, 0);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 7);
}

TEST_F(PendingFileTest, IsAFailureBeyondALimitOfSize) {
    pid_t const child = ::fork();
    if (child == 0) {
        Base::removePendingFilesOnSignals();
        rlimit const small{100, 100};
        ::setrlimit(RLIMIT_FSIZE, &small);
        try {
            Base::writeFile(folder_ / "a.mailing", std::string(1000, 'x'));
            std::_Exit(1);
        } catch (std::system_error const& failure) {
            std::_Exit(failure.code() == std::errc::file_too_large ? 7 : 2);
        }
    }
    int status = 0;
    ::waitpid(child, &status, 0);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 7);
    EXPECT_EQ(filesInFolder(), 0);
}

} // namespace

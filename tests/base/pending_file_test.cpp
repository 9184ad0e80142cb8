#include "programs/base/pending_file.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <fstream>
#include <iterator>
#include <system_error>

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

} // namespace

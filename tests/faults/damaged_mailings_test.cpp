// The subcommands of "vlmail pack", as programs, over mailings that are damaged in every way.
#include "tests/faults/process.h"
#include "tests/support/damaged_mailing.h"
#include "tests/support/temporary_folder.h"

#include <gmock/gmock.h>

#include <fstream>
#include <iterator>
#include <set>
#include <sstream>

namespace {

namespace fs = std::filesystem;
using Faults::Ended;
using testing::IsSubsetOf;

class DamagedMailings : public testing::Test {
protected:
    DamagedMailings() {
        fs::create_directory(folder_);
        std::ofstream(folder_ / "one.txt") << "Dear Mr Smith,\nhello.\n\f\nand more on another page.\n";
        std::ofstream(folder_ / "two.txt") << "Dear Mrs Jones,\ngoodbye.\n";
        run({"mail", "one.txt", "two.txt", "-o", ".", "--jobs", "1"});
        for (fs::directory_entry const& entry : fs::directory_iterator(folder_))
            if (entry.path().extension() == ".mailing")
                whole_ = contentOf(entry.path());
    }

    Ended run(std::vector<std::string> const& arguments) {
        return Faults::runWith({}, VLMAIL_PROGRAM, arguments, {folder_});
    }
    static std::string contentOf(fs::path const& file) {
        std::ifstream in(file, std::ios::binary);
        return {std::istreambuf_iterator<char>(in), {}};
    }
    /// In a folder with nothing else.
    void put(std::string const& mailing) {
        fs::remove_all(folder_);
        fs::create_directory(folder_);
        std::ofstream(folder_ / "m.mailing", std::ios::binary) << mailing;
    }
    /// The pages that "pack extract" writes, whatever their names. The metadata is JSON and none of them.
    std::set<std::string> extracted(char const* file) {
        fs::remove_all(folder_ / "x");
        expectOrdinaryEnd(run({"pack", "extract", file, "-o", "x"}));
        std::set<std::string> contents;
        std::error_code none;
        for (fs::directory_entry const& entry : fs::directory_iterator(folder_ / "x", none))
            if (std::string const content = contentOf(entry.path()); !content.starts_with('{'))
                contents.insert(content);
        return contents;
    }
    /// That a run told what is wrong, or that nothing is.
    static void expectOrdinaryEnd(Ended const& ended) {
        EXPECT_THAT(ended.status, testing::AllOf(testing::Ge(0), testing::Le(2))) << ended.err;
        EXPECT_FALSE(ended.isLate);
        EXPECT_TRUE(ended.status == 0 || !ended.out.empty() || !ended.err.empty());
    }

    /// The lines of a check that are not about what is missing, or about names that nobody knows.
    static std::string damagedBlobs(std::string const& verdict) {
        std::istringstream lines(verdict);
        std::string damaged;
        for (std::string line; std::getline(lines, line);)
            if (line.find(": damaged: ") != std::string::npos &&
                !line.ends_with("the metadata does not know it") && !line.ends_with("it is missing"))
                damaged += line + '\n';
        return damaged;
    }

    TemporaryFolder root_;
    fs::path folder_ = root_ / "work";
    std::string whole_;
};

TEST_F(DamagedMailings, AreAllFoundByACheck) {
    for (auto const& [how, bytes] : VLServiceTest::damagesOf(whole_)) {
        SCOPED_TRACE(how);
        put(bytes);
        Ended const ended = run({"pack", "verify", "m.mailing"});
        expectOrdinaryEnd(ended);
        EXPECT_EQ(ended.status, 1) << ended.out;
        expectOrdinaryEnd(run({"pack", "list", "m.mailing"}));
    }
}

TEST_F(DamagedMailings, GiveOnlyWholePagesOut) {
    put(whole_);
    std::set<std::string> const pages = extracted("m.mailing");
    ASSERT_EQ(pages.size(), 3u);
    for (auto const& [how, bytes] : VLServiceTest::damagesOf(whole_)) {
        put(bytes);
        EXPECT_THAT(extracted("m.mailing"), IsSubsetOf(pages)) << how;
    }
}

TEST_F(DamagedMailings, AreSavedAsWholeOnesAndStayAsTheyAre) {
    put(whole_);
    std::set<std::string> const pages = extracted("m.mailing");
    std::size_t saved = 0;
    for (auto const& [how, bytes] : VLServiceTest::damagesOf(whole_)) {
        SCOPED_TRACE(how);
        put(bytes);
        Ended const salvaged = run({"pack", "salvage", "m.mailing", "-o", "s.mailing"});
        expectOrdinaryEnd(salvaged);
        EXPECT_EQ(contentOf(folder_ / "m.mailing"), bytes);
        if (!fs::exists(folder_ / "s.mailing"))
            continue;
        std::string const verdict = run({"pack", "verify", "s.mailing"}).out;
        EXPECT_EQ(damagedBlobs(verdict), "") << verdict;
        EXPECT_TRUE(salvaged.status == 2 || verdict.find("all whole") != std::string::npos) << verdict;
        EXPECT_THAT(extracted("s.mailing"), IsSubsetOf(pages));
        ++saved;
    }
    // Something is left of nearly all of them.
    EXPECT_GT(saved, VLServiceTest::damagesOf(whole_).size() / 2);
}

} // namespace

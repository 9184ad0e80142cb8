// Holds the pages that people read against each other and against the tree that they describe.
#include "tests/docs/pages.h"

#include "tests/support/temporary_folder.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <fstream>
#include <map>
#include <regex>
#include <set>
#include <string>

namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::IsEmpty;

TEST(Pages, LinkToFilesAndHeadingsThatAreThere) { EXPECT_THAT(brokenLinks(SOURCE_FOLDER), IsEmpty()); }

TEST(Pages, AreReachedFromTheReadme) { EXPECT_THAT(unreachedPages(SOURCE_FOLDER), IsEmpty()); }

TEST(Pages, NamePlacesThatAreThere) { EXPECT_THAT(missingPlaces(SOURCE_FOLDER), IsEmpty()); }

TEST(Pages, NameTestsThatAreThere) { EXPECT_THAT(missingTests(SOURCE_FOLDER), IsEmpty()); }

/// The words of a list that a line of a file begins.
std::string listIn(char const* file, std::string const& begin, char end) {
    std::ifstream in(fs::path(SOURCE_FOLDER) / file);
    for (std::string line; std::getline(in, line);)
        if (std::size_t const at = line.find(begin); at != std::string::npos)
            return line.substr(at + begin.size(), line.find(end, at) - at - begin.size());
    return {};
}

TEST(Workflow, TakesEveryStepThatAPersonCanCheck) {
    std::string const steps = listIn("scripts/check", "steps=(", ')');
    EXPECT_THAT(steps, testing::HasSubstr("dev"));
    EXPECT_EQ(
        std::regex_replace(listIn(".github/workflows/check.yml", "step: [", ']'), std::regex(", "), " "),
        steps);
}

/// By their numbers, each with the text up to the next.
std::map<int, std::string> promisesOf(fs::path const& page) {
    std::regex const numbered(R"((\d+)\. \*\*.*)");
    std::map<int, std::string> promises;
    std::ifstream in(page);
    int number = 0;
    for (std::string line; std::getline(in, line);) {
        if (std::smatch match; std::regex_match(line, match, numbered))
            number = std::stoi(match[1]);
        else if (!line.starts_with("   "))
            number = 0;
        if (number > 0)
            promises[number] += line;
    }
    return promises;
}

TEST(Security, HasATestForEachOfItsSixteenPromises) {
    auto const promises = promisesOf(SOURCE_FOLDER "/docs/security.md");
    EXPECT_EQ(promises.size(), 16U);
    std::set<std::string> const tests = declaredTests(SOURCE_FOLDER);
    for (auto const& promise : promises)
        EXPECT_TRUE(std::ranges::any_of(tests, [&](std::string const& test) {
            return promise.second.find('`' + test + '`') != std::string::npos;
        })) << promise.first;
}

TEST(Security, NamesTheTargetOfEveryDoor) {
    Page const page(fs::path(SOURCE_FOLDER) / "docs/security.md");
    for (fs::directory_entry const& entry : fs::directory_iterator(fs::path(SOURCE_FOLDER) / "fuzz")) {
        std::string const name = "fuzz/" + entry.path().filename().string();
        if (entry.path().extension() == ".cpp" && name != "fuzz/replay_main.cpp") {
            EXPECT_EQ(std::ranges::count(page.places(), name), 1) << name;
        }
    }
}

TEST(Readme, NamesEveryFolderOfTheLibraryAndThePrograms) {
    Page const readme(fs::path(SOURCE_FOLDER) / "README.md");
    for (char const* const house : {"vlservice", "programs"})
        for (fs::directory_entry const& room : fs::directory_iterator(fs::path(SOURCE_FOLDER) / house)) {
            std::string const name = house + ('/' + room.path().filename().string());
            EXPECT_TRUE(!room.is_directory() || std::ranges::count(readme.places(), name) > 0) << name;
        }
}

TEST(News, BeginsWithTheVersionThatIsBuilt) {
    std::ifstream news(SOURCE_FOLDER "/NEWS.md");
    std::string line;
    while (std::getline(news, line) && !line.starts_with("## ")) {
    }
    EXPECT_EQ(line, "## " VERSION_TEXT);
}

/// A tree of pages that is made for the checks themselves.
class MadePages : public testing::Test {
protected:
    MadePages() { fs::create_directory(folder_ / "docs"); }
    void write(char const* name, std::string const& text) const { std::ofstream(folder_ / name) << text; }

    TemporaryFolder const folder_;
};

TEST_F(MadePages, AreFoundBrokenWhereTheyLinkToWhatIsNotThere) {
    write("README.md", "[a](docs/a.md) [b](docs/b.md)\n[c](docs/a.md#what-it-s)[d](docs/a.md#what-its)\n");
    write("docs/a.md", "## What it's\n[up](../README.md) [here](#what-its) [there](#above)\n"
                       "[far](https://example.org/none.md) `[code](none)`\n```\n[example](none.md)\n```\n"
                       "1. x\n  \n   ```console\n   [example](none.md)\n   ```\n");
    EXPECT_THAT(brokenLinks(folder_.path()),
                ElementsAre("README.md: docs/b.md", "README.md: docs/a.md#what-it-s", "docs/a.md: #above"));
}

TEST_F(MadePages, AreReachedByWayOfOthers) {
    write("README.md", "[`a`](docs/a.md)\n");
    write("NEWS.md", "");
    write("docs/a.md", "[b](b.md#below)\n");
    write("docs/b.md", "[back](../README.md)\n## Below\n");
    write("docs/c.md", "[a](a.md)\n");
    EXPECT_THAT(unreachedPages(folder_.path()), ElementsAre("NEWS.md", "docs/c.md"));
}

TEST_F(MadePages, AreFoundWrongWhereTheyNamePlacesThatAreNotThere) {
    write("README.md", "`docs/a.md` `docs/` `docs/b.md` `docs/NAME.md` `fuzz/corpus`\n");
    write("docs/a.md", "");
    EXPECT_THAT(missingPlaces(folder_.path()), ElementsAre("README.md: docs/b.md", "README.md: fuzz/corpus"));
}

TEST_F(MadePages, AreFoundWrongWhereTheyNameTestsThatAreNotThere) {
    fs::create_directory(folder_ / "tests");
    write("README.md", "`Frames.AreRead` `Frames.AreWritten`, `Frames::AreRead` Frames.AreGone\n");
    write("tests/a_test.cpp", "TEST_F(Frames,\n       AreRead) {}\nTEST(Frame, sAreWritten) {}\n");
    EXPECT_THAT(missingTests(folder_.path()), ElementsAre("README.md: Frames.AreWritten"));
}

} // namespace

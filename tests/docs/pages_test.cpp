// Holds the pages that people read against each other and against the tree that they describe.
#include "tests/docs/pages.h"

#include "tests/support/temporary_folder.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <fstream>
#include <string>

namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::IsEmpty;

TEST(Pages, LinkToFilesAndHeadingsThatAreThere) { EXPECT_THAT(brokenLinks(SOURCE_FOLDER), IsEmpty()); }

TEST(Pages, AreReachedFromTheReadme) { EXPECT_THAT(unreachedPages(SOURCE_FOLDER), IsEmpty()); }

TEST(Pages, NamePlacesThatAreThere) { EXPECT_THAT(missingPlaces(SOURCE_FOLDER), IsEmpty()); }

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
                       "[far](https://example.org/none.md) `[code](none)`\n```\n[example](none.md)\n```\n");
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

} // namespace

#pragma once
// The pages that people read: Markdown in the top folder and in docs/, with the links between them.

#include <filesystem>
#include <set>
#include <string>
#include <vector>

/// What a page links to and can be linked by; its examples in fences hold neither.
class Page {
public:
    explicit Page(std::filesystem::path const& file);

    /// The targets of its links within the project, as they are written: `docs/formats.md#the-blob`,
    /// `#zones`.
    std::vector<std::string> const& links() const { return links_; }
    bool hasHeading(std::string const& anchor) const { return anchors_.contains(anchor); }
    /// Names of files and folders of the project that it mentions in backticks.
    std::vector<std::string> const& places() const { return places_; }
    /// Names of tests, `Suite.Name`, that it mentions in backticks.
    std::vector<std::string> const& tests() const { return tests_; }

private:
    void readLine(std::string const& line);

    std::vector<std::string> links_;
    std::vector<std::string> places_;
    std::vector<std::string> tests_;
    std::set<std::string> anchors_;
};

/// All pages below `root`, sorted.
std::vector<std::filesystem::path> pagesOf(std::filesystem::path const& root);

/// One text `page: target` for each link to a file or heading that is not there.
std::vector<std::string> brokenLinks(std::filesystem::path const& root);

/// Pages to which no way leads from README.md, relative to `root`.
std::vector<std::string> unreachedPages(std::filesystem::path const& root);

/// One text `page: place` for each file or folder that is mentioned and not there.
std::vector<std::string> missingPlaces(std::filesystem::path const& root);

/// Of all tests that are declared in `tests` below `root`, `Suite.Name`.
std::set<std::string> declaredTests(std::filesystem::path const& root);

/// One text `page: test` for each test that is mentioned and not declared.
std::vector<std::string> missingTests(std::filesystem::path const& root);

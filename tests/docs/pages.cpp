#include "tests/docs/pages.h"

#include <algorithm>
#include <cctype>
#include <deque>
#include <fstream>
#include <iterator>
#include <regex>
#include <stdexcept>

namespace fs = std::filesystem;

namespace {

std::regex const FENCE(" *```.*");
std::regex const HEADING("#+ +(.*)");
std::regex const CODE("`[^`]*`");
std::regex const LINK(R"(\]\(([^)]+)\))");
std::regex const PLACE("`((?:vlservice|programs|tests|fuzz|bench|examples|docs|scripts)/[a-z0-9_./-]*)`");
std::regex const TEST_NAME("`([A-Z][A-Z0-9]*[a-z][A-Za-z0-9]*\\.[A-Z][A-Za-z0-9]*)`");
std::regex const DECLARATION(R"(\bTEST(?:_F|_P)?\(\s*(\w+),\s*(\w+)\))");

/// Every match's first group.
std::vector<std::string> allMatches(std::string const& line, std::regex const& regex) {
    std::vector<std::string> found;
    for (std::sregex_iterator match(line.begin(), line.end(), regex), end; match != end; ++match)
        found.push_back((*match)[1]);
    return found;
}

/// The name under which viewers offer a heading: small letters and digits, a hyphen for each blank.
std::string anchorOf(std::string const& heading) {
    std::string anchor;
    for (unsigned char const c : heading) {
        if (std::isalnum(c) || c >= 0x80 || c == '-' || c == '_')
            anchor += static_cast<char>(std::tolower(c));
        else if (c == ' ')
            anchor += '-';
    }
    return anchor;
}

/// Where a link leads: a file, empty for the page itself, and a heading, empty for its top.
struct Target {
    std::string file;
    std::string anchor;

    explicit Target(std::string const& link) : file(link.substr(0, link.find('#'))) {
        if (file.size() < link.size())
            anchor = link.substr(file.size() + 1);
    }
    fs::path from(fs::path const& page) const {
        return file.empty() ? page : (page.parent_path() / file).lexically_normal();
    }
};

bool isThere(fs::path const& page, Target const& target) {
    fs::path const file = target.from(page);
    return fs::exists(file) && (target.anchor.empty() || Page(file).hasHeading(target.anchor));
}

} // namespace

Page::Page(fs::path const& file) {
    std::ifstream in(file);
    if (!in)
        throw std::runtime_error("cannot read " + file.string());
    bool isExample = false;
    for (std::string line; std::getline(in, line);) {
        bool const isFence = std::regex_match(line, FENCE);
        isExample ^= isFence;
        if (!isExample && !isFence)
            readLine(line);
    }
}

void Page::readLine(std::string const& line) {
    if (std::smatch heading; std::regex_match(line, heading, HEADING))
        anchors_.insert(anchorOf(heading[1]));
    // Code in backticks may hold brackets that are no link.
    std::ranges::copy_if(allMatches(std::regex_replace(line, CODE, ""), LINK), std::back_inserter(links_),
                         [](std::string const& link) { return link.find("://") == std::string::npos; });
    std::ranges::copy(allMatches(line, PLACE), std::back_inserter(places_));
    std::ranges::copy(allMatches(line, TEST_NAME), std::back_inserter(tests_));
}

std::vector<fs::path> pagesOf(fs::path const& root) {
    std::vector<fs::path> pages;
    auto const add = [&](fs::directory_entry const& entry) {
        if (entry.path().extension() == ".md")
            pages.push_back(entry.path());
    };
    std::ranges::for_each(fs::directory_iterator(root), add);
    std::ranges::for_each(fs::recursive_directory_iterator(root / "docs"), add);
    std::ranges::sort(pages);
    return pages;
}

std::vector<std::string> brokenLinks(fs::path const& root) {
    std::vector<std::string> broken;
    for (fs::path const& file : pagesOf(root)) {
        Page const page(file);
        for (std::string const& link : page.links())
            if (!isThere(file, Target(link)))
                broken.push_back(file.lexically_relative(root).string() + ": " + link);
    }
    return broken;
}

std::vector<std::string> unreachedPages(fs::path const& root) {
    std::set<fs::path> unreached;
    std::ranges::copy(pagesOf(root), std::inserter(unreached, unreached.end()));
    std::deque<fs::path> reached{root / "README.md"};
    for (unreached.erase(reached.front()); !reached.empty(); reached.pop_front()) {
        Page const page(reached.front());
        for (std::string const& link : page.links())
            if (auto const other = unreached.extract(Target(link).from(reached.front())))
                reached.push_back(other.value());
    }
    std::vector<std::string> names;
    for (fs::path const& file : unreached)
        names.push_back(file.lexically_relative(root).string());
    return names;
}

std::vector<std::string> missingPlaces(fs::path const& root) {
    std::vector<std::string> missing;
    for (fs::path const& file : pagesOf(root)) {
        Page const page(file);
        for (std::string const& place : page.places())
            if (!fs::exists(root / place))
                missing.push_back(file.lexically_relative(root).string() + ": " + place);
    }
    return missing;
}

std::set<std::string> declaredTests(fs::path const& root) {
    std::set<std::string> tests;
    for (fs::directory_entry const& entry : fs::recursive_directory_iterator(root / "tests")) {
        if (entry.path().extension() != ".cpp")
            continue;
        std::ifstream in(entry.path());
        std::string const text{std::istreambuf_iterator<char>(in), {}};
        for (std::sregex_iterator match(text.begin(), text.end(), DECLARATION), end; match != end; ++match)
            tests.insert((*match)[1].str() + '.' + (*match)[2].str());
    }
    return tests;
}

std::vector<std::string> missingTests(fs::path const& root) {
    std::set<std::string> const declared = declaredTests(root);
    std::vector<std::string> missing;
    for (fs::path const& file : pagesOf(root)) {
        Page const page(file);
        for (std::string const& test : page.tests())
            if (!declared.contains(test))
                missing.push_back(file.lexically_relative(root).string() + ": " + test);
    }
    return missing;
}

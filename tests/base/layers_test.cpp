// Who includes whom, read from the sources and held against the list of layers.
#include "programs/base/read_file.h"

#include <gmock/gmock.h>

#include <filesystem>
#include <map>
#include <set>
#include <sstream>
#include <string>
#include <vector>

namespace {

namespace fs = std::filesystem;

using testing::HasSubstr;
using testing::IsEmpty;

/// From the ground up. What stands in a line includes only what stands in lines above it, and itself.
std::string const LAYERS = R"(vlservice/export.h
vlservice/json
vlservice/platform
vlservice/cfg
vlservice/extract
vlservice/presets
vlservice/pack
vlservice/ipc
vlservice
programs/base
programs/manual programs/patterns programs/protocol programs/database
programs/mailing
programs/reader
programs/production programs/policy programs/channel
programs/carriers
programs/vlmail/terminal programs/vlmail/service programs/vlmail/letters
programs/vlmail/presets programs/vlmail/explain
programs/vlmail/golden programs/vlmail/report programs/vlmail/mailings programs/vlmail/pack
programs/vlmail/schema
programs/vlmail/workbench
programs/vlmail/commands
programs/vlmail
programs/vlserviced/store
programs/vlserviced/settings
programs/vlserviced/jobs
programs/vlserviced/metrics
programs/vlserviced
)";

/// Beside that: the first is included only by the others.
std::string const ONLY_BY = R"(vlservice/pack: vlservice programs
programs/database: programs/mailing programs/vlserviced
programs/reader: programs/production programs/vlmail
programs/carriers: programs/vlserviced
programs/vlmail: programs/vlmail
programs/vlserviced: programs/vlserviced
)";

/// And the first includes nothing of the project but the others.
std::string const STANDS_ON = R"(vlservice/pack: vlservice/export.h vlservice/platform vlservice/pack
)";

struct Include {
    std::string from;
    std::string to;

    std::string text() const { return from + " includes " + to; }
};

bool liesIn(std::string const& file, std::string const& room) {
    return file == room || file.starts_with(room + '/');
}

std::vector<std::string> words(std::string const& line) {
    std::istringstream in(line);
    std::vector<std::string> all;
    for (std::string word; in >> word;)
        all.push_back(word);
    return all;
}

std::vector<std::string> lines(std::string const& text) {
    std::istringstream in(text);
    std::vector<std::string> all;
    for (std::string line; std::getline(in, line);)
        all.push_back(line);
    return all;
}

class Layers {
public:
    Layers() {
        int layer = 0;
        for (std::string const& line : lines(LAYERS)) {
            for (std::string const& room : words(line))
                layers_[room] = layer;
            ++layer;
        }
    }

    /// The innermost room of a file; empty when it lies in none.
    std::string roomOf(std::string const& file) const {
        for (fs::path path = file; !path.empty(); path = path.parent_path())
            if (layers_.contains(path.string()))
                return path.string();
        return {};
    }

    bool mayInclude(Include const& include) const {
        std::string const from = roomOf(include.from);
        std::string const to = roomOf(include.to);
        if (from.empty() || to.empty())
            return false;
        return from == to || layers_.at(to) < layers_.at(from);
    }

private:
    std::map<std::string, int> layers_;
};

bool isAnyRoomOf(std::string const& file, std::vector<std::string> const& rooms) {
    return std::any_of(rooms.begin(), rooms.end(),
                       [&](std::string const& room) { return liesIn(file, room); });
}

/// The rooms behind the colon, by the one before it.
std::map<std::string, std::vector<std::string>> rulesOf(std::string const& text) {
    std::map<std::string, std::vector<std::string>> rules;
    for (std::string const& line : lines(text)) {
        std::size_t const colon = line.find(':');
        rules[line.substr(0, colon)] = words(line.substr(colon + 1));
    }
    return rules;
}

std::vector<Include> includesOf(fs::path const& source, std::string const& name) {
    std::vector<Include> all;
    std::string const begin = "#include \"";
    for (std::string const& line : lines(Base::readFile(source)))
        if (line.starts_with(begin))
            all.push_back({name, line.substr(begin.size(), line.rfind('"') - begin.size())});
    return all;
}

std::vector<Include> const& allIncludes() {
    static std::vector<Include> const all = [] {
        std::vector<Include> found;
        fs::path const root = VLSERVICE_SOURCE_DIR;
        for (char const* const top : {"vlservice", "programs"})
            for (auto const& entry : fs::recursive_directory_iterator(root / top))
                if (entry.path().extension() == ".h" || entry.path().extension() == ".cpp")
                    for (Include& include :
                         includesOf(entry.path(), fs::relative(entry.path(), root).string()))
                        found.push_back(std::move(include));
        return found;
    }();
    return all;
}

/// Those that a rule forbids, in words.
template<typename IsForbidden>
std::set<std::string> forbidden(IsForbidden const& isForbidden) {
    std::set<std::string> all;
    for (Include const& include : allIncludes())
        if (isForbidden(include))
            all.insert(include.text());
    return all;
}

class CircleSearch {
public:
    CircleSearch() {
        for (Include const& include : allIncludes())
            includes_[include.from].push_back(include.to);
    }

    std::vector<std::string> circles() {
        for (auto const& [file, included] : includes_)
            visit(file);
        return circles_;
    }

private:
    void visit(std::string const& file) {
        if (open_.contains(file))
            circles_.push_back(file);
        if (open_.contains(file) || done_.contains(file))
            return;
        open_.insert(file);
        for (std::string const& next : includes_[file])
            visit(next);
        open_.erase(file);
        done_.insert(file);
    }

    std::map<std::string, std::vector<std::string>> includes_;
    std::set<std::string> open_;
    std::set<std::string> done_;
    std::vector<std::string> circles_;
};

TEST(Layers, AreThoseOfTheArchitecture) {
    std::string const page = Base::readFile(fs::path(VLSERVICE_SOURCE_DIR) / "docs" / "architecture.md");
    EXPECT_THAT(page, HasSubstr("```\n" + LAYERS + "```"));
}

TEST(Layers, HaveARoomForEachSource) {
    Layers const layers;
    EXPECT_THAT(forbidden([&](Include const& include) { return layers.roomOf(include.from).empty(); }),
                IsEmpty());
}

TEST(Layers, IncludeOnlyWhatStandsBelow) {
    Layers const layers;
    EXPECT_THAT(forbidden([&](Include const& include) { return !layers.mayInclude(include); }), IsEmpty());
}

TEST(Layers, AreIncludedOnlyByWhoMayUseThem) {
    auto const rules = rulesOf(ONLY_BY);
    EXPECT_THAT(forbidden([&](Include const& include) {
                    return std::any_of(rules.begin(), rules.end(), [&](auto const& rule) {
                        return liesIn(include.to, rule.first) && !liesIn(include.from, rule.first) &&
                               !isAnyRoomOf(include.from, rule.second);
                    });
                }),
                IsEmpty());
}

TEST(Layers, StandOnNoMoreThanTheyNeed) {
    auto const rules = rulesOf(STANDS_ON);
    EXPECT_THAT(forbidden([&](Include const& include) {
                    return std::any_of(rules.begin(), rules.end(), [&](auto const& rule) {
                        return liesIn(include.from, rule.first) && !isAnyRoomOf(include.to, rule.second);
                    });
                }),
                IsEmpty());
}

TEST(Layers, HaveNoCirclesBetweenFiles) { EXPECT_THAT(CircleSearch().circles(), IsEmpty()); }

/// A list that is not read, or sources that are not found, would forbid nothing.
TEST(Layers, AreHeldAgainstEverySource) {
    Layers const layers;
    EXPECT_GT(allIncludes().size(), 500u);
    EXPECT_EQ(layers.roomOf("programs/vlmail/letters/plan.h"), "programs/vlmail/letters");
    EXPECT_EQ(layers.roomOf("vlservice/vlservice.h"), "vlservice");
    EXPECT_EQ(layers.roomOf("elsewhere/a.h"), "");
    EXPECT_TRUE(layers.mayInclude({"programs/mailing/a.h", "programs/base/b.h"}));
    EXPECT_TRUE(layers.mayInclude({"programs/mailing/a.h", "programs/mailing/b.h"}));
    EXPECT_FALSE(layers.mayInclude({"programs/base/a.h", "programs/mailing/b.h"}));
    EXPECT_FALSE(layers.mayInclude({"programs/policy/a.h", "programs/channel/b.h"}));
    EXPECT_FALSE(layers.mayInclude({"vlservice/ipc/a.h", "programs/base/b.h"}));
}

} // namespace

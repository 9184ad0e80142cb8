// Who acts on which key: the table against the records themselves, and the documents against the table.
#include "programs/vlmail/presets/acting.h"
#include "vlservice/presets/presets.h"
#include "vlservice/presets/settings_parts.h"

#include <gmock/gmock.h>

#include <fstream>
#include <iterator>
#include <map>
#include <regex>
#include <set>
#include <string>
#include <vector>

using namespace testing;
using namespace VlMail;

namespace {

std::vector<std::string> settableKeys(json::RecordKeys const& record) {
    std::vector<std::string> keys;
    for (json::KeyRow const& row : record.rows)
        if (row.use != json::KeyUse::Dropped)
            keys.push_back(row.name);
    return keys;
}

TEST(ActingTable, HasEveryKeyOfEachRecord) {
    for (ActingRecord const& record : actingRecords()) {
        std::vector<std::string> keys;
        for (ActingRow const& row : record.rows)
            keys.push_back(row.key);
        EXPECT_THAT(keys, UnorderedElementsAreArray(settableKeys(record.keys())));
    }
}

/// The records that stand in a record, and those in them.
void collectRecords(json::RecordKeys const& record, std::set<json::RecordKeys const*>& all) {
    if (!all.insert(&record).second)
        return;
    for (json::KeyRow const& row : record.rows)
        if (row.form.record)
            collectRecords(*row.form.record, all);
}

/// Values in several keys, such as an area, act where their record's key does; the part of presets is lists.
std::set<json::RecordKeys const*> const VALUES{&Cfg::Rect::keys(), &Cfg::Point::keys(),
                                               &Cfg::Department::keys(), &Cfg::Profile::keys(),
                                               &Cfg::Presets::keys()};

TEST(ActingTable, HasEveryRecordOfTheSettings) {
    std::set<json::RecordKeys const*> expected;
    for (Cfg::PartInfo const& part : Cfg::settingsParts())
        collectRecords(part.keys, expected);
    for (json::RecordKeys const* const value : VALUES)
        expected.erase(value);
    std::set<json::RecordKeys const*> actual;
    for (ActingRecord const& record : actingRecords())
        actual.insert(&record.keys());
    EXPECT_EQ(actual, expected);
}

std::string page(char const* name) {
    std::ifstream in(std::string(VLSERVICE_DOCS "/") + name);
    return {std::istreambuf_iterator<char>(in), {}};
}

/// The last column of the table of keys in a page's section.
std::map<std::string, std::string> actorsTold(std::string const& text, std::string const& heading) {
    static std::regex const ROW(R"(\n\| `(\w+)` \|.*\| ([^|\n]*) \|)");
    auto const begin = text.find("| Who acts |\n", text.find("\n## " + heading + "\n"));
    std::string const table =
        begin == std::string::npos ? "" : text.substr(begin, text.find("\n\n", begin) - begin);
    std::map<std::string, std::string> told;
    for (std::sregex_iterator at(table.begin(), table.end(), ROW), end; at != end; ++at)
        told.emplace((*at)[1], (*at)[2]);
    return told;
}

struct Told {
    char const* page;
    std::vector<std::string> headings;
    json::RecordKeys const& (*keys)();
};

std::vector<Told> const TOLD{
    {"settings.md", {"app"}, Cfg::App::keys},
    {"settings.md", {"inet"}, Cfg::Inet::keys},
    {"settings.md", {"po"}, Cfg::PO::keys},
    {"settings.md", {"deps"}, Cfg::Departments::keys},
    {"settings.md", {"profiles"}, Cfg::Profiles::keys},
    {"presets.md", {"Extraction presets"}, Cfg::ExtractPreset::keys},
    {"presets.md", {"Zones"}, Cfg::ExtractZone::keys},
    {"presets.md", {"Fields", "Validators"}, Cfg::ExtractField::keys},
    {"presets.md", {"Pack presets"}, Cfg::PackPreset::keys},
    {"presets.md", {"Attachments"}, Cfg::PackPreset::Attachment::keys},
    {"presets.md", {"Letterheads"}, Cfg::LetterheadInf::keys},
    {"presets.md", {"Delays"}, Cfg::PackPreset::DelayInfo::keys},
};

std::map<std::string, std::string> actorsOf(json::RecordKeys const& keys) {
    std::map<std::string, std::string> actors;
    for (ActingRecord const& record : actingRecords())
        if (&record.keys() == &keys)
            for (ActingRow const& row : record.rows)
                actors.emplace(row.key, inWords(row.actor));
    return actors;
}

TEST(ActingTable, IsWhatTheDocumentsTell) {
    ASSERT_EQ(TOLD.size(), actingRecords().size());
    for (Told const& told : TOLD) {
        std::map<std::string, std::string> actors;
        for (std::string const& heading : told.headings)
            actors.merge(actorsTold(page(told.page), heading));
        EXPECT_EQ(actors, actorsOf(told.keys())) << told.headings.front();
    }
}

} // namespace

// Presets as people write them first, and as those do who measure, on letters as companies send them: what of
// them is found.
#include "tests/support/temporary_folder.h"
#include "tests/support/time_zone.h"
#include "tests/vlmail/letter_set/letter_set.h"
#include "tests/vlmail/run_vlmail.h"
#include "vlservice/json/json_text.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <cstddef>
#include <fstream>
#include <map>
#include <set>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

namespace {

using testing::IsEmpty;

std::string inText(json::Value const& value) {
    std::ostringstream text;
    text << value;
    return text.str();
}

/// "NAME: FIELD is VALUE", of fields that are missing or not as they should be.
std::vector<std::string> misread(LetterSet::Letter const& letter, std::string const& line) {
    json::Array const letters = json::strToObject(line.data(), line.size()).get("letters").toArray();
    std::map<std::string, json::Value> found;
    for (json::Value const& field : letters.at(0).toObject().get("fields").toArray())
        found[field.toObject().get("name").toString()] = field.toObject().get("value");
    std::vector<std::string> lines;
    for (auto const& [name, value] : letter.expected)
        if (inText(found[name]) != inText(value))
            lines.push_back(letter.name + ": " + name + " is " + inText(found[name]));
    return lines;
}

class LetterPresets : public testing::Test {
protected:
    explicit LetterPresets(json::Object LetterSet::Letter::*preset) {
        json::Array extractPresets;
        json::Array packPresets;
        for (LetterSet::Letter const& letter : letters_) {
            std::ofstream(folder_ / letter.name.c_str(), std::ios::binary) << letter.pdf;
            extractPresets.append(letter.*preset);
            packPresets.append(letter.packPreset);
        }
        std::ofstream(settings_) << json::Object{{"extract_presets", extractPresets},
                                                 {"pack_presets", packPresets}};
    }

    /// One line of JSON a letter.
    std::vector<std::string> read() const {
        std::vector<std::string> arguments{"letter", "--json", "--settings", settings_};
        for (LetterSet::Letter const& letter : letters_)
            arguments.push_back((folder_ / letter.name.c_str()).string());
        std::istringstream out(runVlMail(arguments).out);
        std::vector<std::string> lines;
        for (std::string line; std::getline(out, line);)
            lines.push_back(line);
        return lines;
    }

    std::vector<std::string> misreadFields() const {
        std::vector<std::string> const lines = read();
        EXPECT_EQ(lines.size(), letters_.size());
        std::vector<std::string> all;
        for (std::size_t i = 0; i < std::min(lines.size(), letters_.size()); ++i)
            for (std::string& one : misread(letters_[i], lines[i]))
                all.push_back(std::move(one));
        return all;
    }

    VLServiceTest::TimeZone const utc_{"UTC"};
    TemporaryFolder const folder_;
    std::string const settings_ = (folder_ / "node.json").string();
    std::vector<LetterSet::Letter> const letters_ = LetterSet::all();
};

class PlainPresets : public LetterPresets {
protected:
    PlainPresets() : LetterPresets(&LetterSet::Letter::plainPreset) {}
};

class MeasuredPresets : public LetterPresets {
protected:
    MeasuredPresets() : LetterPresets(&LetterSet::Letter::measuredPreset) {}
};

TEST_F(PlainPresets, AreManyAndVaried) {
    std::set<std::string> names;
    std::size_t fields = 0;
    for (LetterSet::Letter const& letter : letters_) {
        names.insert(letter.name);
        fields += letter.expected.size();
    }
    EXPECT_EQ(names.size(), 42u);
    EXPECT_EQ(fields, 210u);
}

TEST_F(PlainPresets, FindAllFieldsOfAllLetters) { EXPECT_THAT(misreadFields(), IsEmpty()); }

TEST_F(MeasuredPresets, FindAllFieldsOfAllLetters) { EXPECT_THAT(misreadFields(), IsEmpty()); }

TEST_F(MeasuredPresets, HaveNoErrorsInTheEyesOfLint) {
    Ran const ran = runVlMail({"presets", "lint", settings_});
    EXPECT_THAT(ran.out, testing::HasSubstr(": 0 errors, ")) << ran.out;
}

TEST_F(PlainPresets, HaveNoErrorsInTheEyesOfLint) {
    Ran const ran = runVlMail({"presets", "lint", settings_});
    EXPECT_THAT(ran.out, testing::HasSubstr(": 0 errors, ")) << ran.out;
}

TEST_F(PlainPresets, SendPagesThatLookAsTheyDid) {
    std::vector<std::string> arguments{"mail",    "--json", "--settings",
                                       settings_, "-o",     (folder_ / "out").string()};
    for (LetterSet::Letter const& letter : letters_)
        arguments.push_back((folder_ / letter.name.c_str()).string());
    Ran const ran = runVlMail(arguments);
    json::Object const outcome = json::strToObject(ran.out.data(), ran.out.size());
    for (char const* const told : {"left_out", "failures", "notes"}) {
        std::string const all = outcome.get(told) ? inText(outcome.get(told)) : "";
        EXPECT_EQ(all.find("page-differs"), std::string::npos) << all;
        EXPECT_EQ(all.find("page-redrawn"), std::string::npos) << all;
        EXPECT_EQ(all.find("damaged"), std::string::npos) << all;
    }
    long long sent = 0;
    for (json::Value const& mailing : outcome.get("mailings").toArray())
        sent += mailing.toObject().get("letters").toInt();
    EXPECT_EQ(sent, 42) << inText(outcome.get("left_out"));
}

} // namespace

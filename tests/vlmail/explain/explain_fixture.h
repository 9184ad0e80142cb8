#pragma once
// Runs "vlmail letter --explain" over documents and settings.

#include "tests/support/temporary_folder.h"
#include "tests/support/time_zone.h"
#include "tests/vlmail/run_vlmail.h"
#include "vlservice/json/json_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

namespace VlMail {

class ExplainTest : public testing::Test {
protected:
    /// Runs the program; what it printed is in out_ and err_.
    int vlmail(std::vector<std::string> const& arguments) {
        Ran ran = runVlMail(arguments);
        out_ = std::move(ran.out);
        err_ = std::move(ran.err);
        return ran.status;
    }

    json::Object parsed() const { return json::strToObject(out_.data(), out_.size()); }

    /// What the program says in JSON about one document.
    json::Object explained(std::filesystem::path const& document, std::filesystem::path const& settings) {
        vlmail({"letter", "--explain", "--json", "--settings", settings.string(), document.string()});
        if (out_.empty())
            throw std::runtime_error(err_);
        return parsed();
    }

    /// The same for a text document and the text of its settings.
    json::Object explainedText(std::string const& document, std::string const& settings) {
        write("letter.txt", document);
        write("settings.json", settings);
        return explained(folder_ / "letter.txt", folder_ / "settings.json");
    }

    /// For one zone over the whole page with these fields.
    json::Object explainedFields(std::string const& document, std::string const& fields,
                                 std::string const& more = {}) {
        return explainedText(document,
                             R"({"extract_presets": [{"match": "letter.*", "pack_preset": "P", )" + more +
                                 R"("zones": [{"name": "Page", "location": )"
                                 R"({"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": [)" +
                                 fields + R"(]}]}], "pack_presets": [{"name": "P"}]})");
    }

    void write(std::string const& name, std::string const& text) {
        std::ofstream(folder_ / name.c_str(), std::ios::binary) << text;
    }

    /// The field of that name in the first zone that has it, on the first page that was searched.
    static json::Object fieldOf(json::Object const& reading, std::string const& name) {
        json::Object const& trace = reading.get("trace").toObject();
        json::Value const page = trace.get("pages").toArray().at(0);
        for (json::Value const& zone : page.toObject().get("zones").toArray())
            for (json::Value const& field : zone.toObject().get("fields").toArray())
                if (field.toObject().get("name").textOrEmpty() == name)
                    return field.toObject();
        ADD_FAILURE() << "there is no field " << name;
        return {};
    }

    static json::Array fieldsOfFirstZone(json::Object const& reading) {
        json::Value const page = reading.get("trace").toObject().get("pages").toArray().at(0);
        return page.toObject().get("zones").toArray().at(0).toObject().get("fields").toArray();
    }

    /// "kind: words" of each near miss of the field.
    static std::vector<std::string> nearMissesIn(json::Object const& field) {
        std::vector<std::string> told;
        json::Value const misses = field.get("near_misses");
        if (!misses)
            return told;
        for (json::Value const& miss : misses.toArray())
            told.push_back(miss.toObject().get("kind").textOrEmpty() + ": " +
                           miss.toObject().get("says").textOrEmpty());
        return told;
    }
    static std::vector<std::string> nearMisses(json::Object const& reading, std::string const& field) {
        return nearMissesIn(fieldOf(reading, field));
    }

    VLServiceTest::TimeZone const zone_{"UTC"};
    TemporaryFolder folder_;
    std::string out_;
    std::string err_;
};

} // namespace VlMail

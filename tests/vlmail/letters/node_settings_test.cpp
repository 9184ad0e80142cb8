#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/letters/node_settings.h"

#include "vlservice/json/json_text.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string>

namespace {

namespace fs = std::filesystem;

class NodeSettingsTest : public testing::Test {
protected:
    NodeSettingsTest() {
        std::string name = (fs::temp_directory_path() / "settings.XXXXXX").string();
        folder_ = ::mkdtemp(name.data());
    }
    ~NodeSettingsTest() override { fs::remove_all(folder_); }

    fs::path file(std::string const& text) {
        fs::path const path = folder_ / "node.json";
        std::ofstream(path) << text;
        return path;
    }
    std::string errorOf(fs::path const& path) {
        try {
            VlMail::NodeSettings::fromFile(path);
        } catch (std::runtime_error const& error) {
            return error.what();
        }
        return "no error";
    }
    std::string packPresetFor(fs::path const& path, std::string const& document) {
        return VlMail::NodeSettings::fromFile(path).presets().findMatch(document).second.name();
    }

    fs::path folder_;
};

TEST_F(NodeSettingsTest, TakesPartsUnderTheirNames) {
    fs::path const path = file(R"({"presets": {"extract_presets": [{"match": "a.*", "pack_preset": "A"}],
                                               "pack_presets": ["A"]}})");
    EXPECT_EQ(errorOf(path),
              "cannot use the presets in \"" + path.string() +
                  "\": JSON error: Wrong type: string. Expected type: object; correct them there");
    file(R"({"app": {"m": 1}, "presets": {"extract_presets": [{"match": "a.*", "pack_preset": "A"}],
                                          "pack_presets": [{"name": "A"}]}})");
    EXPECT_EQ(packPresetFor(path, "abc"), "A");
    EXPECT_EQ(packPresetFor(path, "xyz"), "GLOBAL");
}

/// What a node of the account acme inherits from the root.
Protocol::SettingsAnswer inheritedSettings() {
    std::string const text =
        R"({"id":"a=acme","known":true,"chain":["a=acme",""],"parts":{)"
        R"("app":{"own":{},"values":{"descr":"above","db_name":"n"},"origins":{"descr":"","db_name":null}},)"
        R"("presets":{"own":{},"values":{"extract_presets":[{"match":".*","pack_preset":"P"}],)"
        R"("pack_presets":[{"name":"P"}]},"origins":{"extract_presets":[""],"pack_presets":[""]}}}})";
    return Protocol::SettingsAnswer(json::strToObject(text.data(), text.size()));
}

TEST_F(NodeSettingsTest, AreANodesOwnOverWhatItInherits) {
    VlMail::NodeSettings const settings =
        VlMail::NodeSettings::fromText(R"({"app": {"descr": "own"}, "presets": {
            "extract_presets": [{"match": "a.*", "pack_preset": "late", "order": 9},
                                {"match": "ab.*", "pack_preset": "early", "order": 3}],
            "pack_presets": [{"name": "early"}, {"name": "late"}]}})",
                                       "mine")
            .over(inheritedSettings());
    EXPECT_EQ(json::toText(settings.part("app")), R"({"descr":"own","db_name":"n"})");
    EXPECT_EQ(settings.sourced().sourceOf("app", "descr"), "a=acme");
    EXPECT_EQ(settings.sourced().sourceOf("app", "db_name"), "the built-in settings");
    EXPECT_EQ(settings.sourced().sourceOfPackPreset("early"), "a=acme");
    EXPECT_EQ(settings.sourced().sourceOfPackPreset("P"), "the root");
    Cfg::Presets const presets = settings.presets();
    EXPECT_EQ(presets.findMatch("abc").second.name(), "early");
    EXPECT_EQ(presets.findMatch("acc").second.name(), "late");
    EXPECT_EQ(presets.findMatch("xyz").second.name(), "P");
}

TEST_F(NodeSettingsTest, NameThePartThatCannotStandOverWhatIsInherited) {
    VlMail::NodeSettings const settings = VlMail::NodeSettings::fromText(R"({"app": {"descr": 7}})", "mine");
    try {
        settings.over(inheritedSettings());
        FAIL() << "nothing was thrown";
    } catch (std::runtime_error const& error) {
        EXPECT_STREQ(error.what(),
                     "cannot use the part \"app\" in \"mine\": JSON error: Wrong type: integer. "
                     "Expected type: string; correct it there");
    }
}

TEST_F(NodeSettingsTest, TakesThePresetsPartByItself) {
    EXPECT_EQ(packPresetFor(file(R"({"pack_presets": [{"name": "B"}],
                                     "extract_presets": [{"match": "b", "pack_preset": "B"}]})"),
                            "B"),
              "B");
}

TEST_F(NodeSettingsTest, AppliesTheGlobalDefaultsWithoutADocument) {
    EXPECT_EQ(VlMail::NodeSettings().presets().findMatch("x").second.name(), "GLOBAL");
}

TEST_F(NodeSettingsTest, SaysWhatIsWrongWhereAndWhatToDo) {
    fs::path const path = file("{\"presets\": ");
    EXPECT_EQ(errorOf(path),
              "cannot read the settings in \"" + path.string() +
                  "\": JSON error: unexpected token near end of file (line 1, column 12); correct the "
                  "file there");
    file(R"({"preset": {}})");
    EXPECT_EQ(errorOf(path),
              "cannot use the settings in \"" + path.string() +
                  "\": \"preset\" is no settings part; name the parts \"presets\", \"app\", \"inet\", "
                  "\"po\", \"deps\" or \"profiles\"");
    EXPECT_EQ(errorOf(folder_ / "missing"),
              (folder_ / "missing").string() + ": there is no such file; check the name");
}

} // namespace

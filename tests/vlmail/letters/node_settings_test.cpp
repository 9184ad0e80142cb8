#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/letters/node_settings.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>

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

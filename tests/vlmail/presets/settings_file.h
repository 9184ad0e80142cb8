#pragma once
// Settings documents in tests, small ones made of the piece that a test is about.

#include "tests/support/temporary_folder.h"

#include <filesystem>
#include <fstream>
#include <string>

class SettingsFile {
public:
    explicit SettingsFile(std::string const& json) { std::ofstream(path()) << json; }

    std::string path() const { return (folder_ / "node.json").string(); }

private:
    TemporaryFolder folder_;
};

inline std::string const ADDRESS =
    R"({"name": "to", "value_extract": "^To: (?<VAL>.*)$", "priority": 1, "send_to_server": true})";

/// The part "presets" alone.
inline std::string partOf(std::string const& extractPresets,
                          std::string const& packPresets = R"({"name": "P"})") {
    return R"({"extract_presets": [)" + extractPresets + R"(], "pack_presets": [)" + packPresets + "]}";
}

/// A preset for names like "a.pdf" with these zones; it needs nothing but what the zones lack.
inline std::string presetWith(std::string const& zones) {
    return R"({"match": "a.*", "pack_preset": "P", "zones": [)" + zones + "]}";
}

/// A zone with an address and, when it is not empty, a further field.
inline std::string zoneWith(std::string const& field, std::string const& more = "") {
    return R"({"name": "Z", "fields": [)" + ADDRESS + (field.empty() ? "" : ", ") + field + "]" + more + "}";
}

/// A part whose one preset has an address and this field: "/extract_presets/0/zones/0/fields/1".
inline std::string partWithField(std::string const& field) { return partOf(presetWith(zoneWith(field))); }

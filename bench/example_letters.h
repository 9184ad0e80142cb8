#pragma once
// The example letters as benchmarks read them.

#include "vlservice/extract/extract_preset.h"

#include <filesystem>
#include <string>
#include <vector>

namespace Bench {

/// The PDFs of an office and its like.
inline std::vector<std::string> const& documents() {
    static std::vector<std::string> const files = [] {
        std::vector<std::string> found;
        for (auto const& entry : std::filesystem::recursive_directory_iterator(VLSERVICE_EXAMPLE_LETTERS))
            if (entry.path().extension() == ".pdf")
                found.push_back(entry.path().string());
        return found;
    }();
    return files;
}

inline Cfg::ExtractPreset addressAlone() {
    Cfg::ExtractPreset preset;
    preset.zones().emplace_back(Cfg::ExtractZone::DEF_ZONE_NAME,
                                std::vector<Cfg::ExtractField>{Cfg::ExtractField::DefPostal()});
    return preset;
}

} // namespace Bench

#pragma once
// Where the settings of a workbench are kept: read, and written only when they still are what was read.

#include <filesystem>
#include <memory>
#include <string>

namespace VlMail::Workbench {

struct StoredSettings {
    /// Lines end by "\n", however the store ends them.
    std::string text;
    /// Another one whenever what is stored is another.
    std::string version;
};

class SettingsStore {
public:
    virtual ~SettingsStore() = default;

    /// "file" or "none".
    virtual char const* kind() const = 0;
    virtual std::string name() const = 0;
    /// Throws Base::Error.
    virtual StoredSettings read() = 0;
    /// Throws Base::Error, and leaves what is stored as it is.
    virtual StoredSettings write(std::string const& text) = 0;
};

/// A file keeps its rights and the ends of its lines; a link leads to the file that is written.
std::unique_ptr<SettingsStore> settingsInFile(std::filesystem::path file);
/// Settings that were begun with nothing and lie nowhere.
std::unique_ptr<SettingsStore> settingsNowhere();

} // namespace VlMail::Workbench

#pragma once
// Where the settings of a workbench are kept: read, and written only when they still are what was read.

#include "programs/base/error.h"
#include "programs/vlmail/service/service_line.h"

#include <filesystem>
#include <memory>
#include <string>

namespace VlMail::Workbench {

struct StoredSettings {
    /// Lines end by "\n", however the store ends them.
    std::string text;
    /// Another one whenever what is stored is another.
    std::string version;
    /// What counts beside them, as a service has answered a query for what the node inherits; empty where
    /// nothing is inherited.
    std::string inherited = {};
};

class SettingsStore {
public:
    virtual ~SettingsStore() = default;

    /// "file", "node" or "none".
    virtual char const* kind() const = 0;
    virtual std::string name() const = 0;
    /// Throws Base::Error.
    virtual StoredSettings read() = 0;
    /// Throws Base::Error, and leaves what is stored as it is: by settingsChanged() when that is not of the
    /// version any more.
    virtual StoredSettings write(std::string const& text, std::string const& version) = 0;
};

Base::Error settingsChanged();

/// A file keeps its rights and the ends of its lines; a link leads to the file that is written.
std::unique_ptr<SettingsStore> settingsInFile(std::filesystem::path file);
/// A node's own settings, under the name that people have for the node. Each operation makes a connection of
/// its own, in whatever process it is called.
std::unique_ptr<SettingsStore> settingsOfNode(std::string nodeId, std::string name,
                                              ServiceLine::Connect connect);
/// Settings that were begun with nothing and lie nowhere.
std::unique_ptr<SettingsStore> settingsNowhere();

} // namespace VlMail::Workbench

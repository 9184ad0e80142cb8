#pragma once
// The service's own settings, beside those of the nodes.

#include "programs/vlserviced/settings/tariff.h"
#include "vlservice/json/json.h"

#include <optional>
#include <string>
#include <vector>

namespace VlServiced {

/// What is held back for the time being: the bits of CSConfigSrvChange's number.
enum class Suspended : int {
    Nothing = 0,
    /// Settings can be read and not changed.
    SettingsChanges = 1,
    /// Jobs are accepted and wait.
    Jobs = 2,
};

/// A view of the stored object. Reading the values that are not there gives the defaults told.
class ServiceSettings {
public:
    /// `stored` was made by withChanges() and withSuspended() alone.
    explicit ServiceSettings(json::Object stored);

    json::Object const& stored() const { return stored_; }
    /// Where finished containers are handed on; empty when nothing was set.
    std::string uploadFolder() const;
    /// Throws Error when there is none yet.
    Tariff tariff() const;
    /// Whether the node, or one above it, is among the disabled ones.
    bool isDisabled(std::string const& nodeId) const;
    bool isSuspended(Suspended what) const;

    /// The settings with the keys of `changes` replaced; JSON null erases a key.
    /// Throws Error on keys that cannot be set ("upload_folder", "tariff" and "disabled" can) and bad values.
    ServiceSettings withChanges(json::Object const& changes) const;
    /// Throws Error when the number has bits that mean nothing.
    ServiceSettings withSuspended(int bits) const;

private:
    json::Object stored_;
};

} // namespace VlServiced

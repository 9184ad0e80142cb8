#pragma once
// The service's own settings, beside those of the nodes.

#include "programs/protocol/carrier.h"
#include "programs/protocol/price.h"
#include "programs/protocol/service_settings.h"
#include "vlservice/json/json.h"

#include <map>
#include <optional>
#include <string>
#include <unordered_set>

namespace VlServiced {

using Protocol::Suspended;

/// A view of the stored object. Reading the values that are not there gives the defaults told.
class ServiceSettings {
public:
    /// `stored` was made by withChanges() and withSuspended() alone.
    explicit ServiceSettings(json::Object stored);

    json::Object const& stored() const { return stored_; }
    /// Without what is nobody's affair but the service's.
    json::Object told() const;
    /// Where finished containers are handed on; empty when nothing was set.
    std::string const& uploadFolder() const { return values_.uploadFolder; }
    /// Which of all folders of that name it is, as Base::FolderIdentity tells it; empty when that is not
    /// known.
    std::string uploadFolderIdentity() const;
    /// Throws Error when there is none yet.
    Protocol::Tariff tariff() const;
    /// By their channels.
    Protocol::Carriers carriers() const;
    /// Whether the node, or one above it, is among the disabled ones.
    bool isDisabled(std::string const& nodeId) const;
    bool isSuspended(Suspended what) const;
    /// How many bytes the packs of a node may have with the service at once, by its own quota or that of the
    /// nearest node above; nothing when there is none.
    std::optional<long long> quotaOf(std::string const& nodeId) const;
    /// 0 is for ever.
    int retentionDays() const { return values_.retentionDays; }

    /// The settings with the keys of `changes` replaced; JSON null erases a key.
    /// Throws Error on keys that are none of Protocol::SETTABLE, and on bad values.
    ServiceSettings withChanges(json::Object const& changes) const;
    /// The empty text is none.
    ServiceSettings withFolderIdentity(std::string const& identity) const;
    /// Which folders those of the carriers are, by their channels.
    ServiceSettings withCarrierFolders(std::map<std::string, std::string> const& identities) const;
    /// Throws Error when the number has bits that mean nothing.
    ServiceSettings withSuspended(int bits) const;

private:
    json::Object stored_;
    Protocol::ServiceSettings values_;
    std::unordered_set<std::string> disabled_;
};

} // namespace VlServiced

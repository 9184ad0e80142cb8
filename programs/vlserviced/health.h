#pragma once
// What the service can tell of how it is doing: what it needs to work, looked at one by one.

#include "programs/protocol/carrier.h"
#include "programs/protocol/health.h"
#include "programs/vlserviced/settings/service_settings.h"

#include <filesystem>
#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace VlServiced {

/// Of the letters that were sent.
struct RegisterState {
    bool hasItsSecret = true;
    /// When the next of them are past, or were; nothing when there are none.
    std::optional<long long> nextEnd = {};
};

struct HealthSources {
    /// Begins a change and takes it back. Throws std::exception when none can be made.
    std::function<void()> tryDatabase;
    /// As people know it.
    std::string database;
    std::filesystem::path data;
    std::filesystem::path outbox;
    std::function<ServiceSettings()> settings;
    std::function<Protocol::CarriersAnswer()> carriers;
    /// When the certificate that it shows ends, in seconds since the epoch; nothing without TLS.
    std::optional<long long> certificateEnds;
    bool answersDiscovery = false;
    std::function<long long()> now;
    /// Throws std::exception when the database does not tell.
    std::function<RegisterState()> letterRegister = [] { return RegisterState(); };
};

/// Throws nothing of what it looks at: what cannot be had is told as bad.
Protocol::HealthAnswer healthOf(HealthSources const& sources);

} // namespace VlServiced

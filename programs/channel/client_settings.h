#pragma once
// What a client's side of the connection is told.

#include "programs/channel/host_lookup.h"
#include "programs/channel/tls.h"
#include "vlservice/platform/cmd.h"

#include <chrono>
#include <cstdint>
#include <functional>
#include <string>

namespace Channel {

struct ClientSettings {
    std::string host;
    std::uint16_t port = 0;
    std::string token;
    Tls tls = Tls::Auto;
    /// The file of accepted certificates.
    std::string pinFile;
    /// Shows a certificate that is new to the person and tells whether to go on; it is then accepted for
    /// good. Without this function new certificates are refused.
    std::function<bool(std::string const& service, std::string const& fingerprint)> acceptNew;

    /// Whether a service that speaks version 1 alone will do, in which nothing but the greeting is proved.
    bool allowsVersion1 = false;
    /// Runs on another thread, which is left behind when the time is up.
    LookUp lookUp = &lookUpHost;

    /// For finding the host, connecting and the exchange of proofs together.
    std::chrono::milliseconds connectTime = std::chrono::seconds(10);
    /// How long a request of that class may take; zero is no limit.
    std::function<std::chrono::milliseconds(Ipc::Timeouts::TimeoutId)> requestTime = &Ipc::Timeouts::duration;
};

} // namespace Channel

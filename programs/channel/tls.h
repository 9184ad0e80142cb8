#pragma once
// When a connection is encrypted.

namespace Channel {

enum class Tls {
    /// Unless the service's address is a loopback one.
    Auto,
    Always
};

} // namespace Channel

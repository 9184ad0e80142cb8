#pragma once
// How a mailing is processed, as words of flag bits. The library knows the rules on the bits that hold for a
// pack preset read from JSON, and not what the bits mean.

#include <cstdint>

namespace Cfg {

struct ProcessMode {
    constexpr ProcessMode() = default;
    /// Any bits: nothing is checked here.
    explicit constexpr ProcessMode(std::uint32_t bits) : bits_(bits) {}

    constexpr std::uint32_t bits() const { return bits_; }
    friend constexpr bool operator==(ProcessMode, ProcessMode) = default;

private:
    std::uint32_t bits_ = 0;
};

/// The part of it that concerns the client program.
struct ProcessModeClient {
    constexpr ProcessModeClient() = default;
    /// Any bits: nothing is checked here.
    explicit constexpr ProcessModeClient(std::uint32_t bits) : bits_(bits) {}

    constexpr std::uint32_t bits() const { return bits_; }
    friend constexpr bool operator==(ProcessModeClient, ProcessModeClient) = default;

private:
    std::uint32_t bits_ = 0;
};

} // namespace Cfg

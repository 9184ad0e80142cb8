#pragma once
// How a mailing is processed, as words of flag bits. The library knows the rules on the bits that hold for a
// pack preset read from JSON, and not what the bits mean.

#include <cstdint>

namespace Cfg {

/// What holds for a word of flag bits in a pack preset.
struct ModeRules {
    static constexpr std::uint32_t WIDTH = 0xFF; ///< all bits that there are

    /// Bits that exclude each other; none when 0.
    std::uint32_t exclusive;
    /// Bits of which a mode that is set needs one.
    std::uint32_t required;

    /// Whether all of the bits that exclude each other are set.
    constexpr bool excludesItself(std::uint32_t bits) const {
        return exclusive != 0 && (bits & exclusive) == exclusive;
    }
    /// Whether a preset may have these bits: none, or some that go together.
    constexpr bool allows(std::uint32_t bits) const {
        return bits == 0 || (bits <= WIDTH && !excludesItself(bits) && (bits & required) != 0);
    }
};

/// How the service processes a mailing.
struct ProcessMode {
    static constexpr ModeRules RULES{.exclusive = 0x02 | 0x08, .required = 0x01 | 0x02 | 0x08 | 0x80};

    constexpr ProcessMode() = default;
    /// Any bits: nothing is checked here.
    explicit constexpr ProcessMode(std::uint32_t bits) : bits_(bits) {}

    constexpr std::uint32_t bits() const { return bits_; } ///< the word
    friend constexpr bool operator==(ProcessMode, ProcessMode) = default;

private:
    std::uint32_t bits_ = 0;
};

/// The part of it that concerns the client program.
struct ProcessModeClient {
    static constexpr ModeRules RULES{.exclusive = 0, .required = 0x01 | 0x02 | 0x10};

    constexpr ProcessModeClient() = default;
    /// Any bits: nothing is checked here.
    explicit constexpr ProcessModeClient(std::uint32_t bits) : bits_(bits) {}

    constexpr std::uint32_t bits() const { return bits_; } ///< the word
    friend constexpr bool operator==(ProcessModeClient, ProcessModeClient) = default;

private:
    std::uint32_t bits_ = 0;
};

} // namespace Cfg

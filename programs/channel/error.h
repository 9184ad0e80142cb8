#pragma once
// The one failure of the channel.

#include <stdexcept>
#include <string>

namespace Channel {

/// what() is one line for a person: what failed, where, and what to do if that can be said.
class Error : public std::runtime_error {
public:
    explicit Error(std::string const& message) : std::runtime_error(message) {}
};

} // namespace Channel

#pragma once
// Finding a host's addresses, by a function that may wait for as long as the system's name servers do.

#include <functional>
#include <string>
#include <vector>

namespace Channel {

/// The addresses of a host as texts, in the order in which they are to be tried. Throws Error.
using LookUp = std::function<std::vector<std::string>(std::string const& host)>;

/// Asks the system.
std::vector<std::string> lookUpHost(std::string const& host);

} // namespace Channel

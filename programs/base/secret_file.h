#pragma once
// Where secrets lie that settings name and never hold.

#include <string>

namespace Base {

/// An absolute path as it is; a bare name among the credentials that the system's manager hands over. Throws
/// Error when it has handed none over.
std::string secretFile(std::string const& name);

} // namespace Base

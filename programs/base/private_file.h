#pragma once
// Files with secrets, or with what must not be forged: readable and writable by their owner alone.

#include <string>

namespace Base {

/// The contents, of at most `limit` bytes. Throws Error for a file that is missing, no regular one, another
/// user's, or open to the group or to others in any way. The administrator may let a group read what is his:
/// so the system's manager hands secrets over to accounts of services.
std::string readPrivateFile(std::string const& file, std::size_t limit = 1024 * 1024);

/// Writes a file of mode 0600 with all of the contents or not at all. Gives false when there is such a file
/// already. Throws Error.
bool createPrivateFile(std::string const& file, std::string const& contents);

/// Adds to a file, which is made with mode 0600 when there is none. Throws Error.
void appendToPrivateFile(std::string const& file, std::string const& contents);

} // namespace Base

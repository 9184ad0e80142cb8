#pragma once
// Names from outside (documents, pages) as names of files that stay inside a folder.

#include <string>

namespace Base {

/// A name for one file: no separators, no control characters, no leading dot or blank, at most 200 bytes cut
/// between characters, valid UTF-8; never empty, ".", or "..". Characters that may not stand become "_".
/// Different names may give the same safe name.
std::string safeFileName(std::string const& name);

} // namespace Base

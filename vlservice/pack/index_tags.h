#pragma once
// Single tags of a container's index, for those who read one that is damaged as a whole.

#include "vlservice/export.h"
#include "vlservice/pack/pack_wrapper.h"

#include <optional>
#include <string>

namespace Container {

// A tag is from "<" to ">", with or without "/" at its end. It is read byte by byte, so that a damaged
// character takes nothing with it: texts need not be UTF-8. A tag that cannot be parsed, or is that of
// another element, gives nothing.

/// What the tag of an item says; what is not there or unreadable stays empty or zero.
VLSERVICE_EXPORT std::optional<PackWrapper::BinEntry> itemInTag(std::string tag);

/// The id in the tag of the mailing.
VLSERVICE_EXPORT std::optional<std::string> mailingIdInTag(std::string tag);

} // namespace Container

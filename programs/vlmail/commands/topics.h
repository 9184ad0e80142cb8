#pragma once
// What docs/ explain of the commands, and beside them.

#include "programs/manual/topic.h"

#include <span>

namespace VlMail {

/// By the words of a command, or by a word of its own.
std::span<Manual::Topic const> topics();

} // namespace VlMail

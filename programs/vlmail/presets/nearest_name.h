#pragma once
// Which of several names was probably meant.

#include <span>
#include <string>

namespace VlMail {

/// Of the candidates the one that the name was probably meant to be; empty when none is near.
std::string nearestName(std::string const& name, std::span<std::string const> candidates);

} // namespace VlMail

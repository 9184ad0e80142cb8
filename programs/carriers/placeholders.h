#pragma once
// Texts of settings with what is known of a letter filled in.

#include "programs/carriers/carrier.h"

#include <string>

namespace Carriers {

/// The text with {NAME} replaced by the letter's field of that name, {key} by its key, {id} by the
/// mailing's id and {phone_number} by the digits of its address, with "+" in front where it begins so. What
/// is filled in is not looked at again; its control characters become blanks. Braces around anything but
/// letters, digits and "_" stay. Throws Error when the letter has no such field.
std::string filledIn(std::string const& text, OutgoingLetter const& letter, std::string const& mailing);

} // namespace Carriers

#pragma once
// The records of settings as JSON schemas, made from the tables of their keys.

#include "vlservice/json/json.h"
#include "vlservice/json/record_keys.h"

#include <string_view>

namespace VlMail {

/// By the name that a schema has for it: that of a part such as "app", or "field"; the empty handle when
/// there is no such record. Records in it are definitions.
json::Value recordNamed(std::string_view name);

/// A pack preset as the metadata of a mailing holds it: its name has another key, and others stand beside its
/// own.
json::Object embeddedPackPreset();

} // namespace VlMail

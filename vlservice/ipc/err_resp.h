#pragma once
// The response of a command that can fail on the service's side: "err" with one line of text, nothing on
// success.

#include "vlservice/json/json.h"

#include <string>

namespace Ipc {

/// The empty text is success and gives an empty object.
json::Object errToResp(std::string const& error);
/// A response without the key, or with another type under it, is success.
std::string errFromResp(json::Object const& response);

} // namespace Ipc

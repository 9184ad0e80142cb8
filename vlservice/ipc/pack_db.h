#pragma once
// The JSON form of where the pack database is, for the commands that name nothing else.

#include "vlservice/export.h"
#include "vlservice/json/json.h"

#include <string>

namespace Ipc {

struct VLSERVICE_EXPORT PackDb {
    std::string host;
    std::string name;

    json::Object serialize() const;
    /// Throws json::Exc at the first key that holds no string; one before it has been taken over.
    void deserialize(json::Object const& request);
};

} // namespace Ipc

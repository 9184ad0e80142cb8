#pragma once
// The JSON form of where the pack database is, for the commands that name nothing else.

#include "vlservice/export.h"
#include "vlservice/json/json.h"

#include <string>

namespace Ipc {

/// Host and name; a database that is a file has its folder for the host.
struct VLSERVICE_EXPORT PackDb {
    std::string host; ///< or the folder of a file
    std::string name; ///< of the database, or of the file

    json::Object serialize() const;
    /// Throws json::Exc at the first key that holds no string; one before it has been taken over.
    void deserialize(json::Object const& request);
};

} // namespace Ipc

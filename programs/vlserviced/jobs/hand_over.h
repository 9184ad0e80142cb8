#pragma once
// Handing a container on to the upload folder: exactly once, whatever ends the program in between.

#include "programs/vlserviced/settings/upload_folder.h"

#include <filesystem>
#include <functional>
#include <optional>
#include <string>

namespace VlServiced {

// The steps, between which the caller records where it stands:
//
//     stage    the container is copied into the folder under a temporary name
//              (on record: Submitting, and the folder's identity)
//     publish  the temporary name becomes the container's own
//              (on record: Submitted)
//
// Whoever finds "Submitting" on record calls publish again, in the very same folder: it does something
// exactly when the temporary file is still there. The temporary name holds the fence under which it was
// staged: who stalled meanwhile, and was taken for dead, has a name of his own, which nobody publishes. Only
// the fence on record is published, and by whoever comes first. 0 is a name without one. Whoever takes
// containers away leaves names alone that begin with a dot.

/// Throws std::system_error when the copy cannot be made. What lies under the temporary name goes.
void stage(std::filesystem::path const& container, UploadFolder const& folder, long long fence = 0);
/// Takes back what was staged and is not to be published. Throws std::system_error.
void unstage(std::string const& name, UploadFolder const& folder, long long fence = 0);
/// Removes what lies there of a container that was handed over, and what was reported of it. Throws
/// std::system_error.
void discardHandedOver(std::string const& name, UploadFolder const& folder);
/// Throws std::system_error.
void publish(std::string const& name, UploadFolder const& folder, long long fence = 0);
/// Takes back what was staged under fences that `isOfUse` does not know. Throws std::system_error.
void sweepStaged(UploadFolder const& folder,
                 std::function<bool(std::string const& name, long long fence)> const& isOfUse);

/// What the carrier says of a container: NAME.status in the folder, one JSON object with "state" ("delivered"
/// or "failed") and "text".
struct CarrierReport {
    bool delivered = false;
    std::string text;
};

/// Whether the container still lies in the folder. Throws std::system_error when the folder cannot be read.
bool liesIn(UploadFolder const& folder, std::string const& name);
/// Nothing when there is no report, or none that can be read: that is logged.
std::optional<CarrierReport> carrierReport(UploadFolder const& folder, std::string const& name);

} // namespace VlServiced

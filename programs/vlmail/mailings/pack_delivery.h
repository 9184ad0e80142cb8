#pragma once
// From the pack database to the service: packs that are sent, those that were left behind, and those that the
// service has fetched.

#include "programs/mailing/pack_database.h"
#include "programs/protocol/job.h"
#include "programs/vlmail/mailings/careful_upload.h"
#include "programs/vlmail/mailings/pack_upload.h"
#include "programs/vlmail/service/service_line.h"

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace VlMail {

/// Sends a finished pack of a pack database over the connection, to an older service by its path, and has it
/// processed and, with `upload`, handed on; goes on when the connection breaks. Waits some seconds for the
/// service to make its container, and erases the pack when the service has its pages. Letters that went out
/// before stay behind. Throws NothingToSend when these are all, and Error, whose line names the pack and what
/// can be done with it.
Protocol::JobReport deliverPack(ServiceLine& service, std::filesystem::path const& database,
                                std::string const& packId, bool upload, UploadWatcher const& watcher = {},
                                LeftOutWatcher const& leftOut = {});

/// The same for a pack that lies elsewhere, and stays there.
Protocol::JobReport deliverPack(ServiceLine& service, Mailing::PackSource& pack, bool upload,
                                UploadWatcher const& watcher = {}, LeftOutWatcher const& leftOut = {});

/// The id of a finished pack of the database that says the same in the same pages, for the same node, as one
/// that is whole and not finished: what is left of an earlier sending that was not finished. Throws Error.
std::optional<std::string> samePackLeftBehind(std::filesystem::path const& database,
                                              std::string const& packId);

/// Erases the packs that the service has fetched, of those that are older than so many seconds, and gives
/// those that it has no job of, the oldest first. Throws std::exception with a line for people.
std::vector<Mailing::StoredPack> settlePacks(Channel::Client& service, std::filesystem::path const& database,
                                             long long olderThan = -1);

/// Erases a pack that the service does not need any more, or never will. Throws Error when the service is
/// about to fetch it, and when there is none.
void discardPack(Channel::Client& service, std::filesystem::path const& database, std::string const& packId);

} // namespace VlMail

#pragma once
// From the pack database to the service: packs that are sent, those that were left behind, and those that the
// service has fetched.

#include "programs/mailing/pack_database.h"
#include "programs/protocol/job.h"
#include "programs/vlmail/service/service_line.h"

#include <filesystem>
#include <string>
#include <vector>

namespace VlMail {

/// Has a finished pack processed and, with `upload`, handed on; repeated when the connection breaks. Waits
/// some seconds for the service to fetch the pages, and erases the pack when it has. Throws Error, whose line
/// names the pack and what can be done with it.
Protocol::JobReport deliverPack(ServiceLine& service, std::filesystem::path const& database,
                                std::string const& packId, bool upload);

/// Erases the packs that the service has fetched, and gives those that it has no job of, the oldest first.
/// Throws std::exception with a line for people.
std::vector<Mailing::StoredPack> settlePacks(Channel::Client& service, std::filesystem::path const& database);

/// Erases a pack that the service does not need any more, or never will. Throws Error when the service is
/// about to fetch it, and when there is none.
void discardPack(Channel::Client& service, std::filesystem::path const& database, std::string const& packId);

} // namespace VlMail

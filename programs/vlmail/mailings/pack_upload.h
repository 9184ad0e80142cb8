#pragma once
// The pages of a pack on their way to the service, over the connection.

#include "programs/mailing/pack_source.h"
#include "programs/protocol/pack_upload.h"
#include "programs/vlmail/service/service_line.h"

#include <functional>

namespace VlMail {

/// Told how many of how many bytes the service has.
using UploadWatcher = std::function<void(long long done, long long all)>;

/// What is said of a pack before its pages come; reads all of it. Throws Error.
Protocol::BeginPack beginningOf(Mailing::PackSource& pack);

/// Sends what the service lacks of a pack and has it accepted. When the connection breaks it goes on, on
/// another one, where it was; sending a pack again changes nothing. Throws std::exception with a line for
/// people.
void uploadPack(ServiceLine& service, Mailing::PackSource& pack, UploadWatcher const& watcher = {});

} // namespace VlMail

#pragma once
// From the pages of a pack to a container in the outbox.

#include "programs/base/error.h"
#include "programs/mailing/pack_source.h"
#include "vlservice/json/json.h"

#include <filesystem>

namespace VlServiced {

/// The pack itself is at fault: trying again would not help.
class BadPack : public Base::Error {
public:
    using Error::Error;
};

/// Writes the pack's container to `target`, which is there only when it is whole, replacing one of that name.
/// `decided` are members that its metadata has whatever the client wrote.
/// Throws BadPack when a page is no compressed page; Error and std::system_error when the pages cannot be
/// read or the container cannot be written, which may pass.
void writeContainer(Mailing::PackSource& pack, std::filesystem::path const& target,
                    json::Object const& decided = {});

} // namespace VlServiced

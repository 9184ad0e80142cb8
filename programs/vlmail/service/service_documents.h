#pragma once
// Documents of nodes on their way to the service and back. How they travel is told in docs/service.md and
// known here alone.

#include "programs/protocol/documents.h"

#include <string>

namespace Channel {
class Client;
}

namespace VlMail {

/// Those that count at a node. Throws Error with the service's line, as the others do.
Protocol::DocumentsAnswer documentsOf(Channel::Client& service, std::string const& nodeId);
/// The version of a document that has this digest: exactly that, or an Error.
std::string fetchDocument(Channel::Client& service, std::string const& sha256);
/// Puts a document at a node under a name and gives its digest. It is there whole or not at all.
std::string putDocument(Channel::Client& service, std::string const& nodeId, std::string const& name,
                        std::string const& bytes);
/// Removes it and tells which it was.
Protocol::StoredDocument removeDocument(Channel::Client& service, Protocol::DocumentRemoval const& removal);

} // namespace VlMail

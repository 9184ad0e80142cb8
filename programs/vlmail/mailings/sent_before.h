#pragma once
// Letters that the service had before, which stay behind.

#include "programs/protocol/letter_register.h"
#include "programs/vlmail/service/service_line.h"

#include <functional>
#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace VlMail {

/// "sent-before: 2026-11-20 in ID, delivered".
std::string sentBeforeInWords(Protocol::RegisteredLetter const& letter);

/// Asks a service; throws std::exception with a line for people.
using RegisterAsker = std::function<Protocol::RegisterAnswer(Protocol::RegisterQuery const&)>;

/// The service has to outlive it.
RegisterAsker registerOf(ServiceLine& service);

/// Asks for letters that are to be sent for a node.
class SentBefore {
public:
    /// Letters of the packs `besides` were not sent before: sending one of these again is no second sending.
    SentBefore(RegisterAsker asker, std::string nodeId, std::vector<std::string> besides)
        : asker_(std::move(asker)), nodeId_(std::move(nodeId)), besides_(std::move(besides)) {}

    /// Those of the digests that are there, with why their letters stay behind; none with a service that
    /// keeps no register. Throws std::exception with a line for people.
    std::map<std::string, std::string> of(std::vector<std::string> const& digests);

private:
    std::vector<Protocol::RegisteredLetter> ask(std::vector<std::string> const& digests);

    RegisterAsker asker_;
    std::string nodeId_;
    std::vector<std::string> besides_;
};

} // namespace VlMail

#pragma once
// A mailing on its way to where it goes: a file, a service, or nowhere while only a plan is made.

#include "programs/vlmail/mailings/mailing_builder.h"
#include "programs/vlmail/service/service_line.h"

#include <cstddef>
#include <ctime>
#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace VlMail {

class OutgoingMailing {
public:
    virtual ~OutgoingMailing();

    virtual MailingBuilder& builder() = 0;
    /// Lets the mailing arrive. Throws NothingToSend when none of its letters is to be sent, and
    /// std::exception with a line for people; nothing has arrived then.
    virtual void finish() = 0;
    /// Once it has arrived; empty when it arrives nowhere.
    virtual std::string id() const = 0;
    /// Where it is once it has arrived.
    virtual std::string place() const = 0;

    /// A letter that stayed behind, by its place among those of the metadata, and why.
    struct LeftOut {
        std::size_t index;
        std::string why;
    };
    /// Once finish() has ended, also where it has thrown NothingToSend.
    virtual std::vector<LeftOut> leftOut() const { return {}; }
};

/// Begins a mailing for a pack preset.
using BeginMailing = std::function<std::unique_ptr<OutgoingMailing>(Cfg::PackPreset const&)>;

/// Mailings as files "<id>.mailing" in a folder, which is made when it is missing. Throws Error when it
/// cannot be made.
BeginMailing mailingsIntoFolder(std::filesystem::path const& folder);

/// Mailings that a service is to process: stored in the pack database of a node and announced to the service,
/// which must outlive the function. With `upload` the service hands them on at once. A mailing that is left
/// of an earlier run and says the same goes instead. Throws std::exception with a line for people.
BeginMailing mailingsToService(ServiceLine& service, std::string const& nodeId, bool upload);

/// Mailings that are only decided: their pages are thrown away.
BeginMailing mailingsNowhere();

/// Sorts by time and never comes twice.
std::string newMailingId(std::time_t now);

} // namespace VlMail

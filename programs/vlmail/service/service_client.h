#pragma once
// How the subcommands reach the service: by a name or by discovery, with the access token.

#include "programs/channel/client.h"
#include "programs/protocol/carrier.h"
#include "programs/protocol/job.h"
#include "programs/protocol/settings.h"
#include "programs/vlmail/service/service_address.h"
#include "vlservice/ipc/cs_config_ids_list.h"
#include "vlservice/json/json.h"

#include <filesystem>
#include <iosfwd>
#include <memory>
#include <optional>
#include <string>

namespace VlMail {

/// The options of every subcommand that talks to the service.
struct ServiceOptions {
    /// HOST:PORT; empty to look for a service on the network.
    std::string service;
    /// Empty for "token" in configFolder().
    std::string tokenFile;
    /// Empty for "services" in configFolder().
    std::string pinFile;
    /// The fingerprint of a certificate to accept without a question.
    std::string certificate;
    /// Whether a service of the channel's first version will do.
    bool allowsChannel1 = false;
};

/// The token that the options mean; empty where there is none that can be read: connecting says what is wrong
/// with it.
std::string tokenIfAny(ServiceOptions const& options);
/// Finds the service that the options mean. Throws Error when there is none.
ServiceAddress findService(ServiceOptions const& options);
/// Connects to it. A certificate that is new is shown to the person, who decides.
/// Throws std::exception with one line for a person.
std::unique_ptr<Channel::Client> connectToService(ServiceOptions const& options, std::ostream& err);
std::unique_ptr<Channel::Client> connectToService(ServiceAddress const& address,
                                                  ServiceOptions const& options, std::ostream& err);

/// The answer itself, unless it is an error of the service. Throws Error with the service's line.
json::Object const& requireAnswer(json::Object const& answer);
/// Throws Error when the text is not empty.
void requireNoError(std::string const& error);
/// Asks a question and gives the answer as it came, in the form of the type that belongs to the question.
/// Throws Error with the service's line.
template<typename Query>
json::Object ask(Channel::Client& service, Query const& query) {
    return requireAnswer(service.call<Ipc::CSConfigIdsList>(query.serialize())->resp());
}

/// Where the packs of a node lie: its settings "db_host", when that is an absolute path, and "db_name";
/// otherwise "packs.db" in dataFolder(). Throws Error when the name is not that of a file.
std::filesystem::path packDatabaseOf(Channel::Client& service, std::string const& nodeId);
/// Has a finished pack processed by its path and, with `upload`, handed on. Returns when the pack is on
/// record; it has to stay in the database until its job is beyond "accepted". Sending a pack again changes
/// nothing.
void sendPack(Channel::Client& service, std::filesystem::path const& database, std::string const& packId,
              bool upload);
/// What the service knows of a pack's job, as soon as the job has left "accepted" or has a problem, or when
/// the time is up. Throws Error when there is no such job.
Protocol::JobReport awaitJob(Channel::Client& service, std::string const& packId,
                             std::chrono::milliseconds time);

/// The person's folders for this program, by the usual variables or below the home folder.
std::filesystem::path configFolder();
std::filesystem::path dataFolder();

} // namespace VlMail

#include "programs/vlmail/service/service_client.h"

#include "programs/base/error.h"
#include "programs/base/plain_text.h"
#include "programs/base/safe_name.h"
#include "programs/channel/token.h"
#include "programs/protocol/failure.h"
#include "programs/vlmail/service/service_search.h"
#include "vlservice/cfg/app.h"
#include "vlservice/ipc/process_pack.h"
#include "vlservice/ipc/upload_queued.h"

#include <cstdlib>
#include <iostream>
#include <ostream>
#include <thread>
#include <unistd.h>
#include <utility>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

constexpr char const* DEFAULT_PACK_DATABASE = "packs.db";
constexpr std::chrono::milliseconds PAUSE{500};

fs::path personalFolder(char const* variable, char const* belowHome) {
    char const* const folder = std::getenv(variable);
    if (folder && fs::path(folder).is_absolute())
        return fs::path(folder) / "vlmail";
    char const* const home = std::getenv("HOME");
    return fs::path(home ? home : "/") / belowHome / "vlmail";
}

/// Puts the question to the person, when one is there.
bool acceptsCertificate(std::string const& service, std::string const& fingerprint, std::ostream& err) {
    err << "The service " << service << " shows a certificate that is new here:\n  " << fingerprint
        << "\nCompare it with what the service printed when it started.\n";
    if (!::isatty(STDIN_FILENO)) {
        err << "To accept it, add --accept-certificate " << fingerprint << '\n';
        return false;
    }
    err << "Accept it from now on? (yes/no) " << std::flush;
    std::string reply;
    return std::getline(std::cin, reply) && reply == "yes";
}

std::string tokenFile(ServiceOptions const& options) {
    return options.tokenFile.empty() ? (configFolder() / "token").string() : options.tokenFile;
}

} // namespace

std::string tokenIfAny(ServiceOptions const& options) {
    try {
        return Channel::readToken(tokenFile(options));
    } catch (Base::Error const&) {
        return {};
    }
}

ServiceAddress findService(ServiceOptions const& options) {
    if (!options.service.empty())
        return parseServiceAddress(options.service);
    std::optional<ServiceAddress> const found = searchNetwork(tokenIfAny(options));
    if (!found)
        throw Base::Error(
            Base::Code::ServiceNotFound,
            "no service answered on the network; name one with --service HOST:PORT, or see what "
            "\"vlmail discover --doctor\" says");
    return *found;
}

std::unique_ptr<Channel::Client> connectToService(ServiceAddress const& address,
                                                  ServiceOptions const& options, std::ostream& err) {
    Channel::ClientSettings settings;
    settings.host = address.host;
    settings.port = address.port;
    settings.token = Channel::readToken(tokenFile(options));
    settings.allowsVersion1 = options.allowsChannel1;
    settings.pinFile = options.pinFile.empty() ? (configFolder() / "services").string() : options.pinFile;
    settings.acceptNew = [&options, &err](std::string const& service, std::string const& fingerprint) {
        return options.certificate.empty() ? acceptsCertificate(service, fingerprint, err)
                                           : options.certificate == fingerprint;
    };
    return std::make_unique<Channel::Client>(std::move(settings));
}

std::unique_ptr<Channel::Client> connectToService(ServiceOptions const& options, std::ostream& err) {
    return connectToService(findService(options), options, err);
}

json::Object const& requireAnswer(json::Object const& answer) {
    requireNoError(Protocol::failureIn(answer));
    return answer;
}

void requireNoError(std::string const& error) {
    if (!error.empty())
        throw Base::errorSaid(error, Base::Code::ServiceRefused);
}

fs::path packDatabaseOf(Channel::Client& service, std::string const& nodeId) {
    std::string const& app = Cfg::App::PART_NAME;
    json::Object const values =
        Protocol::SettingsAnswer(ask(service, Protocol::SettingsQuery(nodeId, {app}))).part(app).values;
    fs::path const folder = values.get("db_host").textOrEmpty();
    std::string const name = values.get("db_name").textOrEmpty();
    if (!name.empty() && Base::safeFileName(name) != name)
        throw Base::Error(Base::Code::SettingInvalid, "the setting \"db_name\" of node \"" + nodeId +
                                                          "\" has to be the name of a file, and \"" +
                                                          Base::plainLine(name) + "\" is none");
    return (folder.is_absolute() ? folder : dataFolder()) / (name.empty() ? DEFAULT_PACK_DATABASE : name);
}

void sendPack(Channel::Client& service, fs::path const& database, std::string const& packId, bool upload) {
    fs::path const file = fs::absolute(database);
    std::string const folder = file.parent_path().string();
    std::string const name = file.filename().string();
    service.call<Ipc::ProcessPack>(folder, name, packId);
    if (upload)
        service.call<Ipc::UploadQueued>(folder, name);
}

Protocol::JobReport awaitJob(Channel::Client& service, std::string const& packId,
                             std::chrono::milliseconds time) {
    auto const end = std::chrono::steady_clock::now() + time;
    Protocol::JobsQuery query;
    query.ids = {packId};
    for (;;) {
        auto const left =
            std::chrono::ceil<std::chrono::milliseconds>(end - std::chrono::steady_clock::now()).count();
        query.wait = std::max<long long>(left, 0);
        Protocol::JobsAnswer const answer(ask(service, query));
        if (answer.jobs.empty())
            throw Base::Error(Base::Code::MailingUnknown,
                              "the service has no job of pack " + packId + "; send it again");
        if (!waitsForPages(answer.jobs.front()) || left <= 0)
            return answer.jobs.front();
        // A service that holds no answers would be asked without a pause.
        std::this_thread::sleep_for(std::min(PAUSE, std::chrono::milliseconds(left)));
    }
}

fs::path configFolder() { return personalFolder("XDG_CONFIG_HOME", ".config"); }

fs::path dataFolder() { return personalFolder("XDG_DATA_HOME", ".local/share"); }

} // namespace VlMail

#include "programs/vlmail/service/service_client.h"

#include "programs/base/error.h"
#include "programs/base/host_port.h"
#include "programs/channel/token.h"
#include "programs/protocol/failure.h"
#include "vlservice/cfg/app.h"
#include "vlservice/ipc/cs_config_ids_list.h"
#include "vlservice/ipc/discovery_base.h"
#include "vlservice/ipc/discovery_cli.h"
#include "vlservice/ipc/gui_fwd.h"
#include "vlservice/ipc/process_pack.h"
#include "vlservice/ipc/upload_queued.h"

#include <boost/asio/io_context.hpp>

#include <algorithm>
#include <cstdlib>
#include <iostream>
#include <ostream>
#include <unistd.h>
#include <utility>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

constexpr char const* DEFAULT_PACK_DATABASE = "packs.db";

fs::path personalFolder(char const* variable, char const* belowHome) {
    char const* const folder = std::getenv(variable);
    if (folder && fs::path(folder).is_absolute())
        return fs::path(folder) / "vlmail";
    char const* const home = std::getenv("HOME");
    return fs::path(home ? home : "/") / belowHome / "vlmail";
}

/// Keeps what discovery has found.
class Finder : public Ipc::CmdProcessorI {
public:
    void submit(std::shared_ptr<Ipc::CmdI> cmd) override {
        answer = dynamic_cast<Ipc::GuiFwd const&>(*cmd).params();
    }

    json::Object answer;
};

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

} // namespace

std::string ServiceAddress::text() const { return Base::hostPortText(host, port); }

ServiceAddress parseServiceAddress(std::string const& text) {
    auto address = Base::hostPortIn(text);
    if (!address)
        throw Base::Error("\"" + text +
                          "\" names no service: write HOST:PORT, with an IPv6 address in brackets");
    return {std::move(address->host), address->port};
}

ServiceAddress addressInAnswer(json::Object const& answer) {
    std::string host = answer.get(Ipc::DiscoveryBase::SVC_HOST_FLD_NAME).textOrEmpty();
    long long const port = answer.get(Ipc::DiscoveryBase::SVC_PORT_FLD_NAME).intOrZero();
    if (!Base::isHost(host) || port < 1 || port > 65535)
        throw Base::Error(
            "something on the network answered as a service and named no address; name one with "
            "--service HOST:PORT");
    return {std::move(host), static_cast<std::uint16_t>(port)};
}

std::optional<json::Object> askNetwork() {
    boost::asio::io_context io(1);
    auto const finder = std::make_shared<Finder>();
    Ipc::DiscoveryCli const search(finder, io);
    io.run();
    return finder->answer.empty() ? std::nullopt : std::optional(finder->answer);
}

ServiceAddress findService(ServiceOptions const& options) {
    if (!options.service.empty())
        return parseServiceAddress(options.service);
    std::optional<json::Object> const answer = askNetwork();
    if (!answer)
        throw Base::Error(
            "no service answered on the network; name one with --service HOST:PORT, or see what "
            "\"vlmail discover --doctor\" says");
    return addressInAnswer(*answer);
}

std::unique_ptr<Channel::Client> connectToService(ServiceAddress const& address,
                                                  ServiceOptions const& options, std::ostream& err) {
    Channel::ClientSettings settings;
    settings.host = address.host;
    settings.port = address.port;
    settings.token = Channel::readToken(options.tokenFile.empty() ? (configFolder() / "token").string()
                                                                  : options.tokenFile);
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
        throw Base::Error(error);
}

json::Object ask(Channel::Client& service, Protocol::SettingsQuery const& query) {
    return requireAnswer(service.call<Ipc::CSConfigIdsList>(query.serialize())->resp());
}

json::Object ask(Channel::Client& service, Protocol::JobsQuery const& query) {
    return requireAnswer(service.call<Ipc::CSConfigIdsList>(query.serialize())->resp());
}

fs::path packDatabaseOf(Channel::Client& service, std::string const& nodeId) {
    std::string const& app = Cfg::App::PART_NAME;
    json::Object const values = Protocol::SettingsAnswer(ask(service, {nodeId, {app}})).part(app).values;
    fs::path const folder = values.get("db_host").textOrEmpty();
    std::string const name = values.get("db_name").textOrEmpty();
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
            throw Base::Error("the service has no job of pack " + packId + "; send it again");
        if (!waitsForPages(answer.jobs.front()) || left <= 0)
            return answer.jobs.front();
    }
}

fs::path configFolder() { return personalFolder("XDG_CONFIG_HOME", ".config"); }

fs::path dataFolder() { return personalFolder("XDG_DATA_HOME", ".local/share"); }

} // namespace VlMail

#include "tests/chaos/installation.h"

#include "programs/channel/stream.h"
#include "vlservice/json/json_text.h"

#include <sys/mount.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <csignal>
#include <fstream>
#include <stdexcept>
#include <utility>

namespace Chaos {
namespace {

namespace fs = std::filesystem;

/// With room for an empty database and the mailings of a few minutes. The server's account has it.
constexpr char const* SMALL_DISK = "size=128m,mode=0700,uid=65534,gid=65534";
constexpr char const* DATABASE = "chaos";

int connectedTo(fs::path const& path) {
    int const socket = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    path.string().copy(address.sun_path, sizeof address.sun_path - 1);
    if (::connect(socket, reinterpret_cast<sockaddr const*>(&address), sizeof address) == 0)
        return socket;
    ::close(socket);
    return -1;
}

} // namespace

Line::Line(VLServiceTest::CuttingRelay::Connect connect, char const* host)
    : relay_(std::move(connect), host) {
    relay_.onPiece([this](int) { return mayPass(); });
}

void Line::calm() {
    left_ = -1;
    isStalled_ = false;
    isStalled_.notify_all();
}

bool Line::mayPass() {
    isStalled_.wait(true);
    int const left = left_;
    if (left >= 0)
        left_ = left - 1;
    return left != 0;
}

// What is erased has to give its room back soon.
Installation::Installation() : server_({"autovacuum_naptime=1s", "autovacuum_vacuum_cost_delay=0"}) {
    if (!whyNot().empty())
        return;
    if (whyNoRelay().empty())
        inside_.emplace(networks_.service());
    certificate_ = ChannelTest::makeCertificate(folder_.path().string(), "service");
    fingerprint_ = Channel::fingerprintOf(
        *Channel::makeServiceContext(certificate_.certificateFile, certificate_.keyFile));
    for (char const* const name : {"upload", "shop", "taken", "printed"})
        fs::create_directory(folder_ / name);
    uploads_.emplace(upload(), takenContainers());
    letters_.emplace(printShop(), folder_ / "printed");
    makeDisk();
    makeDatabase();
    makePlaces();
    setFolders();
}

Installation::~Installation() {
    for (Place& place : places_)
        place.process.reset();
    ::umount2((server_.folder() / "disk").c_str(), MNT_DETACH);
}

void Installation::makeDisk() {
    fs::path const disk = server_.folder() / "disk";
    fs::create_directory(disk);
    server_.crash();
    // In this process's own view of the file systems, in which the server starts anew.
    whyNoSmallDisk_ = VLServiceTest::MountedDisk(disk.string(), SMALL_DISK).whyNot();
    server_.startAgain();
}

void Installation::makeDatabase() const {
    Database::PostgresConnection server(serverAddress("postgres"));
    std::string where;
    if (whyNoSmallDisk_.empty()) {
        server.run("CREATE TABLESPACE small LOCATION '" + (server_.folder() / "disk").string() + "'");
        where = " TABLESPACE small";
    }
    server.run(std::string("CREATE DATABASE ") + DATABASE + where);
    auto const made = database();
    made->run("CREATE TABLE filler (data TEXT NOT NULL)");
    made->run("ALTER TABLE filler ALTER COLUMN data SET STORAGE PLAIN");
}

void Installation::makePlaces() {
    for (std::size_t service = 0; service < SERVICES; ++service) {
        Place& place = places_[service];
        place.toDatabase = std::make_unique<Line>(
            [socket = server_.folder() / ".s.PGSQL.5432"] { return connectedTo(socket); },
            VLServiceTest::CuttingRelay::LOOPBACK);
        place.toService = std::make_unique<Line>(
            [this, &port = place.port] { return VLServiceTest::connectedTo(port, host()); }, host());
        start(service);
    }
}

void Installation::setFolders() {
    json::Object const shop{{"type", "folder"}, {"folder", printShop().string()}};
    fs::path const carriers = folder_ / "carriers.json";
    std::ofstream(carriers) << json::toText(json::Object{{"postal", shop}});
    ClientRun const run = vlmail(
        0, {"settings", "service", "upload_folder=" + upload().string(), "carriers=" + carriers.string()});
    if (run.status != 0)
        throw std::runtime_error("the services cannot be set up: " + run.err);
}

fs::path Installation::data(std::size_t service) const { return folder_.path() / std::to_string(service); }

std::string Installation::serverAddress(std::string const& database) const {
    return "postgresql:///" + database + "?host=" + server_.folder().string() + "&user=vlservice";
}

std::unique_ptr<Database::Connection> Installation::database() const {
    return std::make_unique<Database::PostgresConnection>(serverAddress(DATABASE));
}

char const* Installation::host() const {
    return whyNoRelay().empty() ? TwoNetworks::SERVICE_IP4 : VLServiceTest::CuttingRelay::LOOPBACK;
}

ClientRun Installation::vlmail(std::size_t service, std::vector<std::string> arguments) const {
    Place const& place = places_.at(service);
    std::uint16_t const port = whyNoRelay().empty() ? place.toService->port() : place.port.load();
    arguments.insert(arguments.end(),
                     {"--service", host() + (':' + std::to_string(port)), "--token", token().string(),
                      "--pins", (folder_ / "pins").string(), "--accept-certificate", fingerprint_});
    return runClient(folder_.path(), std::move(arguments));
}

std::vector<std::string> Installation::argumentsOf(std::size_t service) const {
    std::vector<std::string> arguments{
        "--data",
        data(service).string(),
        "--database",
        "postgresql://vlservice@127.0.0.1:" + std::to_string(places_[service].toDatabase->port()) + '/' +
            DATABASE,
        "--lease",
        std::to_string(LEASE_SECONDS),
        "--no-discovery",
        "--listen",
        host(),
        "--certificate",
        certificate_.certificateFile,
        "--key",
        certificate_.keyFile};
    if (service > 0)
        arguments.insert(arguments.end(), {"--token", token().string()});
    return arguments;
}

void Installation::kill(std::size_t service) {
    places_.at(service).port = 0;
    places_[service].process.reset();
}

void Installation::freeze(std::size_t service) {
    if (auto const& process = places_.at(service).process)
        process->signal(SIGSTOP);
}

void Installation::thaw(std::size_t service) {
    if (auto const& process = places_.at(service).process)
        process->signal(SIGCONT);
}

bool Installation::start(std::size_t service, ServiceProcess::Environment const& more) {
    Place& place = places_.at(service);
    if (place.port != 0)
        return true;
    place.process = std::make_unique<ServiceProcess>(argumentsOf(service), more);
    place.port = place.process->port();
    return place.port != 0;
}

int Installation::end(std::size_t service) {
    ServiceProcess& process = *places_.at(service).process;
    process.signal(SIGTERM);
    return process.wait();
}

std::vector<std::string> Installation::restartAll() {
    std::vector<std::string> wrong;
    for (std::size_t service = 0; service < SERVICES; ++service) {
        int const status = end(service);
        if (places_[service].port != 0 && status != 0)
            wrong.push_back("service " + std::to_string(service) + " ended with status " +
                            std::to_string(status) + ": " + places_[service].process->errors());
        kill(service);
        if (!start(service))
            wrong.push_back("service " + std::to_string(service) +
                            " does not start: " + places_[service].process->errors());
    }
    return wrong;
}

void Installation::fillDisk() const {
    try {
        // What a statement has taken stays taken when it fails.
        database()->run("INSERT INTO filler SELECT repeat('x', 7000) FROM generate_series(1, 1000000)");
    } catch (Database::QueryError const& full) {
        if (full.kind() != Database::QueryError::Kind::Full)
            throw;
    }
}

void Installation::emptyDisk() const { database()->run("TRUNCATE filler"); }

std::vector<std::string> Installation::leftBehind() const {
    std::vector<std::string> left;
    std::vector<fs::path> folders{upload(), printShop()};
    for (std::size_t service = 0; service < SERVICES; ++service)
        for (char const* const outbox : {"outbox", "outbox/rest"})
            folders.push_back(data(service) / outbox);
    for (fs::path const& folder : folders) {
        std::error_code missing;
        for (fs::directory_entry const& entry : fs::directory_iterator(folder, missing))
            if (fs::path const name = entry.path();
                name.extension() == ".part" || name.extension() == ".mailing")
                left.push_back(fs::relative(name, folder_.path()).string());
    }
    return left;
}

} // namespace Chaos

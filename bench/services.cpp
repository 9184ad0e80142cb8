// Measures how many mailings a second one service and four services on one PostgreSQL database bring from the
// pack that came over a connection to the container in the upload folder, as whole processes: with all in
// memory, where the processors are the limit; with all in memory and a database in another house, 2 ms away,
// where waiting is; and with a synced log and folders on the disk. Decides whether services share their work
// or stand in each other's way. What counts is the ratio of four to one, which is to be 3 where neither the
// disk nor the processors are the limit.
#include "programs/database/postgres_connection.h"
#include "programs/mailing/pack_database.h"
#include "programs/protocol/service_settings.h"
#include "programs/vlmail/mailings/pack_upload.h"
#include "programs/vlmail/service/service_line.h"
#include "tests/support/postgres_server.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/pack_help.h"
#include "tests/vlserviced/service_process.h"
#include "vlservice/ipc/cs_config_srv_change.h"
#include "vlservice/ipc/set_svc_cfg.h"

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <list>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace {

namespace fs = std::filesystem;
using Clock = std::chrono::steady_clock;
using namespace std::chrono_literals;

constexpr int JOBS = 200;
constexpr char const* IN_MEMORY = "/dev/shm";
constexpr char const* SOCKET_NAME = ".s.PGSQL.5432";

sockaddr_un addressOf(fs::path const& file) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    file.string().copy(address.sun_path, sizeof(address.sun_path) - 1);
    return address;
}

int newSocket() {
    int const socket = ::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (socket < 0)
        throw std::runtime_error("no socket");
    return socket;
}

/// Stands in front of a database server as a long way does: what goes either way comes a time later.
class LongWay {
public:
    LongWay(fs::path server, std::chrono::microseconds oneWay)
        : server_(std::move(server)), oneWay_(oneWay), listener_(newSocket()) {
        sockaddr_un const address = addressOf(folder_ / SOCKET_NAME);
        if (::bind(listener_, reinterpret_cast<sockaddr const*>(&address), sizeof(address)) != 0 ||
            ::listen(listener_, SOMAXCONN) != 0)
            throw std::runtime_error("cannot listen");
        accepting_ = std::thread([this] { accept(); });
    }
    ~LongWay() {
        ::shutdown(listener_, SHUT_RDWR);
        accepting_.join();
        for (int const socket : sockets_)
            ::shutdown(socket, SHUT_RDWR);
        for (std::thread& way : ways_)
            way.join();
        for (int const socket : sockets_)
            ::close(socket);
        ::close(listener_);
    }
    LongWay(LongWay const&) = delete;
    LongWay& operator=(LongWay const&) = delete;

    fs::path const& folder() const { return folder_.path(); }

private:
    void accept() {
        for (int client = -1; (client = ::accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC)) >= 0;) {
            int const server = newSocket();
            sockaddr_un const address = addressOf(server_ / SOCKET_NAME);
            if (::connect(server, reinterpret_cast<sockaddr const*>(&address), sizeof(address)) != 0)
                throw std::runtime_error("the database server is gone");
            sockets_.insert(sockets_.end(), {client, server});
            ways_.emplace_back([this, client, server] { carry(client, server); });
            ways_.emplace_back([this, client, server] { carry(server, client); });
        }
    }
    void carry(int from, int to) const {
        std::vector<char> bytes(256 * 1024);
        for (ssize_t size = 0; (size = ::read(from, bytes.data(), bytes.size())) > 0;) {
            std::this_thread::sleep_for(oneWay_);
            for (ssize_t sent = 0, some = 0; sent < size; sent += some)
                if ((some = ::send(to, bytes.data() + sent, static_cast<std::size_t>(size - sent),
                                   MSG_NOSIGNAL)) <= 0)
                    return;
        }
        ::shutdown(to, SHUT_WR);
    }

    TemporaryFolder folder_;
    fs::path server_;
    std::chrono::microseconds oneWay_;
    int listener_;
    /// Grow in the thread that accepts, and are looked at when it has ended.
    std::vector<int> sockets_;
    std::list<std::thread> ways_;
    std::thread accepting_;
};

/// Where the services and their database are.
struct Place {
    char const* name;
    char const* folder;
    std::vector<std::string> settings;
    std::chrono::microseconds oneWay;
};

/// Services on a database of their own.
class Services {
public:
    Services(VLServiceTest::PostgresServer const& server, fs::path const& database, std::size_t count)
        : made_(server.folder()) {
        fs::create_directory(folder_ / "upload");
        std::string address = made_.address();
        std::string const folder = server.folder().string();
        address.replace(address.find(folder), folder.size(), database.string());
        for (std::size_t i = 0; i < count; ++i) {
            std::vector<std::string> arguments{"--data", data(i).string(), "--database", address,
                                               "--no-discovery"};
            if (i > 0)
                arguments.insert(arguments.end(), {"--token", (data(0) / "token").string()});
            processes_.push_back(std::make_unique<ServiceProcess>(arguments));
            if (processes_.back()->port() == 0)
                throw std::runtime_error("a service does not start");
        }
    }

    /// Mailings a second, from the word to begin to the last one in the upload folder.
    double rate() {
        client(0)->call<Ipc::SetSvcCfg>(json::Object{{"upload_folder", (folder_ / "upload").string()}});
        suspend(0, Protocol::Suspended::Jobs);
        for (int job = 0; job < JOBS; ++job)
            send("mailing-" + std::to_string(job));
        auto const begin = Clock::now();
        for (std::size_t i = 0; i < processes_.size(); ++i)
            suspend(i, Protocol::Suspended::Nothing);
        Database::PostgresConnection database(made_.address());
        while (database.number("SELECT count(*) FROM jobs WHERE state = 'submitted'") < JOBS)
            std::this_thread::sleep_for(5ms);
        return JOBS / std::chrono::duration<double>(Clock::now() - begin).count();
    }

private:
    fs::path data(std::size_t number) const { return folder_.path() / std::to_string(number); }
    std::unique_ptr<Channel::Client> client(std::size_t number) const {
        return clientOf(*processes_[number], data(0));
    }
    void suspend(std::size_t number, Protocol::Suspended what) const {
        client(number)->call<Ipc::CSConfigSrvChange>(static_cast<Ipc::CSConfigSrvChange::SuspendType>(what));
    }
    void send(std::string const& id) const {
        fs::path const packs = folder_ / "packs.db";
        storePack(packs, id, "a=acme", R"("process_mode": 2, )");
        Mailing::OwnPackReader pack(packs, id);
        VlMail::ServiceLine line([this] { return client(0); });
        VlMail::uploadPack(line, pack);
    }

    TemporaryFolder folder_;
    VLServiceTest::PostgresDatabase made_;
    std::vector<std::unique_ptr<ServiceProcess>> processes_;
};

void measure(Place const& place) {
    if (place.folder)
        ::setenv("TMPDIR", place.folder, 1);
    else
        ::unsetenv("TMPDIR");
    VLServiceTest::PostgresServer const server(place.settings);
    if (!server.whyNot().empty())
        throw std::runtime_error(server.whyNot());
    std::optional<LongWay> longWay;
    if (place.oneWay > 0us)
        longWay.emplace(server.folder(), place.oneWay);
    fs::path const database = longWay ? longWay->folder() : server.folder();
    double const one = Services(server, database, 1).rate();
    double const four = Services(server, database, 4).rate();
    std::printf("%-28s one service %5.0f mailings/s, four %5.0f, ratio %.2f\n", place.name, one, four,
                four / one);
    std::fflush(stdout);
}

} // namespace

int main() {
    try {
        for (Place const& place : {Place{"in memory", IN_MEMORY, {"fsync=off"}, 0us},
                                   Place{"in memory, 2 ms away", IN_MEMORY, {"fsync=off"}, 1ms},
                                   Place{"on the disk", nullptr, {"fsync=on"}, 0us}})
            measure(place);
        return 0;
    } catch (std::exception const& failure) {
        std::fprintf(stderr, "%s\n", failure.what());
        return 1;
    }
}

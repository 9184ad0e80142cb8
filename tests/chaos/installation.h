#pragma once
// Services that share a database and an upload folder, with everything in between that can go wrong: relays
// in front of each service and between it and the database, and a small disk under the database.

#include "programs/database/postgres_connection.h"
#include "tests/channel/test_certificate.h"
#include "tests/chaos/client_run.h"
#include "tests/support/cutting_relay.h"
#include "tests/support/postgres_server.h"
#include "tests/support/small_disk.h"
#include "tests/support/taking_carrier.h"
#include "tests/support/temporary_folder.h"
#include "tests/support/two_networks.h"
#include "tests/vlserviced/service_process.h"

#include <array>
#include <atomic>
#include <chrono>
#include <filesystem>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace Chaos {

/// A relay that cuts and stalls when it is told to. Used by one thread beside the relay's own.
class Line {
public:
    Line(VLServiceTest::CuttingRelay::Connect connect, char const* host);
    /// Lets everything pass.
    ~Line() { calm(); }

    std::uint16_t port() const { return relay_.port(); }
    /// Cuts a connection once, in place of what comes behind so many pieces.
    void cutBehind(int pieces) { left_ = pieces; }
    /// Holds back all that comes.
    void stall() { isStalled_ = true; }
    void calm();

private:
    bool mayPass();

    std::atomic<int> left_{-1};
    std::atomic<bool> isStalled_{false};
    VLServiceTest::CuttingRelay relay_;
};

/// Service 0 has made the schema. Used by one thread, but for what clients ask.
class Installation {
public:
    static constexpr std::size_t SERVICES = 3;
    static constexpr int LEASE_SECONDS = 2;

    Installation();
    ~Installation();
    Installation(Installation const&) = delete;
    Installation& operator=(Installation const&) = delete;

    /// Empty when it stands.
    std::string const& whyNot() const { return server_.whyNot(); }
    /// Empty when the database's disk is a small one.
    std::string const& whyNoSmallDisk() const { return whyNoSmallDisk_; }
    /// Empty when relays stand between services and their clients.
    std::string const& whyNoRelay() const { return networks_.whyNot(); }

    // What goes wrong.

    void kill(std::size_t service);
    void freeze(std::size_t service);
    void thaw(std::size_t service);
    void crashDatabase() { server_.crash(); }
    void startDatabase() { server_.startAgain(); }
    /// Until there is no room for another page of a table.
    void fillDisk() const;
    void emptyDisk() const;
    Line& toDatabase(std::size_t service) { return *places_.at(service).toDatabase; }
    Line& toService(std::size_t service) { return *places_.at(service).toService; }

    // What goes on.

    /// Starts the service anew when it does not run. False when it did not come up.
    bool start(std::size_t service, ServiceProcess::Environment const& more = {});
    /// Has the service end in order, and gives its exit status.
    int end(std::size_t service);
    bool runs(std::size_t service) const { return places_.at(service).process->isRunning(); }
    /// Ends each and starts it anew; what went wrong with that, a line each.
    std::vector<std::string> restartAll();
    /// Past the relays, as often as it is asked.
    std::unique_ptr<Database::Connection> database() const;

    // For clients, in any thread.

    /// Runs it with one of the services named.
    ClientRun vlmail(std::size_t service, std::vector<std::string> arguments) const;
    std::filesystem::path folder() const { return folder_.path(); }

    // What came of it.

    std::filesystem::path upload() const { return folder_ / "upload"; }
    std::filesystem::path printShop() const { return folder_ / "shop"; }
    std::filesystem::path takenContainers() const { return folder_ / "taken"; }
    /// By the names of files.
    std::map<std::string, int> containers() const { return uploads_->taken(); }
    std::map<std::string, int> letters() const { return letters_->taken(); }
    /// Names of files that nobody is to leave behind.
    std::vector<std::string> leftBehind() const;

private:
    /// What one service has to itself.
    struct Place {
        std::atomic<std::uint16_t> port{0};
        std::unique_ptr<Line> toService;
        std::unique_ptr<Line> toDatabase;
        std::unique_ptr<ServiceProcess> process;
    };

    void makeDisk();
    void makeDatabase() const;
    void makePlaces();
    void setFolders();
    std::filesystem::path data(std::size_t service) const;
    std::filesystem::path token() const { return data(0) / "token"; }
    std::vector<std::string> argumentsOf(std::size_t service) const;
    std::string serverAddress(std::string const& database) const;
    char const* host() const;

    TemporaryFolder folder_;
    /// Clients speak TLS to a service that is elsewhere than on loopback.
    TwoNetworks networks_;
    std::optional<TwoNetworks::Inside> inside_;
    /// Without one, proofs would tell that a relay stands between.
    ChannelTest::TestCertificate certificate_;
    std::string fingerprint_;
    VLServiceTest::PostgresServer server_;
    std::string whyNoSmallDisk_;
    std::optional<VLServiceTest::TakingCarrier> uploads_;
    std::optional<VLServiceTest::TakingCarrier> letters_;
    std::array<Place, SERVICES> places_;
};

} // namespace Chaos

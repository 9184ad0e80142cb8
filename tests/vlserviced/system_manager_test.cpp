// The service as the system's manager starts it: with a file of options, a socket, secrets, and somebody who
// wants to know that it lives.
#include "programs/channel/token.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/service_process.h"
#include "vlservice/ipc/get_svc_cfg.h"

#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/local/datagram_protocol.hpp>
#include <gtest/gtest.h>

#include <array>
#include <csignal>
#include <fstream>
#include <sys/stat.h>

namespace {

namespace fs = std::filesystem;
namespace asio = boost::asio;
using boost::asio::ip::tcp;

class ManagedServices : public testing::Test {
protected:
    fs::path write(char const* name, std::string const& text) const {
        fs::path file = folder_ / name;
        std::ofstream(file, std::ios::binary) << text;
        ::chmod(file.c_str(), 0600);
        return file;
    }
    std::vector<std::string> config(std::string const& more = {}) const {
        return {"--config",
                write("conf", "data = " + data_.string() + "\nno-discovery = yes\n" + more).string()};
    }

    TemporaryFolder folder_;
    fs::path data_ = folder_ / "data";
    asio::io_context io_;
};

/// What a process tells its manager.
class Notices {
public:
    Notices(asio::io_context& io, fs::path const& file)
        : socket_(io, asio::local::datagram_protocol::endpoint(file.string())) {}

    std::string next() {
        std::array<char, 500> text;
        return {text.data(), socket_.receive(asio::buffer(text))};
    }

private:
    asio::local::datagram_protocol::socket socket_;
};

TEST_F(ManagedServices, TakeOptionsFromAFileAndOthersFromTheCommandLineBeforeThem) {
    EXPECT_TRUE(ServiceProcess(config()).firstLine().starts_with("listening on 127.0.0.1:"));
    EXPECT_TRUE(fs::exists(data_ / "service.db"));
    auto arguments = config();
    arguments.insert(arguments.end(), {"--data", (folder_ / "other").string()});
    EXPECT_TRUE(ServiceProcess(arguments).firstLine().starts_with("listening on"));
    EXPECT_TRUE(fs::exists(folder_ / "other" / "service.db"));
}

TEST_F(ManagedServices, EndWithOneLineForAFileOfOptionsThatIsWrong) {
    ServiceProcess service(config("prot = 7117\n"));
    EXPECT_EQ(service.wait(), 1);
    EXPECT_EQ(service.errors(), "vlserviced: " + (folder_ / "conf").string() +
                                    ", line 3: there is no option \"prot\"; --help explains [usage]\n");
}

TEST_F(ManagedServices, EndWithOneLineForAFileOfOptionsThatIsCutOff) {
    ServiceProcess service(config("port = 71"));
    EXPECT_EQ(service.wait(), 1);
    EXPECT_EQ(service.errors(), "vlserviced: " + (folder_ / "conf").string() +
                                    ", line 3: does not end with a line feed; the file may be cut off; "
                                    "--help explains [usage]\n");
    EXPECT_FALSE(fs::exists(data_));
}

TEST_F(ManagedServices, EndWithOneLineForAFileOfOptionsThatIsNotThere) {
    fs::path const file = folder_ / "nowhere";
    ServiceProcess service({"--config", file.string()});
    EXPECT_EQ(service.wait(), 1);
    EXPECT_EQ(service.errors(),
              "vlserviced: " + file.string() + ": there is no such file; check the name [file-unreadable]\n");
}

TEST_F(ManagedServices, AnswerOnTheSocketThatTheyAreHanded) {
    tcp::acceptor listening(io_, {asio::ip::address_v4::loopback(), 0});
    ServiceProcess const service(config("port = 1\n"), {}, nullptr, listening.native_handle());
    EXPECT_EQ(service.port(), listening.local_endpoint().port()) << service.firstLine();
    EXPECT_EQ(clientOf(service, data_)->call<Ipc::GetSvcCfg>()->resp().get("outbox"),
              json::Value((data_ / "outbox").string()));
}

TEST_F(ManagedServices, RefuseASocketThatDoesNotListen) {
    tcp::socket silent(io_, tcp::v4());
    ServiceProcess service(config(), {}, nullptr, silent.native_handle());
    EXPECT_EQ(service.wait(), 1);
    EXPECT_EQ(service.errors(), "vlserviced: The socket that the system's manager hands over does not listen "
                                "for TCP. [address-unusable]\n");
}

TEST_F(ManagedServices, SayThatTheyAreReadyThatTheyLiveAndThatTheyEnd) {
    fs::path const file = folder_ / "notices";
    Notices notices(io_, file);
    ServiceProcess service(config(), {{"NOTIFY_SOCKET", file.string()}, {"WATCHDOG_USEC", "200000"}});
    EXPECT_EQ(notices.next(), "READY=1\nSTATUS=listening on port " + std::to_string(service.port()));
    for (int times = 0; times < 3; ++times)
        EXPECT_EQ(notices.next(), "WATCHDOG=1");
    service.signal(SIGTERM);
    std::string last = notices.next();
    while (last == "WATCHDOG=1")
        last = notices.next();
    EXPECT_EQ(last, "STOPPING=1");
    EXPECT_EQ(service.wait(), 0);
}

TEST_F(ManagedServices, KnowTheirClientsByTheTokenThatIsHandedOver) {
    write("token", std::string(40, 't') + '\n');
    ServiceProcess const service(config(), {{"CREDENTIALS_DIRECTORY", folder_.path().string()}});
    EXPECT_TRUE(service.firstLine().starts_with("listening on")) << service.errors();
    EXPECT_FALSE(fs::exists(data_ / "token"));
    EXPECT_EQ(clientOf(service, folder_.path())->call<Ipc::GetSvcCfg>()->resp().get("outbox"),
              json::Value((data_ / "outbox").string()));
}

} // namespace

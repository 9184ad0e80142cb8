// Encrypted connections: the service is known by its certificate and by its knowledge of the token.

#include "tests/channel/running_server.h"
#include "tests/channel/test_certificate.h"

#include "programs/base/error.h"
#include "programs/channel/client.h"
#include "programs/channel/pin_store.h"
#include "programs/channel/stream.h"

#include "tests/support/json_literal.h"
#include "tests/support/two_networks.h"

#include <boost/asio/buffer.hpp>
#include <boost/asio/read.hpp>
#include <boost/asio/ssl/stream.hpp>
#include <boost/asio/write.hpp>

#include <gmock/gmock.h>

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>
#include <thread>
#include <vector>

using namespace testing;
using namespace ChannelTest;
using namespace std::chrono_literals;
using Channel::Client;
using VLServiceTest::messageOf;
namespace asio = boost::asio;
namespace fs = std::filesystem;

namespace {

class TlsConnections : public Test {
protected:
    SharedLog log;
    fs::path const folder = fs::temp_directory_path() / ("channel_tls_" + std::to_string(::getpid()));
    std::string const pinFile = (folder / "pins").string();
    std::vector<std::string> shown;
    std::optional<RunningServer> server;

    TlsConnections() {
        fs::remove_all(folder);
        fs::create_directory(folder);
    }
    ~TlsConnections() override { fs::remove_all(folder); }

    Channel::ServerSettings serverSettings(TestCertificate const& certificate) const {
        Channel::ServerSettings settings = patient();
        settings.token = TOKEN;
        settings.tls = Channel::Tls::Always;
        settings.certificateFile = certificate.certificateFile;
        settings.keyFile = certificate.keyFile;
        return settings;
    }
    void serve() { server.emplace(serverSettings(makeCertificate(folder.string(), "service"))); }

    std::string fingerprint() {
        return server->onThread([](Channel::Server& s) { return s.fingerprint(); });
    }
    std::string name() const { return "127.0.0.1:" + std::to_string(server->port()); }

    /// A person who looks at what is shown and agrees, or does not.
    Channel::ClientSettings clientSettings(bool agrees = true) {
        auto settings = server->clientSettings();
        settings.tls = Channel::Tls::Always;
        settings.pinFile = pinFile;
        settings.acceptNew = [this, agrees](std::string const& service, std::string const& certificate) {
            shown.push_back(service + ' ' + certificate);
            return agrees;
        };
        return settings;
    }

    static std::string errorOf(Channel::ClientSettings const& settings) {
        return messageOf<Base::Error>([&] { Client client(settings); });
    }
};

TEST_F(TlsConnections, CarryCommandsOfAnySize) {
    serve();
    Client client(clientSettings());
    for (std::size_t const size : {1u, 100'000u, 5'000'000u}) {
        std::string const text(size, 'x');
        auto const cmd = client.call<Ipc::PriceEst>(json::Object{{"a", text}});
        EXPECT_EQ(cmd->resp().get("asked").toObject().get("a").textOrEmpty(), text);
    }
}

TEST_F(TlsConnections, ShowANewCertificateOnceAndKeepIt) {
    serve();
    for (int i = 0; i < 3; ++i)
        Client(clientSettings()).call<Ipc::PriceEst>(json::Object{});
    EXPECT_THAT(fingerprint(), MatchesRegex("([0-9A-F][0-9A-F]:)+[0-9A-F][0-9A-F]"));
    EXPECT_EQ(fingerprint().size(), 95u);
    EXPECT_THAT(shown, ElementsAre(name() + ' ' + fingerprint()));
    EXPECT_EQ(Channel::PinStore(pinFile).find(name()), fingerprint());
}

TEST_F(TlsConnections, EndWhenThePersonDoesNotAgree) {
    serve();
    EXPECT_EQ(errorOf(clientSettings(false)), name() + ": Its certificate was not accepted.");
    EXPECT_FALSE(fs::exists(pinFile));
    EXPECT_EQ(shown.size(), 1u);
}

TEST_F(TlsConnections, EndWhenThereIsNobodyToAsk) {
    serve();
    auto settings = clientSettings();
    settings.acceptNew = nullptr;
    EXPECT_EQ(errorOf(settings),
              name() + ": Its certificate is new: " + fingerprint() + ". It must be accepted first.");
}

TEST_F(TlsConnections, EndWhenTheCertificateHasChanged) {
    serve();
    std::string other = fingerprint();
    std::reverse(other.begin(), other.end());
    Channel::PinStore(pinFile).add(name(), other);
    EXPECT_EQ(errorOf(clientSettings()), name() + ": Its certificate has changed from " + other + " to " +
                                             fingerprint() + ". If that is right, remove its line from \"" +
                                             pinFile + "\".");
    EXPECT_THAT(shown, IsEmpty());
}

TEST_F(TlsConnections, EndWhenOthersCouldHaveWrittenTheAcceptedCertificates) {
    serve();
    std::ofstream(pinFile) << name() << " AA:BB\n";
    ::chmod(pinFile.c_str(), 0666);
    EXPECT_EQ(errorOf(clientSettings()),
              name() + ": The file \"" + pinFile +
                  "\" is open to others (mode 0666); make it private with chmod 600.");
}

TEST_F(TlsConnections, EndForAClientWithAnotherToken) {
    serve();
    auto settings = clientSettings();
    settings.token = TOKEN + "x";
    EXPECT_EQ(errorOf(settings), name() + ": Whoever answers there does not know our access token.");
    EXPECT_THAT(shown, IsEmpty()) << "only a service that knows the token is shown to the person";
}

TEST_F(TlsConnections, TellAPlainClient) {
    serve();
    EXPECT_EQ(errorOf(server->clientSettings()), name() + ": It refuses: This service speaks TLS alone.");
    EXPECT_TRUE(log.hasLogged("This service speaks TLS alone."));
}

TEST_F(TlsConnections, AreNotMadeWithAPlainService) {
    server.emplace();
    EXPECT_THAT(errorOf(clientSettings()), StartsWith(name() + ": TLS failed: "));
}

TEST_F(TlsConnections, AreLoggedWhenTheyBreakOffInTheHandshake) {
    serve();
    RawPeer peer(server->port());
    peer.send(std::string("\x16\x03\x01\x00\x05hello", 10));
    EXPECT_TRUE(log.hasLogged("TLS failed: "));
    Client(clientSettings()).call<Ipc::PriceEst>(json::Object{});
}

TEST_F(TlsConnections, AreClosedWhenTheyAreSilentBeforeTheHandshakeOrInIt) {
    auto settings = serverSettings(makeCertificate(folder.string(), "service"));
    settings.greetingTime = 50ms;
    server.emplace(settings);
    RawPeer silent(server->port());
    RawPeer halfway(server->port());
    halfway.send("\x16");
    EXPECT_TRUE(silent.isClosed());
    EXPECT_TRUE(halfway.isClosed());
    EXPECT_TRUE(server->hasConnections(0));
}

TEST_F(TlsConnections, AreForgottenWhenThePeerLeavesBeforeItSaysAnything) {
    serve();
    RawPeer(server->port()).finish();
    EXPECT_TRUE(server->hasConnections(0));
}

/// Sits between a client and the service with a certificate of his own and passes on whatever is said.
class ManInTheMiddle {
public:
    ManInTheMiddle(TestCertificate const& certificate, std::uint16_t servicePort)
        : context_(Channel::makeServiceContext(certificate.certificateFile, certificate.keyFile)),
          acceptor_(io_, {asio::ip::address_v4::loopback(), 0}),
          thread_([this, servicePort] { relay(servicePort); }) {}
    ~ManInTheMiddle() { thread_.join(); }

    std::uint16_t port() const { return acceptor_.local_endpoint().port(); }

private:
    using TlsSocket = asio::ssl::stream<asio::ip::tcp::socket>;

    void relay(std::uint16_t servicePort) {
        auto const clientContext = Channel::makeClientContext();
        TlsSocket toClient(io_, *context_);
        TlsSocket toService(io_, *clientContext);
        acceptor_.accept(toClient.next_layer());
        toClient.handshake(asio::ssl::stream_base::server);
        toService.next_layer().connect({asio::ip::address_v4::loopback(), servicePort});
        toService.handshake(asio::ssl::stream_base::client);
        while (pass(toClient, toService) && pass(toService, toClient)) {
        }
    }
    static bool pass(TlsSocket& from, TlsSocket& to) {
        boost::system::error_code ec;
        char buffer[4096];
        std::size_t const size = from.read_some(asio::buffer(buffer), ec);
        if (!ec)
            asio::write(to, asio::buffer(buffer, size), ec);
        return !ec;
    }

    asio::io_context io_;
    std::unique_ptr<asio::ssl::context> context_;
    asio::ip::tcp::acceptor acceptor_;
    std::thread thread_;
};

TEST_F(TlsConnections, AreNotMadeThroughSomebodyInTheMiddle) {
    serve();
    ManInTheMiddle const man(makeCertificate(folder.string(), "man"), server->port());
    auto settings = clientSettings();
    settings.port = man.port();
    EXPECT_THAT(errorOf(settings), EndsWith(": Whoever answers there does not know our access token."));
    EXPECT_THAT(shown, IsEmpty());
}

// --- certificates and keys

class TlsFiles : public TlsConnections {
protected:
    asio::io_context io;
    TestCertificate const good = makeCertificate(folder.string(), "good");

    std::string refusalOf(TestCertificate const& files) {
        return messageOf<Base::Error>(
            [&] { Channel::Server(io, serverSettings(files), Ipc::makeEmptyCmd, {}); });
    }
};

TEST_F(TlsFiles, MustBeNamed) {
    EXPECT_EQ(refusalOf({}),
              "TLS on 127.0.0.1 needs a certificate and its private key; only a loopback address can do "
              "without TLS.");
    EXPECT_THAT(refusalOf({good.certificateFile, ""}), StartsWith("TLS on 127.0.0.1 needs"));
    EXPECT_THAT(refusalOf({"", good.keyFile}), StartsWith("TLS on 127.0.0.1 needs"));
}

TEST_F(TlsFiles, MustBeThere) {
    EXPECT_EQ(refusalOf({"/no/such.crt", good.keyFile}),
              "Cannot use the certificate \"/no/such.crt\": No such file or directory.");
    EXPECT_EQ(refusalOf({good.certificateFile, "/no/such.key"}),
              "Cannot open \"/no/such.key\": No such file or directory.");
}

TEST_F(TlsFiles, MustBeWhatTheyAreToBe) {
    EXPECT_THAT(refusalOf({good.keyFile, good.keyFile}),
                StartsWith("Cannot use the certificate \"" + good.keyFile + "\": "));
    fs::copy(good.certificateFile, folder / "copy");
    ::chmod((folder / "copy").c_str(), 0600);
    EXPECT_THAT(refusalOf({good.certificateFile, folder / "copy"}),
                StartsWith("Cannot use the private key \"" + (folder / "copy").string() + "\": "));
}

TEST_F(TlsFiles, MustBelongTogether) {
    TestCertificate const other = makeCertificate(folder.string(), "other");
    EXPECT_THAT(refusalOf({good.certificateFile, other.keyFile}),
                StartsWith("Cannot use the private key \"" + other.keyFile + "\": key values mismatch"));
}

TEST_F(TlsFiles, MustNotWantAPassword) {
    TestCertificate const secret = makeCertificate(folder.string(), "secret", "password");
    EXPECT_THAT(refusalOf(secret), StartsWith("Cannot use the private key \"" + secret.keyFile + "\": "));
}

TEST_F(TlsFiles, MustKeepTheKeyPrivate) {
    ::chmod(good.keyFile.c_str(), 0644);
    EXPECT_EQ(refusalOf(good), "The file \"" + good.keyFile +
                                   "\" is open to others (mode 0644); make it private with chmod 600.");
}

// --- addresses

/// A stream of the service's side, on a thread of its own, and a foreign client.
class TlsStreams : public Test {
protected:
    using ForeignStream = asio::ssl::stream<asio::ip::tcp::socket>;

    TlsStreams() {
        asio::ip::tcp::acceptor acceptor(io_, {asio::ip::address_v4::loopback(), 0});
        foreign_.next_layer().connect(acceptor.local_endpoint());
        own_ = Channel::makeTlsStream(acceptor.accept(), *service_, Channel::TlsRole::Service);
    }
    ~TlsStreams() override { fs::remove_all(folder_); }

    /// Both sides agree.
    void agree() {
        own_->handshake([this](Channel::error_code const& ec) { told_ = ec.message(); });
        std::thread thread([this] { foreign_.handshake(asio::ssl::stream_base::client); });
        io_.run();
        io_.restart();
        thread.join();
        ASSERT_EQ(told_, Channel::error_code().message());
    }
    /// Reads until so much is there, or the end, which is told.
    void read(std::size_t wanted) {
        if (got_.size() >= wanted)
            return;
        own_->readSome(room_, [this, wanted](Channel::error_code const& ec, std::size_t size) {
            got_.append(room_.data(), size);
            told_ = ec.message();
            if (!ec)
                read(wanted);
        });
    }
    void write(std::string const& text) {
        own_->writeAll(text, [this](Channel::error_code const& ec) { written_ = ec.message(); });
    }
    static std::string textOf(std::size_t size) {
        std::string text(size, 'x');
        for (std::size_t i = 0; i < size; ++i)
            text[i] = static_cast<char>(i * 7 + i / 4096);
        return text;
    }
    std::string readForeign(std::size_t size) {
        std::string text(size, 'x');
        asio::read(foreign_, asio::buffer(text));
        return text;
    }

    static constexpr std::size_t MUCH = 3'000'001;

    fs::path const folder_ = fs::temp_directory_path() / ("tls_streams_" + std::to_string(::getpid()));
    TestCertificate const certificate_ = [this] {
        fs::create_directory(folder_);
        return makeCertificate(folder_.string(), "service");
    }();
    std::unique_ptr<asio::ssl::context> service_ =
        Channel::makeServiceContext(certificate_.certificateFile, certificate_.keyFile);
    std::unique_ptr<asio::ssl::context> client_ = Channel::makeClientContext();
    asio::io_context io_;
    ForeignStream foreign_{io_, *client_};
    std::unique_ptr<Channel::Stream> own_;
    std::vector<char> room_ = std::vector<char>(100'000);
    std::string got_;
    std::string told_;
    std::string written_;
};

TEST_F(TlsStreams, CarryMuchInBothDirectionsAtOnce) {
    agree();
    std::string const there = textOf(MUCH);
    std::string const back = textOf(MUCH + 5);
    std::string seen;
    std::thread thread([&] {
        asio::write(foreign_, asio::buffer(there));
        seen = readForeign(back.size());
    });
    write(back);
    read(there.size());
    io_.run();
    thread.join();
    EXPECT_TRUE(got_ == there);
    EXPECT_TRUE(seen == back);
    EXPECT_EQ(written_, Channel::error_code().message());
}

TEST_F(TlsStreams, GoOnUnderNewKeysThatTheOtherSideAsksFor) {
    agree();
    std::string seen;
    std::thread thread([&] {
        for (char const* word : {"one", "two"}) {
            SSL_key_update(foreign_.native_handle(), SSL_KEY_UPDATE_REQUESTED);
            asio::write(foreign_, asio::buffer(word, 3));
        }
        seen = readForeign(5);
    });
    read(6);
    io_.run();
    io_.restart();
    write("three");
    io_.run();
    thread.join();
    EXPECT_EQ(got_, "onetwo");
    EXPECT_EQ(seen, "three");
}

TEST_F(TlsStreams, TellAFarewell) {
    agree();
    std::thread thread([&] {
        asio::write(foreign_, asio::buffer("bye", 3));
        Channel::error_code ignored;
        foreign_.shutdown(ignored);
    });
    read(4);
    io_.run();
    own_->socket().close();
    thread.join();
    EXPECT_EQ(got_, "bye");
    EXPECT_EQ(told_, Channel::error_code(asio::error::eof).message());
}

TEST_F(TlsStreams, TellAnEndWithoutAFarewell) {
    agree();
    foreign_.next_layer().shutdown(asio::ip::tcp::socket::shutdown_send);
    read(1);
    io_.run();
    EXPECT_EQ(told_, Channel::error_code(asio::ssl::error::stream_truncated).message());
}

TEST_F(TlsStreams, EndWhatIsUnderWayWhenTheyAreClosed) {
    agree();
    read(1);
    own_->socket().close();
    io_.run();
    EXPECT_EQ(told_, Channel::error_code(asio::error::operation_aborted).message());
}

TEST_F(TlsStreams, TellTheOtherSideThatTheHandshakeFailed) {
    asio::write(foreign_.next_layer(), asio::buffer("\x16\x03\x01\x00\x05hello", 10));
    own_->handshake([this](Channel::error_code const& ec) { told_ = ec.category().name(); });
    io_.run();
    EXPECT_EQ(told_, asio::error::get_ssl_category().name());
    char kind = 0;
    asio::read(foreign_.next_layer(), asio::buffer(&kind, 1));
    EXPECT_EQ(kind, 0x15) << "an alert";
}

TEST(LoopbackAddresses, AreToldInAllTheirForms) {
    std::pair<char const*, bool> const cases[] = {
        {"127.0.0.1", true}, {"127.8.7.6", true},  {"::1", true},       {"::ffff:127.0.0.1", true},
        {"0.0.0.0", false},  {"::", false},        {"10.0.0.1", false}, {"::ffff:10.0.0.1", false},
        {"fe80::1", false},  {"128.0.0.1", false},
    };
    for (auto const& [address, expected] : cases)
        EXPECT_EQ(Channel::isLoopback(asio::ip::make_address(address)), expected) << address;
}

class OverANetwork : public TlsConnections {
protected:
    TwoNetworks networks;

    void SetUp() override {
        if (!networks.whyNot().empty())
            GTEST_SKIP() << "There is no right to make network namespaces: " << networks.whyNot();
    }
};

TEST_F(OverANetwork, ConnectionsAreEncryptedWithoutBeingAskedTo) {
    auto serverSide = serverSettings(makeCertificate(folder.string(), "service"));
    serverSide.tls = Channel::Tls::Auto;
    for (std::string const address : {TwoNetworks::SERVICE_IP4, TwoNetworks::SERVICE_IP6}) {
        serverSide.address = address;
        {
            TwoNetworks::Inside const inside(networks.service());
            server.emplace(serverSide);
        }
        auto settings = clientSettings();
        settings.tls = Channel::Tls::Auto;
        settings.host = address;
        TwoNetworks::Inside const inside(networks.client());
        Client(settings).call<Ipc::PriceEst>(json::Object{});
        EXPECT_THAT(shown.back(), EndsWith(' ' + fingerprint()));
        server.reset();
    }
    EXPECT_EQ(shown.size(), 2u);
}

TEST_F(OverANetwork, AServiceThatIsAwayIsGivenUpInTime) {
    Channel::ClientSettings settings;
    settings.host = "10.77.0.99";
    settings.port = 4711;
    settings.token = TOKEN;
    settings.connectTime = 50ms;
    TwoNetworks::Inside const inside(networks.client());
    EXPECT_EQ(errorOf(settings), "10.77.0.99:4711: It does not let us in within 0.050 s.");
}

} // namespace

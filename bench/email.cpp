// Measures letters that go out as e-mails against libcurl alone, which sends the same messages, made before,
// to the same server over one connection: to a mail server that people run, with TLS, and to one that does
// nothing at all with what it takes, so that all that the carrier does shows. Decides whether messages may be
// made anew for each letter, and whether the carrier's look at each line of the server costs anything. To
// reach at the mail server: `of_peer` 0.8.
#include "programs/carriers/mime_message.h"
#include "programs/carriers/smtp_carrier.h"
#include "tests/carriers/postfix_server.h"
#include "tests/channel/test_certificate.h"
#include "tests/support/temporary_folder.h"

#include <benchmark/benchmark.h>
#include <curl/curl.h>

#include <arpa/inet.h>
#include <array>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <netinet/in.h>
#include <string>
#include <sys/socket.h>
#include <thread>
#include <unistd.h>

namespace {

using Clock = std::chrono::steady_clock;

/// Takes all that it is given, one connection after another.
class Server {
public:
    Server() : socket_(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t size = sizeof address;
        if (::bind(socket_, reinterpret_cast<sockaddr*>(&address), size) != 0 || ::listen(socket_, 4) != 0 ||
            ::getsockname(socket_, reinterpret_cast<sockaddr*>(&address), &size) != 0)
            std::abort();
        port_ = ntohs(address.sin_port);
        thread_ = std::thread([this] { serve(); });
    }
    ~Server() {
        ::shutdown(socket_, SHUT_RDWR);
        thread_.join();
        ::close(socket_);
    }
    Server(Server const&) = delete;
    Server& operator=(Server const&) = delete;

    std::string url() const { return "smtp://127.0.0.1:" + std::to_string(port_); }

private:
    void serve() const {
        for (int client; (client = ::accept4(socket_, nullptr, nullptr, SOCK_CLOEXEC)) >= 0; ::close(client))
            talk(client);
    }
    static void talk(int client) {
        std::string text;
        std::array<char, 65536> buffer{};
        bool isMessage = false;
        say(client, "220 server\r\n");
        for (ssize_t size; (size = ::read(client, buffer.data(), buffer.size())) > 0;) {
            text.append(buffer.data(), static_cast<std::size_t>(size));
            std::string const end = isMessage ? "\r\n.\r\n" : "\r\n";
            if (!text.ends_with(end))
                continue;
            bool const begins = !isMessage && text.starts_with("DATA");
            say(client, begins ? "354 go on\r\n" : "250 taken\r\n");
            isMessage = begins;
            text.clear();
        }
    }
    static void say(int client, char const* line) {
        if (::write(client, line, std::strlen(line)) < 0)
            return;
    }

    int socket_;
    int port_ = 0;
    std::thread thread_;
};

Carriers::Parcel letterOf(std::size_t bytes) {
    Carriers::Parcel parcel;
    parcel.key = "p1-1";
    parcel.mailing = "p1";
    for (std::uint32_t seed = 7; parcel.document.size() < bytes; seed = seed * 1664525 + 1013904223)
        parcel.document += static_cast<char>(seed >> 24);
    Carriers::OutgoingLetter& letter = parcel.letters.emplace_back();
    letter.key = parcel.key;
    letter.address = "ada@example.com";
    letter.fields = {{"name", "Ada"}};
    return parcel;
}

/// With TLS where there is a certificate.
Protocol::CarrierSettings settingsFor(std::string const& url, std::string const& certificateFile = {}) {
    Protocol::CarrierSettings settings;
    settings.type = Protocol::CarrierType::Smtp;
    settings.url = url;
    settings.caFile = certificateFile;
    settings.startsTls = !certificateFile.empty();
    settings.from = "bills@acme.example";
    settings.subject = "Invoice of {name}";
    settings.text = "Dear {name},\n\nhere it is.\n";
    return settings;
}

/// libcurl and a message, and nothing else.
class Peer {
public:
    Peer(Protocol::CarrierSettings const& settings, std::string message) : message_(std::move(message)) {
        recipients_ = curl_slist_append(nullptr, "ada@example.com");
        curl_easy_setopt(handle_, CURLOPT_URL, settings.url.c_str());
        if (settings.startsTls) {
            curl_easy_setopt(handle_, CURLOPT_USE_SSL, static_cast<long>(CURLUSESSL_ALL));
            curl_easy_setopt(handle_, CURLOPT_CAINFO, settings.caFile.c_str());
        }
        curl_easy_setopt(handle_, CURLOPT_MAIL_FROM, "bills@acme.example");
        curl_easy_setopt(handle_, CURLOPT_MAIL_RCPT, recipients_);
        curl_easy_setopt(handle_, CURLOPT_UPLOAD, 1L);
        curl_easy_setopt(handle_, CURLOPT_INFILESIZE_LARGE, static_cast<curl_off_t>(message_.size()));
        curl_easy_setopt(handle_, CURLOPT_READFUNCTION, &Peer::read);
        curl_easy_setopt(handle_, CURLOPT_READDATA, this);
    }
    ~Peer() {
        curl_easy_cleanup(handle_);
        curl_slist_free_all(recipients_);
    }
    Peer(Peer const&) = delete;
    Peer& operator=(Peer const&) = delete;

    void send() {
        at_ = 0;
        if (curl_easy_perform(handle_) != CURLE_OK)
            std::abort();
    }

private:
    static std::size_t read(char* into, std::size_t one, std::size_t room, void* self) {
        auto& peer = *static_cast<Peer*>(self);
        std::size_t const size = peer.message_.copy(into, one * room, peer.at_);
        peer.at_ += size;
        return size;
    }

    std::string message_;
    CURL* handle_ = curl_easy_init();
    curl_slist* recipients_ = nullptr;
    std::size_t at_ = 0;
};

std::string messageOf(Carriers::Parcel const& parcel) {
    Carriers::MailMessage message;
    message.from = "bills@acme.example";
    message.to = parcel.letters.front().address;
    message.subject = "Invoice of Ada";
    message.text = "Dear Ada,\n\nhere it is.\n";
    message.messageId = "p1-1@acme.example";
    message.attachments = {{"p1-1.pdf", parcel.document}};
    return Carriers::inMime(message);
}

/// `state.range(0)` is the letter's size in KiB. Each has a server of its own where they are two.
void compare(benchmark::State& state, Protocol::CarrierSettings const& settings,
             Protocol::CarrierSettings const& settingsOfPeer) {
    Carriers::Parcel const parcel = letterOf(static_cast<std::size_t>(state.range(0)) << 10);
    Carriers::SmtpCarrier carrier(settings);
    Peer peer(settingsOfPeer, messageOf(parcel));
    Clock::duration ours{};
    Clock::duration theirs{};
    for (auto _ : state) {
        auto const begin = Clock::now();
        if (carrier.handOver(parcel, [] {}).kind != Carriers::Outcome::Kind::Accepted)
            std::abort();
        auto const middle = Clock::now();
        peer.send();
        ours += middle - begin;
        theirs += Clock::now() - middle;
    }
    state.counters["of_peer"] = std::chrono::duration<double>(theirs) / std::chrono::duration<double>(ours);
}

void toAMailServer(benchmark::State& state) {
    if (!PostfixServer::whyNot().empty())
        return state.SkipWithError(PostfixServer::whyNot().c_str());
    TemporaryFolder const folder;
    std::filesystem::permissions(folder.path(), std::filesystem::perms(0755));
    auto const files = ChannelTest::makeCertificate(folder.path().string(), "127.0.0.1");
    PostfixServer const server(folder / "server", files.certificateFile, files.keyFile);
    auto const settings = settingsFor(server.url(), files.certificateFile);
    compare(state, settings, settings);
}
BENCHMARK(toAMailServer)->Arg(20)->Arg(100)->Arg(1000)->Iterations(300)->Unit(benchmark::kMillisecond);

void toNobody(benchmark::State& state) {
    Server const server;
    Server const other;
    compare(state, settingsFor(server.url()), settingsFor(other.url()));
}
BENCHMARK(toNobody)->Arg(20)->Arg(100)->Arg(1000)->Unit(benchmark::kMillisecond);

} // namespace

BENCHMARK_MAIN();

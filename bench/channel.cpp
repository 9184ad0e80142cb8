// Measures what a command costs on the connection: the round trip of a small one against the bare echo of the
// same bytes, and 200 clients at once. Decides whether commands may stay JSON objects that are built and read
// for each message. To reach: `of_peer` 0.33 (three times the echo's time), and no client that fails.
#include "programs/channel/client.h"
#include "programs/channel/client_connection.h"
#include "programs/channel/frame.h"
#include "programs/channel/message_text.h"
#include "programs/channel/server.h"

#include "vlservice/ipc/make_empty_cmd.h"
#include "vlservice/ipc/price_est.h"

#include <boost/asio/buffer.hpp>
#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/read.hpp>
#include <boost/asio/write.hpp>

#include <benchmark/benchmark.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <cstdlib>
#include <functional>
#include <memory>
#include <string>
#include <thread>
#include <vector>

namespace {

namespace asio = boost::asio;
using asio::ip::tcp;

std::string const TOKEN = "0123456789abcdef0123456789abcdef";

json::Object parameters() { return {{"sheets", 3}, {"colour", true}, {"duplex", true}, {"priority", false}}; }

/// A thread on which an io_context runs.
class Runner {
public:
    explicit Runner(asio::io_context& io)
        : io_(io), work_(asio::make_work_guard(io)), thread_([&io] { io.run(); }) {}
    ~Runner() {
        io_.stop();
        thread_.join();
    }
    Runner(Runner const&) = delete;
    Runner& operator=(Runner const&) = delete;

private:
    asio::io_context& io_;
    asio::executor_work_guard<asio::io_context::executor_type> work_;
    std::thread thread_;
};

/// A service whose answer is what was asked.
class CommandService {
public:
    CommandService()
        : server_(io_, settings(), Ipc::makeEmptyCmd, [](auto const&, auto const& answer) { answer(); }) {}

    Channel::ClientSettings clientSettings() const {
        Channel::ClientSettings settings;
        settings.host = "127.0.0.1";
        settings.port = server_.port();
        settings.token = TOKEN;
        return settings;
    }

private:
    static Channel::ServerSettings settings() {
        Channel::ServerSettings settings;
        settings.token = TOKEN;
        return settings;
    }

    asio::io_context io_;
    Channel::Server server_;
    Runner runner_{io_};
};

/// Sends back what comes, as little around it as can be.
class EchoService {
public:
    EchoService() : acceptor_(io_, {asio::ip::address_v4::loopback(), 0}), socket_(io_) {
        acceptor_.async_accept(socket_, [this](auto const&) {
            socket_.set_option(tcp::no_delay(true));
            read();
        });
    }
    std::uint16_t port() const { return acceptor_.local_endpoint().port(); }

private:
    void read() {
        socket_.async_read_some(asio::buffer(buffer_), [this](auto const& ec, std::size_t size) {
            if (!ec)
                asio::async_write(socket_, asio::buffer(buffer_.data(), size),
                                  [this](auto const&, std::size_t) { read(); });
        });
    }

    asio::io_context io_;
    tcp::acceptor acceptor_;
    tcp::socket socket_;
    std::array<char, 4096> buffer_;
    Runner runner_{io_};
};

class EchoClient {
public:
    explicit EchoClient(std::uint16_t port) : socket_(io_) {
        socket_.connect({asio::ip::address_v4::loopback(), port});
        socket_.set_option(tcp::no_delay(true));
    }
    void roundTrip(std::string const& bytes) {
        asio::write(socket_, asio::buffer(bytes));
        asio::read(socket_, asio::buffer(buffer_.data(), bytes.size()));
    }

private:
    asio::io_context io_;
    tcp::socket socket_;
    std::array<char, 4096> buffer_;
};

double secondsOf(std::function<void()> const& work) {
    auto const begin = std::chrono::steady_clock::now();
    work();
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - begin).count();
}

double median(std::vector<double> values) {
    auto const middle = values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2);
    std::nth_element(values.begin(), middle, values.end());
    return *middle;
}

void roundTrip(benchmark::State& state) {
    CommandService const service;
    Channel::Client client(service.clientSettings());
    EchoService const echo;
    EchoClient echoClient(echo.port());
    std::string const text = Channel::print(parameters());
    std::string bytes;
    Channel::appendFrame(bytes, {Ipc::PriceEst::CMD_ID, Channel::Kind::Request, 2, text});
    std::vector<double> ours, peers;
    for (auto _ : state) {
        peers.push_back(secondsOf([&] { echoClient.roundTrip(bytes); }));
        ours.push_back(secondsOf([&] { client.call<Ipc::PriceEst>(parameters()); }));
        state.SetIterationTime(ours.back());
    }
    state.counters["median_us"] = median(ours) * 1e6;
    state.counters["echo_us"] = median(peers) * 1e6;
    state.counters["of_peer"] = median(peers) / median(ours);
}
BENCHMARK(roundTrip)->UseManualTime()->Unit(benchmark::kMicrosecond);

/// Each connects, sends ten commands and leaves.
void clientsAtOnce(benchmark::State& state) {
    CommandService const service;
    auto const clients = state.range(0);
    std::int64_t failures = 0;
    std::int64_t answers = 0;
    for (auto _ : state) {
        asio::io_context io;
        for (std::int64_t i = 0; i < clients; ++i) {
            auto const client = Channel::ClientConnection::make(io, service.clientSettings());
            client->connect([&](std::string const& failure) { failures += failure.empty() ? 0 : 1; });
            for (int n = 1; n <= 10; ++n)
                client->submit(std::make_shared<Ipc::PriceEst>(client, parameters()),
                               [&, client, n](std::string const& failure) {
                                   failures += failure.empty() ? 0 : 1;
                                   ++answers;
                                   if (n == 10)
                                       client->close();
                               });
        }
        io.run();
    }
    state.counters["failures"] = static_cast<double>(failures);
    state.SetItemsProcessed(answers);
    if (failures != 0)
        state.SkipWithError("clients failed");
}
BENCHMARK(clientsAtOnce)->Arg(200)->UseRealTime()->Unit(benchmark::kMillisecond);

} // namespace

BENCHMARK_MAIN();

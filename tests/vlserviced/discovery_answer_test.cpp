// The service as it is found, over a real network: client and service each in a namespace of its own.
#include "programs/vlserviced/discovery_answer.h"

#include "programs/vlmail/service/multicast_probe.h"
#include "programs/vlmail/service/service_search.h"
#include "tests/support/log_lines.h"
#include "tests/support/two_networks.h"
#include "tests/vlserviced/json_help.h"

#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/ip/multicast.hpp>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <functional>
#include <optional>
#include <thread>

namespace {

using namespace std::chrono_literals;
using boost::asio::ip::udp;
using testing::ElementsAre;
using testing::IsEmpty;

std::string const TOKEN = "0123456789abcdef0123456789abcdef";

class DiscoveryAnswerTest : public testing::Test {
protected:
    void SetUp() override {
        if (!networks_.whyNot().empty())
            GTEST_SKIP() << "There is no right to make network namespaces: " << networks_.whyNot();
    }
    ~DiscoveryAnswerTest() override {
        io_.stop();
        if (thread_.joinable())
            thread_.join();
    }

    void serve() {
        TwoNetworks::Inside const inside(networks_.service());
        answer_.emplace(io_, "10.77.0.2", std::uint16_t(45001), TOKEN);
    }
    /// Everything of the service's network goes on from now on.
    void run() {
        if (!thread_.joinable())
            thread_ = std::thread([this] {
                TwoNetworks::Inside const inside(networks_.service());
                io_.run();
            });
    }
    /// Datagrams from the client's network to the IPv4 group.
    void send(std::string const& datagram, int times = 1) {
        run();
        TwoNetworks::Inside const inside(networks_.client());
        boost::asio::io_context io;
        udp::socket socket(io, udp::v4());
        for (int i = 0; i < times; ++i)
            socket.send_to(boost::asio::buffer(datagram), GROUP);
    }
    /// A socket in that network that hears what is sent to the IPv4 group.
    static udp::socket member(boost::asio::io_context& io, int network) {
        TwoNetworks::Inside const inside(network);
        udp::socket socket(io, udp::v4());
        socket.set_option(udp::socket::reuse_address(true));
        socket.bind(udp::endpoint(udp::v4(), GROUP.port()));
        socket.set_option(boost::asio::ip::multicast::join_group(GROUP.address()));
        return socket;
    }
    /// Sends this to the group from the service's network as soon as anybody asks there.
    void answerWith(std::vector<std::string> const& datagrams) {
        noise_.emplace(member(io_, networks_.service()));
        noise_->async_wait(udp::socket::wait_read, [this, datagrams](boost::system::error_code const&) {
            for (std::string const& datagram : datagrams)
                noise_->send_to(boost::asio::buffer(datagram), GROUP);
        });
    }
    /// What a client in its network finds.
    std::string found(std::string const& token = TOKEN, std::chrono::milliseconds time = 2s) {
        run();
        TwoNetworks::Inside const inside(networks_.client());
        std::optional<VlMail::ServiceAddress> const service = VlMail::searchNetwork(token, time);
        return service ? service->text() : "nothing";
    }
    /// The same, tried for as long as it takes, within a minute.
    std::string foundInTheEnd() {
        auto const deadline = std::chrono::steady_clock::now() + 1min;
        std::string service = "nothing";
        while (service == "nothing" && std::chrono::steady_clock::now() < deadline)
            service = found(TOKEN, 100ms);
        return service;
    }
    /// How often a datagram with this in it comes to the client's network within half a second.
    int count(std::string const& part) {
        boost::asio::io_context io;
        udp::socket socket = member(io, networks_.client());
        std::array<char, 2000> bytes;
        int heard = 0;
        std::function<void()> const receive = [&] {
            socket.async_receive(boost::asio::buffer(bytes),
                                 [&](boost::system::error_code const& ec, std::size_t size) {
                                     if (ec)
                                         return;
                                     heard += std::string(bytes.data(), size).find(part) != std::string::npos;
                                     receive();
                                 });
        };
        receive();
        io.run_for(500ms);
        return heard;
    }
    /// What the doctor says of the interface that leads to the service.
    VlMail::ProbeReport examined(bool isIp6, std::chrono::milliseconds time) {
        run();
        TwoNetworks::Inside const inside(networks_.client());
        for (VlMail::ProbeReport const& report : VlMail::probeNetwork(time))
            if (report.interface != "lo" && report.isIp6 == isIp6)
                return report;
        return {};
    }

    static inline udp::endpoint const GROUP{boost::asio::ip::make_address("239.4.5.6"), 45677};

    TwoNetworks networks_;
    VLServiceTest::LogLines log_;
    boost::asio::io_context io_;
    boost::asio::executor_work_guard<boost::asio::io_context::executor_type> work_{io_.get_executor()};
    std::optional<VlServiced::DiscoveryAnswer> answer_;
    std::optional<udp::socket> noise_;
    std::thread thread_;
};

constexpr char const* SERVICE = "10.77.0.2:45001";
constexpr char const* ANSWER = R"({"host":"10.77.0.2","port":45001})";

TEST_F(DiscoveryAnswerTest, NamesHostAndPort) {
    serve();
    EXPECT_EQ(found(), SERVICE);
    EXPECT_EQ(found(), SERVICE);
    EXPECT_EQ(found(""), SERVICE) << "without a token to hold it against";
}

TEST_F(DiscoveryAnswerTest, OfWhoeverElseDoesNotHideTheOneThatProvesItself) {
    answerWith({"no JSON", "[]", "{}", R"({"host":"","port":1})", R"({"host":"10.77.0.66","port":1})",
                R"({"host":"10.77.0.66","port":1,"nonce":"","proof":""})"});
    serve();
    EXPECT_EQ(found(), SERVICE);
}

TEST_F(DiscoveryAnswerTest, WithoutAProofCountsWhenTheTimeIsUp) {
    answerWith({"no JSON", R"({"host":"10.77.0.5","port":7})", R"({"host":"10.77.0.6","port":7})"});
    EXPECT_EQ(found(TOKEN, 500ms), "10.77.0.5:7");
}

TEST_F(DiscoveryAnswerTest, IsNothingWhereOnlyGarbageComes) {
    answerWith({"no JSON", "[]", "{}", R"({"host":"","port":1})"});
    EXPECT_EQ(found(TOKEN, 500ms), "nothing");
}

TEST_F(DiscoveryAnswerTest, IsGivenAgainWhenTheInterfaceWasReplaced) {
    serve();
    EXPECT_EQ(found(), SERVICE);
    networks_.disconnect();
    networks_.connect();
    EXPECT_EQ(foundInTheEnd(), SERVICE);
}

TEST_F(DiscoveryAnswerTest, IsGivenByAServiceThatStartedBeforeItsNetwork) {
    networks_.disconnect();
    serve();
    run();
    networks_.connect();
    EXPECT_EQ(foundInTheEnd(), SERVICE);
}

TEST_F(DiscoveryAnswerTest, ToAFloodOfGarbageIsAFewLines) {
    serve();
    send("garbage", 2000);
    EXPECT_EQ(found(), SERVICE);
    io_.stop();
    thread_.join();
    EXPECT_LE(log_.lines.size(), 12u);
}

TEST_F(DiscoveryAnswerTest, GoesOnBehindDatagramsThatAreNone) {
    serve();
    send("no JSON", 3);
    send(std::string(5000, 'x'));
    send(R"({"host":"another service","port":1})");
    send("[]");
    EXPECT_EQ(found(), SERVICE);
}

TEST_F(DiscoveryAnswerTest, IsGivenWithoutIp6) {
    networks_.disableIp6(networks_.service());
    serve();
    EXPECT_EQ(found(), SERVICE);
}

TEST_F(DiscoveryAnswerTest, IsNotMultipliedByAFloodOfRequests) {
    serve();
    run();
    std::thread flood([this] { send(R"({"#req":true})", 200); });
    int const answers = count(ANSWER);
    flood.join();
    EXPECT_GE(answers, 1);
    EXPECT_LE(answers, 11);
}

TEST_F(DiscoveryAnswerTest, IsNotMultipliedByAFloodOfRequestsWithNonces) {
    serve();
    run();
    std::thread flood([this] {
        for (int i = 0; i < 200; ++i)
            send(R"({"#req":true,"nonce":")" + std::to_string(i) + "\"}");
    });
    int const answers = count("\"proof\"");
    flood.join();
    EXPECT_GE(answers, 1);
    EXPECT_LE(answers, 11);
}

TEST_F(DiscoveryAnswerTest, IsSeenByTheDoctorOnTheInterfaceThatItCameBy) {
    serve();
    VlMail::ProbeReport const ip4 = examined(false, std::chrono::milliseconds(1000));
    EXPECT_EQ(ip4.failure, "");
    EXPECT_TRUE(ip4.heardItself);
    EXPECT_THAT(ip4.answers, ElementsAre("10.77.0.2:45001 (from 10.77.0.2)"));
    EXPECT_THAT(VlMail::hintsFor({ip4}), IsEmpty());
    VlMail::ProbeReport const ip6 = examined(true, std::chrono::milliseconds(1000));
    EXPECT_EQ(ip6.failure, "");
    ASSERT_EQ(ip6.answers.size(), 1u);
    EXPECT_TRUE(ip6.answers.front().starts_with("10.77.0.2:45001 (from ")) << ip6.answers.front();
}

TEST_F(DiscoveryAnswerTest, IsMissedByTheDoctorWhereNobodyGivesOne) {
    VlMail::ProbeReport const ip4 = examined(false, std::chrono::milliseconds(200));
    EXPECT_TRUE(ip4.heardItself);
    EXPECT_THAT(ip4.answers, IsEmpty());
    EXPECT_EQ(VlMail::hintsFor({ip4}).size(), 2u);
}

TEST_F(DiscoveryAnswerTest, IsNotTakenFromDatagramsThatNameNoAddress) {
    answerWith({"no JSON", R"({"host":"","port":1})"});
    VlMail::ProbeReport const ip4 = examined(false, std::chrono::milliseconds(1000));
    EXPECT_EQ(ip4.foreign, 2);
    EXPECT_THAT(ip4.answers, IsEmpty());
}

} // namespace

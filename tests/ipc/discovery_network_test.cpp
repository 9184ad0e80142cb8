// Discovery over a real network: client and service each in a namespace of its own, joined by virtual
// interfaces.

#include "tests/ipc/recording_processor.h"
#include "tests/support/log_lines.h"
#include "tests/support/two_networks.h"

#include "vlservice/ipc/discovery_cli.h"
#include "vlservice/ipc/gui_fwd.h"
#include "vlservice/json/json_text.h"

#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/ip/multicast.hpp>

#include <gmock/gmock.h>

#include <chrono>
#include <list>
#include <sstream>
#include <thread>

using namespace testing;
using boost::asio::ip::udp;

namespace {

enum class Family { Ip4, Ip6 };

/// A service as programs write it: it answers each request with its host and port. A datagram of its own
/// making may go out ahead of the answer.
class Service {
public:
    Service(boost::asio::io_context& io, Family family, std::string host, std::string before = {})
        : base_(io, family == Family::Ip4), rawSender_(io), host_(std::move(host)),
          before_(std::move(before)) {
        group_ = udp::endpoint(
            boost::asio::ip::make_address(family == Family::Ip4 ? "239.4.5.6" : "ff45:6:45:6:45:6:45:6"),
            Ipc::DiscoveryBase::DISCOVERY_PORT);
        rawSender_.open(group_.protocol());
        listen();
    }

private:
    void listen() {
        base_.recv([this](json::Object object) {
            if (Ipc::DiscoveryBase::isReq(object))
                answer();
            listen();
        });
    }
    void answer() {
        if (!before_.empty())
            rawSender_.send_to(boost::asio::buffer(before_), group_);
        base_.send({{Ipc::DiscoveryBase::SVC_HOST_FLD_NAME.c_str(), host_},
                    {Ipc::DiscoveryBase::SVC_PORT_FLD_NAME.c_str(), 7}});
    }

    Ipc::DiscoveryBase base_;
    udp::socket rawSender_;
    udp::endpoint group_;
    std::string host_;
    std::string before_;
};

class DiscoveryOverANetwork : public Test {
protected:
    TwoNetworks networks;
    VLServiceTest::LogLines log;
    std::shared_ptr<RecordingProcessor> processor = std::make_shared<RecordingProcessor>();
    std::chrono::steady_clock::duration searched{};

    void SetUp() override {
        if (!networks.whyNot().empty())
            GTEST_SKIP() << "There is no right to make network namespaces: " << networks.whyNot();
    }

    void TearDown() override {
        // The commands hold their processor, and here it holds them.
        processor->submitted.clear();
    }

    void serve(Family family, std::string host, std::string before = {}) {
        TwoNetworks::Inside const inside(networks.service());
        services_.emplace_back(serviceIo_, family, std::move(host), std::move(before));
    }

    /// Runs a client until it has nothing left to do, with the services on a thread of their own, and gives
    /// the results.
    std::vector<std::string> search() {
        std::thread services([this] { serviceIo_.run(); });
        boost::asio::io_context io;
        auto const begin = std::chrono::steady_clock::now();
        {
            TwoNetworks::Inside const inside(networks.client());
            client_.emplace(processor, io);
        }
        io.run();
        searched = std::chrono::steady_clock::now() - begin;
        client_.reset();
        serviceIo_.stop();
        services.join();
        std::vector<std::string> results;
        for (auto const& cmd : processor->submitted) {
            std::ostringstream text;
            text << dynamic_cast<Ipc::GuiFwd&>(*cmd).params();
            results.push_back(text.str());
        }
        return results;
    }

    /// What was logged as a failure, by anybody.
    std::vector<std::string> failures() const {
        std::vector<std::string> texts;
        for (auto const& [priority, line] : log.lines)
            if (priority < 7)
                texts.push_back(line);
        return texts;
    }

private:
    boost::asio::io_context serviceIo_;
    boost::asio::executor_work_guard<boost::asio::io_context::executor_type> work_{serviceIo_.get_executor()};
    std::list<Service> services_;
    std::optional<Ipc::DiscoveryCli> client_;
};

constexpr auto FOUND_BY_IP4 = R"({"host":"10.77.0.2","port":7})";
constexpr auto FOUND_BY_IP6 = R"({"host":"fd77::2","port":7})";
constexpr auto TIMEOUT = std::chrono::seconds(2);

TEST_F(DiscoveryOverANetwork, FindsAServiceByIp4) {
    serve(Family::Ip4, TwoNetworks::SERVICE_IP4);
    EXPECT_THAT(search(), ElementsAre(FOUND_BY_IP4));
    EXPECT_LT(searched, TIMEOUT);
    EXPECT_THAT(failures(), IsEmpty());
}

TEST_F(DiscoveryOverANetwork, FindsAServiceByIp6) {
    serve(Family::Ip6, TwoNetworks::SERVICE_IP6);
    EXPECT_THAT(search(), ElementsAre(FOUND_BY_IP6));
    EXPECT_LT(searched, TIMEOUT);
    EXPECT_THAT(failures(), IsEmpty());
}

TEST_F(DiscoveryOverANetwork, FindsAServiceThatAnswersOnBothFamiliesOnce) {
    serve(Family::Ip6, TwoNetworks::SERVICE_IP6);
    serve(Family::Ip4, TwoNetworks::SERVICE_IP4);
    EXPECT_THAT(search(), ElementsAre(AnyOf(FOUND_BY_IP4, FOUND_BY_IP6)));
}

TEST_F(DiscoveryOverANetwork, FindsAServiceByIp4WhenTheClientHasNoIp6) {
    networks.disableIp6(networks.client());
    serve(Family::Ip4, TwoNetworks::SERVICE_IP4);
    EXPECT_THAT(search(), ElementsAre(FOUND_BY_IP4));
    EXPECT_LT(searched, TIMEOUT);
    // Its socket opens all the same; only the sending fails. Nothing is said of the group it could not join.
    EXPECT_THAT(failures(), ElementsAre(StartsWith("Discovery send operation failed. ")));
}

TEST_F(DiscoveryOverANetwork, EndsWithNothingWhenTheClientHasNoIp6AndNobodyAnswers) {
    networks.disableIp6(networks.client());
    EXPECT_THAT(search(), ElementsAre("{}"));
    EXPECT_GE(searched, TIMEOUT);
}

TEST_F(DiscoveryOverANetwork, EndsWithOneEmptyResultWhenThereIsNoService) {
    EXPECT_THAT(search(), ElementsAre("{}"));
    EXPECT_GE(searched, TIMEOUT);
    EXPECT_LT(searched, 3 * TIMEOUT);
    EXPECT_THAT(failures(), IsEmpty());
}

TEST_F(DiscoveryOverANetwork, GivesOneResultWhenThereAreTwoServices) {
    serve(Family::Ip4, "first");
    serve(Family::Ip4, "second");
    EXPECT_THAT(search(),
                ElementsAre(AnyOf(R"({"host":"first","port":7})", R"({"host":"second","port":7})")));
    EXPECT_LT(searched, TIMEOUT);
}

TEST_F(DiscoveryOverANetwork, SkipsTheRequestsOfOthers) {
    serve(Family::Ip4, TwoNetworks::SERVICE_IP4, R"({"#req":true})");
    EXPECT_THAT(search(), ElementsAre(FOUND_BY_IP4));
}

TEST_F(DiscoveryOverANetwork, TakesAForeignObjectForAnAnswer) {
    serve(Family::Ip4, TwoNetworks::SERVICE_IP4, R"({"printer":"on the second floor"})");
    EXPECT_THAT(search(), ElementsAre(R"({"printer":"on the second floor"})"));
}

TEST_F(DiscoveryOverANetwork, GarbageEndsOneFamilyAndTheOtherStillAnswers) {
    serve(Family::Ip6, TwoNetworks::SERVICE_IP6, std::string("\x16\x03\x01\x00", 4));
    serve(Family::Ip4, TwoNetworks::SERVICE_IP4);
    EXPECT_THAT(search(), ElementsAre(FOUND_BY_IP4));
}

/// Datagrams that are dropped, by the client and by the service that hears itself: no receive follows in
/// either.
class DiscoveryDropping : public DiscoveryOverANetwork,
                          public WithParamInterface<std::pair<char const*, std::string>> {};

TEST_P(DiscoveryDropping, EndsTheSearchWhenTheTimeIsUp) {
    networks.disableIp6(networks.client());
    serve(Family::Ip4, TwoNetworks::SERVICE_IP4, GetParam().second);
    EXPECT_THAT(search(), ElementsAre("{}"));
    EXPECT_GE(searched, TIMEOUT);
    EXPECT_THAT(failures(),
                Contains(StartsWith("Discovery receive operation failed to deserialize")).Times(2));
}

INSTANTIATE_TEST_SUITE_P(Datagrams, DiscoveryDropping,
                         Values(std::pair("Garbage", std::string("\x16\x03\x01\x00", 4)),
                                std::pair("Blank", std::string(" ")),
                                std::pair("Oversized", R"({"host":")" + std::string(1200, 'h') + "\"}")),
                         [](auto const& instance) { return instance.param.first; });

} // namespace

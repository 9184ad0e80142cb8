#include "programs/vlmail/workbench/door.h"

#include "tests/vlmail/workbench/raw_client.h"

#include <utility>

#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/io_context.hpp>

#include <gmock/gmock.h>
#include <list>
#include <memory>
#include <thread>
#include <vector>

namespace {

using namespace VlMail::Workbench;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

/// A door that answers each request by its body.
class WorkbenchDoor : public testing::Test {
protected:
    ~WorkbenchDoor() override {
        io_.stop();
        if (thread_.joinable())
            thread_.join();
    }

    void open(PeerTimes times = {}) {
        door_ = std::make_unique<Door>(io_, times);
        door_->open([](Request request, Door::Respond const& respond) {
            if (request.target != "/drop")
                respond({200, "text/plain", request.target + request.body});
        });
        port_ = door_->port();
        thread_ = std::thread([this] { io_.run(); });
    }

    std::uint16_t port() const { return port_; }

private:
    boost::asio::io_context io_{1};
    std::unique_ptr<Door> door_;
    std::uint16_t port_ = 0;
    std::thread thread_;
};

std::string get(std::string const& target) { return "GET " + target + " HTTP/1.1\r\nHost: h\r\n\r\n"; }

TEST_F(WorkbenchDoor, AnswersSeveralRequestsOnOneConnection) {
    open();
    RawClient client(port());
    EXPECT_THAT(client.ask(get("/a")), HasSubstr("\r\n\r\n/a"));
    EXPECT_THAT(client.ask(get("/b")), HasSubstr("\r\n\r\n/b"));
}

TEST_F(WorkbenchDoor, EndsTheConnectionWhenItIsAsked) {
    open();
    RawClient client(port());
    client.send("GET /a HTTP/1.1\r\nHost: h\r\nConnection: close\r\n\r\n");
    EXPECT_THAT(client.answer(), HasSubstr("\r\nConnection: close\r\n"));
    client.send(get("/b"));
    EXPECT_THAT(client.rest(), IsEmpty());
}

TEST_F(WorkbenchDoor, SaysWhyABodyIsTooLargeAndEndsTheConnection) {
    open();
    RawClient client(port());
    client.send("POST /a HTTP/1.1\r\nHost: h\r\nContent-Length: 99999999\r\n\r\n");
    EXPECT_THAT(client.rest(), StartsWith("HTTP/1.1 413 "));
}

TEST_F(WorkbenchDoor, ClosesConnectionsThatAreSilentOrSlow) {
    open({std::chrono::milliseconds(50), std::chrono::milliseconds(50)});
    RawClient silent(port());
    RawClient slow(port());
    slow.send("GET / HT");
    EXPECT_THAT(silent.rest(), IsEmpty());
    EXPECT_THAT(slow.rest(), IsEmpty());
}

TEST_F(WorkbenchDoor, ClosesAConnectionWhoseRequestNobodyAnswers) {
    open();
    RawClient client(port());
    EXPECT_THAT(client.ask(get("/drop")), IsEmpty());
}

TEST_F(WorkbenchDoor, AnswersThoughOthersHoldAllTheConnectionsThereAre) {
    open();
    std::list<RawClient> silent;
    for (std::size_t i = 0; i < Door::MAX_PEERS; ++i)
        silent.emplace_back(port());
    RawClient client(port());
    EXPECT_THAT(client.ask(get("/a")), HasSubstr("\r\n\r\n/a"));
    // The first of them has gone for that.
    EXPECT_THAT(silent.front().rest(), IsEmpty());
    EXPECT_THAT(silent.back().ask(get("/b")), HasSubstr("\r\n\r\n/b"));
}

} // namespace

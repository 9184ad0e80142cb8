#include "programs/vlserviced/metrics/metrics_door.h"

#include "tests/support/failure_of.h"
#include "tests/support/log_lines.h"
#include "tests/support/temporary_folder.h"

#include <boost/asio/connect.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <boost/asio/read.hpp>
#include <boost/asio/write.hpp>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <list>
#include <stdexcept>

namespace {

namespace asio = boost::asio;
namespace fs = std::filesystem;
using asio::ip::tcp;
using testing::EndsWith;
using testing::StartsWith;
using VlServiced::MetricsDoor;
using VLServiceTest::LogLines;
using Local = asio::local::stream_protocol;

class MetricsDoorTest : public testing::Test {
protected:
    static std::string hello() { return "hello\n"; }

    tcp::socket connected(MetricsDoor const& door) {
        std::string const place = door.place();
        tcp::socket socket(io_);
        auto const colon = place.rfind(':');
        std::string host = place.substr(0, colon);
        if (host.starts_with('['))
            host = host.substr(1, host.size() - 2);
        socket.connect(
            {asio::ip::make_address(host), static_cast<std::uint16_t>(std::stoi(place.substr(colon + 1)))});
        return socket;
    }
    template<typename Socket>
    static std::string asked(Socket& socket, std::string const& request = "GET /metrics HTTP/1.1\r\n\r\n") {
        asio::write(socket, asio::buffer(request));
        std::string answer;
        boost::system::error_code end;
        asio::read(socket, asio::dynamic_buffer(answer), end);
        return answer;
    }
    std::string askedAt(MetricsDoor const& door) {
        tcp::socket socket = connected(door);
        return asked(socket);
    }
    std::string askedAt(fs::path const& file) {
        Local::socket socket(io_);
        socket.connect(Local::endpoint(file.string()));
        return asked(socket);
    }

    TemporaryFolder folder_;
    fs::path file_ = folder_ / "metrics";
    asio::io_context io_;
};

TEST_F(MetricsDoorTest, AnswersOnAPortOfEitherVersion) {
    for (char const* const address : {"127.0.0.1:", "[::1]:"}) {
        MetricsDoor door(std::string(address) + '0');
        EXPECT_THAT(door.place(), StartsWith(address));
        door.open(&hello);
        EXPECT_THAT(askedAt(door), EndsWith("\r\n\r\nhello\n"));
        EXPECT_THAT(askedAt(door), StartsWith("HTTP/1.1 200 OK\r\n"));
    }
}

TEST_F(MetricsDoorTest, AnswersOnASocketForUserAndGroupAndRemovesIt) {
    {
        MetricsDoor door("unix:" + file_.string());
        EXPECT_EQ(door.place(), "unix:" + file_.string());
        EXPECT_EQ(fs::status(file_).permissions(), fs::perms(0660));
        door.open(&hello);
        EXPECT_THAT(askedAt(file_), EndsWith("\r\n\r\nhello\n"));
    }
    EXPECT_FALSE(fs::exists(file_));
}

TEST_F(MetricsDoorTest, ListensOnNoOtherAddressThanALoopbackOne) {
    std::string const long_path = "unix:/" + std::string(107, 'a');
    for (std::string const& place :
         {std::string("0.0.0.0:9117"), std::string("192.0.2.1:9117"), std::string("[::]:9117"),
          std::string("localhost:9117"), std::string("127.0.0.1"), std::string("127.0.0.1:"),
          std::string("127.0.0.1:65536"), std::string("127.0.0.1:9117x"), std::string("9117"), std::string(),
          std::string("unix:"), std::string("unix:metrics"), long_path})
        EXPECT_EQ(failureOf([&] { MetricsDoor const door(place); }),
                  "--metrics takes a loopback address with a port, such as 127.0.0.1:9117, or unix:PATH, and "
                  "got \"" +
                      place + '"');
}

TEST_F(MetricsDoorTest, SaysThatAPortIsTaken) {
    MetricsDoor const first("127.0.0.1:0");
    EXPECT_EQ(failureOf([&] { MetricsDoor const second(first.place()); }),
              "Cannot listen for metrics on " + first.place() +
                  ": Address already in use; end what listens there, or listen elsewhere.");
}

TEST_F(MetricsDoorTest, LeavesTheSocketAloneOfWhoeverListens) {
    MetricsDoor first("unix:" + file_.string());
    first.open(&hello);
    EXPECT_EQ(failureOf([&] { MetricsDoor const second(first.place()); }),
              "Cannot listen for metrics on unix:" + file_.string() +
                  ": Address already in use; end what listens there, or listen elsewhere.");
    EXPECT_THAT(askedAt(file_), EndsWith("hello\n"));
}

TEST_F(MetricsDoorTest, TakesThePlaceOfASocketThatAProcessHasLeft) {
    { Local::acceptor const left(io_, Local::endpoint(file_.string())); }
    ASSERT_TRUE(fs::is_socket(file_));
    MetricsDoor door("unix:" + file_.string());
    door.open(&hello);
    EXPECT_THAT(askedAt(file_), EndsWith("hello\n"));
}

TEST_F(MetricsDoorTest, TakesThePlaceOfNoOtherFile) {
    std::ofstream(file_) << "precious";
    EXPECT_EQ(failureOf([&] { MetricsDoor const door("unix:" + file_.string()); }),
              "Cannot listen for metrics on unix:" + file_.string() +
                  ": Address already in use; end what listens there, or listen elsewhere.");
    EXPECT_EQ(fs::file_size(file_), 8U);
}

TEST_F(MetricsDoorTest, AnswersWhileOthersSayNothing) {
    MetricsDoor door("127.0.0.1:0");
    door.open(&hello);
    std::list<tcp::socket> silent;
    for (int i = 0; i < 40; ++i)
        silent.push_back(connected(door));
    EXPECT_THAT(askedAt(door), EndsWith("hello\n"));
    // The first had to go for those behind it.
    char byte;
    boost::system::error_code end;
    silent.front().read_some(asio::buffer(&byte, 1), end);
    EXPECT_TRUE(end);
}

TEST_F(MetricsDoorTest, AnswersARequestThatComesByteByByte) {
    MetricsDoor door("127.0.0.1:0");
    door.open(&hello);
    tcp::socket socket = connected(door);
    socket.set_option(tcp::no_delay(true));
    for (char const c : std::string("GET /metrics HTTP/1.1\r\n\r"))
        asio::write(socket, asio::buffer(&c, 1));
    EXPECT_THAT(asked(socket, "\n"), EndsWith("hello\n"));
}

TEST_F(MetricsDoorTest, TellsAPeerThatSaysWhatIsNoRequest) {
    MetricsDoor door("127.0.0.1:0");
    door.open(&hello);
    tcp::socket socket = connected(door);
    EXPECT_THAT(asked(socket, std::string("\0\1\2\3\r\n\r\n", 8)),
                StartsWith("HTTP/1.1 400 Bad Request\r\n"));
}

TEST_F(MetricsDoorTest, GoesOnBehindAPageThatCannotBeMade) {
    LogLines log;
    MetricsDoor door("127.0.0.1:0");
    bool isFirst = true;
    door.open(
        [&isFirst] { return std::exchange(isFirst, false) ? throw std::runtime_error("no") : hello(); });
    EXPECT_EQ(askedAt(door), "");
    EXPECT_THAT(askedAt(door), EndsWith("hello\n"));
    EXPECT_THAT(log.texts(), testing::ElementsAre("4 Metrics cannot be told. no"));
}

} // namespace

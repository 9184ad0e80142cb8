#include "programs/vlserviced/metrics/http_answer.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::StartsWith;
using VlServiced::metricsAnswer;

constexpr char const* GET = "GET /metrics HTTP/1.1\r\nHost: 127.0.0.1\r\n\r\n";

std::string shortPage() { return "# EOF\n"; }
std::string noPage() {
    ADD_FAILURE() << "the page was made";
    return {};
}

TEST(MetricsAnswer, ToGetOfMetricsIsThePage) {
    EXPECT_EQ(metricsAnswer(GET, &shortPage),
              "HTTP/1.1 200 OK\r\n"
              "Content-Type: application/openmetrics-text; version=1.0.0; charset=utf-8\r\n"
              "Connection: close\r\n"
              "Cache-Control: no-store\r\n"
              "Content-Length: 6\r\n\r\n"
              "# EOF\n");
}

TEST(MetricsAnswer, WaitsForTheRestOfARequestThatIsCutAnywhere) {
    std::string const request = GET;
    for (std::size_t size = 0; size < request.size(); ++size)
        EXPECT_EQ(metricsAnswer(request.substr(0, size), &noPage), std::nullopt) << size;
}

TEST(MetricsAnswer, ToAllElseIsItsStatusAndALine) {
    struct Row {
        std::string request;
        char const* status;
        char const* line;
    };
    std::vector<Row> const rows{
        {"GET / HTTP/1.1\r\n\r\n", "404 Not Found", "There is nothing here but /metrics."},
        {"GET /metrics/ HTTP/1.1\r\n\r\n", "404 Not Found", "There is nothing here but /metrics."},
        {"GET /metrics?x=1 HTTP/1.1\r\n\r\n", "404 Not Found", "There is nothing here but /metrics."},
        {"POST /metrics HTTP/1.1\r\nContent-Length: 2\r\n\r\nab", "405 Method Not Allowed",
         "Ask for /metrics by GET."},
        {"HEAD /metrics HTTP/1.1\r\n\r\n", "405 Method Not Allowed", "Ask for /metrics by GET."},
        {"hello\r\n\r\n", "400 Bad Request", "This is no request of HTTP."},
        {std::string("\x16\x03\x01\0\1", 5), "400 Bad Request", "This is no request of HTTP."},
        {"GET /metrics HTTP/1.1\r\nX: " + std::string(9000, 'a'), "431 Request Header Fields Too Large",
         "The request is too long."},
        {"GET /" + std::string(9000, 'a'), "431 Request Header Fields Too Large", "The request is too long."},
    };
    for (Row const& row : rows) {
        std::string const answer = metricsAnswer(row.request, &noPage).value_or("none");
        EXPECT_THAT(answer, StartsWith(std::string("HTTP/1.1 ") + row.status + "\r\n")) << row.request;
        EXPECT_THAT(answer, EndsWith(std::string("\r\n\r\n") + row.line + '\n')) << row.request;
        EXPECT_THAT(answer, HasSubstr("Connection: close\r\n")) << row.request;
    }
}

} // namespace

#include "programs/vlserviced/metrics/http_answer.h"

#include "programs/vlserviced/metrics/open_metrics.h"

#include <utility>

#include <boost/asio/buffer.hpp>
#include <boost/beast/http/empty_body.hpp>
#include <boost/beast/http/message.hpp>
#include <boost/beast/http/parser.hpp>
#include <boost/beast/http/string_body.hpp>
#include <boost/beast/http/write.hpp>

#include <sstream>

namespace VlServiced {
namespace {

namespace http = boost::beast::http;
using Request = http::request_parser<http::empty_body>;
using Answer = http::response<http::string_body>;

std::string textOf(Answer& answer) {
    answer.keep_alive(false);
    answer.set(http::field::cache_control, "no-store");
    answer.prepare_payload();
    std::ostringstream text;
    text << answer;
    return std::move(text).str();
}

std::string refused(http::status status, std::string const& line) {
    Answer answer(status, 11);
    answer.set(http::field::content_type, "text/plain; charset=utf-8");
    if (status == http::status::method_not_allowed)
        answer.set(http::field::allow, "GET");
    answer.body() = line + '\n';
    return textOf(answer);
}

std::string answerTo(Request::value_type const& request, std::function<std::string()> const& page) {
    if (request.target() != "/metrics")
        return refused(http::status::not_found, "There is nothing here but /metrics.");
    if (request.method() != http::verb::get)
        return refused(http::status::method_not_allowed, "Ask for /metrics by GET.");
    Answer answer(http::status::ok, 11);
    answer.set(http::field::content_type, OPEN_METRICS_TYPE);
    answer.body() = page();
    return textOf(answer);
}

} // namespace

std::optional<std::string> metricsAnswer(std::string_view received,
                                         std::function<std::string()> const& page) {
    Request request;
    request.header_limit(MAX_METRICS_REQUEST);
    boost::system::error_code failure;
    request.put(boost::asio::buffer(received.data(), received.size()), failure);
    if (request.is_header_done())
        return answerTo(request.get(), page);
    if (received.size() >= MAX_METRICS_REQUEST || failure == http::error::header_limit)
        return refused(http::status::request_header_fields_too_large, "The request is too long.");
    if (failure && failure != http::error::need_more)
        return refused(http::status::bad_request, "This is no request of HTTP.");
    return std::nullopt;
}

} // namespace VlServiced

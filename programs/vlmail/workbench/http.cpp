// Requests and answers as bytes. The one source that stands on the HTTP library.
#include "programs/vlmail/workbench/answer.h"
#include "programs/vlmail/workbench/request.h"

#include "programs/base/error.h"
#include "programs/base/utf8.h"
#include "vlservice/json/json_text.h"

#include <utility>

#include <boost/asio/buffer.hpp>
#include <boost/beast/http/message.hpp>
#include <boost/beast/http/parser.hpp>
#include <boost/beast/http/string_body.hpp>
#include <boost/beast/http/write.hpp>

#include <sstream>

namespace VlMail::Workbench {
namespace {

namespace http = boost::beast::http;
using boost::system::error_code;
using Code = Base::Code;

/// Scripts and styles come from here alone; pictures are asked for with the token and shown out of memory.
constexpr char const* POLICY =
    "default-src 'none'; script-src 'self'; style-src 'self'; img-src 'self' blob:; connect-src 'self'; "
    "base-uri 'none'; form-action 'none'; frame-ancestors 'none'";

std::string textOf(boost::beast::string_view view) { return std::string(view); }

Request::Method methodOf(http::verb verb) {
    return verb == http::verb::get    ? Request::Method::Get
           : verb == http::verb::post ? Request::Method::Post
                                      : Request::Method::Other;
}

Request requestIn(http::request<http::string_body>& message) {
    Request request{methodOf(message.method()), textOf(message.target())};
    request.host = textOf(message[http::field::host]);
    request.origin = textOf(message[http::field::origin]);
    request.token = textOf(message[TOKEN_HEADER]);
    request.body = std::move(message.body());
    request.keepsAlive = message.keep_alive();
    return request;
}

Answer refusalFor(error_code failure) {
    if (failure == http::error::body_limit)
        return failureOf(413, Code::TooLarge,
                         "the request has more than " + std::to_string(MAX_BODY_BYTES >> 20) +
                             " MiB; the settings are too large for the workbench");
    if (failure == http::error::header_limit)
        return failureOf(431, Code::TooLarge, "the header of the request is too long");
    return failureOf(400, Code::RequestInvalid, "this is no request of HTTP");
}

} // namespace

class RequestReader::Parser : public http::request_parser<http::string_body> {};

RequestReader::RequestReader() = default;
RequestReader::~RequestReader() = default;

std::optional<std::variant<Request, Answer>> RequestReader::take() {
    if (!hasBegun_) {
        parser_ = std::make_unique<Parser>();
        parser_->header_limit(MAX_HEADER_BYTES);
        parser_->body_limit(MAX_BODY_BYTES);
        parser_->eager(true);
    }
    if (received_.empty())
        return std::nullopt;
    hasBegun_ = true;
    error_code failure;
    received_.erase(0, parser_->put(boost::asio::buffer(received_), failure));
    if (failure == http::error::need_more)
        failure = {};
    if (failure)
        return refusalFor(failure);
    if (!parser_->is_done())
        return std::nullopt;
    hasBegun_ = false;
    return requestIn(parser_->get());
}

std::string wireTextOf(Answer const& answer, bool keepsAlive) {
    http::response<http::string_body> message(static_cast<http::status>(answer.status), 11);
    message.set(http::field::content_type, answer.type);
    message.set(http::field::cache_control, "no-store");
    message.set("Content-Security-Policy", POLICY);
    message.set("X-Content-Type-Options", "nosniff");
    message.set("X-Frame-Options", "DENY");
    message.set("Referrer-Policy", "no-referrer");
    message.set("Cross-Origin-Resource-Policy", "same-origin");
    message.set("Cross-Origin-Opener-Policy", "same-origin");
    message.body() = answer.body;
    message.keep_alive(keepsAlive);
    message.prepare_payload();
    std::ostringstream text;
    text << message;
    return std::move(text).str();
}

} // namespace VlMail::Workbench

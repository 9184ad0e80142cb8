#pragma once
// What the page asks for, as HTTP brings it.

#include "programs/vlmail/workbench/answer.h"

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <variant>

namespace VlMail::Workbench {

/// Of one request: the settings of a node and a little beside them.
constexpr std::size_t MAX_BODY_BYTES = std::size_t{4} << 20;
constexpr std::size_t MAX_HEADER_BYTES = std::size_t{16} << 10;

/// The header that bears the token of the URL.
constexpr char const* TOKEN_HEADER = "X-Workbench-Token";

struct Request {
    enum class Method { Get, Post, Other };

    Method method = Method::Get;
    /// As it was asked for, with what stands behind "?".
    std::string target;
    std::string host = {};
    /// Empty where the browser names none.
    std::string origin = {};
    std::string token = {};
    std::string body = {};
    /// Whether the connection may bear another request.
    bool keepsAlive = true;
};

/// Takes requests out of what a peer sends, one behind the other.
class RequestReader {
public:
    RequestReader();
    ~RequestReader();

    void put(std::string_view bytes) { received_ += bytes; }
    /// The next request as soon as it is whole, or the answer that ends the connection: it is too large, or
    /// none.
    std::optional<std::variant<Request, Answer>> take();
    /// Nothing of another request has come yet.
    bool isBetweenRequests() const { return !hasBegun_ && received_.empty(); }

private:
    class Parser;

    std::unique_ptr<Parser> parser_;
    /// What the parser has not taken.
    std::string received_;
    bool hasBegun_ = false;
};

} // namespace VlMail::Workbench

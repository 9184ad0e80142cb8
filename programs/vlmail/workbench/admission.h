#pragma once
// Who may ask: the page that was opened with the token, and no other page of the same browser.

#include "programs/vlmail/workbench/answer.h"
#include "programs/vlmail/workbench/request.h"

#include <cstdint>
#include <optional>
#include <string>

namespace VlMail::Workbench {

struct Admission {
    std::string token;
    std::uint16_t port = 0;

    /// "127.0.0.1:PORT".
    std::string host() const;
    /// What a person opens: the token stands where browsers keep it to themselves.
    std::string url() const;
    /// The answer to a request that is refused; nothing for one that may go on.
    std::optional<Answer> refusalOf(Request const& request) const;
};

/// Where requests with the token go; all others are files of the page.
constexpr char const* API = "/api/";

} // namespace VlMail::Workbench

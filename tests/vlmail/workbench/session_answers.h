#pragma once
// What a session of the workbench answers, waited for.

#include "programs/vlmail/workbench/session.h"
#include "vlservice/json/json_text.h"

#include <boost/asio/io_context.hpp>

#include <optional>
#include <string>
#include <utility>

inline VlMail::Workbench::Answer answerOf(boost::asio::io_context& io, VlMail::Workbench::Session& session,
                                          std::string const& what, json::Object const& query) {
    std::optional<VlMail::Workbench::Answer> got;
    session.answer(what, json::toText(query), [&](VlMail::Workbench::Answer one) { got = std::move(one); });
    while (!got)
        io.run_one();
    return *got;
}

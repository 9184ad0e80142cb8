#include "programs/vlmail/mailings/sent_before.h"

#include "programs/base/error.h"
#include "programs/vlmail/service/service_client.h"
#include "vlservice/platform/local_time.h"

#include <algorithm>
#include <cstddef>
#include <string_view>

namespace VlMail {
namespace {

constexpr std::size_t DATE_CHARACTERS = std::string_view("2026-11-20").size();

/// An older service does not know the question, and one that is older still gives its refusal no code.
bool hasNoRegister(Base::Error const& failure) {
    return failure.code() == Base::Code::ServiceOutdated || failure.code() == Base::Code::ServiceRefused;
}

} // namespace

std::string sentBeforeInWords(Protocol::RegisteredLetter const& letter) {
    std::string date = LocalTime::toText(letter.at).substr(0, DATE_CHARACTERS);
    std::ranges::replace(date, '/', '-');
    if (letter.pack.empty())
        return "sent-before: " + date + " at another node";
    return "sent-before: " + date + " in " + letter.pack + (letter.state.empty() ? "" : ", ") + letter.state;
}

RegisterAsker registerOf(ServiceLine& service) {
    return [&service](Protocol::RegisterQuery const& query) {
        return service.repeat(
            [&](Channel::Client& client) { return Protocol::RegisterAnswer(VlMail::ask(client, query)); });
    };
}

std::map<std::string, std::string> SentBefore::of(std::vector<std::string> const& digests) {
    constexpr std::size_t AT_ONCE = Protocol::RegisterQuery::MAX_DIGESTS;
    std::map<std::string, std::string> known;
    for (std::size_t from = 0; from < digests.size(); from += AT_ONCE) {
        auto const begin = digests.begin() + static_cast<std::ptrdiff_t>(from);
        auto const end =
            digests.begin() + static_cast<std::ptrdiff_t>(std::min(from + AT_ONCE, digests.size()));
        for (Protocol::RegisteredLetter const& letter : ask({begin, end}))
            known.emplace(letter.digest, sentBeforeInWords(letter));
    }
    return known;
}

std::vector<Protocol::RegisteredLetter> SentBefore::ask(std::vector<std::string> const& digests) {
    Protocol::RegisterQuery query;
    query.id = nodeId_;
    query.digests = digests;
    query.besides = besides_;
    try {
        return asker_(query).letters;
    } catch (Base::Error const& failure) {
        if (hasNoRegister(failure))
            return {};
        throw;
    }
}

} // namespace VlMail

#pragma once
// What letters would cost.

#include "programs/channel/client.h"
#include "programs/mailing/metadata.h"
#include "programs/protocol/price.h"

#include <functional>
#include <map>
#include <optional>
#include <string>
#include <tuple>
#include <vector>

namespace VlMail {

/// What letters of a mailing have in common that cost the same: channel, printed pages, sheets and coloured
/// pages.
using Alike = std::tuple<std::string, long long, long long, long long>;

/// Without blank sides.
long long printedPages(Mailing::MailedLetter const& letter);

/// The letters of a mailing, those of the same channel and of as many pages, sheets and coloured pages
/// together.
std::vector<Protocol::LetterBatch> pricedLettersOf(Mailing::Metadata const& mailing);

/// The service's estimate as it answers it; an older service that knows of no channels is asked without them.
/// Throws std::exception with a line for people.
json::Object estimatePrice(Channel::Client& service, std::vector<Protocol::LetterBatch> const& letters);
/// The same of a service that answers so.
using AskPrice = std::function<json::Object(json::Object const& request)>;
json::Object estimatePrice(AskPrice const& ask, std::vector<Protocol::LetterBatch> letters);

/// What a mailing costs, and each of its letters.
class MailingPrice {
public:
    /// Asks the service. Throws std::exception with a line for people.
    MailingPrice(Channel::Client& service, Mailing::Metadata const& mailing);

    /// As the service has answered it.
    json::Object const& answer() const { return answer_; }
    /// Of a letter of the mailing that goes by that channel, its first or one that it may fall back to, in
    /// hundredths; nothing where the service did not tell it.
    std::optional<long long> of(Mailing::MailedLetter const& letter, std::string const& channel) const;

private:
    void add(std::map<Alike, long long> const& letters, json::Object const& answer);

    json::Object answer_;
    /// Of one letter each, by what those have in common that cost the same.
    std::map<Alike, long long> each_;
};

/// Hundredths as a person writes them: -0.05.
std::string money(long long hundredths);

} // namespace VlMail

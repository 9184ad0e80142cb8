#include "programs/vlmail/mailings/price.h"

#include "programs/mailing/fallback.h"
#include "programs/mailing/print_wishes.h"
#include "programs/protocol/failure.h"
#include "programs/vlmail/service/service_client.h"
#include "vlservice/ipc/price_est.h"

#include <cstdio>
#include <utility>

namespace VlMail {
namespace {

Alike alikeOf(Mailing::MailedLetter const& letter, std::string const& channel) {
    return {channel, printedPages(letter), letter.sheets, letter.colouredPages};
}

constexpr char const* KNOWS_NO_CHANNELS = "the letters have no key \"channel\"";

/// An older service knows letters in colour throughout and no others.
void setColour(Protocol::LetterBatch& batch, long long colouredPages, Mailing::Metadata const& mailing) {
    batch.colour = mailing.madeReady ? colouredPages == batch.pages
                                     : mailing.packPreset.colorModel() == Mailing::COLOURED;
    if (!batch.colour)
        batch.colouredPages = colouredPages;
}

/// How many letters of each kind there are, in the order of their batches.
std::map<Alike, long long> lettersByKind(Mailing::Metadata const& mailing) {
    std::map<Alike, long long> letters;
    for (Mailing::MailedLetter const& letter : mailing.letters)
        ++letters[alikeOf(letter, Mailing::channelOf(letter))];
    return letters;
}

/// The same by the channels that they may fall back to.
std::map<Alike, long long> fallenBackByKind(Mailing::Metadata const& mailing) {
    std::map<Alike, long long> letters;
    for (Mailing::MailedLetter const& letter : mailing.letters)
        for (Mailing::OtherWay const& way : Mailing::otherWaysOf(letter, mailing.packPreset))
            ++letters[alikeOf(letter, way.channel)];
    return letters;
}

Protocol::LetterBatch batchOf(Alike const& alike, long long count, Mailing::Metadata const& mailing) {
    auto const& [channel, pages, sheets, colouredPages] = alike;
    Protocol::LetterBatch batch;
    batch.count = count;
    batch.channel = channel;
    batch.duplex = mailing.packPreset.duplex();
    batch.priority = mailing.packPreset.priorityDelivery();
    batch.pages = pages;
    if (sheets != batch.sheets())
        batch.paperSheets = sheets;
    setColour(batch, colouredPages, mailing);
    return batch;
}

std::vector<Protocol::LetterBatch> batchesOf(std::map<Alike, long long> const& letters,
                                             Mailing::Metadata const& mailing) {
    std::vector<Protocol::LetterBatch> batches;
    for (auto const& [alike, count] : letters)
        batches.push_back(batchOf(alike, count, mailing));
    return batches;
}

} // namespace

long long printedPages(Mailing::MailedLetter const& letter) {
    long long pages = 0;
    for (Mailing::DocumentPages const& document : letter.documents)
        if (document.role != Mailing::DocumentPages::Role::Blank)
            pages += static_cast<long long>(document.pages.size());
    return pages;
}

std::vector<Protocol::LetterBatch> pricedLettersOf(Mailing::Metadata const& mailing) {
    return batchesOf(lettersByKind(mailing), mailing);
}

json::Object estimatePrice(Channel::Client& service, std::vector<Protocol::LetterBatch> const& letters) {
    return estimatePrice(
        [&](json::Object const& request) { return service.call<Ipc::PriceEst>(request)->resp(); }, letters);
}

json::Object estimatePrice(AskPrice const& ask, std::vector<Protocol::LetterBatch> letters) {
    json::Object answer = ask(Protocol::PriceRequest(letters).serialize());
    if (Protocol::failureIn(answer) == KNOWS_NO_CHANNELS) {
        for (Protocol::LetterBatch& batch : letters)
            batch.channel.clear();
        answer = ask(Protocol::PriceRequest(letters).serialize());
    }
    return requireAnswer(answer);
}

MailingPrice::MailingPrice(Channel::Client& service, Mailing::Metadata const& mailing)
    : answer_(estimatePrice(service, pricedLettersOf(mailing))) {
    add(lettersByKind(mailing), answer_);
    auto const fallenBack = fallenBackByKind(mailing);
    if (!fallenBack.empty())
        add(fallenBack, estimatePrice(service, batchesOf(fallenBack, mailing)));
}

void MailingPrice::add(std::map<Alike, long long> const& letters, json::Object const& answer) {
    Protocol::Estimate const estimate(answer);
    std::size_t batch = 0;
    for (auto const& [alike, count] : letters)
        if (batch < estimate.letters.size())
            each_[alike] = estimate.letters[batch++].price / count;
}

std::optional<long long> MailingPrice::of(Mailing::MailedLetter const& letter,
                                          std::string const& channel) const {
    auto const found = each_.find(alikeOf(letter, channel));
    return found == each_.end() ? std::nullopt : std::optional(found->second);
}

std::string money(long long hundredths) {
    // The lowest number has no positive counterpart of its type.
    unsigned long long const amount = hundredths < 0 ? 0ULL - static_cast<unsigned long long>(hundredths)
                                                     : static_cast<unsigned long long>(hundredths);
    char text[32];
    std::snprintf(text, sizeof text, "%s%llu.%02llu", hundredths < 0 ? "-" : "", amount / 100, amount % 100);
    return text;
}

} // namespace VlMail

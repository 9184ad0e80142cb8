#include "programs/vlmail/mailings/price.h"

#include "programs/mailing/print_wishes.h"
#include "programs/vlmail/service/service_client.h"
#include "vlservice/ipc/price_est.h"

#include <cstdio>
#include <map>
#include <tuple>

namespace VlMail {
namespace {

/// Printed pages, sheets and coloured pages of a letter.
using Counts = std::tuple<long long, long long, long long>;

long long printedPages(Mailing::MailedLetter const& letter) {
    long long pages = 0;
    for (Mailing::DocumentPages const& document : letter.documents)
        if (document.role != Mailing::DocumentPages::Role::Blank)
            pages += static_cast<long long>(document.pages.size());
    return pages;
}

/// An older service knows letters in colour throughout and no others.
void setColour(Protocol::LetterBatch& batch, long long colouredPages, Mailing::Metadata const& mailing) {
    batch.colour = mailing.madeReady ? colouredPages == batch.pages
                                     : mailing.packPreset.colorModel() == Mailing::COLOURED;
    if (!batch.colour)
        batch.colouredPages = colouredPages;
}

} // namespace

std::vector<Protocol::LetterBatch> pricedLettersOf(Mailing::Metadata const& mailing) {
    std::map<Counts, long long> lettersByCounts;
    for (Mailing::MailedLetter const& letter : mailing.letters)
        ++lettersByCounts[{printedPages(letter), letter.sheets, letter.colouredPages}];
    std::vector<Protocol::LetterBatch> batches;
    for (auto const& [counts, letters] : lettersByCounts) {
        Protocol::LetterBatch& batch = batches.emplace_back();
        batch.count = letters;
        batch.duplex = mailing.packPreset.duplex();
        batch.priority = mailing.packPreset.priorityDelivery();
        batch.pages = std::get<0>(counts);
        if (std::get<1>(counts) != batch.sheets())
            batch.paperSheets = std::get<1>(counts);
        setColour(batch, std::get<2>(counts), mailing);
    }
    return batches;
}

json::Object estimatePrice(Channel::Client& service, std::vector<Protocol::LetterBatch> const& letters) {
    json::Object const request = Protocol::PriceRequest(letters).serialize();
    return requireAnswer(service.call<Ipc::PriceEst>(request)->resp());
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

#include "programs/vlmail/mailings/price.h"

#include "programs/vlmail/service/service_client.h"
#include "vlservice/ipc/price_est.h"

#include <cstdio>
#include <map>

namespace VlMail {
namespace {

/// As pack presets say it: 1 is grey, and 0 leaves it to the pages, which the tariff cannot see.
constexpr PackColorModel COLOUR{2};

} // namespace

std::vector<Protocol::LetterBatch> pricedLettersOf(Mailing::Metadata const& mailing) {
    std::map<long long, long long> lettersByPages;
    for (Mailing::MailedLetter const& letter : mailing.letters) {
        long long pages = 0;
        for (Mailing::DocumentPages const& document : letter.documents)
            pages += static_cast<long long>(document.pages.size());
        ++lettersByPages[pages];
    }
    std::vector<Protocol::LetterBatch> batches;
    for (auto const& [pages, letters] : lettersByPages) {
        Protocol::LetterBatch& batch = batches.emplace_back();
        batch.count = letters;
        batch.pages = pages;
        batch.colour = mailing.packPreset.colorModel() == COLOUR;
        batch.duplex = mailing.packPreset.duplex();
        batch.priority = mailing.packPreset.priorityDelivery();
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

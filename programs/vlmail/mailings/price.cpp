#include "programs/vlmail/mailings/price.h"

#include "programs/vlmail/service/service_client.h"
#include "vlservice/ipc/price_est.h"

#include <cstdio>
#include <map>

namespace VlMail {
namespace {

json::Object requestFor(std::vector<PricedLetters> const& batches, bool colour) {
    json::Array letters;
    for (PricedLetters const& batch : batches)
        letters.append(json::Object{{"count", batch.count},
                                    {"pages", batch.pages},
                                    {"colour", colour},
                                    {"duplex", batch.duplex},
                                    {"priority", batch.priority}});
    return {{"letters", letters}};
}

} // namespace

std::vector<PricedLetters> pricedLettersOf(Mailing::Metadata const& mailing) {
    std::map<long long, long long> lettersByPages;
    for (Mailing::MailedLetter const& letter : mailing.letters) {
        long long pages = 0;
        for (Mailing::DocumentPages const& document : letter.documents)
            pages += static_cast<long long>(document.pages.size());
        ++lettersByPages[pages];
    }
    std::vector<PricedLetters> batches;
    for (auto const& [pages, letters] : lettersByPages)
        batches.push_back(
            {letters, pages, mailing.packPreset.duplex(), mailing.packPreset.priorityDelivery()});
    return batches;
}

json::Object estimatePrice(Channel::Client& service, std::vector<PricedLetters> const& batches, bool colour) {
    return requireAnswer(service.call<Ipc::PriceEst>(requestFor(batches, colour))->resp());
}

std::string money(long long hundredths) {
    char text[32];
    std::snprintf(text, sizeof text, "%lld.%02lld", hundredths / 100, hundredths % 100);
    return text;
}

} // namespace VlMail

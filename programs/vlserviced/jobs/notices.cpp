#include "programs/vlserviced/jobs/notices.h"

#include "programs/base/plain_text.h"

#include <algorithm>
#include <utility>

namespace VlServiced {
namespace {

/// The default fields call it so.
constexpr char const* REFERENCE = "reference";

/// Of grouped letters a field may have collected several.
std::vector<std::string> textsIn(json::Value const& value) {
    std::vector<std::string> texts;
    if (value.isString())
        texts.push_back(value.toString());
    else if (value.isArray())
        for (json::Value const& one : value.toArray())
            if (one.isString())
                texts.push_back(one.toString());
    return texts;
}

std::string referenceIn(Mailing::MailedLetter const& letter) {
    for (auto const& [priority, field] : letter.fields)
        if (field.name() == REFERENCE && field.rawValue().isString())
            return field.rawValue().toString();
    return {};
}

std::string lettersInWords(long long count) {
    return std::to_string(count) + (count == 1 ? " letter" : " letters");
}

std::string nameOf(Job const& job) {
    return job.title.empty() ? job.pack.packId : '"' + job.title + "\" (" + job.pack.packId + ')';
}

/// "postal: 12 letters accepted", or where they went in the container.
std::string inWords(LetterShare const& share) {
    return (share.channel.empty() ? "without an address" : share.channel) + ": " +
           lettersInWords(share.count) + ' ' +
           (share.byCarrier ? Protocol::letterStateName(share.state)
                            : "handed on in the mailing's container");
}

std::string confirmationText(Job const& job, std::vector<LetterShare> const& shares) {
    std::string text = "The mailing " + nameOf(job) + " was handed over.\n\n";
    for (LetterShare const& share : shares)
        text += inWords(share) + '\n';
    if (shares.empty())
        text += std::to_string(job.pages) + (job.pages == 1 ? " page" : " pages") +
                " handed on in the mailing's container\n";
    return text + "\n\"vlmail status " + job.pack.packId + "\" tells of each letter.\n";
}

std::string notificationText(StoredLetter const& notice, std::optional<StoredLetter> const& letter) {
    std::string const way = letter && letter->byCarrier ? "by " + letter->channel : "in a container";
    std::string text = "Letter " + std::to_string(notice.notice.letter) + " of the mailing " +
                       notice.id.packId + " was handed over " + way + ".\n";
    if (!notice.notice.reference.empty())
        text += "\nReference: " + Base::oneLine(notice.notice.reference) + '\n';
    return text;
}

} // namespace

void addConfirmation(Mailing::Metadata const& mailing, std::vector<Notice>& notices) {
    std::string const& sender = mailing.packPreset.userEmailOverride();
    if (mailing.packPreset.confirmReceipt() && !sender.empty())
        notices.push_back({0, sender});
}

void addNotifications(Mailing::Metadata const& mailing, long long number, Mailing::MailedLetter const& letter,
                      std::vector<Notice>& notices) {
    std::vector<std::string> known;
    for (auto const& [priority, field] : letter.fields) {
        if (priority >= 0)
            continue;
        for (std::string& recipient : textsIn(field.rawValue())) {
            if (recipient.empty() || std::ranges::find(known, recipient) != known.end())
                continue;
            notices.push_back(
                {number, recipient, mailing.packPreset.userEmailOverride(), referenceIn(letter)});
            known.push_back(std::move(recipient));
        }
    }
}

Carriers::Notice written(StoredLetter const& notice, Job const& job, LetterStore const& letters) {
    Carriers::Notice mail;
    mail.key = notice.id.key();
    mail.to = notice.notice.recipient;
    mail.replyTo = notice.notice.replyTo;
    if (notice.notice.letter == 0) {
        mail.subject = "Handed over: " + nameOf(job);
        mail.text = confirmationText(job, letters.sharesOf(job.pack.packId));
    } else {
        std::string const& reference = notice.notice.reference;
        mail.subject =
            "A letter was handed over" + (reference.empty() ? "" : ": " + Base::oneLine(reference));
        mail.text = notificationText(notice, letters.find({notice.id.packId, notice.notice.letter}));
    }
    return mail;
}

} // namespace VlServiced

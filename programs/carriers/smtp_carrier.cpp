#include "programs/carriers/smtp_carrier.h"

#include "programs/base/email_address.h"
#include "programs/base/error.h"
#include "programs/base/hex.h"
#include "programs/base/private_file.h"
#include "programs/base/quoting.h"
#include "programs/base/secret_file.h"
#include "programs/carriers/placeholders.h"

#include <algorithm>
#include <charconv>
#include <utility>

namespace Carriers {
namespace {

constexpr std::size_t MAX_PASSWORD_BYTES = 1000;

std::string passwordIn(std::string const& file) {
    std::string password = Base::readPrivateFile(Base::secretFile(file), MAX_PASSWORD_BYTES);
    password.erase(std::min(password.find_first_of("\r\n"), password.size()));
    return password;
}

/// What stands between hosts and users of an envelope is ASCII.
std::string plainAddress(std::string const& address) {
    bool const isPlain = Base::isEmailAddress(address) && std::ranges::all_of(address, [](char c) {
                             return static_cast<unsigned char>(c) < 0x80;
                         });
    if (!isPlain)
        throw Base::Error(Base::Code::LetterUnsuitable,
                          Base::inQuotes(address) + " is not one plain e-mail address");
    return address;
}

std::string hostOf(std::string const& address) { return address.substr(address.find('@') + 1); }

bool isPlainInId(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-' || c == '_';
}

} // namespace

std::string messageIdFor(std::string_view key, std::string_view host) {
    std::string id;
    for (char const c : key)
        id += isPlainInId(c) ? std::string(1, c) : '%' + Base::hexNumber(static_cast<unsigned char>(c), 2);
    return id + '@' + std::string(host);
}

std::string keyOfMessageId(std::string_view messageId) {
    std::string_view const id = messageId.substr(0, messageId.find('@'));
    std::string key;
    for (std::size_t at = 0; at < id.size(); ++at) {
        if (id[at] != '%') {
            key += id[at];
            continue;
        }
        std::string_view const digits = id.substr(at + 1, 2);
        unsigned char byte = 0;
        if (digits.size() != 2 || std::from_chars(digits.begin(), digits.end(), byte, 16).ptr != digits.end())
            return {};
        key += static_cast<char>(byte);
        at += 2;
    }
    return key;
}

SmtpCarrier::SmtpCarrier(Protocol::CarrierSettings settings, StopSign const& stop)
    : settings_(std::move(settings)), session_(stop) {}

SmtpServer SmtpCarrier::server() const {
    SmtpServer server{settings_.url, settings_.caFile, settings_.startsTls, settings_.user};
    if (!settings_.passwordFile.empty())
        server.password = passwordIn(settings_.passwordFile);
    return server;
}

MailMessage SmtpCarrier::messageUnder(std::string const& key, std::string const& to,
                                      std::string const& replyTo) const {
    MailMessage message;
    message.from = settings_.from;
    message.fromName = settings_.fromName;
    message.to = plainAddress(to);
    if (!replyTo.empty())
        message.replyTo = plainAddress(replyTo);
    message.messageId = messageIdFor(key, hostOf(message.from));
    return message;
}

MailMessage SmtpCarrier::messageFor(Notice const& notice) const {
    MailMessage message = messageUnder(notice.key, notice.to, notice.replyTo);
    message.subject = notice.subject;
    message.text = notice.text;
    return message;
}

MailMessage SmtpCarrier::messageFor(Parcel const& parcel) const {
    OutgoingLetter const& letter = parcel.letters.front();
    MailMessage message = messageUnder(
        parcel.key, settings_.to.empty() ? letter.address : filledIn(settings_.to, letter, parcel.mailing),
        parcel.replyTo);
    message.subject = filledIn(settings_.subject, letter, parcel.mailing);
    message.text = filledIn(settings_.text, letter, parcel.mailing);
    message.attachments.push_back({parcel.key + ".pdf", parcel.document});
    for (auto const& [name, bytes] : parcel.attachments)
        message.attachments.push_back({name, bytes});
    return message;
}

Outcome SmtpCarrier::handOver(Parcel const& parcel, PutOnRecord const& mayHaveIt) {
    MailMessage message;
    try {
        message = messageFor(parcel);
    } catch (Base::Error const& bad) {
        return {Outcome::Kind::Refused, bad.what()};
    }
    return send(message, mayHaveIt);
}

Outcome SmtpCarrier::send(Notice const& notice, PutOnRecord const& mayHaveIt) {
    MailMessage message;
    try {
        message = messageFor(notice);
    } catch (Base::Error const& bad) {
        return {Outcome::Kind::Refused, bad.what()};
    }
    return send(message, mayHaveIt);
}

Outcome SmtpCarrier::send(MailMessage const& message, PutOnRecord const& mayHaveIt) {
    MimeText text(message);
    auto const read = [&text](char* into, std::size_t room) { return text.read(into, room); };
    return session_.send(server(), {message.from, message.to, text.size(), read}, mayHaveIt);
}

std::string SmtpCarrier::test() {
    std::string offers = session_.extensions(server());
    for (std::size_t at = 0; (at = offers.find('\n', at)) != offers.npos; at += 2)
        offers.replace(at, 1, ", ");
    return settings_.url + (settings_.user.empty() ? "" : " lets the user " + settings_.user + " in and") +
           " offers " + (offers.empty() ? "nothing beside mails" : offers);
}

} // namespace Carriers

#pragma once
// Letters as e-mails, given to a server that sends them on.

#include "programs/carriers/carrier.h"
#include "programs/carriers/mime_message.h"
#include "programs/carriers/smtp_session.h"

namespace Carriers {

/// "KEY@HOST" of what is sent under a key from that host. What no such name may have is written as "%2e".
std::string messageIdFor(std::string_view key, std::string_view host);
/// The other way; empty when it is none of those.
std::string keyOfMessageId(std::string_view messageId);

/// What the other side refuses for good are letters; who cannot be reached, does not let the user in or puts
/// mails off has failed.
class SmtpCarrier : public Carrier {
public:
    explicit SmtpCarrier(Protocol::CarrierSettings settings, StopSign const& stop = {});

    Outcome handOver(Parcel const& parcel, PutOnRecord const& mayHaveIt) override;
    Outcome send(Notice const& notice, PutOnRecord const& mayHaveIt) override;
    std::string test() override;

private:
    /// With what all messages from here have, and to that address. Throws Error when it is none.
    MailMessage messageUnder(std::string const& key, std::string const& to, std::string const& replyTo) const;
    /// Throws Error when the letter can never be sent.
    MailMessage messageFor(Parcel const& parcel) const;
    MailMessage messageFor(Notice const& notice) const;
    Outcome send(MailMessage const& message, PutOnRecord const& mayHaveIt);
    /// Throws Error when the password cannot be read.
    SmtpServer server() const;

    Protocol::CarrierSettings settings_;
    SmtpSession session_;
};

} // namespace Carriers

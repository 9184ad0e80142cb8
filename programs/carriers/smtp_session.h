#pragma once
// A connection to a server that takes e-mails.

#include "programs/carriers/carrier.h"

#include <cstddef>
#include <functional>
#include <memory>
#include <string>

namespace Carriers {

struct SmtpServer {
    /// "smtp://HOST:PORT", or smtps.
    std::string url;
    /// Of certificates that the server's may be signed with; empty for the system's.
    std::string caFile;
    /// Where it does not begin so: nothing is said to a server that does not change over to TLS.
    bool startsTls = true;
    std::string user = {};
    std::string password = {};
};

struct Mail {
    /// Plain addresses of the envelope.
    std::string from;
    std::string to;
    /// Of the message, whose lines end in carriage return and line feed.
    std::size_t size = 0;
    /// Its next bytes; asked again behind the last, it gives 0.
    std::function<std::size_t(char* into, std::size_t room)> read;
};

/// Stays connected from one mail to the next. Used by one thread at a time.
class SmtpSession {
public:
    /// What hangs is given up when the sign is raised.
    explicit SmtpSession(StopSign stop = {});
    ~SmtpSession();
    SmtpSession(SmtpSession const&) = delete;
    SmtpSession& operator=(SmtpSession const&) = delete;

    /// `mayHaveIt` is called before the last bytes of the message. What it throws is thrown, and nobody has
    /// the mail then. What the server says is told; what it is sent to prove who the user is, is not.
    Outcome send(SmtpServer const& server, Mail const& mail, PutOnRecord const& mayHaveIt);
    /// Connects and gives the server's extensions, one to a line. Throws Error.
    std::string extensions(SmtpServer const& server);

private:
    class Transfer;

    StopSign stop_;
    /// A CURL, which curl's header calls void.
    std::unique_ptr<void, void (*)(void*)> handle_;
    /// The server's extensions as it told them when it was connected to.
    std::string extensions_;
};

} // namespace Carriers

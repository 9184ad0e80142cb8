#pragma once
// A connected socket, with or without TLS on it.

#include <utility>

#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/ssl/context.hpp>

#include <cstddef>
#include <functional>
#include <memory>
#include <span>
#include <string>
#include <string_view>

#include <openssl/types.h>

namespace Channel {

using boost::asio::ip::tcp;
using boost::system::error_code;

/// One read and one write may be under way. The stream, and what is read into and written from, must live
/// until their functions have been called; closing the socket ends them.
class Stream {
public:
    using Done = std::function<void(error_code const&)>;
    using Moved = std::function<void(error_code const&, std::size_t)>;

    virtual ~Stream() = default;

    /// Agrees on TLS; without TLS there is nothing to agree on.
    virtual void handshake(Done done) = 0;
    virtual void readSome(std::span<char> room, Moved done) = 0;
    virtual void writeAll(std::string_view bytes, Done done) = 0;
    /// Of the other side's certificate; empty without TLS. Throws Error when there is none or it cannot be
    /// computed.
    virtual std::string fingerprint() = 0;
    virtual tcp::socket& socket() = 0;
};

enum class TlsRole { Client, Service };

std::unique_ptr<Stream> makePlainStream(tcp::socket socket);
std::unique_ptr<Stream> makeTlsStream(tcp::socket socket, boost::asio::ssl::context& context, TlsRole role);

/// The context of a service that shows this certificate. Throws Error.
std::unique_ptr<boost::asio::ssl::context> makeServiceContext(std::string const& certificateFile,
                                                              std::string const& keyFile);
/// In the form in which the tools for certificates print it. Throws Error when there is none, or when it
/// cannot be computed.
std::string fingerprintOf(X509 const* certificate);
/// The fingerprint of the certificate that a context shows. Throws Error.
std::string fingerprintOf(boost::asio::ssl::context& context);
/// When that certificate ends, in seconds since the epoch. Throws Error.
long long certificateEnd(boost::asio::ssl::context& context);
/// The context of a client. It accepts any certificate: whose it is, is told by the fingerprint.
std::unique_ptr<boost::asio::ssl::context> makeClientContext();

/// The two ends of a connected socket as HOST:PORT, the same for both sides. Throws boost's system_error.
struct Ends {
    std::string own;
    std::string other;
};
Ends endsOf(tcp::socket const& socket);

/// Also for IPv4 addresses in the form of IPv6.
bool isLoopback(boost::asio::ip::address const& address);

} // namespace Channel

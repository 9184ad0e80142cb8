#include "programs/channel/stream.h"

#include "programs/base/error.h"
#include "programs/base/private_file.h"

#include <boost/asio/buffer.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/ssl/context.hpp>
#include <boost/asio/write.hpp>

#include <openssl/evp.h>
#include <openssl/sha.h>
#include <openssl/ssl.h>
#include <openssl/x509.h>

#include <unistd.h>

#include <array>
#include <cerrno>
#include <ctime>
#include <sstream>

namespace Channel {

namespace asio = boost::asio;
namespace ssl = asio::ssl;

namespace {

asio::ip::address unmapped(asio::ip::address const& address) {
    if (address.is_v6() && address.to_v6().is_v4_mapped())
        return asio::ip::make_address_v4(asio::ip::v4_mapped, address.to_v6());
    return address;
}

std::string textOf(tcp::endpoint const& end) {
    std::ostringstream text;
    text << tcp::endpoint(unmapped(end.address()), end.port());
    return std::move(text).str();
}

class PlainStream : public Stream {
public:
    explicit PlainStream(tcp::socket socket) : socket_(std::move(socket)) {}

    void handshake(Done done) override {
        asio::post(socket_.get_executor(), [done = std::move(done)] { done({}); });
    }
    void readSome(std::span<char> room, Moved done) override {
        socket_.async_read_some(asio::buffer(room.data(), room.size()), std::move(done));
    }
    void writeAll(std::string_view bytes, Done done) override {
        asio::async_write(socket_, asio::buffer(bytes.data(), bytes.size()),
                          [done = std::move(done)](error_code const& ec, std::size_t) { done(ec); });
    }
    std::string fingerprint() override { return {}; }
    tcp::socket& socket() override { return socket_; }

private:
    tcp::socket socket_;
};

std::unique_ptr<ssl::context> makeContext(ssl::context::method method) {
    auto context = std::make_unique<ssl::context>(method);
    if (SSL_CTX_set_min_proto_version(context->native_handle(), TLS1_3_VERSION) != 1)
        throw Base::Error(Base::Code::TlsUnusable, "TLS 1.3 is not to be had.");
    return context;
}

void orThrow(error_code const& ec, std::string const& what, std::string const& file) {
    if (ec)
        throw Base::Error(Base::Code::TlsUnusable,
                          "Cannot use the " + what + " \"" + file + "\": " + ec.message() + '.');
}

} // namespace

std::unique_ptr<Stream> makePlainStream(tcp::socket socket) {
    return std::make_unique<PlainStream>(std::move(socket));
}

std::unique_ptr<ssl::context> makeServiceContext(std::string const& certificateFile,
                                                 std::string const& keyFile) {
    auto context = makeContext(ssl::context::tls_server);
    error_code ec;
    // The library's own reading does not tell why a file cannot be read.
    if (::access(certificateFile.c_str(), R_OK) != 0)
        ec.assign(errno, boost::system::system_category());
    else
        context->use_certificate_chain_file(certificateFile, ec);
    orThrow(ec, "certificate", certificateFile);
    // A key with a password is refused instead of asking on the terminal.
    context->set_password_callback([](std::size_t, ssl::context::password_purpose) { return std::string(); });
    std::string const key = Base::readPrivateFile(keyFile);
    context->use_private_key(asio::buffer(key), ssl::context::pem, ec);
    orThrow(ec, "private key", keyFile);
    return context;
}

std::string fingerprintOf(X509 const* certificate) {
    std::array<unsigned char, EVP_MAX_MD_SIZE> digest;
    unsigned int length = 0;
    // Short of memory, the library may give the digest of another function and call that a success.
    if (!certificate || X509_digest(certificate, EVP_sha256(), digest.data(), &length) != 1 ||
        length != SHA256_DIGEST_LENGTH)
        throw Base::Error(Base::Code::TlsUnusable, "The fingerprint of the certificate cannot be computed.");
    constexpr char const* DIGITS = "0123456789ABCDEF";
    std::string text;
    for (unsigned int i = 0; i < length; ++i) {
        if (i > 0)
            text += ':';
        text += DIGITS[digest[i] >> 4];
        text += DIGITS[digest[i] & 15];
    }
    return text;
}

std::string fingerprintOf(ssl::context& context) {
    return fingerprintOf(SSL_CTX_get0_certificate(context.native_handle()));
}

long long certificateEnd(ssl::context& context) {
    X509 const* const certificate = SSL_CTX_get0_certificate(context.native_handle());
    std::tm end{};
    if (!certificate || ASN1_TIME_to_tm(X509_get0_notAfter(certificate), &end) != 1)
        throw Base::Error(Base::Code::TlsUnusable, "The end of the certificate cannot be read.");
    return ::timegm(&end);
}

std::unique_ptr<ssl::context> makeClientContext() {
    auto context = makeContext(ssl::context::tls_client);
    context->set_verify_mode(ssl::verify_none);
    return context;
}

bool isLoopback(asio::ip::address const& address) { return unmapped(address).is_loopback(); }

Ends endsOf(tcp::socket const& socket) {
    return {textOf(socket.local_endpoint()), textOf(socket.remote_endpoint())};
}

} // namespace Channel

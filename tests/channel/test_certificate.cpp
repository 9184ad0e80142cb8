#include "tests/channel/test_certificate.h"

#include <openssl/ec.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/x509.h>

#include <sys/stat.h>

#include <cstdio>
#include <memory>
#include <stdexcept>

namespace ChannelTest {
namespace {

constexpr long A_DAY = 24 * 60 * 60;

using File = std::unique_ptr<FILE, decltype(&std::fclose)>;

File create(std::string const& name) {
    File file(std::fopen(name.c_str(), "w"), std::fclose);
    if (!file)
        throw std::runtime_error("Cannot write " + name);
    return file;
}

} // namespace

TestCertificate makeCertificate(std::string const& folder, std::string const& name,
                                std::string const& password) {
    std::unique_ptr<EVP_PKEY, decltype(&EVP_PKEY_free)> const key(EVP_EC_gen("P-256"), EVP_PKEY_free);
    std::unique_ptr<X509, decltype(&X509_free)> const certificate(X509_new(), X509_free);
    ASN1_INTEGER_set(X509_get_serialNumber(certificate.get()), 1);
    X509_gmtime_adj(X509_getm_notBefore(certificate.get()), -A_DAY);
    X509_gmtime_adj(X509_getm_notAfter(certificate.get()), A_DAY);
    X509_set_pubkey(certificate.get(), key.get());
    X509_NAME* const subject = X509_get_subject_name(certificate.get());
    X509_NAME_add_entry_by_txt(subject, "CN", MBSTRING_ASC,
                               reinterpret_cast<unsigned char const*>(name.c_str()), -1, -1, 0);
    X509_set_issuer_name(certificate.get(), subject);
    X509_sign(certificate.get(), key.get(), EVP_sha256());

    TestCertificate const files{folder + '/' + name + ".crt", folder + '/' + name + ".key"};
    PEM_write_X509(create(files.certificateFile).get(), certificate.get());
    PEM_write_PrivateKey(create(files.keyFile).get(), key.get(),
                         password.empty() ? nullptr : EVP_aes_256_cbc(),
                         reinterpret_cast<unsigned char const*>(password.data()),
                         static_cast<int>(password.size()), nullptr, nullptr);
    ::chmod(files.keyFile.c_str(), 0600);
    return files;
}

} // namespace ChannelTest

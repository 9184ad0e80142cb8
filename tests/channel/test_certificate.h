#pragma once
// Certificates for tests, signed by themselves.

#include <string>

namespace ChannelTest {

struct TestCertificate {
    std::string certificateFile;
    std::string keyFile;
};

/// Writes a new one into two files of that folder. A password encrypts the key.
TestCertificate makeCertificate(std::string const& folder, std::string const& name,
                                std::string const& password = {});

} // namespace ChannelTest

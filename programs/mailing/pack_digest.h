#pragma once
// The fingerprint of a pack on its way to the service: of the names and bytes of all of its pages, and of its
// metadata.

#include "programs/base/digest.h"

#include <string>

namespace Mailing {

/// Fed with the pages in their order, and with the metadata last, under empty names. docs/formats.md tells
/// how it is computed.
class PackDigest {
public:
    /// `sha256` is that of the blob.
    void add(std::string const& document, std::string const& page, long long size, std::string const& sha256);

    /// 64 hexadecimal digits; nothing is added behind it.
    std::string text() { return digest_.digest(); }

private:
    Base::Sha256 digest_;
};

} // namespace Mailing

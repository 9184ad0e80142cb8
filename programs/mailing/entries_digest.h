#pragma once
// A fingerprint of what the index of a container says of its pages, which the metadata carries: the index
// itself has none, and a changed bit in a name would give a page to another letter.

#include "vlservice/pack/shared_mem_buffer.h"

#include <cstdint>
#include <string>

namespace Mailing {

/// Fed with the pages in file order. docs/formats.md tells how it is computed.
class EntriesDigest {
public:
    explicit EntriesDigest(std::string const& packId);

    void add(std::string const& document, std::string const& page, std::uint32_t length, std::uint32_t crc);
    /// A page that is to be stored.
    void add(std::string const& document, std::string const& page, SharedMemBuffer const& blob);

    /// 64 hexadecimal digits.
    std::string const& text() const { return text_; }

private:
    std::string text_;
};

} // namespace Mailing

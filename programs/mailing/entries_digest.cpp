#include "programs/mailing/entries_digest.h"

#include "programs/base/digest.h"
#include "programs/mailing/measured.h"

#include <zlib.h>

namespace Mailing {
EntriesDigest::EntriesDigest(std::string const& packId) : text_(Base::sha256(packId)) {}

void EntriesDigest::add(std::string const& document, std::string const& page, std::uint32_t length,
                        std::uint32_t crc) {
    text_ = Base::sha256(text_ + measured(document) + measured(page) + std::to_string(length) + ',' +
                         std::to_string(crc));
}

void EntriesDigest::add(std::string const& document, std::string const& page, SharedMemBuffer const& blob) {
    add(document, page, static_cast<std::uint32_t>(blob.size()),
        static_cast<std::uint32_t>(crc32_z(0, blob.data(), blob.size())));
}

} // namespace Mailing

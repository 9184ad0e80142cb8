#include "programs/mailing/metadata_text.h"

#include "programs/base/error.h"
#include "programs/mailing/page_blob.h"
#include "vlservice/pack/blob_format.h"

#include <cstdint>
#include <utility>

namespace Mailing {
namespace {

constexpr std::uint64_t MAX_BYTES = 256 << 20;

/// What its blob claims to hold.
std::uint64_t claimedBytes(SharedMemBuffer const& blob) {
    std::uint64_t bytes = 0;
    for (std::size_t i = DB_ZIP_HEADER_SIZE; blob.size() >= DB_ZIP_HEADER_SIZE && i > DB_ZIP_MAGIC.size();
         --i)
        bytes = bytes << 8 | blob.data()[i - 1];
    return bytes;
}

} // namespace

void failAsMetadata() { throw Base::Error(Base::Code::MailingDamaged, "it is no metadata of a mailing"); }

SharedMemBuffer expandedMetadata(SharedMemBuffer blob) {
    if (claimedBytes(blob) > MAX_BYTES)
        failAsMetadata();
    return expanded(std::move(blob));
}

void takeOnce(bool& isTaken) {
    if (std::exchange(isTaken, true))
        failAsMetadata();
}

} // namespace Mailing

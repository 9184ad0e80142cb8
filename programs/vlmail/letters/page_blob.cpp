#include "programs/vlmail/letters/page_blob.h"

namespace VlMail {

void put(WorkerMessage& message, std::vector<PageBlob> const& blobs) {
    message.put(blobs.size());
    for (PageBlob const& blob : blobs) {
        message.put(static_cast<std::uint64_t>(blob.number));
        message.put(blob.data);
        message.put(blob.laterData);
        message.put(static_cast<std::uint64_t>(blob.size.width));
        message.put(static_cast<std::uint64_t>(blob.size.height));
        message.put(std::uint64_t{blob.isColoured});
        message.put(std::uint64_t{blob.isLaterColoured});
    }
}

std::vector<PageBlob> takeBlobs(WorkerMessage& message) {
    std::vector<PageBlob> blobs(message.number());
    for (PageBlob& blob : blobs) {
        blob.number = message.smallNumber();
        blob.data = message.buffer();
        blob.laterData = message.buffer();
        blob.size.width = message.smallNumber();
        blob.size.height = message.smallNumber();
        blob.isColoured = message.number() != 0;
        blob.isLaterColoured = message.number() != 0;
    }
    return blobs;
}

} // namespace VlMail

#include "programs/vlmail/pack/container_file.h"

#include "programs/base/error.h"
#include "programs/vlmail/pack/blob_extent.h"
#include "vlservice/pack/blob_format.h"

#include <algorithm>
#include <cstring>
#include <numeric>
#include <vector>

namespace VlMail {
namespace {

ReadBytes readerOf(SharedMemBuffer const& bytes) {
    return [&bytes](std::uint64_t position, void* to, std::size_t count) {
        std::uint64_t const left = position < bytes.size() ? bytes.size() - position : 0;
        auto const given = static_cast<std::size_t>(std::min<std::uint64_t>(count, left));
        if (given > 0)
            std::memcpy(to, bytes.data() + position, given);
        return given;
    };
}

/// What does not begin as a blob is stored uncompressed.
bool isCompressed(SharedMemBuffer const& bytes) {
    return bytes.size() >= DB_ZIP_MAGIC.size() &&
           std::equal(DB_ZIP_MAGIC.begin(), DB_ZIP_MAGIC.end(), bytes.data());
}

} // namespace

ContainerFile::ContainerFile(std::string const& path) : fileSize_(ByteFile(path).size()) {
    container_.emplace(path, PackWrapper::PURPOSE_IMPORT, std::string());
    if (container_->failed())
        throw Base::Error("cannot read \"" + path +
                          "\": it is no mailing file, or its index is damaged; \"vlmail pack " +
                          "salvage\" saves what is left of it");
    findOverlaps();
}

ContainerFile::Blob ContainerFile::blob(unsigned long long index) {
    Blob blob{container_->binData(index), 0, {}};
    blob.damage = damageOf(index, blob);
    return blob;
}

/// Blobs stand one behind the other; entries that share bytes were forged, and expand to any size.
void ContainerFile::findOverlaps() {
    std::vector<unsigned long long> order(size());
    std::iota(order.begin(), order.end(), 0);
    std::erase_if(order, [this](auto i) { return entry(i).length == 0; });
    std::stable_sort(order.begin(), order.end(),
                     [this](auto a, auto b) { return entry(a).offset < entry(b).offset; });
    std::uint64_t end = 0;
    for (auto const i : order) {
        if (entry(i).offset < end)
            overlapping_.insert(i);
        end = std::max(end, entry(i).offset + entry(i).length);
    }
}

std::string ContainerFile::damageOf(unsigned long long index, Blob& blob) const {
    Entry const& entry = this->entry(index);
    if (entry.length == 0)
        return "it is empty";
    if (entry.length > fileSize_ || entry.offset > fileSize_ - entry.length)
        return "it runs past the end of the file";
    if (overlapping_.contains(index))
        return "its bytes belong to another as well";
    // A blob that cannot be read, or whose checksum is wrong, is not given out.
    if (blob.bytes.empty())
        return "its checksum is wrong";
    blob.dataSize = blob.bytes.size();
    if (!isCompressed(blob.bytes))
        return {};
    auto const extent = blobExtent(readerOf(blob.bytes), 0);
    if (!extent || !extent->headerIsTrue)
        return "it cannot be expanded";
    blob.dataSize = extent->dataSize;
    return blob.dataSize == 0 ? "it is empty" : "";
}

bool isPage(PackWrapper::BinEntry const& entry) { return entry.role == Container::ROLE_PAGE; }

std::string inWords(PackWrapper::BinEntry const& entry) {
    if (!isPage(entry))
        return "the metadata";
    return "page " + entry.name + " of \"" + entry.document + '"';
}

} // namespace VlMail

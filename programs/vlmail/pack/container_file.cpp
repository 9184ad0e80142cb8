#include "programs/vlmail/pack/container_file.h"

#include "programs/base/error.h"
#include "programs/vlmail/pack/blob_extent.h"
#include "vlservice/pack/blob_format.h"

#include <zlib.h>

#include <algorithm>
#include <cstring>
#include <new>
#include <numeric>
#include <utility>
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

ContainerFile::ContainerFile(std::string const& path) : file_(path) {
    container_.emplace(path, PackWrapper::PURPOSE_IMPORT, std::string());
    if (container_->failed()) {
        requireReadable();
        throw Base::Error(Base::Code::MailingDamaged,
                          "cannot read \"" + path +
                              "\": it is no mailing file, or its index is damaged; \"vlmail pack " +
                              "salvage\" saves what is left of it");
    }
    findOverlaps();
}

/// An index that the disk does not give is not damaged. It stands at the end, and says where at the
/// beginning.
void ContainerFile::requireReadable() {
    constexpr std::uint64_t LOOKED_AT = std::uint64_t{16} << 20;
    std::string part(std::size_t{1} << 20, '\0');
    file_.read(0, part.data(), 1);
    for (std::uint64_t at = file_.size() - std::min(LOOKED_AT, file_.size()); at < file_.size();
         at += part.size())
        file_.read(at, part.data(), part.size());
}

ContainerFile::Blob ContainerFile::blob(unsigned long long index) {
    Blob blob;
    blob.damage = damageOfPlace(index);
    if (blob.damage.empty())
        blob.damage = read(entry(index), blob.bytes);
    if (blob.damage.empty())
        blob.damage = damageOfContent(blob);
    return blob;
}

/// Not by way of the library, which gives no bytes both when the disk fails and when they are others.
std::string ContainerFile::read(Entry const& entry, SharedMemBuffer& bytes) {
    try {
        SharedMemBuffer stored;
        stored.resize(entry.length);
        std::size_t const got =
            file_.read(entry.offset, reinterpret_cast<char*>(stored.data()), entry.length);
        if (got != entry.length || crc32(0, stored.data(), entry.length) != entry.crc)
            return "its checksum is wrong";
        bytes = std::move(stored);
        return {};
    } catch (Base::Error const& failure) {
        return failure.what();
    } catch (std::bad_alloc const&) {
        return "there is not enough memory for it";
    }
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

std::string ContainerFile::damageOfPlace(unsigned long long index) const {
    Entry const& entry = this->entry(index);
    if (entry.length == 0)
        return "it is empty";
    if (entry.length > fileSize() || entry.offset > fileSize() - entry.length)
        return "it runs past the end of the file";
    return overlapping_.contains(index) ? "its bytes belong to another as well" : "";
}

std::string ContainerFile::damageOfContent(Blob& blob) {
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

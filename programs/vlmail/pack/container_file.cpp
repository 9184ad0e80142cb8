#include "programs/vlmail/pack/container_file.h"

#include "programs/base/error.h"
#include "programs/vlmail/pack/blob_extent.h"
#include "vlservice/pack/blob_format.h"

#include <algorithm>
#include <cstring>

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
}

ContainerFile::Blob ContainerFile::blob(unsigned long long index) {
    SharedMemBuffer const bytes = container_->binData(index);
    return {bytes, damageOf(entry(index), bytes)};
}

std::string ContainerFile::damageOf(Entry const& entry, SharedMemBuffer const& bytes) const {
    if (entry.length > fileSize_ || entry.offset > fileSize_ - entry.length)
        return "it runs past the end of the file";
    // A blob that cannot be read, or whose checksum is wrong, is not given out.
    if (bytes.empty() && (entry.length != 0 || entry.crc != 0))
        return "its checksum is wrong";
    if (!isCompressed(bytes))
        return {};
    auto const extent = blobExtent(readerOf(bytes), 0);
    return extent && extent->headerIsTrue ? "" : "it cannot be expanded";
}

bool isPage(PackWrapper::BinEntry const& entry) { return entry.role == Container::ROLE_PAGE; }

std::string inWords(PackWrapper::BinEntry const& entry) {
    if (!isPage(entry))
        return "the metadata";
    return "page " + entry.name + " of \"" + entry.document + '"';
}

} // namespace VlMail

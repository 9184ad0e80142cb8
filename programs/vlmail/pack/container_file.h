#pragma once
// A mailing file as the subcommands look into it.

#include "programs/base/log_capture.h"
#include "programs/vlmail/pack/byte_file.h"
#include "vlservice/pack/pack_wrapper.h"

#include <cstdint>
#include <optional>
#include <set>
#include <string>

namespace VlMail {

/// Opened for reading. Its index is whole; its blobs may be damaged.
class ContainerFile {
public:
    using Entry = PackWrapper::BinEntry;

    struct Blob {
        SharedMemBuffer bytes;
        /// Of the data in it.
        std::uint64_t dataSize = 0;
        /// What is wrong with it, in words; empty when it is whole and can be expanded.
        std::string damage;
    };

    /// Throws Error when there is no such file or its index cannot be read.
    explicit ContainerFile(std::string const& path);

    std::uint64_t fileSize() const { return file_.size(); }
    std::string const& packId() const { return container_->packId(); }
    unsigned long long size() const { return container_->szBins(); }
    Entry const& entry(unsigned long long index) const { return container_->bin(index); }

    /// The blob of an entry as it is stored, checked.
    Blob blob(unsigned long long index);

private:
    void requireReadable();
    void findOverlaps();
    /// What is wrong, in words, or nothing; each looks at what the one before it has found in order.
    std::string damageOfPlace(unsigned long long index) const;
    std::string read(Entry const& entry, SharedMemBuffer& bytes);
    static std::string damageOfContent(Blob& blob);

    /// The subcommands say what failed in words of their own.
    Base::LogCapture quiet_;
    ByteFile file_;
    std::optional<PackWrapper> container_;
    /// Entries whose bytes belong to an entry before them as well.
    std::set<unsigned long long> overlapping_;
};

bool isPage(PackWrapper::BinEntry const& entry);

/// `page 2 of "a.pdf"`, "the metadata".
std::string inWords(PackWrapper::BinEntry const& entry);

} // namespace VlMail

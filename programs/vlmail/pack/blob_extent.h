#pragma once
// How far a compressed blob reaches, told by expanding it.

#include "programs/vlmail/pack/byte_file.h"

#include <cstdint>
#include <optional>

namespace VlMail {

struct BlobExtent {
    /// Of the blob, its header included.
    std::uint64_t length;
    /// Of the data in it.
    std::uint64_t dataSize;
    /// Whether the header says so too.
    bool headerIsTrue;
};

/// Whether a blob's header stands there.
bool beginsAsBlob(ReadBytes const& read, std::uint64_t position);

/// None when no blob begins there or when its stream is damaged. Takes the same memory for any size.
std::optional<BlobExtent> blobExtent(ReadBytes const& read, std::uint64_t position);

} // namespace VlMail

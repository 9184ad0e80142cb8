#pragma once
// What can be saved of a damaged mailing file, and under which names.

#include "programs/vlmail/pack/byte_file.h"
#include "vlservice/pack/shared_mem_buffer.h"

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace VlMail {

/// A blob that is whole.
struct FoundBlob {
    enum class Form {
        Compressed,
        /// Compressed, but its header tells a wrong size.
        WrongHeader,
        /// Stored as it is; only the index can tell where it ends.
        Plain,
    };

    std::uint64_t offset = 0;
    std::uint64_t length = 0;
    std::uint64_t dataSize = 0;
    Form form = Form::Compressed;
};

struct PageName {
    std::string document;
    std::string page;

    auto operator<=>(PageName const&) const = default;
};

/// Where the name of a page comes from. Without any it is numbered.
enum class NamedBy { Index, Metadata, Nothing };

struct SavedPage {
    FoundBlob blob;
    PageName name;
    NamedBy namedBy;
};

struct LostPage {
    PageName name;
    /// Its blob begins where the index says, but is damaged.
    bool isDamaged;
};

struct SalvagePlan {
    std::string packId;
    /// In file order.
    std::vector<SavedPage> pages;
    std::optional<FoundBlob> metadata;
    /// Pages that index or metadata name and that no blob could be told to be.
    std::vector<LostPage> lost;
    /// Where damaged blobs begin that no name is known for.
    std::vector<std::uint64_t> damagedAt;

    /// Everything that is known of was saved under its name.
    bool isComplete() const;
};

/// Only reads the file. Throws Error when it cannot be read.
SalvagePlan planSalvage(ByteFile& file);

/// The blob in its compressed form with a true header.
SharedMemBuffer salvagedBlob(ByteFile& file, FoundBlob const& blob);

} // namespace VlMail

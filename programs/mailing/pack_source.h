#pragma once
// A finished pack as whoever makes a container of it, or sends it, sees it: wherever its pages lie.

#include "vlservice/pack/page_loader.h"
#include "vlservice/pack/shared_mem_buffer.h"

#include <cstddef>
#include <string>
#include <utility>
#include <vector>

namespace Mailing {

/// More than any page needs, and a bound for what a forged pack makes its reader allocate.
constexpr int MAX_BLOB_BYTES = 256 << 20;

/// Whether a pack can bear this id: it names a file later on, so it has to be a safe file name of at most 128
/// bytes.
bool isPackId(std::string const& id);

/// What a pack is beside its pages.
struct PackInfo {
    std::string id;
    /// The settings node that it is sent for; the empty text is the root.
    std::string cfgId;
    std::string title;

    bool operator==(PackInfo const&) const = default;
};

/// Used by one thread. Pages and metadata are products of PageSaverI::zipDbData.
class PackSource : public PageLoaderI {
public:
    struct PageName {
        std::string document;
        std::string page;

        PageName(std::string documentName, std::string pageName)
            : document(std::move(documentName)), page(std::move(pageName)) {}
        bool operator==(PageName const&) const = default;
    };

    explicit PackSource(std::string packId) : PageLoaderI(std::move(packId)) {}

    virtual PackInfo const& info() const = 0;
    /// In the order in which they were stored.
    virtual std::vector<PageName> const& pages() const = 0;
    virtual SharedMemBuffer metadata() = 0;

    /// Calls `func` before it returns, with the empty buffer when there is no such page. Throws Base::Error
    /// when the pack cannot be read.
    void requestPageData(std::string const& document, std::string const& page, PageFunc func) final;
    std::size_t documentCount() const;

protected:
    virtual SharedMemBuffer load(std::string const& document, std::string const& page) = 0;
};

/// The page itself, which has to be one of the pack.
SharedMemBuffer pageOf(PackSource& pack, PackSource::PageName const& name);

} // namespace Mailing

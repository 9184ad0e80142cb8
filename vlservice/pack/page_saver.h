#pragma once
// Where pages go, and the compressed form in which they are kept.

#include "vlservice/export.h"
#include "vlservice/pack/shared_mem_buffer.h"

#include <string>

/// A sink of pages.
class VLSERVICE_EXPORT PageSaverI {
public:
    PageSaverI(std::string packId); ///< of the mailing that pages are of
    PageSaverI(PageSaverI const&) = default;
    PageSaverI& operator=(PageSaverI const&) = default;
    virtual ~PageSaverI();

    /// Takes a page, which is in its compressed form.
    virtual void savePage(std::string const& document, std::string const& page, SharedMemBuffer data) = 0;

    /// The compressed form of the data, a header and a zlib stream; no data gives a blob too.
    /// Only the first (size mod 4 GiB) bytes of larger data get into the stream. A failure is logged and
    /// gives the empty buffer.
    static SharedMemBuffer zipDbData(void const* data, unsigned long long size);
    static SharedMemBuffer zipDbData(SharedMemBuffer data);

protected:
    /// The id of the mailing that is saved. Not called packId(): a class that is source and sink has two ids.
    std::string const& savedPackId() const { return packId_; }

private:
    std::string packId_;
};

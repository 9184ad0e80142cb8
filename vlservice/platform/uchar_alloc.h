#pragma once
// The blocks of memory that page data lives in.

#include "vlservice/export.h"

#include <cstddef>

/// Allocates and, as a deleter, releases blocks. The two sides match `new unsigned char[n]`, so a
/// std::shared_ptr<unsigned char[]> may hold a block with plain deletion as well.
class VLSERVICE_EXPORT ExportedUCharAlloc {
public:
    /// Bytes are not initialised. Throws std::bad_alloc.
    static unsigned char* alloc(std::size_t size);
    void operator()(unsigned char* block) const; ///< frees it
};

#pragma once
// The bytes of a page on their way through the system: a block that is shared, never copied.

#include "vlservice/export.h"

#include <memory>

/// A handle to a block of bytes. Copies share the block, and the constness of a handle is not that of its
/// bytes. The empty buffer is the answer wherever there is no data, also after a failure.
class VLSERVICE_EXPORT SharedMemBuffer {
public:
    SharedMemBuffer() = default;
    /// A block of its own; no bytes give the empty buffer. Throws std::bad_alloc.
    static SharedMemBuffer copyOf(void const* data, unsigned long long size);

    /// Null when the buffer never had a size.
    unsigned char* data() const { return data_.get(); }
    unsigned long long size() const { return size_; }
    bool empty() const { return size_ == 0; }

    /// Sets the size. Growing takes a new block, whose bytes are not initialised: the contents are not kept.
    /// Shrinking keeps the block. Throws std::bad_alloc and then leaves the buffer as it was.
    void resize(unsigned long long size);

private:
    std::shared_ptr<unsigned char[]> data_;
    unsigned long long size_ = 0;
};

#include "vlservice/pack/shared_mem_buffer.h"

#include "vlservice/platform/uchar_alloc.h"

#include <cstring>

SharedMemBuffer SharedMemBuffer::copyOf(void const* data, unsigned long long size) {
    SharedMemBuffer copy;
    copy.resize(size);
    if (size != 0)
        std::memcpy(copy.data(), data, size);
    return copy;
}

void SharedMemBuffer::resize(unsigned long long size) {
    // The first block is released by plain deletion, later ones by their allocator: deliberately so, and the
    // reason why ExportedUCharAlloc promises that both are right.
    if (!data_ && size != 0)
        data_.reset(ExportedUCharAlloc::alloc(size));
    else if (size > size_)
        data_.reset(ExportedUCharAlloc::alloc(size), ExportedUCharAlloc());
    size_ = size;
}

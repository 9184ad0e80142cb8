#include "vlservice/platform/uchar_alloc.h"

#include "tests/support/sanitized.h"

#include <gtest/gtest.h>

#include <cstring>
#include <memory>
#include <new>

namespace {

TEST(UCharAlloc, GivesABlockThatItReleasesItself) {
    unsigned char* const block = ExportedUCharAlloc::alloc(100);
    std::memset(block, 0xa5, 100);
    EXPECT_EQ(block[99], 0xa5);
    ExportedUCharAlloc const release;
    release(block);
    release(nullptr);
}

// The address sanitizer tells whether the forms of allocation and release match.
TEST(UCharAlloc, SuitsSharedPointersWithPlainDeletionAndWithItAsDeleter) {
    std::shared_ptr<unsigned char[]> const plain(ExportedUCharAlloc::alloc(16));
    std::shared_ptr<unsigned char[]> const with(ExportedUCharAlloc::alloc(16), ExportedUCharAlloc());
    plain[15] = with[15] = 1;
    EXPECT_EQ(plain[15], with[15]);
}

TEST(UCharAlloc, GivesABlockOfNoBytes) {
    std::shared_ptr<unsigned char[]> const none(ExportedUCharAlloc::alloc(0));
    EXPECT_NE(none, nullptr);
}

TEST(UCharAlloc, ThrowsWhenThereIsNotThatMuch) {
    if (VLServiceTest::SANITIZED)
        GTEST_SKIP() << "the sanitizer's allocator ends the process instead";
    EXPECT_THROW(ExportedUCharAlloc()(ExportedUCharAlloc::alloc(std::size_t{1} << 62)), std::bad_alloc);
}

} // namespace

#include "vlservice/pack/shared_mem_buffer.h"

#include "tests/pack/container_fixture.h"
#include "tests/support/sanitized.h"

#include <gtest/gtest.h>

#include <string>

namespace {

TEST(SharedMemBuffers, AreEmptyByDefault) {
    SharedMemBuffer const buffer;
    EXPECT_EQ(buffer.data(), nullptr);
    EXPECT_EQ(buffer.size(), 0u);
    EXPECT_TRUE(buffer.empty());
}

TEST(SharedMemBuffers, CopyWhatTheyAreMadeOf) {
    std::string text = "page";
    SharedMemBuffer const buffer = SharedMemBuffer::copyOf(text.data(), text.size());
    text = "????";
    EXPECT_EQ(textOf(buffer), "page");
    EXPECT_FALSE(buffer.empty());
}

TEST(SharedMemBuffers, OfNoBytesAreEmpty) {
    EXPECT_EQ(SharedMemBuffer::copyOf("x", 0).data(), nullptr);
    EXPECT_EQ(SharedMemBuffer::copyOf(nullptr, 0).data(), nullptr);
}

TEST(SharedMemBuffers, ShareTheirBlockWithCopies) {
    SharedMemBuffer const buffer = SharedMemBuffer::copyOf("page", 4);
    SharedMemBuffer const copy = buffer;
    EXPECT_EQ(copy.data(), buffer.data());
    copy.data()[0] = 'c';
    EXPECT_EQ(textOf(buffer), "cage");
}

TEST(SharedMemBuffers, StayWithoutABlockAtSizeZero) {
    SharedMemBuffer buffer;
    buffer.resize(0);
    EXPECT_EQ(buffer.data(), nullptr);
}

TEST(SharedMemBuffers, KeepTheirBlockWhenTheyShrink) {
    SharedMemBuffer buffer = SharedMemBuffer::copyOf("page", 4);
    unsigned char const* const block = buffer.data();
    buffer.resize(2);
    EXPECT_EQ(buffer.data(), block);
    EXPECT_EQ(textOf(buffer), "pa");
    buffer.resize(0);
    EXPECT_EQ(buffer.data(), block);
    EXPECT_TRUE(buffer.empty());
}

TEST(SharedMemBuffers, TakeANewBlockWhenTheyGrow) {
    SharedMemBuffer buffer = SharedMemBuffer::copyOf("page", 4);
    SharedMemBuffer const copy = buffer;
    buffer.resize(5);
    EXPECT_EQ(buffer.size(), 5u);
    EXPECT_NE(buffer.data(), copy.data());
    EXPECT_EQ(textOf(copy), "page");
}

TEST(SharedMemBuffers, TakeANewBlockEvenWhereTheShrunkOneWouldDo) {
    SharedMemBuffer buffer = SharedMemBuffer::copyOf("page", 4);
    SharedMemBuffer const copy = buffer;
    buffer.resize(1);
    buffer.resize(2);
    EXPECT_NE(buffer.data(), copy.data());
}

TEST(SharedMemBuffers, ReleaseEveryKindOfBlock) {
    // The leak checker of the sanitizers is the judge: one block of each deleter, and one that was replaced.
    SharedMemBuffer grown;
    grown.resize(1);
    grown.resize(1000);
    SharedMemBuffer fresh;
    fresh.resize(1);
    EXPECT_FALSE(grown.empty());
    EXPECT_FALSE(fresh.empty());
}

TEST(SharedMemBuffers, StayAsTheyWereWhenThereIsNoMemory) {
    if (VLServiceTest::SANITIZED)
        GTEST_SKIP() << "the sanitizer's allocator ends the process instead of throwing";
    SharedMemBuffer buffer = SharedMemBuffer::copyOf("page", 4);
    EXPECT_THROW(buffer.resize(1ull << 62), std::bad_alloc);
    EXPECT_EQ(textOf(buffer), "page");
}

} // namespace

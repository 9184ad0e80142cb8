#include "tests/pack/container_fixture.h"
#include "tests/support/sanitized.h"
#include "vlservice/pack/blob_format.h"
#include "vlservice/pack/page_loader.h"
#include "vlservice/pack/page_saver.h"

#include <gmock/gmock.h>
#include <sys/resource.h>
#include <zlib.h>

#include <cstdint>
#include <random>
#include <string>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

LogLine const TOO_SMALL{4, "Failed to decompress data from db. Size too small"};
LogLine const DAMAGED{4, "Failed to decompress data from db"};

std::string streamOf(std::string const& plain) {
    std::string stream(compressBound(static_cast<uLong>(plain.size())), '\0');
    uLongf length = stream.size();
    compress2(reinterpret_cast<Bytef*>(stream.data()), &length, reinterpret_cast<Bytef const*>(plain.data()),
              plain.size(), 1);
    stream.resize(length);
    return stream;
}

std::string header(std::uint64_t size) { return "TEZ" + littleEndian(size); }

/// Bytes that compress to about half.
std::string sampleText(std::size_t size, unsigned seed) {
    std::mt19937 random(seed);
    std::string text(size, '\0');
    for (char& c : text)
        c = static_cast<char>('a' + random() % 16);
    return text;
}

class BlobTest : public testing::Test {
protected:
    std::string unzip(std::string const& blob) { return textOf(PageLoaderI::unzipDbData(bufferOf(blob))); }

    LogLines log_;
};

using ZippingBlobs = BlobTest;
using UnzippingBlobs = BlobTest;

TEST_F(ZippingBlobs, HaveTheFormatsNumbers) {
    EXPECT_EQ(DB_ZIP_MAGIC, "TEZ");
    EXPECT_EQ(DB_ZIP_HEADER_SIZE, 11u);
    EXPECT_EQ(DB_ZIP_LEVEL, 1);
}

TEST_F(ZippingBlobs, WritesHeaderAndStream) {
    std::string const plain = sampleText(1000, 1);
    EXPECT_EQ(textOf(PageSaverI::zipDbData(plain.data(), plain.size())), header(1000) + streamOf(plain));
}

TEST_F(ZippingBlobs, GivesABlobForNoData) {
    EXPECT_EQ(textOf(PageSaverI::zipDbData(SharedMemBuffer())), header(0) + streamOf(""));
    EXPECT_EQ(textOf(PageSaverI::zipDbData(nullptr, 0)), header(0) + streamOf(""));
}

TEST_F(ZippingBlobs, TakesABufferAsWell) {
    EXPECT_EQ(textOf(PageSaverI::zipDbData(bufferOf("page"))), textOf(PageSaverI::zipDbData("page", 4)));
}

TEST_F(ZippingBlobs, ComesBackAsItWas) {
    for (std::size_t size : {0, 1, 2, 3, 10, 11, 255, 256, 4096, 100'000, 1'000'003}) {
        std::string const plain = sampleText(size, static_cast<unsigned>(size));
        EXPECT_EQ(unzip(textOf(PageSaverI::zipDbData(bufferOf(plain)))), plain) << size << " bytes";
    }
    EXPECT_THAT(log_.take(), IsEmpty());
}

/// For death tests: the child gets no more than half a gigabyte in all.
void limitMemory() {
    rlimit const limit{std::size_t{1} << 29, std::size_t{1} << 29};
    ::setrlimit(RLIMIT_AS, &limit);
}

[[noreturn]] void exitAs(bool passed) { std::exit(passed ? 0 : 1); }

TEST_F(ZippingBlobs, LogsThatThereIsNoMemory) {
    if (VLServiceTest::SANITIZED)
        GTEST_SKIP() << "the sanitizer needs more address space than a limit leaves it";
    auto const inChild = [this] {
        limitMemory();
        // The block for the result is taken before the data is looked at.
        bool const isEmpty = PageSaverI::zipDbData("page", 0xFFFFFFFF).empty();
        exitAs(isEmpty && log_.take() == std::vector<LogLine>{{3, "Failed to compress data for db"}});
    };
    EXPECT_EXIT(inChild(), testing::ExitedWithCode(0), "");
}

TEST_F(UnzippingBlobs, LogsThatThereIsNoMemory) {
    if (VLServiceTest::SANITIZED)
        GTEST_SKIP() << "the sanitizer needs more address space than a limit leaves it";
    auto const inChild = [this] {
        limitMemory();
        bool const isEmpty = unzip(header(std::uint64_t{1} << 30) + streamOf("page")).empty();
        exitAs(isEmpty && log_.take() == std::vector{DAMAGED});
    };
    EXPECT_EXIT(inChild(), testing::ExitedWithCode(0), "");
}

TEST_F(UnzippingBlobs, PassesOnWhatIsNoBlob) {
    for (std::string const bytes :
         {"", "T", "TE", "TEX", "teZ", "tez12345678", "%PDF-1.7 and so on", "ZTEZ"}) {
        SharedMemBuffer const given = bufferOf(bytes);
        SharedMemBuffer const got = PageLoaderI::unzipDbData(given);
        EXPECT_EQ(got.data(), given.data()) << bytes;
        EXPECT_EQ(textOf(got), bytes);
    }
    EXPECT_THAT(log_.take(), IsEmpty());
}

TEST_F(UnzippingBlobs, RefusesACutHeader) {
    for (std::size_t size = 3; size < DB_ZIP_HEADER_SIZE; ++size) {
        EXPECT_EQ(unzip(header(4).substr(0, size)), "") << size;
        EXPECT_THAT(log_.take(), ElementsAre(TOO_SMALL)) << size;
    }
}

TEST_F(UnzippingBlobs, RefusesAStreamCutAnywhere) {
    std::string const blob = header(500) + streamOf(sampleText(500, 2));
    for (std::size_t size = DB_ZIP_HEADER_SIZE; size < blob.size(); ++size) {
        EXPECT_EQ(unzip(blob.substr(0, size)), "") << size;
        EXPECT_THAT(log_.take(), ElementsAre(DAMAGED)) << size;
    }
}

TEST_F(UnzippingBlobs, NeverTakesAFlippedBitForTheData) {
    std::string const plain = sampleText(300, 3);
    std::string const blob = header(plain.size()) + streamOf(plain);
    // The first bytes of a stream say how it was made; a flip there may leave it as good as before.
    std::size_t const checked = DB_ZIP_HEADER_SIZE + 2;
    for (std::size_t bit = checked * 8; bit < blob.size() * 8; ++bit) {
        std::string damaged = blob;
        damaged[bit / 8] = static_cast<char>(damaged[bit / 8] ^ (1 << bit % 8));
        std::string const got = unzip(damaged);
        auto const lines = log_.take();
        EXPECT_TRUE(got == plain ? lines.empty() : lines == std::vector{DAMAGED}) << "bit " << bit;
    }
}

TEST_F(UnzippingBlobs, FillsTheTailOfAClaimTooLargeWithZeroes) {
    EXPECT_EQ(unzip(header(10) + streamOf("page")), "page" + std::string(6, '\0'));
    std::string const large = unzip(header(1'000'000) + streamOf("page"));
    EXPECT_EQ(large.size(), 1'000'000u);
    EXPECT_EQ(large.find_first_not_of('\0', 4), std::string::npos);
    EXPECT_THAT(log_.take(), IsEmpty());
}

TEST_F(UnzippingBlobs, RefusesAClaimTooSmall) {
    EXPECT_EQ(unzip(header(3) + streamOf("page")), "");
    EXPECT_THAT(log_.take(), ElementsAre(DAMAGED));
}

TEST_F(UnzippingBlobs, GivesTheEmptyBufferForNoData) {
    SharedMemBuffer const got = PageLoaderI::unzipDbData(bufferOf(header(0) + streamOf("")));
    EXPECT_EQ(got.data(), nullptr);
    EXPECT_THAT(log_.take(), IsEmpty());
}

TEST_F(UnzippingBlobs, IgnoresWhatStandsBehindTheStream) {
    EXPECT_EQ(unzip(header(4) + streamOf("page") + "rest"), "page");
}

TEST_F(UnzippingBlobs, RefusesClaimsThatNoStreamCouldHold) {
    std::uint64_t const gigabyte = std::uint64_t{1} << 30;
    for (std::uint64_t claim : {gigabyte + 1, gigabyte * 4, std::uint64_t{1} << 62, ~std::uint64_t{0}}) {
        EXPECT_EQ(unzip(header(claim) + streamOf("page")), "") << claim;
        EXPECT_THAT(log_.take(), ElementsAre(DAMAGED)) << claim;
    }
}

} // namespace

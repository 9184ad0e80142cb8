#include "programs/mailing/page_blob.h"

#include "programs/mailing/entries_digest.h"
#include "programs/mailing/metadata.h"
#include "tests/support/failure_of.h"
#include "tests/support/sanitized.h"
#include "vlservice/json/json_text.h"
#include "vlservice/platform/log.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <iostream>
#include <sys/resource.h>

namespace {

/// In a process of its own, which may have no more memory than it has.
template<typename Operation>
void printFailureWithoutMemory(Operation operation) {
    Log::setSink({});
    rlimit const nothingMore{std::size_t{64} << 20, std::size_t{64} << 20};
    ::setrlimit(RLIMIT_AS, &nothingMore);
    std::cerr << failureOf(operation);
    std::_Exit(0);
}

TEST(PageBlobs, AreNeverEmptyForWantOfMemory) {
    if (VLServiceTest::SANITIZED)
        GTEST_SKIP() << "the sanitizers take memory without a limit";
    testing::FLAGS_gtest_death_test_style = "fast";
    std::string const data(std::size_t{80} << 20, 'x');
    EXPECT_EXIT(printFailureWithoutMemory([&] { Mailing::compressed(data); }), testing::ExitedWithCode(0),
                "^there is no memory to compress 83886080 bytes; close other programs or raise the limit$");
    SharedMemBuffer const blob = Mailing::compressed(data);
    EXPECT_EXIT(printFailureWithoutMemory([&] { Mailing::expanded(blob); }), testing::ExitedWithCode(0),
                "^it cannot be expanded, or there is no memory for it$");
}

TEST(PageBlobs, AreExpandedToWhatWasCompressed) {
    EXPECT_EQ(Mailing::viewOf(Mailing::expanded(Mailing::compressed("page"))), "page");
    EXPECT_THROW(Mailing::expanded(Mailing::compressed("")), std::exception);
    EXPECT_THROW(Mailing::expanded({}), std::exception);
    EXPECT_THROW(Mailing::expanded(SharedMemBuffer::copyOf("TEZ", 3)), std::exception);
}

TEST(EntriesDigest, IsAnotherForEachChange) {
    auto const digestOf = [](std::string const& id, std::string const& document, std::string const& page,
                             std::uint32_t length, std::uint32_t crc) {
        Mailing::EntriesDigest digest(id);
        digest.add(document, page, length, crc);
        return digest.text();
    };
    std::string const digest = digestOf("m", "a.pdf", "1", 7, 9);
    EXPECT_EQ(digest, "7677a415a3e9414528c27d58c2d82330d6f987315b06b498f5157558d18cb1ce");
    for (std::string const& other : {digestOf("n", "a.pdf", "1", 7, 9), digestOf("m", "a.pd", "f1", 7, 9),
                                     digestOf("m", "a.pdf", "2", 7, 9), digestOf("m", "a.pdf", "1", 8, 9),
                                     digestOf("m", "a.pdf", "1", 7, 8), digestOf("m", "a.pdf", "1", 79, 0)})
        EXPECT_NE(other, digest);
}

TEST(EntriesDigest, GoesWithTheMetadata) {
    Mailing::Metadata metadata{"m", 7, {}, {}, {}};
    EXPECT_EQ(Mailing::Metadata::fromBlob(metadata.toBlob()).entriesDigest, "");
    EXPECT_EQ(Mailing::Metadata::fromBlob(Mailing::withEntriesDigest(metadata.toBlob(), "d")).entriesDigest,
              "");
    metadata.entriesDigest = "c";
    SharedMemBuffer const changed = Mailing::withEntriesDigest(metadata.toBlob(), "d");
    EXPECT_EQ(Mailing::Metadata::fromBlob(changed).entriesDigest, "d");
    SharedMemBuffer const other = Mailing::compressed("not of ours");
    EXPECT_EQ(Mailing::viewOf(Mailing::expanded(Mailing::withEntriesDigest(other, "d"))), "not of ours");
}

} // namespace

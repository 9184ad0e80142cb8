#include "vlservice/pack/index_search.h"

#include "tests/pack/container_fixture.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <limits>
#include <string>
#include <vector>

namespace Container {

static void PrintTo(IndexPlace const& place, std::ostream* out) {
    *out << "{position " << place.position << ", size " << place.size << ", blobs from " << place.blobStart
         << '}';
}

} // namespace Container

namespace {

using Container::IndexPlace;
using Container::IndexSearch;
using testing::ElementsAre;
using testing::IsEmpty;
using namespace std::string_literals;

constexpr std::int64_t LOWEST = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t HIGHEST = std::numeric_limits<std::int64_t>::max();
constexpr std::int64_t LIMIT = std::int64_t{1} << 32;

/// A file whose end may be far behind its last byte; the rest reads as zeroes, as holes do.
struct File {
    std::string bytes;
    std::int64_t end = static_cast<std::int64_t>(bytes.size());
    /// Reads from here on fail.
    std::int64_t unreadableFrom = HIGHEST;
    /// What stands at the end of the file, where it is not part of `bytes`.
    std::string trailer = {};

    bool read(std::int64_t position, char* to, std::size_t count) const {
        auto const size = static_cast<std::int64_t>(count);
        if (position < 0 || position > end - size || position + size > unreadableFrom)
            return false;
        for (std::int64_t i = position; i < position + size; ++i)
            *to++ = byteAt(i);
        return true;
    }

    char byteAt(std::int64_t position) const {
        std::int64_t const inTrailer = position - (end - static_cast<std::int64_t>(trailer.size()));
        if (inTrailer >= 0 && !trailer.empty())
            return trailer[static_cast<std::size_t>(inTrailer)];
        return position < static_cast<std::int64_t>(bytes.size()) ? bytes[static_cast<std::size_t>(position)]
                                                                  : '\0';
    }
};

struct Found {
    std::vector<IndexPlace> places;
    std::string failure;
};

/// All candidates, as if none could be parsed.
Found searchIn(File const& file) {
    IndexSearch::FirstBytes firstBytes;
    EXPECT_TRUE(file.read(0, firstBytes.data(), firstBytes.size())) << "the file is too short for the test";
    IndexSearch search(firstBytes, file.end, [&](auto... args) { return file.read(args...); });
    Found found;
    while (auto const place = search.next()) {
        found.places.push_back(*place);
        if (found.places.size() > 3) {
            ADD_FAILURE() << "the search does not end";
            break;
        }
    }
    found.failure = search.failure();
    return found;
}

std::string trailing(std::int64_t position, std::size_t size = 100) {
    std::string bytes(size, '.');
    return "TEZ" + bytes.replace(size - 8, 8, littleEndian(static_cast<std::uint64_t>(position))).substr(3);
}

std::string leading(std::int64_t position, std::string const& tail = std::string(90, '.')) {
    return littleEndian(static_cast<std::uint64_t>(position)) + "TE" + tail;
}

std::string wide(std::int64_t position, std::size_t idLength = 3) {
    return wideHeader(std::string(idLength, 'i')) + std::string(50, '.') + wideTrailer(position);
}

TEST(IndexSearching, KnowsTheFormatsNumbers) {
    EXPECT_EQ(Container::FIRST_BYTES_SIZE, 18u);
    EXPECT_EQ(wideMagic().size(), Container::FIRST_BYTES_SIZE);
    EXPECT_EQ(Container::WIDE_ID_LENGTH_AT, 26);
    EXPECT_EQ(Container::WIDE_ID_EXTRA, 5);
    EXPECT_EQ(Container::WIDE_TRAILER_SIZE, 28);
}

TEST(IndexSearching, GivesTheCandidatesOfEachLayout) {
    struct Case {
        char const* what;
        File file;
        std::vector<IndexPlace> places;
    };
    // A wide file of id "iii" begins its blobs at 34, has its trailer at 84 and ends at 112.
    Case const cases[] = {
        {"trailing offset", {trailing(40)}, {{40, 52, 0}}},
        {"trailing offset of an index alone", {trailing(0)}, {{0, 92, 0}}},
        {"trailing offset, the smallest index", {trailing(91)}, {{91, 1, 0}}},
        {"trailing offset at the trailer", {trailing(92)}, {}},
        {"trailing offset behind the trailer", {trailing(93)}, {}},
        {"trailing offset at the end of numbers", {trailing(HIGHEST)}, {}},
        {"trailing offset before the file", {trailing(-1)}, {{-1, 93, 0}}},
        {"trailing offset far before the file", {trailing(93 - LIMIT)}, {{93 - LIMIT, LIMIT - 1, 0}}},
        {"trailing offset farther before it", {trailing(92 - LIMIT)}, {{92 - LIMIT, LIMIT - 1, 0}}},
        {"trailing offset at the start of numbers", {trailing(LOWEST)}, {{LOWEST, LIMIT - 1, 0}}},
        {"leading offset", {leading(40)}, {{40, 60, 0}}},
        {"leading offset, the smallest index", {leading(99)}, {{99, 1, 0}}},
        {"leading offset at the end", {leading(100)}, {}},
        {"leading offset behind the end", {leading(HIGHEST)}, {}},
        {"leading offset before the file", {leading(-5)}, {{-5, 105, 0}}},
        {"leading offset at the start of numbers", {leading(LOWEST)}, {{LOWEST, LIMIT - 1, 0}}},
        {"wide header", {wide(10)}, {{44, 40, 34}}},
        {"wide header, index at the start of the blobs", {wide(0)}, {{34, 50, 34}}},
        {"wide header, the smallest index", {wide(49)}, {{83, 1, 34}}},
        {"wide header, index of no size, once", {wide(50)}, {{84, 0, 34}}},
        {"wide header, index behind the trailer", {wide(51)}, {{83, 1, 34}}},
        {"wide header, position at the end of numbers", {wide(HIGHEST)}, {{83, 1, 34}}},
        {"no layout", {std::string(100, '.')}, {}},
    };
    for (Case const& c : cases) {
        Found const found = searchIn(c.file);
        EXPECT_EQ(found.places, c.places) << c.what;
        EXPECT_EQ(found.failure, "Failed to find meta in") << c.what;
    }
}

TEST(IndexSearching, TriesALeadingOffsetBehindATrailingOne) {
    // The first blob begins with "TE" and so do bytes 8 and 9: its first bytes are then taken for a position.
    std::string bytes = "TE\0\0\0\0\0\0TE"s + std::string(0x4554 + 100, '.');
    std::string const trailer = littleEndian(40);
    bytes.replace(bytes.size() - 8, 8, trailer);
    auto const end = static_cast<std::int64_t>(bytes.size());
    EXPECT_THAT(searchIn({bytes}).places,
                ElementsAre(IndexPlace{40, end - 48, 0}, IndexPlace{0x4554, end - 0x4554, 0}));

    bytes.replace(bytes.size() - 8, 8, littleEndian(static_cast<std::uint64_t>(end)));
    EXPECT_THAT(searchIn({bytes}).places, ElementsAre(IndexPlace{0x4554, end - 0x4554, 0}));
}

TEST(IndexSearching, RefusesAnIndexOfFourGigabytes) {
    struct Case {
        char const* what;
        File file;
        std::vector<IndexPlace> places;
    };
    Case const cases[] = {
        {"trailing offset below the limit",
         {.bytes = "TEZ", .end = LIMIT + 107, .trailer = littleEndian(100)},
         {{100, LIMIT - 1, 0}}},
        {"trailing offset at the limit",
         {.bytes = "TEZ", .end = LIMIT + 108, .trailer = littleEndian(100)},
         {}},
        {"trailing offset of twice the limit",
         {.bytes = "TEZ", .end = 2 * LIMIT + 108, .trailer = littleEndian(100)},
         {}},
        {"leading offset below the limit", {.bytes = leading(100), .end = LIMIT + 99}, {{100, LIMIT - 1, 0}}},
        {"leading offset at the limit", {.bytes = leading(100), .end = LIMIT + 100}, {}},
        {"wide header below the limit",
         {.bytes = wideHeader("iii"), .end = 34 + LIMIT - 1 + 28, .trailer = wideTrailer(0)},
         {{34, LIMIT - 1, 34}}},
        {"wide header at the limit",
         {.bytes = wideHeader("iii"), .end = 34 + LIMIT + 28, .trailer = wideTrailer(0)},
         {}},
    };
    for (Case const& c : cases)
        EXPECT_EQ(searchIn(c.file).places, c.places) << c.what;
}

TEST(IndexSearching, AddsTheLengthOfAnIdInSixtyFourBits) {
    File file{wideMagic() + "????????" + littleEndian(0xFFFFFFFF, 4)};
    file.end = 200;
    file.trailer = wideTrailer(10);
    // The blobs would begin behind the end, so the candidate is the byte before the trailer.
    EXPECT_THAT(searchIn(file).places, ElementsAre(IndexPlace{171, 1, 31 + std::int64_t{0xFFFFFFFF}}));
}

TEST(IndexSearching, TellsTheWideMagicFromLookAlikes) {
    for (std::size_t i = 0; i < Container::FIRST_BYTES_SIZE; ++i) {
        std::string bytes = wide(10);
        bytes[i] = static_cast<char>(bytes[i] ^ 0x20);
        EXPECT_THAT(searchIn({bytes}).places, IsEmpty()) << "byte " << i;
    }
}

TEST(IndexSearching, SaysWhatItCouldNotRead) {
    struct Case {
        char const* what;
        File file;
        char const* failure;
    };
    Case const cases[] = {
        {"the length of an id", {.bytes = wide(10), .unreadableFrom = 29}, "Failed to read id from"},
        {"the position under a wide header",
         {.bytes = wide(10), .unreadableFrom = 90},
         "Failed to read valid meta position (-1) from"},
        {"a negative position under a wide header",
         {.bytes = wide(-2)},
         "Failed to read valid meta position (-1) from"},
        {"the lowest position under a wide header",
         {.bytes = wide(LOWEST)},
         "Failed to read valid meta position (-1) from"},
        {"a trailing offset",
         {.bytes = trailing(40), .unreadableFrom = 99},
         "Failed to read meta offset from"},
    };
    for (Case const& c : cases) {
        Found const found = searchIn(c.file);
        EXPECT_THAT(found.places, IsEmpty()) << c.what;
        EXPECT_EQ(found.failure, c.failure) << c.what;
    }
}

} // namespace

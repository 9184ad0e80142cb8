// Hexadecimal digits, lengths, quotes, addresses, digests.
#include "programs/base/digest.h"
#include "programs/base/hex.h"
#include "programs/base/host_port.h"
#include "programs/base/millimetres.h"
#include "programs/base/quoting.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <limits>
#include <optional>
#include <string>
#include <string_view>

namespace {

TEST(Hex, HasTwoDigitsAByteAndAsManyOfANumberAsAreAskedFor) {
    EXPECT_EQ(Base::toHex("\x00\x0F\xFF", 3), "000fff");
    EXPECT_EQ(Base::toHex(nullptr, 0), "");
    EXPECT_EQ(Base::hexNumber(0xBEEF, 8), "0000beef");
    EXPECT_EQ(Base::hexNumber(0x12345, 4), "2345");
}

TEST(Hex, IsReadAsPairsOfLowerCaseDigits) {
    struct {
        std::string_view text;
        std::optional<std::string> bytes;
    } const cases[] = {{"000fff", std::string("\x00\x0F\xFF", 3)},
                       {"9a", "\x9A"},
                       {"", ""},
                       {"0", std::nullopt},
                       {"9A", std::nullopt},
                       {"9g", std::nullopt},
                       {"/9", std::nullopt},
                       {":9", std::nullopt},
                       {"`a", std::nullopt},
                       {" 9", std::nullopt}};
    for (auto const& c : cases)
        EXPECT_EQ(Base::fromHex(c.text), c.bytes) << c.text;
}

TEST(Digest, IsThatOfTheStandard) {
    EXPECT_EQ(Base::sha256("abc"), "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
}

TEST(Quotes, StandAroundAText) { EXPECT_EQ(Base::inQuotes("a b"), "\"a b\""); }

TEST(Millimetres, HaveAsManyDecimalsAsNeeded) {
    struct {
        long long hundredths;
        char const* text;
    } const cases[] = {{0, "0"},
                       {9500, "95"},
                       {9550, "95.5"},
                       {9505, "95.05"},
                       {-1, "-0.01"},
                       {-250, "-2.5"},
                       {std::numeric_limits<long long>::min(), "-92233720368547758.08"}};
    for (auto const& c : cases) {
        EXPECT_EQ(Base::inMillimetres(c.hundredths), c.text);
        EXPECT_EQ(Base::withMillimetres(c.hundredths), c.text + std::string(" mm"));
    }
}

TEST(HostAndPort, AreWrittenAsTheyAreRead) {
    struct {
        char const* host;
        std::uint16_t port;
        char const* text;
    } const cases[] = {{"localhost", 1, "localhost:1"},
                       {"192.0.2.7", 65535, "192.0.2.7:65535"},
                       {"::1", 5000, "[::1]:5000"},
                       {"fe80::1%eth0", 80, "[fe80::1%eth0]:80"}};
    for (auto const& c : cases) {
        EXPECT_EQ(Base::hostPortText(c.host, c.port), c.text);
        auto const read = Base::hostPortIn(c.text);
        ASSERT_TRUE(read) << c.text;
        EXPECT_EQ(read->host, c.host);
        EXPECT_EQ(read->port, c.port);
    }
}

TEST(HostAndPort, AreRefusedWhenOneIsMissingOrNone) {
    for (std::string const text : {"", "localhost", ":80", "localhost:", "localhost:0", "localhost:65536",
                                   "localhost:80x", "localhost:+80", "::1:80", "[]:80", "[::1]", "a b:80",
                                   "a\n:80", "a/b:80", "user@host:80", "h\xC3\xBC:80"})
        EXPECT_FALSE(Base::hostPortIn(text)) << text;
    EXPECT_FALSE(Base::hostPortIn(std::string(256, 'a') + ":80"));
}

TEST(WhyNobodyCanListen, GoesWithWhatToDo) {
    EXPECT_EQ(Base::whyNotListening(EADDRINUSE),
              "Address already in use; end what listens there, or listen elsewhere");
    EXPECT_EQ(Base::whyNotListening(EADDRNOTAVAIL),
              "Cannot assign requested address; name an address of this machine");
    EXPECT_EQ(Base::whyNotListening(EACCES),
              "Permission denied; get the right to, which ports below 1024 want, or listen elsewhere");
    EXPECT_EQ(Base::whyNotListening(ENOENT), "No such file or directory; listen elsewhere");
}

} // namespace

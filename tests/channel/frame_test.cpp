// Frames: what is written, what is read, and what is refused.

#include "programs/base/error.h"
#include "programs/channel/frame.h"
#include "tests/channel/known_texts.h"

#include "tests/support/format_document.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <vector>

using namespace testing;
using namespace std::string_literals;
using Channel::FrameDecoder;
using Channel::Kind;
using ChannelTest::NOT_SEALED;

namespace {

struct Owned {
    int command;
    Kind kind;
    std::uint32_t sequence;
    std::string text;
    friend bool operator==(Owned const&, Owned const&) = default;
};

std::string streamOf(std::vector<Owned> const& messages) {
    std::string bytes = Channel::preface();
    for (Owned const& m : messages)
        Channel::appendFrame(bytes, {static_cast<std::uint8_t>(m.command), m.kind, m.sequence, m.text});
    return bytes;
}

void feed(FrameDecoder& decoder, std::string_view bytes) {
    while (!bytes.empty()) {
        auto const room = decoder.room();
        std::size_t const size = std::min(room.size(), bytes.size());
        std::copy_n(bytes.begin(), size, room.begin());
        decoder.commit(size);
        bytes.remove_prefix(size);
    }
}

std::vector<Owned> takeAll(FrameDecoder& decoder) {
    std::vector<Owned> messages;
    while (auto const frame = decoder.next())
        messages.push_back({frame->command, frame->kind, frame->sequence, std::string(frame->text)});
    return messages;
}

/// Why these bytes are refused; empty when they are not.
std::string refusalOf(std::string_view bytes) {
    FrameDecoder decoder;
    try {
        feed(decoder, bytes);
        takeAll(decoder);
    } catch (Base::Error const& e) {
        return e.what();
    }
    return {};
}

// --- writing

TEST(Frames, BeginWithMagicAndVersion) {
    EXPECT_EQ(Channel::preface(), "VLCH\0\2"s);
    EXPECT_EQ(Channel::preface(1), "VLCH\0\1"s);
    EXPECT_EQ(Channel::versionIn("VLCH\1\2"s), 0x102);
    EXPECT_EQ(Channel::versionIn("VLCH\1"s), std::nullopt);
    EXPECT_EQ(Channel::versionIn("VLCX\0\2"s), std::nullopt);
}

TEST(Frames, AreAHeaderInNetworkOrderAndTheText) {
    std::string bytes;
    Channel::appendFrame(bytes, {25, Kind::Response, 0x01020304, "{}"});
    EXPECT_EQ(bytes, "\x19\x02\x01\x02\x03\x04\x00\x00\x00\x02{}"s);
}

TEST(Frames, AreNotWrittenOverTheLimit) {
    std::string bytes;
    std::string const tooLong(Channel::MAX_TEXT + 1, ' ');
    try {
        Channel::appendFrame(bytes, {1, Kind::Request, 1, tooLong});
        FAIL() << "nothing was thrown";
    } catch (Base::Error const& e) {
        EXPECT_STREQ(e.what(), "A message of 16777217 bytes is over the limit of 16777216.");
    }
    EXPECT_EQ(bytes, "");
}

// --- reading

std::vector<Owned> const THREE = {{25, Kind::Request, 2, R"({"id":"p"})"},
                                  {0, Kind::Error, 0xffffffff, ""},
                                  {255, Kind::Response, 3, "{}"}};

TEST(Frames, ReadBackAsTheyWereWritten) {
    FrameDecoder decoder;
    feed(decoder, streamOf(THREE));
    EXPECT_EQ(takeAll(decoder), THREE);
    EXPECT_FALSE(decoder.isInside());
}

TEST(Frames, ReadTheSameInTwoPiecesCutAnywhere) {
    std::string const bytes = streamOf(THREE);
    for (std::size_t cut = 0; cut <= bytes.size(); ++cut) {
        FrameDecoder decoder;
        feed(decoder, bytes.substr(0, cut));
        auto messages = takeAll(decoder);
        feed(decoder, bytes.substr(cut));
        for (Owned const& message : takeAll(decoder))
            messages.push_back(message);
        EXPECT_EQ(messages, THREE) << "cut at " << cut;
    }
}

TEST(Frames, ReadTheSameByteByByte) {
    FrameDecoder decoder;
    std::vector<Owned> messages;
    for (char const byte : streamOf(THREE)) {
        feed(decoder, std::string(1, byte));
        for (Owned const& message : takeAll(decoder))
            messages.push_back(message);
    }
    EXPECT_EQ(messages, THREE);
}

TEST(Frames, ThatAreTruncatedAnywhereGiveTheMessagesBeforeAndAnUnfinishedOne) {
    std::string const bytes = streamOf(THREE);
    std::vector<std::size_t> ends = {Channel::PREFACE_SIZE};
    for (Owned const& message : THREE)
        ends.push_back(ends.back() + Channel::HEADER_SIZE + message.text.size());
    for (std::size_t length = 0; length < bytes.size(); ++length) {
        FrameDecoder decoder;
        feed(decoder, bytes.substr(0, length));
        auto const complete = static_cast<std::size_t>(
            std::count_if(ends.begin() + 1, ends.end(), [&](std::size_t end) { return end <= length; }));
        EXPECT_EQ(takeAll(decoder).size(), complete) << length;
        bool const isAtAnEnd = length == 0 || std::find(ends.begin(), ends.end(), length) != ends.end();
        EXPECT_EQ(decoder.isInside(), !isAtAnEnd) << length;
    }
}

TEST(Frames, MayBeAsLongAsTheLimit) {
    FrameDecoder decoder;
    std::vector<Owned> const longest = {{1, Kind::Request, 1, std::string(Channel::MAX_TEXT, 'x')}};
    feed(decoder, streamOf(longest));
    EXPECT_EQ(takeAll(decoder), longest);
}

TEST(Frames, AnnounceTheirSize) {
    FrameDecoder decoder;
    std::string const bytes = streamOf({{1, Kind::Request, 1, std::string(100, 'x')}});
    feed(decoder, bytes.substr(0, Channel::PREFACE_SIZE + Channel::HEADER_SIZE - 1));
    EXPECT_EQ(decoder.next(), std::nullopt);
    EXPECT_EQ(decoder.announced(), 0u);
    feed(decoder, bytes.substr(Channel::PREFACE_SIZE + Channel::HEADER_SIZE - 1, 1));
    EXPECT_EQ(decoder.next(), std::nullopt);
    EXPECT_EQ(decoder.announced(), Channel::HEADER_SIZE + 100);
}

TEST(Frames, AllocateNothingForWhatIsOnlyAnnounced) {
    FrameDecoder decoder;
    feed(decoder, streamOf({{1, Kind::Request, 1, std::string(Channel::MAX_TEXT, 'x')}}).substr(0, 100));
    EXPECT_EQ(decoder.next(), std::nullopt);
    EXPECT_LE(decoder.room().size(), 64u * 1024);
}

// --- refusing

struct Refused {
    char const* name;
    std::string bytes;
    char const* reason;
};

constexpr auto OTHER_PROTOCOL = "The first bytes are not those of this protocol.";

class RefusedFrames : public TestWithParam<Refused> {};

TEST_P(RefusedFrames, NameTheReason) { EXPECT_EQ(refusalOf(GetParam().bytes), GetParam().reason); }

INSTANTIATE_TEST_SUITE_P(
    Bytes, RefusedFrames,
    Values(Refused{"FirstByteOfTheMagic", "X", OTHER_PROTOCOL},
           Refused{"LastByteOfTheMagic", "VLCX", OTHER_PROTOCOL},
           Refused{"AWebBrowser", "GET / HTTP/1.1\r\n\r\n", OTHER_PROTOCOL},
           Refused{"ATlsClient", "\x16\x03\x01\x02\x00"s, OTHER_PROTOCOL},
           Refused{"TheNextVersion", "VLCH\0\3"s,
                   "Version 3 of the protocol is not spoken here, only the versions 1 and 2."},
           Refused{"VersionZero", "VLCH\0\0"s,
                   "Version 0 of the protocol is not spoken here, only the versions 1 and 2."},
           Refused{"VersionInTheOtherOrder", "VLCH\1\0"s,
                   "Version 256 of the protocol is not spoken here, only the versions 1 and 2."},
           Refused{"KindZero", "VLCH\0\1\x19\0\0\0\0\2\0\0\0\0"s, "There is no message of kind 0."},
           Refused{"KindFour", "VLCH\0\1\x19\4\0\0\0\2\0\0\0\0"s, "There is no message of kind 4."},
           Refused{"KindFive", "VLCH\0\1\x19\5\0\0\0\2\0\0\0\0"s, "There is no message of kind 5."},
           Refused{"KindSixInTheSecondVersion", "VLCH\0\2\x19\6\0\0\0\2\0\0\0\0"s,
                   "There is no message of kind 6."},
           Refused{"DataOverItsLimit", "VLCH\0\2\x19\4\0\0\0\2\0\x12\1\x17"s,
                   "A message of 1179927 bytes is over the limit of 1179926."},
           Refused{"ATextBehindStored", "VLCH\0\2\x19\5\0\0\0\2\0\0\0\1"s,
                   "A message of 1 bytes is over the limit of 0."},
           Refused{"OneByteOverTheLimit", "VLCH\0\1\x19\1\0\0\0\2\1\0\0\1"s,
                   "A message of 16777217 bytes is over the limit of 16777216."},
           Refused{"TheGreatestLength", "VLCH\0\1\x19\1\0\0\0\2\xff\xff\xff\xff"s,
                   "A message of 4294967295 bytes is over the limit of 16777216."}),
    [](auto const& instance) { return instance.param.name; });

TEST(Frames, KeepToALowerLimit) {
    FrameDecoder decoder;
    decoder.limitText(99);
    feed(decoder, streamOf({{1, Kind::Request, 1, std::string(100, 'x')}}));
    EXPECT_THROW(decoder.next(), Base::Error);
}

// --- sealed

std::string const KEY(32, 'k');

std::string sealed(std::vector<Owned> const& messages) {
    Channel::Seal seal(KEY);
    std::string bytes = Channel::preface();
    for (Owned const& m : messages) {
        std::string message;
        Channel::appendFrame(message, {static_cast<std::uint8_t>(m.command), m.kind, m.sequence, m.text});
        bytes += message + seal.next(message);
    }
    return bytes;
}

struct Read {
    std::vector<Owned> messages;
    std::string refusal;
};

Read readSealed(std::string const& bytes) {
    FrameDecoder decoder;
    decoder.expectSeals(KEY);
    Read read;
    try {
        feed(decoder, bytes);
        while (auto const frame = decoder.next())
            read.messages.push_back({frame->command, frame->kind, frame->sequence, std::string(frame->text)});
    } catch (Base::Error const& e) {
        read.refusal = e.what();
    }
    return read;
}

TEST(SealedFrames, ReadBackAsTheyWereWritten) {
    Read const read = readSealed(sealed(THREE));
    EXPECT_EQ(read.refusal, "");
    EXPECT_EQ(read.messages, THREE);
}

TEST(SealedFrames, AreRefusedWhenAnyBitHasChanged) {
    std::string const good = sealed({{25, Kind::Request, 2, "{}"}});
    for (std::size_t bit = 8 * Channel::PREFACE_SIZE; bit < 8 * good.size(); ++bit) {
        std::string bad = good;
        bad[bit / 8] = static_cast<char>(bad[bit / 8] ^ 1 << bit % 8);
        // A message that has become longer is never there as a whole.
        EXPECT_THAT(readSealed(bad).messages, IsEmpty()) << bit;
    }
}

TEST(SealedFrames, AreRefusedWhenOneIsLeftOutRepeatedOrMoved) {
    Owned const first{24, Kind::Request, 2, "{}"};
    Owned const second{24, Kind::Request, 3, "{}"};
    std::string const both = sealed({first, second});
    std::size_t const size = (both.size() - Channel::PREFACE_SIZE) / 2;
    std::string const a = both.substr(Channel::PREFACE_SIZE, size);
    std::string const b = both.substr(Channel::PREFACE_SIZE + size);
    for (std::string const& bytes : {b, b + a, a + a}) {
        Read const read = readSealed(Channel::preface() + bytes);
        EXPECT_EQ(read.refusal, NOT_SEALED);
        EXPECT_LE(read.messages.size(), 1u);
    }
}

TEST(SealedFrames, CountTheirSealAsPartOfTheirSize) {
    FrameDecoder decoder;
    decoder.expectSeals(KEY);
    feed(decoder,
         sealed({{1, Kind::Request, 1, "{}"}}).substr(0, Channel::PREFACE_SIZE + Channel::HEADER_SIZE));
    EXPECT_EQ(decoder.next(), std::nullopt);
    EXPECT_EQ(decoder.announced(), Channel::HEADER_SIZE + 2 + 32);
}

// --- the description

std::string block(std::string const& name) {
    return VLServiceTest::documentBlock(VLSERVICE_DOCS "/formats-channel.md", "hexdump " + name);
}

TEST(FrameDescription, ShowsARequestBehindThePreface) {
    EXPECT_EQ(block("request"), VLServiceTest::hexDump(streamOf(
                                    {{20, Kind::Request, 2, R"({"db_host":"db","db_name":"packs"})"}})));
}

TEST(FrameDescription, ShowsASealedResponse) {
    std::string response;
    Channel::appendFrame(response, {20, Kind::Response, 2, "{}"});
    EXPECT_EQ(block("sealed"), VLServiceTest::hexDump(response + Channel::Seal(KEY).next(response)));
}

TEST(FrameDescription, ShowsItsAnswers) {
    std::string response;
    Channel::appendFrame(response, {20, Kind::Response, 2, "{}"});
    EXPECT_EQ(block("response"), VLServiceTest::hexDump(response));
    std::string error;
    Channel::appendFrame(error, {20, Kind::Error, 2, R"({"err":"The database is away."})"});
    EXPECT_EQ(block("error"), VLServiceTest::hexDump(error));
}

} // namespace

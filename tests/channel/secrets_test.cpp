// Tokens, proofs, accepted certificates and the files that they lie in.

#include "programs/base/error.h"
#include "programs/base/hex.h"
#include "programs/base/private_file.h"
#include "programs/channel/pin_store.h"
#include "programs/channel/proof.h"
#include "programs/channel/token.h"
#include "tests/channel/known_texts.h"

#include "tests/support/format_document.h"
#include "tests/support/json_literal.h"

#include <gmock/gmock.h>

#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <set>

using namespace testing;
using namespace Channel;
using ChannelTest::plainTerms;
using ChannelTest::TOKEN;
using VLServiceTest::messageOf;
namespace fs = std::filesystem;

namespace {

class PrivateFiles : public Test {
protected:
    fs::path const folder = fs::temp_directory_path() / ("channel_secrets_" + std::to_string(::getpid()));
    std::string const file = (folder / "secret").string();

    PrivateFiles() {
        fs::remove_all(folder);
        fs::create_directory(folder);
    }
    ~PrivateFiles() override { fs::remove_all(folder); }

    void write(std::string const& contents, mode_t mode = 0600) const {
        std::ofstream(file) << contents;
        ::chmod(file.c_str(), mode);
    }
    mode_t mode() const {
        struct stat status {};
        ::stat(file.c_str(), &status);
        return status.st_mode & 07777;
    }
};

// --- files

TEST_F(PrivateFiles, AreRead) {
    for (mode_t const mode : {0600, 0400, 0700}) {
        write("text\n", mode);
        EXPECT_EQ(Base::readPrivateFile(file), "text\n");
    }
}

struct Open {
    mode_t mode;
    char const* text;
};

TEST_F(PrivateFiles, AreRefusedWhenTheyAreOpenToOthersInAnyWay) {
    for (auto const& [mode, text] : {Open{0644, "0644"}, Open{0660, "0660"}, Open{0604, "0604"},
                                     Open{0602, "0602"}, Open{0610, "0610"}, Open{04640, "4640"}}) {
        write("text", mode);
        EXPECT_EQ(messageOf<Base::Error>([&] { Base::readPrivateFile(file); }),
                  "The file \"" + file + "\" is open to others (mode " + text +
                      "); make it private with chmod 600.");
    }
}

TEST_F(PrivateFiles, AreRefusedWhenTheyAreNoFiles) {
    EXPECT_EQ(messageOf<Base::Error>([&] { Base::readPrivateFile(folder.string()); }),
              '"' + folder.string() + "\" is not a file.");
    ::mkfifo(file.c_str(), 0600);
    EXPECT_EQ(messageOf<Base::Error>([&] { Base::readPrivateFile(file); }), '"' + file + "\" is not a file.");
}

TEST_F(PrivateFiles, AreRefusedWhenTheyAreAnotherUsers) {
    write("text");
    if (::chown(file.c_str(), 12345, 12345) != 0)
        GTEST_SKIP() << "There is no right to give files to another user.";
    EXPECT_EQ(messageOf<Base::Error>([&] { Base::readPrivateFile(file); }),
              "The file \"" + file + "\" belongs to another user.");
}

TEST_F(PrivateFiles, MustBeThere) {
    EXPECT_EQ(messageOf<Base::Error>([&] { Base::readPrivateFile(file); }),
              "Cannot open \"" + file + "\": No such file or directory.");
}

TEST_F(PrivateFiles, HaveALimit) {
    write("12345");
    EXPECT_EQ(Base::readPrivateFile(file, 5), "12345");
    EXPECT_EQ(messageOf<Base::Error>([&] { Base::readPrivateFile(file, 4); }),
              "The file \"" + file + "\" is larger than 4 bytes.");
}

TEST_F(PrivateFiles, AreMadePrivateWhateverTheMask) {
    mode_t const before = ::umask(0);
    EXPECT_TRUE(Base::createPrivateFile(file, "text"));
    ::umask(before);
    EXPECT_EQ(mode(), 0600u);
    EXPECT_EQ(Base::readPrivateFile(file), "text");
}

TEST_F(PrivateFiles, AreNotReplaced) {
    write("old");
    EXPECT_FALSE(Base::createPrivateFile(file, "new"));
    EXPECT_EQ(Base::readPrivateFile(file), "old");
    EXPECT_EQ(std::distance(fs::directory_iterator(folder), {}), 1) << "nothing else is left in the folder";
}

TEST_F(PrivateFiles, CannotBeMadeWhereThereIsNoFolder) {
    std::string const lost = (folder / "no" / "secret").string();
    EXPECT_EQ(messageOf<Base::Error>([&] { Base::createPrivateFile(lost, "x"); }),
              "Cannot create \"" + lost + "\": No such file or directory.");
}

TEST_F(PrivateFiles, GrowAtTheirEnd) {
    Base::appendToPrivateFile(file, "a\n");
    Base::appendToPrivateFile(file, "b\n");
    EXPECT_EQ(Base::readPrivateFile(file), "a\nb\n");
    EXPECT_EQ(mode(), 0600u);
    write("a\n", 0644);
    EXPECT_THAT(messageOf<Base::Error>([&] { Base::appendToPrivateFile(file, "b\n"); }),
                HasSubstr("is open to others"));
}

// --- the token

TEST_F(PrivateFiles, HoldATokenWithoutTheWhiteSpaceAroundIt) {
    write("  " + TOKEN + "\r\n");
    EXPECT_EQ(readToken(file), TOKEN);
}

TEST_F(PrivateFiles, HoldNoTokenThatIsShortOrNoWord) {
    std::string const refusal =
        "The file \"" + file + "\" holds no access token, which is one word of at least 32 characters.";
    for (std::string const& contents : {std::string(), std::string("\n"), TOKEN.substr(1),
                                        TOKEN + " " + TOKEN, TOKEN + "\xc3\xa9", std::string(32, '\0')}) {
        write(contents);
        EXPECT_EQ(messageOf<Base::Error>([&] { readToken(file); }), refusal) << contents;
    }
}

TEST_F(PrivateFiles, GetANewTokenWhenThereIsNone) {
    std::string const token = readOrCreateToken(file);
    EXPECT_THAT(token, MatchesRegex("[0-9a-f]{16}\\.[0-9a-f]{64}"));
    EXPECT_EQ(mode(), 0600u);
    EXPECT_EQ(readOrCreateToken(file), token);
    EXPECT_EQ(readToken(file), token);
    fs::remove(file);
    EXPECT_NE(readOrCreateToken(file), token);
}

TEST_F(PrivateFiles, KeepATokenThatOthersCanReadFromBeingUsed) {
    write(TOKEN, 0640);
    EXPECT_THAT(messageOf<Base::Error>([&] { readOrCreateToken(file); }), HasSubstr("is open to others"));
}

// --- proofs

/// A connection without TLS.
TEST(Proofs, AreTheDescribedOnes) {
    std::string const client(64, '0');
    std::string const service(64, 'f');
    Terms const first = plainTerms(1);
    Terms const second = plainTerms(2);
    auto const hex = [](std::string const& key) { return Base::toHex(key.data(), key.size()); };
    EXPECT_EQ(VLServiceTest::documentBlock(VLSERVICE_DOCS "/formats-channel.md", "proofs"),
              "P  = " + makeProof(Side::Service, second, client, service) +
                  "\nQ  = " + makeProof(Side::Client, second, client, service) +
                  "\nKC = " + hex(makeSealKey(Side::Client, second, client, service)) +
                  "\nKS = " + hex(makeSealKey(Side::Service, second, client, service)) + '\n');
    EXPECT_EQ(VLServiceTest::documentBlock(VLSERVICE_DOCS "/formats-channel.md", "proofs 1"),
              "P = " + makeProof(Side::Service, first, client, service) +
                  "\nQ = " + makeProof(Side::Client, first, client, service) + '\n');
    EXPECT_EQ(VLServiceTest::documentBlock(VLSERVICE_DOCS "/formats-channel.md", "proof discovery"),
              makeDiscoveryProof(TOKEN, client, "10.0.0.1", 4711) + '\n');
}

TEST(ProofsByATokenWithAnId, AreTheDescribedOnes) {
    std::string const client(64, '0');
    std::string const service(64, 'f');
    std::string const token = "0123456789abcdef." + std::string(64, 'a');
    Terms byService = plainTerms(2);
    byService.token = keysOf(token).service;
    Terms byDigest = plainTerms(2);
    byDigest.token = keysOf(token).clientDigest;
    EXPECT_EQ(VLServiceTest::documentBlock(VLSERVICE_DOCS "/formats-channel.md", "proofs token"),
              "P  = " + makeProof(Side::Service, byService, client, service) +
                  "\nQ  = " + makeKeyProof(clientKeyOf(token), byDigest, client, service) + '\n');
}

/// The same terms but for one of them, each time another one.
std::vector<Terms> variants(Terms const& terms) {
    std::vector<Terms> all(5, terms);
    all[1].token += 'x';
    all[2].fingerprint = "AA";
    all[3].clientAddress = "127.0.0.1:40001";
    all[4].serviceAddress = "127.0.0.1:4712";
    return all;
}

TEST(Keys, GiveTheCodesOfTheStandardHoweverOftenTheyAreAsked) {
    auto const hexOf = [](std::string const& bytes) { return Base::toHex(bytes.data(), bytes.size()); };
    HmacKey const key("Jefe");
    for (int i = 0; i < 2; ++i)
        EXPECT_EQ(hexOf(key.codeOf("what do ya want for nothing?")),
                  "5bdcc146bf60754e6a042426089575c75a003f089d2739839dec58b964ec3843");
    EXPECT_EQ(key.codeOf(""), hmac("Jefe", ""));
    EXPECT_EQ(hexOf(HmacKey("").codeOf("")),
              "b613679a0814d9ec772f95d778c35fc5ff1697c493715653c6c712144292c5ad");
}

TEST(Proofs, DependOnEverythingThatTheyProve) {
    std::vector<std::string> proofs;
    for (Terms const& terms : variants(plainTerms(2)))
        for (Side const side : {Side::Client, Side::Service})
            for (auto const& [c, s] : {std::pair("c", "s"), std::pair("d", "s"), std::pair("c", "t"),
                                       std::pair("cs", ""), std::pair("", "cs")}) {
                proofs.push_back(makeProof(side, terms, c, s));
                proofs.push_back(makeSealKey(side, terms, c, s));
            }
    proofs.push_back(makeDiscoveryProof(TOKEN, "c", "s", 1));
    EXPECT_EQ(std::set(proofs.begin(), proofs.end()).size(), proofs.size());
}

TEST(Proofs, OfOneVersionDoNotServeInTheOther) {
    for (Side const side : {Side::Client, Side::Service})
        for (Side const other : {Side::Client, Side::Service})
            EXPECT_NE(makeProof(side, plainTerms(1), "c", "s"), makeProof(other, plainTerms(2), "c", "s"));
}

TEST(Proofs, DifferInLengthOrInAnyCharacter) {
    EXPECT_TRUE(isSameProof("abc", "abc"));
    EXPECT_FALSE(isSameProof("abc", "ab"));
    EXPECT_FALSE(isSameProof("abc", "abd"));
    EXPECT_FALSE(isSameProof("abc", "xbc"));
}

TEST(Proofs, ThatAreEmptyProveNothing) { EXPECT_FALSE(isSameProof("", "")); }

TEST(Nonces, AreNewEachTime) {
    EXPECT_THAT(makeNonce(), MatchesRegex("[0-9a-f]{64}"));
    EXPECT_NE(makeNonce(), makeNonce());
}

// --- accepted certificates

/// 32 times the same two digits.
std::string fingerprintOf(std::string const& digits) {
    std::string text = digits;
    for (int i = 1; i < 32; ++i)
        text += ':' + digits;
    return text;
}

TEST_F(PrivateFiles, KeepAcceptedCertificatesByService) {
    PinStore const pins(file);
    EXPECT_EQ(pins.find("a:1"), std::nullopt);
    pins.add("a:1", fingerprintOf("AB"));
    pins.add("b:1", fingerprintOf("CD"));
    EXPECT_EQ(pins.find("a:1"), fingerprintOf("AB"));
    EXPECT_EQ(pins.find("b:1"), fingerprintOf("CD"));
    EXPECT_EQ(pins.find("a:11"), std::nullopt);
    EXPECT_EQ(pins.find(":1"), std::nullopt);
    EXPECT_EQ(mode(), 0600u);
    EXPECT_EQ(Base::readPrivateFile(file),
              "a:1 " + fingerprintOf("AB") + "\nb:1 " + fingerprintOf("CD") + '\n');
}

TEST_F(PrivateFiles, LetLinesBeAddedAndRemovedByHand) {
    write("\n# of the office\nhalf\n  a:1\t " + fingerprintOf("AB") + "  rest\nb:1 " + fingerprintOf("CD"));
    EXPECT_EQ(PinStore(file).find("a:1"), fingerprintOf("AB"));
    EXPECT_EQ(PinStore(file).find("b:1"), fingerprintOf("CD"));
    EXPECT_EQ(PinStore(file).find("half"), std::nullopt);
    PinStore(file).add("c:1", fingerprintOf("EF"));
    EXPECT_EQ(PinStore(file).find("b:1"), fingerprintOf("CD"));
    EXPECT_EQ(PinStore(file).find("c:1"), fingerprintOf("EF"));
}

TEST_F(PrivateFiles, PassOverALineThatAFullDiskHasCutAnywhere) {
    std::string const line = "a:1 " + fingerprintOf("AB");
    for (std::size_t length = 0; length < line.size(); ++length) {
        write(line.substr(0, length));
        EXPECT_EQ(PinStore(file).find("a:1"), std::nullopt) << length;
        PinStore(file).add("a:1", fingerprintOf("CD"));
        EXPECT_EQ(PinStore(file).find("a:1"), fingerprintOf("CD")) << length;
    }
}

TEST_F(PrivateFiles, KeepNoCertificatesThatOthersCouldHaveWritten) {
    write("a:1 AA:BB\n", 0666);
    EXPECT_THAT(messageOf<Base::Error>([&] { PinStore(file).find("a:1"); }), HasSubstr("is open to others"));
}

} // namespace

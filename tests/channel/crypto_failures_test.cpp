// What becomes of a greeting when the crypto library runs out of memory: nobody is let in by that.

#include "tests/channel/test_certificate.h"

#include "programs/base/error.h"
#include "programs/channel/greeting.h"
#include "programs/channel/stream.h"
#include "tests/channel/known_texts.h"

#include <gmock/gmock.h>

#include <openssl/crypto.h>

#include <unistd.h>

#include <cstdlib>
#include <filesystem>

using namespace testing;
using namespace Channel;
using ChannelTest::TOKEN;
using Verdict = GreetingStep::Verdict;
namespace fs = std::filesystem;

namespace {

/// Of this thread: how many allocations still succeed; below zero all do.
thread_local int granted = -1;
thread_local bool hasFailed = false;
bool isWatching = false;

bool mayAllocate() {
    if (granted == 0)
        hasFailed = true;
    return granted != 0 && (granted < 0 || granted-- > 0);
}

void* allocate(std::size_t size, char const*, int) { return mayAllocate() ? std::malloc(size) : nullptr; }
void* reallocate(void* block, std::size_t size, char const*, int) {
    return mayAllocate() ? std::realloc(block, size) : nullptr;
}
void release(void* block, char const*, int) { std::free(block); }

/// Only before the library's first allocation, which is before the first constructor of a global.
__attribute__((constructor(101))) void watchTheLibrary() {
    isWatching = CRYPTO_set_mem_functions(allocate, reallocate, release) == 1;
}

/// Does something with the first allocation failing, then with the second one, until none is left to fail;
/// and tells how many there were.
template<typename Work>
int withEachAllocationFailing(Work work) {
    for (int n = 0;; ++n) {
        granted = n;
        hasFailed = false;
        work();
        granted = -1;
        if (!hasFailed)
            return n;
    }
}

Terms const TERMS{VERSION, TOKEN, "", "127.0.0.1:40000", "127.0.0.1:4711"};
Terms const OLD_TERMS{VERSION_1, TOKEN, "", "", ""};
std::string const NONCE_TEXT(64, '0');

class CryptoFailures : public Test {
protected:
    /// Its very first steps the library does not survive without memory.
    CryptoFailures() { hmac("key", "message"); }
};

TEST_F(CryptoFailures, AreWatched) {
    ASSERT_TRUE(isWatching);
    int const allocations = withEachAllocationFailing([] {
        try {
            hmac("key", "message");
        } catch (Base::Error const&) {
        }
    });
    EXPECT_GT(allocations, 0);
}

TEST_F(CryptoFailures, AreToldWhenAProofIsComputed) {
    std::string const proof = makeProof(Side::Client, TERMS, "c", "s");
    withEachAllocationFailing([&] {
        try {
            EXPECT_EQ(makeProof(Side::Client, TERMS, "c", "s"), proof);
        } catch (Base::Error const& failure) {
            EXPECT_STREQ(failure.what(), "The crypto library cannot compute a proof.");
        }
    });
}

TEST_F(CryptoFailures, LeaveAKeyAsItWas) {
    HmacKey const key("key");
    std::string const code = key.codeOf("message");
    withEachAllocationFailing([&] {
        try {
            EXPECT_EQ(key.codeOf("message"), code);
        } catch (Base::Error const& failure) {
            EXPECT_STREQ(failure.what(), "The crypto library cannot compute a proof.");
        }
    });
    EXPECT_EQ(key.codeOf("message"), code);
}

TEST_F(CryptoFailures, LetNoStrangerInAtTheService) {
    for (Terms const& terms : {TERMS, OLD_TERMS}) {
        int welcomes = 0;
        withEachAllocationFailing([&] {
            ServiceGreeting service(terms, NONCE_TEXT);
            service.take({GREETING, Kind::Request, CHALLENGE, R"({"nonce":"n"})"});
            auto const step = service.take({GREETING, Kind::Request, PROVING, R"({"proof":""})"});
            welcomes += step.verdict == Verdict::Welcome;
        });
        EXPECT_EQ(welcomes, 0);
    }
}

TEST_F(CryptoFailures, LetAClientTrustNoStranger) {
    for (Terms const& terms : {TERMS, OLD_TERMS}) {
        int proofs = 0;
        withEachAllocationFailing([&] {
            ClientGreeting client(terms, NONCE_TEXT);
            auto const step =
                client.take({GREETING, Kind::Response, CHALLENGE, R"({"nonce":"n","proof":""})"});
            proofs += step.verdict != Verdict::Refused;
        });
        EXPECT_EQ(proofs, 0);
    }
}

TEST_F(CryptoFailures, GiveNoEmptyFingerprint) {
    fs::path const folder = fs::temp_directory_path() / ("channel_crypto_" + std::to_string(::getpid()));
    fs::create_directory(folder);
    auto const files = ChannelTest::makeCertificate(folder.string(), "service");
    auto const context = makeServiceContext(files.certificateFile, files.keyFile);
    fs::remove_all(folder);
    std::string const fingerprint = fingerprintOf(*context);
    int const allocations = withEachAllocationFailing([&] {
        try {
            EXPECT_EQ(fingerprintOf(*context), fingerprint);
        } catch (Base::Error const& failure) {
            EXPECT_STREQ(failure.what(), "The fingerprint of the certificate cannot be computed.");
        }
    });
    EXPECT_GT(allocations, 0);
}

} // namespace

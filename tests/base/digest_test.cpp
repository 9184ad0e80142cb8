#include "programs/base/digest.h"

#include <gmock/gmock.h>

#include <openssl/crypto.h>

#include <cstdlib>
#include <new>

namespace {

/// How many allocations of the crypto library succeed; below zero all do.
long granted = -1;

bool mayAllocate() { return granted < 0 || granted-- > 0; }
void* allocate(std::size_t size, char const*, int) { return mayAllocate() ? std::malloc(size) : nullptr; }
void* reallocate(void* block, std::size_t size, char const*, int) {
    return mayAllocate() ? std::realloc(block, size) : nullptr;
}
void release(void* block, char const*, int) { std::free(block); }

[[noreturn]] void digestGranted(long allocations) {
    if (CRYPTO_set_mem_functions(allocate, reallocate, release) != 1)
        std::_Exit(2);
    granted = allocations;
    try {
        Base::sha256("text");
    } catch (std::exception const&) {
        std::_Exit(1);
    }
    std::_Exit(0);
}

bool endsInOrder(int status) { return WIFEXITED(status) && WEXITSTATUS(status) < 2; }

TEST(Digest, IsThatOfTheStandard) {
    EXPECT_EQ(Base::sha256("abc"), "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
}

TEST(Digest, IsTheSameOfPiecesAndOfTheWhole) {
    Base::Sha256 pieces;
    for (char const* const piece : {"a", "", "bc"})
        pieces.add(piece);
    EXPECT_EQ(pieces.digest(), Base::sha256("abc"));
    EXPECT_EQ(Base::Sha256().digest(), Base::sha256(""));
}

TEST(Digest, FailsWhenTheCryptoLibraryFindsNoMemoryToBeginWith) {
    // The library begins once: each number of allocations wants a process of its own.
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    for (long allocations = 0; allocations < 60; allocations += 3)
        EXPECT_EXIT(digestGranted(allocations), endsInOrder, "") << allocations;
}

} // namespace

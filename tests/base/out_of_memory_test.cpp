#include "programs/base/out_of_memory.h"

#include "programs/base/pending_file.h"
#include "tests/support/sanitized.h"
#include "tests/support/temporary_folder.h"

#include <gmock/gmock.h>

#include <csignal>
#include <cstdlib>
#include <list>
#include <new>
#include <stdexcept>
#include <sys/resource.h>
#include <vector>

namespace {

namespace fs = std::filesystem;
using testing::ExitedWithCode;

constexpr char const* LINE = "program: there is not enough memory; close others\n";

template<typename Failure>
void fail(Failure const& failure) {
    throw failure;
}

class WithoutMemory : public testing::Test {
protected:
    void SetUp() override {
        if (VLServiceTest::SANITIZED)
            GTEST_SKIP() << "a sanitizer needs the memory that is taken away";
    }

    /// Takes all that the process may have in pieces that become smaller, as it does when it is used up.
    static void takeAll() {
        rlimit const limit{std::size_t{1} << 28, std::size_t{1} << 28};
        ::setrlimit(RLIMIT_AS, &limit);
        static std::list<std::vector<char>> taken;
        for (;;)
            taken.emplace_back(1000);
    }
};

TEST_F(WithoutMemory, AProgramEndsWithItsLineAndAStatus) {
    EXPECT_EXIT(
        {
            Base::endWhenOutOfMemory(LINE);
            takeAll();
        },
        ExitedWithCode(1), "^program: there is not enough memory; close others\n$");
}

TEST_F(WithoutMemory, AProgramEndsAlsoWhereNothingMayBeThrown) {
    EXPECT_EXIT(
        {
            Base::endWhenOutOfMemory(LINE);
            []() noexcept { takeAll(); }();
        },
        ExitedWithCode(1), "^program: ");
}

TEST_F(WithoutMemory, AProgramEndsAlsoWhenOneRequestFailsWhereNothingMayBeThrown) {
    EXPECT_EXIT(
        {
            Base::endWhenOutOfMemory(LINE);
            []() noexcept { fail(std::bad_alloc()); }();
        },
        ExitedWithCode(1), "^program: there is not enough memory; close others\n$");
}

TEST_F(WithoutMemory, OtherFailuresWhereNothingMayBeThrownAreToldAsEver) {
    EXPECT_EXIT(
        {
            Base::endWhenOutOfMemory(LINE);
            []() noexcept { fail(std::runtime_error("something else")); }();
        },
        testing::KilledBySignal(SIGABRT), "something else");
}

TEST_F(WithoutMemory, NothingThatWasPendingIsLeft) {
    TemporaryFolder const folder;
    EXPECT_EXIT(
        {
            Base::removePendingFilesOnSignals();
            Base::endWhenOutOfMemory(LINE);
            Base::PendingFile const pending(folder / "a.mailing");
            takeAll();
        },
        ExitedWithCode(1), "^program: ");
    EXPECT_TRUE(fs::is_empty(folder / "."));
}

TEST_F(WithoutMemory, OneRequestThatIsTooLargeIsNoEnd) {
    EXPECT_EXIT(
        {
            Base::endWhenOutOfMemory(LINE);
            try {
                std::vector<char> const huge(std::size_t{1} << 60);
            } catch (std::bad_alloc const&) {
                std::_Exit(7);
            }
        },
        ExitedWithCode(7), "^$");
}

} // namespace

#include "programs/base/error.h"
#include "tests/base/late/late_sample.h"

#include <dlfcn.h>
#include <gmock/gmock.h>

#include <atomic>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace {

using testing::AllOf;
using testing::EndsWith;
using testing::HasSubstr;

bool isLoaded(char const* library) {
    void* const handle = ::dlopen(library, RTLD_LAZY | RTLD_NOLOAD);
    if (handle)
        ::dlclose(handle);
    return handle != nullptr;
}

// In a process of its own: other tests call the library too.
TEST(LateCalls, BringTheLibraryInWithTheFirstOfThem) {
    auto const look = [] {
        bool const before = isLoaded(LATE_SAMPLE_NAME);
        LateSample::touch();
        std::exit(!before && isLoaded(LATE_SAMPLE_NAME) ? 0 : 1);
    };
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(look(), testing::ExitedWithCode(0), "");
}

TEST(LateCalls, HandOverWhatStandsInRegistersAndOnTheStack) {
    for (int call = 0; call < 2; ++call) {
        EXPECT_THAT(LateSample::rowOf(1, 2, 3, 4, 5, 6, 7, 8, 9).numbers,
                    testing::ElementsAre(1, 2, 3, 4, 5, 6, 7, 8, 9));
        EXPECT_EQ(LateSample::weighed(1, 2, 3, 4, 5, 6, 7, 8, 9, 2), 2 * 987654321.0);
        EXPECT_EQ(LateSample::written("%s %d %.1f %ld", "one", 2, 3.5, 4L), "one 2 3.5 4");
    }
}

TEST(LateCalls, LetOutWhatTheFunctionThrows) {
    for (std::string const words : {"at the first call", "at the second"})
        try {
            LateSample::refuse(words);
            FAIL() << "nothing was thrown";
        } catch (std::out_of_range const& refusal) {
            EXPECT_EQ(refusal.what(), words);
        }
}

TEST(LateCalls, ComeFromManyThreadsAtOnce) {
    std::atomic<int> sum = 0;
    std::vector<std::thread> threads;
    for (int i = 1; i <= 8; ++i)
        threads.emplace_back([&sum, i] { sum += LateSample::twice(i); });
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(sum, 72);
}

TEST(LateCalls, FailWithALineWhereTheLibraryIsNotThere) {
    for (int call = 0; call < 2; ++call)
        try {
            LateNowhere::anything();
            FAIL() << "nothing was thrown";
        } catch (Base::Error const& failure) {
            EXPECT_EQ(failure.code(), Base::Code::ProgramLimited);
            EXPECT_THAT(failure.what(),
                        AllOf(HasSubstr("a library of the program cannot be loaded: liblate_nowhere.so.0: "),
                              EndsWith("; install the package of the program again")));
        }
}

} // namespace

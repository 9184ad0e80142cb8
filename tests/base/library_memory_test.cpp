// What libraries do that do not get the memory that they ask for.
#include "programs/base/library_memory.h"

#include "programs/patterns/pattern.h"
#include "vlservice/json/json_text.h"

#include <gmock/gmock.h>

#include <cstdlib>
#include <functional>
#include <ostream>
#include <sstream>

#include <sys/wait.h>
#include <unicode/uclean.h>
#include <unistd.h>

namespace {

enum class Refused { Once, FromThenOn };

long callsLeft = 0;
Refused refused = Refused::Once;

bool isRefused() {
    if (callsLeft > 0)
        return --callsLeft == 0;
    return refused == Refused::FromThenOn;
}

void* allocateOrNot(std::size_t size) { return isRefused() ? nullptr : std::malloc(size); }
void* reallocateOrNot(void* block, std::size_t size) {
    return isRefused() ? nullptr : std::realloc(block, size);
}

struct Use {
    std::string name;
    /// Whether it came out as it should.
    std::function<bool()> run;
};

void PrintTo(Use const& use, std::ostream* out) { *out << use.name; }

bool compilesAndMatches() {
    return Patterns::Pattern("[[:alpha:]]+[a-z\u00E4]", Patterns::Pattern::Use::Name).fits("AB\u00C4") ==
           Patterns::Pattern::Answer::Yes;
}

bool writesAndReads() {
    json::Array list;
    list.append(1);
    list.append("two");
    std::string const text = json::toText(json::Object{{"a", 1}, {"b", 2.5}, {"c", "text"}, {"d", list}});
    return text == R"({"a":1,"b":2.5,"c":"text","d":[1,"two"]})" &&
           json::toText(json::strToObject(text.data(), text.size())) == text;
}

constexpr int NONE_REFUSED = 7;
constexpr int OTHER_RESULT = 8;
constexpr unsigned SECONDS = 30;

[[noreturn]] void runWith(Use const& use, long refusedCall, Refused which) {
    u_cleanup();
    // A library may wait for itself, for ever.
    ::alarm(SECONDS);
    callsLeft = refusedCall;
    refused = which;
    Base::holdLibraryMemory({&allocateOrNot, &reallocateOrNot});
    bool const isRight = use.run();
    ::_exit(!isRight ? OTHER_RESULT : callsLeft > 0 ? NONE_REFUSED : EXIT_SUCCESS);
}

/// How a process ends in which that call finds nothing: its status, or less than nothing for a signal.
int endWith(Use const& use, long refusedCall, Refused which) {
    pid_t const process = ::fork();
    if (process == 0)
        runWith(use, refusedCall, which);
    int status = 0;
    ::waitpid(process, &status, 0);
    return WIFSIGNALED(status) ? -WTERMSIG(status) : WEXITSTATUS(status);
}

class LibrariesWithoutMemory : public testing::TestWithParam<Use> {
protected:
    /// Tries each call until there is none left.
    static void expectEnd(int expected, Refused which) {
        long call = 1;
        for (int end = 0; !HasFailure(); ++call) {
            end = endWith(GetParam(), call, which);
            if (end == NONE_REFUSED)
                break;
            EXPECT_EQ(end, expected) << "call " << call;
        }
        EXPECT_GT(call, 10);
    }
};

TEST_P(LibrariesWithoutMemory, GoOnWhenAPieceIsThereAtTheSecondTry) {
    expectEnd(EXIT_SUCCESS, Refused::Once);
}

TEST_P(LibrariesWithoutMemory, EndTheProgramWhenThereIsNoneLeft) {
    expectEnd(EXIT_FAILURE, Refused::FromThenOn);
}

INSTANTIATE_TEST_SUITE_P(Of, LibrariesWithoutMemory,
                         testing::Values(Use{"patterns", &compilesAndMatches}, Use{"json", &writesAndReads}),
                         [](auto const& each) { return each.param.name; });

} // namespace

#include "tests/pack/container_fixture.h"
#include "vlservice/pack/page_loader.h"

#include <gmock/gmock.h>

#include <functional>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

using testing::ElementsAre;

/// Lets the test play the part of the derived class.
class Loader : public PageLoaderI {
public:
    using PageLoaderI::afterExecutedFunc;
    using PageLoaderI::callPgFunc;
    using PageLoaderI::chkCallDone;
    using PageLoaderI::findFuncToExec;
    using PageLoaderI::PageLoaderI;

    void done() override { events.push_back("done"); }

    void request(std::string const& document, std::string const& page, std::string const& name) {
        requestPageData(document, page,
                        [this, name](SharedMemBuffer data) { events.push_back(name + ":" + textOf(data)); });
    }
    void arrive(std::string const& document, std::string const& page, std::string const& data = "") {
        callPgFunc(document, page, bufferOf(data));
    }

    std::vector<std::string> events;
};

TEST(PageLoading, KeepsTheMailingsId) {
    EXPECT_EQ(Loader("m1").packId(), "m1");
    EXPECT_EQ(Loader(std::string()).packId(), "");
}

TEST(PageLoading, AnswersNothingOnRequest) {
    Loader loader("m1");
    EXPECT_TRUE(loader.nothingPening());
    loader.request("a.pdf", "1", "f");
    EXPECT_FALSE(loader.nothingPening());
    EXPECT_TRUE(loader.events.empty());
}

TEST(PageLoading, RunsDoneBehindTheLastCallback) {
    Loader loader("m1");
    loader.request("a.pdf", "1", "f");
    loader.request("a.pdf", "2", "g");
    loader.request("b.pdf", "1", "h");
    loader.arrive("a.pdf", "2", "x");
    loader.arrive("b.pdf", "1", "y");
    EXPECT_THAT(loader.events, ElementsAre("g:x", "h:y"));
    loader.arrive("a.pdf", "1", "z");
    EXPECT_THAT(loader.events, ElementsAre("g:x", "h:y", "f:z", "done"));
    EXPECT_TRUE(loader.nothingPening());
}

TEST(PageLoading, RunsDoneEachTimeTheRequestsAreUsedUp) {
    Loader loader("m1");
    for (int i = 0; i < 2; ++i) {
        loader.request("a.pdf", "1", "f");
        loader.arrive("a.pdf", "1");
    }
    EXPECT_THAT(loader.events, ElementsAre("f:", "done", "f:", "done"));
}

TEST(PageLoading, AnswersOneRequestAnArrivalTheOldestFirst) {
    Loader loader("m1");
    std::vector<std::string> expected;
    for (int i = 0; i < 20; ++i) {
        loader.request("a.pdf", "1", std::to_string(i));
        expected.push_back(std::to_string(i) + ":");
    }
    expected.push_back("done");
    for (int i = 0; i < 20; ++i) {
        EXPECT_FALSE(loader.nothingPening());
        loader.arrive("a.pdf", "1");
    }
    EXPECT_EQ(loader.events, expected);
}

TEST(PageLoading, ClaimsARequestWhileItsCallbackRuns) {
    Loader loader("m1");
    bool pendingInside = false;
    loader.requestPageData("a.pdf", "1", [&](SharedMemBuffer) { pendingInside = !loader.nothingPening(); });
    loader.arrive("a.pdf", "1");
    EXPECT_TRUE(pendingInside);
    EXPECT_TRUE(loader.nothingPening());
}

TEST(PageLoading, PicksTheNextRequestInANestedCall) {
    Loader loader("m1");
    loader.requestPageData("a.pdf", "1", [&](SharedMemBuffer) {
        loader.events.push_back("outer begins");
        loader.arrive("a.pdf", "1");
        loader.events.push_back("outer ends");
    });
    loader.request("a.pdf", "1", "inner");
    loader.arrive("a.pdf", "1");
    EXPECT_THAT(loader.events, ElementsAre("outer begins", "inner:", "outer ends", "done"));
}

TEST(PageLoading, TakesRequestsFromACallback) {
    Loader loader("m1");
    loader.requestPageData("a.pdf", "1", [&](SharedMemBuffer) { loader.request("a.pdf", "1", "again"); });
    loader.arrive("a.pdf", "1");
    EXPECT_TRUE(loader.events.empty());
    loader.arrive("a.pdf", "1");
    EXPECT_THAT(loader.events, ElementsAre("again:", "done"));
}

TEST(PageLoading, RefusesAnArrivalThatNobodyWaitsFor) {
    Loader loader("m1");
    EXPECT_THROW(loader.arrive("a.pdf", "1"), std::bad_function_call);
    loader.request("a.pdf", "1", "f");
    EXPECT_THROW(loader.arrive("a.pdf", "2"), std::bad_function_call);
    EXPECT_THROW(loader.arrive("b.pdf", "1"), std::bad_function_call);
    EXPECT_TRUE(loader.events.empty());
    EXPECT_FALSE(loader.nothingPening());
}

TEST(PageLoading, RefusesAnArrivalWhoseRequestsAreAllClaimed) {
    Loader loader("m1");
    loader.requestPageData("a.pdf", "1", [&](SharedMemBuffer) { loader.arrive("a.pdf", "1"); });
    EXPECT_THROW(loader.arrive("a.pdf", "1"), std::bad_function_call);
    EXPECT_TRUE(loader.nothingPening());
}

TEST(PageLoading, LetsACallbacksExceptionThroughAndForgetsTheRequest) {
    Loader loader("m1");
    loader.requestPageData("a.pdf", "1", [](SharedMemBuffer) { throw std::runtime_error("disk"); });
    loader.request("a.pdf", "1", "second");
    EXPECT_THROW(loader.arrive("a.pdf", "1"), std::runtime_error);
    loader.arrive("a.pdf", "1");
    EXPECT_THAT(loader.events, ElementsAre("second:", "done"));
}

TEST(PageLoading, MayBeDeletedByDone) {
    struct Suicidal : Loader {
        explicit Suicidal(std::vector<std::string>& seen) : Loader("m1"), seen_(seen) {}
        ~Suicidal() override { seen_ = events; }
        void done() override { delete this; }
        std::vector<std::string>& seen_;
    };
    std::vector<std::string> seen;
    auto* const loader = new Suicidal(seen);
    loader->request("a.pdf", "1", "f");
    loader->arrive("a.pdf", "1", "page");
    EXPECT_THAT(seen, ElementsAre("f:page"));
}

TEST(PageLoading, CopiesTakeTheRequestsAlong) {
    Loader loader("m1");
    int answered = 0;
    loader.requestPageData("a.pdf", "1", [&](SharedMemBuffer) { ++answered; });
    Loader copy = loader;
    Loader assigned("m2");
    assigned = loader;
    EXPECT_EQ(copy.packId(), "m1");
    EXPECT_EQ(assigned.packId(), "m1");
    for (Loader* each : {&loader, &copy, &assigned}) {
        EXPECT_FALSE(each->nothingPening());
        each->arrive("a.pdf", "1");
    }
    EXPECT_EQ(answered, 3);
}

TEST(PageLoading, HandsTheFunctionOutOnce) {
    Loader loader("m1");
    loader.request("a.pdf", "1", "f");
    EXPECT_TRUE(loader.findFuncToExec("a.pdf", "1"));
    EXPECT_FALSE(loader.findFuncToExec("a.pdf", "1"));
    EXPECT_FALSE(loader.nothingPening());
    loader.afterExecutedFunc("a.pdf", "1");
    EXPECT_THAT(loader.events, ElementsAre("done"));
}

TEST(PageLoading, ErasesOnlyClaimedRequests) {
    Loader loader("m1");
    loader.request("a.pdf", "1", "f");
    loader.afterExecutedFunc("a.pdf", "1");
    loader.afterExecutedFunc("a.pdf", "2");
    loader.afterExecutedFunc("b.pdf", "1");
    EXPECT_FALSE(loader.nothingPening());
    EXPECT_TRUE(loader.events.empty());
}

TEST(PageLoading, AsksTheVirtualOperationsWhetherItIsDone) {
    struct NeverDone : Loader {
        using Loader::Loader;
        bool nothingPening() const override { return false; }
    };
    NeverDone loader("m1");
    loader.chkCallDone();
    EXPECT_TRUE(loader.events.empty());
    Loader idle("m1");
    idle.chkCallDone();
    EXPECT_THAT(idle.events, ElementsAre("done"));
}

} // namespace

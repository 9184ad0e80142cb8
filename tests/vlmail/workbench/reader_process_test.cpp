#include "programs/vlmail/workbench/reader_process.h"

#include <utility>

#include <boost/asio/io_context.hpp>

#include <cstdlib>
#include <gmock/gmock.h>
#include <map>
#include <memory>
#include <string>
#include <unistd.h>
#include <vector>

namespace {

using namespace VlMail::Workbench;
using testing::ElementsAre;
using testing::HasSubstr;

/// Does what its jobs are named after.
Answer perform(std::string const& name, std::string const& query) {
    static int count = 0;
    ++count;
    if (name == "die")
        std::abort();
    while (name == "spin" && query == "a") {
    }
    std::string const hoard = name == "hoard" ? std::string(std::size_t{64} << 20, 'x') : "";
    while (!hoard.empty()) {
    }
    return {200, "text/plain", query + ' ' + std::to_string(count)};
}

class AReaderProcess : public testing::Test {
protected:
    void ask(std::string const& name, std::string const& query, bool isReplaceable = false) {
        process_->ask({name, query, "letter.pdf", isReplaceable}, [this, query](Answer const& answer) {
            answers_.push_back(query + ": " + std::to_string(answer.status));
            bodies_[query] = answer.body;
        });
    }
    void run(VlMail::JobLimits const& limits = {}) {
        process_ = std::make_unique<ReaderProcess>(io_, limits, perform);
    }
    /// Until that many answers are there.
    void await(std::size_t count) {
        while (answers_.size() < count)
            io_.run_one();
    }

    std::vector<std::string> answers_;
    std::map<std::string, std::string> bodies_;

private:
    boost::asio::io_context io_{1};
    std::unique_ptr<ReaderProcess> process_;
};

TEST_F(AReaderProcess, KeepsWhatItHasFromOneJobToTheNext) {
    run();
    ask("say", "a");
    ask("say", "b");
    await(2);
    EXPECT_EQ(bodies_["a"], "a 1");
    EXPECT_EQ(bodies_["b"], "b 2");
}

TEST_F(AReaderProcess, IsBegunAnewWhenAJobBringsItDown) {
    run();
    ask("die", "a");
    ask("say", "b");
    await(2);
    EXPECT_THAT(answers_, ElementsAre("a: 422", "b: 200"));
    EXPECT_EQ(bodies_["a"],
              "{\"error\":{\"code\":\"limit-exceeded\",\"line\":\"cannot read \\\"letter.pdf\\\": the "
              "reader broke down over it; the document is damaged, print it to a new PDF\"}}\n");
    EXPECT_EQ(bodies_["b"], "b 1");
}

TEST_F(AReaderProcess, EndsAJobThatTakesTooLong) {
    run({std::chrono::milliseconds(20), std::uint64_t{1} << 30});
    ask("spin", "a");
    await(1);
    EXPECT_THAT(bodies_["a"], HasSubstr("it took more than 0.020 s of processor time"));
}

TEST_F(AReaderProcess, EndsAJobThatTakesTooMuchMemory) {
    run({std::chrono::seconds(30), std::uint64_t{16} << 20});
    ask("hoard", "a");
    await(1);
    EXPECT_THAT(bodies_["a"], HasSubstr("it took more than 16 MiB of memory"));
}

TEST_F(AReaderProcess, DoesTheNewestOfWhatReplacesEachOther) {
    run();
    for (char const* const query : {"a", "b", "c"})
        ask("say", query, true);
    await(3);
    // The first is being done when the next comes.
    EXPECT_THAT(answers_, ElementsAre("a: 409", "b: 409", "c: 200"));
    EXPECT_EQ(bodies_["c"], "c 2");
}

TEST_F(AReaderProcess, DoesNotWaitLongForAJobThatIsReplaced) {
    run();
    ask("spin", "a", true);
    ask("spin", "b", true);
    EXPECT_THAT(answers_, ElementsAre("a: 409"));
    await(2);
    EXPECT_EQ(bodies_["b"], "b 1");
}

TEST_F(AReaderProcess, PutsWhatIsReplaceableInFrontOfWhatIsNot) {
    run();
    ask("say", "a");
    ask("say", "b");
    ask("evaluate", "c", true);
    await(3);
    EXPECT_THAT(answers_, ElementsAre("a: 200", "c: 200", "b: 200"));
}

} // namespace

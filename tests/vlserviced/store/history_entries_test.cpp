#include "programs/vlserviced/store/history.h"
#include "tests/vlserviced/store_database.h"

#include <gmock/gmock.h>

#include <stdexcept>

namespace {

using testing::ElementsAre;
using VlServiced::History;

class HistoryEntriesTest : public VLServiceTest::OnEachDatabase {
protected:
    void note(std::string const& who, std::string const& node, std::string const& what) {
        History::Person const acting(history_, who);
        history_.note(node, what, "was " + what, "is " + what);
    }
    std::vector<std::string> of(std::string const& node, long long limit = 100) const {
        std::vector<std::string> told;
        for (Protocol::HistoryEntry const& entry : history_.of(node, limit))
            told.push_back(entry.who + ": " + entry.what);
        return told;
    }

    long long now_ = 1000;
    History history_{*database_, [this] { return now_; }};
};

TEST_P(HistoryEntriesTest, SayWhoChangedWhatAndWhen) {
    note("ann", "a=acme", "settings po");
    std::vector<Protocol::HistoryEntry> const entries = history_.of("a=acme", 10);
    ASSERT_EQ(entries.size(), 1u);
    EXPECT_EQ(entries[0].at, 1000);
    EXPECT_EQ(entries[0].who, "ann");
    EXPECT_EQ(entries[0].id, "a=acme");
    EXPECT_EQ(entries[0].was, "was settings po");
    EXPECT_EQ(entries[0].is, "is settings po");
}

TEST_P(HistoryEntriesTest, AreToldOfANodeAndAllBelowItInTheirOrder) {
    note("ann", "a=acme", "first");
    note("bob", "u=joe/a=acme", "second");
    note("cid", "a=Acme", "of a node in capitals");
    note("dan", "", "of the root");
    EXPECT_THAT(of("a=acme"), ElementsAre("ann: first", "bob: second"));
    EXPECT_THAT(of("u=joe/a=acme"), ElementsAre("bob: second"));
    EXPECT_THAT(of("", 2), ElementsAre("cid: of a node in capitals", "dan: of the root"));
}

TEST_P(HistoryEntriesTest, ComeFromAllServicesThatShareTheDatabase) {
    note("ann", "a=acme", "first");
    auto const database = open();
    History other(*database, [] { return 1001; });
    EXPECT_EQ(other.of("a=acme", 10).size(), 1u);
    History::Person const acting(other, "bob");
    other.note("a=acme", "second", "", "x");
    EXPECT_THAT(of("a=acme"), ElementsAre("ann: first", "bob: second"));
}

TEST_P(HistoryEntriesTest, GoWithTheChangeThatFailed) {
    History::Person const acting(history_, "ann");
    VlServiced::Recorder const recorder(history_);
    EXPECT_THROW(recorder.together([&] {
        recorder.note("a=acme", "settings po", "", "x");
        throw std::runtime_error("no room");
    }),
                 std::runtime_error);
    EXPECT_TRUE(history_.of("", 10).empty());
}

TEST_P(HistoryEntriesTest, AreKeptForTenYears) {
    note("ann", "a=acme", "first");
    now_ += 1 + History::KEPT_DAYS * 24 * 60 * 60;
    note("bob", "a=acme", "second");
    history_.removeOld();
    EXPECT_THAT(of(""), ElementsAre("bob: second"));
}

VLSERVICE_ON_EACH_DATABASE(HistoryEntriesTest);

} // namespace

#include "programs/vlserviced/metrics/metrics_page.h"

#include "programs/base/digest.h"
#include "programs/base/read_file.h"
#include "programs/database/postgres_connection.h"
#include "programs/vlserviced/store/letter_register.h"
#include "programs/vlserviced/store/letter_store.h"
#include "tests/vlserviced/store_database.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <cstdio>
#include <fstream>
#include <sstream>
#include <sys/wait.h>

namespace {

using namespace std::chrono_literals;
using testing::Contains;
using testing::HasSubstr;
using testing::Not;
using VlServiced::Job;
using VlServiced::JobState;
using VlServiced::LetterState;
using VlServiced::Measures;
using VlServiced::MetricsPage;
using VlServiced::Moment;
using VlServiced::Refusal;
using VlServiced::Step;

constexpr long long TEN_O_CLOCK = 1'795'000'000;

class MetricsPageTest : public VLServiceTest::OnEachDatabase {
protected:
    void add(std::string const& packId, JobState state, long long acceptedAt) {
        Job job;
        job.pack = {"/srv", "packs.db", packId};
        job.cfgId = "u=jane/a=acme";
        job.title = "Notice to Jane Doe";
        job.acceptedAt = acceptedAt;
        jobs_.accept(job);
        if (state != JobState::Accepted)
            jobs_.advance(packId, JobState::Accepted, state, acceptedAt);
    }
    void addLetters() {
        add("pack-of-jane", JobState::Queued, TEN_O_CLOCK - 90);
        letters_.divide("pack-of-jane", {{1, "fax", true}, {2, "fax", true}, {3, "email", true}},
                        TEN_O_CLOCK);
        letters_.finish({{"pack-of-jane", 2}}, LetterState::Uncertain, "jane@example.org", TEN_O_CLOCK);
        letters_.setCarrier("fax", {true, 3, "no line to +49 30 12", TEN_O_CLOCK, 0});
    }
    /// That are known again, and one whose time is up.
    void enterTwoLetters() {
        VlServiced::LetterRegister letterRegister(*database_);
        using Known = VlServiced::LetterRegister::Known;
        letterRegister.enter({"p1", "a=acme", TEN_O_CLOCK - 9, TEN_O_CLOCK + 1},
                             {{Base::sha256("1"), 1}, {Base::sha256("2"), 2}}, Known::Refused);
        letterRegister.enter({"p2", "a=acme", TEN_O_CLOCK - 9, TEN_O_CLOCK}, {{Base::sha256("3"), 1}},
                             Known::Refused);
    }
    /// The page as it is when all that can happen has.
    MetricsPage full() {
        measures_.noteStep(Step::Packing, 250ms);
        measures_.noteCommand("begin_pack", 3ms);
        measures_.noteDatabase("commit", 2ms);
        measures_.noteLetters("fax", LetterState::Accepted, 4);
        moment_ = Moment{5, {{"jobs in hand", 6}}, {"email", "fax"}, TEN_O_CLOCK + 7};
        addLetters();
        return page();
    }
    MetricsPage page() {
        return {measures_,
                {[this] {
                     return isGone_ ? throw Database::DatabaseError(Base::Code::DatabaseFailed, "gone")
                                    : openAnother();
                 },
                 [this] { return moment_; },
                 {{"data", folder_.path()}, {"nowhere", folder_ / "missing"}},
                 [] { return TEN_O_CLOCK; },
                 "1.2.3",
                 "0123abc",
                 keepFor_}};
    }
    std::unique_ptr<Database::Connection> openAnother() {
        return isPostgres() ? std::make_unique<Database::PostgresConnection>(postgres_->address())
                            : VlServiced::openToLook(folder_ / "service.db");
    }
    static std::vector<std::string> lines(std::string const& text) {
        std::istringstream in(text);
        std::vector<std::string> all;
        for (std::string line; std::getline(in, line);)
            all.push_back(line);
        return all;
    }
    /// What the checker says of a page and of what is made from its names.
    std::string checked(std::string const& text) const {
        std::ofstream(folder_ / "page", std::ios::binary) << text;
        std::string const command = "/usr/bin/python3 " CHECK_METRICS " " + (folder_ / "page").string() +
                                    " " OPERATIONS "/dashboard.json " OPERATIONS "/alerts.yml 2>&1";
        FILE* const pipe = ::popen(command.c_str(), "r");
        std::string said;
        std::array<char, 1000> room;
        while (std::size_t const size = std::fread(room.data(), 1, room.size(), pipe))
            said.append(room.data(), size);
        EXPECT_EQ(::pclose(pipe), 0) << said;
        return said;
    }

    Measures measures_;
    VlServiced::JobStore jobs_{*database_};
    VlServiced::LetterStore letters_{*database_, jobs_};
    std::optional<Moment> moment_ = Moment();
    bool isGone_ = false;
    std::chrono::milliseconds keepFor_{0};
};

TEST_P(MetricsPageTest, IsOpenMetricsWithAllNamesThatTheDashboardAndTheRulesForAlertsHave) {
    std::string const said = checked(full().text());
    // Nothing is wrong: there is the last line alone.
    EXPECT_THAT(said, testing::MatchesRegex("[0-9]+ names, [0-9]+ panels, [0-9]+ rules\n"));
}

TEST_P(MetricsPageTest, IsToldWhatIsWrongWithIt) {
    EXPECT_THAT(checked("# TYPE other gauge\n# HELP other Helps.\nother 1\n# EOF\n"),
                HasSubstr("rule DatabaseIsGone: there is no metric vlserviced_database_up"));
}

TEST_P(MetricsPageTest, TellsOfJobsByTheirState) {
    add("p1", JobState::Accepted, TEN_O_CLOCK - 40);
    add("p2", JobState::Accepted, TEN_O_CLOCK - 50);
    add("p3", JobState::Failed, TEN_O_CLOCK - 60);
    MetricsPage tested = page();
    auto const told = lines(tested.text());
    EXPECT_THAT(told, Contains("vlserviced_jobs{state=\"accepted\"} 2"));
    EXPECT_THAT(told, Contains("vlserviced_jobs{state=\"failed\"} 1"));
    EXPECT_THAT(told, Contains("vlserviced_jobs{state=\"held\"} 0"));
    EXPECT_THAT(told, Contains("vlserviced_oldest_job_age_seconds{state=\"accepted\"} 50"));
    EXPECT_THAT(told, Contains("vlserviced_oldest_job_age_seconds{state=\"queued\"} 0"));
    EXPECT_THAT(told, Not(Contains(HasSubstr("age_seconds{state=\"failed\"}"))));
    EXPECT_THAT(told, Contains("vlserviced_database_up 1"));
}

TEST_P(MetricsPageTest, TellsOfLettersAndTheirCarriers) {
    MetricsPage tested = full();
    auto const told = lines(tested.text());
    EXPECT_THAT(told, Contains("vlserviced_letters_waiting{channel=\"fax\"} 1"));
    EXPECT_THAT(told, Contains("vlserviced_letters_uncertain{channel=\"fax\"} 1"));
    EXPECT_THAT(told, Contains("vlserviced_letters_waiting{channel=\"email\"} 1"));
    EXPECT_THAT(told, Contains("vlserviced_carrier_paused{channel=\"fax\"} 1"));
    EXPECT_THAT(told, Contains("vlserviced_carrier_failures{channel=\"fax\"} 3"));
    EXPECT_THAT(told, Contains("vlserviced_carrier_paused{channel=\"email\"} 0"));
    EXPECT_THAT(told, Contains("vlserviced_letters_total{channel=\"fax\",outcome=\"accepted\"} 4"));
}

TEST_P(MetricsPageTest, TellsWhatWasCountedAndTimed) {
    measures_.noteRefusal(Refusal::Rights);
    MetricsPage tested = full();
    auto const told = lines(tested.text());
    EXPECT_THAT(told, Contains("vlserviced_commands_refused_total{reason=\"rights\"} 1"));
    EXPECT_THAT(told, Contains("vlserviced_commands_refused_total{reason=\"token\"} 0"));
    EXPECT_THAT(told, Contains("vlserviced_step_seconds_sum{step=\"packing\"} 0.25"));
    EXPECT_THAT(told, Contains("vlserviced_step_seconds_bucket{step=\"packing\",le=\"0.05\"} 0"));
    EXPECT_THAT(told, Contains("vlserviced_step_seconds_bucket{step=\"packing\",le=\"0.25\"} 1"));
    EXPECT_THAT(told, Contains("vlserviced_command_seconds_count{command=\"begin_pack\"} 1"));
    EXPECT_THAT(told, Contains("vlserviced_database_seconds_count{operation=\"commit\"} 1"));
    EXPECT_THAT(told, Contains("vlserviced_build_info{version=\"1.2.3\",commit=\"0123abc\"} 1"));
    EXPECT_THAT(told, Contains("vlserviced_start_timestamp_seconds " + std::to_string(TEN_O_CLOCK)));
}

TEST_P(MetricsPageTest, TellsOfTheServiceAndItsSurroundings) {
    MetricsPage tested = full();
    auto const told = lines(tested.text());
    EXPECT_THAT(told, Contains("vlserviced_responsive 1"));
    EXPECT_THAT(told, Contains("vlserviced_connections 5"));
    EXPECT_THAT(told, Contains("vlserviced_queue_length{queue=\"jobs in hand\"} 6"));
    EXPECT_THAT(told,
                Contains("vlserviced_certificate_end_timestamp_seconds " + std::to_string(TEN_O_CLOCK + 7)));
    EXPECT_THAT(told, Contains(HasSubstr("vlserviced_disk_free_bytes{folder=\"data\"} ")));
    EXPECT_THAT(told, Not(Contains(HasSubstr("nowhere"))));
}

TEST_P(MetricsPageTest, TellsOfTheRegisterOfSentLetters) {
    enterTwoLetters();
    measures_.noteSentBefore(VlServiced::LeftOut::Told, 3);
    MetricsPage tested = page();
    auto const told = lines(tested.text());
    EXPECT_THAT(told, Contains("vlserviced_letters_registered 2"));
    EXPECT_THAT(told, Contains("vlserviced_letters_sent_before_total{outcome=\"told\"} 3"));
    EXPECT_THAT(told, Contains("vlserviced_letters_sent_before_total{outcome=\"refused\"} 0"));
}

TEST_P(MetricsPageTest, NamesNoPersonAndNoMailing) {
    MetricsPage tested = full();
    for (char const* const secret : {"jane", "Jane", "acme", "+49", folder_.path().c_str()})
        EXPECT_THAT(tested.text(), Not(HasSubstr(secret)));
}

TEST_P(MetricsPageTest, SaysThatTheServiceDoesNotAnswer) {
    moment_.reset();
    MetricsPage tested = page();
    auto const told = lines(tested.text());
    EXPECT_THAT(told, Contains("vlserviced_responsive 0"));
    EXPECT_THAT(told, Not(Contains(HasSubstr("vlserviced_connections"))));
    EXPECT_THAT(told, Contains("vlserviced_jobs{state=\"held\"} 0"));
}

TEST_P(MetricsPageTest, SaysThatTheDatabaseIsGoneAndFindsItAgain) {
    isGone_ = true;
    MetricsPage tested = page();
    auto const without = lines(tested.text());
    EXPECT_THAT(without, Contains("vlserviced_database_up 0"));
    EXPECT_THAT(without, Not(Contains(HasSubstr("vlserviced_jobs"))));
    EXPECT_EQ(without.back(), "# EOF");
    isGone_ = false;
    EXPECT_THAT(lines(tested.text()), Contains("vlserviced_database_up 1"));
}

TEST_P(MetricsPageTest, IsTheSameForWhoeverAsksAgainAtOnce) {
    keepFor_ = 1h;
    MetricsPage tested = page();
    std::string const first = tested.text();
    add("p1", JobState::Accepted, TEN_O_CLOCK);
    EXPECT_EQ(tested.text(), first);
}

VLSERVICE_ON_EACH_DATABASE(MetricsPageTest);

} // namespace

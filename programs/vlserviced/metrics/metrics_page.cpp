#include "programs/vlserviced/metrics/metrics_page.h"

#include "programs/vlserviced/metrics/open_metrics.h"
#include "programs/vlserviced/store/letter_register.h"
#include "programs/vlserviced/store/letter_store.h"

#include <exception>
#include <map>
#include <new>
#include <system_error>

namespace VlServiced {
namespace {

using prometheus::ClientMetric;
using prometheus::MetricFamily;
using Protocol::JobState;

/// Of jobs that somebody waits for.
constexpr JobState ON_THEIR_WAY[] = {JobState::Accepted,   JobState::Held,      JobState::Queued,
                                     JobState::Submitting, JobState::Submitted, JobState::Lodged,
                                     JobState::Delivering};

/// Values as they are, of one name.
class Gauges {
public:
    Gauges(char const* name, char const* help) : family_{name, help, prometheus::MetricType::Gauge, {}} {}

    Gauges& add(std::vector<ClientMetric::Label> labels, double value) {
        ClientMetric& metric = family_.metric.emplace_back();
        metric.label = std::move(labels);
        metric.gauge.value = value;
        return *this;
    }
    Gauges& add(std::vector<ClientMetric::Label> labels, long long value) {
        return add(std::move(labels), static_cast<double>(value));
    }
    /// What has no values is left out.
    void into(std::vector<MetricFamily>& families) {
        if (!family_.metric.empty())
            families.push_back(std::move(family_));
    }

private:
    MetricFamily family_;
};

} // namespace

MetricsPage::MetricsPage(Measures const& measures, PageSources sources)
    : measures_(measures), sources_(std::move(sources)), startedAt_(sources_.now()) {}

std::string const& MetricsPage::text() {
    auto const time = std::chrono::steady_clock::now();
    if (!madeAt_ || time - *madeAt_ >= sources_.keepFor) {
        text_ = openMetricsText(families());
        madeAt_ = time;
    }
    return text_;
}

MetricsPage::Families MetricsPage::families() {
    Families families = measures_.collect();
    Gauges("vlserviced_build_info", "What the service was built from.")
        .add({{"version", sources_.version}, {"commit", sources_.commit}}, 1LL)
        .into(families);
    Gauges("vlserviced_start_timestamp_seconds", "When the service started, since 1970.")
        .add({}, startedAt_)
        .into(families);
    auto const asked = std::chrono::steady_clock::now();
    std::optional<Moment> const moment = sources_.moment();
    std::chrono::duration<double> const waited = std::chrono::steady_clock::now() - asked;
    Gauges("vlserviced_responsive", "1 when the thread that serves connections answers in time, 0 when not.")
        .add({}, moment ? 1LL : 0LL)
        .into(families);
    Gauges("vlserviced_thread_delay_seconds", "How long that thread let its next piece of work wait.")
        .add({}, waited.count())
        .into(families);
    if (moment)
        addMoment(families, *moment);
    addDisks(families);
    addStored(families, moment ? moment->channels : std::vector<std::string>());
    return families;
}

/// A connection that failed is opened anew the next time.
void MetricsPage::addStored(Families& families, std::vector<std::string> const& channels) {
    Families stored;
    long long isUp = 1;
    try {
        if (!database_)
            database_ = sources_.openDatabase();
        addJobs(stored);
        addLetters(stored, channels);
        addRegister(stored);
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const&) {
        // The log has it from whoever works with the database.
        database_.reset();
        stored.clear();
        isUp = 0;
    }
    families.insert(families.end(), stored.begin(), stored.end());
    Gauges("vlserviced_database_up", "1 when the database answers, 0 when not.").add({}, isUp).into(families);
}

void MetricsPage::addJobs(Families& families) {
    JobStore const jobs(*database_);
    std::map<JobState, long long> counts;
    for (auto const& [state, count] : jobs.counts())
        counts[state] = count;
    Gauges number("vlserviced_jobs", "Mailings on record, by their state.");
    for (JobState const state : Protocol::ALL_JOB_STATES)
        number.add({{"state", Protocol::stateName(state)}}, counts[state]);
    number.into(families);
    Gauges age("vlserviced_oldest_job_age_seconds",
               "How long ago the oldest mailing of a state was accepted; 0 when there is none.");
    for (JobState const state : ON_THEIR_WAY) {
        std::optional<long long> const accepted = jobs.oldestAcceptance(state);
        age.add({{"state", Protocol::stateName(state)}}, accepted ? sources_.now() - *accepted : 0);
    }
    age.into(families);
}

void MetricsPage::addLetters(Families& families, std::vector<std::string> const& channels) {
    JobStore jobs(*database_);
    LetterStore const letters(*database_, jobs);
    Gauges waiting("vlserviced_letters_waiting", "Letters that wait for the carrier of their channel.");
    Gauges uncertain("vlserviced_letters_uncertain",
                     "Letters of which nobody knows whether the carrier has them.");
    Gauges paused("vlserviced_carrier_paused", "1 when a person has paused the carrier, 0 when not.");
    Gauges failures("vlserviced_carrier_failures", "How often the carrier has failed since it last worked.");
    for (std::string const& channel : channels) {
        CarrierRecord const record = letters.carrier(channel);
        waiting.add({{"channel", channel}}, letters.waiting(channel));
        uncertain.add({{"channel", channel}}, letters.uncertain(channel));
        paused.add({{"channel", channel}}, record.isPaused ? 1LL : 0LL);
        failures.add({{"channel", channel}}, record.failures);
    }
    for (Gauges* const gauges : {&waiting, &uncertain, &paused, &failures})
        gauges->into(families);
}

/// Counting millions takes its time, of which it gets a small part.
void MetricsPage::addRegister(Families& families) {
    constexpr int PART_OF_THE_TIME = 100;
    auto const begin = std::chrono::steady_clock::now();
    if (!countAt_ || *countAt_ <= begin) {
        registered_ = registeredLetters(*database_, sources_.now());
        auto const end = std::chrono::steady_clock::now();
        countAt_ = end + PART_OF_THE_TIME * (end - begin);
    }
    Gauges("vlserviced_letters_registered", "Letters that are known again, each as often as it went out.")
        .add({}, registered_)
        .into(families);
}

void MetricsPage::addMoment(Families& families, Moment const& moment) const {
    Gauges("vlserviced_connections", "Connections of clients.")
        .add({}, static_cast<long long>(moment.connections))
        .into(families);
    Gauges queues("vlserviced_queue_length", "How many wait or are at work, by what they wait for.");
    for (auto const& [name, length] : moment.queues)
        queues.add({{"queue", name}}, static_cast<long long>(length));
    queues.into(families);
    if (moment.certificateEnds)
        Gauges("vlserviced_certificate_end_timestamp_seconds", "When the certificate ends, since 1970.")
            .add({}, *moment.certificateEnds)
            .into(families);
}

void MetricsPage::addDisks(Families& families) const {
    Gauges room("vlserviced_disk_free_bytes", "Room that is left for the service on the disk of a folder.");
    for (auto const& [name, folder] : sources_.disks) {
        std::error_code failure;
        std::filesystem::space_info const space = std::filesystem::space(folder, failure);
        if (!failure)
            room.add({{"folder", name}}, static_cast<double>(space.available));
    }
    room.into(families);
}

} // namespace VlServiced

#pragma once
// All that the service tells of itself to whoever watches it, as one page.

#include "programs/database/connection.h"
#include "programs/vlserviced/metrics/measures.h"

#include <chrono>
#include <cstddef>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace VlServiced {

/// What the thread that serves connections knows, as of a moment.
struct Moment {
    std::size_t connections = 0;
    /// How many wait or are at work, by the names of what they wait for.
    std::vector<std::pair<char const*, std::size_t>> queues;
    /// That have carriers.
    std::vector<std::string> channels;
    /// In seconds since the epoch; nothing without TLS.
    std::optional<long long> certificateEnds;
};

struct PageSources {
    /// A connection of the page's own. Throws std::exception.
    std::function<std::unique_ptr<Database::Connection>()> openDatabase;
    /// Nothing when that thread does not answer in time.
    std::function<std::optional<Moment>()> moment;
    /// By their names.
    std::vector<std::pair<char const*, std::filesystem::path>> disks;
    /// Seconds since the epoch.
    std::function<long long()> now;
    std::string version;
    std::string commit;
    /// For how long a page is the same, so that whoever asks often costs little.
    std::chrono::milliseconds keepFor = std::chrono::seconds(1);
};

/// Used by one thread, which waits for the database and the disk.
class MetricsPage {
public:
    /// The measures have to outlive the page.
    MetricsPage(Measures const& measures, PageSources sources);

    /// In the form that openMetricsText() writes. What cannot be had is missing.
    std::string const& text();

private:
    using Families = std::vector<prometheus::MetricFamily>;

    Families families();
    void addJobs(Families& families);
    void addLetters(Families& families, std::vector<std::string> const& channels);
    void addRegister(Families& families);
    void addStored(Families& families, std::vector<std::string> const& channels);
    void addMoment(Families& families, Moment const& moment) const;
    void addDisks(Families& families) const;

    Measures const& measures_;
    PageSources sources_;
    long long startedAt_;
    std::unique_ptr<Database::Connection> database_;
    long long registered_ = 0;
    /// When it may be counted again.
    std::optional<std::chrono::steady_clock::time_point> countAt_;
    std::string text_;
    std::optional<std::chrono::steady_clock::time_point> madeAt_;
};

} // namespace VlServiced

#pragma once
// Questions about jobs whose answers wait until there is news, so that a client that waits need not ask again
// and again.

#include "programs/protocol/job.h"
#include "programs/vlserviced/store/job_store.h"

#include <boost/asio/steady_timer.hpp>

#include <cstddef>
#include <functional>
#include <list>
#include <set>
#include <string>
#include <unordered_map>

namespace boost::asio {
class io_context;
}

namespace VlServiced {

/// Used by the thread that runs the io_context, which nothing here blocks. A change of a job costs as much as
/// there are questions that wait for that job.
class HeldQueries {
public:
    using Release = std::function<void()>;

    /// Both have to outlive the object. The store's changes are to be told to onChange().
    HeldQueries(boost::asio::io_context& io, JobStore const& jobs) : io_(io), jobs_(jobs) {}

    /// Calls `release` once: at once unless the question may wait and one of its jobs waits for its pages;
    /// otherwise when none does any more, when the time is up, or with releaseAll().
    void hold(Protocol::JobsQuery const& query, Release release);
    void onChange(std::string const& packId);
    /// The same of every job that somebody waits for.
    void lookAgain();
    void releaseAll();
    /// How many wait.
    std::size_t size() const { return held_.size(); }

private:
    struct Held {
        Release release;
        /// Pack ids of jobs that wait for their pages.
        std::set<std::string> waiting;
        boost::asio::steady_timer due;
    };
    using Place = std::list<Held>::iterator;

    bool waitsForPages(std::string const& packId) const;
    void finish(Place held);

    boost::asio::io_context& io_;
    JobStore const& jobs_;
    std::list<Held> held_;
    std::unordered_multimap<std::string, Place> byPack_;
};

} // namespace VlServiced

#include "programs/vlserviced/jobs/held_queries.h"

#include <boost/asio/io_context.hpp>

#include <algorithm>
#include <chrono>
#include <utility>
#include <vector>

namespace VlServiced {

void HeldQueries::hold(Protocol::JobsQuery const& query, Release release) {
    std::set<std::string> waiting;
    if (query.wait > 0)
        std::ranges::copy_if(query.ids, std::inserter(waiting, waiting.end()),
                             [this](std::string const& id) { return waitsForPages(id); });
    if (waiting.empty())
        return release();
    Place const held = held_.insert(
        held_.end(), Held{std::move(release), std::move(waiting), boost::asio::steady_timer(io_)});
    for (std::string const& packId : held->waiting)
        byPack_.emplace(packId, held);
    held->due.expires_after(std::chrono::milliseconds(std::min(query.wait, Protocol::JobsQuery::MAX_WAIT)));
    held->due.async_wait([this, held](boost::system::error_code const& ec) {
        if (!ec)
            finish(held);
    });
}

void HeldQueries::onChange(std::string const& packId) {
    auto const [begin, end] = byPack_.equal_range(packId);
    if (begin == end || waitsForPages(packId))
        return;
    std::vector<Place> settled;
    for (auto entry = begin; entry != end; ++entry)
        if (entry->second->waiting.erase(packId) > 0 && entry->second->waiting.empty())
            settled.push_back(entry->second);
    byPack_.erase(begin, end);
    for (Place const held : settled)
        finish(held);
}

void HeldQueries::lookAgain() {
    std::set<std::string> packIds;
    for (auto const& [packId, held] : byPack_)
        packIds.insert(packId);
    for (std::string const& packId : packIds)
        onChange(packId);
}

void HeldQueries::releaseAll() {
    while (!held_.empty())
        finish(held_.begin());
}

bool HeldQueries::waitsForPages(std::string const& packId) const {
    std::optional<Job> const job = jobs_.find(packId);
    return job && Protocol::waitsForPages(*job);
}

void HeldQueries::finish(Place held) {
    for (std::string const& packId : held->waiting) {
        auto const [begin, end] = byPack_.equal_range(packId);
        byPack_.erase(std::find_if(begin, end, [&](auto const& entry) { return entry.second == held; }));
    }
    Release const release = std::move(held->release);
    held_.erase(held);
    release();
}

} // namespace VlServiced

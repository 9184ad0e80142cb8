#include "programs/channel/background_lookup.h"

#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/post.hpp>

#include <mutex>
#include <new>
#include <optional>
#include <thread>
#include <utility>

namespace Channel {

namespace asio = boost::asio;

struct BackgroundLookup::State {
    using Work = asio::executor_work_guard<asio::io_context::executor_type>;

    std::mutex mutex;
    /// Empty when the look-up was given up; keeps the io_context waiting otherwise.
    std::optional<Work> work;
    Done done;

    void finish(std::string failure, std::vector<std::string> addresses, std::shared_ptr<State> const& self) {
        std::lock_guard const guard(mutex);
        if (!work)
            return;
        asio::post(work->get_executor(), [self, failure = std::move(failure), found = std::move(addresses)] {
            if (auto const told = self->release())
                told(failure, found);
        });
    }
    Done release() {
        std::lock_guard const guard(mutex);
        work.reset();
        return std::exchange(done, nullptr);
    }
};

namespace {

/// Why it failed, and else what was found.
std::pair<std::string, std::vector<std::string>> found(LookUp const& lookUp, std::string const& host) {
    try {
        return {"", lookUp(host)};
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const& failure) {
        return {failure.what(), {}};
    }
}

} // namespace

BackgroundLookup::BackgroundLookup(asio::io_context& io, LookUp lookUp, std::string host, Done done)
    : state_(std::make_shared<State>()) {
    state_->work.emplace(io.get_executor());
    state_->done = std::move(done);
    std::thread([state = state_, lookUp = std::move(lookUp), host = std::move(host)] {
        try {
            auto [failure, addresses] = found(lookUp, host);
            state->finish(std::move(failure), std::move(addresses), state);
        } catch (std::bad_alloc const&) {
            // An answer for which there is no memory is as one that never comes, which is given up.
        }
    }).detach();
}

BackgroundLookup::~BackgroundLookup() { state_->release(); }

} // namespace Channel

#include "programs/channel/background_lookup.h"

#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/post.hpp>

#include <mutex>
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

BackgroundLookup::BackgroundLookup(asio::io_context& io, LookUp lookUp, std::string host, Done done)
    : state_(std::make_shared<State>()) {
    state_->work.emplace(io.get_executor());
    state_->done = std::move(done);
    std::thread([state = state_, lookUp = std::move(lookUp), host = std::move(host)] {
        std::string failure;
        std::vector<std::string> addresses;
        try {
            addresses = lookUp(host);
        } catch (std::exception const& e) {
            failure = e.what();
        }
        state->finish(std::move(failure), std::move(addresses), state);
    }).detach();
}

BackgroundLookup::~BackgroundLookup() { state_->release(); }

} // namespace Channel

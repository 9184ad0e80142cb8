#pragma once
// A time at which something is given up. Moving it, which happens with each message, costs nothing unless it
// comes nearer.

#include <utility>

#include <boost/asio/steady_timer.hpp>

#include <chrono>
#include <functional>
#include <memory>

namespace Channel {

class Deadline {
public:
    using Clock = std::chrono::steady_clock;
    static constexpr Clock::time_point NEVER = Clock::time_point::max();

    Deadline(boost::asio::io_context& io, std::function<void()> onDue)
        : state_(std::make_shared<State>(io, std::move(onDue))) {}
    ~Deadline() { state_->timer.cancel(); }
    Deadline(Deadline const&) = delete;
    Deadline& operator=(Deadline const&) = delete;

    void set(Clock::time_point at) {
        state_->at = at;
        state_->arm();
    }
    void set(std::chrono::milliseconds fromNow) { set(Clock::now() + fromNow); }
    /// Keeps an earlier time that is set already.
    void setNoLaterThan(Clock::time_point at) {
        if (at < state_->at)
            set(at);
    }
    /// The timer may run on; it does nothing.
    void clear() { state_->at = NEVER; }

private:
    struct State : std::enable_shared_from_this<State> {
        State(boost::asio::io_context& io, std::function<void()> due) : timer(io), onDue(std::move(due)) {}

        void arm() {
            if (at >= armedFor)
                return;
            armedFor = at;
            timer.expires_at(at);
            timer.async_wait(
                [weak = weak_from_this(), mine = ++generation](boost::system::error_code const& ec) {
                    auto const state = weak.lock();
                    // One that had expired before it could be moved is none of ours any more.
                    if (state && !ec && mine == state->generation)
                        state->onTimer();
                });
        }
        void onTimer() {
            armedFor = NEVER;
            if (Clock::now() < at)
                return arm();
            at = NEVER;
            onDue();
        }

        boost::asio::steady_timer timer;
        std::function<void()> onDue;
        Clock::time_point at = NEVER;
        Clock::time_point armedFor = NEVER;
        unsigned long long generation = 0;
    };

    std::shared_ptr<State> state_;
};

} // namespace Channel

#include "programs/vlserviced/neighbours.h"

#include "vlservice/platform/log.h"

#include <boost/asio/io_context.hpp>

#include <unistd.h>
#include <utility>

namespace VlServiced {
namespace {

constexpr char const* JOBS = "vlserviced_jobs";
constexpr char const* WORK = "vlserviced_work";
constexpr char const* LETTERS = "vlserviced_letters";
constexpr char const* SETTINGS = "vlserviced_settings";

} // namespace

Neighbours::Neighbours(boost::asio::io_context& io, std::string address, Heard heard)
    : io_(io), address_(std::move(address)), heard_(std::move(heard)), readable_(io) {}

Neighbours::~Neighbours() = default;

void Neighbours::listen() {
    if (listener_)
        return;
    listener_ = std::make_unique<Database::PostgresListener>(
        address_, std::vector<std::string>{JOBS, WORK, LETTERS, SETTINGS},
        [this](std::string const& channel, std::string const& payload) { tell(channel, payload); });
    // A descriptor of its own, since both ends close theirs.
    readable_ = boost::asio::posix::stream_descriptor(io_, ::dup(listener_->descriptor()));
    await();
    for (char const* const channel : {SETTINGS, WORK, LETTERS})
        tell(channel, {});
}

void Neighbours::await() {
    readable_.async_wait(
        boost::asio::posix::stream_descriptor::wait_read, [this](boost::system::error_code const& ec) {
            if (ec || !listener_)
                return;
            try {
                listener_->take();
            } catch (Database::QueryError const& lost) {
                Log::Lock(4).logStreamLine() << "Other services are not heard for a while: " << lost.what();
                return stop();
            }
            await();
        });
}

void Neighbours::stop() {
    boost::system::error_code ignored;
    readable_.close(ignored);
    listener_.reset();
}

void Neighbours::tell(std::string const& channel, std::string const& payload) const {
    try {
        if (channel == JOBS)
            heard_.jobChanged(payload);
        else if (channel == WORK)
            heard_.work();
        else if (channel == LETTERS)
            heard_.letters();
        else
            heard_.settings();
    } catch (Database::QueryError const& failure) {
        // The next look now and then makes up for it.
        Log::Lock(4).logStreamLine() << "What another service has told is seen to later: " << failure.what();
    }
}

} // namespace VlServiced

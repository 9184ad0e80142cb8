#pragma once
// Notices when interfaces, addresses or routes of this host come and go.

#include <utility>

#include <boost/asio/io_context.hpp>
#include <boost/asio/posix/stream_descriptor.hpp>
#include <boost/asio/steady_timer.hpp>

#include <array>
#include <functional>
#include <memory>

namespace VlServiced {

/// The io_context is run by one thread and outlives this object. Where the system does not tell, nothing is
/// noticed, and the log says so once.
class NetworkChanges {
public:
    /// `onChange` is called a moment after a change, for all changes until then.
    NetworkChanges(boost::asio::io_context& io, std::function<void()> onChange);

private:
    void listen();
    void awaitMore();

    boost::asio::posix::stream_descriptor events_;
    boost::asio::steady_timer pause_;
    bool pausing_ = false;
    std::function<void()> onChange_;
    std::array<char, 8192> room_;
    /// Expires first of all; the handlers watch it.
    std::shared_ptr<void> alive_ = std::make_shared<char>();
};

} // namespace VlServiced

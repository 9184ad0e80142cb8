#pragma once
// What the system's manager hands over to a service, and what it wants to be told.

#include "programs/vlserviced/options.h"

#include <boost/asio/io_context.hpp>
#include <boost/asio/steady_timer.hpp>

#include <chrono>
#include <string>

namespace VlServiced {

/// Fills in what the manager hands over: a socket that listens already, with its address and port, and the
/// credentials "token", "certificate" and "key" for which the options name no file. Without a manager nothing
/// changes. Throws Error when there is more than one socket, or one that does not listen for TCP.
void takeHandedOver(Options& options);

/// Tells the manager when the service is ready, that it is alive, as often as it wants to know, and when it
/// ends. Does nothing without a manager.
class SystemManager {
public:
    explicit SystemManager(boost::asio::io_context& io);

    /// The service answers from now on; `status` is one line for a person.
    void onReady(std::string const& status);
    void onStopping();

private:
    void tellAlive();

    boost::asio::steady_timer timer_;
    /// Zero when the manager does not want to know.
    std::chrono::microseconds interval_;
};

} // namespace VlServiced

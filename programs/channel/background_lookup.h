#pragma once
// A look-up that can be given up while it waits.

#include "programs/channel/host_lookup.h"

#include <boost/asio/io_context.hpp>

#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace Channel {

/// Runs on a thread of its own, which is left behind when the look-up is given up: the system has no way to
/// end it. The io_context outlives this object and has work while it waits.
class BackgroundLookup {
public:
    /// Called once in the io_context, with the reason when there is no address.
    using Done = std::function<void(std::string const& failure, std::vector<std::string> const& addresses)>;

    BackgroundLookup(boost::asio::io_context& io, LookUp lookUp, std::string host, Done done);
    /// Gives it up: nothing is called afterwards.
    ~BackgroundLookup();
    BackgroundLookup(BackgroundLookup const&) = delete;
    BackgroundLookup& operator=(BackgroundLookup const&) = delete;

private:
    struct State;
    std::shared_ptr<State> state_;
};

} // namespace Channel

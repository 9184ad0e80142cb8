#pragma once
// A connection to the service that is made again when it broke.

#include "programs/base/error.h"
#include "programs/channel/client.h"

#include <chrono>
#include <functional>
#include <memory>
#include <thread>
#include <utility>

namespace VlMail {

/// How long a line tries to reach a service that it had reached before, and how long it waits in between.
struct Patience {
    std::chrono::milliseconds time = std::chrono::minutes(2);
    std::chrono::milliseconds pause = std::chrono::milliseconds(500);
};

/// Used by one thread.
class ServiceLine {
public:
    using Connect = std::function<std::unique_ptr<Channel::Client>()>;

    /// Connects. Throws what `connect` does.
    explicit ServiceLine(Connect connect, Patience patience = {})
        : connect_(std::move(connect)), patience_(patience), client_(connect_()) {}

    /// Valid until the next repeated operation.
    Channel::Client& client() { return *client_; }

    /// Carries out an operation that may be carried out any number of times without harm: once more, on a new
    /// connection, each time that the connection breaks, until it could not be had for as long as patience
    /// lasts. Throws what it throws in the end; what is no Base::Error at once.
    template<typename Operation>
    auto repeat(Operation operation) {
        progressed();
        for (;;) {
            try {
                if (!client_->isOpen())
                    client_ = connect_();
                return operation(*client_);
            } catch (Base::Error const&) {
                // With the connection open, it is the service that refuses.
                if (client_->isOpen() || std::chrono::steady_clock::now() >= due_)
                    throw;
            }
            std::this_thread::sleep_for(patience_.pause);
        }
    }
    /// The same without any patience.
    template<typename Operation>
    auto once(Operation operation) {
        if (!client_->isOpen())
            client_ = connect_();
        return operation(*client_);
    }
    /// Patience begins anew: the operation has come further than before.
    void progressed() { due_ = std::chrono::steady_clock::now() + patience_.time; }

private:
    Connect connect_;
    Patience patience_;
    std::chrono::steady_clock::time_point due_;
    std::unique_ptr<Channel::Client> client_;
};

} // namespace VlMail

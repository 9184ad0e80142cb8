#pragma once
// A connection to the service that is made again when it broke.

#include "programs/base/error.h"
#include "programs/channel/client.h"

#include <functional>
#include <memory>
#include <utility>

namespace VlMail {

/// Used by one thread.
class ServiceLine {
public:
    using Connect = std::function<std::unique_ptr<Channel::Client>()>;

    /// Connects. Throws what `connect` does.
    explicit ServiceLine(Connect connect) : connect_(std::move(connect)), client_(connect_()) {}

    /// Valid until the next repeated operation.
    Channel::Client& client() { return *client_; }

    /// Carries out an operation that may be carried out twice without harm: once more, on a new connection,
    /// each time that the connection breaks, as long as there is hope. Throws what it throws in the end.
    template<typename Operation>
    auto repeat(Operation operation) {
        constexpr int ATTEMPTS = 3;
        for (int attempt = 1;; ++attempt) {
            try {
                return operation(*client_);
            } catch (Base::Error const&) {
                // With the connection open, it is the service that refuses.
                if (client_->isOpen() || attempt == ATTEMPTS)
                    throw;
            }
            client_ = connect_();
        }
    }

private:
    Connect connect_;
    std::unique_ptr<Channel::Client> client_;
};

} // namespace VlMail

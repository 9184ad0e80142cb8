#include "programs/channel/client.h"

#include "programs/base/error.h"
#include "programs/channel/client_connection.h"

#include <boost/asio/io_context.hpp>

#include <exception>
#include <new>
#include <optional>

namespace Channel {

class Client::Impl {
public:
    explicit Impl(ClientSettings settings) : connection_(ClientConnection::make(io_, std::move(settings))) {
        wait([&](ClientConnection::Done done) { connection_->connect(std::move(done)); });
    }
    ~Impl() {
        try {
            connection_->close();
        } catch (std::bad_alloc const&) {
            // What was asked for is done, and the socket closes with its owner.
        }
    }
    Impl(Impl const&) = delete;
    Impl& operator=(Impl const&) = delete;

    std::shared_ptr<Ipc::CmdProcessorI> processor() const { return connection_; }
    bool isOpen() const { return connection_->isOpen(); }
    bool takesData() const { return connection_->takesData(); }
    void sendData(DataSource const& source) {
        // What the source throws ends the connection as a line; it is more than that.
        std::exception_ptr thrown;
        auto const guarded = [&]() -> std::optional<std::string> {
            try {
                return source();
            } catch (...) {
                thrown = std::current_exception();
                throw;
            }
        };
        try {
            wait([&](ClientConnection::Done done) { connection_->submitData(guarded, std::move(done)); });
        } catch (Base::Error const&) {
            if (thrown)
                std::rethrow_exception(thrown);
            throw;
        }
    }
    void send(std::shared_ptr<Ipc::CmdI> const& cmd) {
        wait([&](ClientConnection::Done done) {
            connection_->submit(cmd, std::move(done));
            connection_->sendNext();
        });
    }

private:
    /// Starts something and runs until it is done.
    template<typename Start>
    void wait(Start start) {
        auto const result = std::make_shared<std::optional<std::string>>();
        start([result](std::string const& failure) { *result = failure; });
        io_.restart();
        while (!*result)
            if (io_.run_one() == 0)
                throw Base::Error(Base::Code::ConnectionLost, "The connection was lost.");
        if (!(*result)->empty())
            throw Base::errorSaid(**result, Base::Code::ServiceUnreachable);
    }

    boost::asio::io_context io_;
    std::shared_ptr<ClientConnection> connection_;
};

Client::Client(ClientSettings settings) : impl_(std::make_unique<Impl>(std::move(settings))) {}
Client::~Client() = default;

std::shared_ptr<Ipc::CmdProcessorI> Client::processor() const { return impl_->processor(); }
bool Client::isOpen() const { return impl_->isOpen(); }
bool Client::takesData() const { return impl_->takesData(); }
void Client::sendData(DataSource const& source) { impl_->sendData(source); }
void Client::send(std::shared_ptr<Ipc::CmdI> const& cmd) { impl_->send(cmd); }

} // namespace Channel

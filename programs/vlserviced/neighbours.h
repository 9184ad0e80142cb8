#pragma once
// Other services on the same database: what they tell of their changes.

#include "programs/database/postgres_connection.h"

#include <boost/asio/posix/stream_descriptor.hpp>

#include <functional>
#include <memory>
#include <string>

namespace boost::asio {
class io_context;
}

namespace VlServiced {

/// Used by the thread that runs the io_context.
class Neighbours {
public:
    /// What is done when something is told; this service hears itself as well.
    struct Heard {
        std::function<void(std::string const& packId)> jobChanged;
        /// There is a job that nobody works on.
        std::function<void()> work;
        std::function<void()> letters;
        std::function<void()> settings;
    };

    /// The io_context has to outlive the object.
    Neighbours(boost::asio::io_context& io, std::string address, Heard heard);
    ~Neighbours();
    Neighbours(Neighbours const&) = delete;
    Neighbours& operator=(Neighbours const&) = delete;

    /// Listens from here on, where it does not yet or the connection went; to be called now and then. What
    /// was told meanwhile is lost: all but single jobs is taken for changed. Throws Database::QueryError.
    void listen();
    void stop();

private:
    void await();
    void tell(std::string const& channel, std::string const& payload) const;

    boost::asio::io_context& io_;
    std::string address_;
    Heard heard_;
    std::unique_ptr<Database::PostgresListener> listener_;
    boost::asio::posix::stream_descriptor readable_;
};

} // namespace VlServiced

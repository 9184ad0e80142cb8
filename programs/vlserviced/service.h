#pragma once
// The whole service: what it keeps, what it listens on, and what it does from time to time.

#include "programs/vlserviced/options.h"

#include <cstdint>
#include <memory>
#include <string>

namespace VlServiced {

/// One service on one data folder.
class Service {
public:
    /// Opens everything and listens; nothing is answered before run(). Throws a std::exception whose text is
    /// one line for a person.
    explicit Service(Options const& options);
    ~Service();
    Service(Service const&) = delete;
    Service& operator=(Service const&) = delete;

    std::uint16_t port() const;
    /// Of the certificate; empty without TLS.
    std::string const& fingerprint() const;
    /// Where metrics are asked for; empty for nowhere.
    std::string metricsPlace() const;

    /// Serves until stop() or one of the signals SIGTERM and SIGINT; then answers the commands at hand,
    /// finishes the container at hand and returns.
    void run();
    /// May be called from any thread.
    void stop();

private:
    class Impl;
    std::unique_ptr<Impl> impl_;
};

} // namespace VlServiced

#pragma once
// Where metrics are asked for: a port of this machine alone, or a socket of the file system.

#include <functional>
#include <memory>
#include <string>

namespace VlServiced {

/// Answers on a thread of its own, so that whoever asks, and however he does, holds up nobody else. Peers are
/// few, and each has its time; when there are more, the one that has been here for the longest goes.
class MetricsDoor {
public:
    /// Listens from now on at "ADDRESS:PORT", a loopback address and a port, 0 for a free one, or at
    /// "unix:PATH", which the user and his group may use from then on. Throws Error.
    explicit MetricsDoor(std::string const& place);
    /// Ends the thread, and removes the socket's file.
    ~MetricsDoor();
    MetricsDoor(MetricsDoor const&) = delete;
    MetricsDoor& operator=(MetricsDoor const&) = delete;

    /// Where it listens: "127.0.0.1:9117", "unix:/run/vlserviced/metrics".
    std::string const& place() const;

    /// Answers from now on; `page` is called on the door's thread, and what it throws is the end of that
    /// connection alone.
    void open(std::function<std::string()> page);

private:
    class Impl;
    std::unique_ptr<Impl> impl_;
};

} // namespace VlServiced

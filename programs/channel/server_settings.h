#pragma once
// What a service's side of the connection is told.

#include "programs/channel/greeting.h"
#include "programs/channel/tls.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <string>

namespace Channel {

struct ServerSettings {
    /// An IP address.
    std::string address = "127.0.0.1";
    /// 0 takes a free port.
    std::uint16_t port = 0;
    /// Listens at that address and port already, and is the server's from now on; below 0 when there is none.
    int socket = -1;
    std::string token;
    /// Its tokens that have an id; asked with each greeting of one.
    TokenLookup tokens = {};
    Tls tls = Tls::Auto;
    /// PEM files that TLS wants. The key's must be private.
    std::string certificateFile;
    std::string keyFile;

    /// Of clients that have proved themselves; more wait until one of these has left.
    std::size_t maxConnections = 2000;
    /// Of strangers; when there are more, the one that has been here for the longest goes.
    std::size_t maxStrangers = 256;
    /// Of the log's lines about strangers in each such time; how many more there were is told behind it.
    std::size_t strangersLines = 20;
    std::chrono::milliseconds strangersLinesTime = std::chrono::seconds(10);
    /// For TLS and the exchange of proofs.
    std::chrono::milliseconds greetingTime = std::chrono::seconds(10);
    /// For the rest of a message whose first byte is there, and for a peer to take an answer.
    std::chrono::milliseconds messageTime = std::chrono::seconds(60);
    /// For all large requests and all data that is not stored yet; further ones wait.
    std::size_t requestMemory = 64 * 1024 * 1024;
    /// For all answers that their clients have not taken yet; when there are more, the oldest goes with its
    /// connection.
    std::size_t answerMemory = 64 * 1024 * 1024;
};

} // namespace Channel

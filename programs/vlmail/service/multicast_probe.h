#pragma once
// What discovery meets with on each network interface: sent, heard again, answered.

#include "vlservice/json/json.h"

#include <chrono>
#include <string>
#include <vector>

namespace VlMail {

/// One interface in one IP version.
struct ProbeReport {
    std::string interface;
    /// The interface's own address.
    std::string address;
    bool isIp6 = false;
    /// Why the request could not be sent; empty when it was.
    std::string failure;
    /// Whether the request came back to this host, as multicast does.
    bool heardItself = false;
    /// The services that answered, as "HOST:PORT (from ADDRESS)".
    std::vector<std::string> answers;
    /// Datagrams that were neither requests nor answers.
    int foreign = 0;
};

/// Sends a request on every interface that is up and listens for that time.
std::vector<ProbeReport> probeNetwork(std::chrono::milliseconds time);

/// What a person can try, by what was met with; one line each, empty when a service answered.
std::vector<std::string> hintsFor(std::vector<ProbeReport> const& reports);

json::Object toJson(std::vector<ProbeReport> const& reports);

} // namespace VlMail

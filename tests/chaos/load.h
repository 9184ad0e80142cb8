#pragma once
// Clients that send mailings, each until a service has answered that it has it.

#include "tests/chaos/installation.h"

#include <atomic>
#include <map>
#include <mutex>
#include <random>
#include <set>
#include <string>
#include <thread>
#include <vector>

namespace Chaos {

/// A mailing by its id, which says all of it: what it consists of, and what its pages say.
class SentMailing {
public:
    /// Of letters for the print shop, which go by a carrier, and of others, which go in the container.
    enum class Kind { InContainer, ByCarrier, Both };

    SentMailing(std::string id, Kind kind) : id_(std::move(id)), kind_(kind) {}

    std::string const& id() const { return id_; }
    /// The numbers of letters that go by the carrier.
    std::vector<int> carried() const;
    bool hasContainer() const { return kind_ != Kind::ByCarrier; }

    void write(std::filesystem::path const& file) const;
    /// What is wrong with a container that was handed over; empty when it is whole.
    std::string faultIn(std::filesystem::path const& container) const;

private:
    static constexpr int LETTERS = 2;

    std::string channelOf(int letter) const;
    std::string pageOf(int letter) const;

    std::string id_;
    Kind kind_;
};

/// Runs vlmail again and again, in threads, from its beginning to stop().
class Load {
public:
    /// `name` is the beginning of the ids of mailings.
    Load(Installation const& installation, std::string const& name, unsigned seed, int clients);
    ~Load() { stop(); }
    Load(Load const&) = delete;
    Load& operator=(Load const&) = delete;

    /// What is at hand is sent until it was answered.
    void stop();
    /// Those that were answered.
    std::map<std::string, SentMailing> answered() const;
    /// What clients were told at last that had no answer in all their time.
    std::vector<std::string> unanswered() const;

private:
    void run(std::string const& name, unsigned seed);
    void send(SentMailing const& mailing, std::mt19937& random);

    Installation const& installation_;
    std::atomic<bool> isStopping_{false};
    mutable std::mutex mutex_;
    std::map<std::string, SentMailing> answered_;
    std::vector<std::string> unanswered_;
    std::vector<std::thread> clients_;
};

} // namespace Chaos

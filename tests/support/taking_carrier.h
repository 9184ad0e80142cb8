#pragma once
// What a carrier does with a folder: whatever comes into it is taken away.

#include <atomic>
#include <filesystem>
#include <map>
#include <mutex>
#include <string>
#include <thread>

namespace VLServiceTest {

/// Counts each name as often as a file is renamed to it, also when that replaces one that is there still.
/// Files are moved to another folder; names that begin with a dot are left alone.
class TakingCarrier {
public:
    TakingCarrier(std::filesystem::path folder, std::filesystem::path taken);
    ~TakingCarrier();
    TakingCarrier(TakingCarrier const&) = delete;
    TakingCarrier& operator=(TakingCarrier const&) = delete;

    std::map<std::string, int> taken() const;

private:
    void run();
    void take(std::string const& name);

    std::filesystem::path folder_;
    std::filesystem::path takenFolder_;
    int watch_;
    std::atomic<bool> isEnding_{false};
    mutable std::mutex mutex_;
    std::map<std::string, int> taken_;
    std::thread thread_;
};

} // namespace VLServiceTest

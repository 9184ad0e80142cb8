#pragma once
// A service that gets one mailing over the connection and brings it on its way while one of its calls fails.
// Whatever it acknowledged has to be there after the next start, and the mailing arrives once.

#include "tests/faults/fault.h"
#include "tests/support/temporary_folder.h"

#include <set>
#include <string>
#include <vector>

namespace Channel {
class Client;
}
class ServiceProcess;

namespace Faults {

class OneJob {
public:
    OneJob();

    /// How many calls of a kind the service makes on the whole way when nothing fails.
    long callsOf(std::string const& call);
    /// What was promised and not kept; empty when all was.
    std::vector<std::string> run(Fault const& fault);

private:
    void prepare();
    void runWith(Fault const& fault);
    void send(ServiceProcess const& service);
    void bring(ServiceProcess const& service);
    void requireAcknowledged(Channel::Client& client);
    void takeMailings();
    void finish();
    void find(std::string const& what) { findings_.push_back(what); }
    std::vector<std::string> arguments() const { return {"--data", data_.string(), "--no-discovery"}; }

    TemporaryFolder root_;
    std::filesystem::path folder_ = root_ / "work";
    std::filesystem::path data_ = folder_ / "data";
    std::filesystem::path upload_ = folder_ / "upload";
    std::filesystem::path taken_ = folder_ / "taken";
    std::filesystem::path counter_ = root_ / "calls";
    std::set<std::string> acknowledged_;
    std::vector<std::string> findings_;
};

} // namespace Faults

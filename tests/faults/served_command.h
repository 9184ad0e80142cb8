#pragma once
// A command of vlmail that asks a service, while its calls fail and the service's do not: what it says was
// done is done, what it says was not may be done again, and nothing is lost or there twice.

#include "tests/faults/process.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/service_process.h"

#include <set>
#include <string>
#include <vector>

namespace Faults {

class ServedCommand {
public:
    static std::vector<std::string> const NAMES;

    /// Of a name among NAMES. The service runs as long as the object lives.
    explicit ServedCommand(std::string name);

    long callsOf(std::string const& call);
    /// What was promised and not kept; empty when all was.
    std::vector<std::string> run(Fault const& fault);

private:
    /// With the service named.
    Ended vlmail(std::vector<std::string> arguments, Fault const& fault = {}) const;
    Ended runOnce(Fault const& fault);
    void checkEnd(Fault const& fault, Ended const& ended);
    void checkSetting(Ended const& ended);
    void checkMailing(Ended const& ended);
    void resumeStranded();
    /// The ids of all mailings, once the service has fetched them.
    std::multiset<std::string> mailings() const;
    void find(std::string const& what) { findings_.push_back(what); }

    std::string const name_;
    TemporaryFolder root_;
    std::filesystem::path data_ = root_ / "data";
    std::filesystem::path folder_ = root_ / "work";
    ServiceProcess service_{{"--data", data_.string(), "--no-discovery"}};
    std::multiset<std::string> before_;
    /// Each run sets another value.
    int value_ = 0;
    std::vector<std::string> findings_;
};

} // namespace Faults

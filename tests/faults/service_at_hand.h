#pragma once
// A service with a client beside it, whose calls fail and the service's do not.

#include "tests/faults/process.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/service_process.h"

#include <string>
#include <vector>

namespace Faults {

class ServiceAtHand {
public:
    ServiceAtHand();

    /// Runs vlmail with the service named.
    Ended vlmail(std::vector<std::string> arguments, Fault const& fault = {}) const;
    /// What "pack verify" says of a file.
    std::string verify(std::filesystem::path const& mailing) const;

    /// Where vlmail runs; it holds letter.txt.
    std::filesystem::path const& folder() const { return folder_; }
    /// The service's.
    std::filesystem::path const& data() const { return data_; }
    /// Where vlmail keeps mailings until the service has them.
    std::filesystem::path packDatabase() const { return home_ / "vlmail" / "packs.db"; }

private:
    TemporaryFolder root_;
    std::filesystem::path data_ = root_ / "data";
    std::filesystem::path folder_ = root_ / "work";
    std::filesystem::path home_ = root_ / "home";
    ServiceProcess service_{{"--data", data_.string(), "--no-discovery"}};
};

/// The ids of mailings differ from run to run.
std::string withoutIds(std::string const& text);
/// Whether a line says what failed. Libraries may have lines of their own.
bool saysWhy(std::string const& errors);
/// What no end may be, whatever fails: too late, or by a signal that does not come of the fault.
std::vector<std::string> faultsInEnd(Fault const& fault, Ended const& ended);

} // namespace Faults

#pragma once
// A printer of the system's own, which a script prints for.

#include "tests/support/cutting_relay.h"

#include <filesystem>
#include <optional>
#include <string>
#include <sys/types.h>
#include <vector>

class IppPrinter {
public:
    /// Its files lie in `folder`. `script` is run in there for each job, with the document as its argument,
    /// what it says on standard error as the printer's state, and $IPP_JOB_NAME and the like.
    IppPrinter(std::filesystem::path const& folder, std::string const& script,
               std::vector<std::string> const& offers = {"-2", "-s", "10,5"});
    ~IppPrinter();
    IppPrinter(IppPrinter const&) = delete;
    IppPrinter& operator=(IppPrinter const&) = delete;

    /// Why there is none; empty where there is one.
    static std::string whyNot();

    std::string uri() const { return "ipp://127.0.0.1:" + std::to_string(relay_->port()) + "/ipp/print"; }
    VLServiceTest::CuttingRelay& relay() { return *relay_; }
    /// What the script has been told to print, a line each.
    std::string had() const;

private:
    pid_t start(std::vector<std::string> const& arguments, int readyOn, char const* readyWord) const;
    void startPrinter(std::filesystem::path const& program, std::vector<std::string> const& offers);

    std::filesystem::path folder_;
    std::uint16_t port_ = 0;
    pid_t bus_ = -1;
    pid_t printer_ = -1;
    std::optional<VLServiceTest::CuttingRelay> relay_;
};

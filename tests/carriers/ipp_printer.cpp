#include "tests/carriers/ipp_printer.h"

#include "tests/support/free_port.h"

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <thread>

namespace {

namespace fs = std::filesystem;

constexpr char const* PRINTER = "/usr/sbin/ippeveprinter";
constexpr char const* BUS = "/usr/bin/dbus-daemon";

void end(pid_t process) {
    if (process <= 0)
        return;
    ::kill(process, SIGKILL);
    ::waitpid(process, nullptr, 0);
}

} // namespace

std::string IppPrinter::whyNot() {
    for (char const* const program : {PRINTER, BUS})
        if (::access(program, X_OK) != 0)
            return "there is no " + std::string(program);
    return {};
}

/// Waits until it has written the word, which it does when it can be spoken to; it may be read on.
pid_t IppPrinter::start(std::vector<std::string> const& arguments, int readyOn, char const* readyWord) const {
    int ends[2];
    if (::pipe2(ends, O_CLOEXEC) != 0)
        throw std::runtime_error("no pipe");
    std::vector<char*> argv;
    for (std::string const& argument : arguments)
        argv.push_back(const_cast<char*>(argument.c_str()));
    argv.push_back(nullptr);
    pid_t const process = ::fork();
    if (process == 0) {
        ::prctl(PR_SET_PDEATHSIG, SIGKILL);
        int const nowhere = ::open("/dev/null", O_RDWR);
        for (int const stream : {0, 1, 2})
            ::dup2(stream == readyOn ? ends[1] : nowhere, stream);
        ::execv(argv.front(), argv.data());
        ::_exit(127);
    }
    ::close(ends[1]);
    std::string told;
    std::array<char, 512> bytes{};
    ssize_t size = 0;
    while (told.find(readyWord) == std::string::npos &&
           (size = ::read(ends[0], bytes.data(), bytes.size())) > 0)
        told.append(bytes.data(), static_cast<std::size_t>(size));
    // Whoever writes into a pipe that nobody reads is ended.
    if (told.find(readyWord) == std::string::npos) {
        end(process);
        throw std::runtime_error(arguments.front() + " did not start: " + told);
    }
    std::thread([reader = ends[0]] {
        std::array<char, 512> more{};
        while (::read(reader, more.data(), more.size()) > 0) {
        }
        ::close(reader);
    }).detach();
    return process;
}

IppPrinter::IppPrinter(fs::path const& folder, std::string const& script,
                       std::vector<std::string> const& offers)
    : folder_(folder) {
    fs::create_directories(folder_ / "spool");
    fs::path const program = folder_ / "print";
    std::ofstream(program) << "#!/bin/sh\ncd '" << folder_.string()
                           << "'\necho \"$IPP_JOB_NAME sides=$IPP_SIDES colour=$IPP_PRINT_COLOR_MODE "
                              "media=$IPP_MEDIA copies=$IPP_COPIES\" >>had\n"
                           << script << '\n';
    fs::permissions(program, fs::perms::owner_all);
    std::string const address = "unix:path=" + (folder_ / "bus").string();
    // It announces itself on a bus, on which nobody listens.
    bus_ = start({BUS, "--session", "--nofork", "--nopidfile", "--print-address", "--address=" + address}, 1,
                 "unix:");
    ::setenv("DBUS_SYSTEM_BUS_ADDRESS", address.c_str(), 1);
    startPrinter(program, offers);
    relay_.emplace([port = port_] { return VLServiceTest::connectedTo(port); });
}

/// Somebody else may take its port in front of it.
void IppPrinter::startPrinter(fs::path const& program, std::vector<std::string> const& offers) {
    for (int attempt = 1; printer_ <= 0; ++attempt) {
        port_ = VLServiceTest::freePort();
        std::vector<std::string> arguments{PRINTER, "-v",
                                           "-d",    (folder_ / "spool").string(),
                                           "-c",    program.string(),
                                           "-f",    "application/pdf",
                                           "-p",    std::to_string(port_),
                                           "-n",    "localhost",
                                           "-r",    "off"};
        arguments.insert(arguments.end(), offers.begin(), offers.end());
        arguments.emplace_back("Test");
        try {
            printer_ = start(arguments, 2, "printer-uuid");
        } catch (std::runtime_error const&) {
            if (attempt == 5)
                throw;
        }
    }
}

IppPrinter::~IppPrinter() {
    relay_.reset();
    end(printer_);
    end(bus_);
}

std::string IppPrinter::had() const {
    std::ifstream in(folder_ / "had");
    return {std::istreambuf_iterator<char>(in), {}};
}

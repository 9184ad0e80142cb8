#include "tests/vlserviced/service_process.h"

#include "programs/channel/token.h"

#include <csignal>
#include <cstdlib>
#include <fcntl.h>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <sys/wait.h>
#include <unistd.h>

namespace {

namespace fs = std::filesystem;

fs::path newFile() {
    std::string name = (fs::temp_directory_path() / "vlserviced-errors.XXXXXX").string();
    ::close(::mkstemp(name.data()));
    return name;
}

/// As the third file, for the process of that number.
void handOver(int socket) {
    ::dup2(socket, STDERR_FILENO + 1);
    ::setenv("LISTEN_FDS", "1", 1);
    ::setenv("LISTEN_PID", std::to_string(::getpid()).c_str(), 1);
}

[[noreturn]] void become(std::vector<std::string> arguments, ServiceProcess::Environment const& more,
                         int output, int errors, int socket) {
    ::dup2(output, STDOUT_FILENO);
    ::dup2(errors, STDERR_FILENO);
    if (socket >= 0)
        handOver(socket);
    for (auto const& [name, value] : more)
        ::setenv(name.c_str(), value.c_str(), 1);
    arguments.insert(arguments.begin(), VLSERVICED_PROGRAM);
    std::vector<char*> pointers;
    for (std::string& argument : arguments)
        pointers.push_back(argument.data());
    pointers.push_back(nullptr);
    ::execv(VLSERVICED_PROGRAM, pointers.data());
    ::_exit(127);
}

std::string lineFrom(int file) {
    std::string line;
    for (char c; ::read(file, &c, 1) == 1 && c != '\n';)
        line += c;
    return line;
}

} // namespace

ServiceProcess::ServiceProcess(std::vector<std::string> arguments, Environment const& more, Starter* starter,
                               int socket)
    : starter_(starter), errors_(newFile()) {
    int ends[2];
    if (::pipe2(ends, O_CLOEXEC) != 0)
        throw std::runtime_error("no pipe");
    int const errors = ::open(errors_.c_str(), O_WRONLY | O_CLOEXEC);
    process_ = starter_ ? starter_->start(arguments, more, ends[1], errors) : ::fork();
    if (process_ == 0)
        become(std::move(arguments), more, ends[1], errors, socket);
    ::close(errors);
    ::close(ends[1]);
    firstLine_ = lineFrom(ends[0]);
    ::close(ends[0]);
}

ServiceProcess::~ServiceProcess() {
    if (process_ > 0) {
        signal(SIGKILL);
        wait();
    }
    std::error_code ignored;
    fs::remove(errors_, ignored);
}

std::uint16_t ServiceProcess::port() const {
    auto const colon = firstLine_.rfind(':');
    return colon == std::string::npos ? std::uint16_t(0)
                                      : static_cast<std::uint16_t>(std::stoi(firstLine_.substr(colon + 1)));
}

void ServiceProcess::signal(int number) const {
    if (process_ > 0)
        ::kill(process_, number);
}

bool ServiceProcess::isRunning() const {
    siginfo_t ended{};
    return process_ > 0 &&
           ::waitid(P_PID, static_cast<id_t>(process_), &ended, WEXITED | WNOHANG | WNOWAIT) == 0 &&
           ended.si_pid == 0;
}

bool ServiceProcess::awaitEnd(int& status) const {
    if (process_ > 0 && starter_)
        status = starter_->wait();
    return process_ > 0 && (starter_ || ::waitpid(process_, &status, 0) == process_);
}

int ServiceProcess::wait() {
    int status = 0;
    if (awaitEnd(status)) {
        process_ = -1;
        status_ = WIFSIGNALED(status) ? -WTERMSIG(status) : WEXITSTATUS(status);
    }
    return status_;
}

std::string ServiceProcess::errors() const {
    std::ifstream in(errors_);
    return {std::istreambuf_iterator<char>(in), {}};
}

std::unique_ptr<Channel::Client> clientOf(ServiceProcess const& service, fs::path const& data) {
    Channel::ClientSettings settings;
    settings.host = "127.0.0.1";
    settings.port = service.port();
    settings.token = Channel::readToken((data / "token").string());
    return std::make_unique<Channel::Client>(std::move(settings));
}

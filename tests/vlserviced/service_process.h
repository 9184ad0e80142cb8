#pragma once
// The program itself as a process, on loopback with a port of its own choice.

#include "programs/channel/client.h"

#include <cstdint>
#include <filesystem>
#include <map>
#include <memory>
#include <string>
#include <sys/types.h>
#include <vector>

class ServiceProcess {
public:
    using Environment = std::map<std::string, std::string>;

    /// Another way to begin the program than from a file, as a child of another process.
    class Starter {
    public:
        virtual ~Starter() = default;
        virtual pid_t start(std::vector<std::string> const& arguments, Environment const& more, int out,
                            int err) = 0;
        /// What waitpid() says of it in the end.
        virtual int wait() = 0;
    };

    /// Starts the program and waits for its first line, or for its end. `starter` lives longer.
    /// A socket of 0 or above is handed over as the system's manager does it.
    ServiceProcess(std::vector<std::string> arguments, Environment const& more = {},
                   Starter* starter = nullptr, int socket = -1);
    /// Kills it if it still runs.
    ~ServiceProcess();
    ServiceProcess(ServiceProcess const&) = delete;
    ServiceProcess& operator=(ServiceProcess const&) = delete;

    /// Its first line; empty when it ended without one.
    std::string const& firstLine() const { return firstLine_; }
    /// From the first line; 0 when there is none.
    std::uint16_t port() const;

    void signal(int number) const;
    bool isRunning() const;
    /// Waits for its end and gives the exit status, or minus the number of the signal that ended it.
    int wait();
    /// What it has written to standard error, after its end.
    std::string errors() const;

private:
    /// Waits for the end; false when there is none to wait for.
    bool awaitEnd(int& status) const;

    Starter* starter_;
    pid_t process_ = -1;
    int status_ = 0;
    std::filesystem::path errors_;
    std::string firstLine_;
};

/// A client of the service on a data folder. Throws what Channel::Client does.
std::unique_ptr<Channel::Client> clientOf(ServiceProcess const& service, std::filesystem::path const& data);

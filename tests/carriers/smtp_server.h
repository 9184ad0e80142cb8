#pragma once
// A server of e-mail as a process: smtp_server.py, which tells what it can be asked for.

#include "programs/base/read_file.h"
#include "vlservice/json/json.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <filesystem>
#include <map>
#include <sstream>
#include <stdexcept>
#include <string>
#include <vector>

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

namespace VLServiceTest {

class SmtpServer {
public:
    /// `wanted` without the folder, which is made.
    SmtpServer(std::filesystem::path folder, json::Object wanted) : folder_(std::move(folder)) {
        std::filesystem::create_directories(folder_);
        wanted.set("folder", folder_.string());
        std::ostringstream text;
        text << wanted;
        start(text.str());
        firstLine_ = line();
    }
    ~SmtpServer() {
        ::close(input_);
        ::close(output_);
        ::waitpid(process_, nullptr, 0);
    }
    SmtpServer(SmtpServer const&) = delete;
    SmtpServer& operator=(SmtpServer const&) = delete;

    /// Why there is none; empty where there is one.
    std::string missing() const {
        bool const isPort =
            !firstLine_.empty() && firstLine_.find_first_not_of("0123456789") == firstLine_.npos;
        return isPort ? "" : "no server of e-mail: " + firstLine_;
    }
    std::string url(char const* scheme = "smtp") const { return scheme + ("://127.0.0.1:" + firstLine_); }

    /// Waits until it has one more message.
    void awaitMessage() const { line(); }
    /// Each with its sender and its recipients on a line in front, the oldest first.
    std::vector<std::string> messages() const {
        std::map<std::pair<std::size_t, std::string>, std::string> found;
        for (auto const& entry : std::filesystem::directory_iterator(folder_))
            if (std::string const name = entry.path().filename().string(); entry.path().extension() == ".eml")
                found[{name.size(), name}] = Base::readFile(entry.path());
        std::vector<std::string> texts;
        for (auto const& [name, text] : found)
            texts.push_back(text);
        return texts;
    }

private:
    void start(std::string const& wanted) {
        int in[2];
        int out[2];
        if (::pipe2(in, O_CLOEXEC) != 0 || ::pipe2(out, O_CLOEXEC) != 0)
            throw std::runtime_error("no pipe");
        process_ = ::fork();
        if (process_ == 0) {
            ::dup2(in[0], STDIN_FILENO);
            ::dup2(out[1], STDOUT_FILENO);
            ::dup2(::open((folder_ / "errors").c_str(), O_WRONLY | O_CREAT | O_APPEND, 0600), STDERR_FILENO);
            ::execl("/usr/bin/python3", "python3", SMTP_SERVER, wanted.c_str(), nullptr);
            ::_exit(127);
        }
        ::close(in[0]);
        ::close(out[1]);
        input_ = in[1];
        output_ = out[0];
    }
    std::string line() const {
        std::string text;
        for (char c; ::read(output_, &c, 1) == 1 && c != '\n';)
            text += c;
        return text;
    }

    std::filesystem::path folder_;
    std::string firstLine_;
    int input_ = -1;
    int output_ = -1;
    pid_t process_ = -1;
};

} // namespace VLServiceTest

#pragma once
// A mail server of the system's own, which delivers into mailboxes below a folder.

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <string>
#include <sys/types.h>

/// It knows ada@example.com, bills@acme.example, who gets what comes back, and gone@example.com, whose mails
/// it takes and then cannot deliver.
class PostfixServer {
public:
    /// Its files lie in `folder`, which others may enter; TLS is with that certificate and its key.
    PostfixServer(std::filesystem::path folder, std::string const& certificateFile,
                  std::string const& keyFile);
    ~PostfixServer();
    PostfixServer(PostfixServer const&) = delete;
    PostfixServer& operator=(PostfixServer const&) = delete;

    /// Why there is none; empty where there is one.
    static std::string whyNot();

    std::string url() const { return "smtp://127.0.0.1:" + std::to_string(port_); }
    /// The most bytes of a message.
    static constexpr std::size_t SIZE_LIMIT = 3'000'000;
    /// The first mail of that user ("ada"), which is waited for.
    std::string mailOf(std::string const& user) const;

private:
    void makeFolders() const;
    void writeSettings(std::string const& certificateFile, std::string const& keyFile) const;
    void writeServices() const;
    void start();
    void end();

    std::filesystem::path folder_;
    std::uint16_t port_ = 0;
    pid_t process_ = -1;
};

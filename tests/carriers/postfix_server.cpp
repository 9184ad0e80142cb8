#include "tests/carriers/postfix_server.h"

#include "programs/base/read_file.h"
#include "tests/support/cutting_relay.h"
#include "tests/support/free_port.h"

#include <fcntl.h>
#include <grp.h>
#include <pwd.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <fstream>
#include <optional>
#include <stdexcept>
#include <utility>

namespace {

namespace fs = std::filesystem;

constexpr char const* PROGRAM = "/usr/lib/postfix/sbin/master";
constexpr char const* OWNER = "postfix";
constexpr char const* GROUP = "postdrop";
constexpr char const* NOBODY = "nobody";
constexpr auto PATIENCE = std::chrono::seconds(60);

void makeFolder(fs::path const& folder, char const* owner, char const* group, unsigned rights) {
    fs::create_directories(folder);
    passwd const* const user = owner ? ::getpwnam(owner) : nullptr;
    ::group const* const members = group ? ::getgrnam(group) : nullptr;
    uid_t const uid = user ? user->pw_uid : static_cast<uid_t>(-1);
    gid_t const gid = members ? members->gr_gid : static_cast<gid_t>(-1);
    if ((owner && !user) || (group && !members) || ::chown(folder.c_str(), uid, gid) != 0)
        throw std::runtime_error("no right to give " + folder.string() + " away");
    fs::permissions(folder, fs::perms(rights));
}

/// Asks until there is an answer.
template<typename Ask>
auto awaited(Ask ask, char const* what) {
    auto const end = std::chrono::steady_clock::now() + PATIENCE;
    for (;;) {
        if (auto answer = ask())
            return answer;
        if (std::chrono::steady_clock::now() > end)
            throw std::runtime_error(std::string("no ") + what);
    }
}

} // namespace

std::string PostfixServer::whyNot() {
    if (::access(PROGRAM, X_OK) != 0)
        return "there is no " + std::string(PROGRAM);
    return ::geteuid() == 0 ? std::string() : "its processes change to users of their own: only root may";
}

PostfixServer::PostfixServer(fs::path folder, std::string const& certificateFile, std::string const& keyFile)
    : folder_(std::move(folder)) {
    makeFolders();
    for (int attempt = 1; process_ < 0; ++attempt) {
        port_ = VLServiceTest::freePort();
        writeSettings(certificateFile, keyFile);
        writeServices();
        try {
            start();
        } catch (std::runtime_error const&) {
            // Somebody else may have taken the port in front of it.
            end();
            if (attempt == 3)
                throw;
        }
    }
}

PostfixServer::~PostfixServer() { end(); }

void PostfixServer::makeFolders() const {
    makeFolder(folder_ / "settings", nullptr, nullptr, 0755);
    makeFolder(folder_ / "data", OWNER, nullptr, 0700);
    makeFolder(folder_ / "mail", NOBODY, nullptr, 0755);
    makeFolder(folder_ / "queue" / "pid", nullptr, nullptr, 0755);
    makeFolder(folder_ / "queue" / "public", OWNER, GROUP, 0710);
    makeFolder(folder_ / "queue" / "maildrop", OWNER, GROUP, 0730);
    for (char const* const name : {"active", "bounce", "corrupt", "defer", "deferred", "flush", "hold",
                                   "incoming", "private", "saved", "trace"})
        makeFolder(folder_ / "queue" / name, OWNER, nullptr, 0700);
    fs::path const refuse = folder_ / "refuse";
    // That there is no such user.
    std::ofstream(refuse) << "#!/bin/sh\nexit 67\n";
    fs::permissions(refuse, fs::perms(0755));
}

void PostfixServer::writeSettings(std::string const& certificateFile, std::string const& keyFile) const {
    std::string const folder = folder_.string();
    std::ofstream(folder_ / "settings" / "main.cf")
        << "compatibility_level = 3.6\n"
        << "queue_directory = " << folder << "/queue\ndata_directory = " << folder << "/data\n"
        << "command_directory = /usr/sbin\ndaemon_directory = /usr/lib/postfix/sbin\n"
        << "mail_owner = " << OWNER << "\nsetgid_group = " << GROUP << '\n'
        << "maillog_file = " << folder << "/log\nmaillog_file_prefixes = " << folder << '\n'
        << "myhostname = mail.example\ninet_interfaces = 127.0.0.1\nmynetworks = 127.0.0.0/8\n"
        << "mydestination =\nlocal_recipient_maps =\nalias_maps =\n"
        << "virtual_mailbox_domains = example.com, acme.example\nvirtual_mailbox_base = " << folder
        << "/mail\n"
        << "virtual_mailbox_maps = inline:{ {ada@example.com = ada/} {gone@example.com = gone/} "
           "{bills@acme.example = bills/} }\n"
        << "virtual_uid_maps = static:" << ::getpwnam(NOBODY)->pw_uid << "\nvirtual_minimum_uid = 1\n"
        << "virtual_gid_maps = static:" << ::getpwnam(NOBODY)->pw_gid << '\n'
        << "transport_maps = inline:{ {gone@example.com = refusing:} }\n"
        << "message_size_limit = " << SIZE_LIMIT << '\n'
        << "smtpd_tls_security_level = may\nsmtpd_tls_cert_file = " << certificateFile
        << "\nsmtpd_tls_key_file = " << keyFile << '\n';
}

void PostfixServer::writeServices() const {
    std::ofstream file(folder_ / "settings" / "master.cf");
    file << "127.0.0.1:" << port_ << " inet n - n - - smtpd\n"
         << "qmgr unix n - n 300 1 qmgr\n"
         << "tlsmgr unix - - n 1000? 1 tlsmgr\n"
         << "rewrite unix - - n - - trivial-rewrite\n"
         << "verify unix - - n - 1 verify\n"
         << "virtual unix - n n - - virtual\n"
         << "postlog unix-dgram n - n - 1 postlogd\n"
         << "refusing unix - n n - - pipe user=" << NOBODY << " argv=" << (folder_ / "refuse").string()
         << '\n';
    for (char const* const name : {"cleanup", "proxymap", "error", "anvil"})
        file << name << " unix " << (*name == 'c' ? 'n' : '-') << " - n - 0 " << name << '\n';
    for (char const* const name : {"bounce", "defer", "trace"})
        file << name << " unix - - n - 0 bounce\n";
}

void PostfixServer::start() {
    std::string const settings = (folder_ / "settings").string();
    process_ = ::fork();
    if (process_ == 0) {
        ::setpgid(0, 0);
        int const said = ::open((folder_ / "said").c_str(), O_WRONLY | O_CREAT | O_APPEND, 0600);
        ::dup2(said, STDOUT_FILENO);
        ::dup2(said, STDERR_FILENO);
        ::execl(PROGRAM, "master", "-c", settings.c_str(), "-d", nullptr);
        ::_exit(127);
    }
    awaited(
        [this] {
            if (::waitpid(process_, nullptr, WNOHANG) != 0)
                throw std::runtime_error("the mail server ended: " + Base::readFile(folder_ / "said"));
            int const socket = VLServiceTest::connectedTo(port_);
            if (socket >= 0)
                ::close(socket);
            return socket >= 0;
        },
        "mail server");
}

void PostfixServer::end() {
    if (process_ > 0) {
        // With all of its processes, which are of its group.
        ::kill(-process_, SIGTERM);
        ::waitpid(process_, nullptr, 0);
    }
    process_ = -1;
}

std::string PostfixServer::mailOf(std::string const& user) const {
    fs::path const box = folder_ / "mail" / user / "new";
    return awaited(
               [&]() -> std::optional<std::string> {
                   std::error_code none;
                   for (fs::directory_entry const& mail : fs::directory_iterator(box, none))
                       return Base::readFile(mail.path());
                   return std::nullopt;
               },
               "mail")
        .value();
}

#include "tests/carriers/ssh_server.h"

#include "tests/support/without_rights.h"

#include <fcntl.h>
#include <pwd.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <grp.h>
#include <memory>
#include <stdexcept>
#include <utility>

namespace {

namespace fs = std::filesystem;

constexpr char const* PROGRAM = "/usr/sbin/sshd";

uid_t user() { return ::geteuid() == 0 ? VLServiceTest::WithoutRights::NOBODY : ::geteuid(); }

std::string nameOfUser() { return ::getpwuid(user())->pw_name; }

std::string outputOf(std::string const& command) {
    std::unique_ptr<FILE, decltype(&::pclose)> const pipe(::popen(command.c_str(), "re"), &::pclose);
    std::string output;
    char bytes[256];
    while (std::size_t const size = pipe ? std::fread(bytes, 1, sizeof bytes, pipe.get()) : 0)
        output.append(bytes, size);
    return output;
}

void giveToUser(fs::path const& file, fs::perms rights) {
    fs::permissions(file, rights);
    if (::chown(file.c_str(), user(), static_cast<gid_t>(-1)) != 0)
        throw std::runtime_error("no right to give " + file.string() + " away");
}

} // namespace

std::string SshServer::whyNot() {
    return ::access(PROGRAM, X_OK) == 0 ? std::string() : "there is no " + std::string(PROGRAM);
}

SshServer::SshServer(fs::path const& folder, fs::path drop) : folder_(folder), drop_(std::move(drop)) {
    fs::permissions(folder_.parent_path(), fs::perms(0755));
    fs::create_directories(folder_);
    for (char const* const name : {"host", "user", "stranger"})
        makeKey(name);
    fs::copy_file(folder_ / "user.pub", folder_ / "authorized");
    std::ofstream(folder_ / "config") << "HostKey " << (folder_ / "host").string() << "\nAuthorizedKeysFile "
                                      << (folder_ / "authorized").string()
                                      << "\nPidFile none\nUsePAM yes\nStrictModes no\nLogLevel QUIET\n"
                                         "PasswordAuthentication no\nSubsystem sftp internal-sftp\n";
    giveToUser(folder_ / "host", fs::perms(0600));
    giveToUser(folder_ / "config", fs::perms(0644));
    // "256 SHA256:... comment (ED25519)"
    std::string const told = outputOf("ssh-keygen -l -f '" + (folder_ / "host.pub").string() + "'");
    hostKey_ = told.substr(told.find("SHA256:"), 50);
    relay_.emplace([this] { return connect(); });
}

void SshServer::makeKey(char const* name) const {
    outputOf("ssh-keygen -q -t ed25519 -N '' -C test -f '" + (folder_ / name).string() + "'");
}

std::string SshServer::url() const {
    return "sftp://" + nameOfUser() + "@127.0.0.1:" + std::to_string(relay_->port()) + drop_.string() + '/';
}

int SshServer::connect() const {
    int ends[2];
    if (::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) != 0)
        return -1;
    std::string const config = (folder_ / "config").string();
    bool const givesUpRights = ::geteuid() == 0;
    uid_t const id = user();
    pid_t const between = ::fork();
    if (between == 0) {
        // A grandchild: nobody has to wait for its end.
        if (::fork() != 0)
            ::_exit(0);
        if (givesUpRights && (::setgroups(0, nullptr) != 0 || ::setgid(id) != 0 || ::setuid(id) != 0))
            ::_exit(1);
        int const nowhere = ::open("/dev/null", O_WRONLY);
        if (::dup2(ends[1], 0) < 0 || ::dup2(ends[1], 1) < 0 || ::dup2(nowhere, 2) < 0)
            ::_exit(1);
        ::execl(PROGRAM, PROGRAM, "-i", "-f", config.c_str(), static_cast<char*>(nullptr));
        ::_exit(1);
    }
    ::waitpid(between, nullptr, 0);
    ::close(ends[1]);
    return ends[0];
}

#include "programs/base/pending_file.h"

#include "programs/base/file_descriptor.h"
#include "vlservice/platform/log.h"

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <fcntl.h>
#include <list>
#include <mutex>
#include <string>
#include <sys/stat.h>
#include <system_error>
#include <unistd.h>
#include <utility>

namespace Base {
namespace {

namespace fs = std::filesystem;

/// Of ".part".
constexpr int ENDING_LENGTH = 5;
constexpr int ENDING_SIGNALS[]{SIGINT, SIGTERM, SIGHUP, SIGPIPE};

/// Absolute. Read by the handler, and changed only while that cannot run.
std::list<std::string>& pendingNames() {
    static std::list<std::string> names;
    return names;
}
/// The process whose files they are; a child has a copy of the names.
volatile pid_t owner = 0;

class SignalsHeld {
public:
    SignalsHeld() : lock_(guard()) {
        sigset_t ending;
        ::sigemptyset(&ending);
        for (int const number : ENDING_SIGNALS)
            ::sigaddset(&ending, number);
        ::pthread_sigmask(SIG_BLOCK, &ending, &before_);
    }
    ~SignalsHeld() { ::pthread_sigmask(SIG_SETMASK, &before_, nullptr); }
    SignalsHeld(SignalsHeld const&) = delete;
    SignalsHeld& operator=(SignalsHeld const&) = delete;

private:
    /// Against other threads; the handler, which must not wait, runs only in programs of one.
    static std::mutex& guard() {
        static std::mutex mutex;
        return mutex;
    }

    std::lock_guard<std::mutex> lock_;
    sigset_t before_;
};

extern "C" void removePendingFilesAndEnd(int number) {
    removePendingFiles();
    std::signal(number, SIG_DFL);
    std::raise(number);
}

[[noreturn]] void fail(std::string const& what) {
    throw std::system_error(errno, std::generic_category(), what);
}

/// The rights that a file made by open() would have; temporary files begin with fewer.
void giveUsualRights(int file) {
    mode_t const mask = ::umask(0);
    ::umask(mask);
    ::fchmod(file, 0666 & ~mask);
}

void trySyncFolder(fs::path const& target) {
    try {
        syncFolder(folderOf(target));
    } catch (std::system_error const& failure) {
        Log::Lock(4).logStreamLine() << failure.what() << "; a power failure may still undo "
                                     << target.string();
    }
}

} // namespace

PendingFile::PendingFile(fs::path target)
    : target_(std::move(target)), file_(target_), temporary_(file_.name()) {}

PendingFile::Temporary::Temporary(fs::path const& target) {
    // Once the file is there nothing may fail, or it would stay.
    SignalsHeld const held;
    std::list<std::string> name{fs::absolute(folderOf(target) / ".XXXXXX.part").string()};
    int const file = ::mkostemps(name.front().data(), ENDING_LENGTH, O_CLOEXEC);
    if (file < 0)
        fail("cannot write into " + folderOf(target).string());
    giveUsualRights(file);
    ::close(file);
    name_ = name.begin();
    pendingNames().splice(pendingNames().end(), name);
}

PendingFile::Temporary::~Temporary() {
    SignalsHeld const held;
    if (!isLeft_)
        ::unlink(name_->c_str());
    pendingNames().erase(name_);
}

void PendingFile::commit(Durability durability) {
    if (durability == Durability::Synced)
        FileDescriptor(temporary_, O_RDONLY).sync();
    if (::rename(temporary_.c_str(), target_.c_str()) != 0)
        fail("cannot write " + target_.string());
    file_.leave();
    if (durability == Durability::Synced)
        trySyncFolder(target_);
}

void writeFile(fs::path const& target, std::string_view bytes, PendingFile::Durability durability) {
    PendingFile pending(target);
    FileDescriptor file(pending.temporary(), O_WRONLY);
    file.writeAll(bytes);
    file.close();
    pending.commit(durability);
}

void removePendingFilesOnSignals() {
    owner = ::getpid();
    for (int const number : ENDING_SIGNALS) {
        struct sigaction before {};
        ::sigaction(number, nullptr, &before);
        // Who started the program with a signal ignored wants it to go on.
        if (before.sa_handler != SIG_IGN)
            std::signal(number, removePendingFilesAndEnd);
    }
    std::signal(SIGXFSZ, SIG_IGN);
}

void removePendingFiles() noexcept {
    if (::getpid() == owner)
        for (std::string const& name : pendingNames())
            ::unlink(name.c_str());
}

} // namespace Base

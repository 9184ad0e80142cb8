#pragma once
// A disk that is soon full.

#include <sched.h>
#include <sys/mount.h>
#include <unistd.h>

#include <cerrno>
#include <string>
#include <system_error>

namespace VLServiceTest {

/// A file system in memory with room for 8 KiB. It is mounted nowhere and goes when this goes.
class SmallDisk {
public:
    SmallDisk() : context_(::fsopen("tmpfs", FSOPEN_CLOEXEC)) {
        if (context_ >= 0 && ::fsconfig(context_, FSCONFIG_SET_STRING, "size", "8k", 0) == 0 &&
            ::fsconfig(context_, FSCONFIG_CMD_CREATE, nullptr, nullptr, 0) == 0)
            disk_ = ::fsmount(context_, FSMOUNT_CLOEXEC, 0);
        if (disk_ < 0)
            whyNot_ = std::generic_category().message(errno);
    }
    ~SmallDisk() {
        ::close(disk_);
        ::close(context_);
    }
    SmallDisk(SmallDisk const&) = delete;
    SmallDisk& operator=(SmallDisk const&) = delete;

    /// Empty when there is a disk.
    std::string const& whyNot() const { return whyNot_; }
    /// Its top folder, for this process and its children.
    std::string path() const {
        return "/proc/" + std::to_string(::getpid()) + "/fd/" + std::to_string(disk_);
    }

private:
    int context_;
    int disk_ = -1;
    std::string whyNot_;
};

/// A file system in memory in place of a folder, for this process alone, as long as it lives. For what looks
/// through links, as databases do.
class MountedDisk {
public:
    MountedDisk(std::string const& folder, char const* options) {
        bool const isThere = ::unshare(CLONE_NEWNS) == 0 &&
                             ::mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0 &&
                             ::mount("tmpfs", folder.c_str(), "tmpfs", 0, options) == 0;
        if (!isThere)
            whyNot_ = std::generic_category().message(errno);
    }

    /// Empty when it is there.
    std::string const& whyNot() const { return whyNot_; }

private:
    std::string whyNot_;
};

} // namespace VLServiceTest

#pragma once
// How long jobs and their containers are kept once they have ended.

#include "programs/vlserviced/settings/service_settings.h"
#include "programs/vlserviced/store/job_store.h"
#include "programs/vlserviced/store/letter_register.h"

#include <filesystem>
#include <functional>
#include <utility>

namespace VlServiced {

/// Used by the thread that the store is used by.
class Retention {
public:
    /// Store and register have to outlive it. `settings` are as they are at that moment, `now` is in seconds
    /// since the epoch.
    Retention(JobStore& jobs, LetterRegister& letterRegister, std::filesystem::path outbox,
              std::function<ServiceSettings()> settings, std::function<long long()> now)
        : jobs_(jobs), letterRegister_(letterRegister), outbox_(std::move(outbox)),
          settings_(std::move(settings)), now_(std::move(now)) {}

    /// Removes a few of the jobs whose time is up, with their containers, and what is past of the register;
    /// false when nothing of both is left. A container that cannot be removed keeps its job for the next
    /// time.
    bool removeSome();
    /// Takes what was removed out of the database's log, too.
    void finish();

private:
    bool removeJobs();
    bool remove(Job const& job);

    JobStore& jobs_;
    LetterRegister& letterRegister_;
    std::filesystem::path outbox_;
    std::function<ServiceSettings()> settings_;
    std::function<long long()> now_;
    bool hasRemoved_ = false;
};

} // namespace VlServiced

#include "programs/vlserviced/jobs/retention.h"

#include "programs/base/plain_text.h"
#include "programs/vlserviced/jobs/hand_over.h"
#include "programs/vlserviced/jobs/job_runner.h"
#include "vlservice/platform/log.h"

#include <system_error>

namespace VlServiced {
namespace {

namespace fs = std::filesystem;

/// Others wait meanwhile.
constexpr std::size_t AT_ONCE = 50;
constexpr long long DAY = 24 * 60 * 60;

/// What a carrier has left there. A folder that is away, or another one, is nobody's affair any more.
void removeHandedOver(Job const& job) {
    if (job.uploadFolder.empty() || job.state == JobState::Lodged)
        return;
    try {
        discardHandedOver(job.containerName(), UploadFolder(job.uploadFolder, job.uploadFolderIdentity));
    } catch (std::exception const& failure) {
        Log::Lock(4).logStreamLine() << "What is left of job " << job.pack.packId << " stays where it is. "
                                     << Base::oneLine(failure.what());
    }
}

} // namespace

bool Retention::removeSome() {
    bool const isPast = letterRegister_.removeSome(now_());
    hasRemoved_ |= isPast;
    return removeJobs() || isPast;
}

bool Retention::removeJobs() {
    long long const days = settings_().retentionDays();
    if (days == 0)
        return false;
    bool isAnyRemoved = false;
    for (Job const& job : jobs_.endedBefore(now_() - days * DAY, AT_ONCE))
        isAnyRemoved |= remove(job);
    hasRemoved_ |= isAnyRemoved;
    return isAnyRemoved;
}

bool Retention::remove(Job const& job) {
    std::error_code failure;
    for (fs::path const& folder : {outbox_ / JobRunner::REST_FOLDER, outbox_})
        if (!failure)
            fs::remove(folder / job.containerName(), failure);
    if (failure) {
        Log::Lock(4).logStreamLine() << "The container " << job.containerName()
                                     << " cannot be removed, which is tried again: " << failure.message();
        return false;
    }
    removeHandedOver(job);
    jobs_.forget(job.pack.packId);
    return true;
}

void Retention::finish() {
    if (std::exchange(hasRemoved_, false))
        jobs_.emptyLog();
}

} // namespace VlServiced

#include "programs/vlserviced/store/job.h"

namespace VlServiced {

bool isDoneWithPages(Job const& job) {
    bool const isDelivering = job.lettersState == JobState::Delivering;
    return !isDelivering && (hasEnded(job.state) || job.state == JobState::Submitted);
}

bool isToWorkOn(Job const& job) {
    return job.state == JobState::Accepted || job.state == JobState::Submitting ||
           (job.state == JobState::Queued && job.toUpload);
}

bool hasEnded(JobState state) {
    switch (state) {
    case JobState::Lodged:
    case JobState::Delivered:
    case JobState::Failed:
    case JobState::Cancelled:
    case JobState::Tried:
        return true;
    default:
        return false;
    }
}

} // namespace VlServiced

#include "programs/vlserviced/store/job.h"

namespace VlServiced {

bool isDoneWithPages(JobState state) { return hasEnded(state) || state == JobState::Submitted; }

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

#include "programs/policy/course.h"

namespace Policy {

bool has(Cfg::ProcessMode mode, ProcessBit bit) {
    return (mode.bits() & static_cast<std::uint32_t>(bit)) != 0;
}

Course courseOf(Cfg::PackPreset const& mailing, Moment const& moment) {
    Cfg::ProcessMode const mode = mailing.processMode();
    Course course;
    course.handsOver = has(mode, ProcessBit::HandOver);
    course.holds = has(mode, ProcessBit::Hold);
    course.isTrial = has(mode, ProcessBit::Trial);
    if (mailing.pDelayInfo())
        course.due = slotAfter(*mailing.pDelayInfo(), moment).value_or(0);
    return course;
}

} // namespace Policy

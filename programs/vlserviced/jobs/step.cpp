#include "programs/vlserviced/jobs/step.h"

namespace VlServiced {

char const* stepName(Step step) {
    switch (step) {
    case Step::Storing:
        return "storing";
    case Step::Admission:
        return "admission";
    case Step::Packing:
        return "packing";
    case Step::Division:
        return "division";
    case Step::Staging:
        return "staging";
    case Step::Publishing:
        return "publishing";
    case Step::HandingOver:
        break;
    }
    return "handing over";
}

} // namespace VlServiced

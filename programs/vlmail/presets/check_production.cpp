// What pack presets say about carriers, and nodes about printers: whether it can be used.
#include "programs/base/millimetres.h"
#include "programs/production/production_rules.h"
#include "programs/vlmail/presets/checks.h"
#include "vlservice/cfg/app.h"

#include <string>
#include <vector>

namespace VlMail {
namespace {

using enum FindingKind;
using Production::ProductionRules;

std::string inWords(Cfg::Rect const& rect) {
    return "from " + Base::inMillimetres(rect.left) + " to " + Base::withMillimetres(rect.right) +
           " across and from " + Base::inMillimetres(rect.top) + " to " + Base::withMillimetres(rect.bottom) +
           " down";
}

} // namespace

void checkProductionRules(PresetsDocument const& document, Findings& findings) {
    for (ListedPackPreset const& pack : document.packPresets()) {
        std::vector<Reader::RulesFault> faults;
        ProductionRules::from(pack.json.get(ProductionRules::KEY), faults);
        for (Reader::RulesFault const& fault : faults)
            findings.add(ProductionRefused, pack.place / ProductionRules::KEY / fault.path,
                         {fault.what, fault.advice});
    }
}

void checkPrintArea(PresetsDocument const& document, Findings& findings) {
    json::Value const app = document.isPartAlone() ? json::Value() : document.json().get(Cfg::App::PART_NAME);
    if (!app.isObject())
        return;
    Unwrapped const area =
        unwrap(app.toObject().get("print_area"), Place() / Cfg::App::PART_NAME / "print_area");
    if (!area.node.isObject())
        return;
    Cfg::Rect const rect(area.node);
    if (!rect.isZeroes() && (rect.left >= rect.right || rect.top >= rect.bottom))
        findings.add(PrintAreaEmpty, area.place, {inWords(rect)});
}

} // namespace VlMail

#pragma once
// The commands that set one part of a node's settings.

#include "vlservice/cfg/app.h"
#include "vlservice/cfg/departments.h"
#include "vlservice/cfg/inet.h"
#include "vlservice/cfg/po.h"
#include "vlservice/cfg/profiles.h"
#include "vlservice/ipc/set_part_base.h"
#include "vlservice/presets/presets.h"

#include <memory>
#include <string>
#include <utility>

namespace Ipc {

/// Sets the part of class Part. A received part has been read once by that class, so that part() does not
/// throw.
template<typename Part, unsigned char Id>
class SetPartTmpl : public SetPartBase {
public:
    /// "Set ", the part's name, both in double quotes that belong to the value.
    static std::string const CMD_NAME;
    static constexpr unsigned char CMD_ID = Id;

    SetPartTmpl(std::shared_ptr<CmdProcessorI> processor) : SetPartBase(Id, std::move(processor)) {}
    SetPartTmpl(std::shared_ptr<CmdProcessorI> processor, Cfg::Id cfgId, Part const& part)
        : SetPartBase(Id, std::move(processor), std::move(cfgId), part.serialize()) {}

    char const* name() const override { return CMD_NAME.c_str(); }
    std::string const& partName() const override { return Part::PART_NAME; }

    /// The part as an object; the flags are those of its constructor.
    Part part(bool global, bool sorted) const { return Part(partJson(), global, sorted); }

private:
    void requireReadable(json::Value const& partJson) const override { Part(partJson, false, false); }
};

template<typename Part, unsigned char Id>
std::string const SetPartTmpl<Part, Id>::CMD_NAME = "\"Set " + Part::PART_NAME + '"';

using SetApp = SetPartTmpl<Cfg::App, 10>;
using SetInet = SetPartTmpl<Cfg::Inet, 12>;
using SetPresets = SetPartTmpl<Cfg::Presets, 13>;
using SetProfiles = SetPartTmpl<Cfg::Profiles, 14>;
using SetPO = SetPartTmpl<Cfg::PO, 15>;
using SetDepartments = SetPartTmpl<Cfg::Departments, 16>;

// The library forms their names when it is loaded, so that a program's static objects may use them.
extern template class VLSERVICE_EXPORT SetPartTmpl<Cfg::App, 10>;
extern template class VLSERVICE_EXPORT SetPartTmpl<Cfg::Inet, 12>;
extern template class VLSERVICE_EXPORT SetPartTmpl<Cfg::Presets, 13>;
extern template class VLSERVICE_EXPORT SetPartTmpl<Cfg::Profiles, 14>;
extern template class VLSERVICE_EXPORT SetPartTmpl<Cfg::PO, 15>;
extern template class VLSERVICE_EXPORT SetPartTmpl<Cfg::Departments, 16>;

} // namespace Ipc

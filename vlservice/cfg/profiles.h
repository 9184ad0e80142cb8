#pragma once
// The profiles that users pick from: a list whose elements are inherited one by one.

#include "vlservice/cfg/part.h"
#include "vlservice/export.h"
#include "vlservice/json/json.h"

#include <string>
#include <tuple>
#include <utility>

namespace Cfg {

/// JSON: an object with "name" and, when there is one, "descrip".
class VLSERVICE_EXPORT Profile {
public:
    Profile() = default;
    Profile(std::string name, std::string descr) : name_(std::move(name)), descr_(std::move(descr)) {}
    /// A description that is no text is empty. Throws json::Exc when there is no name.
    Profile(json::Object const& object);

    std::string const& name() const { return name_; } ///< as people pick it
    std::string const& descr() const { return descr_; }
    json::Object serialize() const;
    static json::RecordKeys const& keys();
    friend bool operator==(Profile const&, Profile const&) = default;

private:
    struct Keys;

    std::string name_;
    std::string descr_;
};

enum class VLSERVICE_EXPORT ProfFieldIdxs { Vals };

using ProfFields = std::tuple<Field<Profile, ArrValue<Profile>>>;

extern template class VLSERVICE_EXPORT Part<ProfFieldIdxs, ProfFields>;

/// The part "profiles".
class VLSERVICE_EXPORT Profiles : public Part<ProfFieldIdxs, ProfFields> {
public:
    static std::string const PART_NAME;
    static json::RecordKeys const& keys();

    Profiles(json::Value const& j, bool global, bool sorted);

    /// True when there is no profile, own or inherited.
    bool empty() const { return elements<ProfFieldIdxs::Vals>().empty(); }

private:
    static ProfFields const FLDS_INIT;
};

} // namespace Cfg

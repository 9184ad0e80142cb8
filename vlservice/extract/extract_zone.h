#pragma once
// A named part of a page together with the fields to look for in it.

#include "vlservice/cfg/geometry.h"
#include "vlservice/export.h"
#include "vlservice/extract/extract_field.h"
#include "vlservice/json/json.h"

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

/// How text blocks inside a zone are joined. Acted on by the reader; numbers without a name are kept.
enum class CombineBlocksMethod : std::int32_t { Default = 0 };

/// Whether and how finds are restricted to a zone's location. Acted on by the reader; numbers without a name
/// are kept.
enum class RestrictZoneLocation : std::int32_t { Default = 0 };

namespace Cfg {

/// A zone is found by its location or, without one, by the point where its content is expected.
class VLSERVICE_EXPORT ExtractZone {
public:
    static std::string const DEF_ZONE_NAME; ///< of the zone that has an address
    /// Where an address is expected on a letter.
    static constexpr Point DEF_MOST_PROBABLE_POINT{4500, 6200};

    ExtractZone() = default;
    ExtractZone(std::string const& name, std::vector<ExtractField> fields); ///< found by its point
    ExtractZone(std::string const& name, std::vector<ExtractField> fields, Rect const& location,
                CombineBlocksMethod combineBlocks, RestrictZoneLocation restrictToLocation);
    /// Throws json::Exc when "name" is not a string, "fields" is not an array of objects, or a field cannot
    /// be read.
    ExtractZone(json::Object const& object);

    std::string const& name() const { return name_; }                   ///< what people call it
    std::vector<ExtractField>& fields() { return fields_; }             ///< for changing
    std::vector<ExtractField> const& fields() const { return fields_; } ///< in the order of search
    /// Whether a field is a recipient address.
    bool hasAddress() const;

    Rect const& location() const { return location_; }
    bool hasLocation() const { return !location_.isZeroes(); } ///< found by its rectangle
    /// The default point when none is set.
    Point const& mostProbablePoint() const {
        return mostProbablePoint_.isZeroes() ? DEF_MOST_PROBABLE_POINT : mostProbablePoint_;
    }
    CombineBlocksMethod combineBlocks() const { return combineBlocks_; }
    RestrictZoneLocation restrictToLocation() const { return restrictToLocation_; }

    /// Compares the stored points: a zone that relies on the default differs from one that stores the same
    /// point.
    bool operator==(ExtractZone const& other) const;

    /// "name" and "fields" are always there; other keys that hold their default are left out.
    json::Object serialize() const;
    static json::RecordKeys const& keys();

    void setName(std::string name) { name_ = std::move(name); } ///< what people call it
    /// Leaves the most probable point alone.
    void setLocation(Rect const& location) { location_ = location; }
    /// Removes the location. The asymmetry is deliberate: a zone that is found by its point has no rectangle,
    /// but a rectangle may keep its point.
    void setMostProbablePoint(Point const& point) {
        mostProbablePoint_ = point;
        location_ = {};
    }
    void setCombineBlocks(CombineBlocksMethod method) { combineBlocks_ = method; }
    void setRestrictToLocation(RestrictZoneLocation restriction) { restrictToLocation_ = restriction; }

private:
    struct Keys;

    std::string name_;
    std::vector<ExtractField> fields_;
    Rect location_;
    Point mostProbablePoint_;
    CombineBlocksMethod combineBlocks_ = CombineBlocksMethod::Default;
    RestrictZoneLocation restrictToLocation_ = RestrictZoneLocation::Default;
};

} // namespace Cfg

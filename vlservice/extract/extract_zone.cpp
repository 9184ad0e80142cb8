#include "vlservice/extract/extract_zone.h"

#include "vlservice/json/json_record.h"

#include <algorithm>
#include <tuple>

namespace Cfg {

struct ExtractZone::Keys {
    static constexpr std::tuple TABLE{
        json::Required{"name", &ExtractZone::name_},
        json::Required{"fields", &ExtractZone::fields_},
        json::Key{"location", &ExtractZone::location_},
        json::Key{"most_probable_point", &ExtractZone::mostProbablePoint_},
        json::Key{"combine_blocks", &ExtractZone::combineBlocks_},
        json::Key{"restrict_to_location", &ExtractZone::restrictToLocation_},
    };
};

std::string const ExtractZone::DEF_ZONE_NAME = "_Address";

ExtractZone::ExtractZone(std::string const& name, std::vector<ExtractField> fields)
    : name_(name), fields_(std::move(fields)) {}

ExtractZone::ExtractZone(std::string const& name, std::vector<ExtractField> fields, Rect const& location,
                         CombineBlocksMethod combineBlocks, RestrictZoneLocation restrictToLocation)
    : name_(name), fields_(std::move(fields)), location_(location), combineBlocks_(combineBlocks),
      restrictToLocation_(restrictToLocation) {}

ExtractZone::ExtractZone(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }

bool ExtractZone::hasAddress() const {
    return std::any_of(fields_.begin(), fields_.end(),
                       [](auto const& field) { return field.priority() >= 1; });
}

bool ExtractZone::operator==(ExtractZone const& other) const {
    return json::sameKeys(Keys::TABLE, *this, other);
}

json::Object ExtractZone::serialize() const {
    json::Object object;
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

json::RecordKeys const& ExtractZone::keys() {
    static json::RecordKeys const keys{json::describeKeys(Keys::TABLE)};
    return keys;
}

} // namespace Cfg

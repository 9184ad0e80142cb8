#include "vlservice/extract/extract_preset.h"

#include "vlservice/extract/regex.h"
#include "vlservice/json/json_record.h"

#include <ctime>
#include <limits>
#include <string_view>
#include <tuple>
#include <type_traits>

namespace Cfg {

static_assert(std::is_nothrow_move_constructible_v<ExtractPreset>);
static_assert(std::is_nothrow_move_assignable_v<ExtractPreset>);

using ZoneList = json::Form<std::vector<ExtractZone>>;

int ExtractPreset::MAX_ORDER = std::numeric_limits<int>::max();

/// In wire order.
struct ExtractPreset::Keys {
    /// All that is left of a preset that is marked for deletion.
    static constexpr std::tuple TOMBSTONE{
        json::Key{"match", &ExtractPreset::match_}.alwaysWritten(),
        json::Key{"order", &ExtractPreset::order_},
        json::Key{"erase_me", &ExtractPreset::eraseMe_},
    };
    static constexpr std::tuple NAMES{
        json::Key{"pack_preset", &ExtractPreset::packPreset_},
        json::Key{"name", &ExtractPreset::name_},
    };
    static constexpr std::tuple SETTINGS{
        json::Key{"type", &ExtractPreset::type_},
        json::Key{"use_only_fields", &ExtractPreset::useFieldsOnly_},
        json::Key{"ocr_mode", &ExtractPreset::ocrMode_},
        json::Key{"ocr_test_pages", &ExtractPreset::ocrTestPages_},
        json::Key{"tet_granularity", &ExtractPreset::tetPageOption_},
        json::Key{"space_adjust_perc", &ExtractPreset::spaceAdjustPerc_},
        json::Key{"no_spaces_in_frags", &ExtractPreset::noSpacesInFrags_},
        json::Key{"trim_frags", &ExtractPreset::trimFrags_},
        json::Key{"skip_images", &ExtractPreset::skipImages_},
        json::Key{"signature_adjust", &ExtractPreset::signatureAdjust_},
        json::Key{"retry_on_repeated", &ExtractPreset::retryOnRepeated_},
        json::Key{"skip_first_page", &ExtractPreset::skipFirstPage_},
        json::Key{"last_used", &ExtractPreset::lastUsed_},
        json::Key{"max_spaces_between_fragments", &ExtractPreset::maxSpacesBetweenFrags_,
                  MAX_SPACES_BETWEEN_FRAGS_DEFAULT},
        json::Key{"max_line_distance", &ExtractPreset::maxLineDistance_, LINE_DISTANCE_MAX_DEFAULT},
        json::Key{"zones", &ExtractPreset::zones_},
    };
};

ExtractPreset::ExtractPreset(std::string const& regex, std::string const& packPreset,
                             std::shared_ptr<ExtractZones> zones)
    : match_(regex), packPreset_(packPreset), zones_(std::move(zones)) {}

ExtractPreset::ExtractPreset(bool useFieldsOnly, bool skipImages, bool skipFirstPage,
                             std::shared_ptr<ExtractZones> zones)
    : useFieldsOnly_(useFieldsOnly), skipImages_(skipImages), skipFirstPage_(skipFirstPage),
      zones_(std::move(zones)) {}

ExtractPreset::ExtractPreset(json::Object const& object) {
    json::readKeys(Keys::TOMBSTONE, object, *this);
    json::readKeys(Keys::NAMES, object, *this);
    json::readKeys(Keys::SETTINGS, object, *this);
    if (maxSpacesBetweenFrags_ <= 0.0)
        maxSpacesBetweenFrags_ = MAX_SPACES_BETWEEN_FRAGS_DEFAULT;
    if (maxLineDistance_ <= 0.0)
        maxLineDistance_ = LINE_DISTANCE_MAX_DEFAULT;
}

bool ExtractPreset::match(std::string const& name) const { return regex().matches(name); }

bool ExtractPreset::match(std::string const& regex, std::string const& name) {
    return NameRegex(regex).matches(name);
}

bool ExtractPreset::compareSettings(ExtractPreset const& other) const {
    return json::sameKeys(Keys::SETTINGS, *this, other) && eraseMe_ == other.eraseMe_;
}

bool ExtractPreset::operator==(ExtractPreset const& other) const {
    return json::sameKeys(Keys::NAMES, *this, other) && json::sameKeys(Keys::TOMBSTONE, *this, other) &&
           compareSettings(other);
}

json::Object ExtractPreset::serialize() const {
    json::Object object;
    json::writeKeys(Keys::TOMBSTONE, *this, object);
    if (eraseMe_)
        return object;
    json::writeKeys(Keys::NAMES, *this, object);
    json::writeKeys(Keys::SETTINGS, *this, object);
    return object;
}

json::RecordKeys const& ExtractPreset::keys() {
    static json::RecordKeys const keys{json::describeKeys(Keys::TOMBSTONE, Keys::NAMES, Keys::SETTINGS)};
    return keys;
}

void ExtractPreset::resetLastUsed() const { lastUsed_ = std::time(nullptr); }

void ExtractPreset::setAsAutoExpireFor(std::string const& name) {
    // The name may be one of this preset's own texts.
    std::string match = escapeSpecialRegexChars(name);
    packPreset_ = "#auto_" + name;
    match_ = std::move(match);
    name_.clear();
    resetLastUsed();
}

NameRegex const& ExtractPreset::regex() const { return compiledMatch_.get(match_); }

std::string ExtractPreset::escapeSpecialRegexChars(std::string text) {
    constexpr std::string_view SPECIAL = R"(.[{}()\*+?|^$)";
    for (auto at = text.find_first_of(SPECIAL); at != std::string::npos;
         at = text.find_first_of(SPECIAL, at + 2))
        text.insert(at, 1, '\\');
    return text;
}

ExtractPreset::OwnedZones::OwnedZones(json::Value const& node)
    : zones_(std::make_shared<ExtractZones>(ZoneList::read(node))) {}

ExtractPreset::OwnedZones::OwnedZones(OwnedZones const& other)
    : zones_(other.empty() ? nullptr : std::make_shared<ExtractZones>(*other.zones_)) {}

ExtractPreset::OwnedZones& ExtractPreset::OwnedZones::operator=(OwnedZones const& other) {
    return *this = OwnedZones(other);
}

ExtractZones& ExtractPreset::OwnedZones::list() const {
    if (!zones_)
        zones_ = std::make_shared<ExtractZones>();
    return *zones_;
}

bool ExtractPreset::OwnedZones::operator==(OwnedZones const& other) const {
    return empty() || other.empty() ? empty() == other.empty() : *zones_ == *other.zones_;
}

json::Value ExtractPreset::OwnedZones::serialize() const { return ZoneList::write(list()); }

} // namespace Cfg

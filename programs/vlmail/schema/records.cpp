#include "programs/vlmail/schema/records.h"

#include "programs/production/production_rules.h"
#include "programs/reader/reading_rules.h"
#include "programs/vlmail/presets/known_numbers.h"
#include "programs/vlmail/schema/descriptions.h"
#include "vlservice/cfg/field.h"
#include "vlservice/cfg/geometry.h"
#include "vlservice/presets/process_mode.h"
#include "vlservice/presets/settings_parts.h"

#include <algorithm>
#include <cstdint>
#include <iterator>
#include <limits>
#include <span>
#include <string>

namespace VlMail {
namespace {

namespace Schema = Base::Schema;
using json::Inheritance;
using json::KeyRow;
using json::KeyType;

constexpr char const* PACK_PRESET = "pack_preset";
constexpr char const* PRESETS_PAGE = "presets.md";
constexpr char const* SETTINGS_PAGE = "settings.md";

struct RecordRow {
    char const* name;
    json::RecordKeys const& (*keys)();
    KeyTables tables;
    std::span<KnownNumbers const> numbers = {};
};

std::span<RecordRow const> records() {
    static RecordRow const all[] = {
        {"app", &Cfg::App::keys, {SETTINGS_PAGE, {"app"}}},
        {"inet", &Cfg::Inet::keys, {SETTINGS_PAGE, {"inet"}}},
        {"po", &Cfg::PO::keys, {SETTINGS_PAGE, {"po"}}},
        {"deps", &Cfg::Departments::keys, {SETTINGS_PAGE, {"deps"}}},
        {"department", &Cfg::Department::keys, {SETTINGS_PAGE, {}}},
        {"profiles", &Cfg::Profiles::keys, {SETTINGS_PAGE, {"profiles"}}},
        {"profile", &Cfg::Profile::keys, {SETTINGS_PAGE, {}}},
        {"presets", &Cfg::Presets::keys, {PRESETS_PAGE, {"The part"}}},
        {"extract_preset",
         &Cfg::ExtractPreset::keys,
         {PRESETS_PAGE, {"Extraction presets"}},
         EXTRACT_PRESET_NUMBERS},
        {"zone", &Cfg::ExtractZone::keys, {PRESETS_PAGE, {"Zones"}}},
        {"field", &Cfg::ExtractField::keys, {PRESETS_PAGE, {"Fields", "Validators"}}, FIELD_NUMBERS},
        {PACK_PRESET, &Cfg::PackPreset::keys, {PRESETS_PAGE, {"Pack presets"}}},
        {"delay", &Cfg::PackPreset::DelayInfo::keys, {PRESETS_PAGE, {"Delays"}}},
        {"attachment", &Cfg::PackPreset::Attachment::keys, {PRESETS_PAGE, {"Attachments"}}},
        {"letterhead", &Cfg::LetterheadInf::keys, {PRESETS_PAGE, {"Letterheads"}}},
        {"area", &Cfg::Rect::keys, {PRESETS_PAGE, {}}},
        {"point", &Cfg::Point::keys, {PRESETS_PAGE, {}}},
    };
    return all;
}

/// A reference to the record's definition.
json::Object reference(json::RecordKeys const& keys) {
    auto const row =
        std::ranges::find_if(records(), [&](RecordRow const& each) { return &each.keys() == &keys; });
    return row == records().end() ? Schema::mapOf(Schema::anything()) : Schema::definition(row->name);
}

template<typename Integer>
json::Object integersOf() {
    using Limits = std::numeric_limits<Integer>;
    using Widest = std::numeric_limits<std::int64_t>;
    return Schema::integer(Limits::is_signed ? static_cast<long long>(Limits::min()) : 0,
                           sizeof(Integer) == sizeof(std::int64_t) ? Widest::max()
                                                                   : static_cast<long long>(Limits::max()));
}

json::Object wrapperOr(json::Object const& plain) {
    json::Object const isWrapper{{Cfg::INH_KEY, Schema::constant(true)}};
    json::Array keys;
    keys.append(Cfg::INH_KEY);
    json::Object const then =
        Schema::Members().require(Cfg::VALUE_KEY, plain).add(Cfg::INH_KEY, Schema::flag()).schema();
    return {{"if", json::Object{{"type", "object"}, {"properties", isWrapper}, {"required", keys}}},
            {"then", then},
            {"else", plain}};
}

json::Object plainForm(KeyRow const& row) {
    switch (row.form.type) {
    case KeyType::Text:
        return Schema::text();
    case KeyType::Flag:
        return Schema::flag();
    case KeyType::Int32:
        return integersOf<std::int32_t>();
    case KeyType::UInt32:
        return integersOf<std::uint32_t>();
    case KeyType::UInt64:
        return integersOf<std::uint64_t>();
    case KeyType::Int64:
        return integersOf<std::int64_t>();
    case KeyType::Bits:
        return Schema::integer(0, Cfg::ModeRules::WIDTH);
    case KeyType::Number:
        return Schema::number();
    case KeyType::Record:
        return reference(*row.form.record);
    case KeyType::Records:
        return Schema::listOf(row.inheritance == Inheritance::ByElements
                                  ? wrapperOr(reference(*row.form.record))
                                  : reference(*row.form.record));
    case KeyType::Numbers:
        return Schema::listOf(integersOf<std::int64_t>());
    case KeyType::Texts:
        return Schema::listOf(Schema::text());
    case KeyType::Any:
        break;
    }
    return Schema::anything();
}

json::Value valueOf(std::string const& text) {
    return json::Value(json_loadb(text.data(), text.size(), JSON_DECODE_ANY, nullptr));
}

json::Object formOf(KeyRow const& row, std::span<KnownNumbers const> numbers) {
    if (row.use == json::KeyUse::Dropped)
        return {{"deprecated", true}};
    auto const known = std::ranges::find(numbers, row.name, &KnownNumbers::key);
    json::Object form = known == numbers.end() ? plainForm(row) : Schema::integer(known->least, known->most);
    if (row.inheritance == Inheritance::Whole)
        form = wrapperOr(form);
    if (json::Value const missing = valueOf(row.missing))
        form.set("default", missing);
    return form;
}

/// Keys that the record keeps and that these programs know.
void addKeysOfPrograms(json::RecordKeys const& keys, Schema::Members& into) {
    if (&keys != &Cfg::PackPreset::keys())
        return;
    into.add(Reader::ReadingRules::KEY, Reader::ReadingRules::schema());
    into.add(Production::ProductionRules::KEY, Production::ProductionRules::schema());
}

json::Object objectOf(RecordRow const& record) {
    Schema::Members members;
    for (KeyRow const& row : record.keys().rows) {
        members.add(row.name, formOf(row, record.numbers));
        if (row.use == json::KeyUse::Required)
            members.require(row.name);
    }
    addKeysOfPrograms(record.keys(), members);
    return described(members.schema(), record.tables);
}

RecordRow const* rowNamed(std::string_view name) {
    auto const row =
        std::ranges::find_if(records(), [&](RecordRow const& each) { return each.name == name; });
    return row == records().end() ? nullptr : &*row;
}

} // namespace

json::Value recordNamed(std::string_view name) {
    RecordRow const* const row = rowNamed(name);
    if (!row)
        return {};
    json::Object const object = objectOf(*row);
    return row->keys().mayBeText ? Schema::either({Schema::text(), object}) : object;
}

json::Object embeddedPackPreset() {
    json::Object const object = objectOf(*rowNamed(PACK_PRESET));
    json::Object const members = Schema::without(object.get("properties").toObject(), "name");
    return Schema::with(Schema::without(object, "required"), "properties", members);
}

} // namespace VlMail

#include "programs/vlmail/schema/schemas.h"

#include "programs/mailing/metadata.h"
#include "programs/protocol/carrier.h"
#include "programs/protocol/price.h"
#include "programs/protocol/service_settings.h"
#include "programs/vlmail/letters/reading.h"
#include "programs/vlmail/mailings/plan.h"
#include "programs/vlmail/schema/descriptions.h"
#include "programs/vlmail/schema/records.h"
#include "vlservice/extract/extracted_field.h"
#include "vlservice/presets/settings_parts.h"

#include <algorithm>
#include <string>

namespace VlMail {
namespace {

namespace Schema = Base::Schema;
using Schema::Members;

constexpr char const* LETTERS_PAGE = "letters-and-mailings.md";
constexpr char const* CARRIERS_PAGE = "carriers.md";
constexpr char const* SERVICE_PAGE = "service.md";

json::Array listOf(std::initializer_list<char const*> words) {
    json::Array all;
    for (char const* word : words)
        all.append(word);
    return all;
}

template<Cfg::ExtractedField::ValueType... TYPES>
json::Object oneOf() {
    json::Array all;
    (all.append(static_cast<int>(TYPES)), ...);
    return {{"enum", all}};
}

/// The library writes it; another key would be noticed by the tests.
json::Object extractedField() {
    using enum Cfg::ExtractedField::ValueType;
    json::Object const field = Members(Members::Others::Refused)
                                   .require("name", Schema::text())
                                   .add("type", oneOf<NotValidated, Plain, Time, Invalid>())
                                   .add("value", Schema::anything())
                                   .add("priority", Schema::integer())
                                   .add("send_to_server", Schema::flag())
                                   .add("ignore_on_group", Schema::integer())
                                   .schema();
    return described(field, {"presets.md", {"Values"}});
}

json::Object letter() { return described(letterSchema(), {LETTERS_PAGE, {"Reading: "}}); }

json::Object readDocument() {
    Members members(Members::Others::Refused);
    DocumentReading::describe(members);
    json::Object const whole = members.schema();
    json::Array either;
    either.append(json::Object{{"required", listOf({"error", "code"})}});
    either.append(json::Object{{"required", listOf({"extract_preset", "pack_preset", "letters"})}});
    return Schema::with(described(whole, {LETTERS_PAGE, {"Reading: "}}), "oneOf", either);
}

json::Object plan() { return described(Plan::schema(), {LETTERS_PAGE, {"Planning: "}}); }

json::Object metadata() {
    Members own;
    Mailing::Metadata::describe(own);
    json::Object const keys = described(own.schema(), {LETTERS_PAGE, {"The metadata of a mailing"}});
    json::Array both;
    both.append(embeddedPackPreset());
    both.append(keys);
    return {{"type", "object"}, {"allOf", both}};
}

json::Object partOf(std::string const& name) { return Schema::definition(name); }

/// Parts under their names, or the part "presets" by itself.
json::Object nodeSettings() {
    Members parts(Members::Others::Refused);
    parts.add(Schema::KEY, Schema::text());
    for (Cfg::PartInfo const& part : Cfg::settingsParts())
        parts.add(part.name, partOf(part.name));
    json::Array keys;
    keys.append(json::Object{{"required", listOf({"extract_presets"})}});
    keys.append(json::Object{{"required", listOf({"pack_presets"})}});
    return {{"type", "object"},
            {"if", json::Object{{"anyOf", keys}}},
            {"then", partOf(Cfg::Presets::PART_NAME)},
            {"else", parts.schema()}};
}

json::Object tariff() { return described(Protocol::Tariff::schema(), {SERVICE_PAGE, {"Prices"}}); }

json::Object carriers() {
    json::Array types;
    for (Protocol::CarrierSchema const& each : Protocol::carrierSchemas())
        types.append(described(each.schema, {CARRIERS_PAGE, {each.type, "Settings"}}));
    return Protocol::carriersSchema({{"oneOf", types}});
}

/// As a file, which may name its schema.
json::Object carriersFile() {
    return Schema::with(carriers(), "properties", json::Object{{Schema::KEY, Schema::text()}});
}

json::Object tariffFile() {
    json::Object const schema = tariff();
    json::Object const members = schema.get("properties").toObject();
    return Schema::with(schema, "properties", Schema::with(members, Schema::KEY, Schema::text()));
}

json::Object serviceSettings() {
    return described(Protocol::serviceSettingsSchema(carriers(), tariff()),
                     {SERVICE_PAGE, {"The service's own settings"}});
}

template<auto const& NAME>
json::Object part() {
    return Schema::definition(NAME);
}

constexpr NamedSchema SCHEMAS[] = {
    {"settings", "Settings of a node: its parts under their names, or the part \"presets\" alone",
     &nodeSettings},
    {"app", "The settings part \"app\"", &part<Cfg::App::PART_NAME>},
    {"inet", "The settings part \"inet\"", &part<Cfg::Inet::PART_NAME>},
    {"po", "The settings part \"po\"", &part<Cfg::PO::PART_NAME>},
    {"deps", "The settings part \"deps\"", &part<Cfg::Departments::PART_NAME>},
    {"profiles", "The settings part \"profiles\"", &part<Cfg::Profiles::PART_NAME>},
    {"presets", "The settings part \"presets\"", &part<Cfg::Presets::PART_NAME>},
    {"letter", "A line of vlmail letter --json: what a document was read as", &readDocument},
    {"plan", "What vlmail plan writes", &plan},
    {"metadata", "The metadata in the container of a mailing", &metadata},
    {"service-settings", "What vlmail settings service --json tells, and what sets it", &serviceSettings},
    {"carriers", "The ways out of the service: the file of vlmail settings service carriers=FILE",
     &carriersFile},
    {"tariff", "Prices: the file of vlmail settings service tariff=FILE", &tariffFile},
};

json::Object definitionNamed(std::string const& name) {
    if (name == Mailing::EXTRACTED_FIELD)
        return extractedField();
    if (name == LETTER_DEFINITION)
        return letter();
    return recordNamed(name).toObject();
}

/// Adds the definitions that are named in it, and those that are named in these.
void addDefinitions(json::Value const& node, json::Object& definitions) {
    constexpr std::string_view BEGIN = "#/$defs/";
    if (node.isArray())
        for (json::Value const& element : node.toArray())
            addDefinitions(element, definitions);
    if (!node.isObject())
        return;
    for (auto const& [key, member] : node.toObject()) {
        std::string const text = key == std::string_view("$ref") ? member.textOrEmpty() : std::string();
        std::string const name = text.starts_with(BEGIN) ? text.substr(BEGIN.size()) : std::string();
        if (!name.empty() && !definitions.get(name)) {
            json::Object const definition = definitionNamed(name);
            definitions.set(name, definition);
            addDefinitions(definition, definitions);
        }
        addDefinitions(member, definitions);
    }
}

} // namespace

std::span<NamedSchema const> schemas() { return SCHEMAS; }

NamedSchema const* schemaNamed(std::string_view name) {
    auto const found =
        std::ranges::find_if(SCHEMAS, [&](NamedSchema const& each) { return each.name == name; });
    return found == std::end(SCHEMAS) ? nullptr : &*found;
}

json::Object documentOf(NamedSchema const& schema) {
    json::Object document{{Schema::KEY, Schema::DRAFT}, {"title", schema.title}};
    json::Object const root = schema.make();
    for (auto const& [key, member] : root)
        document.set(key, member);
    json::Object definitions;
    addDefinitions(root, definitions);
    if (!definitions.empty())
        document.set("$defs", definitions);
    return document;
}

} // namespace VlMail

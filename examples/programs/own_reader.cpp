// A reader of one's own: takes letters out of the export of an office program, a line each. It knows where a
// text stands; which fields there are, and what they have to be, the presets say.
#include "vlservice/vlservice.h"

#include <iostream>
#include <map>
#include <sstream>
#include <string>
#include <string_view>

namespace {

constexpr std::string_view PRESETS = R"json({
    "extract_presets": [{"match": ".*\\.export", "pack_preset": "Bills", "zones": [
        {"name": "To", "fields": [
            {"name": "email", "value_extract": "^Email: (?<VAL>.*)$", "priority": 2, "send_to_server": true},
            {"name": "postal", "value_extract": "\\A(?<VAL>(.+\\n?)+)\\Z", "priority": 1, "send_to_server": true}]},
        {"name": "Sum", "fields": [
            {"name": "total", "value_extract": "(?<VAL>.+)", "value_type": 2, "value_max": 5000}]}]}],
    "pack_presets": [{"name": "Bills", "process_mode": 3}]})json";
constexpr char const* LETTERS = "To=Ada Brook/14 Mill Lane/HX7 8AB Hebden Bridge|Sum=42.50\n"
                                "To=Email: nadia@example.org|Sum=1234.50\n"
                                "To=Owen Pryce/3 Castle Street/LL32 8AY Conwy|Sum=7812.40\n"
                                "Sum=3.00\n";

/// "A=a/b|B=c" as the texts of zones; "/" is the end of a line.
std::map<std::string, std::string> zonesIn(std::string const& line) {
    std::map<std::string, std::string> zones;
    std::istringstream parts(line);
    for (std::string part; std::getline(parts, part, '|');)
        for (char const c : part.substr(part.find('=') + 1))
            zones[part.substr(0, part.find('='))] += c == '/' ? '\n' : c;
    return zones;
}

Cfg::ExtractedFields fieldsOf(Cfg::ExtractPreset const& preset, std::map<std::string, std::string> zones) {
    Cfg::ExtractedFields fields;
    for (Cfg::ExtractZone const& zone : preset.zones())
        for (Cfg::ExtractField const& field : zone.fields())
            if (auto const value = field.extractField(zones[zone.name()])) {
                field.validate(*value);
                fields.emplace(value->priority(), *value);
            }
    return fields;
}

} // namespace

int main() {
    Cfg::Presets const presets(json::strToObject(PRESETS.data(), PRESETS.size()), true, true);
    auto const& [extractPreset, packPreset] = presets.findMatch("march.export");
    std::istringstream lines(LETTERS);
    for (std::string line; std::getline(lines, line);) {
        Cfg::ExtractedFields const fields = fieldsOf(extractPreset, zonesIn(line));
        std::string message = "no address";
        if (fields.isProductionReady(message))
            message = fields.primaryAddressField()->name() + ", sent by " + packPreset.name();
        std::cout << message << '\n' << "    " << fields.serialize() << '\n';
    }
}

// Keys that nobody knows, and values that are not read as they stand.
#include "programs/base/json_schema.h"
#include "programs/production/production_rules.h"
#include "programs/reader/reading_rules.h"
#include "programs/vlmail/presets/acting.h"
#include "programs/vlmail/presets/checks.h"
#include "programs/vlmail/presets/known_numbers.h"
#include "programs/vlmail/presets/nearest_name.h"
#include "programs/vlmail/presets/words.h"
#include "vlservice/json/json_text.h"
#include "vlservice/presets/settings_parts.h"

#include <algorithm>
#include <cstdint>
#include <limits>
#include <string>

namespace VlMail {
namespace {

using enum FindingKind;
using json::Inheritance;
using json::KeyRow;
using json::KeyType;
using json::KeyUse;
using json::RecordKeys;

/// What is to be written where another type stands.
char const* wanted(KeyType type) {
    switch (type) {
    case KeyType::Text:
        return "a text in quotes";
    case KeyType::Flag:
        return "true or false";
    case KeyType::Int32:
    case KeyType::UInt32:
    case KeyType::Int64:
    case KeyType::UInt64:
    case KeyType::Bits:
        return "an integer";
    case KeyType::Number:
        return "a number";
    case KeyType::Record:
        return "an object {...}";
    case KeyType::Records:
        return "a list [...]";
    case KeyType::Numbers:
        return "a list of integers";
    case KeyType::Texts:
        return "a list of texts";
    case KeyType::Any:
        break;
    }
    return "a value";
}

/// What is read where another type stands.
std::string readsAs(KeyRow const& row) {
    if (row.missing.empty())
        return "nothing";
    return row.missing == R"("")" ? "the empty text" : row.missing;
}

bool isOfType(json::Value const& value, KeyType type) {
    switch (type) {
    case KeyType::Text:
        return value.isString();
    case KeyType::Flag:
        return json_is_boolean(value.node());
    case KeyType::Int32:
    case KeyType::UInt32:
    case KeyType::Int64:
    case KeyType::UInt64:
    case KeyType::Bits:
        return value.isInt();
    case KeyType::Number:
        return value.isInt() || value.isReal();
    case KeyType::Record:
        return value.isObject();
    case KeyType::Records:
    case KeyType::Numbers:
    case KeyType::Texts:
        return value.isArray();
    case KeyType::Any:
        break;
    }
    return true;
}

/// Keys that the record keeps and that this program knows; checkReadingRules and checkProductionRules look at
/// them.
std::vector<std::string> keysOfPrograms(RecordKeys const& keys) {
    if (&keys != &Cfg::PackPreset::keys())
        return {};
    return {Reader::ReadingRules::KEY, Production::ProductionRules::KEY};
}

/// Whether there is something else than what a missing key reads as.
bool isSet(json::Value const& value, KeyRow const& row) {
    return isOfType(value, row.form.type) && json::toText(value) != row.missing;
}

class KeyChecker {
public:
    explicit KeyChecker(Findings& findings) : findings_(findings) {}

    void check(json::Value const& node, Place const& place, RecordKeys const& keys) {
        if (node.isString() && keys.mayBeText)
            return;
        if (!node.isObject())
            return refuse(node, place,
                          keys.mayBeText ? "an object {...}, or the id as a text" : "an object {...}");
        json::Object const& object = node.toObject();
        for (auto const& [key, value] : object)
            checkKey(object, key, value, place, keys);
        for (KeyRow const& row : keys.rows)
            if (row.use == KeyUse::Required && !object.get(row.name))
                findings_.add(MissingKey, place, {inQuotes(row.name)});
    }

private:
    void checkKey(json::Object const& object, std::string const& key, json::Value const& value,
                  Place const& parent, RecordKeys const& keys) {
        KeyRow const* const row = keys.find(key);
        if (!row)
            return checkUnknown(object, key, parent / key, keys);
        if (row->use == KeyUse::Dropped)
            return findings_.add(DroppedKey, parent / key, {inQuotes(key)});
        Unwrapped const unwrapped = row->inheritance == Inheritance::Whole
                                        ? unwrap(value, parent / key)
                                        : Unwrapped{value, parent / key, false};
        checkValue(unwrapped.node, unwrapped.place, *row);
        if (isCarriedOnly(keys, key) && isSet(unwrapped.node, *row))
            findings_.add(CarriedOnly, unwrapped.place, {inQuotes(key)});
    }

    void checkUnknown(json::Object const& object, std::string const& key, Place const& place,
                      RecordKeys const& keys) {
        std::vector<std::string> candidates = keysOfPrograms(keys);
        if (std::ranges::find(candidates, key) != candidates.end())
            return;
        for (KeyRow const& row : keys.rows)
            if (row.use != KeyUse::Dropped)
                candidates.push_back(row.name);
        // A known key that stands in the same object already is not what was meant.
        std::erase_if(candidates, [&](std::string const& name) { return bool(object.get(name)); });
        std::string const nearest = nearestName(key, candidates);
        if (!nearest.empty())
            findings_.add(MisspeltKey, place, {inQuotes(key), inQuotes(nearest)});
        else if (!keys.keepsOthers)
            findings_.add(UnknownKey, place, {inQuotes(key)});
    }

    void checkValue(json::Value const& value, Place const& place, KeyRow const& row) {
        if (!isOfType(value, row.form.type)) {
            if (row.use != KeyUse::Lenient)
                return refuse(value, place, wanted(row.form.type));
            return findings_.add(WrongType, place, {value.typeName(), readsAs(row), wanted(row.form.type)});
        }
        if (value.isInt())
            checkRange(value.toInt(), place, row.form.type);
        else if (row.form.type == KeyType::Record)
            check(value, place, *row.form.record);
        else if (value.isArray())
            checkElements(value.toArray(), place, row);
    }

    void checkElements(json::Array const& array, Place const& place, KeyRow const& row) {
        for (std::size_t i = 0; i < array.size(); ++i) {
            json::Value const element = array.at(i);
            if (row.form.type == KeyType::Numbers && !element.isInt())
                refuse(element, place / i, "an integer");
            else if (row.form.type == KeyType::Texts && !element.isString())
                refuse(element, place / i, "a text in quotes");
            else if (row.form.type == KeyType::Records)
                checkElement(element, place / i, row);
        }
    }

    void checkElement(json::Value const& element, Place const& place, KeyRow const& row) {
        if (row.inheritance != Inheritance::ByElements)
            return check(element, place, *row.form.record);
        Unwrapped const unwrapped = unwrap(element, place);
        check(unwrapped.node, unwrapped.place, *row.form.record);
    }

    void refuse(json::Value const& value, Place const& place, char const* wanted) {
        findings_.add(RefusedType, place, {value.typeName(), wanted});
    }

    void checkRange(long long number, Place const& place, KeyType type) {
        using Int32 = std::numeric_limits<std::int32_t>;
        using UInt32 = std::numeric_limits<std::uint32_t>;
        using Int64 = std::numeric_limits<std::int64_t>;
        if (type == KeyType::Int32)
            checkRange(number, place, static_cast<std::int32_t>(number), Int32::min(), Int32::max());
        else if (type == KeyType::UInt32)
            checkRange(number, place, static_cast<std::uint32_t>(number), 0, UInt32::max());
        else if (type == KeyType::UInt64)
            checkRange(number, place, static_cast<std::uint64_t>(number), 0, Int64::max());
    }

    template<typename Read>
    void checkRange(long long number, Place const& place, Read readsAs, long long least, long long most) {
        if (number < least || number > most)
            findings_.add(CutNumber, place,
                          {std::to_string(number), std::to_string(readsAs), std::to_string(least),
                           std::to_string(most)});
    }

    Findings& findings_;
};

void checkNumbersOf(json::Object const& object, Place const& place, std::span<KnownNumbers const> rows,
                    Findings& findings) {
    for (KnownNumbers const& row : rows) {
        json::Value const value = object.get(row.key);
        if (value.isInt() && (value.toInt() < row.least || value.toInt() > row.most))
            findings.add(UnknownNumber, place / row.key,
                         {std::to_string(value.toInt()), row.otherwise,
                          std::to_string(row.least) + " to " + std::to_string(row.most)});
    }
}

/// `"a", "b" or "c"`.
std::string namesOfParts() {
    auto const parts = Cfg::settingsParts();
    std::string names;
    for (std::size_t i = 0; i < parts.size(); ++i)
        names += (i == 0 ? "" : i + 1 < parts.size() ? ", " : " or ") + inQuotes(parts[i].name);
    return names;
}

} // namespace

void checkParts(PresetsDocument const& document, Findings& findings) {
    if (document.isPartAlone())
        return;
    for (auto const& [key, part] : document.json()) {
        std::string const name = key;
        if (name != Base::Schema::KEY && !Cfg::findSettingsPart(name))
            findings.add(UnknownPart, Place() / name, {inQuotes(name), namesOfParts()});
    }
}

void checkDuplicateKeys(PresetsDocument const& document, Findings& findings) {
    if (!document.duplicateKey().empty())
        findings.add(DuplicateKey, Place(), {document.duplicateKey()});
}

void checkKeys(PresetsDocument const& document, Findings& findings) {
    KeyChecker checker(findings);
    if (document.isPartAlone())
        return checker.check(Base::Schema::without(document.json(), Base::Schema::KEY), Place(),
                             Cfg::Presets::keys());
    for (Cfg::PartInfo const& part : Cfg::settingsParts())
        if (json::Value const node = document.json().get(part.name))
            checker.check(node, Place() / part.name, part.keys);
}

void checkNumbers(PresetsDocument const& document, Findings& findings) {
    for (ListedExtractPreset const& preset : document.extractPresets())
        checkNumbersOf(preset.json, preset.place, EXTRACT_PRESET_NUMBERS, findings);
    forEachField(document, [&](ListedExtractPreset const&, ListedZone const&, ListedField const& field) {
        checkNumbersOf(field.json, field.place, FIELD_NUMBERS, findings);
    });
}

} // namespace VlMail

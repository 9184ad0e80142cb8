// Limits and defaults: whether they are read, and what they let through.
#include "programs/patterns/outline.h"
#include "programs/patterns/pattern.h"
#include "programs/patterns/samples.h"
#include "programs/vlmail/presets/checks.h"
#include "programs/vlmail/presets/words.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <cmath>
#include <exception>
#include <optional>
#include <sstream>
#include <string>

namespace VlMail {
namespace {

using enum FindingKind;

constexpr char const* DEFAULT_VALUE = "default_value";
constexpr char const* VALUE_MIN = "value_min";
constexpr char const* VALUE_MAX = "value_max";

std::string shown(json::Value const& value) {
    std::ostringstream text;
    text << value;
    return text.str();
}

std::string typeInWords(FieldValueType type) {
    switch (type) {
    case FieldValueType::Integer:
        return "an integer";
    case FieldValueType::Float:
        return "a number";
    case FieldValueType::Date:
        return "a date";
    case FieldValueType::String:
        break;
    }
    return "a text";
}

/// What validation makes of a text; nothing when it fails with an error of its own.
std::optional<Cfg::ExtractedField> validated(Cfg::ExtractField const& field, std::string const& text) {
    Cfg::ExtractedField value(field.name(), text, 0, false, IgnoreOnGroup::MustMatch,
                              Cfg::ExtractedField::ValueType::NotValidated);
    try {
        field.validate(value);
        return value;
    } catch (std::exception const&) {
        return std::nullopt;
    }
}

bool isRefused(Cfg::ExtractField const& field, std::string const& text) {
    auto const value = validated(field, text);
    return value && !value->isValid();
}

void checkLimit(ListedField const& listed, char const* key, json::Value const& limit, FieldValueType type,
                Findings& findings) {
    json::Value const written = listed.json.get(key);
    if (!written)
        return;
    if (type == FieldValueType::String)
        findings.add(LimitIgnored, listed.place / key,
                     {shown(written), "a text", "a \"value_match\" instead, or another \"value_type\""});
    else if (!limit)
        findings.add(LimitIgnored, listed.place / key,
                     {shown(written), typeInWords(type), typeInWords(type)});
    else if (type == FieldValueType::Integer && written.isReal() &&
             std::trunc(written.toReal()) != written.toReal())
        findings.add(LimitCut, listed.place / key, {shown(written), shown(limit)});
}

/// Why the limits refuse a number; empty when they do not. Both are numbers of one kind.
std::string refusedBy(Cfg::ExtractField::Validation const& validation, json::Value const& number) {
    json::Value const min = validation.minVal();
    json::Value const max = validation.maxVal();
    if (min && number.numberOrZero() < min.numberOrZero())
        return "it is below the least value " + shown(min);
    if (max && number.numberOrZero() > max.numberOrZero())
        return "it is above the greatest value " + shown(max);
    return {};
}

std::string whyRefused(ListedField const& listed, Cfg::ExtractField const& field, json::Value const& value) {
    auto const& validation = field.validation();
    if (std::string const limit = refusedBy(validation, value); !value.isString() && !limit.empty())
        return limit;
    json::Value const written = listed.json.get(DEFAULT_VALUE);
    if (written.isString() && isRefused(field, written.toString()))
        return "it does not fit " + inQuotes(validation.strRegex());
    return {};
}

void checkDefault(ListedField const& listed, Cfg::ExtractField const& field, Findings& findings) {
    json::Value const written = listed.json.get(DEFAULT_VALUE);
    Place const place = listed.place / DEFAULT_VALUE;
    if (!written)
        return;
    if (field.priority() > 0)
        return findings.add(DefaultDropped, place);
    Cfg::ExtractedField const* const value = field.validation().defaultValue();
    if (!value)
        return findings.add(DefaultIgnored, place,
                            {shown(written), typeInWords(field.validation().valueType())});
    if (std::string const why = whyRefused(listed, field, value->rawValue()); !why.empty())
        findings.add(DefaultRefused, place, {shown(written), why});
}

/// A text that the pattern takes for a date without its year, and that the field accepts as a time before
/// 1970.
std::optional<std::string> dateWithoutYear(Cfg::ExtractField const& field) {
    constexpr std::size_t SAMPLES = 12;
    Patterns::Pattern const pattern(field.validation().strRegex(), Patterns::Pattern::Use::Validate);
    for (std::string const& sample : Patterns::samplesOf(pattern, SAMPLES)) {
        auto const value = validated(field, sample);
        if (value && value->isValid() && value->timeVal() < 0 && !pattern.fitsWithGroup(sample, "year"))
            return sample;
    }
    return std::nullopt;
}

/// Whether the group of the value fits that text; taken for granted where that cannot be told.
bool mayExtract(Cfg::ExtractField const& field, char const* text) {
    auto const outline = Patterns::outlineOf(field.strRegex());
    Patterns::Piece const* const group =
        Patterns::findGroup(outline, Cfg::ExtractField::REGEX_VALUE_GROUP_MARK);
    try {
        return !group || Patterns::Pattern(group->body, Patterns::Pattern::Use::Validate).fits(text) ==
                             Patterns::Pattern::Answer::Yes;
    } catch (Patterns::Broken const&) {
        return true;
    }
}

bool isNumber(FieldValueType type) {
    return type == FieldValueType::Integer || type == FieldValueType::Float;
}

/// A number with a decimal comma that the field takes, and what it reads.
struct Misread {
    std::string text;
    json::Value number;
};

std::optional<Misread> misreadDecimalComma(Cfg::ExtractField const& field) {
    for (char const* text : {"1.234,56", "1234,56", "1 234,56", "12,50", "1,5", "1'234,56", "12,50 EUR"}) {
        auto const value = validated(field, text);
        if (value && value->isValid() && mayExtract(field, text))
            return Misread{text, value->rawValue()};
    }
    return std::nullopt;
}

} // namespace

void checkLimits(PresetsDocument const& document, Findings& findings) {
    forEachReadableField(document, [&](ListedField const& listed, Cfg::ExtractField const& field) {
        auto const& validation = field.validation();
        json::Value const min = validation.minVal();
        json::Value const max = validation.maxVal();
        checkLimit(listed, VALUE_MIN, min, validation.valueType(), findings);
        checkLimit(listed, VALUE_MAX, max, validation.valueType(), findings);
        if (min && max && min.numberOrZero() > max.numberOrZero())
            findings.add(LimitsCrossed, listed.place / VALUE_MIN, {shown(min), shown(max)});
    });
}

void checkDefaults(PresetsDocument const& document, Findings& findings) {
    forEachReadableField(document, [&](ListedField const& listed, Cfg::ExtractField const& field) {
        checkDefault(listed, field, findings);
    });
}

void checkDatesWithoutYear(PresetsDocument const& document, Findings& findings) {
    forEachReadableField(document, [&](ListedField const& listed, Cfg::ExtractField const& field) {
        if (field.validation().valueType() != FieldValueType::Date || field.strRegex().empty())
            return;
        try {
            if (auto const date = dateWithoutYear(field))
                findings.add(DateWithoutYear, listed.place, {inQuotes(*date)});
        } catch (Patterns::Broken const&) {
            // Told by checkPatterns.
        }
    });
}

void checkNumbersWithoutMinimum(PresetsDocument const& document, Findings& findings) {
    forEachReadableField(document, [&](ListedField const& listed, Cfg::ExtractField const& field) {
        if (!isNumber(field.validation().valueType()) || field.strRegex().empty())
            return;
        for (char const* text : {" ", ","}) {
            auto const value = validated(field, text);
            if (value && value->isValid() && mayExtract(field, text))
                return findings.add(NumberWithoutMinimum, listed.place,
                                    {inQuotes(text), shown(value->rawValue())});
        }
    });
}

void checkDecimalCommas(PresetsDocument const& document, Findings& findings) {
    forEachField(
        document, [&](ListedExtractPreset const& preset, ListedZone const&, ListedField const& listed) {
            // The pattern that holds where none is written takes commas for separators of thousands.
            bool const hasOwnPattern = !listed.json.get("value_match").textOrEmpty().empty();
            if (!hasOwnPattern || !listed.field || !isNumber(listed.field->validation().valueType()) ||
                readingRulesFor(document, preset).numbers.kind != Reader::NumberRules::Decimal::Plain)
                return;
            if (auto const misread = misreadDecimalComma(*listed.field))
                findings.add(DecimalComma, listed.place / "value_match",
                             {inQuotes(misread->text), shown(misread->number)});
        });
}

} // namespace VlMail

#include "programs/vlmail/explain/refusal.h"

#include "programs/base/quoting.h"
#include "programs/vlmail/explain/words.h"

#include <stdexcept>
#include <string_view>

namespace VlMail {
namespace {

using Cfg::ExtractedField;
using Cfg::ExtractField;
using Reason = Refusal::Reason;
using Validation = ExtractField::Validation;

/// The text as a validator of that kind and pattern leaves it that has no limits.
ExtractedField validatedWithoutLimits(ExtractField const& field, FieldValueType type,
                                      std::string const& pattern, std::string const& text) {
    ExtractField unlimited(field);
    // The mark of a single letter would make every validator one of integers.
    unlimited.setMark(LetterSeparatorMark::None);
    unlimited.setValidation(Validation::create(type, pattern, {}, {}, {}, unlimited));
    ExtractedField value(field.name(), text, 0, false, field.ignoreOnGroup(),
                         ExtractedField::ValueType::NotValidated);
    unlimited.validate(value);
    return value;
}

std::string const& defaultPattern(FieldValueType type) {
    static ExtractField const NONE;
    auto const make = [](FieldValueType of) {
        std::unique_ptr<Validation> const validation(Validation::create(of, {}, {}, {}, {}, NONE));
        return validation->strRegex();
    };
    static std::string const OF_INTEGER = make(FieldValueType::Integer);
    static std::string const OF_FLOAT = make(FieldValueType::Float);
    static std::string const OF_DATE = make(FieldValueType::Date);
    static std::string const OF_STRING;
    switch (type) {
    case FieldValueType::Integer:
        return OF_INTEGER;
    case FieldValueType::Float:
        return OF_FLOAT;
    case FieldValueType::Date:
        return OF_DATE;
    case FieldValueType::String:
        break;
    }
    return OF_STRING;
}

std::string misfit(FieldValueType type, std::string const& pattern, std::string const& text) {
    std::string const subject = Words::excerpt(text);
    if (pattern != defaultPattern(type))
        return subject + " does not match the validation pattern " + Base::inQuotes(pattern);
    switch (type) {
    case FieldValueType::Integer:
        return subject + " is no integer";
    case FieldValueType::Float:
        return subject + " is no number";
    case FieldValueType::Date:
        return subject + " matches no date pattern: day/month/year is expected";
    case FieldValueType::String:
        break;
    }
    return subject + " is refused";
}

/// Midnight is left out: limits of dates are days as a rule.
std::string limitInWords(json::Value const& limit, FieldValueType type) {
    if (type != FieldValueType::Date)
        return limit.isInt() ? std::to_string(limit.toInt()) : Words::number(limit.toReal());
    std::string text = ExtractedField::timeToStr(limit.toInt());
    constexpr std::string_view MIDNIGHT = " 00:00:00";
    if (text.ends_with(MIDNIGHT))
        text.resize(text.size() - MIDNIGHT.size());
    return text;
}

bool isLess(json::Value const& a, json::Value const& b) {
    return a.isInt() && b.isInt() ? a.toInt() < b.toInt() : a.numberOrZero() < b.numberOrZero();
}

std::optional<Refusal> refusalBy(ExtractField const& field, std::string const& text) {
    Validation const& validation = field.validation();
    FieldValueType const type = validation.valueType();
    ExtractedField const value = validatedWithoutLimits(field, type, validation.strRegex(), text);
    bool const isDate = type == FieldValueType::Date;
    if (!value.isValid()) {
        bool const fits =
            isDate &&
            validatedWithoutLimits(field, FieldValueType::String, validation.strRegex(), text).isValid();
        if (fits)
            return Refusal{
                Reason::NoDate,
                Words::excerpt(text) +
                    " is no date: its month, year or hour cannot be read; names of months are English"};
        return Refusal{Reason::Pattern, misfit(type, validation.strRegex(), text)};
    }
    json::Value const least = validation.minVal();
    if (least && isLess(value.rawValue(), least))
        return Refusal{Reason::BelowMinimum,
                       Words::shortened(text) +
                           (isDate ? " is before the earliest date " : " is below the minimum ") +
                           limitInWords(least, type),
                       value.rawValue()};
    json::Value const most = validation.maxVal();
    if (most && isLess(most, value.rawValue()))
        return Refusal{Reason::AboveMaximum,
                       Words::shortened(text) +
                           (isDate ? " is after the latest date " : " is above the maximum ") +
                           limitInWords(most, type),
                       value.rawValue()};
    return std::nullopt;
}

} // namespace

std::optional<Refusal> refusalOf(ExtractField const& field, std::string const& text) {
    try {
        return refusalBy(field, text);
    } catch (std::runtime_error const&) {
        return std::nullopt;
    }
}

char const* typeInWords(ExtractField const& field) {
    switch (field.validation().valueType()) {
    case FieldValueType::Integer:
        return "integer";
    case FieldValueType::Float:
        return "number";
    case FieldValueType::Date:
        return "date";
    case FieldValueType::String:
        break;
    }
    return "text";
}

} // namespace VlMail

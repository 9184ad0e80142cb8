#include "programs/reader/value_reading.h"

#include "programs/base/plain_text.h"
#include "programs/base/quoting.h"
#include "programs/reader/month_names.h"
#include "programs/reader/number_reading.h"

#include <algorithm>
#include <vector>

namespace Reader {
namespace {

using Cfg::ExtractedField;
using Cfg::ExtractField;

std::string inQuotes(std::string const& text) { return Base::inQuotes(Base::plainLine(text)); }

/// Whether the field takes the value in that form; then it has it.
bool take(ExtractField const& field, std::string const& form, ExtractedField& value) {
    ExtractedField typed(value.name(), form, value.priority(), value.sendToServer(), value.ignoreType(),
                         ExtractedField::ValueType::NotValidated);
    field.validate(typed);
    if (!typed.isValid())
        return false;
    value.setValidValue(typed.rawValue(), typed.valueType() == ExtractedField::ValueType::Time);
    return true;
}

/// An integer has no decimals, so "1.234" is not ambiguous for it, and those of "12.00" are left out.
std::vector<std::string> wholeForms(std::vector<std::string> forms) {
    for (std::string& form : forms) {
        std::size_t const point = form.find('.');
        if (point != form.npos && form.find_first_not_of('0', point + 1) == form.npos)
            form.erase(point);
    }
    auto const hasDecimals = [](std::string const& form) { return form.find('.') != form.npos; };
    if (!std::all_of(forms.begin(), forms.end(), hasDecimals))
        std::erase_if(forms, hasDecimals);
    return forms;
}

std::string readNumber(ExtractField const& field, ExtractedField& value, NumberRules const& rules) {
    std::string const text = value.rawValue().textOrEmpty();
    std::vector<std::string> forms = numberForms(text, rules);
    if (field.validation().valueType() == FieldValueType::Integer)
        forms = wholeForms(std::move(forms));
    if (forms.size() == 1 && take(field, forms.front(), value))
        return {};
    value.setInvalid();
    if (forms.size() == 2)
        return inQuotes(text) + " may be " + forms[0] + " or " + forms[1] +
               "; say in \"reading\" which character stands in front of decimals";
    return forms.empty() ? inQuotes(text) + " is no number as \"reading\" has them" : std::string();
}

std::string readPlainNumber(ExtractField const& field, ExtractedField& value) {
    std::string const text = value.rawValue().textOrEmpty();
    field.validate(value);
    std::string const doubt = value.isValid() ? doubtAbout(text, value.rawValue()) : std::string();
    return doubt.empty() ? doubt
                         : inQuotes(text) + ' ' + Base::plainLine(doubt) +
                               "; say in \"reading\" of the pack preset how numbers are written";
}

void readDate(ExtractField const& field, ExtractedField& value, std::string const& language) {
    for (std::string const& date : datesInEnglish(value.rawValue().textOrEmpty(), language))
        if (take(field, date, value))
            return;
    field.validate(value);
}

} // namespace

std::string readValue(ExtractField const& field, ExtractedField& value, ReadingRules const& rules) {
    FieldValueType const type = field.validation().valueType();
    bool const isNumber = type == FieldValueType::Integer || type == FieldValueType::Float;
    if (isNumber && !value.isValidated())
        return rules.numbers.kind == NumberRules::Decimal::Plain ? readPlainNumber(field, value)
                                                                 : readNumber(field, value, rules.numbers);
    if (type == FieldValueType::Date && !value.isValidated() && !rules.months.empty())
        readDate(field, value, rules.months);
    else
        field.validate(value);
    return {};
}

} // namespace Reader

// A field's definition as JSON, up to the first line feed, and a text to validate behind it.
#include "vlservice/extract/extract_field.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <stdexcept>
#include <string>

namespace {

using ValueType = Cfg::ExtractedField::ValueType;

void require(bool holds) {
    if (!holds)
        std::abort();
}

bool within(json::Value const& value, json::Value const& min, json::Value const& max) {
    double const number = value.numberOrZero();
    return (!min || number >= min.numberOrZero()) && (!max || number <= max.numberOrZero());
}

/// Whether a valid value is of the kind that its validator promises.
bool keepsPromise(Cfg::ExtractField::Validation const& validation, Cfg::ExtractedField const& value) {
    bool const isDate = validation.valueType() == FieldValueType::Date;
    if (isDate != (value.valueType() == ValueType::Time))
        return false;
    switch (validation.valueType()) {
    case FieldValueType::Integer:
    case FieldValueType::Date:
        return value.rawValue().isInt() && within(value.rawValue(), validation.minVal(), validation.maxVal());
    case FieldValueType::Float:
        return value.rawValue().isReal() &&
               within(value.rawValue(), validation.minVal(), validation.maxVal());
    case FieldValueType::String:
        break;
    }
    return value.rawValue().isString();
}

void checkValidation(Cfg::ExtractField const& field, std::string const& text) {
    Cfg::ExtractedField value("f", text, 0, false, IgnoreOnGroup::MustMatch, ValueType::NotValidated);
    json::Value const raw = value.rawValue();
    try {
        field.validate(value);
        require(value.isValid() ? keepsPromise(field.validation(), value) : value.rawValue() == raw);
    } catch (std::runtime_error const&) { // a bad or a runaway pattern
    } catch (std::out_of_range const&) {  // a pattern or a text that is not UTF-8
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    std::string const input(reinterpret_cast<char const*>(data), size);
    std::string const keys = input.substr(0, input.find('\n'));
    std::string const text = input.substr(std::min(size, keys.size() + 1), 300);
    try {
        Cfg::ExtractField const field(json::strToObject(keys.data(), keys.size()));
        json::Object const written = field.serialize();
        Cfg::ExtractField const readBack(written);
        require(readBack == field && readBack.serialize() == written);
        require(Cfg::ExtractField(field).serialize() == written);
        checkValidation(field, text);
    } catch (std::runtime_error const&) { // bad JSON, or a date whose pattern does not compile
    } catch (std::out_of_range const&) {  // a date whose limit is not UTF-8
    }
    return 0;
}

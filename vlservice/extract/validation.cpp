#include "vlservice/extract/extract_field.h"
#include "vlservice/extract/lower_case.h"
#include "vlservice/extract/regex.h"
#include "vlservice/platform/local_time.h"

#include <concepts>
#include <ctime>
#include <locale>
#include <sstream>
#include <string_view>
#include <unordered_map>

namespace Cfg {

namespace {

constexpr char const* INTEGER_PATTERN = R"(\A[\+\-]?[\d,\s]{1,19}\z)";
constexpr char const* FLOAT_PATTERN = R"(\A[\+\-]?[\d,\s]+\.?\d*\z)";
constexpr char const* DATE_PATTERN =
    R"(\A(?<day>\d?\d)/(?<month>\d?\d)(/(?<year>\d{2,4}))?)"
    R"(( (?<hour>\d?\d):(?<min>\d?\d)(:(?<sec>\d?\d))?( ?(?<ampm>AM|PM|am|pm))?)?\z)";

std::unordered_map<std::string, int> const MONTH_NAMES{
    {"january", 0}, {"jan", 0},       {"february", 1}, {"feb", 1},       {"march", 2}, {"mar", 2},
    {"april", 3},   {"apr", 3},       {"may", 4},      {"june", 5},      {"jun", 5},   {"july", 6},
    {"jul", 6},     {"august", 7},    {"aug", 7},      {"september", 8}, {"sep", 8},   {"october", 9},
    {"oct", 9},     {"november", 10}, {"nov", 10},     {"december", 11}, {"dec", 11},
};

/// The number at the text's start, as a stream reads it: `unreadable` when there is none, the type's limit
/// when it is out of range. What follows the number is ignored.
template<typename T>
T readNumber(std::string const& text, T unreadable) {
    std::istringstream in(text);
    in.imbue(std::locale::classic());
    T number{};
    in >> number;
    // A stream leaves 0 when it fails for want of a number, the limit when it fails for a number out of
    // range.
    return in.fail() && number == T{} ? unreadable : number;
}

template<typename T>
constexpr char const* DEFAULT_PATTERN = std::integral<T> ? INTEGER_PATTERN : FLOAT_PATTERN;

/// What a text without a number reads as; so it cannot be a default value.
template<typename T>
constexpr T UNREADABLE = std::numeric_limits<T>::lowest();

template<typename T>
T parseNumber(std::string text) {
    std::erase(text, ' ');
    std::erase(text, ',');
    return readNumber(text, UNREADABLE<T>);
}

template<typename T>
T fromReal(double number) {
    if constexpr (std::integral<T>) {
        // The first real above the type's range; its negative is the lowest value itself.
        constexpr double BEYOND = 9223372036854775808.0;
        if (number >= BEYOND)
            return std::numeric_limits<T>::max();
        if (number <= -BEYOND)
            return std::numeric_limits<T>::lowest();
    }
    return static_cast<T>(number);
}

/// A limit or default as it stands in JSON; nothing when it is absent, of another type or a text without a
/// number.
template<typename T>
std::optional<T> numberFrom(json::Value const& value) {
    if (value.isReal())
        return fromReal<T>(value.toReal());
    if (value.isInt())
        return static_cast<T>(value.toInt());
    if (!value.isString())
        return std::nullopt;
    T const number = parseNumber<T>(value.toString());
    return number == UNREADABLE<T> ? std::nullopt : std::optional(number);
}

int readDecimal(std::string_view group) { return readNumber<int>(std::string(group), -1); }

/// Counted from 0; nothing for an unknown name and for month 0.
std::optional<int> readMonth(std::string_view group) {
    if (group.size() >= 3) {
        auto const found = MONTH_NAMES.find(lowerCase(std::string(group)));
        return found == MONTH_NAMES.end() ? std::nullopt : std::optional(found->second);
    }
    int const month = readDecimal(group) - 1;
    return month == -1 ? std::nullopt : std::optional(month);
}

/// Counted from 1900; two digits are years of this century.
std::optional<int> readYear(std::string_view group) {
    int const year = readDecimal(group);
    if (year == -1)
        return std::nullopt;
    return (year < 100 ? year + 2000 : year) - 1900;
}

/// Anything but "am" is the afternoon. Nothing for an hour that no such clock shows.
std::optional<int> hourOfDay(int hour, std::string_view ampm) {
    if (hour == 0 || hour > 12)
        return std::nullopt;
    if (lowerCase(std::string(ampm)) == "am")
        return hour == 12 ? 0 : hour;
    return hour == 12 ? hour : hour + 12;
}

/// Groups that are missing leave the midnight of 1 January 1900 as it is.
std::optional<long long> dateFromGroups(RegexGroups const& match) {
    std::tm local{};
    local.tm_mday = 1;
    if (auto const day = match.group("day"))
        local.tm_mday = readDecimal(*day);
    if (auto const month = match.group("month")) {
        auto const number = readMonth(*month);
        if (!number)
            return std::nullopt;
        local.tm_mon = *number;
    }
    if (auto const year = match.group("year")) {
        auto const number = readYear(*year);
        if (!number)
            return std::nullopt;
        local.tm_year = *number;
    }
    if (auto const hour = match.group("hour"))
        local.tm_hour = readDecimal(*hour);
    if (auto const minute = match.group("min"))
        local.tm_min = readDecimal(*minute);
    if (auto const second = match.group("sec"))
        local.tm_sec = readDecimal(*second);
    if (auto const ampm = match.group("ampm")) {
        auto const hour = hourOfDay(local.tm_hour, *ampm);
        if (!hour)
            return std::nullopt;
        local.tm_hour = *hour;
    }
    return LocalTime::toSeconds(local);
}

template<typename T>
json::Value limitValue(T limit, T notSet) {
    return limit == notSet ? json::Value() : json::Value(limit);
}

void setIfAny(json::Object& object, char const* key, json::Value value) {
    if (value)
        object.set(key, std::move(value));
}

} // namespace

ExtractField::Validation* ExtractField::Validation::create(FieldValueType type, std::string const& regex,
                                                           json::Value min, json::Value max,
                                                           std::string const& def,
                                                           ExtractField const& field) {
    json::Object object{{TYPE_KEY, static_cast<std::int32_t>(type)}};
    if (!regex.empty())
        object.set(MATCH_KEY, regex);
    setIfAny(object, MIN_KEY, std::move(min));
    setIfAny(object, MAX_KEY, std::move(max));
    if (!def.empty())
        object.set(DEFAULT_KEY, def);
    return createImpl(object, field);
}

ExtractField::Validation* ExtractField::Validation::create(json::Value const& def,
                                                           ExtractField const& field) {
    return createImpl(json::Object{{DEFAULT_KEY, def}}, field);
}

ExtractField::Validation* ExtractField::Validation::createImpl(json::Object const& object,
                                                               ExtractField const& field) {
    auto const kind = field.mark() == LetterSeparatorMark::SingleLetter
                          ? FieldValueType::Integer
                          : static_cast<FieldValueType>(object.get(TYPE_KEY).intOrZero());
    switch (kind) {
    case FieldValueType::Integer:
        return new ValidateNum<long long>(object, field);
    case FieldValueType::Float:
        return new ValidateNum<double>(object, field);
    case FieldValueType::Date:
        return new ValidateDate(object, field);
    case FieldValueType::String:
        break;
    }
    return new ValidateString(object, field);
}

ExtractField::Validation::Validation(json::Object const& object)
    : strRegex_(object.get(MATCH_KEY).textOrEmpty()) {}

ExtractField::Validation::Validation(Validation const& other)
    : defaultValue_(other.defaultValue_ ? std::make_shared<ExtractedField>(*other.defaultValue_) : nullptr),
      strRegex_(other.strRegex_) {}

ExtractField::Validation::~Validation() = default;

ExtractField::Validation& ExtractField::Validation::operator=(Validation const& other) {
    defaultValue_ = other.defaultValue_;
    strRegex_ = other.strRegex_;
    compiledRegex_.shareWith(other.compiledRegex_);
    return *this;
}

json::Value ExtractField::Validation::minVal() const { return {}; }
json::Value ExtractField::Validation::maxVal() const { return {}; }

void ExtractField::Validation::serialize(json::Object& object) const {
    if (defaultValue_)
        object.set(DEFAULT_KEY, defaultValue_->rawValue());
}

void ExtractField::Validation::serializeTyped(json::Object& object, char const* defaultPattern) const {
    if (strRegex_ != defaultPattern)
        object.set(MATCH_KEY, strRegex_);
    object.set(TYPE_KEY, static_cast<std::int32_t>(valueType()));
    setIfAny(object, MIN_KEY, minVal());
    setIfAny(object, MAX_KEY, maxVal());
}

void ExtractField::Validation::validate(ExtractedField& value) const {
    if (valid(value.rawValue().toString()))
        value.setValidValue(value.rawValue(), false);
    else
        value.setInvalid();
}

FieldRegex const& ExtractField::Validation::regex() const { return compiledRegex_.get(strRegex_); }

bool ExtractField::Validation::valid(char const* text) const {
    return strRegex_.empty() || regex().match(text);
}

void ExtractField::Validation::setDefault(json::Value const& value, ExtractedField::ValueType type,
                                          ExtractField const& field) {
    if (field.priority() > 0)
        return;
    defaultValue_ = std::make_shared<ExtractedField>(field.name(), value, field.priority(),
                                                     field.sendToServer(), field.ignoreOnGroup(), type);
}

ExtractField::ValidateString::ValidateString(json::Object const& object, ExtractField const& field)
    : Validation(object) {
    auto const def = object.get(DEFAULT_KEY);
    if (!def.textOrEmpty().empty())
        setDefault(def, ExtractedField::ValueType::Plain, field);
}

FieldValueType ExtractField::ValidateString::valueType() const { return FieldValueType::String; }

ExtractField::Validation* ExtractField::ValidateString::clone() const { return new ValidateString(*this); }

void ExtractField::ValidateString::serialize(json::Object& object) const {
    if (!strRegex_.empty())
        object.set(MATCH_KEY, strRegex_);
    Validation::serialize(object);
}

template<typename T>
ExtractField::ValidateNum<T>::ValidateNum(json::Object const& object, ExtractField const& field)
    : Validation(object) {
    if (strRegex_.empty())
        strRegex_ = DEFAULT_PATTERN<T>;
    min_ = numberFrom<T>(object.get(MIN_KEY)).value_or(min_);
    max_ = numberFrom<T>(object.get(MAX_KEY)).value_or(max_);
    auto const def = numberFrom<T>(object.get(DEFAULT_KEY));
    if (def && *def != UNREADABLE<T>)
        setDefault(*def, ExtractedField::ValueType::Plain, field);
}

template<typename T>
FieldValueType ExtractField::ValidateNum<T>::valueType() const {
    return std::integral<T> ? FieldValueType::Integer : FieldValueType::Float;
}

template<typename T>
json::Value ExtractField::ValidateNum<T>::minVal() const {
    return limitValue(min_, std::numeric_limits<T>::lowest());
}

template<typename T>
json::Value ExtractField::ValidateNum<T>::maxVal() const {
    return limitValue(max_, std::numeric_limits<T>::max());
}

template<typename T>
ExtractField::Validation* ExtractField::ValidateNum<T>::clone() const {
    return new ValidateNum(*this);
}

template<typename T>
void ExtractField::ValidateNum<T>::serialize(json::Object& object) const {
    serializeTyped(object, DEFAULT_PATTERN<T>);
    Validation::serialize(object);
}

template<typename T>
void ExtractField::ValidateNum<T>::validate(ExtractedField& value) const {
    char const* const text = value.rawValue().toString();
    if (!valid(text))
        return value.setInvalid();
    T const number = parseNumber<T>(text);
    if (number < min_ || number > max_)
        return value.setInvalid();
    value.setValidValue(number, false);
}

template class ExtractField::ValidateNum<long long>;
template class ExtractField::ValidateNum<double>;

ExtractField::ValidateDate::ValidateDate(json::Object const& object, ExtractField const& field)
    : Validation(object) {
    if (strRegex_.empty())
        strRegex_ = DATE_PATTERN;
    min_ = dateFrom(object.get(MIN_KEY)).value_or(min_);
    max_ = dateFrom(object.get(MAX_KEY)).value_or(max_);
    auto const def = dateFrom(object.get(DEFAULT_KEY));
    if (def && *def != UNREADABLE<long long>)
        setDefault(*def, ExtractedField::ValueType::Time, field);
}

FieldValueType ExtractField::ValidateDate::valueType() const { return FieldValueType::Date; }

json::Value ExtractField::ValidateDate::minVal() const {
    return limitValue(min_, std::numeric_limits<long long>::lowest());
}

json::Value ExtractField::ValidateDate::maxVal() const {
    return limitValue(max_, std::numeric_limits<long long>::max());
}

ExtractField::Validation* ExtractField::ValidateDate::clone() const { return new ValidateDate(*this); }

void ExtractField::ValidateDate::serialize(json::Object& object) const {
    serializeTyped(object, DATE_PATTERN);
    Validation::serialize(object);
}

void ExtractField::ValidateDate::validate(ExtractedField& value) const {
    auto const date = parseDate(value.rawValue().toString());
    if (!date || *date < min_ || *date > max_)
        return value.setInvalid();
    value.setValidValue(*date, true);
}

std::optional<long long> ExtractField::ValidateDate::parseDate(char const* text) const {
    auto const match = regex().match(text);
    return match ? dateFromGroups(*match) : std::nullopt;
}

std::optional<long long> ExtractField::ValidateDate::dateFrom(json::Value const& value) const {
    if (value.isInt())
        return value.toInt();
    // A pattern of the user's own may fit the empty text; that is no date all the same.
    return value.textOrEmpty().empty() ? std::nullopt : parseDate(value.toString());
}

} // namespace Cfg

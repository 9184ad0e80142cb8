#include "vlservice/extract/extracted_field.h"

#include "vlservice/json/json_record.h"
#include "vlservice/json/json_text.h"
#include "vlservice/platform/local_time.h"

#include <algorithm>
#include <locale>
#include <new>
#include <sstream>
#include <utility>

namespace Cfg {
namespace {

constexpr char const* DATE_KEY = "$date";
constexpr int MILLISECONDS_A_SECOND = 1000;

std::string streamForm(json::Value const& value) {
    std::ostringstream text;
    text.imbue(std::locale::classic());
    text << value;
    return text.str();
}

template<typename T>
int signOf(T const& a, T const& b) {
    return (b < a) - (a < b);
}

bool isDateList(json::Value const& value) {
    if (!value.isArray())
        return false;
    json::Value const first = value.toArray().at(0);
    return first.isObject() && first.toObject().size() == 1 && first.toObject().get(DATE_KEY);
}

/// Seconds of a "$date", which counts milliseconds; 0 for what is no number or not within 64 bits.
long long dateSeconds(json::Object const& date) {
    json::Value const milliseconds = date.get(DATE_KEY);
    if (milliseconds.isInt())
        return milliseconds.toInt() / MILLISECONDS_A_SECOND;
    double const seconds = milliseconds.numberOrZero() / MILLISECONDS_A_SECOND;
    constexpr double LIMIT = 9223372036854775808.0;
    return seconds > -LIMIT && seconds < LIMIT ? static_cast<long long>(seconds) : 0;
}

std::string dateListToStr(json::Array const& dates) {
    std::string text = "[";
    for (json::Value const& date : dates) {
        if (text.size() > 1)
            text += ',';
        text += '"' + ExtractedField::timeToStr(dateSeconds(date.toObject())) + '"';
    }
    return text + ']';
}

[[noreturn]] void refuseMerging(json::Value const& a, json::Value const& b) {
    throw json::Exc("Grouping fields failed (not primitive type), arg1 is " + streamForm(a) + ", arg2 is " +
                    streamForm(b));
}

long long wrappingSum(long long a, long long b) {
    return static_cast<long long>(static_cast<unsigned long long>(a) + static_cast<unsigned long long>(b));
}

/// The rules of one way to merge, for each JSON type that can be merged.
struct Sum {
    static std::string merge(std::string const& a, std::string const& b) { return a + b; }
    static long long merge(long long a, long long b) { return wrappingSum(a, b); }
    static double merge(double a, double b) { return a + b; }
    static bool merge(bool a, bool b) { return a || b; }
};

struct Min {
    template<typename T>
    static T merge(T const& a, T const& b) {
        return std::min(a, b);
    }
};

struct Max {
    template<typename T>
    static T merge(T const& a, T const& b) {
        return std::max(a, b);
    }
};

template<typename Rule>
json::Value merged(json::Value const& a, json::Value const& b) {
    if (a.isString())
        return Rule::merge(std::string(a.toString()), std::string(b.toString()));
    if (a.isInt())
        return Rule::merge(a.toInt(), b.toInt());
    // Deliberate: of reals it is the flags "is a real" that are merged, not the numbers. Two reals sum
    // to 2.0.
    if (a.isReal())
        return Rule::merge(1.0, b.isReal() ? 1.0 : 0.0);
    if (json_is_boolean(a.node()))
        return Rule::merge(a.toBool(), b.toBool());
    refuseMerging(a, b);
}

} // namespace

struct ExtractedField::Keys {
    static constexpr std::tuple TABLE{
        json::Required{"name", &ExtractedField::name_},
        json::Key{"type", &ExtractedField::valueType_, ValueType::Plain},
        json::Key{"value", &ExtractedField::value_},
        json::Key{"priority", &ExtractedField::priority_},
        json::Key{"send_to_server", &ExtractedField::sendToServer_},
        json::Key{"ignore_on_group", &ExtractedField::ignoreOnGroup_, IgnoreOnGroup::MustMatch},
    };
};

ExtractedField::ExtractedField(std::string const& name, json::Value value, int priority, bool sendToServer,
                               IgnoreOnGroup ignore, ValueType type)
    : name_(name), valueType_(type), value_(std::move(value)), priority_(priority),
      sendToServer_(sendToServer), ignoreOnGroup_(ignore) {}

ExtractedField::ExtractedField(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }

json::Object ExtractedField::serialize() const {
    json::Object object;
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

std::string ExtractedField::strVal() const { return value_.toString(); }

long long ExtractedField::intVal() const { return value_.toInt(); }

double ExtractedField::floatVal() const { return value_.toReal(); }

std::string ExtractedField::valueToStr() const {
    if (valueType_ == ValueType::Time)
        return timeToStr(intVal());
    if (valueType_ != ValueType::Plain || !value_ || value_.isString())
        return value_.textOrEmpty();
    return isDateList(value_) ? dateListToStr(value_.toArray()) : streamForm(value_);
}

std::string ExtractedField::timeToStr(long long seconds) { return LocalTime::toText(seconds); }

bool ExtractedField::sameAs(ExtractedField const& other) const {
    if (ignoreOnGroup_ == IgnoreOnGroup::NeverSame || other.ignoreOnGroup_ == IgnoreOnGroup::NeverSame)
        return false;
    return valueType_ == other.valueType_ && name_ == other.name_ && value_ == other.value_;
}

int ExtractedField::cmpSort(ExtractedField const& other) const {
    if (valueType_ == ValueType::Time)
        return signOf(intVal(), other.intVal());
    if (valueType_ == ValueType::Plain && value_.isString())
        return signOf(strVal(), other.value_.textOrEmpty());
    if (valueType_ == ValueType::Plain && value_.isInt())
        return signOf(intVal(), other.value_.intOrZero());
    if (valueType_ == ValueType::Plain && value_.isReal())
        return signOf(floatVal(), other.value_.numberOrZero());
    return signOf(streamForm(value_), streamForm(other.value_));
}

void ExtractedField::setValidValue(json::Value const& value, bool isTime) {
    value_ = value;
    valueType_ = isTime ? ValueType::Time : ValueType::Plain;
}

void ExtractedField::combineOnGroup(ExtractedField const& other) {
    bool const isSum = ignoreOnGroup_ == IgnoreOnGroup::Sum;
    // A sum with a part missing would be a wrong number, so it turns invalid and stays so; other rules pass
    // over it.
    if (!other.isValid()) {
        if (isSum)
            setInvalid();
        return;
    }
    if (!isValid()) {
        if (!isSum)
            *this = other;
        return;
    }
    switch (ignoreOnGroup_) {
    case IgnoreOnGroup::Sum:
        value_ = merged<Sum>(value_, other.value_);
        break;
    case IgnoreOnGroup::Min:
        value_ = merged<Min>(value_, other.value_);
        break;
    case IgnoreOnGroup::Max:
        value_ = merged<Max>(value_, other.value_);
        break;
    case IgnoreOnGroup::KeepLast:
        value_ = other.value_;
        break;
    case IgnoreOnGroup::Collect:
        collect(other.value_);
        break;
    case IgnoreOnGroup::NeverSame:
    case IgnoreOnGroup::MustMatch:
    case IgnoreOnGroup::KeepFirst:
        break;
    }
}

void ExtractedField::collect(json::Value const& other) {
    // The raw node is extended, past the copy on write of json::Array: a group's array is one for all who
    // share it. The other's elements go into an array of their own first, as it may be the very array that
    // grows.
    json::Array added;
    if (!value_.isArray() && value_)
        added.append(value_);
    if (other.isArray()) {
        for (json::Value const& element : other.toArray())
            added.append(element);
    } else if (other) {
        added.append(other);
    }
    if (!value_.isArray())
        value_ = added;
    else if (json_array_extend(value_.node(), added.node()) != 0)
        throw std::bad_alloc();
}

} // namespace Cfg

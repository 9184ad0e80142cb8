#pragma once
// One value taken from a letter, with its validation state and what the mailing around it needs to know of
// it.

#include "vlservice/export.h"
#include "vlservice/extract/ignore_on_group.h"
#include "vlservice/json/json.h"

#include <string>

namespace Cfg {

/// A value object. Copies share the JSON value through an unsynchronised count: they stay on one thread.
class VLSERVICE_EXPORT ExtractedField {
public:
    /// What validation has made of the value.
    enum class ValueType : signed char {
        NotValidated = -1, ///< a string with the raw text
        Plain = 0,         ///< a string, integer or real, or an array after grouping
        Time = 1,          ///< an integer: seconds since the epoch
        Invalid = 2,       ///< failed validation: a string with the raw text
    };

    /// An unnamed ordinary field without a value, not validated.
    ExtractedField() = default;
    ExtractedField(std::string const& name, json::Value value, int priority, bool sendToServer,
                   IgnoreOnGroup ignore, ValueType type);
    /// Throws json::Exc when "name" is not a string; every other key has a default.
    ExtractedField(json::Object const& object);

    /// Keys that hold their default are left out; "name" is always there.
    json::Object serialize() const;

    /// The name of the definition that produced the value.
    std::string const& name() const { return name_; }
    ValueType valueType() const { return valueType_; }
    json::Value const& rawValue() const { return value_; }
    bool isValidated() const { return valueType_ != ValueType::NotValidated; }         ///< typed or refused
    bool isValid() const { return isValidated() && valueType_ != ValueType::Invalid; } ///< typed

    /// Above 0 a recipient address, the highest preferred; below 0 a notification address; 0 an ordinary
    /// field.
    int priority() const { return priority_; }
    bool isAddress() const { return priority_ != 0; }      ///< of a recipient, or for notes
    bool isRcptAddress() const { return priority_ > 0; }   ///< of the recipient
    bool isNotifyAddress() const { return priority_ < 0; } ///< to be notified only
    bool sendToServer() const { return sendToServer_; }
    IgnoreOnGroup ignoreType() const { return ignoreOnGroup_; }
    /// Whether the field is left out when letters are compared for grouping.
    bool ignoreOnCompare() const { return ignoreOnGroup_ > IgnoreOnGroup::MustMatch; }

    /// The value as the type asked for; each throws json::Exc when the JSON type is another.
    std::string strVal() const;
    long long intVal() const; ///< refuses a real
    /// Seconds since the epoch.
    long long timeVal() const { return intVal(); }
    /// Refuses an integer.
    double floatVal() const;

    /// The value for people: dates in local time, a plain text as it stands, anything else as JSON; empty
    /// without a value. Throws json::Exc for a date that is no integer and for a list of dates with an
    /// element that is no object.
    std::string valueToStr() const;
    /// "YYYY/MM/DD hh:mm:ss" in local time; the empty text for seconds that have no such form.
    static std::string timeToStr(long long seconds);

    /// Whether state, name and value are equal. A field that is NeverSame equals nothing, not even itself.
    bool sameAs(ExtractedField const& other) const;
    /// -1, 0 or 1, for sorting letters by a field; this field alone chooses the kind of comparison.
    /// Throws json::Exc when this field is a date and either value is no integer.
    int cmpSort(ExtractedField const& other) const;

    void setValidValue(json::Value const& value, bool isTime); ///< seconds when `isTime`
    /// The value stays as it is.
    void setInvalid() { valueType_ = ValueType::Invalid; }

    /// Merges the value of a letter that joins the group into this one, by the rule of ignoreType().
    /// A collected array is changed in place: every handle that shares it, also the one in the letter that it
    /// came from, sees the new elements. Callers who keep that letter copy the array first. Throws json::Exc
    /// for values that cannot be merged and leaves this field unchanged then.
    void combineOnGroup(ExtractedField const& other);

private:
    struct Keys;

    void collect(json::Value const& other);

    std::string name_;
    ValueType valueType_ = ValueType::NotValidated;
    json::Value value_;
    int priority_ = 0;
    bool sendToServer_ = false;
    IgnoreOnGroup ignoreOnGroup_ = IgnoreOnGroup::MustMatch;
};

} // namespace Cfg

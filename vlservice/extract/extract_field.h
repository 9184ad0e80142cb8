#pragma once
// The definition of one piece of data to be taken from the text of a letter, and the validators that type
// what was taken.

#include "vlservice/export.h"
#include "vlservice/extract/extracted_field.h"
#include "vlservice/extract/ignore_on_group.h"
#include "vlservice/extract/regex_cache.h"
#include "vlservice/json/json.h"
#include "vlservice/json/record_keys.h"

#include <cstdint>
#include <functional>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <utility>

/// What a field says about where letters begin. Numbers without a name are kept: their meaning lies with the
/// reader.
enum class LetterSeparatorMark : std::int32_t {
    None = 0,
    SingleLetter = 2, ///< the document is one letter; the field's value is an integer
};

/// Numbers without a name are kept: their meaning lies with the reader.
enum class FieldPostalMatch : std::int32_t { None = 0 };

/// The kind of a field's value; any other number counts as String.
enum class FieldValueType : std::int32_t { String = 0, Integer = 1, Float = 2, Date = 3 };

namespace Cfg {

/// Where a field's value stands in a text, how it is cleaned and validated, and what stands in for it when it
/// is missing.
///
/// `extractField` on a zone's text gives a value, `validate` types it, and it joins the letter's
/// ExtractedFields. Both compile their pattern at first use without a lock: one object is used by one thread
/// until then. Copies clone the validator. They start without a compiled pattern, and an assigned definition
/// goes on matching by the pattern that it has compiled before, until `setRegex`: both are deliberate, see
/// RegexCache.
class VLSERVICE_EXPORT ExtractField {
public:
    class Validation;
    class ValidateString;
    template<typename T>
    class ValidateNum;
    class ValidateDate;

    /// Gives the width of the `length` bytes at `offset` in `text` on the page. Whether that piece leaves the
    /// text is the callback's affair.
    using Measure = std::function<unsigned long long(std::string& text, unsigned long long offset,
                                                     unsigned long long length)>;

    /// Learns why a search failed, in the words that are logged as well.
    using OnFailure = std::function<void(std::string const& reason)>;

    /// The group of an extraction pattern that captures the value.
    static std::string const REGEX_VALUE_GROUP_MARK;

    /// Has no validator: give it one with setValidation() before it is used for more than its attributes.
    ExtractField() = default;
    /// Throws json::Exc when "name" is not a string; every other key has a default. A bad extraction pattern
    /// is not noticed here; a bad validation pattern is when a date's limit or default has to be read by it.
    ExtractField(json::Object const& object);

    // What the client's letters hold when nobody has defined anything else: built at first use, valid to the
    // end of the process.

    static ExtractField const& DefReference(); ///< "reference", behind "Ref:"
    static ExtractField const& DefEmail();     ///< "email", behind "Email:"
    static ExtractField const& DefFax();       ///< "fax", behind "Fax:"
    static ExtractField const& DefSms();       ///< "sms", behind "Sms:"
    static ExtractField const& DefPostal();    ///< "postal", the whole text

    /// Cuts this field's value out of `text`, not yet validated. Without a measure the whole match leaves the
    /// text. Without a match, or without a group "VAL" in it, gives a copy of the default value, or nothing.
    /// A match wider than maxWidth() gives the validator's own default value, not a copy: change it and you
    /// change the definition. Throws nothing derived from std::exception: a bad pattern, text that is not
    /// UTF-8 and a failing measure are logged and count as no match.
    std::shared_ptr<ExtractedField> extractField(std::string& text, Measure const& measure = {}) const;
    std::shared_ptr<ExtractedField> extractField(std::string& text, Measure const& measure,
                                                 OnFailure const& onFailure) const;

    /// Types a value that is not validated yet, or marks it invalid; leaves any other alone.
    /// Throws boost::regex_error for a bad pattern, std::out_of_range for text that is not UTF-8.
    void validate(ExtractedField& value) const;

    bool isMyField(ExtractedField const& value) const { return value.name() == name_; } ///< by its name
    /// Whether one zone list may hold both: names differ, and they are not recipient addresses of the same
    /// priority.
    bool fieldsCanCoexist(ExtractField const& other) const;

    /// Restores what construction from JSON promises: an address has a name in lower case, a marking field is
    /// obligatory, a recipient address has no default value.
    void fix();

    /// Keys that hold their default are left out; "name" is always there. The validator's keys come last.
    json::Object serialize() const;
    static json::RecordKeys const& keys();

    /// Of the validators only their patterns are compared.
    bool operator==(ExtractField const& other) const;

    std::string const& name() const { return name_; } ///< under which a value is told
    LetterSeparatorMark mark() const { return mark_; }
    /// Above 0 a recipient address, the highest preferred; below 0 a notification address; 0 an ordinary
    /// field.
    int priority() const { return priority_; }
    bool sendToServer() const { return sendToServer_; }
    IgnoreOnGroup ignoreOnGroup() const { return ignoreOnGroup_; }
    /// The extraction pattern; an empty one always yields the default value.
    std::string const& strRegex() const { return strRegex_; }
    bool ignoreFontMetrics() const { return ignoreFontMetrics_; }
    bool mustHave() const { return mustHave_; }
    /// In 1/100 mm, as the measure reports it; 0 is no limit.
    unsigned long long maxWidth() const { return width_; }
    bool make1Line() const { return make1Line_; }
    bool nameIsRedirectMatch() const { return nameIsRedirectMatch_; }
    FieldPostalMatch postalMatchType() const { return postalMatch_; }
    /// There must be one.
    Validation const& validation() const { return *validation_; }

    // Setters do not fix(): what belongs together is the caller's to keep.

    void setName(std::string name) { name_ = std::move(name); } ///< of its values
    void setMark(LetterSeparatorMark mark) { mark_ = mark; }
    void setPriority(int priority) { priority_ = priority; }
    void setSendToServer(bool send) { sendToServer_ = send; }
    void setIgnoreOnGroup(IgnoreOnGroup ignore) { ignoreOnGroup_ = ignore; }
    /// From here on the field matches by this pattern.
    void setRegex(std::string regex) {
        strRegex_ = std::move(regex);
        compiledRegex_.clear();
    }
    /// The odd spelling is the interface's.
    void setIgnoreFontMertics(bool ignore) { ignoreFontMetrics_ = ignore; }
    void setMustHave(bool mustHave) { mustHave_ = mustHave; }
    void setWidth(unsigned long long width) { width_ = width; }
    void setMake1Line(bool make1Line) { make1Line_ = make1Line; }
    void setNameIsRedirectMatch(bool isRedirect) { nameIsRedirectMatch_ = isRedirect; }
    void setPostalMatch(FieldPostalMatch match) { postalMatch_ = match; }
    /// Takes the validator over and destroys the former one.
    void setValidation(Validation* validation) { validation_.reset(validation); }

private:
    struct Keys;
    struct Found;

    /// Owns the validator; a copy owns a clone, and move assignment swaps.
    class VLSERVICE_EXPORT OwnedValidation {
    public:
        OwnedValidation() noexcept;
        OwnedValidation(OwnedValidation const& other);
        OwnedValidation(OwnedValidation&& other) noexcept;
        OwnedValidation& operator=(OwnedValidation const& other);
        OwnedValidation& operator=(OwnedValidation&& other) noexcept;
        ~OwnedValidation();

        void reset(Validation* validation) noexcept;
        explicit operator bool() const noexcept { return validation_ != nullptr; }
        Validation& operator*() const noexcept { return *validation_; }
        Validation* operator->() const noexcept { return validation_.get(); }

    private:
        std::unique_ptr<Validation> validation_;
    };

    std::optional<Found> find(std::string const& text) const;
    bool isTooWide(unsigned long long width) const { return width_ != 0 && width_ < width; }
    std::shared_ptr<ExtractedField> cutOut(std::string& text, Found const& found) const;
    std::shared_ptr<ExtractedField> measured(std::string& text, Found const& found,
                                             Measure const& measure) const;
    std::shared_ptr<ExtractedField> makeValue(std::string_view found) const;
    /// The validator's own object; null when it has none.
    std::shared_ptr<ExtractedField> const& sharedDefault() const;

    OwnedValidation validation_;
    std::string name_;
    LetterSeparatorMark mark_ = LetterSeparatorMark::None;
    bool ignoreFontMetrics_ = false;
    std::string strRegex_;
    RegexCache<FieldRegex> compiledRegex_;
    int priority_ = 0;
    bool mustHave_ = false;
    unsigned long long width_ = 0;
    bool make1Line_ = false;
    bool sendToServer_ = false;
    IgnoreOnGroup ignoreOnGroup_ = IgnoreOnGroup::MustMatch;
    bool nameIsRedirectMatch_ = false;
    FieldPostalMatch postalMatch_ = FieldPostalMatch::None;
};

/// Decides whether a text is acceptable as a field's value, types it, and holds the field's default value.
/// Its keys stand in the same JSON object as those of its field.
class VLSERVICE_EXPORT ExtractField::Validation {
public:
    /// A new validator of that kind, owned by the caller. An empty pattern, limit or default is none. A field
    /// marked SingleLetter gets an Integer validator whatever `type` says; one of positive priority gets no
    /// default value.
    static Validation* create(FieldValueType type, std::string const& regex, json::Value min, json::Value max,
                              std::string const& def, ExtractField const& field);
    /// A text validator (or the field's own kind, as above) with nothing but a default value.
    static Validation* create(json::Value const& def, ExtractField const& field);

    virtual ~Validation();
    /// Shares the source's default value and, unlike a copy, its compiled pattern. This is deliberate: it is
    /// the assignment of a pattern together with its compiled form, where ExtractField clones instead.
    Validation& operator=(Validation const& other);

    // The order of the virtual operations is part of the binary interface.

    virtual FieldValueType valueType() const = 0;
    /// The least value that is accepted; the empty handle when there is no limit.
    virtual json::Value minVal() const;
    /// The greatest value that is accepted; the empty handle when there is no limit.
    virtual json::Value maxVal() const;

private:
    virtual void serialize(json::Object& object) const;

public:
    /// A copy of the same class, owned by the caller. Its default value is a copy too, and its pattern is not
    /// compiled.
    virtual Validation* clone() const = 0;

    /// The pattern that must fit the whole of a text.
    std::string const& strRegex() const { return strRegex_; }
    /// Null when there is none; lives as long as this validator and its default.
    ExtractedField const* defaultValue() const { return defaultValue_.get(); }

private:
    friend class ExtractField;

    static constexpr char const* TYPE_KEY = "value_type";
    static constexpr char const* MATCH_KEY = "value_match";
    static constexpr char const* MIN_KEY = "value_min";
    static constexpr char const* MAX_KEY = "value_max";
    static constexpr char const* DEFAULT_KEY = "default_value";

    static Validation* createImpl(json::Object const& object, ExtractField const& field);

    explicit Validation(json::Object const& object);
    Validation(Validation const& other);

    virtual void validate(ExtractedField& value) const;

    bool valid(char const* text) const;
    FieldRegex const& regex() const;
    void setDefault(json::Value const& value, ExtractedField::ValueType type, ExtractField const& field);
    /// The keys that a validator of a kind other than String writes before the base's.
    void serializeTyped(json::Object& object, char const* defaultPattern) const;

    std::shared_ptr<ExtractedField> defaultValue_;
    std::string strRegex_;
    RegexCache<FieldRegex> compiledRegex_;
};

/// Texts: without a pattern every one is accepted.
class VLSERVICE_EXPORT ExtractField::ValidateString : public Validation {
public:
    ValidateString(json::Object const& object, ExtractField const& field);

    FieldValueType valueType() const override;
    Validation* clone() const override;

private:
    void serialize(json::Object& object) const override;
};

/// Numbers, `long long` or `double`. Blanks and commas in a text are no part of the number; a text without a
/// number, one of blanks only among them, is the lowest value of T, so an amount needs a least value. The
/// lowest value as minimum and the highest as maximum are no limit.
template<typename T>
class VLSERVICE_EXPORT ExtractField::ValidateNum : public Validation {
public:
    ValidateNum(json::Object const& object, ExtractField const& field);

    FieldValueType valueType() const override;
    json::Value minVal() const override;
    json::Value maxVal() const override;
    Validation* clone() const override;

private:
    void serialize(json::Object& object) const override;
    void validate(ExtractedField& value) const override;

    T min_ = std::numeric_limits<T>::lowest();
    T max_ = std::numeric_limits<T>::max();
};

extern template class ExtractField::ValidateNum<long long>;
extern template class ExtractField::ValidateNum<double>;

/// Dates, as seconds since the epoch of a local time. The pattern's groups "day", "month" (a number or an
/// English name), "year", "hour", "min", "sec" and "ampm" give its parts; days and months beyond the calendar
/// roll over. A date without a year, or before the epoch, is -1 and valid: set a least value to refuse it.
class VLSERVICE_EXPORT ExtractField::ValidateDate : public Validation {
public:
    ValidateDate(json::Object const& object, ExtractField const& field);

    FieldValueType valueType() const override;
    json::Value minVal() const override;
    json::Value maxVal() const override;
    Validation* clone() const override;

private:
    void serialize(json::Object& object) const override;
    void validate(ExtractedField& value) const override;

    std::optional<long long> parseDate(char const* text) const;
    std::optional<long long> dateFrom(json::Value const& value) const;

    long long min_ = std::numeric_limits<long long>::lowest();
    long long max_ = std::numeric_limits<long long>::max();
};

} // namespace Cfg

#include "programs/vlmail/golden/expectation.h"

#include "programs/base/error.h"
#include "programs/base/plain_text.h"
#include "programs/vlmail/explain/refusal.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/presets/words.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdlib>
#include <memory>
#include <span>
#include <sstream>

namespace VlMail {
namespace {

using Cfg::ExtractedField;

constexpr char const* EXTRACT_PRESET = "extract_preset";
constexpr char const* PACK_PRESET = "pack_preset";
constexpr char const* LETTERS = "letters";
constexpr std::array DOCUMENT_KEYS{EXTRACT_PRESET, PACK_PRESET, LETTERS};

constexpr char const* PAGES = "pages";
constexpr char const* GOES_TO = "goes_to";
constexpr char const* MISSING = "missing";
constexpr char const* FIELDS = "fields";
constexpr std::array LETTER_KEYS{PAGES, GOES_TO, MISSING, FIELDS};

/// Values that stand for themselves in no other way.
constexpr char const* DATE = "date";
constexpr char const* INVALID = "invalid";

json::Value expectedValue(ExtractedField const& field) {
    if (field.valueType() == ExtractedField::ValueType::Time)
        return json::Object{{DATE, field.valueToStr()}};
    if (!field.isValid())
        return json::Object{{INVALID, field.rawValue()}};
    return field.rawValue();
}

json::Object fieldsOf(LetterReading const& letter) {
    json::Object fields;
    for (auto const& [priority, field] : letter.fields)
        fields.set(field.name(), expectedValue(field));
    return fields;
}

json::Object expectationOf(LetterReading const& letter) {
    json::Object object;
    if (!letter.pages.empty())
        object.set(PAGES, toJsonArray(letter.pages));
    Cfg::ExtractedField const* const address = letter.fields.primaryAddressField();
    object.set(GOES_TO, address ? json::Value(address->name()) : json::Value(json_null()));
    if (!letter.missing.empty()) {
        json::Array missing;
        for (std::string const& name : letter.missing)
            missing.append(name);
        object.set(MISSING, missing);
    }
    object.set(FIELDS, fieldsOf(letter));
    return object;
}

/// A key that nobody compares would be an expectation that nothing can fail.
void requireKnownKeys(json::Object const& object, std::span<char const* const> known) {
    for (auto const& [key, value] : object) {
        std::string const name = key;
        if (std::ranges::find(known, name) != known.end())
            continue;
        std::string all;
        for (char const* one : known)
            all += (all.empty() ? "" : ", ") + inQuotes(one);
        throw Base::Error(Base::Code::ExpectationMalformed,
                          inQuotes(name) + " is nothing that can be expected there; write one of " + all);
    }
}

bool isValue(json::Value const& value) {
    if (!value.isObject())
        return value.isString() || value.isInt() || value.isReal();
    json::Object const& object = value.toObject();
    return object.size() == 1 && (object.get(DATE).isString() || object.get(INVALID).isString());
}

void requireLetter(json::Value const& letter) {
    if (!letter.isObject())
        throw Base::Error(Base::Code::ExpectationMalformed,
                          "a letter must be an object; write {\"fields\": {...}}");
    requireKnownKeys(letter.toObject(), LETTER_KEYS);
    json::Value const fields = letter.toObject().get(FIELDS);
    if (!fields.isObject())
        throw Base::Error(Base::Code::ExpectationMalformed,
                          "a letter has no object \"fields\"; write the fields that it is to have");
    for (auto const& [name, value] : fields.toObject())
        if (!isValue(value))
            throw Base::Error(
                Base::Code::ExpectationMalformed,
                "the value of " + inQuotes(name) +
                    " is none that a field can have; write a text, a number, {\"date\": \"...\"} or "
                    "{\"invalid\": \"...\"}");
}

std::string shown(json::Value const& value) {
    if (value.isObject()) {
        json::Object const& object = value.toObject();
        if (json::Value const date = object.get(DATE))
            return date.textOrEmpty();
        if (json::Value const invalid = object.get(INVALID))
            return shown(invalid) + " (invalid)";
    }
    std::ostringstream text;
    text << value;
    return Base::plainLine(text.str());
}

/// Reals are written with 15 digits, so the last ones may differ.
bool isSame(json::Value const& a, json::Value const& b) {
    constexpr double NEARLY = 1e-12;
    if (!a.isReal() && !b.isReal())
        return a == b;
    bool const areNumbers = (a.isReal() || a.isInt()) && (b.isReal() || b.isInt());
    double const size = std::max(std::abs(a.numberOrZero()), std::abs(b.numberOrZero()));
    return areNumbers && std::abs(a.numberOrZero() - b.numberOrZero()) <= size * NEARLY;
}

/// Compares letters of one document, and collects what differs.
class Comparison {
public:
    explicit Comparison(Cfg::ExtractZones const& definitions) : definitions_(definitions) {}

    void compareText(json::Object const& expected, char const* key, char const* what,
                     std::string const& found) {
        json::Value const wanted = expected.get(key);
        if (wanted && wanted != json::Value(found))
            add(std::string(what) + ": expected " + shown(wanted) + ", found " + inQuotes(found));
    }

    void compareLetters(json::Value const& expected, std::optional<std::vector<LetterReading>> const& found) {
        if (!expected.isArray() || !found) {
            if (expected.isArray() != found.has_value())
                add(found ? "expected an attachment, found " + counted(found->size(), "letter")
                          : "expected " + counted(expected.toArray().size(), "letter") +
                                ", found an attachment");
            return;
        }
        json::Array const& letters = expected.toArray();
        std::size_t const count = std::max(letters.size(), found->size());
        for (std::size_t i = 0; i < count; ++i) {
            std::string const number = "letter " + std::to_string(i + 1) + ": ";
            if (i >= found->size())
                add(number + "expected, not found");
            else if (i >= letters.size())
                add(number + "not expected, found on " + pagesInWords((*found)[i].pages));
            else
                compareLetter(letters.at(i).toObject(), (*found)[i], count == 1 ? "" : number);
        }
    }

    std::vector<std::string> take() { return std::move(differences_); }

private:
    void compareLetter(json::Object const& expected, LetterReading const& letter, std::string const& prefix) {
        prefix_ = prefix;
        json::Object const found = expectationOf(letter);
        compareOptional(expected, found, PAGES, "pages");
        compareOptional(expected, found, GOES_TO, "goes to");
        compareOptional(expected, found, MISSING, "missing");
        json::Object const wanted = expected.get(FIELDS).toObject();
        json::Object const fields = found.get(FIELDS).toObject();
        for (auto const& [name, value] : wanted)
            compareField(name, value, fields.get(name));
        for (auto const& [name, value] : fields)
            if (!wanted.get(name))
                add(std::string(name) + ": not expected, found " + inWords(name, value));
        prefix_.clear();
    }

    void compareOptional(json::Object const& expected, json::Object const& found, char const* key,
                         char const* what) {
        json::Value const wanted = expected.get(key);
        json::Value const value = found.get(key);
        if (wanted && wanted != value)
            add(std::string(what) + ": expected " + shown(wanted) + ", found " +
                (value ? shown(value) : "none"));
    }

    void compareField(std::string const& name, json::Value const& expected, json::Value const& found) {
        if (!found)
            add(name + ": expected " + shown(expected) + ", not found");
        else if (!isSame(expected, found))
            add(name + ": expected " + shown(expected) + ", found " + inWords(name, found));
    }

    /// With the reason when it is invalid.
    std::string inWords(std::string const& name, json::Value const& found) const {
        json::Value const text = found.isObject() ? found.toObject().get(INVALID) : json::Value();
        Cfg::ExtractField const* const definition = definitions_.findField(name);
        if (!text.isString() || !definition)
            return shown(found);
        auto const refusal = refusalOf(*definition, text.toString());
        return refusal ? shown(text) + " (invalid: " + refusal->says + ')' : shown(found);
    }

    void add(std::string const& difference) { differences_.push_back(prefix_ + difference); }

    Cfg::ExtractZones const& definitions_;
    /// Of what is said of one of several letters.
    std::string prefix_;
    std::vector<std::string> differences_;
};

} // namespace

json::Object expectationOf(DocumentReading const& reading) {
    json::Value letters(json_null());
    if (reading.letters) {
        json::Array all;
        for (LetterReading const& letter : *reading.letters)
            all.append(expectationOf(letter));
        letters = all;
    }
    return {{EXTRACT_PRESET, reading.extractPreset}, {PACK_PRESET, reading.packPreset}, {LETTERS, letters}};
}

std::string printed(json::Object const& expectation) {
    std::unique_ptr<char, decltype(&std::free)> const text(
        json_dumps(expectation.node(), JSON_INDENT(2) | JSON_REAL_PRECISION(15)), std::free);
    if (!text)
        throw Base::Error(Base::Code::ExpectationMalformed,
                          "the fields hold text that is no UTF-8, which cannot be written");
    return std::string(text.get()) + '\n';
}

json::Object readExpectation(std::string const& text) {
    json::Object expectation;
    try {
        expectation = json::strToObject(text.data(), text.size());
    } catch (json::Exc const& wrong) {
        throw Base::Error(Base::Code::ExpectationMalformed,
                          std::string(wrong.what()) + "; correct the file there");
    }
    requireKnownKeys(expectation, DOCUMENT_KEYS);
    json::Value const letters = expectation.get(LETTERS);
    if (!letters)
        throw Base::Error(Base::Code::ExpectationMalformed,
                          "\"letters\" is missing; write a list of letters, or null for an attachment");
    if (letters.isArray())
        for (json::Value const& letter : letters.toArray())
            requireLetter(letter);
    else if (!json_is_null(letters.node()))
        throw Base::Error(Base::Code::ExpectationMalformed,
                          "\"letters\" is no list; write a list of letters, or null for an attachment");
    return expectation;
}

std::vector<std::string> differences(json::Object const& expected, DocumentReading const& reading,
                                     Cfg::ExtractZones const& definitions) {
    Comparison comparison(definitions);
    comparison.compareText(expected, EXTRACT_PRESET, "extraction preset", reading.extractPreset);
    comparison.compareText(expected, PACK_PRESET, "pack preset", reading.packPreset);
    comparison.compareLetters(expected.get(LETTERS), reading.letters);
    return comparison.take();
}

} // namespace VlMail

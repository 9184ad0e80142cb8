#include "vlservice/extract/extract_field.h"

#include "vlservice/extract/lower_case.h"
#include "vlservice/extract/regex.h"
#include "vlservice/json/json_record.h"
#include "vlservice/platform/log.h"

#include <boost/container/small_vector.hpp>

#include <algorithm>
#include <cstddef>
#include <exception>
#include <string>
#include <tuple>
#include <type_traits>

namespace Cfg {

static_assert(std::is_nothrow_move_constructible_v<ExtractField>);
static_assert(std::is_nothrow_move_assignable_v<ExtractField>);

std::string const ExtractField::REGEX_VALUE_GROUP_MARK = "VAL";

struct ExtractField::Keys {
    static constexpr std::tuple TABLE{
        json::Required{"name", &ExtractField::name_},
        json::Key{"value_extract", &ExtractField::strRegex_},
        json::Key{"mark", &ExtractField::mark_},
        json::Key{"ignore_font_metrics", &ExtractField::ignoreFontMetrics_},
        json::Key{"priority", &ExtractField::priority_},
        json::Key{"obligatory", &ExtractField::mustHave_},
        json::Key{"make_one_line", &ExtractField::make1Line_},
        json::Key{"send_to_server", &ExtractField::sendToServer_},
        json::Key{"width", &ExtractField::width_},
        json::Key{"ignore_on_group", &ExtractField::ignoreOnGroup_},
        json::Key{"name_is_redirect_match", &ExtractField::nameIsRedirectMatch_},
        json::Key{"postal_match", &ExtractField::postalMatch_},
    };
    /// Read and written by the validator. What limits and a default may be depends on the type of the value.
    static constexpr std::tuple VALIDATION{
        json::Named{Validation::MATCH_KEY, json::KeyType::Text, R"("")"},
        json::Named{Validation::TYPE_KEY, json::KeyType::Int32, "0"},
        json::Named{Validation::MIN_KEY, json::KeyType::Any},
        json::Named{Validation::MAX_KEY, json::KeyType::Any},
        json::Named{Validation::DEFAULT_KEY, json::KeyType::Any},
    };
};

/// The group, which lies in the text, and where the whole match stands in it.
struct ExtractField::Found {
    std::string_view value;
    std::size_t offset;
    std::size_t length;
};

ExtractField::ExtractField(json::Object const& object) {
    json::readKeys(Keys::TABLE, object, *this);
    validation_.reset(Validation::createImpl(object, *this));
    fix();
}

std::shared_ptr<ExtractedField> ExtractField::extractField(std::string& text, Measure const& measure) const {
    return extractField(text, measure, {});
}

std::shared_ptr<ExtractedField> ExtractField::extractField(std::string& text, Measure const& measure,
                                                           OnFailure const& onFailure) const {
    try {
        if (auto found = find(text)) {
            return measure ? measured(text, *found, measure) : cutOut(text, *found);
        }
    } catch (std::exception const& error) {
        Log::Lock(3).logStreamLine() << "Extract field failed with " << error.what() << '\n';
        if (onFailure)
            onFailure(error.what());
    }
    auto const& standIn = sharedDefault();
    return standIn ? std::make_shared<ExtractedField>(*standIn) : nullptr;
}

void ExtractField::validate(ExtractedField& value) const {
    if (!value.isValidated() && validation_)
        validation_->validate(value);
}

bool ExtractField::fieldsCanCoexist(ExtractField const& other) const {
    bool const sameAddress = priority_ >= 1 && priority_ == other.priority_;
    return name_ != other.name_ && !sameAddress;
}

void ExtractField::fix() {
    if (priority_ != 0)
        name_ = lowerCase(std::move(name_));
    if (mark_ != LetterSeparatorMark::None)
        mustHave_ = true;
    if (priority_ >= 1 && validation_)
        validation_->defaultValue_.reset();
}

json::Object ExtractField::serialize() const {
    json::Object object;
    json::writeKeys(Keys::TABLE, *this, object);
    if (validation_)
        validation_->serialize(object);
    return object;
}

json::RecordKeys const& ExtractField::keys() {
    static json::RecordKeys const keys{json::describeKeys(Keys::TABLE, Keys::VALIDATION)};
    return keys;
}

bool ExtractField::operator==(ExtractField const& other) const {
    std::string const none;
    auto const validationPattern = [&](ExtractField const& field) -> std::string const& {
        return field.validation_ ? field.validation_->strRegex_ : none;
    };
    return json::sameKeys(Keys::TABLE, *this, other) && validationPattern(*this) == validationPattern(other);
}

std::optional<ExtractField::Found> ExtractField::find(std::string const& text) const {
    if (strRegex_.empty())
        return std::nullopt;
    auto const found = compiledRegex_.get(strRegex_, REGEX_VALUE_GROUP_MARK).search(text);
    if (!found || !found->group)
        return std::nullopt;
    auto const offset = static_cast<std::size_t>(found->whole.data() - text.data());
    return Found{*found->group, offset, found->whole.size()};
}

std::shared_ptr<ExtractedField> ExtractField::cutOut(std::string& text, Found const& found) const {
    auto value = makeValue(found.value);
    text.erase(found.offset, found.length);
    return value;
}

std::shared_ptr<ExtractedField> ExtractField::measured(std::string& text, Found const& found,
                                                       Measure const& measure) const {
    // The measure may change the text.
    std::string const value(found.value);
    return isTooWide(measure(text, found.offset, found.length)) ? sharedDefault() : makeValue(value);
}

std::shared_ptr<ExtractedField> ExtractField::makeValue(std::string_view found) const {
    // Most values are short: what is changed in them is changed on the stack.
    boost::container::small_vector<char, 256> text(found.begin(), found.end());
    if (make1Line_)
        text.erase(std::remove(text.begin(), text.end(), '\n'), text.end());
    std::replace(text.begin(), text.end(), '\t', ' ');
    text.push_back('\0');
    return std::make_shared<ExtractedField>(name_, text.data(), priority_, sendToServer_, ignoreOnGroup_,
                                            ExtractedField::ValueType::NotValidated);
}

std::shared_ptr<ExtractedField> const& ExtractField::sharedDefault() const {
    static std::shared_ptr<ExtractedField> const none;
    return validation_ ? validation_->defaultValue_ : none;
}

ExtractField::OwnedValidation::OwnedValidation() noexcept = default;
ExtractField::OwnedValidation::OwnedValidation(OwnedValidation const& other)
    : validation_(other ? other->clone() : nullptr) {}
ExtractField::OwnedValidation::OwnedValidation(OwnedValidation&& other) noexcept = default;
ExtractField::OwnedValidation& ExtractField::OwnedValidation::operator=(OwnedValidation const& other) {
    validation_.reset(other ? other->clone() : nullptr);
    return *this;
}
ExtractField::OwnedValidation& ExtractField::OwnedValidation::operator=(OwnedValidation&& other) noexcept {
    validation_.swap(other.validation_);
    return *this;
}
ExtractField::OwnedValidation::~OwnedValidation() = default;

void ExtractField::OwnedValidation::reset(Validation* validation) noexcept { validation_.reset(validation); }

} // namespace Cfg

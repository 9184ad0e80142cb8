// Fields: whether a letter can hold them together, and whether their attributes do what they say.
#include "programs/vlmail/presets/checks.h"
#include "programs/vlmail/presets/words.h"

#include <algorithm>
#include <string>
#include <vector>

namespace VlMail {
namespace {

using enum FindingKind;

/// Less than a short word in small print.
constexpr unsigned long long TINY_WIDTH = 1000;

std::vector<ListedField> readableFields(ListedExtractPreset const& preset) {
    std::vector<ListedField> fields;
    for (ListedZone const& zone : preset.zones)
        std::ranges::copy_if(zone.fields, std::back_inserter(fields),
                             [](ListedField const& field) { return field.field != nullptr; });
    return fields;
}

void checkCoexist(ListedField const& later, ListedField const& earlier, Findings& findings) {
    if (later.field->fieldsCanCoexist(*earlier.field))
        return;
    if (later.field->name() == earlier.field->name())
        findings.add(FieldNameTwice, later.place / "name",
                     {inQuotes(later.field->name()), earlier.place.pointer()});
    else
        findings.add(FieldPriorityTwice, later.place / "priority",
                     {inQuotes(earlier.field->name()), earlier.place.pointer(),
                      std::to_string(later.field->priority())});
}

bool isRecipient(ListedField const& field) { return field.field->priority() > 0; }

bool isSingleLetterMark(Cfg::ExtractField const& field) {
    return field.mark() == LetterSeparatorMark::SingleLetter;
}

/// What two reals become; empty when grouping leaves them alone.
char const* mergedReals(IgnoreOnGroup rule) {
    switch (rule) {
    case IgnoreOnGroup::Sum:
        return "2.0";
    case IgnoreOnGroup::Min:
    case IgnoreOnGroup::Max:
        return "1.0";
    default:
        return "";
    }
}

void checkAttributes(ListedField const& listed, Cfg::ExtractField const& field, Findings& findings) {
    if (field.strRegex().empty() && !field.validation().defaultValue())
        findings.add(NeverFound, listed.place);
    if (field.name() != listed.name)
        findings.add(NameLowered, listed.place / "name", {inQuotes(field.name())});
    if (field.maxWidth() > 0 && field.maxWidth() < TINY_WIDTH)
        findings.add(WidthTiny, listed.place / "width",
                     {inMillimetres(static_cast<long long>(field.maxWidth()))});
    json::Value const type = listed.json.get("value_type");
    if (isSingleLetterMark(field) && type && type.intOrZero() != static_cast<int>(FieldValueType::Integer))
        findings.add(TypeOverruled, listed.place / "value_type");
    std::string const merged = mergedReals(field.ignoreOnGroup());
    if (field.validation().valueType() == FieldValueType::Float && !merged.empty())
        findings.add(RealsNotMerged, listed.place / "ignore_on_group", {merged});
}

} // namespace

void checkFieldsCoexist(PresetsDocument const& document, Findings& findings) {
    for (ListedExtractPreset const& preset : document.extractPresets()) {
        std::vector<ListedField> const fields = readableFields(preset);
        for (auto later = fields.begin(); later != fields.end(); ++later)
            for (auto earlier = fields.begin(); earlier != later; ++earlier)
                checkCoexist(*later, *earlier, findings);
    }
}

void checkAddresses(PresetsDocument const& document, Findings& findings) {
    for (ListedExtractPreset const& preset : document.extractPresets()) {
        std::vector<ListedField> const fields = readableFields(preset);
        for (ListedField const& field : fields)
            if (isRecipient(field) && !field.field->sendToServer())
                findings.add(AddressNotSent, field.place);
        // A tombstone has nothing to say of its fields.
        if (preset.preset.isForLetters() && !preset.preset.eraseMe() &&
            std::ranges::none_of(fields, isRecipient))
            findings.add(NoAddress, preset.place);
    }
}

void checkFieldAttributes(PresetsDocument const& document, Findings& findings) {
    forEachReadableField(document, [&](ListedField const& listed, Cfg::ExtractField const& field) {
        checkAttributes(listed, field, findings);
    });
}

} // namespace VlMail

#include "vlservice/extract/extract_zones.h"

#include <algorithm>
#include <iterator>
#include <stdexcept>
#include <utility>

namespace Cfg {

namespace {

auto named(std::string const& name) {
    return [&name](ExtractField const& field) { return field.name() == name; };
}

} // namespace

std::string const ExtractZones::SINGLE_LTR_FLD_NAME = "Single Letter Documents (Automatic)";

ExtractField const* ExtractZones::findField(std::string const& name) const {
    for (ExtractZone const& zone : *this) {
        auto const& fields = zone.fields();
        auto const found = std::find_if(fields.begin(), fields.end(), named(name));
        if (found != fields.end())
            return &*found;
    }
    return nullptr;
}

ExtractField const& ExtractZones::field(std::string const& name) const {
    auto const* const found = findField(name);
    if (!found)
        // The odd spelling is the interface's: programs know the message so.
        throw std::runtime_error("Failed to fine field " + name + " in any zone");
    return *found;
}

bool ExtractZones::hasSinlgeLetterField() const {
    if (empty())
        return false;
    auto const& fields = front().fields();
    return std::any_of(fields.begin(), fields.end(), named(SINGLE_LTR_FLD_NAME));
}

void ExtractZones::setSingleLetterField(bool isSingle) {
    if (isSingle == hasSinlgeLetterField())
        return;
    if (isSingle)
        addSingleLetterField();
    else
        eraseSingleLetterField();
}

void ExtractZones::addSingleLetterField() {
    ExtractField field;
    field.setName(SINGLE_LTR_FLD_NAME);
    field.setMark(LetterSeparatorMark::SingleLetter);
    field.setValidation(ExtractField::Validation::create(0, field));
    if (empty())
        emplace_back();
    front().fields().push_back(std::move(field));
}

void ExtractZones::eraseSingleLetterField() {
    // Into a new vector: shifting by assignment would leave each field behind the erased one with the
    // compiled pattern of its predecessor.
    auto& fields = front().fields();
    auto const erased = std::find_if(fields.begin(), fields.end(), named(SINGLE_LTR_FLD_NAME));
    std::vector<ExtractField> kept;
    kept.reserve(fields.size() - 1);
    std::move(fields.begin(), erased, std::back_inserter(kept));
    std::move(std::next(erased), fields.end(), std::back_inserter(kept));
    fields = std::move(kept);
}

} // namespace Cfg

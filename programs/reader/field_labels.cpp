#include "programs/reader/field_labels.h"

#include "programs/patterns/parts.h"
#include "programs/patterns/pattern.h"

#include <algorithm>
#include <optional>

namespace Reader {
namespace {

/// How much of the text's beginning the pattern fits.
std::size_t fittedBy(std::string const& label, std::string_view text) {
    try {
        auto const place = Patterns::Pattern(label, Patterns::Pattern::Use::Extract).find(text);
        return place ? place->length : 0;
    } catch (Patterns::Broken const&) {
        return 0; // It is said where the field is searched.
    }
}

std::string_view withoutBlanksInFront(std::string_view text) {
    return text.substr(std::min(text.find_first_not_of(' '), text.size()));
}

} // namespace

void FieldLabels::add(Cfg::ExtractField const& field) {
    std::string const label = Patterns::labelIn(field.strRegex());
    if (!Patterns::literalsOf(label).empty())
        labels_.emplace_back(field.name(), "\\A(?:" + label + ')');
}

bool FieldLabels::haveAll(std::string_view text, Cfg::ExtractField const& besides) const {
    if (text.empty())
        return false;
    while (!text.empty()) {
        std::size_t fitted = 0;
        for (auto const& [name, label] : labels_)
            if (name != besides.name())
                fitted = std::max(fitted, fittedBy(label, text));
        if (fitted == 0)
            return false;
        text = withoutBlanksInFront(text.substr(fitted));
    }
    return true;
}

} // namespace Reader

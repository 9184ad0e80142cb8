#include "vlservice/extract/extracted_fields.h"

#include <algorithm>
#include <utility>

namespace Cfg {
namespace {

using Position = ExtractedFields::const_iterator;

Position nextCompared(Position at, Position end) {
    return std::find_if(at, end, [](auto const& entry) { return !entry.second.ignoreOnCompare(); });
}

} // namespace

ExtractedFields::ExtractedFields(json::Array const& array) {
    for (json::Value const& element : array) {
        ExtractedField field(element.toObject());
        int const priority = field.priority();
        emplace(priority, std::move(field));
    }
}

json::Array ExtractedFields::serialize() const {
    json::Array array;
    for (auto const& [priority, field] : *this)
        array.append(field.serialize());
    return array;
}

ExtractedField const* ExtractedFields::primaryAddressField() const {
    auto const found = std::find_if(begin(), end(), [](auto const& entry) {
        return entry.second.isRcptAddress() && entry.second.sendToServer();
    });
    return found == end() ? nullptr : &found->second;
}

bool ExtractedFields::isProductionReady(std::string& message) const {
    auto const invalid =
        std::find_if(begin(), end(), [](auto const& entry) { return !entry.second.isValid(); });
    if (invalid != end()) {
        message = "Field name: \"" + invalid->second.name() + '"';
        return false;
    }
    return primaryAddressField() != nullptr;
}

bool ExtractedFields::sameAs(ExtractedFields const& other) const {
    auto at = nextCompared(begin(), end());
    auto otherAt = nextCompared(other.begin(), other.end());
    while (at != end() && otherAt != other.end()) {
        if (!at->second.sameAs(otherAt->second))
            return false;
        at = nextCompared(std::next(at), end());
        otherAt = nextCompared(std::next(otherAt), other.end());
    }
    return at == end() && otherAt == other.end();
}

void ExtractedFields::combineOnGroup(ExtractedFields const& other) {
    for (auto const& [priority, field] : other) {
        if (!field.ignoreOnCompare())
            continue;
        if (ExtractedField* const own = findField(field.name()))
            own->combineOnGroup(field);
        else
            emplace(priority, field);
    }
}

ExtractedField* ExtractedFields::findField(std::string const& name) {
    auto const found =
        std::find_if(begin(), end(), [&](auto const& entry) { return entry.second.name() == name; });
    return found == end() ? nullptr : &found->second;
}

} // namespace Cfg

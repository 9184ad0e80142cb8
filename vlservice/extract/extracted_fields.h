#pragma once
// All values read from one letter: can it go out, to which address, and with which letters may it be grouped?

#include "vlservice/export.h"
#include "vlservice/extract/extracted_field.h"

#include <functional>
#include <map>
#include <string>

namespace Cfg {

/// Fields by falling priority: recipient addresses, ordinary fields, notification addresses. Within a
/// priority they stand in the order of their insertion. The key of an entry is the field's priority; whoever
/// inserts sees to that.
class VLSERVICE_EXPORT ExtractedFields : public std::multimap<int, ExtractedField, std::greater<int>> {
public:
    ExtractedFields() = default;
    /// Throws json::Exc when an element is no object or no field.
    ExtractedFields(json::Array const& array);

    /// The fields in iteration order.
    json::Array serialize() const;

    /// The first recipient address that goes to the server, valid or not; null when there is none.
    ExtractedField const* primaryAddressField() const;
    /// Whether every field is valid and there is a primary address. `message` is replaced only to name the
    /// first field that is not valid: false with an unchanged message means that there is no address.
    bool isProductionReady(std::string& message) const;
    /// Whether two letters may be grouped: the fields that are compared are the same, position by position.
    /// The same fields in another order within a priority are not the same.
    bool sameAs(ExtractedFields const& other) const;

    /// Merges the fields of a letter that joins the group; what must agree between letters is left alone. The
    /// danger of ExtractedField::combineOnGroup holds here too: a collected array grows in every handle that
    /// shares it. Throws json::Exc for values that cannot be merged; the fields merged until then stay
    /// merged.
    void combineOnGroup(ExtractedFields const& other);

private:
    ExtractedField* findField(std::string const& name);
};

} // namespace Cfg

// The values of two letters: {"a": [field, ...], "b": [field, ...]}, read, written, compared, grouped.
#include "vlservice/extract/extracted_fields.h"
#include "vlservice/json/json_text.h"

#include <cstdint>
#include <cstdlib>
#include <string>

namespace {

void require(bool holds) {
    if (!holds)
        std::abort();
}

bool hasNeverSame(Cfg::ExtractedFields const& fields) {
    for (auto const& [priority, field] : fields)
        if (field.ignoreType() == IgnoreOnGroup::NeverSame)
            return true;
    return false;
}

void checkField(Cfg::ExtractedField const& field, Cfg::ExtractedField const& other) {
    require(field.sameAs(other) == other.sameAs(field));
    try {
        field.valueToStr();
    } catch (json::Exc const&) { // a date that is no integer, a list of dates with something else in it
    }
    try {
        field.cmpSort(other);
    } catch (json::Exc const&) { // a date against something else
    }
}

void check(Cfg::ExtractedFields const& fields) {
    json::Array const written = fields.serialize();
    Cfg::ExtractedFields const readBack(written);
    require(readBack.size() == fields.size() && readBack.serialize() == written);
    require(fields.sameAs(readBack) || hasNeverSame(fields));
    std::string message;
    bool const ready = fields.isProductionReady(message);
    require(!ready || (fields.primaryAddressField() && message.empty()));
    for (auto const& [priority, field] : fields) {
        require(priority == field.priority());
        checkField(field, fields.begin()->second);
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    try {
        json::Object const letters = json::strToObject(reinterpret_cast<char const*>(data), size);
        Cfg::ExtractedFields group(letters.get("a").toArray());
        check(group);
        Cfg::ExtractedFields const letter(letters.get("b").toArray());
        check(letter);
        require(group.sameAs(letter) == letter.sameAs(group));
        group.combineOnGroup(letter);
        // Once more, now that the group shares some of the letter's values.
        group.combineOnGroup(letter);
        group.serialize();
    } catch (json::Exc const&) {
    }
    return 0;
}

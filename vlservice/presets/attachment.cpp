#include "vlservice/presets/additional_keys.h"
#include "vlservice/presets/pack_preset.h"

#include <algorithm>
#include <array>
#include <string_view>

namespace Cfg {
namespace {

constexpr char const* ID = "id";
constexpr char const* PREFERRED_POS = "preferred_pos";

/// The last three are other programs' keys: they are dropped.
constexpr std::array<std::string_view, 5> RESERVED{ID, PREFERRED_POS, "pdf_file_name", "doc_name",
                                                   "is_letter"};

bool isReserved(std::string_view key) {
    return std::find(RESERVED.begin(), RESERVED.end(), key) != RESERVED.end();
}

} // namespace

PackPreset::Attachment::Attachment(std::string document, int position, json::Value unknownKeys)
    : id(std::move(document)), preferredPos(position), additional(std::move(unknownKeys)) {}

PackPreset::Attachment::Attachment(json::Value const& value) {
    if (value.isString()) {
        id = value.toString();
        return;
    }
    json::Object const& object = value.toObject();
    id = object.get(ID).toString();
    if (json::Value const position = object.get(PREFERRED_POS))
        preferredPos = static_cast<int>(position.toInt());
    additional = additionalKeys(object, isReserved);
}

json::Value PackPreset::Attachment::serialize() const {
    if (preferredPos == NO_PREFERRED_POS && !additional)
        return id;
    json::Object object{{ID, id}};
    if (preferredPos != NO_PREFERRED_POS)
        object.set(PREFERRED_POS, preferredPos);
    addKeys(additional, object);
    return object;
}

} // namespace Cfg

#include "vlservice/json/json_record.h"
#include "vlservice/presets/additional_keys.h"
#include "vlservice/presets/pack_preset.h"

#include <string_view>
#include <tuple>

namespace Cfg {
namespace {

using Attachment = PackPreset::Attachment;

constexpr std::tuple TABLE{
    json::Required{"id", &Attachment::id},
    json::Key{"preferred_pos", &Attachment::preferredPos, Attachment::NO_PREFERRED_POS}.checked(),
    json::Dropped{"pdf_file_name"},
    json::Dropped{"doc_name"},
    json::Dropped{"is_letter"},
};

} // namespace

PackPreset::Attachment::Attachment(std::string document, int position, json::Value unknownKeys)
    : id(std::move(document)), preferredPos(position), additional(std::move(unknownKeys)) {}

PackPreset::Attachment::Attachment(json::Value const& value) {
    if (value.isString()) {
        id = value.toString();
        return;
    }
    json::Object const& object = value.toObject();
    json::readKeys(TABLE, object, *this);
    additional = additionalKeys(object, [](std::string_view key) { return json::claimsKey(TABLE, key); });
}

json::Value PackPreset::Attachment::serialize() const {
    if (preferredPos == NO_PREFERRED_POS && !additional)
        return id;
    json::Object object;
    json::writeKeys(TABLE, *this, object);
    addKeys(additional, object);
    return object;
}

json::RecordKeys const& PackPreset::Attachment::keys() {
    static json::RecordKeys const keys{
        .rows = json::describeKeys(TABLE), .keepsOthers = true, .mayBeText = true};
    return keys;
}

} // namespace Cfg

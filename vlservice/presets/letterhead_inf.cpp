#include "vlservice/presets/letterhead_inf.h"

#include "vlservice/json/json_record.h"
#include "vlservice/presets/additional_keys.h"

#include <string_view>
#include <tuple>
#include <utility>

namespace Cfg {
namespace {

constexpr std::tuple ID{json::Required{"id", &LetterheadInf::id}};
/// What makes an object of the letterhead when it is written.
constexpr std::tuple FLAGS{
    json::Key{"skip_letters", &LetterheadInf::skipLetters},
    json::Key{"skip_attachments", &LetterheadInf::skipAttachments},
    json::Key{"repeat_last_page", &LetterheadInf::repeatLastPage},
    json::Key{"apply_first_grouped_only", &LetterheadInf::applyFirstGroupedOnly},
    json::Key{"on_top", &LetterheadInf::onTop},
};
constexpr std::tuple LIST{json::Key{"which_attachments", &LetterheadInf::whichAttachments}};
/// Names of files are other programs' affair.
constexpr std::tuple DROPPED{json::Dropped{"file_name"}, json::Dropped{"pdf_file_name"}};

constexpr auto TABLE = std::tuple_cat(ID, FLAGS, LIST, DROPPED);

} // namespace

LetterheadInf::LetterheadInf(std::string document, bool notForLetters, bool notForAttachments,
                             bool repeatLast, bool firstGroupedOnly, bool aboveContent)
    : id(std::move(document)), skipLetters(notForLetters), skipAttachments(notForAttachments),
      repeatLastPage(repeatLast), applyFirstGroupedOnly(firstGroupedOnly), onTop(aboveContent) {}

LetterheadInf::LetterheadInf(json::Value const& value) {
    if (value.isString()) {
        id = value.toString();
        return;
    }
    json::Object const& object = value.toObject();
    json::readKeys(TABLE, object, *this);
    additional = additionalKeys(object, [](std::string_view key) { return json::claimsKey(TABLE, key); });
}

json::Value LetterheadInf::serialize() const {
    if (json::sameKeys(FLAGS, *this, LetterheadInf()))
        return id;
    json::Object object;
    json::writeKeys(TABLE, *this, object);
    addKeys(additional, object);
    return object;
}

json::RecordKeys const& LetterheadInf::keys() {
    static json::RecordKeys const keys{
        .rows = json::describeKeys(TABLE), .keepsOthers = true, .mayBeText = true};
    return keys;
}

bool LetterheadInf::operator==(LetterheadInf const& other) const {
    return json::sameKeys(TABLE, *this, other);
}

} // namespace Cfg

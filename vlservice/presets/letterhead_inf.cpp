#include "vlservice/presets/letterhead_inf.h"

#include "vlservice/json/json_form.h"
#include "vlservice/json/json_record.h"
#include "vlservice/presets/additional_keys.h"

#include <algorithm>
#include <array>
#include <string_view>
#include <tuple>
#include <utility>

namespace Cfg {
namespace {

using Texts = JsonForm<std::vector<std::string>>;

constexpr std::tuple KEYS{
    json::Required{"id", &LetterheadInf::id},
    json::Key{"skip_letters", &LetterheadInf::skipLetters},
    json::Key{"skip_attachments", &LetterheadInf::skipAttachments},
    json::Key{"repeat_last_page", &LetterheadInf::repeatLastPage},
    json::Key{"apply_first_grouped_only", &LetterheadInf::applyFirstGroupedOnly},
    json::Key{"on_top", &LetterheadInf::onTop},
};

constexpr char const* WHICH_ATTACHMENTS = "which_attachments";

/// The names of files are other programs' keys: they are dropped.
constexpr std::array<std::string_view, 9> RESERVED{
    "id",
    "file_name",
    "pdf_file_name",
    "skip_letters",
    "skip_attachments",
    WHICH_ATTACHMENTS,
    "repeat_last_page",
    "apply_first_grouped_only",
    "on_top",
};

bool isReserved(std::string_view key) {
    return std::find(RESERVED.begin(), RESERVED.end(), key) != RESERVED.end();
}

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
    json::readKeys(KEYS, object, *this);
    whichAttachments = Texts::read(object.get(WHICH_ATTACHMENTS));
    additional = additionalKeys(object, isReserved);
}

json::Value LetterheadInf::serialize() const {
    json::Object object;
    json::writeKeys(KEYS, *this, object);
    bool const hasFlags = object.size() > 1;
    if (!hasFlags)
        return id;
    if (!whichAttachments.empty())
        object.set(WHICH_ATTACHMENTS, Texts::write(whichAttachments));
    addKeys(additional, object);
    return object;
}

bool LetterheadInf::operator==(LetterheadInf const& other) const {
    auto const compared = [](LetterheadInf const& l) {
        return std::tie(l.skipLetters, l.skipAttachments, l.whichAttachments, l.repeatLastPage,
                        l.applyFirstGroupedOnly, l.onTop, l.id);
    };
    return compared(*this) == compared(other);
}

} // namespace Cfg

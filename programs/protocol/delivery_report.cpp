#include "programs/protocol/delivery_report.h"

#include "programs/base/utf8.h"
#include "programs/protocol/query.h"
#include "programs/protocol/rows.h"

#include <algorithm>

namespace Protocol {
namespace {

constexpr char const* ID = "id";
constexpr char const* LETTER = "letter";

struct MessageForm {
    static bool fits(json::Value const& node) {
        return node.isString() && node.textOrEmpty().size() <= DeliveryReport::MAX_BYTES;
    }
    static std::string wanted() {
        return "a text of at most " + std::to_string(DeliveryReport::MAX_BYTES) + " bytes";
    }
};

} // namespace

struct DeliveryReport::Keys {
    static constexpr std::tuple TABLE{
        Asked{"message", &DeliveryReport::message, MessageForm{}},
    };
};

DeliveryReport::DeliveryReport(std::string_view bytes) {
    std::string text(bytes.substr(0, MAX_BYTES));
    std::ranges::replace(text, '\0', ' ');
    message = Base::firstBytes(Base::validUtf8(text), MAX_BYTES);
}

DeliveryReport::DeliveryReport(json::Object const& object) { json::readKeys(Keys::TABLE, object, *this); }

json::Object DeliveryReport::serialize() const {
    json::Object object = question(KIND);
    json::writeKeys(Keys::TABLE, *this, object);
    return object;
}

DeliveryReportAnswer::DeliveryReportAnswer(json::Object const& object)
    : id(object.get(ID).textOrEmpty()), letter(object.get(LETTER).toObject()) {}

json::Object DeliveryReportAnswer::serialize() const { return {{ID, id}, {LETTER, letter.serialize()}}; }

} // namespace Protocol

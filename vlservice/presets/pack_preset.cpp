#include "vlservice/presets/pack_preset.h"

#include "vlservice/json/json_form.h"
#include "vlservice/json/json_record.h"
#include "vlservice/presets/additional_keys.h"

#include <algorithm>
#include <array>
#include <concepts>
#include <ctime>
#include <stdexcept>
#include <string_view>
#include <tuple>

namespace Cfg {

/// Words of flag bits: what is no integer reads as 0, and they are written unsigned.
template<typename T>
requires std::same_as<T, ProcessMode> || std::same_as<T, ProcessModeClient>
struct JsonForm<T> {
    static T read(json::Value const& node) { return T(static_cast<std::uint32_t>(node.intOrZero())); }
    static json::Value write(T mode) { return mode.bits(); }
};

std::string const PackPreset::NAME_FLD_NAME = "name";
std::string const PackPreset::PROC_MODE_FLD_NAME = "process_mode";

namespace {

constexpr char const* EMBEDDED_NAME = "pack_preset";
constexpr char const* DELAY = "delay";
constexpr char const* ATTACHMENTS = "attachments";
constexpr char const* LETTERHEADS = "letterheads";

/// Keys that never become additional ones. Some are read by nobody here; they belong to the object around an
/// embedded preset and are dropped. Missing on purpose: "lock_pack_ui" and "pack_preset", which stay among
/// the additional keys.
constexpr std::array<std::string_view, 26> RESERVED{
    "name",
    "title",
    "colour_model",
    "department",
    "duplex",
    "orientation",
    "no_group",
    "process_mode",
    "process_mode_client",
    "profile",
    "priority_delivery",
    "purchase_order",
    "confirmation_email",
    "customer_email",
    ATTACHMENTS,
    "add_docs",
    LETTERHEADS,
    DELAY,
    "account",
    "user",
    "_id",
    "draft",
    "version",
    "covert",
    "erase_me",
    "last_used",
};

constexpr std::uint32_t MODE_WIDTH = 0xFF;
/// Two bits that exclude each other.
constexpr std::uint32_t MODE_EXCLUSIVE = 0x02 | 0x08;
/// A mode that is set needs one of these.
constexpr std::uint32_t MODE_REQUIRED = 0x01 | 0x02 | 0x08 | 0x80;
constexpr std::uint32_t CLIENT_MODE_REQUIRED = 0x01 | 0x02 | 0x10;

bool isPlausible(std::uint32_t bits, std::uint32_t required) {
    return bits <= MODE_WIDTH && (bits == 0 || (bits & required) != 0);
}

void check(ProcessMode mode, ProcessModeClient clientMode) {
    bool const excludesItself = (mode.bits() & MODE_EXCLUSIVE) == MODE_EXCLUSIVE;
    if (excludesItself || !isPlausible(mode.bits(), MODE_REQUIRED) ||
        !isPlausible(clientMode.bits(), CLIENT_MODE_REQUIRED))
        throw std::runtime_error("Invalid value for process_mode!");
}

} // namespace

struct PackPreset::Keys {
    static constexpr std::tuple TABLE{
        json::Key{"title", &PackPreset::title_},
        json::Key{"colour_model", &PackPreset::colorModel_},
        json::Key{"duplex", &PackPreset::duplex_},
        json::Key{"orientation", &PackPreset::orientation_},
        json::Key{"department", &PackPreset::department_},
        json::Key{"no_group", &PackPreset::noGroup_},
        json::Key{"process_mode", &PackPreset::processMode_},
        json::Key{"process_mode_client", &PackPreset::processModeClient_},
        json::Key{"profile", &PackPreset::profile_},
        json::Key{"priority_delivery", &PackPreset::priorityDelivery_},
        json::Key{"confirmation_email", &PackPreset::confirmReceipt_},
        json::Key{"customer_email", &PackPreset::userEmailOverride_},
        json::Key{"lock_pack_ui", &PackPreset::lockPackUI_},
        json::Key{"last_used", &PackPreset::lastUsed_},
    };
    /// Stands apart: it is written in the shortened form only.
    static constexpr json::Key ERASE_ME{"erase_me", &PackPreset::eraseMe_};
};

// The order decides which failure a bad object reports: the name, then the process modes, then the lists.
PackPreset::PackPreset(json::Object const& obj, std::unordered_set<std::string> const& extraFields) {
    name_ = obj.get(extraFields.empty() ? NAME_FLD_NAME.c_str() : EMBEDDED_NAME).toString();
    json::readKeys(Keys::TABLE, obj, *this);
    check(processMode_, processModeClient_);
    delay_ = j2pDelayInf(obj.get(DELAY));
    attachments_ = j2Attachments(obj.get(ATTACHMENTS));
    letterheads_ = j2ltrheads(obj.get(LETTERHEADS));
    additional_ = j2jAddFields(obj, extraFields);
    Keys::ERASE_ME.read(obj, *this);
}

json::Object PackPreset::serialize(bool embedded) const {
    json::Object object;
    object.set(embedded ? EMBEDDED_NAME : NAME_FLD_NAME.c_str(), name_);
    if (eraseMe_ && !embedded) {
        Keys::ERASE_ME.write(*this, object);
        return object;
    }
    json::writeKeys(Keys::TABLE, *this, object);
    if (delay_)
        object.set(DELAY, delay_->serialize());
    if (!attachments_.empty())
        object.set(ATTACHMENTS, JsonForm<std::vector<Attachment>>::write(attachments_));
    if (!letterheads_.empty())
        object.set(LETTERHEADS, JsonForm<std::vector<LetterheadInf>>::write(letterheads_));
    addKeys(additional_, object);
    return object;
}

bool PackPreset::compareSettings(PackPreset const& other) const {
    auto const compared = [](PackPreset const& p) {
        return std::tie(p.colorModel_, p.duplex_, p.orientation_, p.noGroup_, p.processMode_,
                        p.processModeClient_, p.priorityDelivery_, p.confirmReceipt_, p.lockPackUI_, p.title_,
                        p.department_, p.profile_, p.userEmailOverride_, p.attachments_, p.letterheads_,
                        p.additional_, p.eraseMe_);
    };
    auto const sameDelay = [](DelayInfo const* a, DelayInfo const* b) { return a && b ? *a == *b : a == b; };
    return compared(*this) == compared(other) && sameDelay(pDelayInfo(), other.pDelayInfo());
}

bool PackPreset::operator==(PackPreset const& other) const {
    return name_ == other.name_ && compareSettings(other);
}

json::Object& PackPreset::jObjAdditional() {
    if (!additional_)
        additional_ = json::Object();
    // An object's handle is a view of the value's, so the view of a value that may change may change too.
    return const_cast<json::Object&>(additional_.toObject());
}

void PackPreset::resetLastUsed() { lastUsed_ = std::time(nullptr); }

json::Value PackPreset::j2jAddFields(json::Object const& obj,
                                     std::unordered_set<std::string> const& extraFields) {
    return additionalKeys(obj, [&](std::string const& key) {
        return std::find(RESERVED.begin(), RESERVED.end(), key) != RESERVED.end() ||
               extraFields.contains(key);
    });
}

std::shared_ptr<PackPreset::DelayInfo const> PackPreset::j2pDelayInf(json::Value const& value) {
    return value ? std::make_shared<DelayInfo const>(value.toObject()) : nullptr;
}

std::vector<PackPreset::Attachment> PackPreset::j2Attachments(json::Value const& value) {
    return JsonForm<std::vector<Attachment>>::read(value);
}

std::vector<LetterheadInf> PackPreset::j2ltrheads(json::Value const& value) {
    return JsonForm<std::vector<LetterheadInf>>::read(value);
}

} // namespace Cfg

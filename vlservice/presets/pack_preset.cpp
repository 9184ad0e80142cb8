#include "vlservice/presets/pack_preset.h"

#include "vlservice/json/json_record.h"
#include "vlservice/presets/additional_keys.h"

#include <concepts>
#include <ctime>
#include <stdexcept>
#include <tuple>

namespace json {

/// Words of flag bits: what is no integer reads as 0, and they are written unsigned.
template<typename T>
requires std::same_as<T, Cfg::ProcessMode> || std::same_as<T, Cfg::ProcessModeClient>
struct Form<T> {
    static bool fits(Value const& node) { return node.isInt(); }
    static T read(Value const& node) {
        T const mode(static_cast<std::uint32_t>(node.toInt()));
        if (!T::RULES.allows(mode.bits()))
            throw std::runtime_error("Invalid value for process_mode!");
        return mode;
    }
    static Value write(T mode) { return mode.bits(); }
    static KeyForm describe() { return {KeyType::Bits}; }
};

/// A record that may be missing. Copies of a preset share it; it is compared by what it says.
template<>
struct Form<std::shared_ptr<Cfg::PackPreset::DelayInfo const>> {
    using Delay = Cfg::PackPreset::DelayInfo;
    using Shared = std::shared_ptr<Delay const>;

    static Value write(Shared const& delay) { return delay ? Value(delay->serialize()) : Value(); }
    static bool same(Shared const& a, Shared const& b) { return a && b ? *a == *b : a == b; }
    static KeyForm describe() { return {KeyType::Record, &Delay::keys()}; }
};

} // namespace json

namespace Cfg {
namespace {

constexpr char const* NAME = "name";
constexpr char const* PROCESS_MODE = "process_mode";

} // namespace

std::string const PackPreset::NAME_FLD_NAME = NAME;
std::string const PackPreset::PROC_MODE_FLD_NAME = PROCESS_MODE;

/// In wire order, which is also the order of reading: it decides which failure a bad object reports.
struct PackPreset::Keys {
    static constexpr json::Required CONFIGURED_NAME{NAME, &PackPreset::name_};
    /// Of the embedded form. Deliberately no row of the table, so not claimed: whoever reads that form names
    /// it among the further keys or gets it back among the additional ones.
    static constexpr json::Required EMBEDDED_NAME{"pack_preset", &PackPreset::name_};
    static constexpr std::tuple PRODUCTION{
        json::Key{"title", &PackPreset::title_},
        json::Key{"colour_model", &PackPreset::colorModel_},
        json::Key{"duplex", &PackPreset::duplex_},
        json::Key{"orientation", &PackPreset::orientation_},
        json::Key{"department", &PackPreset::department_},
        json::Key{"no_group", &PackPreset::noGroup_},
        json::Key{PROCESS_MODE, &PackPreset::processMode_},
        json::Key{"process_mode_client", &PackPreset::processModeClient_},
        json::Key{"profile", &PackPreset::profile_},
        json::Key{"priority_delivery", &PackPreset::priorityDelivery_},
        json::Key{"confirmation_email", &PackPreset::confirmReceipt_},
        json::Key{"customer_email", &PackPreset::userEmailOverride_},
        // Deliberately not claimed: stored presets hold it among the additional keys too, and on writing that
        // one wins over the field.
        json::Key{"lock_pack_ui", &PackPreset::lockPackUI_}.notClaimed(),
    };
    static constexpr std::tuple LAST_USED{json::Key{"last_used", &PackPreset::lastUsed_}};
    static constexpr std::tuple LISTS{
        json::Key{"delay", &PackPreset::delay_}.readBy(&PackPreset::j2pDelayInf),
        json::Key{"attachments", &PackPreset::attachments_}.readBy(&PackPreset::j2Attachments),
        json::Key{"letterheads", &PackPreset::letterheads_}.readBy(&PackPreset::j2ltrheads),
    };
    /// Written in the shortened form only.
    static constexpr std::tuple ERASE_ME{json::Key{"erase_me", &PackPreset::eraseMe_}};
    /// They belong to the object around an embedded preset.
    static constexpr std::tuple DROPPED{
        json::Dropped{"purchase_order"}, json::Dropped{"add_docs"}, json::Dropped{"account"},
        json::Dropped{"user"},           json::Dropped{"_id"},      json::Dropped{"draft"},
        json::Dropped{"version"},        json::Dropped{"covert"},
    };

    /// Behind the name.
    static constexpr auto WRITTEN = std::tuple_cat(PRODUCTION, LAST_USED, LISTS);
    static constexpr auto ALL = std::tuple_cat(std::tuple{CONFIGURED_NAME}, WRITTEN, ERASE_ME, DROPPED);
};

PackPreset::PackPreset(json::Object const& obj, std::unordered_set<std::string> const& extraFields) {
    (extraFields.empty() ? Keys::CONFIGURED_NAME : Keys::EMBEDDED_NAME).read(obj, *this);
    json::readKeys(Keys::WRITTEN, obj, *this);
    json::readKeys(Keys::ERASE_ME, obj, *this);
    additional_ = j2jAddFields(obj, extraFields);
}

json::Object PackPreset::serialize(bool embedded) const {
    json::Object object;
    (embedded ? Keys::EMBEDDED_NAME : Keys::CONFIGURED_NAME).write(*this, object);
    if (eraseMe_ && !embedded) {
        json::writeKeys(Keys::ERASE_ME, *this, object);
        return object;
    }
    json::writeKeys(Keys::WRITTEN, *this, object);
    addKeys(additional_, object);
    return object;
}

json::RecordKeys const& PackPreset::keys() {
    static json::RecordKeys const keys{.rows = json::describeKeys(Keys::ALL), .keepsOthers = true};
    return keys;
}

bool PackPreset::compareSettings(PackPreset const& other) const {
    return json::sameKeys(Keys::PRODUCTION, *this, other) && json::sameKeys(Keys::LISTS, *this, other) &&
           json::sameKeys(Keys::ERASE_ME, *this, other) && additional_ == other.additional_;
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
        return json::claimsKey(Keys::ALL, key) || extraFields.contains(key);
    });
}

std::shared_ptr<PackPreset::DelayInfo const> PackPreset::j2pDelayInf(json::Value const& value) {
    return value ? std::make_shared<DelayInfo const>(value.toObject()) : nullptr;
}

std::vector<PackPreset::Attachment> PackPreset::j2Attachments(json::Value const& value) {
    return json::Form<std::vector<Attachment>>::read(value);
}

std::vector<LetterheadInf> PackPreset::j2ltrheads(json::Value const& value) {
    return json::Form<std::vector<LetterheadInf>>::read(value);
}

} // namespace Cfg

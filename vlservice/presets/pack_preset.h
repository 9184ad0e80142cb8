#pragma once
// How the letters of one mailing are to be produced and sent.

#include "vlservice/export.h"
#include "vlservice/json/json.h"
#include "vlservice/json/record_keys.h"
#include "vlservice/presets/letterhead_inf.h"
#include "vlservice/presets/process_mode.h"

#include <cstdint>
#include <limits>
#include <memory>
#include <set>
#include <string>
#include <unordered_set>
#include <utility>
#include <vector>

/// On the wire a plain number, neither checked nor interpreted here.
enum class PackColorModel : std::int32_t { Default = 0 };

/// On the wire a plain number, neither checked nor interpreted here.
enum class PackForcedOrientation : std::int32_t { Default = 0 };

namespace Cfg {

/// A value without virtual operations. Its setters check nothing: the rules on the process modes hold for
/// reading only. Copies share the delay record, which is never changed in place, and the additional JSON
/// node, which is copied on write; a preset and its copies belong to one thread.
class VLSERVICE_EXPORT PackPreset {
public:
    /// A document that is added to a mailing.
    struct VLSERVICE_EXPORT Attachment {
        static constexpr int NO_PREFERRED_POS = std::numeric_limits<int>::min(); ///< no position is set

        Attachment(std::string document, int position, json::Value unknownKeys); ///< a record of these
        /// From the id as a string, or from an object with "id". Throws json::Exc for anything else and for a
        /// position that is no integer.
        Attachment(json::Value const& value);

        /// The id as a string when nothing else is set, otherwise an object.
        /// Throws json::Exc when `additional` holds something that is no object.
        json::Value serialize() const;
        static json::RecordKeys const& keys();

        bool operator==(Attachment const& other) const = default;

        std::string id; ///< of the document
        int preferredPos = NO_PREFERRED_POS;
        json::Value additional; ///< unknown keys as an object, or the empty handle
    };

    /// When a mailing may go out. The numbers are neither checked nor interpreted here.
    struct VLSERVICE_EXPORT DelayInfo {
        DelayInfo() = default;
        /// Throws json::Exc for a set that is no list of integers.
        DelayInfo(json::Object const& object);

        /// Without the members that are 0 or empty.
        json::Object serialize() const;
        static json::RecordKeys const& keys();

        bool operator==(DelayInfo const& other) const = default;

        /// The integers of an array, cut to 32 bits; none for the empty handle. Throws json::Exc for anything
        /// else.
        static std::set<int> jArrToInts(json::Value const& value);

        int count = 0;
        std::set<int> weekDays;
        std::set<int> monthDays;
        std::set<int> mins;
    };

    static std::string const NAME_FLD_NAME;      ///< key of the name
    static std::string const PROC_MODE_FLD_NAME; ///< key of the process mode

    PackPreset() = default;
    /// Reads the configuration form, which has the name under "name", when `extraFields` is empty. Otherwise
    /// it reads the embedded form: the name is under "pack_preset", and the keys in `extraFields` belong to
    /// somebody else. Throws json::Exc for values of the wrong type and std::runtime_error "Invalid value for
    /// process_mode!" for bits that do not go together in either process mode.
    PackPreset(json::Object const& obj, std::unordered_set<std::string> const& extraFields);

    /// Leaves out what equals its default, and sets the additional keys last, over the preset's own.
    /// Without `embedded` a preset marked for erasing is written as "name" and "erase_me" alone.
    /// Throws json::Exc when the additional value is neither the empty handle nor an object.
    json::Object serialize(bool embedded) const;
    /// Those of the configuration form.
    static json::RecordKeys const& keys();

    std::string const& name() const { return name_; } ///< by which presets are referred to
    std::string const& title() const { return title_; }
    PackColorModel colorModel() const { return colorModel_; }
    bool duplex() const { return duplex_; }
    PackForcedOrientation orientationForced() const { return orientation_; }
    std::string const& department() const { return department_; }
    bool noGroup() const { return noGroup_; }
    ProcessMode processMode() const { return processMode_; } ///< never checked here
    ProcessModeClient processModeClient() const { return processModeClient_; }
    std::string const& profile() const { return profile_; }
    bool priorityDelivery() const { return priorityDelivery_; }
    bool confirmReceipt() const { return confirmReceipt_; }
    std::string const& userEmailOverride() const { return userEmailOverride_; }
    bool lockPackUI() const { return lockPackUI_; } ///< nodes below keep to it
    /// Null when there is no delay; valid until this preset's delay is replaced and its copies are gone.
    DelayInfo const* pDelayInfo() const { return delay_.get(); }
    std::vector<Attachment> const& attachments() const { return attachments_; }    ///< in list order
    std::vector<LetterheadInf> const& letterheads() const { return letterheads_; } ///< in list order
    /// The keys that the preset does not know; may be the empty handle.
    json::Value const& jAdditional() const { return additional_; }
    bool eraseMe() const { return eraseMe_; } ///< it is to be erased

    /// Whether the presets say the same, by whatever name and whenever they were used.
    bool compareSettings(PackPreset const& other) const;
    bool operator==(PackPreset const& other) const;
    bool operator!=(PackPreset const& other) const { return !(*this == other); }

    void setName(std::string name) { name_ = std::move(name); } ///< by which it is referred to
    void setTitle(std::string title) { title_ = std::move(title); }
    /// Of colorModel(); the odd name is the interface's.
    void setColourMode(PackColorModel model) { colorModel_ = model; }
    void setDuplex(bool duplex) { duplex_ = duplex; }
    void setOrientationForced(PackForcedOrientation orientation) { orientation_ = orientation; }
    void setDepartment(std::string department) { department_ = std::move(department); }
    void setNoGroup(bool noGroup) { noGroup_ = noGroup; }
    void setProcessMode(ProcessMode mode) { processMode_ = mode; } ///< any bits
    void setProcessModeClient(ProcessModeClient mode) { processModeClient_ = mode; }
    void setProfile(std::string profile) { profile_ = std::move(profile); }
    void setPriorityDelivery(bool priority) { priorityDelivery_ = priority; }
    void setConfirmReceipt(bool confirm) { confirmReceipt_ = confirm; }
    void setUserEmailOverride(std::string email) { userEmailOverride_ = std::move(email); }
    /// A preset that was read with "lock_pack_ui" holds that key among the additional ones too, and those win
    /// on writing: there this call changes the answer of lockPackUI() and not what is written.
    void setLockPackUI(bool lock) { lockPackUI_ = lock; }
    /// Replaces the delay; copies of this preset keep theirs.
    void setDelayInfo(DelayInfo const& delay) { delay_ = std::make_shared<DelayInfo const>(delay); }
    std::vector<Attachment>& attachments() { return attachments_; }    ///< for changing
    std::vector<LetterheadInf>& letterheads() { return letterheads_; } ///< for changing
    /// The additional keys for changing; made when there are none yet.
    /// Throws json::Exc when the additional value is something else than an object.
    json::Object& jObjAdditional();
    void setAdditional(json::Value additional) { additional_ = std::move(additional); } ///< all of them
    /// Last used becomes the current time.
    void resetLastUsed();
    void deleteLastUsed() { lastUsed_ = 0; } ///< as if it was never used
    /// The mark is no part of what the preset says, so it can be set on a preset that must not change.
    void setEraseMe(bool erase) const { eraseMe_ = erase; }

private:
    struct Keys;

    static json::Value j2jAddFields(json::Object const& obj,
                                    std::unordered_set<std::string> const& extraFields);
    static std::shared_ptr<DelayInfo const> j2pDelayInf(json::Value const& value);
    static std::vector<Attachment> j2Attachments(json::Value const& value);
    static std::vector<LetterheadInf> j2ltrheads(json::Value const& value);

    std::string name_;
    std::string title_;
    PackColorModel colorModel_ = PackColorModel::Default;
    bool duplex_ = false;
    PackForcedOrientation orientation_ = PackForcedOrientation::Default;
    std::string department_;
    bool noGroup_ = false;
    ProcessMode processMode_;
    ProcessModeClient processModeClient_;
    std::string profile_;
    bool priorityDelivery_ = false;
    bool confirmReceipt_ = false;
    std::string userEmailOverride_;
    bool lockPackUI_ = false;
    std::shared_ptr<DelayInfo const> delay_;
    std::vector<Attachment> attachments_;
    std::vector<LetterheadInf> letterheads_;
    json::Value additional_;
    long long lastUsed_ = 0; ///< seconds since the epoch, 0 for never
    mutable bool eraseMe_ = false;
};

} // namespace Cfg

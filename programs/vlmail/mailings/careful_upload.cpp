#include "programs/vlmail/mailings/careful_upload.h"

#include "programs/mailing/print_wishes.h"
#include "programs/policy/course.h"
#include "programs/vlmail/mailings/sent_before.h"

#include <map>
#include <new>
#include <utility>
#include <vector>

namespace VlMail {
namespace {

/// Those that are to be asked for.
std::vector<Mailing::LetterDigest> digestsOf(Mailing::PackSource& pack) {
    try {
        Mailing::MailingOutline outline = Mailing::outlineOf(pack.metadata());
        if (!outline.again.empty() || !looksForDuplicates(outline.packPreset))
            return {};
        return std::move(outline.digests);
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const&) {
        // What is wrong with the metadata, the service says.
        return {};
    }
}

} // namespace

bool looksForDuplicates(Cfg::PackPreset const& preset) {
    return Mailing::PrintWishes::of(preset).duplicateDays > 0 &&
           !Policy::has(preset.processMode(), Policy::ProcessBit::Trial);
}

CarefulUpload::CarefulUpload(ServiceLine& service, Mailing::PackSource& pack, UploadWatcher const& watcher,
                             LeftOutWatcher const& leftOut)
    : service_(service), pack_(pack), watcher_(watcher), leftOut_(leftOut), digests_(digestsOf(pack)) {}

void CarefulUpload::send() {
    leaveOutKnown();
    for (;;) {
        try {
            return uploadPack(service_, rest(), watcher_);
        } catch (std::exception const&) {
            if (!mayHaveLostARace())
                throw;
        }
    }
}

Mailing::PackSource& CarefulUpload::rest() {
    if (!edited_)
        return pack_;
    return *edited_;
}

/// What kept the pack from being sent is told where this is no answer.
bool CarefulUpload::mayHaveLostARace() {
    try {
        return leaveOutKnown();
    } catch (NothingToSend const&) {
        throw;
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const&) {
        return false;
    }
}

bool CarefulUpload::leaveOutKnown() {
    std::vector<std::string> asked;
    for (Mailing::LetterDigest const& letter : digests_)
        asked.push_back(letter.digest);
    std::map<std::string, std::string> const known =
        SentBefore(registerOf(service_), pack_.info().cfgId, {pack_.packId()}).of(asked);
    std::map<std::string, long long> own;
    std::size_t const before = left_.size();
    for (Mailing::LetterDigest const& letter : digests_) {
        auto const [first, isFirst] = own.emplace(letter.digest, letter.number);
        if (auto const found = known.find(letter.digest); found != known.end())
            leaveOut(letter.number, found->second);
        else if (!isFirst)
            leaveOut(letter.number,
                     "sent-before: letter " + std::to_string(first->second) + " of the same mailing");
    }
    if (left_.size() == before)
        return false;
    std::erase_if(digests_, [this](auto const& letter) { return left_.contains(letter.number); });
    edited_ = EditedPack::without(pack_, left_);
    if (edited_->pages().empty())
        throw NothingToSend(pack_.packId());
    return true;
}

void CarefulUpload::leaveOut(long long number, std::string const& why) {
    if (left_.insert(number).second && leftOut_)
        leftOut_(number, why);
}

} // namespace VlMail

#pragma once
// Packs on their way to the service without letters that went out before.

#include "programs/base/error.h"
#include "programs/mailing/mailing_outline.h"
#include "programs/mailing/pack_source.h"
#include "programs/vlmail/mailings/edited_pack.h"
#include "programs/vlmail/mailings/pack_upload.h"

#include <functional>
#include <memory>
#include <set>
#include <string>
#include <vector>

namespace VlMail {

/// Told of a letter that stays behind, by its number in the pack, from 1, and why.
using LeftOutWatcher = std::function<void(long long number, std::string const& why)>;

/// All letters of a pack went out before: nothing of it is sent.
class NothingToSend : public Base::Error {
public:
    explicit NothingToSend(std::string const& packId)
        : Error(Base::Code::SentBefore, "all letters of " + packId + " were sent before") {}
};

/// Whether letters that go by it are looked for among those that went out.
bool looksForDuplicates(Cfg::PackPreset const& preset);

/// Sends one pack, which has to outlive it.
class CarefulUpload {
public:
    CarefulUpload(ServiceLine& service, Mailing::PackSource& pack, UploadWatcher const& watcher,
                  LeftOutWatcher const& leftOut);

    /// Returns when the pack is on record. Of two clients that send the same letter at once the service takes
    /// one: the other leaves it out then. Throws NothingToSend, and std::exception with a line for people.
    void send();

private:
    /// Leaves out what the service has of the letters that are left; false when that is nothing.
    bool leaveOutKnown();
    bool mayHaveLostARace();
    void leaveOut(long long number, std::string const& why);
    Mailing::PackSource& rest();

    ServiceLine& service_;
    Mailing::PackSource& pack_;
    UploadWatcher const& watcher_;
    LeftOutWatcher const& leftOut_;
    /// Empty where nobody is to ask.
    std::vector<Mailing::LetterDigest> digests_;
    std::set<long long> left_;
    /// Where letters were left out.
    std::unique_ptr<EditedPack> edited_;
};

} // namespace VlMail

#pragma once
// Sorts the letters of a batch into mailings, one a pack preset, and keeps account of what stays behind.

#include "programs/base/error.h"
#include "programs/channel/client.h"
#include "programs/vlmail/letters/making_ready.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/letters/reading.h"
#include "programs/vlmail/mailings/mailing_policies.h"
#include "programs/vlmail/mailings/outgoing_mailing.h"
#include "programs/vlmail/mailings/price.h"
#include "programs/vlmail/mailings/sent_before.h"
#include "programs/vlmail/terminal/terminal.h"

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace VlMail {

class Dispatch {
public:
    /// `presets` are those that the documents were read by, `making` is what they were made ready with.
    Dispatch(Cfg::Presets const& presets, MakingReady const& making, MailingPolicies policies,
             BeginMailing begin, Terminal const& terminal);

    /// Has letters stay behind that went out before, or twice in the batch; `sent` has to outlive the
    /// dispatch.
    void leaveOut(SentBefore& sent) { sent_ = &sent; }
    /// Has them go out all the same, for that reason.
    void sendAgain(std::string reason) { again_ = std::move(reason); }

    /// Adds a document's letters to their mailings. What cannot go out is remembered; failures are complained
    /// of.
    void take(ReadResult result);
    /// Has each letter told with its channel.
    void tellLetters() { tellsLetters_ = true; }
    /// Asks what the mailings would cost. Throws std::exception with a line for people.
    void estimate(Channel::Client& service);
    /// Lets all mailings arrive; one that fails does not stop the others.
    void finish();

    /// A table of the mailings, and a line for each document and letter that stays behind.
    void print() const;
    /// {"mailings", "left_out", "attachments", "failures"}, and "notifications" and "notes" where there are
    /// any.
    json::Object toJson() const;
    /// Of that object.
    static json::Object schema();
    Outcome::End end() const { return outcome_.end(); }

private:
    /// A letter, or all of a document, that stays behind.
    struct LeftBehind {
        std::string name;
        std::vector<int> pages;
        std::string reason;
        /// Of what is left out it also stands in front of the reason. Empty when there is none.
        std::string code = {};
    };

    /// Somebody who is to hear of a letter that goes out, by an address of a priority below 0.
    struct Notification {
        std::string name;
        std::vector<int> pages;
        std::string field;
        std::string address;
    };

    void refuseLetters(DocumentReading& reading);
    void refuseKnown(DocumentReading& reading);
    void noteLeftOut(OutgoingMailing& mailing);
    void mailLetters(DocumentReading reading);
    void noteRedrawnPages(std::string const& name, LetterReading const& letter);
    void noteNotifications(std::string const& name, LetterReading const& letter);
    OutgoingMailing& mailingFor(std::string const& packPreset);
    std::string priceInWords(OutgoingMailing const* mailing) const;
    void fail(std::string const& name, Base::Error const& failure);
    json::Array mailingsToJson() const;
    void printWays() const;
    std::vector<std::string> wayInWords(OutgoingMailing& mailing, Mailing::MailedLetter const& letter) const;
    std::optional<long long> priceOf(OutgoingMailing const& mailing, Mailing::MailedLetter const& letter,
                                     std::string const& channel) const;

    struct Rows;

    Cfg::Presets const& presets_;
    MakingReady const& making_;
    MailingPolicies policies_;
    BeginMailing begin_;
    SentBefore* sent_ = nullptr;
    std::string again_;
    /// Letters that go out, by their digests: their document and pages.
    std::map<std::string, std::string> going_;
    Terminal const& terminal_;
    /// By the pack preset's name, so that the same documents give the same order of mailings.
    std::map<std::string, std::unique_ptr<OutgoingMailing>> mailings_;
    std::vector<OutgoingMailing*> arrived_;
    /// By mailing; empty when nobody has asked.
    std::map<OutgoingMailing const*, MailingPrice> prices_;
    bool tellsLetters_ = false;
    std::vector<LeftBehind> leftOut_;
    std::vector<LeftBehind> failures_;
    std::vector<std::string> attachments_;
    /// What a person should know of a mailing.
    std::vector<std::string> notes_;
    std::vector<Notification> notifications_;
    Outcome outcome_;
};

} // namespace VlMail

#pragma once
// A way out for letters: one interface in front of all carriers.

#include "programs/protocol/carrier.h"

#include <atomic>
#include <functional>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace Carriers {

/// A letter as a carrier takes it.
struct OutgoingLetter {
    /// From 1, its place in the mailing.
    long long number = 0;
    /// The same at every attempt; a safe file name.
    std::string key;
    std::string address;
    /// Names and values, in their order.
    std::vector<std::pair<std::string, std::string>> fields;
    /// Sides in the document, from 1.
    long long firstPage = 1;
    long long pages = 0;
    /// Of paper.
    long long sheets = 0;
    long long colouredPages = 0;
};

/// How letters are to be printed.
struct Printing {
    enum class Colour { AsItIs, Grey, Coloured };

    Colour colour = Colour::AsItIs;
    /// Of a sheet, in 1/100 mm; 0 where nothing is said.
    int width = 0;
    int height = 0;
    int copies = 1;
};

/// What is handed over at once: a letter, or those of a mailing that go by the channel.
struct Parcel {
    /// The same at every attempt; a safe file name.
    std::string key;
    /// The mailing's id.
    std::string mailing;
    bool isDuplex = false;
    Printing printing;
    /// At least one, in their order.
    std::vector<OutgoingLetter> letters;
    /// Of all letters; a PDF.
    std::string document;
    long long pages = 0;
    /// Where they go as files of their own: names and PDFs.
    std::vector<std::pair<std::string, std::string>> attachments;
    /// Where answers of recipients go; may be empty.
    std::string replyTo;
};

/// An e-mail of text alone that tells of a mailing, or of one of its letters.
struct Notice {
    /// The same at every attempt.
    std::string key;
    std::string to;
    /// Where answers go; may be empty.
    std::string replyTo;
    /// A line.
    std::string subject;
    std::string text;
};

/// How handing over has ended.
struct Outcome {
    enum class Kind {
        /// The other side has taken it on.
        Accepted,
        /// The other side does not want it, now and later.
        Refused,
        /// The carrier itself failed, and nobody has it: to be tried again.
        Failed,
        /// The other side may have it or not.
        Uncertain,
    };

    Kind kind = Kind::Accepted;
    /// In the other side's words, or what failed; one line without secrets.
    std::string says;
};

/// What the other side says, when it is asked, of what it was given.
struct Progress {
    enum class Kind {
        UnderWay,
        Delivered,
        Failed,
        /// It came to nothing before anything was done with it: nobody has it.
        Lost,
    };

    Kind kind = Kind::UnderWay;
    /// One line.
    std::string says;
};

/// Raised when what hangs is to be given up, since the service ends: by any thread, once, for all copies.
class StopSign {
public:
    void raise() const { *isRaised_ = true; }
    bool isRaised() const { return *isRaised_; }

private:
    std::shared_ptr<std::atomic<bool>> isRaised_ = std::make_shared<std::atomic<bool>>(false);
};

/// Puts on record, until the disk has it, that the other side may have a parcel from here on. Throws
/// std::exception when that cannot be done: the parcel stays here then.
using PutOnRecord = std::function<void()>;

/// Used by one thread at a time.
class Carrier {
public:
    virtual ~Carrier() = default;

    /// Throws std::exception with one line where the carrier failed and nobody has it. `mayHaveIt` is called
    /// before the step from which on the other side may act; not by a carrier under whose keys anything can
    /// be handed over again, where it replaces what is there.
    virtual Outcome handOver(Parcel const& parcel, PutOnRecord const& mayHaveIt) = 0;
    /// The same with a notice, which carriers of e-mail send alone.
    virtual Outcome send(Notice const& /*notice*/, PutOnRecord const& /*mayHaveIt*/) {
        return {Outcome::Kind::Refused, "its carrier sends no e-mails"};
    }
    /// Of those keys that the other side can tell something of. Throws std::exception with one line.
    virtual std::map<std::string, Progress> ask(std::set<std::string> const& /*keys*/) { return {}; }
    /// Tries the other side without sending anything, and says in one line what it offers. Throws
    /// std::exception with one line.
    virtual std::string test() = 0;
};

/// The carrier that the settings name. One that talks to another machine gives up what it does some seconds
/// behind the raising of the sign.
std::unique_ptr<Carrier> makeCarrier(Protocol::CarrierSettings const& settings, StopSign const& stop = {});

} // namespace Carriers

#pragma once
// Letters that were divided among the channels, and how their carriers are doing, as the database keeps them.

#include "programs/mailing/fallback.h"
#include "programs/protocol/letter.h"
#include "programs/vlserviced/store/job_store.h"

#include <map>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

namespace VlServiced {

using Protocol::LetterState;

/// Which letter of which mailing, or which notice: those are numbered from -1 down.
struct LetterId {
    std::string packId;
    /// From 1, its place in the mailing.
    long long number = 0;

    auto operator<=>(LetterId const&) const = default;
    bool isNotice() const { return number < 0; }
    /// Under which it is handed over: a safe file name, "PACK-3" or "PACK-n1", which no other letter and no
    /// mailing has.
    std::string key() const {
        return packId + (isNotice() ? "-n" : "-") + std::to_string(isNotice() ? -number : number);
    }
    /// The other way; nothing when it is no key.
    static std::optional<LetterId> ofKey(std::string_view key);
};

/// A letter of a mailing that is divided.
struct DividedLetter {
    long long number = 0;
    std::string channel;
    /// Otherwise it goes in the container.
    bool byCarrier = false;
    /// By which it may go when that channel fails, in their order.
    std::vector<Mailing::OtherWay> otherWays = {};
};

/// Who is told that something was handed over.
struct Notice {
    /// That is handed over; 0 for the whole mailing.
    long long letter = 0;
    /// An e-mail address, or what should be one.
    std::string recipient;
    /// The same; may be empty.
    std::string replyTo = {};
    /// By which the recipient knows the letter; may be empty.
    std::string reference = {};
};

/// A letter, or a notice on its way.
struct StoredLetter {
    LetterId id;
    std::string channel;
    bool byCarrier = false;
    LetterState state = LetterState::Waiting;
    /// One line.
    std::string says;
    /// Seconds since the epoch.
    long long changedAt = 0;
    long long attempts = 0;
    /// When it was tried first; 0 before.
    long long firstTry = 0;
    /// When it may be tried next.
    long long due = 0;
    /// Where it is one.
    Notice notice = {};
    /// That are left, in their order.
    std::vector<Mailing::OtherWay> otherWays = {};
    /// Channels that it failed by, in their order; its own when it goes by that once more, without the others
    /// of its mailing.
    std::vector<std::string> tried = {};
};

/// How many letters of a job by channel, by whether they go by carriers, and by state.
struct LetterShare {
    std::string channel;
    bool byCarrier = false;
    LetterState state = LetterState::Waiting;
    long long count = 0;
};

/// How many letters of a job that go by carriers are in each state.
using LetterCounts = std::map<LetterState, long long>;

/// How a carrier is doing.
struct CarrierRecord {
    bool isPaused = false;
    /// In a row.
    long long failures = 0;
    std::string says;
    /// Seconds since the epoch.
    long long since = 0;
    /// When it may be tried again while it fails.
    long long tryAt = 0;
};

/// How a letter goes that is moved to another state.
enum class Goes {
    AsBefore,
    /// Without the others of its mailing, whose file stays as it is.
    Alone,
};

/// Where letters are that something became of.
enum class LettersAre {
    Anywhere,
    Waiting,
    /// The other side may have them.
    HandedOver,
};

/// Every change is one transaction and on the disk when the operation returns.
class LetterStore {
public:
    /// Both have to outlive the store.
    LetterStore(Database::Connection& database, JobStore& jobs) : database_(database), jobs_(jobs) {}

    /// Records the letters of a queued job, and its notices, which are held. False, and no change, when it is
    /// not queued or was divided before.
    bool divide(JobKey const& job, std::vector<DividedLetter> const& letters, long long now,
                std::vector<Notice> const& notices = {});

    std::optional<StoredLetter> find(LetterId const& letter) const;
    /// Of a job, in their order, at most `limit`.
    std::vector<StoredLetter> ofJob(std::string const& packId, std::size_t limit) const;
    long long countOfJob(std::string const& packId) const;
    /// The same of its notices.
    std::vector<StoredLetter> noticesOf(std::string const& packId, std::size_t limit) const;
    long long countOfNotices(std::string const& packId) const;
    std::vector<LetterShare> sharesOf(std::string const& packId) const;
    /// Of those that wait for a channel's carrier and are due by then, the first few in the order of their
    /// time and of their division. Costs what the answer is large.
    std::vector<StoredLetter> toGo(std::string const& channel, long long now, std::size_t limit) const;
    /// Those of one job, all of them, in their order.
    std::vector<StoredLetter> toGoTogether(std::string const& packId, std::string const& channel,
                                           long long now) const;
    /// The channels that letters wait for.
    std::vector<std::string> channelsToGo() const;
    long long waiting(std::string const& channel) const;
    long long uncertain(std::string const& channel) const;
    /// Those that the other side of a channel has, or may have, and that changed since. Costs what all
    /// letters cost: for the start.
    std::vector<StoredLetter> withOtherSide(std::string const& channel, long long since) const;
    /// The channels by whose carriers letters of a job go.
    std::set<std::string> channelsByCarrier(std::string const& packId) const;
    LetterCounts counts(std::string const& packId) const;
    /// Whether any letter of a job waits, or is being handed over.
    bool isUnderWay(std::string const& packId) const;
    /// The first of a job in that state.
    std::optional<StoredLetter> firstIn(std::string const& packId, LetterState state) const;

    /// Notes that from here on the other side may have them. Throws Error, and has changed nothing, where
    /// another service may have handed one over.
    void beginHandingOver(std::vector<LetterId> const& letters, long long now);
    /// Takes hold of a channel, or holds it on; false while another service has it. Letters that a former
    /// holder may have handed over are uncertain from then on, which `says` tells why.
    bool holdChannel(std::string const& channel, std::string const& says, long long now);
    /// The channels with letters that may have been handed over and that nobody holds any more; of those that
    /// services share.
    std::vector<std::string> channelsLeft() const;
    /// Whether several services may hand letters over.
    bool isShared() const { return jobs_.isShared(); }

    /// Notes what became of them, of those alone that are so still.
    void finish(std::vector<LetterId> const& letters, LetterState state, std::string const& says,
                long long now, LettersAre are = LettersAre::Anywhere);
    /// Notes an attempt that failed, and when the next one is due.
    void postpone(std::vector<LetterId> const& letters, std::string const& says, long long due, long long now,
                  LettersAre are = LettersAre::Anywhere);
    /// Lets none of a job that waits for a channel go before that time.
    void holdBack(std::string const& packId, std::string const& channel, long long due);
    /// Has a letter wait for the carrier of another channel, where it is so still: the one that it goes by
    /// has failed, and of its other ways those are left.
    void fallBack(LetterId const& letter, std::string const& channel,
                  std::vector<Mailing::OtherWay> const& left, std::string const& says, long long now,
                  LettersAre are = LettersAre::Anywhere);
    /// Moves a letter that goes by a carrier to another state; false, and no change, unless it is in one of
    /// `from`. One that waits again is due at once and its attempts count anew.
    bool decide(LetterId const& letter, std::vector<LetterState> const& from, LetterState to,
                std::string const& says, long long now, Goes goes = Goes::AsBefore);

    /// Lets notices go that are held: that of a whole job, or those of its letters that are in its container.
    /// Those of a letter that goes by a carrier go when that has taken it.
    void releaseNoticeOfJob(std::string const& packId, long long now);
    void releaseNoticesOfContainer(std::string const& packId, long long now);

    /// Those that were being handed over when a process ended become uncertain.
    void doubt(std::string const& says, long long now);
    /// The same of all that go by carriers and have not been taken on, which is how many there are.
    long long doubtAll(std::string const& says, long long now);

    CarrierRecord carrier(std::string const& channel) const;
    void setCarrier(std::string const& channel, CarrierRecord const& record);

private:
    void addNotices(std::string const& packId, std::vector<Notice> const& notices, long long now);
    void releaseNoticesOf(LetterId const& letter, long long now);

    Database::Connection& database_;
    JobStore& jobs_;
};

} // namespace VlServiced

#pragma once
// Hands letters over to the carriers of their channels, each once, and keeps on record what became of them.

#include "programs/base/local_offset.h"
#include "programs/carriers/carrier.h"
#include "programs/carriers/mime_message.h"
#include "programs/vlserviced/jobs/carrier_pace.h"
#include "programs/vlserviced/jobs/division.h"
#include "programs/vlserviced/jobs/letter_parcel.h"
#include "programs/vlserviced/jobs/step.h"
#include "programs/vlserviced/settings/service_settings.h"
#include "programs/vlserviced/store/history.h"

#include <filesystem>
#include <functional>
#include <list>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace VlServiced {

/// What a runner of letters needs around it.
struct LetterSurroundings {
    using Work = std::function<void()>;

    /// Runs work of a channel's carrier away from the caller's thread, `atOnce` side by side.
    std::function<void(std::string const& channel, std::size_t atOnce, Work)> onCarrier;
    /// Runs the test of a carrier away from the caller's thread.
    std::function<void(Work)> onTest;
    /// Runs work on the runner's own thread; may be called from any.
    std::function<void(Work)> onOwnThread;
    /// Seconds since the epoch.
    std::function<long long()> now;
    /// The service's settings as they are at that moment.
    std::function<ServiceSettings()> settings;
    std::filesystem::path outbox;
    /// The clock of the place that carriers' hours are meant for.
    Policy::UtcOffset offset = &Base::localOffset;
    std::function<std::unique_ptr<Carriers::Carrier>(Protocol::CarrierSettings const&)> makeCarrier =
        [](Protocol::CarrierSettings const& carrier) { return Carriers::makeCarrier(carrier); };
    /// Told when the last of a job's letters was taken on, with the pack id.
    std::function<void(std::string const& packId)> taken = [](std::string const&) {};
    /// Told whenever nextTime() may be another.
    std::function<void()> proceeded = [] {};
    /// Runs work on the runner's own thread and returns when it is done, with what it throws; called from the
    /// threads of carriers.
    std::function<void(Work const&)> doneOnOwnThread = [](Work const& work) { work(); };
    /// Where is noted what people decide.
    Recorder recorder = {};
    /// Work, away from the own thread, that has a mailing's container in the outbox: another machine may have
    /// made it.
    std::function<Work(std::string const& packId)> container = [](std::string const&) { return [] {}; };
    StepTook took = [](Step, std::chrono::duration<double>) {};
    /// Told what became of letters that were handed over, or were to be.
    std::function<void(std::string const& channel, LetterState state, std::size_t letters)> became =
        [](std::string const&, LetterState, std::size_t) {};
    /// Raised when carriers are to give up what hangs.
    Carriers::StopSign stop = {};
};

/// Used by one thread; the work it hands to carriers touches nothing of it.
class LetterRunner {
public:
    /// All have to outlive the runner, and the runner has to outlive the work on its own thread.
    LetterRunner(LetterStore& letters, JobStore& jobs, LetterSurroundings surroundings);

    LetterStore const& store() const { return letters_; }
    /// How many letters are in the hands of carriers.
    std::size_t inHand() const;

    /// Takes up what an earlier process left.
    void resume();
    /// Hands over what may be handed over by now.
    void proceed();
    /// Holds the channels on that it has, and takes up those that a service has left which is gone; to be
    /// called a few times in the time of the jobs' holder.
    void keepHold();
    /// When something could be handed over that cannot by now; nothing when nothing waits for the clock.
    std::optional<long long> nextTime();

    /// Puts the letters of a queued job on record, and its notices.
    void record(JobKey const& job, Division const& division);
    /// Lets go what waited for that: to be called in the transaction that puts it on record.
    void noteContainerHandedOn(std::string const& packId);

    /// Throws Error when the letter is not one that this can be decided of.
    void decide(Protocol::LetterChange const& change);
    /// Notes what a server of e-mail reports of a letter, and gives the letter as it is then. Throws Error
    /// when it is not one that went by e-mail.
    StoredLetter note(LetterId const& id, Carriers::MailReport::Kind kind, std::string const& says);
    Protocol::CarriersAnswer list() const;
    void pause(std::string const& channel);
    void resume(std::string const& channel);
    /// `done` is called on the own thread, with what the other side offers and an empty text, or the other
    /// way round with what failed. Throws Error when the channel has no carrier.
    void test(std::string const& channel,
              std::function<void(std::string const& says, std::string const& failure)> done);

private:
    using CarrierPtr = std::shared_ptr<Carriers::Carrier>;

    /// What there is of a channel beside its record.
    struct Channel {
        Protocol::CarrierSettings settings;
        /// That are at no work, by these settings.
        std::vector<CarrierPtr> idle;
        std::size_t busy = 0;
        std::set<LetterId> inHand;
        MinuteRate rate;
        /// What the other side has, or may have, by the keys that it went under, and can be asked about.
        std::map<std::string, std::vector<LetterId>> askable;
        long long askAt = 0;
        bool isAsked = false;
    };

    /// Letters that are handed over together, or a notice, and what became of them.
    struct HandOver {
        std::string channel;
        std::string packId;
        std::vector<StoredLetter> letters;
        /// Where it is one.
        std::optional<Carriers::Notice> notice;
        Protocol::CarrierSettings settings;
        CarrierPtr carrier;
        LetterSurroundings::Work makeContainer;
        std::shared_ptr<LetterSource> source;
        std::string key;
        std::vector<BadLetter> bad;
        Carriers::Outcome outcome;
        /// Where its letters are, as far as others may change that.
        LettersAre are = LettersAre::Anywhere;
        /// Whether it was the carrier that failed, where the outcome says so.
        bool isCarriersFault = true;
        /// Whether nothing failed, and nobody has anything: the service ends.
        bool isGivenUp = false;

        std::vector<LetterId> ids() const;
        /// Takes them from the letters.
        void setBad(std::vector<BadLetter> const& found);
        /// What is to be handed over; throws std::exception where it cannot be made.
        using Give = std::function<Carriers::Outcome(Carriers::PutOnRecord const&)>;
        Give prepared();
    };

    bool hold(std::string const& name);
    void takeUpLeft();
    Channel& channelOf(std::string const& name, Protocol::CarrierSettings const& settings);
    void proceedAll();
    void proceed(std::string const& name, Channel& channel);
    /// When the channel's carrier may be given something, as far as the clock goes.
    long long freeAt(std::string const& name, Channel& channel) const;
    /// The first that is due by then and in nobody's hands.
    std::optional<StoredLetter> firstToGo(std::string const& name, Channel const& channel,
                                          long long by) const;
    std::vector<StoredLetter> next(std::string const& name, Channel const& channel) const;
    void start(std::string const& name, Channel& channel, std::vector<StoredLetter> letters);
    std::optional<Carriers::Notice> noticeIn(StoredLetter const& letter) const;
    static void carryOut(HandOver& handOver, bool isShared, Carriers::PutOnRecord const& mayHaveThem);
    CarrierPtr idleOrNew(Channel& channel) const;
    void onDone(std::shared_ptr<HandOver> const& handOver);
    /// What cannot be put on record is kept and tried again.
    void settle(std::shared_ptr<HandOver> const& handOver);
    void recordOutcome(HandOver const& handOver);
    /// Notes it on record, and tells of it.
    void finish(std::string const& channel, std::vector<LetterId> const& letters, LetterState state,
                std::string const& says, LettersAre are = LettersAre::Anywhere);
    void postpone(HandOver const& handOver);
    /// Has a letter go by the next channel that it can go by, or notes that it has failed.
    void fail(HandOver const& handOver, StoredLetter const& letter, std::string const& says);
    void noteCarrier(HandOver const& handOver);
    static std::string keyOf(StoredLetter const& letter, std::string const& channel,
                             Protocol::CarrierSettings const& settings);
    void recallAskable();
    void ask(std::string const& name, Channel& channel);
    void onAsked(std::string const& name, std::map<std::string, Carriers::Progress> const& progress);
    /// False when no more is to be asked of the letter.
    bool note(Channel const& channel, LetterId const& id, Carriers::Progress const& progress);
    void noteState(StoredLetter const& letter, LetterState state, std::string const& says);
    void settleJobs();
    void settleJob(std::string const& packId);
    bool isDelivering(std::string const& packId) const;
    bool isHandedOver(std::string const& packId) const;
    bool hasPages(std::string const& packId) const;
    void noteInHistory(StoredLetter const& letter, LetterState to);
    bool goesWithOthers(StoredLetter const& letter) const;
    bool recordDecision(Protocol::LetterChange const& change, StoredLetter const& letter);
    void recordCarrier(std::string const& channel, CarrierRecord const& record);
    std::string problemOf(std::string const& packId, LetterCounts const& counts) const;
    std::shared_ptr<LetterSource> sourceOf(std::string const& packId);
    Protocol::CarrierSettings settingsOf(std::string const& channel) const;

    LetterStore& letters_;
    JobStore& jobs_;
    LetterSurroundings surroundings_;
    std::map<std::string, Channel> channels_;
    /// Those that this service has.
    std::set<std::string> held_;
    /// Of mailings that letters were taken from last, the latest first.
    std::list<std::shared_ptr<LetterSource>> sources_;
    /// Jobs whose state may have to follow from their letters'.
    std::set<std::string> unsettled_;
    /// What the database could not take.
    std::vector<std::shared_ptr<HandOver>> unrecorded_;
};

} // namespace VlServiced

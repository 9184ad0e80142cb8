#include "programs/vlserviced/jobs/letter_runner.h"

#include "programs/base/error.h"
#include "programs/base/plain_text.h"
#include "programs/vlserviced/jobs/notices.h"
#include "vlservice/platform/log.h"

#include <algorithm>
#include <limits>
#include <utility>

namespace VlServiced {
namespace {

using Carriers::Outcome;
using Protocol::CarrierUnit;
using Protocol::JobState;

/// So many failures in a row, and a carrier is tried now and then alone.
constexpr long long MANY_FAILURES = 10;
constexpr long long SECONDS_BETWEEN_TRIES = 15 * 60;
constexpr long long SECONDS_BETWEEN_QUESTIONS = 15;
/// Containers that are kept open.
constexpr std::size_t MAX_SOURCES = 4;

constexpr char const* ENDED_MEANWHILE = "the service was ended while it was handed over";

bool isFailing(CarrierRecord const& record) { return record.failures >= MANY_FAILURES; }

/// Whether it is handed over without others of its mailing. Those that fell back come behind the others,
/// whose file stays as it is.
bool isAlone(StoredLetter const& letter, Protocol::CarrierSettings const& settings) {
    return settings.unitOfFiles() == CarrierUnit::Letter || letter.id.isNotice() || !letter.tried.empty();
}

std::string lettersInWords(long long count) {
    return std::to_string(count) + (count == 1 ? " letter" : " letters");
}

std::string nameOf(LetterId const& id) {
    return (id.isNotice() ? "notice " + std::to_string(-id.number) : "letter " + std::to_string(id.number)) +
           " of mailing " + Base::oneLine(id.packId);
}

LetterState stateBehind(Outcome::Kind kind) {
    switch (kind) {
    case Outcome::Kind::Accepted:
        return LetterState::Accepted;
    case Outcome::Kind::Refused:
        return LetterState::Failed;
    case Outcome::Kind::Failed:
        return LetterState::Waiting;
    case Outcome::Kind::Uncertain:
        break;
    }
    return LetterState::Uncertain;
}

/// Of a letter that the other side has accepted.
LetterState stateBehind(Carriers::Progress::Kind kind) {
    using Kind = Carriers::Progress::Kind;
    if (kind == Kind::UnderWay)
        return LetterState::Accepted;
    return kind == Kind::Delivered ? LetterState::Delivered : LetterState::Failed;
}

LetterState stateBehind(Carriers::MailReport::Kind kind) {
    switch (kind) {
    case Carriers::MailReport::Kind::Delivered:
        return LetterState::Delivered;
    case Carriers::MailReport::Kind::Returned:
        return LetterState::Returned;
    case Carriers::MailReport::Kind::UnderWay:
        break;
    }
    return LetterState::Accepted;
}

/// "working", "paused", "failing".
char const* stateOf(CarrierRecord const& record) {
    if (record.isPaused)
        return "paused";
    return isFailing(record) ? "failing" : "working";
}

} // namespace

std::vector<LetterId> LetterRunner::HandOver::ids() const {
    std::vector<LetterId> ids;
    for (StoredLetter const& letter : letters)
        ids.push_back(letter.id);
    return ids;
}

void LetterRunner::HandOver::setBad(std::vector<BadLetter> const& found) {
    bad = found;
    for (BadLetter const& one : bad)
        std::erase_if(letters, [&](StoredLetter const& letter) { return letter.id == one.id; });
}

LetterRunner::HandOver::Give LetterRunner::HandOver::prepared() {
    if (notice)
        return [this](Carriers::PutOnRecord const& mayHaveIt) { return carrier->send(*notice, mayHaveIt); };
    makeContainer();
    auto const made = std::make_shared<MadeParcel>(source->parcelOf(
        letters, key,
        settings.sendsFiles() ? LetterSource::Attachments::Apart : LetterSource::Attachments::Printed));
    setBad(made->bad);
    return [this, made](Carriers::PutOnRecord const& mayHaveThem) {
        return made->parcel.letters.empty() ? Outcome() : carrier->handOver(made->parcel, mayHaveThem);
    };
}

LetterRunner::LetterRunner(LetterStore& letters, JobStore& jobs, LetterSurroundings surroundings)
    : letters_(letters), jobs_(jobs), surroundings_(std::move(surroundings)) {}

LetterRunner::Channel& LetterRunner::channelOf(std::string const& name,
                                               Protocol::CarrierSettings const& settings) {
    Channel& channel = channels_[name];
    if (!(channel.settings == settings))
        channel.idle.clear();
    channel.settings = settings;
    return channel;
}

void LetterRunner::resume() {
    if (!letters_.isShared())
        letters_.doubt(ENDED_MEANWHILE, surroundings_.now());
    for (std::string const& packId : jobs_.delivering())
        unsettled_.insert(packId);
    recallAskable();
    proceed();
}

std::size_t LetterRunner::inHand() const {
    std::size_t letters = 0;
    for (auto const& [name, channel] : channels_)
        letters += channel.inHand.size();
    return letters;
}

/// One service has a channel at a time, so that its pace is that of one.
bool LetterRunner::hold(std::string const& name) {
    if (held_.contains(name))
        return true;
    if (!letters_.holdChannel(name, ENDED_MEANWHILE, surroundings_.now()))
        return false;
    held_.insert(name);
    for (std::string const& packId : jobs_.delivering())
        unsettled_.insert(packId);
    return true;
}

void LetterRunner::keepHold() {
    for (std::string const& name : std::exchange(held_, {})) {
        auto const channel = channels_.find(name);
        bool const isInUse = channel != channels_.end() && channel->second.busy > 0;
        if (isInUse || firstToGo(name, channels_[name], std::numeric_limits<long long>::max()))
            hold(name);
    }
    takeUpLeft();
}

/// Where no further letter waits for a channel, nobody would take hold of it and see what its former holder
/// has left.
void LetterRunner::takeUpLeft() {
    std::vector<std::string> const left = letters_.channelsLeft();
    for (std::string const& name : left)
        hold(name);
    if (!left.empty())
        proceed();
}

void LetterRunner::proceed() {
    proceedAll();
    surroundings_.proceeded();
}

void LetterRunner::proceedAll() {
    for (auto const& handOver : std::exchange(unrecorded_, {}))
        settle(handOver);
    settleJobs();
    ServiceSettings const settings = surroundings_.settings();
    if (settings.isSuspended(Suspended::Jobs))
        return;
    for (auto const& [name, carrier] : settings.carriers()) {
        ask(name, channelOf(name, carrier));
        proceed(name, channelOf(name, carrier));
    }
}

void LetterRunner::proceed(std::string const& name, Channel& channel) {
    CarrierRecord const record = letters_.carrier(name);
    std::size_t const most = isFailing(record) ? 1 : static_cast<std::size_t>(channel.settings.atOnce);
    while (!record.isPaused && channel.busy < most && freeAt(name, channel) <= surroundings_.now()) {
        std::vector<StoredLetter> letters = next(name, channel);
        if (letters.empty() || !hold(name))
            return;
        start(name, channel, std::move(letters));
    }
}

long long LetterRunner::freeAt(std::string const& name, Channel& channel) const {
    long long const now = surroundings_.now();
    CarrierRecord const record = letters_.carrier(name);
    return std::max({opensAt(channel.settings, {now, surroundings_.offset}),
                     channel.rate.freeAt(channel.settings, now), isFailing(record) ? record.tryAt : now});
}

std::optional<long long> LetterRunner::nextTime() {
    constexpr long long EVER = std::numeric_limits<long long>::max();
    std::optional<long long> next;
    ServiceSettings const service = surroundings_.settings();
    if (service.isSuspended(Suspended::Jobs))
        return next;
    for (auto const& [name, settings] : service.carriers()) {
        Channel& channel = channelOf(name, settings);
        if (!channel.askable.empty() && !channel.isAsked)
            next = std::min(next.value_or(EVER), channel.askAt);
        // Whoever comes back from its work goes on with the next.
        if (letters_.carrier(name).isPaused || channel.busy >= static_cast<std::size_t>(settings.atOnce))
            continue;
        if (auto const letter = firstToGo(name, channel, EVER)) {
            long long const at = std::max(letter->due, freeAt(name, channel));
            next = std::min(next.value_or(EVER), at);
        }
    }
    return next;
}

std::optional<StoredLetter> LetterRunner::firstToGo(std::string const& name, Channel const& channel,
                                                    long long by) const {
    for (StoredLetter const& letter : letters_.toGo(name, by, channel.inHand.size() + 1))
        if (!channel.inHand.contains(letter.id))
            return letter;
    return std::nullopt;
}

std::vector<StoredLetter> LetterRunner::next(std::string const& name, Channel const& channel) const {
    long long const now = surroundings_.now();
    std::optional<StoredLetter> const first = firstToGo(name, channel, now);
    if (!first)
        return {};
    if (isAlone(*first, channel.settings))
        return {*first};
    std::vector<StoredLetter> together = letters_.toGoTogether(first->id.packId, name, now);
    std::erase_if(together, [&](StoredLetter const& one) { return channel.inHand.contains(one.id); });
    return together;
}

LetterRunner::CarrierPtr LetterRunner::idleOrNew(Channel& channel) const {
    if (channel.idle.empty())
        return surroundings_.makeCarrier(channel.settings);
    CarrierPtr carrier = channel.idle.back();
    channel.idle.pop_back();
    return carrier;
}

void LetterRunner::start(std::string const& name, Channel& channel, std::vector<StoredLetter> letters) {
    auto const handOver = std::make_shared<HandOver>();
    handOver->channel = name;
    handOver->settings = channel.settings;
    handOver->key = keyOf(letters.front(), name, channel.settings);
    handOver->packId = letters.front().id.packId;
    handOver->notice = noticeIn(letters.front());
    if (!handOver->notice) {
        handOver->source = sourceOf(handOver->packId);
        handOver->makeContainer = surroundings_.container(handOver->packId);
    }
    handOver->letters = std::move(letters);
    handOver->carrier = idleOrNew(channel);
    for (StoredLetter const& letter : handOver->letters)
        channel.inHand.insert(letter.id);
    ++channel.busy;
    channel.rate.add(surroundings_.now());
    surroundings_.onCarrier(
        name, static_cast<std::size_t>(channel.settings.atOnce),
        [this, handOver, isShared = letters_.isShared(), onOwnThread = surroundings_.onOwnThread,
         doneOnOwnThread = surroundings_.doneOnOwnThread, took = surroundings_.took,
         stop = surroundings_.stop] {
            // Whoever finds them so on record cannot know whether the other side has them.
            {
                StepTime const time(took, Step::HandingOver);
                carryOut(*handOver, isShared, [&] {
                    doneOnOwnThread([&] { letters_.beginHandingOver(handOver->ids(), surroundings_.now()); });
                });
                handOver->isGivenUp = handOver->outcome.kind == Outcome::Kind::Failed && stop.isRaised();
            }
            onOwnThread([this, handOver] { onDone(handOver); });
        });
}

std::optional<Carriers::Notice> LetterRunner::noticeIn(StoredLetter const& letter) const {
    if (!letter.id.isNotice())
        return std::nullopt;
    return written(letter, jobs_.find(letter.id.packId).value(), letters_);
}

/// Where other services may hand over the same letters, whatever the carrier does comes behind the record.
void LetterRunner::carryOut(HandOver& handOver, bool isShared, Carriers::PutOnRecord const& mayHaveThem) {
    handOver.isCarriersFault = false;
    try {
        handOver.are = isShared ? LettersAre::Waiting : LettersAre::Anywhere;
        HandOver::Give const give = handOver.prepared();
        if (isShared) {
            mayHaveThem();
            handOver.are = LettersAre::HandedOver;
        }
        handOver.isCarriersFault = true;
        handOver.outcome = give(isShared ? [] {} : mayHaveThem);
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const& failure) {
        handOver.outcome = {Outcome::Kind::Failed, failure.what()};
    }
    handOver.outcome.says = Base::oneLine(handOver.outcome.says);
}

void LetterRunner::onDone(std::shared_ptr<HandOver> const& handOver) {
    Channel& channel = channels_.at(handOver->channel);
    --channel.busy;
    if (channel.settings == handOver->settings)
        channel.idle.push_back(std::move(handOver->carrier));
    settle(handOver);
    proceed();
}

void LetterRunner::settle(std::shared_ptr<HandOver> const& handOver) {
    try {
        recordOutcome(*handOver);
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const& failure) {
        // They stay in hand, so that nobody has them twice.
        Log::Lock(3).logStreamLine() << "What became of " << handOver->key << " cannot be recorded. "
                                     << Base::oneLine(failure.what());
        unrecorded_.push_back(handOver);
        return;
    }
    Channel& channel = channels_.at(handOver->channel);
    for (LetterId const& id : handOver->ids())
        channel.inHand.erase(id);
    for (BadLetter const& bad : handOver->bad)
        channel.inHand.erase(bad.id);
    // What becomes of a notice changes nothing of its mailing.
    if (!handOver->notice)
        unsettled_.insert(handOver->packId);
}

void LetterRunner::recordOutcome(HandOver const& handOver) {
    for (BadLetter const& bad : handOver.bad)
        finish(handOver.channel, {bad.id}, LetterState::Failed, Base::oneLine(bad.why),
               letters_.isShared() ? LettersAre::Waiting : LettersAre::Anywhere);
    if (handOver.letters.empty())
        return;
    if (handOver.isGivenUp)
        return letters_.finish(handOver.ids(), LetterState::Waiting, {}, surroundings_.now(), handOver.are);
    noteCarrier(handOver);
    Outcome const& outcome = handOver.outcome;
    if (outcome.kind == Outcome::Kind::Failed)
        return postpone(handOver);
    if (outcome.kind == Outcome::Kind::Refused) {
        jobs_.together([&] {
            for (StoredLetter const& letter : handOver.letters)
                fail(handOver, letter, outcome.says);
        });
        return;
    }
    finish(handOver.channel, handOver.ids(), stateBehind(outcome.kind), outcome.says, handOver.are);
    if (!handOver.settings.canBeAsked())
        return;
    Channel& channel = channels_.at(handOver.channel);
    if (channel.askable.empty())
        channel.askAt = surroundings_.now();
    channel.askable[handOver.key] = handOver.ids();
}

void LetterRunner::finish(std::string const& channel, std::vector<LetterId> const& letters, LetterState state,
                          std::string const& says, LettersAre are) {
    letters_.finish(letters, state, says, surroundings_.now(), are);
    auto const count = std::ranges::count_if(letters, [](LetterId const& id) { return !id.isNotice(); });
    surroundings_.became(channel, state, static_cast<std::size_t>(count));
}

void LetterRunner::postpone(HandOver const& handOver) {
    long long const now = surroundings_.now();
    std::string const& says = handOver.outcome.says;
    for (StoredLetter const& letter : handOver.letters) {
        if (isGivenUp(letter.firstTry, now, handOver.settings))
            fail(handOver, letter,
                 "given up after " + std::to_string(handOver.settings.giveUpHours) + " hours: " + says);
        else
            letters_.postpone({letter.id}, says, now + pauseBehind(letter.attempts + 1, handOver.settings),
                              now, handOver.are);
    }
    StoredLetter const& first = handOver.letters.front();
    if (handOver.settings.keepsOrder())
        letters_.holdBack(first.id.packId, handOver.channel,
                          now + pauseBehind(first.attempts + 1, handOver.settings));
}

void LetterRunner::fail(HandOver const& handOver, StoredLetter const& letter, std::string const& says) {
    Protocol::Carriers const carriers = surroundings_.settings().carriers();
    std::vector<Mailing::OtherWay> left = letter.otherWays;
    std::string why = says;
    while (!left.empty()) {
        Mailing::OtherWay const next = left.front();
        left.erase(left.begin());
        if (next.hasAddress && carriers.contains(next.channel)) {
            letters_.fallBack(letter.id, next.channel, left, Base::oneLine(handOver.channel + ": " + why),
                              surroundings_.now(), handOver.are);
            return surroundings_.became(handOver.channel, LetterState::Failed, 1);
        }
        why += next.hasAddress ? "; there is no carrier of " + next.channel
                               : "; the letter has no address " + next.channel;
    }
    finish(handOver.channel, {letter.id}, LetterState::Failed, Base::oneLine(why), handOver.are);
}

std::string LetterRunner::keyOf(StoredLetter const& letter, std::string const& channel,
                                Protocol::CarrierSettings const& settings) {
    return isAlone(letter, settings) ? letter.id.key() : letter.id.packId + '-' + channel;
}

/// What is on record of an earlier process; a printer forgets jobs sooner than that.
void LetterRunner::recallAskable() {
    for (auto const& [name, settings] : surroundings_.settings().carriers()) {
        if (!settings.canBeAsked())
            continue;
        long long const since = surroundings_.now() - settings.giveUpHours * 3600;
        for (StoredLetter const& letter : letters_.withOtherSide(name, since))
            channelOf(name, settings).askable[keyOf(letter, name, settings)].push_back(letter.id);
    }
}

void LetterRunner::ask(std::string const& name, Channel& channel) {
    if (channel.askable.empty() || channel.isAsked || channel.askAt > surroundings_.now())
        return;
    channel.isAsked = true;
    std::set<std::string> keys;
    for (auto const& [key, letters] : channel.askable)
        keys.insert(key);
    CarrierPtr const carrier = surroundings_.makeCarrier(channel.settings);
    surroundings_.onCarrier(name, static_cast<std::size_t>(channel.settings.atOnce),
                            [this, name, keys, carrier, onOwnThread = surroundings_.onOwnThread] {
                                std::map<std::string, Carriers::Progress> progress;
                                try {
                                    progress = carrier->ask(keys);
                                } catch (Base::Error const&) {
                                    // It is asked again; what hands letters over says what fails.
                                    progress.clear();
                                }
                                onOwnThread([this, name, progress] { onAsked(name, progress); });
                            });
}

void LetterRunner::onAsked(std::string const& name,
                           std::map<std::string, Carriers::Progress> const& progress) {
    Channel& channel = channels_.at(name);
    channel.isAsked = false;
    channel.askAt = surroundings_.now() + SECONDS_BETWEEN_QUESTIONS;
    for (auto const& [key, told] : progress)
        if (auto const found = channel.askable.find(key); found != channel.askable.end()) {
            std::erase_if(found->second,
                          [&, &said = told](LetterId const& id) { return !note(channel, id, said); });
            if (found->second.empty())
                channel.askable.erase(found);
        }
    proceed();
}

bool LetterRunner::note(Channel const& channel, LetterId const& id, Carriers::Progress const& progress) {
    std::optional<StoredLetter> const letter = letters_.find(id);
    bool const isUncertain = letter && letter->state == LetterState::Uncertain;
    if (!isUncertain && (!letter || letter->state != LetterState::Accepted))
        return false;
    std::string const says = Base::oneLine(progress.says);
    bool const isLost = progress.kind == Carriers::Progress::Kind::Lost;
    if (isUncertain && isLost)
        letters_.postpone({id}, says,
                          surroundings_.now() + pauseBehind(letter->attempts + 1, channel.settings),
                          surroundings_.now());
    else if (isUncertain)
        // Of what may not have arrived whole, only a person knows what was printed.
        noteState(*letter, LetterState::Uncertain, Base::oneLine("it may not have arrived whole: " + says));
    else
        noteState(*letter, stateBehind(progress.kind), says);
    unsettled_.insert(id.packId);
    return progress.kind == Carriers::Progress::Kind::UnderWay;
}

void LetterRunner::noteState(StoredLetter const& letter, LetterState state, std::string const& says) {
    if (state != letter.state || says != letter.says)
        finish(letter.channel, {letter.id}, state, says);
}

void LetterRunner::noteCarrier(HandOver const& handOver) {
    CarrierRecord record = letters_.carrier(handOver.channel);
    bool const wasFailing = isFailing(record);
    bool const fails = handOver.outcome.kind == Outcome::Kind::Failed;
    if (fails ? !handOver.isCarriersFault : record.failures == 0)
        return;
    long long const now = surroundings_.now();
    record.failures = fails ? record.failures + 1 : 0;
    record.says = fails ? handOver.outcome.says : std::string();
    record.tryAt = now + SECONDS_BETWEEN_TRIES;
    if (wasFailing != isFailing(record)) {
        record.since = now;
        // Its words may tell of a recipient.
        Log::Lock(4).logStreamLine() << "The carrier of " << handOver.channel
                                     << (fails ? " fails and is tried every 15 minutes: \"vlmail carriers "
                                                 "list\" says why"
                                               : " works again");
    }
    letters_.setCarrier(handOver.channel, record);
}

void LetterRunner::record(JobKey const& job, Division const& division) {
    letters_.divide(job, division.letters, surroundings_.now(), division.notices);
    proceed();
}

void LetterRunner::noteContainerHandedOn(std::string const& packId) {
    letters_.releaseNoticesOfContainer(packId, surroundings_.now());
    if (isHandedOver(packId))
        letters_.releaseNoticeOfJob(packId, surroundings_.now());
}

void LetterRunner::settleJobs() {
    while (!unsettled_.empty()) {
        settleJob(*unsettled_.begin());
        unsettled_.erase(unsettled_.begin());
    }
}

void LetterRunner::settleJob(std::string const& packId) {
    bool const isUnderWay = letters_.isUnderWay(packId);
    LetterCounts const counts = isUnderWay ? LetterCounts() : letters_.counts(packId);
    auto const has = [&](LetterState state) { return counts.contains(state); };
    JobState state = JobState::Lodged;
    if (isUnderWay || has(LetterState::Uncertain))
        state = JobState::Delivering;
    else if (has(LetterState::Failed) || has(LetterState::Returned))
        state = JobState::Failed;
    else if (!has(LetterState::Accepted))
        state = JobState::Delivered;
    if (isUnderWay && isDelivering(packId))
        return;
    jobs_.together([&] {
        jobs_.setLettersState(packId, state, problemOf(packId, counts), surroundings_.now());
        if (isHandedOver(packId))
            letters_.releaseNoticeOfJob(packId, surroundings_.now());
    });
    if (state == JobState::Lodged || state == JobState::Delivered) {
        sources_.remove_if([&](auto const& source) { return source->packId() == packId; });
        surroundings_.taken(packId);
    }
}

bool LetterRunner::isDelivering(std::string const& packId) const {
    std::optional<Job> const job = jobs_.find(packId);
    return job && job->lettersState.value_or(job->state) == JobState::Delivering;
}

/// No letter is on its way to its carrier, nor the container to its folder. Letters that are uncertain were
/// handed over, as far as the service can tell.
bool LetterRunner::isHandedOver(std::string const& packId) const {
    std::optional<Job> const job = jobs_.find(packId);
    bool const isContainerOnItsWay =
        !job || job->state == JobState::Queued || job->state == JobState::Submitting;
    return !isContainerOnItsWay && !letters_.isUnderWay(packId);
}

std::string LetterRunner::problemOf(std::string const& packId, LetterCounts const& counts) const {
    std::string problem;
    for (LetterState const state : {LetterState::Uncertain, LetterState::Failed, LetterState::Returned}) {
        auto const count = counts.find(state);
        if (count == counts.end())
            continue;
        StoredLetter const first = letters_.firstIn(packId, state).value();
        problem += (problem.empty() ? "" : "; ") + lettersInWords(count->second) + ' ' +
                   Protocol::letterStateName(state) + ", letter " + std::to_string(first.id.number) + ": " +
                   first.says;
    }
    return Base::oneLine(problem);
}

std::shared_ptr<LetterSource> LetterRunner::sourceOf(std::string const& packId) {
    auto const found =
        std::ranges::find_if(sources_, [&](auto const& source) { return source->packId() == packId; });
    if (found != sources_.end()) {
        sources_.splice(sources_.begin(), sources_, found);
        return sources_.front();
    }
    sources_.push_front(std::make_shared<LetterSource>(surroundings_.outbox, packId));
    if (sources_.size() > MAX_SOURCES)
        sources_.pop_back();
    return sources_.front();
}

void LetterRunner::decide(Protocol::LetterChange const& change) {
    LetterId const id{change.id, change.notice > 0 ? -change.notice : change.letter};
    std::string const name = nameOf(id);
    std::optional<StoredLetter> const letter = letters_.find(id);
    if (!letter)
        throw Base::Error(Base::Code::LetterUnknown, "there is no " + name);
    if (!letter->byCarrier)
        throw Base::Error(Base::Code::StateRefused, name + " goes in the mailing's container");
    bool const isResent = change.action == Protocol::LetterAction::Resend;
    if (isResent && !id.isNotice() && !hasPages(id.packId))
        throw Base::Error(Base::Code::MailingDamaged,
                          "the pages of " + name +
                              (letters_.isShared()
                                   ? " are not here: ask the service that has had it, or mail it anew"
                                   : " are gone: mail it anew"));
    if (!recordDecision(change, *letter))
        throw Base::Error(Base::Code::StateRefused,
                          name + " is " + Protocol::letterStateName(letter->state) + ": " +
                              (isResent ? "only one that is uncertain, failed or returned is sent again"
                                        : "only one that is uncertain can be settled"));
    if (!id.isNotice())
        unsettled_.insert(id.packId);
    proceed();
}

/// The container may be made again as long as the pages are kept that it was made from.
bool LetterRunner::hasPages(std::string const& packId) const {
    if (std::filesystem::exists(LetterSource::container(surroundings_.outbox, packId)))
        return true;
    std::optional<Job> const job = jobs_.find(packId);
    return job && job->pack.isWithService() && !isDoneWithPages(*job);
}

void LetterRunner::noteInHistory(StoredLetter const& letter, LetterState to) {
    std::optional<Job> const job = jobs_.find(letter.id.packId);
    if (job)
        surroundings_.recorder.note(job->cfgId, nameOf(letter.id), Protocol::letterStateName(letter.state),
                                    Protocol::letterStateName(to));
}

/// Whether one file holds it and others of its mailing: what is sent again must not take its place.
bool LetterRunner::goesWithOthers(StoredLetter const& letter) const {
    Protocol::Carriers const carriers = surroundings_.settings().carriers();
    auto const found = carriers.find(letter.channel);
    return found != carriers.end() && !isAlone(letter, found->second);
}

bool LetterRunner::recordDecision(Protocol::LetterChange const& change, StoredLetter const& letter) {
    using Protocol::LetterAction;
    bool const isResent = change.action == LetterAction::Resend;
    LetterState const delivered =
        change.action == LetterAction::SettleDelivered ? LetterState::Delivered : LetterState::Failed;
    LetterState const to = isResent ? LetterState::Waiting : delivered;
    bool isDecided = false;
    surroundings_.recorder.together([&] {
        isDecided =
            isResent ? letters_.decide(letter.id,
                                       {LetterState::Uncertain, LetterState::Failed, LetterState::Returned},
                                       to, "a person has it sent again", surroundings_.now(),
                                       goesWithOthers(letter) ? Goes::Alone : Goes::AsBefore)
                     : letters_.decide(letter.id, {LetterState::Uncertain}, to, "a person says so",
                                       surroundings_.now());
        if (isDecided)
            noteInHistory(letter, to);
    });
    return isDecided;
}

void LetterRunner::recordCarrier(std::string const& channel, CarrierRecord const& record) {
    auto const inHistory = [](CarrierRecord const& one) { return one.isPaused ? "paused" : "not paused"; };
    surroundings_.recorder.together([&] {
        surroundings_.recorder.note({}, "carrier " + channel, inHistory(letters_.carrier(channel)),
                                    inHistory(record));
        letters_.setCarrier(channel, record);
    });
}

StoredLetter LetterRunner::note(LetterId const& id, Carriers::MailReport::Kind kind,
                                std::string const& says) {
    using Kind = Carriers::MailReport::Kind;
    std::string const name = nameOf(id);
    std::optional<StoredLetter> const letter = letters_.find(id);
    if (!letter)
        throw Base::Error(Base::Code::LetterUnknown, "there is no " + name);
    if (settingsOf(letter->channel).type != Protocol::CarrierType::Smtp)
        throw Base::Error(Base::Code::StateRefused, name + " does not go by e-mail");
    std::vector<LetterState> from{LetterState::Accepted, LetterState::Uncertain};
    if (kind != Kind::UnderWay)
        from.push_back(LetterState::Delivered);
    if (kind == Kind::Returned)
        from.push_back(LetterState::Returned);
    bool isNoted = false;
    surroundings_.recorder.together([&] {
        isNoted = letters_.decide(id, from, stateBehind(kind), Base::oneLine(says), surroundings_.now());
        if (isNoted)
            noteInHistory(*letter, stateBehind(kind));
    });
    if (!isNoted)
        throw Base::Error(Base::Code::StateRefused, name + " is " + Protocol::letterStateName(letter->state) +
                                                        ", which the report does not go with");
    surroundings_.became(letter->channel, stateBehind(kind), id.isNotice() ? 0 : 1);
    if (!id.isNotice())
        unsettled_.insert(id.packId);
    proceed();
    return letters_.find(id).value();
}

Protocol::CarriersAnswer LetterRunner::list() const {
    Protocol::Carriers const carriers = surroundings_.settings().carriers();
    std::set<std::string> channels;
    for (auto const& [channel, settings] : carriers)
        channels.insert(channel);
    for (std::string const& channel : letters_.channelsToGo())
        channels.insert(channel);
    Protocol::CarriersAnswer answer;
    for (std::string const& channel : channels) {
        Protocol::CarrierReport& report = answer.carriers.emplace_back();
        CarrierRecord const record = letters_.carrier(channel);
        auto const settings = carriers.find(channel);
        bool const isThere = settings != carriers.end();
        report.channel = channel;
        report.type = isThere ? carrierTypeName(settings->second.type) : "";
        report.state = isThere ? stateOf(record) : "missing";
        report.says = isThere ? record.says : "letters wait for a carrier: set one, or cancel them";
        report.since = record.since;
        report.waiting = letters_.waiting(channel);
        report.uncertain = letters_.uncertain(channel);
    }
    return answer;
}

void LetterRunner::pause(std::string const& channel) {
    settingsOf(channel);
    CarrierRecord record = letters_.carrier(channel);
    if (!std::exchange(record.isPaused, true))
        record.since = surroundings_.now();
    recordCarrier(channel, record);
}

void LetterRunner::resume(std::string const& channel) {
    settingsOf(channel);
    CarrierRecord record = letters_.carrier(channel);
    if (record.isPaused || isFailing(record))
        record = {false, 0, {}, surroundings_.now(), 0};
    recordCarrier(channel, record);
    proceed();
}

void LetterRunner::test(std::string const& channel,
                        std::function<void(std::string const& says, std::string const& failure)> done) {
    std::shared_ptr<Carriers::Carrier> const carrier = surroundings_.makeCarrier(settingsOf(channel));
    surroundings_.onTest([carrier, done = std::move(done), onOwnThread = surroundings_.onOwnThread] {
        std::string says;
        std::string failed;
        try {
            says = Base::oneLine(carrier->test());
        } catch (std::bad_alloc const&) {
            throw;
        } catch (std::exception const& failure) {
            failed = Base::oneLine(failure.what());
        }
        onOwnThread([done, says, failed] { done(says, failed); });
    });
}

Protocol::CarrierSettings LetterRunner::settingsOf(std::string const& channel) const {
    Protocol::Carriers const carriers = surroundings_.settings().carriers();
    auto const found = carriers.find(channel);
    if (found == carriers.end())
        throw Base::Error(Base::Code::CarrierUnknown,
                          "there is no carrier of " + Base::oneLine(channel) +
                              ": \"vlmail carriers list\" shows those that there are");
    return found->second;
}

} // namespace VlServiced

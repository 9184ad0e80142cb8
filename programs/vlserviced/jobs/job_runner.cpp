#include "programs/vlserviced/jobs/job_runner.h"

#include "programs/base/error.h"
#include "programs/base/plain_text.h"
#include "programs/base/safe_name.h"
#include "programs/mailing/pack_database.h"
#include "programs/vlserviced/jobs/container.h"
#include "programs/vlserviced/jobs/division.h"
#include "programs/vlserviced/jobs/hand_over.h"
#include "programs/vlserviced/jobs/letter_runner.h"
#include "vlservice/platform/local_time.h"
#include "vlservice/platform/log.h"

#include <algorithm>
#include <system_error>
#include <utility>

namespace VlServiced {
namespace {

namespace fs = std::filesystem;

using Protocol::JobAction;

/// That are held at once.
constexpr std::size_t AT_ONCE = 16;
/// How long something in the way of a job is left to itself.
constexpr long long RETRY_SECONDS = 60;

/// One spelling for a folder, so that jobs are found again by it.
std::string folderText(std::string const& folder) {
    std::string const normal = fs::path(folder).lexically_normal().string();
    return normal.size() > 1 && normal.back() == '/' ? normal.substr(0, normal.size() - 1) : normal;
}

PackLocation checkedLocation(PackLocation const& pack) {
    if (!Mailing::isPackId(pack.packId))
        throw Base::Error(Base::Code::MailingIdInvalid,
                          "the pack id \"" + pack.packId + "\" cannot name a file");
    if (pack.isWithService())
        return pack;
    if (!fs::path(pack.folder).is_absolute())
        throw Base::Error(
            Base::Code::SettingInvalid,
            "pages come over the connection or from a pack database below the folder of --local-packs: "
            "\"db_conn\" has to be the absolute path of a folder there, and \"" +
                pack.folder + "\" is none");
    if (Base::safeFileName(pack.database) != pack.database)
        throw Base::Error(Base::Code::SettingInvalid,
                          "\"db_name\" has to be the name of a file, and \"" + pack.database + "\" is none");
    return {folderText(pack.folder), pack.database, pack.packId};
}

/// A job that is there already: the pack is taken, or it cannot be.
void requireSamePack(Job const& known, PackLocation const& pack) {
    if (!(known.pack == pack))
        throw Base::Error(Base::Code::MailingExists,
                          "there is another pack " + pack.packId + ", from " +
                              (known.pack.isWithService() ? "a connection" : known.pack.file().string()));
    if (known.state == JobState::Failed)
        throw Base::Error(Base::Code::StateRefused,
                          "pack " + pack.packId + " was given up: " + known.problem);
    if (known.state == JobState::Cancelled)
        throw Base::Error(Base::Code::StateRefused,
                          "pack " + pack.packId + " was cancelled: mail its letters anew");
}

/// Whether the outbox is no place for the container any more that goes to the upload folder.
bool hasLeft(JobState state) {
    return state == JobState::Submitted || state == JobState::Lodged || state == JobState::Delivered ||
           state == JobState::Cancelled;
}

/// Whether the outbox is no place for the mailing any more.
bool hasLeftOutbox(Job const& job) {
    return hasLeft(job.state) && hasLeft(job.lettersState.value_or(job.state));
}

/// How far a job has got that it is too late for.
std::string whoHas(Job const& job) {
    if (job.lettersState)
        return "letters of it are going out by carriers";
    switch (job.state) {
    case JobState::Delivering:
        return "its letters are going out by carriers";
    case JobState::Lodged:
        return job.uploadFolder.empty()
                   ? "the carriers have its letters"
                   : "the carrier has taken it from the upload folder " + job.uploadFolder;
    case JobState::Submitting:
        return "it is being handed over to the upload folder " + job.uploadFolder;
    case JobState::Submitted:
        return "the upload folder " + job.uploadFolder + " has it since " + LocalTime::toText(job.changedAt);
    case JobState::Delivered:
        return "the carrier has delivered it";
    case JobState::Cancelled:
        return "it was cancelled";
    case JobState::Tried:
        return "it was a trial run, which hands nothing over";
    default:
        return "it was given up: " + job.problem;
    }
}

/// False when it is too late.
bool record(JobStore& jobs, JobAction action, std::string const& packId, long long now) {
    switch (action) {
    case JobAction::Hold:
        return jobs.hold(packId, now);
    case JobAction::Release:
        return jobs.release(packId, now);
    case JobAction::Upload:
        return jobs.wantUpload(packId);
    case JobAction::Cancel:
        break;
    }
    return jobs.cancel(packId, now);
}

std::string nameInHistory(Job const& job) { return "mailing " + job.pack.packId; }

std::string inHistory(Job const& job) {
    return std::string(stateName(job.state)) + (job.toHold ? ", to be held" : "") +
           (job.toUpload ? ", to be handed on" : "");
}

/// Whether a job that is past a change is as the change wants it.
bool isSoAlready(Job const& job, JobAction action) {
    if (action == JobAction::Upload)
        return job.state == JobState::Submitting || job.state == JobState::Submitted ||
               job.state == JobState::Lodged || job.state == JobState::Delivering ||
               job.state == JobState::Delivered || job.state == JobState::Tried;
    return action == JobAction::Cancel && job.state == JobState::Cancelled;
}

/// The state of a job whose container is made.
JobState stateBehindPacking(Job const& job, long long now) {
    if (job.isTrial)
        return JobState::Tried;
    return job.toHold || job.due > now ? JobState::Held : JobState::Queued;
}

} // namespace

std::unique_ptr<Mailing::PackSource> openPackDatabase(PackLocation const& pack) {
    return std::make_unique<Mailing::PackDatabaseReader>(pack.file(), pack.packId);
}

JobRunner::JobRunner(JobStore& jobs, JobSurroundings surroundings)
    : jobs_(jobs), surroundings_(std::move(surroundings)) {
    jobs_.freeOwn();
}

void JobRunner::resume() {
    sweepOutbox();
    jobs_.hurry();
    takeUp();
}

void JobRunner::takeUp() {
    // What is taken up may come to its end at once, and ask for more.
    if (isTakingUp_)
        return;
    isTakingUp_ = true;
    try {
        releaseDue();
        while (held_.size() < AT_ONCE && !surroundings_.settings().isSuspended(Suspended::Jobs)) {
            std::vector<Job> const jobs = jobs_.claim(AT_ONCE - held_.size());
            for (Job const& job : jobs)
                held_.emplace(job.pack.packId, job.fence);
            // What this service stood still with for too long comes to its end first.
            for (Job const& job : jobs)
                if (!busy_.contains(job.pack.packId))
                    goOn(job);
            if (jobs.empty())
                break;
        }
    } catch (...) {
        isTakingUp_ = false;
        // What nobody works on is free again when its time is over.
        std::erase_if(held_, [this](auto const& each) { return !busy_.contains(each.first); });
        throw;
    }
    isTakingUp_ = false;
}

void JobRunner::keepHold() {
    std::vector<std::string> packIds;
    for (auto const& [packId, fence] : held_)
        packIds.push_back(packId);
    jobs_.keep(packIds);
}

/// Of one that is not held nothing is changed: somebody else may have it.
JobKey JobRunner::held(std::string const& packId) const {
    constexpr long long NO_FENCE = -1;
    auto const found = held_.find(packId);
    return {packId, found == held_.end() ? NO_FENCE : found->second};
}

void JobRunner::releaseDue() {
    // Each is a transaction of its own, and others wait meanwhile.
    constexpr std::size_t RELEASED_AT_ONCE = 100;
    for (Job const& job : jobs_.due(surroundings_.now(), RELEASED_AT_ONCE))
        if (jobs_.advance(job.pack.packId, JobState::Held, JobState::Queued, surroundings_.now()))
            proceed(jobs_.find(job.pack.packId).value());
}

void JobRunner::accept(PackLocation const& pack, RequireNode const& mayBeOf,
                       std::function<void(std::string const& failure)> done) {
    auto const finish = [done = std::move(done)](std::function<void()> const& step) {
        Outcome const outcome = outcomeOf(step);
        done(outcome.why.empty() ? outcome.why : Base::codedLine(outcome.why, outcome.code));
    };
    PackLocation location;
    std::optional<Job> known;
    Outcome const checked = outcomeOf([&] {
        location = checkedLocation(pack);
        if ((known = jobs_.find(location.packId))) {
            mayBeOf(known->cfgId);
            requireSamePack(*known, location);
        }
    });
    if (checked.kind != Outcome::Kind::Done)
        return finish([&] { throw Base::Error(checked.code, checked.why); });
    if (known)
        return finish([&] { proceed(*known); });
    surroundings_.onReader([this, location, mayBeOf, finish, open = surroundings_.openPack,
                            onOwnThread = surroundings_.onOwnThread, who = surroundings_.recorder.who(),
                            took = surroundings_.took] {
        auto const summary = std::make_shared<PackSummary>();
        Outcome const read = outcomeOf([&] {
            StepTime const time(took, Step::Admission);
            *summary = summaryOf(*open(location));
        });
        onOwnThread([this, location, mayBeOf, finish, summary, read, who] {
            finish([&] {
                if (read.kind != Outcome::Kind::Done)
                    throw Base::Error(read.code, read.why);
                surroundings_.recorder.as(who, [&] { admit(location, *summary, mayBeOf); });
            });
        });
    });
}

void JobRunner::admit(PackLocation const& pack, PackSummary const& summary, RequireNode const& mayBeOf) {
    mayBeOf(summary.cfgId);
    // Somebody else may have sent it meanwhile.
    std::optional<Job> job = jobs_.find(pack.packId);
    if (job) {
        requireSamePack(*job, pack);
    } else {
        requireNotDisabled(pack.packId, summary.cfgId);
        Policy::Moment const moment{surroundings_.now(), surroundings_.offset};
        requireAllowed(
            pack.packId, summary, surroundings_.rules(summary.cfgId), moment,
            [&](std::string const& name) { return surroundings_.presetSource(summary.cfgId, name); });
        job = jobFor(pack, summary, moment);
        enter(*job, summary);
        surroundings_.usedPreset(summary.cfgId, summary.packPreset.name());
    }
    proceed(*job);
}

/// The job with its letters, or nothing of it.
void JobRunner::enter(Job const& job, PackSummary const& summary) {
    try {
        jobs_.together([&] {
            if (!jobs_.accept(job))
                return;
            if (surroundings_.letterRegister)
                enterLetters(*surroundings_.letterRegister, job, summary);
            surroundings_.recorder.note(job.cfgId, nameInHistory(job), "",
                                        inHistory(job) + (summary.again.empty() ? "" : ", again: ") +
                                            summary.again);
        });
    } catch (SentBefore const& refused) {
        surroundings_.refusedLetters(job.pack.packId, refused.letters());
        throw;
    }
}

void JobRunner::requireNotDisabled(std::string const& packId, std::string const& cfgId) const {
    if (surroundings_.settings().isDisabled(cfgId))
        throw Base::Error(Base::Code::NodeDisabled,
                          "node " + cfgId + " is disabled: pack " + packId + " is not taken");
}

void JobRunner::proceed(Job const& job) {
    std::string const& packId = job.pack.packId;
    if (busy_.contains(packId) || !isToWorkOn(job) || surroundings_.settings().isSuspended(Suspended::Jobs))
        return;
    if (held_.contains(packId))
        return goOn(job);
    if (held_.size() >= AT_ONCE)
        return;
    if (std::optional<Job> const claimed = jobs_.claim(packId)) {
        held_.emplace(packId, claimed->fence);
        goOn(*claimed);
    }
}

void JobRunner::goOn(Job const& job) {
    if (job.state == JobState::Accepted)
        startPacking(job);
    else if (job.state == JobState::Queued && job.toUpload)
        startHandingOver(job);
    else if (job.state == JobState::Submitting)
        finishSubmitting(job);
    if (!busy_.contains(job.pack.packId))
        letGo(job.pack.packId);
}

/// One that could go on has something in its way, and is tried again later.
void JobRunner::letGo(std::string const& packId) {
    auto const held = held_.find(packId);
    if (held == held_.end())
        return;
    JobKey const key(packId, held->second);
    held_.erase(held);
    std::optional<Job> const job = jobs_.find(packId);
    if (job && !hasEnded(job->state) && job->state != JobState::Submitted)
        jobs_.letGo(key, isToWorkOn(*job) ? RETRY_SECONDS : 0);
}

std::function<void()> JobRunner::packing(Job const& job) const {
    return
        [pack = job.pack, open = surroundings_.openPack, target = surroundings_.outbox / job.containerName(),
         decided = Policy::decidedMembers(surroundings_.rules(job.cfgId))] {
            writeContainer(*open(pack), target, decided);
        };
}

std::function<void()> JobRunner::makingContainer(std::string const& packId) const {
    std::optional<Job> const job = jobs_.find(packId);
    return job ? makingContainer(*job) : [] {};
}

std::function<void()> JobRunner::makingContainer(Job const& job) const {
    return [container = surroundings_.outbox / job.containerName(), pack = packing(job)] {
        if (!fs::exists(container))
            pack();
    };
}

void JobRunner::startPacking(Job const& job) {
    inBackground(job.pack.packId, Step::Packing, packing(job),
                 [this, packId = job.pack.packId](Outcome const& outcome) { onPacked(packId, outcome); });
}

void JobRunner::onPacked(std::string const& packId, Outcome const& outcome) {
    Job const job = jobs_.find(packId).value();
    if (job.state != JobState::Accepted)
        return discard(job);
    if (outcome.kind == Outcome::Kind::GiveUp) {
        Log::Lock(3).logStreamLine() << "Pack " << packId << " is given up: " << outcome.why;
        jobs_.fail(held(packId), outcome.why, surroundings_.now());
    } else if (outcome.kind == Outcome::Kind::TryLater) {
        noteProblem(packId, outcome.why);
    } else {
        long long const now = surroundings_.now();
        if (jobs_.advance(held(packId), JobState::Accepted, stateBehindPacking(job, now), now))
            proceed(jobs_.find(packId).value());
    }
}

void JobRunner::startHandingOver(Job const& job) {
    bool const isToDivide =
        surroundings_.letters && !job.isDivided && !surroundings_.settings().carriers().empty();
    isToDivide ? startDividing(job) : startStaging(job);
}

void JobRunner::startDividing(Job const& job) {
    auto const division = std::make_shared<Division>();
    inBackground(
        job.pack.packId, Step::Division,
        [division, make = makingContainer(job), container = surroundings_.outbox / job.containerName(),
         rest = surroundings_.outbox / REST_FOLDER / job.containerName(),
         carriers = surroundings_.settings().carriers()] {
            make();
            *division = divide(
                container, rest, [&](std::string const& channel) { return carriers.contains(channel); },
                Protocol::sendsNotices(carriers) ? Notifying::Yes : Notifying::No);
        },
        [this, packId = job.pack.packId, division](Outcome const& outcome) {
            if (outcome.kind != Outcome::Kind::Done)
                return noteProblem(packId, outcome.why);
            surroundings_.letters->record(held(packId), *division);
            proceed(jobs_.find(packId).value());
        });
}

void JobRunner::onLettersTaken(std::string const& packId) {
    if (std::optional<Job> const job = jobs_.find(packId); job && hasLeftOutbox(*job))
        clearOutbox(*job);
}

fs::path JobRunner::containerToStage(Job const& job) const {
    return (job.lettersState ? surroundings_.outbox / REST_FOLDER : surroundings_.outbox) /
           job.containerName();
}

std::function<void()> JobRunner::makingRest(Job const& job) const {
    auto const make = makingContainer(job);
    if (!job.lettersState)
        return make;
    std::set<std::string> channels = surroundings_.letters->store().channelsByCarrier(job.pack.packId);
    return [make, channels, container = surroundings_.outbox / job.containerName(),
            rest = containerToStage(job)] {
        if (fs::exists(rest))
            return;
        make();
        divide(container, rest, [&](std::string const& channel) { return channels.contains(channel); });
    };
}

void JobRunner::sweep() {
    ServiceSettings const settings = surroundings_.settings();
    Outcome const swept = outcomeOf([&] {
        if (!settings.uploadFolder().empty())
            sweepStaged(
                UploadFolder(settings.uploadFolder(), settings.uploadFolderIdentity()),
                [this](std::string const& name, long long fence) { return isStagedOfUse(name, fence); });
    });
    if (swept.kind != Outcome::Kind::Done)
        Log::Lock(4).logStreamLine() << "The upload folder cannot be looked through: " << swept.why;
    discardLeft();
}

/// What nobody may publish is staged under a fence that is past and not on record, or of a job that goes no
/// further. Of an unknown job it may be that of others who use the folder.
bool JobRunner::isStagedOfUse(std::string const& name, long long fence) const {
    std::optional<Job> const job = jobs_.find(fs::path(name).stem().string());
    if (!job || (job->state == JobState::Submitting && fence == job->submitFence))
        return true;
    return fence >= job->fence && !hasLeft(job->state) && !hasEnded(job->state);
}

void JobRunner::startStaging(Job const& job) {
    std::string const folder = surroundings_.settings().uploadFolder();
    // The job list tells that there is none.
    if (folder.empty())
        return;
    auto const identity = std::make_shared<std::string>(surroundings_.settings().uploadFolderIdentity());
    inBackground(
        job.pack.packId, Step::Staging,
        [container = containerToStage(job), make = makingRest(job), folder, identity,
         fence = *held(job.pack.packId).fence] {
            UploadFolder const target(folder, *identity);
            make();
            stage(container, target, fence);
            *identity = target.identity().text();
        },
        [this, packId = job.pack.packId, folder, identity](Outcome const& outcome) {
            onStaged(packId, folder, *identity, outcome);
        });
}

void JobRunner::onStaged(std::string const& packId, std::string const& folder, std::string const& identity,
                         Outcome const& outcome) {
    bool const isStaged = outcome.kind == Outcome::Kind::Done;
    if (isStaged && jobs_.beginSubmitting(held(packId), folder, identity, surroundings_.now()))
        return finishSubmitting(jobs_.find(packId).value());
    Job const job = jobs_.find(packId).value();
    if (job.state == JobState::Queued && !isStaged)
        return noteProblem(packId, outcome.why);
    // A person was faster, or another service.
    discard(job);
}

/// What lies of a job where it is not to lie: a staged copy of one that is held or was cancelled, and the
/// container of a cancelled one. The container goes last, so that a later start finds what is left to do.
void JobRunner::discard(Job const& job) {
    Outcome const unstaged = outcomeOf([&] {
        ServiceSettings const settings = surroundings_.settings();
        std::optional<long long> const fence = fenceToUnstage(job);
        if (fence && !settings.uploadFolder().empty())
            unstage(job.containerName(),
                    UploadFolder(settings.uploadFolder(), settings.uploadFolderIdentity()), *fence);
    });
    if (unstaged.kind != Outcome::Kind::Done)
        Log::Lock(4).logStreamLine() << "Pack " << job.pack.packId << " may lie in the upload folder under a "
                                     << "temporary name: " << unstaged.why;
    if (hasLeftOutbox(job))
        clearOutbox(job);
}

/// What others stage and are about to publish is theirs.
std::optional<long long> JobRunner::fenceToUnstage(Job const& job) const {
    if (auto const found = held_.find(job.pack.packId); found != held_.end())
        return found->second;
    return hasLeft(job.state) ? std::optional(job.fence) : std::nullopt;
}

bool JobRunner::recordChange(JobAction action, Job const& job) {
    bool isChanged = false;
    jobs_.together([&] {
        isChanged = record(jobs_, action, job.pack.packId, surroundings_.now());
        surroundings_.recorder.note(job.cfgId, nameInHistory(job), inHistory(job),
                                    inHistory(jobs_.find(job.pack.packId).value()));
    });
    return isChanged;
}

void JobRunner::change(JobAction action, std::string const& packId) {
    std::optional<Job> const job = jobs_.find(packId);
    if (!job)
        throw Base::Error(Base::Code::MailingUnknown, "there is no mailing " + Base::oneLine(packId));
    if (action == JobAction::Upload)
        requireUploadFolder();
    if (!recordChange(action, *job) && !isSoAlready(*job, action))
        throw Base::Error(Base::Code::StateRefused, "it is too late to " + std::string(actionName(action)) +
                                                        " mailing " + packId + ": " + whoHas(*job));
    Job const changed = jobs_.find(packId).value();
    // What the worker is about to make is seen to when it has.
    if (changed.state == JobState::Cancelled && !busy_.contains(packId))
        discard(changed);
    else
        proceed(changed);
}

void JobRunner::finishSubmitting(Job const& job) {
    Outcome const outcome = outcomeOf([&] {
        StepTime const time(surroundings_.took, Step::Publishing);
        publish(job.containerName(), UploadFolder(job.uploadFolder, job.uploadFolderIdentity),
                job.submitFence);
    });
    if (outcome.kind != Outcome::Kind::Done)
        return noteProblem(job.pack.packId, outcome.why);
    // While the job is on record as Submitting, so that a container that stays behind is seen to again.
    removeFromOutbox(containerToStage(job));
    jobs_.together([&] {
        bool const isNoted = jobs_.advance(held(job.pack.packId), JobState::Submitting, JobState::Submitted,
                                           surroundings_.now());
        if (isNoted && surroundings_.letters)
            surroundings_.letters->noteContainerHandedOn(job.pack.packId);
    });
    if (job.lettersState)
        onLettersTaken(job.pack.packId);
    if (surroundings_.letters && job.isDivided)
        surroundings_.letters->proceed();
}

/// The mailing's container goes last, so that a later start finds what is left to do.
void JobRunner::clearOutbox(Job const& job) {
    if (job.lettersState)
        removeFromOutbox(containerToStage(job));
    removeFromOutbox(surroundings_.outbox / job.containerName());
}

void JobRunner::removeFromOutbox(fs::path const& container) {
    std::error_code failure;
    fs::remove(container, failure);
    if (!failure)
        leftInOutbox_.erase(container);
    else if (leftInOutbox_.insert(container).second)
        Log::Lock(4).logStreamLine()
            << "The container " << container.filename().string()
            << " was handed on and cannot be removed from the outbox, which is tried "
               "again: "
            << failure.message();
}

/// What an earlier process left there, or another service has handed over.
void JobRunner::discardLeft() {
    std::error_code unreadable;
    for (fs::directory_entry const& entry : fs::directory_iterator(surroundings_.outbox, unreadable))
        if (std::optional<Job> const job = jobs_.find(entry.path().stem().string());
            job && hasLeftOutbox(*job) && entry.path().filename() == job->containerName())
            discard(*job);
}

/// What could not be removed is tried again; the first time, with all that an earlier process left.
void JobRunner::sweepOutbox() {
    if (!std::exchange(isSwept_, true))
        discardLeft();
    for (fs::path const& container : std::set<fs::path>(leftInOutbox_))
        removeFromOutbox(container);
}

void JobRunner::requireUploadFolder() const {
    ServiceSettings const settings = surroundings_.settings();
    if (settings.uploadFolder().empty() && settings.carriers().empty())
        throw Base::Error(
            Base::Code::SettingMissing,
            "the service has no upload folder: set one with \"vlmail settings service upload_folder=PATH\"");
}

void JobRunner::upload(std::string const& folder, std::string const& database, Policy::Grant const& by) {
    requireUploadFolder();
    surroundings_.recorder.together([&] {
        wantUpload(folder.empty() ? folder : folderText(folder), database, by);
        surroundings_.recorder.note(by.node, "mailings that wait", "", "to be handed on");
    });
    resume();
}

void JobRunner::wantUpload(std::string const& folder, std::string const& database, Policy::Grant const& by) {
    if (by.node.empty())
        return jobs_.wantUpload(folder, database);
    for (JobState const state : {JobState::Accepted, JobState::Held, JobState::Queued})
        for (Job const& job : jobs_.inState(state))
            if (by.covers(job.cfgId) && (folder.empty() || job.pack.folder == folder) &&
                (database.empty() || job.pack.database == database))
                jobs_.wantUpload(job.pack.packId);
}

void JobRunner::updateStatus(std::string const& folder, std::string const& database) {
    for (Job const& job : jobs_.underWay(folder.empty() ? folder : folderText(folder), database)) {
        if (job.state == JobState::Submitted || job.state == JobState::Lodged)
            refresh(job);
        else
            proceed(job);
    }
}

void JobRunner::refresh(Job const& job) {
    // All of its letters went by carriers.
    if (job.uploadFolder.empty())
        return;
    Outcome const outcome = outcomeOf([&] {
        UploadFolder const folder(job.uploadFolder, job.uploadFolderIdentity);
        bool const waits = liesIn(folder, job.containerName());
        std::optional<CarrierReport> const report = carrierReport(folder, job.containerName());
        if (report && !report->delivered)
            jobs_.fail(job.pack.packId, "the carrier: " + Base::oneLine(report->text), surroundings_.now());
        else if (report)
            jobs_.advance(job.pack.packId, job.state, JobState::Delivered, surroundings_.now());
        else if (job.state == JobState::Submitted && !waits)
            jobs_.advance(job.pack.packId, job.state, JobState::Lodged, surroundings_.now());
    });
    if (outcome.kind != Outcome::Kind::Done)
        noteProblem(job.pack.packId, outcome.why);
    else if (!job.problem.empty() && jobs_.find(job.pack.packId)->state == job.state)
        jobs_.setProblem(job.pack.packId, {});
}

void JobRunner::noteProblem(std::string const& packId, std::string const& problem) {
    // What goes on being in the way is logged once.
    if (jobs_.find(packId).value().problem == problem)
        return;
    Log::Lock(4).logStreamLine() << "Pack " << packId << " cannot go on: " << problem;
    jobs_.setProblem(held_.contains(packId) ? held(packId) : JobKey(packId), problem);
}

void JobRunner::inBackground(std::string const& packId, Step step, std::function<void()> work,
                             std::function<void(Outcome)> then) {
    busy_.insert(packId);
    auto const finish = [this, packId, then = std::move(then)](Outcome const& outcome) {
        busy_.erase(packId);
        try {
            then(outcome);
            if (!busy_.contains(packId))
                letGo(packId);
            takeUp();
        } catch (std::exception const& failure) {
            // The record did not change, so the step is made again by whoever takes it up next; unless it is
            // the next step that has begun already.
            if (!busy_.contains(packId))
                held_.erase(packId);
            Log::Lock(3).logStreamLine() << "Pack " << packId << " cannot be recorded. " << failure.what();
        }
    };
    try {
        surroundings_.onWorker(
            [work = timed(step, std::move(work)), finish, onOwnThread = surroundings_.onOwnThread] {
                onOwnThread([finish, outcome = outcomeOf(work)] { finish(outcome); });
            });
    } catch (...) {
        busy_.erase(packId);
        throw;
    }
}

std::function<void()> JobRunner::timed(Step step, std::function<void()> work) const {
    return [step, work = std::move(work), took = surroundings_.took] {
        StepTime const time(took, step);
        work();
    };
}

JobRunner::Outcome JobRunner::outcomeOf(std::function<void()> const& work) {
    try {
        work();
        return {};
    } catch (BadPack const& bad) {
        return {Outcome::Kind::GiveUp, Base::oneLine(bad.what()), bad.code()};
    } catch (std::exception const& failure) {
        return {Outcome::Kind::TryLater, Base::oneLine(failure.what()), Base::codeOf(failure)};
    }
}

} // namespace VlServiced

#pragma once
// Brings jobs along their way: from the client's database into the outbox, from there to the upload folder,
// and on with what the carrier reports.

#include "programs/base/error_code.h"
#include "programs/base/local_offset.h"
#include "programs/mailing/pack_source.h"
#include "programs/policy/limits.h"
#include "programs/policy/rights.h"
#include "programs/vlserviced/jobs/admission.h"
#include "programs/vlserviced/jobs/step.h"
#include "programs/vlserviced/settings/service_settings.h"
#include "programs/vlserviced/store/history.h"
#include "programs/vlserviced/store/job_store.h"

#include <filesystem>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>

namespace VlServiced {

class LetterRunner;

/// Opens a finished pack; called away from the runner's thread. Throws Error.
using OpenPack = std::function<std::unique_ptr<Mailing::PackSource>(PackLocation const&)>;

/// The pages of a pack database, wherever it lies.
std::unique_ptr<Mailing::PackSource> openPackDatabase(PackLocation const& pack);

/// What a runner needs around it.
struct JobSurroundings {
    using Work = std::function<void()>;

    /// Runs long work, one after another, away from the caller's thread.
    std::function<void(Work)> onWorker;
    /// Runs short work that may have to wait for a file, away from the caller's thread and from long work.
    std::function<void(Work)> onReader;
    /// Runs work on the runner's own thread; may be called from any.
    std::function<void(Work)> onOwnThread;
    /// Seconds since the epoch.
    std::function<long long()> now;
    /// The service's settings as they are at that moment.
    std::function<ServiceSettings()> settings;
    std::filesystem::path outbox;
    /// What counts for the mailings of a node.
    std::function<Policy::Rules(std::string const& node)> rules = [](std::string const&) {
        return Policy::Rules();
    };
    /// Where a node has a pack preset from, for messages.
    std::function<std::string(std::string const& node, std::string const& packPreset)> presetSource =
        [](std::string const& node, std::string const&) { return node; };
    /// The clock of the place that delays are meant for.
    Policy::UtcOffset offset = &Base::localOffset;
    /// Told that a node's mailing was accepted that goes by that pack preset.
    std::function<void(std::string const& node, std::string const& packPreset)> usedPreset =
        [](std::string const&, std::string const&) {};
    /// Takes the letters of channels that have carriers; null where there are none.
    LetterRunner* letters = nullptr;
    OpenPack openPack = &openPackDatabase;
    /// Where is noted what people do.
    Recorder recorder = {};
    StepTook took = [](Step, std::chrono::duration<double>) {};
    /// Letters that went out are in it; null where nobody looks.
    LetterRegister* letterRegister = nullptr;
    /// Told that a pack is not taken as it is: of the same id it comes with other letters, if at all.
    std::function<void(std::string const& packId, std::size_t letters)> refusedLetters =
        [](std::string const&, std::size_t) {};
};

/// Every step is put on record before and after it, so that a job goes on where it was, whatever ended the
/// process. Used by one thread; the work it hands to the worker touches nothing of it.
/// Operations on a pack database take its folder and its name; for all but accept() an empty text is no
/// restriction.
class JobRunner {
public:
    /// In the outbox: containers of what carriers leave of mailings.
    static constexpr char const* REST_FOLDER = "rest";

    /// The store has to outlive the runner, and the runner has to outlive the work on its own thread.
    JobRunner(JobStore& jobs, JobSurroundings surroundings);

    /// Takes up every job that can go on: at the start, and when jobs are no longer held back.
    void resume();
    /// Takes up those whose time has come and that nobody works on, a few at a time.
    void takeUp();
    /// How many jobs the worker is busy with, or will be.
    std::size_t inHand() const { return busy_.size(); }
    /// Holds on what is being worked on; to be called a few times in the time of the store's holder.
    void keepHold();
    /// Removes what nobody publishes any more from the upload folder, and from the outbox what has left it.
    void sweep();
    /// Takes up what is held and due by now, a few jobs at a time.
    void releaseDue();
    /// Puts a pack on record as a job, once for each pack id: a further call for the same pack changes
    /// nothing. The pages are fetched later. `mayBeOf` is asked whether the node of the pack is one that it
    /// may be sent for, and throws Error when it is not. `done` is called on the own thread, with the reason
    /// as one line when the pack cannot be taken, which is empty otherwise.
    using RequireNode = std::function<void(std::string const& cfgId)>;
    void accept(PackLocation const& pack, RequireNode const& mayBeOf,
                std::function<void(std::string const& failure)> done);
    /// Has the containers of these jobs handed on, of those that the grant covers, and those that are not
    /// there yet as soon as they are. Throws Error when there is no upload folder.
    void upload(std::string const& folder, std::string const& database,
                Policy::Grant const& by = Policy::Grant::ofService());
    /// Brings the states of these jobs up to date with the upload folder, and tries again what failed before.
    void updateStatus(std::string const& folder, std::string const& database);
    /// Work that makes the container of a job where it is not in this outbox: another machine may have made
    /// it.
    std::function<void()> makingContainer(std::string const& packId) const;
    /// Told that the letters of a job that go by carriers were all taken on.
    void onLettersTaken(std::string const& packId);
    /// Holds a job, lets it go on, has it handed on, or calls it back. What is so already stays so. Throws
    /// Error, which says where the job has got to, when it is too late.
    void change(Protocol::JobAction action, std::string const& packId);

private:
    /// How a step of the worker ended.
    struct Outcome {
        enum class Kind { Done, TryLater, GiveUp } kind = Kind::Done;
        std::string why;
        Base::Code code = Base::Code::Unexpected;
    };

    void proceed(Job const& job);
    /// Of a job that is held.
    void goOn(Job const& job);
    void letGo(std::string const& packId);
    JobKey held(std::string const& packId) const;
    std::optional<long long> fenceToUnstage(Job const& job) const;
    std::function<void()> packing(Job const& job) const;
    /// The same where it is not in this outbox: another machine may have made it.
    std::function<void()> makingContainer(Job const& job) const;
    /// The same for the container that goes to the upload folder.
    std::function<void()> makingRest(Job const& job) const;
    bool isStagedOfUse(std::string const& name, long long fence) const;
    void startPacking(Job const& job);
    void startHandingOver(Job const& job);
    void startDividing(Job const& job);
    void startStaging(Job const& job);
    void finishSubmitting(Job const& job);
    void onPacked(std::string const& packId, Outcome const& outcome);
    void onStaged(std::string const& packId, std::string const& folder, std::string const& identity,
                  Outcome const& outcome);
    void refresh(Job const& job);
    void discard(Job const& job);
    void noteProblem(std::string const& packId, std::string const& problem);
    void admit(PackLocation const& pack, PackSummary const& summary, RequireNode const& mayBeOf);
    void enter(Job const& job, PackSummary const& summary);
    void wantUpload(std::string const& folder, std::string const& database, Policy::Grant const& by);
    bool recordChange(Protocol::JobAction action, Job const& job);
    void requireUploadFolder() const;
    void requireNotDisabled(std::string const& packId, std::string const& cfgId) const;
    /// The container that goes to the upload folder.
    std::filesystem::path containerToStage(Job const& job) const;
    void clearOutbox(Job const& job);
    void removeFromOutbox(std::filesystem::path const& container);
    void discardLeft();
    void sweepOutbox();
    /// Runs `work` on the worker and hands its outcome to `then` on the own thread.
    void inBackground(std::string const& packId, Step step, std::function<void()> work,
                      std::function<void(Outcome)> then);
    /// The same work, of which is told how long it takes.
    std::function<void()> timed(Step step, std::function<void()> work) const;
    static Outcome outcomeOf(std::function<void()> const& work);

    JobStore& jobs_;
    JobSurroundings surroundings_;
    /// Pack ids that the worker is busy with, or will be.
    std::set<std::string> busy_;
    /// The fences of jobs that are held.
    std::map<std::string, long long> held_;
    bool isTakingUp_ = false;
    /// Containers that were handed on and are still in the outbox.
    std::set<std::filesystem::path> leftInOutbox_;
    bool isSwept_ = false;
};

} // namespace VlServiced

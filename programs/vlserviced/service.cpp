#include "programs/vlserviced/service.h"

#include "programs/base/error.h"
#include "programs/base/local_offset.h"
#include "programs/base/out_of_memory.h"
#include "programs/base/plain_text.h"
#include "programs/base/version.h"
#include "programs/channel/server.h"
#include "programs/channel/token.h"
#include "programs/database/postgres_connection.h"
#include "programs/protocol/query.h"
#include "programs/vlserviced/discovery_answer.h"
#include "programs/vlserviced/health.h"
#include "programs/vlserviced/jobs/held_queries.h"
#include "programs/vlserviced/jobs/local_packs.h"
#include "programs/vlserviced/jobs/pack_reception.h"
#include "programs/vlserviced/jobs/retention.h"
#include "programs/vlserviced/metrics/metrics_door.h"
#include "programs/vlserviced/metrics/metrics_page.h"
#include "programs/vlserviced/neighbours.h"
#include "programs/vlserviced/processor.h"
#include "programs/vlserviced/store/data_folder.h"
#include "programs/vlserviced/store/move_database.h"
#include "programs/vlserviced/store/schema.h"
#include "programs/vlserviced/system_manager.h"
#include "vlservice/cfg/inet.h"
#include "vlservice/ipc/cs_config_ids_list.h"
#include "vlservice/ipc/make_empty_cmd.h"
#include "vlservice/platform/log.h"

#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/address.hpp>
#include <boost/asio/ip/host_name.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/signal_set.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/thread_pool.hpp>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <csignal>
#include <ctime>
#include <functional>
#include <future>
#include <map>
#include <new>
#include <optional>
#include <random>
#include <thread>
#include <unistd.h>
#include <utility>
#include <vector>

namespace VlServiced {
namespace {

namespace asio = boost::asio;
namespace fs = std::filesystem;

/// How often jobs are tried again that something kept from going on.
constexpr std::chrono::minutes RETRY_TIME{1};
/// How often unused presets are looked for.
constexpr std::chrono::hours SWEEP_TIME{24};
/// How often packs are looked for that nobody needs, and jobs whose time is up.
constexpr std::chrono::hours ENDED_SWEEP_TIME{1};
constexpr std::size_t MAX_PATH_BYTES = 1000;
/// How long carriers get for what they have begun when the service ends.
constexpr std::chrono::seconds CARRIERS_PATIENCE{3};
/// How long a piece of a pack waits for others that go to the disk with it.
constexpr std::chrono::milliseconds PIECES_PATIENCE{20};

constexpr char const* REVOKED = "this access token was revoked: ask for another one (\"vlmail token add\")";

/// How often what other services tell is looked up, whether it was heard or not.
constexpr std::chrono::seconds POLL_TIME{15};

/// What the database's clock is ahead of this machine's, in seconds.
std::atomic<long long> databaseAhead{0};

long long now() { return std::time(nullptr) + databaseAhead; }

/// Another one for each process.
Holder newHolder(Options const& options) {
    std::random_device random;
    return options.database.empty() ? Holder{"this service", options.lease}
                                    : Holder{asio::ip::host_name() + '-' + std::to_string(::getpid()) + '-' +
                                                 std::to_string(random()),
                                             options.lease};
}

SharedDatabase openDatabase(Options const& options, DataFolder const& data) {
    if (!options.database.empty()) {
        requireMoved(data, options.database);
        return openSharedDatabase(options.database);
    }
    requireNotMoved(data);
    return {openServiceDatabase(data.database()), true};
}

std::shared_ptr<PackStore> openPackStore(Options const& options, DataFolder const& data) {
    return options.database.empty() ? openSqlitePackStore(data.packs())
                                    : openSharedPackStore(options.database);
}

/// Goes on whoever sets the clock.
long long steadySeconds() {
    return std::chrono::duration_cast<std::chrono::seconds>(
               std::chrono::steady_clock::now().time_since_epoch())
        .count();
}

fs::path preparedOutbox(Options const& options, DataFolder const& data) {
    fs::path const outbox = fs::absolute(options.outbox.empty() ? data.outbox() : options.outbox);
    if (!Base::isPlainText(outbox.string(), MAX_PATH_BYTES))
        throw Base::Error(Base::Code::Usage, "the path of the outbox has to be a line of UTF-8 text");
    makeWritableFolder(outbox);
    return outbox;
}

/// Whether the file is one that a Base::PendingFile was being written to.
bool isUnfinished(fs::path const& file) {
    std::string const name = file.filename().string();
    return name.size() == 12 && name.starts_with('.') && name.ends_with(".part");
}

/// What a process that was killed was writing; nothing where there is no such folder.
void removeUnfinished(fs::path const& outbox) {
    std::vector<fs::path> unfinished;
    std::error_code missing;
    for (fs::directory_entry const& entry : fs::directory_iterator(outbox, missing))
        if (isUnfinished(entry.path()))
            unfinished.push_back(entry.path());
    std::error_code ignored;
    for (fs::path const& file : unfinished)
        fs::remove(file, ignored);
}

/// The question about jobs that a command asks and that may wait; one that does not when it asks none. What
/// is wrong with a question is told when it is answered.
Protocol::JobsQuery waitedFor(Ipc::CmdI const& cmd) {
    auto const* const list = dynamic_cast<Ipc::CSConfigIdsList const*>(&cmd);
    if (!list || Protocol::kindOf(list->reqParams()) != Protocol::JobsQuery::KIND)
        return {};
    try {
        return Protocol::JobsQuery(list->reqParams());
    } catch (std::exception const&) {
        return {};
    }
}

/// Of all that clients may ask, a name that is one of a few.
std::string measuredName(Ipc::CmdI const& cmd) {
    auto const* const list = dynamic_cast<Ipc::CSConfigIdsList const*>(&cmd);
    if (!list)
        return cmd.name();
    static std::vector<std::string> const known = Processor::questions();
    std::string const kind = Protocol::kindOf(list->reqParams());
    return std::ranges::find(known, kind) == known.end() ? "unknown question" : kind;
}

std::string announcedHost(Options const& options) {
    if (!options.announce.empty())
        return options.announce;
    return asio::ip::make_address(options.listen).is_unspecified() ? asio::ip::host_name() : options.listen;
}

/// The service's own token. The first start makes one, where none is named; of services that share a
/// database, the first of all.
struct OwnToken {
    std::string text;
    bool isNew = false;
};

OwnToken ownToken(Options const& options, DataFolder const& data, bool mayMakeIt) {
    if (!options.token.empty())
        return {Channel::readToken(options.token)};
    bool const isNew = !fs::exists(data.token());
    if (isNew && !mayMakeIt)
        throw Base::Error(
            Base::Code::TokenInvalid,
            "the token of this database lies with the service that has made it: copy that file to " +
                data.token().string() + " or name it by --token");
    return {Channel::readOrCreateToken(data.token().string()), isNew};
}

} // namespace

/// Threads for the work of carriers, so that one that hangs holds up no other channel.
class CarrierThreads {
public:
    /// Work of a channel, so many of it side by side.
    asio::thread_pool& of(std::string const& channel, std::size_t atOnce) {
        auto& [threads, number] = byChannel_[channel];
        if (number < atOnce) {
            // What the former ones have begun they finish.
            if (threads)
                former_.push_back(std::move(threads));
            threads = std::make_unique<asio::thread_pool>(atOnce);
            number = atOnce;
        }
        return *threads;
    }
    void end() {
        for (auto& [channel, threads] : byChannel_)
            former_.push_back(std::move(threads.first));
        byChannel_.clear();
        for (auto const& threads : former_)
            threads->stop();
        for (auto const& threads : former_)
            threads->join();
        former_.clear();
    }

private:
    using Threads = std::unique_ptr<asio::thread_pool>;

    std::map<std::string, std::pair<Threads, std::size_t>> byChannel_;
    std::vector<Threads> former_;
};

class Service::Impl {
public:
    explicit Impl(Options const& options)
        : data_(options.data), outbox_(preparedOutbox(options, data_)),
          databaseInWords_(options.database.empty() ? data_.database().string()
                                                    : Database::shownPostgresAddress(options.database)),
          opened_(openDatabase(options, data_)), jobs_(*opened_.connection, newHolder(options)),
          localPacks_(options.localPacks), packStore_(openPackStore(options, data_)),
          ownToken_(ownToken(options, data_, opened_.isNew)),
          server_(
              std::in_place, io_, serverSettings(options), &Ipc::makeEmptyCmd,
              [this](std::shared_ptr<Ipc::CmdI> const& cmd, Channel::Answer const& answer) {
                  handle(cmd, answer);
              },
              [this](Channel::ReceivedData data, Channel::DataStored const& stored) {
                  take(std::move(data), stored);
              }) {
        if (ownToken_.isNew)
            tokens_.enrol();
        jobs_.onChange([this](std::string const& packId) {
            held_.onChange(packId);
            packs_.onJobChanged(packId);
            awaitDue();
        });
        removeUnfinished(outbox_);
        removeUnfinished(outbox_ / JobRunner::REST_FOLDER);
        recogniseFolders();
        if (options.answersDiscovery)
            discovery_.emplace(io_, announcedHost(options), server_->port(), ownToken_.text, tokenLookup());
        if (!options.database.empty())
            neighbours_.emplace(io_, options.database, heard());
        if (!options.metrics.empty())
            measure(options);
    }

    ~Impl() {
        endThreads();
        carrierThreads_.end();
    }

    Channel::Server const& server() const { return *server_; }
    std::string metricsPlace() const { return metrics_ ? metrics_->place() : std::string(); }

    void run() {
        signals_.async_wait([this](boost::system::error_code const& ec, int) {
            if (!ec)
                stop();
        });
        asio::post(io_, [this] {
            awaitHold();
            awaitPoll();
            if (neighbours_)
                neighbours_->listen();
            readClock();
            awaitDue();
            runner_.resume();
            letterRunner_.resume();
        });
        asio::post(io_, [this] {
            sweepPresets();
            sweepEnded();
        });
        manager_.onReady("listening on port " + std::to_string(server_->port()));
        awaitUpkeep();
        if (metrics_)
            metrics_->open([this] { return page_->text(); });
        runHandlers();
        metrics_.reset();
        // What the worker has finished by now goes on record; the rest is taken up at the next start.
        endThreads();
        endCarriers();
    }

    void stopFromAnywhere() {
        asio::post(io_, [this] { stop(); });
    }

private:
    Channel::TokenLookup tokenLookup() const {
        return [this](std::string const& id) { return tokens_.keysOf(id); };
    }

    Channel::ServerSettings serverSettings(Options const& options) const {
        Channel::ServerSettings settings;
        settings.address = options.listen;
        settings.port = options.port;
        settings.socket = options.socket;
        settings.token = ownToken_.text;
        settings.tokens = tokenLookup();
        settings.certificateFile = options.certificate;
        settings.keyFile = options.key;
        return settings;
    }

    void measure(Options const& options) {
        metrics_ = std::make_unique<MetricsDoor>(options.metrics);
        opened_.connection->onTook([this](char const* operation, Measures::Duration took) {
            measures_.noteDatabase(operation, took);
        });
        processor_->countIn(measures_);
        page_.emplace(measures_, pageSources(options));
    }

    PageSources pageSources(Options const& options) {
        return {[options, file = data_.database()] {
                    return options.database.empty()
                               ? openToLook(file)
                               : std::make_unique<Database::PostgresConnection>(options.database);
                },
                [this] { return moment(); },
                {{"data", data_.path()}, {"outbox", outbox_}},
                &now,
                Base::projectVersion(),
                options.commit};
    }

    /// Called by another thread, which does not wait for a service that hangs.
    std::optional<Moment> moment() {
        constexpr std::chrono::seconds PATIENCE{2};
        auto const told = std::make_shared<std::promise<Moment>>();
        std::future<Moment> answer = told->get_future();
        asio::post(io_, [this, told] { told->set_value(momentNow()); });
        if (answer.wait_for(PATIENCE) != std::future_status::ready)
            return std::nullopt;
        return answer.get();
    }

    Moment momentNow() {
        Moment moment;
        moment.connections = server_->connections();
        moment.queues = {{"jobs in hand", runner_.inHand()},
                         {"letters in hand", letterRunner_.inHand()},
                         {"pieces to store", packs_.waiting()},
                         {"questions held", held_.size()}};
        moment.channels = channels();
        moment.certificateEnds = server_->certificateEnds();
        return moment;
    }

    /// That have carriers; none while the database does not tell.
    std::vector<std::string> channels() {
        std::vector<std::string> channels;
        try {
            for (auto const& [channel, carrier] : settings_.service().carriers())
                channels.push_back(channel);
        } catch (Database::QueryError const&) {
            return {};
        }
        return channels;
    }

    void endThreads() {
        for (asio::thread_pool* const threads : {&worker_, &reader_, &storeThread_}) {
            threads->stop();
            threads->join();
        }
    }

    /// What carriers have begun they finish, and put on record meanwhile; what hangs they give up.
    void endCarriers() {
        io_.restart();
        auto guard = asio::make_work_guard(io_);
        asio::steady_timer patience(io_, CARRIERS_PATIENCE);
        patience.async_wait([this](boost::system::error_code const& ec) {
            if (!ec)
                carriersStop_.raise();
        });
        std::thread ending([&] {
            carrierThreads_.end();
            asio::post(io_, [&] { patience.cancel(); });
            guard.reset();
        });
        runHandlers();
        ending.join();
    }

    void recogniseFolders() {
        try {
            settings_.recogniseCarrierFolders();
            settings_.recogniseUploadFolder();
        } catch (std::exception const& failure) {
            Log::Lock(4).logStreamLine() << "The upload folder is not known yet. " << failure.what();
        }
    }

    void runHandlers() {
        for (;;) {
            try {
                io_.run();
                return;
            } catch (std::bad_alloc const&) {
                // A connection or a listener may be lost with what failed; nothing would take it up again.
                throw;
            } catch (std::exception const& failure) {
                Log::Lock(3).logStreamLine()
                    << "The service goes on after a failure. " << Base::oneLine(failure.what());
            }
        }
    }

    /// What asks to wait for jobs is answered when they have moved; all else at once.
    void handle(std::shared_ptr<Ipc::CmdI> const& cmd, Channel::Answer const& answer) {
        held_.hold(waitedFor(*cmd), [this, cmd, answer] { carryOut(cmd, answer); });
    }

    /// What a token may do is asked anew for each command: it may have been revoked meanwhile.
    std::optional<Policy::Grant> grantOf(Ipc::CmdProcessorI const& connection) const {
        return tokens_.grantOf(Channel::tokenIdOf(connection));
    }

    void carryOut(std::shared_ptr<Ipc::CmdI> const& cmd, Channel::Answer const& answer) {
        std::optional<Policy::Grant> const by = grantOf(*cmd->processor());
        if (!by) {
            access_.refused().note(REVOKED);
            measures_.noteRefusal(Refusal::Token);
            return answer.refuse(REVOKED);
        }
        processor_->carryOut(cmd, *by,
                             [this, answer, name = measuredName(*cmd),
                              begin = std::chrono::steady_clock::now()](std::string const& failure) {
                                 measures_.noteCommand(name, std::chrono::steady_clock::now() - begin);
                                 if (failure.empty())
                                     answer();
                                 else
                                     access_.refused().isLast(failure) ? answer.refuse(failure)
                                                                       : answer.fail(failure);
                             });
    }

    void take(Channel::ReceivedData data, Channel::DataStored const& stored) {
        if (!grantOf(*data.connection))
            return stored.fail(REVOKED);
        packs_.take(data.connection, std::move(data.text), [stored](std::string const& failure) {
            failure.empty() ? stored() : stored.fail(failure);
        });
    }

    void stop() {
        // First, whatever fails: timers that have expired already are not stopped by a cancel.
        isStopping_ = true;
        manager_.onStopping();
        releaseHeld();
        server_->stop();
        discovery_.reset();
        upkeep_.cancel();
        due_.cancel();
        lettersDue_.cancel();
        hold_.cancel();
        poll_.cancel();
        if (neighbours_)
            neighbours_->stop();
        signals_.cancel();
    }

    /// Their clients are told by the end of the connection otherwise.
    void releaseHeld() {
        try {
            held_.releaseAll();
        } catch (Database::QueryError const& failure) {
            Log::Lock(4).logStreamLine()
                << "Questions about jobs stay without an answer: " << Base::oneLine(failure.what());
        }
    }

    Neighbours::Heard heard() {
        return {[this](std::string const& packId) { held_.onChange(packId); }, [this] { runner_.takeUp(); },
                [this] { letterRunner_.proceed(); }, [this] { settings_.forgetRead(); }};
    }

    void readClock() const {
        databaseAhead = opened_.connection->number("SELECT clock_ms()") / 1000 -
                        static_cast<long long>(std::time(nullptr));
    }

    /// A few times in the time after which others take up what this service works on, and it what they did.
    void awaitHold() {
        hold_.expires_after(std::chrono::milliseconds(jobs_.holder().seconds * 1000 / 4));
        hold_.async_wait([this](boost::system::error_code const& ec) {
            if (ec || isStopping_)
                return;
            awaitHold();
            runner_.keepHold();
            letterRunner_.keepHold();
            // What a service that is gone has left is nobody's from the end of its time on.
            if (neighbours_)
                runner_.takeUp();
        });
    }

    /// What other services have changed, in case that it was not heard.
    void awaitPoll() {
        poll_.expires_after(POLL_TIME);
        poll_.async_wait([this](boost::system::error_code const& ec) {
            if (ec || isStopping_ || !neighbours_)
                return;
            awaitPoll();
            settings_.forgetRead();
            neighbours_->listen();
            readClock();
            runner_.takeUp();
            letterRunner_.proceed();
            held_.lookAgain();
            awaitDue();
        });
    }

    /// Looks at the clock again now and then, since somebody may set it.
    void awaitDue() {
        std::optional<long long> const due = jobs_.nextDue();
        if (!due || isStopping_) {
            due_.cancel();
            return;
        }
        due_.expires_after(std::clamp(std::chrono::seconds(*due - now()), std::chrono::seconds(0),
                                      std::chrono::seconds(RETRY_TIME)));
        due_.async_wait([this](boost::system::error_code const& ec) {
            if (ec)
                return;
            runner_.releaseDue();
            awaitDue();
        });
    }

    void awaitLetters() {
        std::optional<long long> const next = isStopping_ ? std::nullopt : letterRunner_.nextTime();
        if (!next) {
            lettersDue_.cancel();
            return;
        }
        lettersDue_.expires_after(std::clamp(std::chrono::seconds(*next - now()), std::chrono::seconds(0),
                                             std::chrono::seconds(RETRY_TIME)));
        lettersDue_.async_wait([this](boost::system::error_code const& ec) {
            if (!ec)
                letterRunner_.proceed();
        });
    }

    void awaitUpkeep() {
        upkeep_.expires_after(RETRY_TIME);
        upkeep_.async_wait([this](boost::system::error_code const& ec) {
            if (ec || isStopping_)
                return;
            awaitUpkeep();
            keepUp();
        });
    }

    void keepUp() {
        // Where services share a database each job has its time.
        if (neighbours_)
            runner_.takeUp();
        else
            runner_.resume();
        letterRunner_.proceed();
        documents_.dropStalled();
        access_.refused().tellWhatWasLeftOut();
        auto const time = std::chrono::steady_clock::now();
        if (time - lastStatusUpdate_ >= statusUpdateTime()) {
            lastStatusUpdate_ = time;
            runner_.updateStatus("", "");
        }
        if (time - lastSweep_ >= SWEEP_TIME)
            sweepPresets();
        if (time - lastEndedSweep_ >= ENDED_SWEEP_TIME) {
            lastEndedSweep_ = time;
            sweepEnded();
        }
    }

    void sweepEnded() {
        packs_.sweep();
        history_.removeOld();
        runner_.sweep();
        removeEndedJobs();
    }

    /// A few at a time: others get their turn in between.
    void removeEndedJobs() {
        if (isStopping_)
            return;
        if (retention_.removeSome())
            asio::post(io_, [this] { removeEndedJobs(); });
        else
            retention_.finish();
    }

    void sweepPresets() {
        lastSweep_ = std::chrono::steady_clock::now();
        settings_.removeUnusedPresets();
    }

    /// The mailing is on record whatever becomes of this.
    void notePresetUse(std::string const& node, std::string const& packPreset) {
        try {
            settings_.notePresetUse(node, packPreset);
        } catch (std::exception const& failure) {
            Log::Lock(4).logStreamLine()
                << "The use of a preset is not on record. " << Base::oneLine(failure.what());
        }
    }

    std::chrono::hours statusUpdateTime() const {
        Cfg::Inet const inet(settings_.values("", Cfg::Inet::PART_NAME), false, false);
        int const hours = inet.value<Cfg::InetFieldIdxs::StatusUpdateHours>();
        return std::chrono::hours(hours > 0 ? hours : 1);
    }

    /// Work hands its outcome over itself. What keeps it from that would leave a job or a client waiting for
    /// good.
    static void runOn(asio::thread_pool& threads, JobSurroundings::Work work) {
        asio::post(threads, [work = std::move(work)] {
            try {
                work();
            } catch (std::bad_alloc const&) {
                Base::endOutOfMemory();
            }
        });
    }

    /// Called from other threads, which wait for it.
    void doOnOwnThread(LetterSurroundings::Work const& work) {
        std::packaged_task<void()> task(work);
        std::future<void> done = task.get_future();
        asio::post(io_, std::move(task));
        done.get();
    }

    JobSurroundings surroundings() {
        return {[this](JobSurroundings::Work work) { runOn(worker_, std::move(work)); },
                [this](JobSurroundings::Work work) { runOn(reader_, std::move(work)); },
                [this](JobSurroundings::Work work) { asio::post(io_, std::move(work)); },
                &now,
                [this] { return settings_.service(); },
                outbox_,
                [this](std::string const& node) { return settings_.rules(node); },
                [this](std::string const& node, std::string const& packPreset) {
                    return settings_.sourceOfPackPreset(node, packPreset);
                },
                &Base::localOffset,
                [this](std::string const& node, std::string const& packPreset) {
                    notePresetUse(node, packPreset);
                },
                &letterRunner_,
                [this](PackLocation const& pack) {
                    return pack.isWithService() ? packStore_->open(pack.packId) : localPacks_.open(pack);
                },
                history_,
                took_,
                &letterRegister_,
                [this](std::string const& packId, std::size_t letters) {
                    measures_.noteSentBefore(LeftOut::Refused, letters);
                    packs_.drop(packId);
                }};
    }

    LetterSurroundings letterSurroundings() {
        return {[this](std::string const& channel, std::size_t atOnce, LetterSurroundings::Work work) {
                    // What waits is taken up at the next start.
                    if (!isStopping_)
                        runOn(carrierThreads_.of(channel, atOnce), std::move(work));
                },
                [this](LetterSurroundings::Work work) { runOn(reader_, std::move(work)); },
                [this](LetterSurroundings::Work work) { asio::post(io_, std::move(work)); },
                &now,
                [this] { return settings_.service(); },
                outbox_,
                &Base::localOffset,
                [stop = carriersStop_](Protocol::CarrierSettings const& settings) {
                    return Carriers::makeCarrier(settings, stop);
                },
                [this](std::string const& packId) { runner_.onLettersTaken(packId); },
                [this] { awaitLetters(); },
                [this](LetterSurroundings::Work const& work) { doOnOwnThread(work); },
                history_,
                [this](std::string const& packId) { return runner_.makingContainer(packId); },
                took_,
                [this](std::string const& channel, LetterState state, std::size_t letters) {
                    measures_.noteLetters(channel, state, letters);
                },
                carriersStop_};
    }

    ReceptionSurroundings receptionSurroundings() {
        return {[this](ReceptionSurroundings::Work work) {
                    runOn(storeThread_, [this, work = std::move(work)] {
                        StepTime const time(took_, Step::Storing);
                        work();
                    });
                },
                [this](ReceptionSurroundings::Work work) { asio::post(io_, std::move(work)); },
                &now,
                [this](std::string const& node) { return settings_.service().quotaOf(node); },
                [this](std::string const& node) { return settings_.service().isDisabled(node); },
                [this](ReceptionSurroundings::Work work) {
                    pieces_.expires_after(PIECES_PATIENCE);
                    pieces_.async_wait([work = std::move(work)](boost::system::error_code const& ec) {
                        if (!ec)
                            work();
                    });
                }};
    }

    HealthSources healthSources() {
        return {[this] { Database::Transaction(*opened_.connection, Database::Transaction::ALONE); },
                databaseInWords_,
                data_.path(),
                outbox_,
                [this] { return settings_.service(); },
                [this] { return letterRunner_.list(); },
                server_->certificateEnds(),
                discovery_.has_value(),
                &now,
                [this] {
                    return RegisterState{letterRegister_.hasItsSecret(), letterRegister_.nextEnd()};
                }};
    }

    Measures measures_;
    StepTook took_ = [this](Step step, Measures::Duration took) { measures_.noteStep(step, took); };
    DataFolder data_;
    fs::path outbox_;
    std::string databaseInWords_;
    SharedDatabase opened_;
    SettingsStore store_{*opened_.connection};
    History history_{*opened_.connection, &now};
    SettingsService settings_{store_, &SettingsService::localClock, history_};
    DocumentStore documentStore_{*opened_.connection};
    DocumentService documents_{documentStore_, store_, settings_, &now, history_};
    JobStore jobs_;
    LetterStore letters_{*opened_.connection, jobs_};
    LetterRegister letterRegister_{*opened_.connection};
    LocalPacks localPacks_;
    std::shared_ptr<PackStore> packStore_;
    OwnToken ownToken_;
    TokenStore tokenStore_{*opened_.connection};
    TokenService tokens_{tokenStore_, ownToken_.text, &now, history_};
    Access access_{&steadySeconds};

    asio::io_context io_{1};
    asio::thread_pool worker_{1};
    /// As many as may wait for databases that somebody holds, before others have to wait for them.
    asio::thread_pool reader_{8};
    CarrierThreads carrierThreads_;
    Carriers::StopSign carriersStop_;
    /// For the pack store alone, which is used by one thread.
    asio::thread_pool storeThread_{1};
    HeldQueries held_{io_, jobs_};
    LetterRunner letterRunner_{letters_, jobs_, letterSurroundings()};
    JobRunner runner_{jobs_, surroundings()};
    Retention retention_{jobs_, letterRegister_, outbox_, [this] { return settings_.service(); }, &now};
    PackReception packs_{packStore_, jobs_, receptionSurroundings()};
    std::shared_ptr<Processor> processor_ = std::make_shared<Processor>(ProcessorSurroundings{
        settings_, documents_, tokens_, access_, history_, jobs_, runner_, letterRunner_, packs_,
        letterRegister_, outbox_, &now, [this] { return healthOf(healthSources()); }});

    SystemManager manager_{io_};
    asio::signal_set signals_{io_, SIGTERM, SIGINT};
    asio::steady_timer upkeep_{io_};
    /// For pieces of packs that wait for others.
    asio::steady_timer pieces_{io_};
    /// For the next job that is held and due.
    asio::steady_timer due_{io_};
    /// For the next letter that waits for the clock.
    asio::steady_timer lettersDue_{io_};
    asio::steady_timer hold_{io_};
    asio::steady_timer poll_{io_};
    /// Where services share a database.
    std::optional<Neighbours> neighbours_;
    bool isStopping_ = false;
    std::chrono::steady_clock::time_point lastStatusUpdate_ = std::chrono::steady_clock::now();
    std::chrono::steady_clock::time_point lastSweep_ = std::chrono::steady_clock::now();
    std::chrono::steady_clock::time_point lastEndedSweep_ = std::chrono::steady_clock::now();
    std::optional<Channel::Server> server_;
    std::optional<DiscoveryAnswer> discovery_;
    /// Where somebody may watch the service.
    std::optional<MetricsPage> page_;
    std::unique_ptr<MetricsDoor> metrics_;
};

Service::Service(Options const& options) : impl_(std::make_unique<Impl>(options)) {}
Service::~Service() = default;

std::uint16_t Service::port() const { return impl_->server().port(); }
std::string Service::metricsPlace() const { return impl_->metricsPlace(); }
std::string const& Service::fingerprint() const { return impl_->server().fingerprint(); }
void Service::run() { impl_->run(); }
void Service::stop() { impl_->stopFromAnywhere(); }

} // namespace VlServiced

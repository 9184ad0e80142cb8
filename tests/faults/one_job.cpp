#include "tests/faults/one_job.h"

#include "programs/mailing/pack_database.h"
#include "programs/protocol/job.h"
#include "programs/vlmail/mailings/pack_upload.h"
#include "tests/faults/fork_server.h"
#include "tests/faults/process.h"
#include "tests/vlserviced/json_help.h"
#include "tests/vlserviced/pack_help.h"
#include "tests/vlserviced/service_process.h"
#include "vlservice/ipc/cs_config_ids_list.h"
#include "vlservice/ipc/get_svc_cfg.h"
#include "vlservice/ipc/set_svc_cfg.h"

#include <chrono>
#include <csignal>

namespace Faults {
namespace {

namespace fs = std::filesystem;
using Clock = std::chrono::steady_clock;

constexpr char const* DATABASE = "packs.db";
constexpr char const* PACK = "p1";

/// Empty when the service does not know it.
json::Object jobIn(Channel::Client& client) {
    json::Object const answer = client.call<Ipc::CSConfigIdsList>(json::Object{{"query", "jobs"}})->resp();
    for (json::Value const& job : answer.get("jobs").toArray())
        if (job.toObject().get("id").textOrEmpty() == PACK)
            return job.toObject();
    return {};
}

std::string stateOfJob(Channel::Client& client) { return jobIn(client).get("state").textOrEmpty(); }

/// Asks until the job is handed over or the time is up.
bool isSubmitted(Channel::Client& client, std::chrono::seconds limit) {
    for (auto const end = Clock::now() + limit; Clock::now() < end;)
        if (stateOfJob(client) == "submitted")
            return true;
    return false;
}

/// Asks until the job is handed over or something is in its way, or the time is up.
void awaitStandstill(Channel::Client& client, std::chrono::seconds limit) {
    for (auto const end = Clock::now() + limit; Clock::now() < end;)
        if (json::Object const job = jobIn(client);
            job.get("state").textOrEmpty() == "submitted" || !job.get("problem").textOrEmpty().empty())
            return;
}

void handOn(Channel::Client& client) {
    client.call<Ipc::CSConfigIdsList>(Protocol::JobsChange(Protocol::JobAction::Upload, {PACK}).serialize());
}

/// Begins the service without linking it again.
class Forked : public ServiceProcess::Starter {
public:
    explicit Forked(fs::path folder) : folder_(std::move(folder)) {}

    pid_t start(std::vector<std::string> const& arguments, ServiceProcess::Environment const& more, int out,
                int err) override {
        process_ = server_.start({folder_, more, arguments, out, err});
        return process_;
    }
    int wait() override {
        return awaitEndOrKill(server_, process_, std::chrono::minutes(2)).value_or(SIGKILL);
    }

private:
    ForkServer& server_ = ForkServer::of(VLSERVICED_PROGRAM);
    fs::path folder_;
    pid_t process_ = -1;
};

/// Made once: storing it takes its time.
fs::path packDatabase() {
    static TemporaryFolder const folder;
    static bool const stored = [] {
        storePack(folder / DATABASE, PACK);
        return true;
    }();
    return stored ? folder / DATABASE : fs::path();
}

} // namespace

OneJob::OneJob() { fs::create_directories(folder_); }

long OneJob::callsOf(std::string const& call) {
    prepare();
    runWith({call, 1, 0, false});
    return callsIn(counter_);
}

std::vector<std::string> OneJob::run(Fault const& fault) {
    prepare();
    runWith(fault);
    takeMailings();
    finish();
    return std::exchange(findings_, {});
}

void OneJob::prepare() {
    fs::remove_all(folder_);
    fs::create_directories(upload_);
    fs::create_directories(taken_);
    acknowledged_.clear();
    findings_.clear();
}

void OneJob::runWith(Fault const& fault) {
    Forked forked(folder_);
    ServiceProcess service(arguments(), environmentOf(fault, counter_), &forked);
    if (service.port() != 0) {
        send(service);
        service.signal(SIGTERM);
    }
    int const status = service.wait();
    if (status < 0 && !fault.kills())
        find("the service dies of signal " + std::to_string(-status) + ": " + service.errors());
    if (status > 0 && !service.errors().starts_with("vlserviced: "))
        find("the service ends without a line that says why: " + service.errors());
}

void OneJob::send(ServiceProcess const& service) {
    try {
        auto const client = clientOf(service, data_);
        client->call<Ipc::SetSvcCfg>(json::Object{{"upload_folder", upload_.string()}});
        acknowledged_.insert("the upload folder");
        bring(service);
        acknowledged_.insert(PACK);
        handOn(*client);
        // What failed is tried again later; the next start has to bring it to its end.
        awaitStandstill(*client, std::chrono::seconds(2));
    } catch (std::exception const&) {
        // It was killed, or has told its failure: nothing is acknowledged then.
    }
}

/// Its pages, over a connection of their own.
void OneJob::bring(ServiceProcess const& service) {
    VlMail::ServiceLine line([&] { return clientOf(service, data_); }, {.time = {}, .pause = {}});
    Mailing::PackDatabaseReader pack(packDatabase(), PACK);
    VlMail::uploadPack(line, pack);
}

void OneJob::requireAcknowledged(Channel::Client& client) {
    if (acknowledged_.contains("the upload folder") &&
        !client.call<Ipc::GetSvcCfg>()->resp().get("upload_folder"))
        find("a setting that was acknowledged is lost");
    if (acknowledged_.contains(PACK) && stateOfJob(client).empty())
        find("a mailing that was acknowledged is lost");
}

void OneJob::takeMailings() {
    std::vector<fs::path> there;
    for (fs::directory_entry const& entry : fs::directory_iterator(upload_))
        if (!entry.path().filename().string().starts_with('.'))
            there.push_back(entry.path());
    for (fs::path const& mailing : there) {
        fs::path const target = taken_ / mailing.filename();
        if (fs::exists(target))
            find("the mailing is handed on twice");
        fs::rename(mailing, target);
    }
}

void OneJob::finish() {
    Forked forked(folder_);
    ServiceProcess service(arguments(), {}, &forked);
    if (service.port() == 0) {
        service.wait();
        return find("the service does not start again: " + service.errors());
    }
    try {
        auto const client = clientOf(service, data_);
        requireAcknowledged(*client);
        client->call<Ipc::SetSvcCfg>(json::Object{{"upload_folder", upload_.string()}});
        bring(service);
        handOn(*client);
        if (!isSubmitted(*client, std::chrono::seconds(30)))
            find("the mailing is \"" + stateOfJob(*client) + "\" for good");
    } catch (std::exception const& failure) {
        find(std::string("a command fails though no call does: ") + failure.what());
    }
    service.signal(SIGTERM);
    service.wait();
    takeMailings();
    if (contentOf(taken_ / (PACK + std::string(".mailing"))) != contentOfPack(PACK))
        find("what arrived is not what was sent: " + contentOf(taken_ / (PACK + std::string(".mailing"))));
}

} // namespace Faults

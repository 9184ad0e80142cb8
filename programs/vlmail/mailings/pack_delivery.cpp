#include "programs/vlmail/mailings/pack_delivery.h"

#include "programs/base/error.h"
#include "programs/mailing/metadata.h"
#include "programs/mailing/page_blob.h"
#include "programs/vlmail/service/service_client.h"

#include <algorithm>
#include <chrono>
#include <ctime>
#include <map>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

/// For a job that is only waiting for its turn; it goes on without us.
constexpr std::chrono::seconds PATIENCE{10};

bool isOverConnection(Protocol::JobReport const& job) { return job.folder == Protocol::OVER_CONNECTION; }

/// Whether the service needs the client's pages no more.
bool isFetched(Protocol::JobReport const& job) {
    if (job.state == Protocol::JobState::Failed)
        return false;
    return isOverConnection(job) || job.state != Protocol::JobState::Accepted;
}

/// The letters are on their way, whatever becomes of their copy: what cannot be erased is erased another
/// time.
void eraseFetched(fs::path const& database, std::string const& packId) {
    try {
        Mailing::removePack(database, packId);
    } catch (Database::DatabaseError const&) {
        // The next mailing settles it.
    }
}

using Jobs = std::map<std::string, Protocol::JobReport>;

/// The service's jobs of these packs.
Jobs jobsOf(Channel::Client& service, std::vector<Mailing::StoredPack> const& packs) {
    constexpr std::size_t AT_ONCE = Protocol::JobsQuery::MAX_JOBS;
    Jobs jobs;
    for (std::size_t from = 0; from < packs.size(); from += AT_ONCE) {
        Protocol::JobsQuery query;
        for (std::size_t i = from; i < std::min(from + AT_ONCE, packs.size()); ++i)
            query.ids.push_back(packs[i].info.id);
        for (Protocol::JobReport& job : Protocol::JobsAnswer(ask(service, query)).jobs)
            jobs.emplace(job.id, std::move(job));
    }
    return jobs;
}

/// Has one job handed on.
void wantUpload(Channel::Client& service, std::string const& packId) {
    Protocol::JobsChangeAnswer const answer(
        ask(service, Protocol::JobsChange(Protocol::JobAction::Upload, {packId})));
    for (Protocol::JobRefusal const& refused : answer.refused)
        throw Base::errorSaid(refused.why, Base::Code::StateRefused);
}

Protocol::JobReport awaitDelivery(ServiceLine& service, std::string const& packId) {
    Protocol::JobReport job =
        service.repeat([&](Channel::Client& client) { return awaitJob(client, packId, PATIENCE); });
    // What it has of ours, it goes on with by itself.
    bool const isStuck = !job.problem.empty() && !isOverConnection(job);
    if (isStuck || job.state == Protocol::JobState::Failed)
        throw Base::Error(Base::Code::ServiceTrouble, "the service has trouble with it: " + job.problem);
    return job;
}

Protocol::JobReport deliverOverConnection(ServiceLine& service, Mailing::PackSource& pack, bool upload,
                                          UploadWatcher const& watcher, LeftOutWatcher const& leftOut) {
    CarefulUpload(service, pack, watcher, leftOut).send();
    if (upload)
        service.repeat([&](Channel::Client& client) { wantUpload(client, pack.packId()); });
    return awaitDelivery(service, pack.packId());
}

Protocol::JobReport deliver(ServiceLine& service, fs::path const& database, std::string const& packId,
                            bool upload, UploadWatcher const& watcher, LeftOutWatcher const& leftOut) {
    if (service.client().takesData()) {
        Mailing::OwnPackReader pack(database, packId);
        return deliverOverConnection(service, pack, upload, watcher, leftOut);
    }
    service.repeat([&](Channel::Client& client) { sendPack(client, database, packId, upload); });
    return awaitDelivery(service, packId);
}

/// Carries out a delivery, whose failures name the mailing and what can be done with it.
template<typename Delivery>
Protocol::JobReport orNamed(std::string const& packId, std::string const& remedy, Delivery delivery) {
    try {
        return delivery();
    } catch (NothingToSend const&) {
        throw;
    } catch (std::exception const& failure) {
        throw Base::Error(Base::codeOf(failure), "mailing " + packId + ": " + failure.what() + remedy);
    }
}

/// The pages and the metadata of two packs, less what is new each time.
bool isSame(Mailing::PackSource& a, Mailing::PackSource& b) {
    if (a.info().cfgId != b.info().cfgId || a.info().title != b.info().title || a.pages() != b.pages())
        return false;
    if (!Mailing::isSameMailing(a.metadata(), b.metadata()))
        return false;
    return std::all_of(a.pages().begin(), a.pages().end(), [&](Mailing::PackSource::PageName const& name) {
        return Mailing::viewOf(pageOf(a, name)) == Mailing::viewOf(pageOf(b, name));
    });
}

} // namespace

Protocol::JobReport deliverPack(ServiceLine& service, fs::path const& database, std::string const& packId,
                                bool upload, UploadWatcher const& watcher, LeftOutWatcher const& leftOut) {
    std::string const remedy =
        "; \"vlmail status " + packId + "\" tells what the service knows of it, \"vlmail resume " + packId +
        "\" sends it again, never twice, and \"vlmail discard " + packId + "\" erases it";
    Protocol::JobReport job =
        orNamed(packId, remedy, [&] { return deliver(service, database, packId, upload, watcher, leftOut); });
    if (isFetched(job))
        eraseFetched(database, packId);
    return job;
}

Protocol::JobReport deliverPack(ServiceLine& service, Mailing::PackSource& pack, bool upload,
                                UploadWatcher const& watcher, LeftOutWatcher const& leftOut) {
    if (!service.client().takesData())
        throw Base::Error(Base::Code::ServiceOutdated,
                          "the service takes no pages over the connection: bring it up to date");
    return orNamed(pack.packId(), "; sending it again goes on where it was, and never sends it twice",
                   [&] { return deliverOverConnection(service, pack, upload, watcher, leftOut); });
}

std::optional<std::string> samePackLeftBehind(fs::path const& database, std::string const& packId) {
    Mailing::OwnPackReader pack(database, packId, Mailing::OwnPackReader::Sees::Unfinished);
    for (Mailing::StoredPack const& other : Mailing::finishedPacks(database)) {
        Mailing::OwnPackReader left(database, other.info.id);
        if (isSame(left, pack))
            return other.info.id;
    }
    return std::nullopt;
}

std::vector<Mailing::StoredPack> settlePacks(Channel::Client& service, fs::path const& database,
                                             long long olderThan) {
    std::vector<Mailing::StoredPack> stranded;
    std::vector<Mailing::StoredPack> const packs = Mailing::finishedPacks(database);
    Jobs const jobs = jobsOf(service, packs);
    for (Mailing::StoredPack const& pack : packs) {
        auto const job = jobs.find(pack.info.id);
        if (job == jobs.end())
            stranded.push_back(pack);
        else if (isFetched(job->second) && pack.created < std::time(nullptr) - olderThan)
            eraseFetched(database, pack.info.id);
    }
    return stranded;
}

void discardPack(Channel::Client& service, fs::path const& database, std::string const& packId) {
    std::vector<Mailing::StoredPack> packs = Mailing::finishedPacks(database);
    std::erase_if(packs, [&](Mailing::StoredPack const& pack) { return pack.info.id != packId; });
    if (packs.empty())
        throw Base::Error(Base::Code::MailingUnknown,
                          "the pack database " + database.string() + " has no mailing " + packId +
                              "; \"vlmail status --stranded\" lists those that it has");
    Jobs const jobs = jobsOf(service, packs);
    if (!jobs.empty() && jobs.begin()->second.state == Protocol::JobState::Accepted)
        throw Base::Error(Base::Code::StateRefused,
                          (isOverConnection(jobs.begin()->second)
                               ? "the service has mailing "
                               : "the service is about to fetch mailing ") +
                              packId + " and its letters will go out: it cannot be discarded");
    Mailing::removePack(database, packId);
}

} // namespace VlMail

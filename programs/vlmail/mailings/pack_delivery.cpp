#include "programs/vlmail/mailings/pack_delivery.h"

#include "programs/base/error.h"
#include "programs/vlmail/service/service_client.h"

#include <algorithm>
#include <chrono>
#include <map>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

/// For a job that is only waiting for its turn; it goes on without us.
constexpr std::chrono::seconds PATIENCE{10};

bool isFetched(Protocol::JobReport const& job) {
    return job.state != Protocol::JobState::Accepted && job.state != Protocol::JobState::Failed;
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

Protocol::JobReport deliver(ServiceLine& service, fs::path const& database, std::string const& packId,
                            bool upload) {
    service.repeat([&](Channel::Client& client) { sendPack(client, database, packId, upload); });
    Protocol::JobReport job =
        service.repeat([&](Channel::Client& client) { return awaitJob(client, packId, PATIENCE); });
    if (!job.problem.empty())
        throw Base::Error("the service has trouble with it: " + job.problem);
    return job;
}

} // namespace

Protocol::JobReport deliverPack(ServiceLine& service, fs::path const& database, std::string const& packId,
                                bool upload) {
    try {
        Protocol::JobReport job = deliver(service, database, packId, upload);
        if (isFetched(job))
            eraseFetched(database, packId);
        return job;
    } catch (std::exception const& failure) {
        throw Base::Error("mailing " + packId + ": " + failure.what() + "; \"vlmail status " + packId +
                          "\" tells what the service knows of it, \"vlmail resume " + packId +
                          "\" sends it again, never twice, and \"vlmail discard " + packId + "\" erases it");
    }
}

std::vector<Mailing::StoredPack> settlePacks(Channel::Client& service, fs::path const& database) {
    std::vector<Mailing::StoredPack> stranded;
    std::vector<Mailing::StoredPack> const packs = Mailing::finishedPacks(database);
    Jobs const jobs = jobsOf(service, packs);
    for (Mailing::StoredPack const& pack : packs) {
        auto const job = jobs.find(pack.info.id);
        if (job == jobs.end())
            stranded.push_back(pack);
        else if (isFetched(job->second))
            eraseFetched(database, pack.info.id);
    }
    return stranded;
}

void discardPack(Channel::Client& service, fs::path const& database, std::string const& packId) {
    std::vector<Mailing::StoredPack> packs = Mailing::finishedPacks(database);
    std::erase_if(packs, [&](Mailing::StoredPack const& pack) { return pack.info.id != packId; });
    if (packs.empty())
        throw Base::Error("the pack database " + database.string() + " has no mailing " + packId +
                          "; \"vlmail status --stranded\" lists those that it has");
    Jobs const jobs = jobsOf(service, packs);
    if (!jobs.empty() && jobs.begin()->second.state == Protocol::JobState::Accepted)
        throw Base::Error("the service is about to fetch mailing " + packId +
                          " and its letters will go out: it cannot be discarded");
    Mailing::removePack(database, packId);
}

} // namespace VlMail

#include "programs/vlserviced/health.h"

#include "programs/base/plain_text.h"
#include "programs/vlserviced/settings/upload_folder.h"
#include "vlservice/platform/local_time.h"

#include <array>
#include <cstdint>
#include <exception>
#include <string>
#include <utility>

namespace VlServiced {
namespace {

namespace fs = std::filesystem;
using Protocol::HealthCheck;
using Protocol::HealthState;

/// A mailing takes some megabytes, and the database asks for as much again while it is tidied.
constexpr std::uintmax_t LITTLE_ROOM = std::uintmax_t{1} << 30;
constexpr std::uintmax_t NO_ROOM = std::uintmax_t{100} << 20;
constexpr long long DAY = 86'400;
/// Time for a person to get a new certificate.
constexpr long long SOON = 30 * DAY;

/// What is looked at does not stop the rest when it fails.
template<typename Look>
HealthCheck looked(std::string const& name, std::string const& remedy, Look look) {
    try {
        return look();
    } catch (std::exception const& failure) {
        return {name, HealthState::Bad, Base::oneLine(failure.what()), remedy};
    }
}

HealthCheck databaseCheck(HealthSources const& sources) {
    return looked("database", "see that it has room, rights and a server; the service goes on by itself",
                  [&] {
                      sources.tryDatabase();
                      return HealthCheck::well("database", sources.database + " takes changes");
                  });
}

std::string inMiB(std::uintmax_t bytes) { return std::to_string(bytes >> 20) + " MiB"; }

HealthCheck roomIn(char const* name, fs::path const& folder) {
    return looked(name, "make the folder, and see that the service's account may use it", [&] {
        std::uintmax_t const room = fs::space(folder).available;
        std::string const says = inMiB(room) + " left in " + folder.string();
        if (room >= LITTLE_ROOM)
            return HealthCheck::well(name, says);
        return HealthCheck(name, room < NO_ROOM ? HealthState::Bad : HealthState::Doubtful, says,
                           "free some room there, or put the folder on a larger disk");
    });
}

/// Without one, and without carriers, mailings end in the outbox.
HealthCheck uploadFolderCheck(HealthSources const& sources, ServiceSettings const& settings) {
    std::string const folder = settings.uploadFolder();
    if (folder.empty() && settings.carriers().empty())
        return {"upload folder", HealthState::Doubtful,
                "none is set and there are no carriers: mailings stay in " + sources.outbox.string(),
                "\"vlmail settings service upload_folder=PATH\" sets one, \"carriers=FILE\" carriers"};
    if (folder.empty())
        return HealthCheck::well("upload folder", "none is set; letters go by carriers");
    return looked("upload folder",
                  "mount the share again, or set the folder once more; mailings wait meanwhile", [&] {
                      UploadFolder const known(folder, settings.uploadFolderIdentity());
                      return HealthCheck::well("upload folder", folder + " is the one that was set");
                  });
}

HealthCheck suspensionCheck(ServiceSettings const& settings) {
    bool const jobs = settings.isSuspended(Protocol::Suspended::Jobs);
    bool const changes = settings.isSuspended(Protocol::Suspended::SettingsChanges);
    if (!jobs && !changes)
        return HealthCheck::well("suspended", "nothing is held back");
    return {"suspended", HealthState::Doubtful,
            jobs ? "mailings are accepted and wait" : "settings can be read and not changed",
            "\"vlmail settings suspend nothing\" lets all go on"};
}

HealthCheck carrierCheck(Protocol::CarrierReport const& carrier) {
    std::string const name = "carrier " + carrier.channel;
    std::string const waiting = std::to_string(carrier.waiting) + " waiting";
    if (carrier.state == "failing")
        return {name, HealthState::Bad, waiting + ": " + carrier.says,
                "\"vlmail carriers test " + carrier.channel + "\" tries it without sending"};
    if (carrier.state == "paused")
        return {name, HealthState::Doubtful, "is paused, " + waiting,
                "\"vlmail carriers resume " + carrier.channel + "\" lets it go on"};
    if (carrier.uncertain > 0)
        return {name, HealthState::Doubtful,
                std::to_string(carrier.uncertain) + " letters may have been taken or not",
                "find out at the other side, then \"vlmail settle\" or \"vlmail resend\" each"};
    return HealthCheck::well(name, carrier.type + ", " + waiting);
}

HealthCheck certificateCheck(std::optional<long long> const& ends, long long now) {
    if (!ends)
        return HealthCheck::well("certificate", "none is needed: the service listens on this machine alone");
    std::string const until = LocalTime::toText(*ends);
    if (*ends - now > SOON)
        return HealthCheck::well("certificate", "holds until " + until);
    bool const isOver = *ends <= now;
    return {"certificate", isOver ? HealthState::Bad : HealthState::Doubtful,
            (isOver ? "has ended on " : "ends on ") + until,
            "put a new one under the names given with --certificate and --key, and start the service again"};
}

/// Another secret makes all letters new ones; what is past is no harm but room that is lost.
HealthCheck registerCheck(HealthSources const& sources, long long now) {
    constexpr char const* NAME = "sent letters";
    return looked(NAME, "see that the database answers; until then no mailing is accepted", [&] {
        RegisterState const state = sources.letterRegister();
        if (!state.hasItsSecret)
            return HealthCheck(NAME, HealthState::Bad,
                               "the database has another secret: letters that were sent are not known again",
                               "start the service again, as the database was changed under it");
        if (!state.nextEnd)
            return HealthCheck::well(NAME, "none are known");
        if (*state.nextEnd > now - DAY)
            return HealthCheck::well(NAME,
                                     "are known again, the next until " + LocalTime::toText(*state.nextEnd));
        return HealthCheck(NAME, HealthState::Doubtful,
                           "some should have been forgotten by " + LocalTime::toText(*state.nextEnd),
                           "the log says why they cannot be removed; the service looks each hour");
    });
}

HealthCheck discoveryCheck(bool isAnswered) {
    if (isAnswered)
        return HealthCheck::well("discovery", "the service answers clients that look for it");
    return HealthCheck::well("discovery", "is switched off: clients name the service with --service");
}

} // namespace

Protocol::HealthAnswer healthOf(HealthSources const& sources) {
    Protocol::HealthAnswer answer;
    answer.now = sources.now();
    ServiceSettings const settings = sources.settings();
    answer.checks = {databaseCheck(sources),
                     roomIn("data disk", sources.data),
                     roomIn("outbox disk", sources.outbox),
                     uploadFolderCheck(sources, settings),
                     suspensionCheck(settings),
                     certificateCheck(sources.certificateEnds, answer.now),
                     discoveryCheck(sources.answersDiscovery),
                     registerCheck(sources, answer.now)};
    for (Protocol::CarrierReport const& carrier : sources.carriers().carriers)
        answer.checks.push_back(carrierCheck(carrier));
    return answer;
}

} // namespace VlServiced

// Measures what holding a mailing against the settings of its node adds to accepting it as a job, with its
// letters in the register and a line in the history, for mailings of 20 and of 200 letters. Decides whether
// the service looks into each mailing when it accepts it, or later. What counts is the ratio of accepting to
// accepting less what the policies take, which has to stay below 1.05. The outline of the metadata is read
// whether there are policies or not, since it has the letters' digests and when the mailing is to go; how
// much that is is told beside it.
#include "programs/base/digest.h"
#include "programs/mailing/pack_database.h"
#include "programs/vlserviced/jobs/job_runner.h"
#include "programs/vlserviced/settings/settings_service.h"
#include "programs/vlserviced/store/history.h"
#include "programs/vlserviced/store/letter_register.h"
#include "programs/vlserviced/store/schema.h"

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

namespace {

namespace fs = std::filesystem;
using Clock = std::chrono::steady_clock;
using VlServiced::JobRunner;
using VlServiced::JobSurroundings;

constexpr int ROUNDS = 60;
constexpr long long NOW = 1'795'000'000;

double microseconds(Clock::duration time) { return std::chrono::duration<double, std::micro>(time).count(); }

double median(std::vector<double> times) {
    std::nth_element(times.begin(), times.begin() + static_cast<std::ptrdiff_t>(times.size() / 2),
                     times.end());
    return times[times.size() / 2];
}

/// As vlmail writes it: three pages and five fields a letter.
std::string metadataText(std::string const& id, int letters) {
    std::string text =
        R"({"pack_preset":"Bills","title":"Bills of March","duplex":true,"process_mode":1,"production":{"duplicate_days":90},"delay":{"week_days":[1,2,3,4,5],"mins":[480]},"id":")" +
        id + R"(","created":1795000000,"letters":[)";
    for (int letter = 0; letter < letters; ++letter) {
        std::string const number = std::to_string(letter);
        text +=
            (letter == 0 ? "" : ",") + (R"({"documents":[{"name":"invoice )" + number) +
            R"(.pdf","pages":[1,2,3],"role":"letter"}],"fields":[{"name":"postal","value":"Ada Lovelace\n12 St James's Square\nLondon SW1Y 4LB","priority":1,"send_to_server":true},)"
            R"({"name":"number","value":)" +
            number +
            R"(},{"name":"total","value":119.5},{"name":"date","value":1707091200,"type":1},{"name":"reference","value":"2024-)" +
            number + R"("}],"sheets":2,"coloured_pages":0,"digests":[")" +
            Base::sha256(id + " letter " + number) + R"("]})";
    }
    return text + R"(],"made_ready":true,"entries_digest":")" + std::string(64, 'a') + "\"}";
}

void storePack(fs::path const& file, std::string const& id, int letters) {
    Mailing::PackDatabaseWriter pack(file, {id, "u=bob/ou=sales/a=acme", "Bills of March"});
    std::string const page(20'000, 'p');
    for (int letter = 0; letter < letters; ++letter)
        for (char const* const number : {"1", "2", "3"})
            pack.savePage("invoice " + std::to_string(letter) + ".pdf", number,
                          PageSaverI::zipDbData(page.data(), page.size()));
    std::string const metadata = metadataText(id, letters);
    pack.finish(PageSaverI::zipDbData(metadata.data(), metadata.size()));
}

/// A service's part for jobs. What it is given to make is not made.
class Service {
public:
    explicit Service(fs::path folder) : folder_(std::move(folder)) {
        settings_.setPart("a=acme", "app", json::Object{{"max_letter_sheets", 20}, {"enforce_po", true}});
        settings_.setPart("", "po", json::Object{{"code", "P-1"}});
    }

    void accept(std::string const& id) {
        runner_.accept(
            {folder_.string(), "packs.db", id}, [](std::string const&) {},
            [&](std::string const& failure) {
                if (!failure.empty())
                    std::printf("refused: %s\n", failure.c_str()), std::exit(1);
            });
    }
    /// What the register and the history want to know of it as well.
    static VlServiced::PackSummary outline(Mailing::PackDatabaseReader& pack) {
        VlServiced::PackSummary summary;
        summary.cfgId = pack.info().cfgId;
        VlServiced::addOutline(summary, pack);
        return summary;
    }
    /// What of it the policies take.
    void decide(VlServiced::PackSummary const& summary) {
        Policy::Moment const moment{NOW, &Base::localOffset};
        VlServiced::requireAllowed("", summary, settings_.rules(summary.cfgId), moment,
                                   [](std::string const&) { return std::string(); });
        if (VlServiced::jobFor({}, summary, moment).due == 0)
            std::exit(1);
    }

private:
    JobSurroundings surroundings() {
        using Work = JobSurroundings::Work;
        JobSurroundings made{[](Work const&) {},
                             [](Work const& work) { work(); },
                             [](Work const& work) { work(); },
                             [] { return NOW; },
                             [this] { return settings_.service(); },
                             folder_,
                             [this](std::string const& node) { return settings_.rules(node); }};
        made.recorder = history_;
        made.letterRegister = &letterRegister_;
        return made;
    }

    fs::path folder_;
    std::unique_ptr<Database::Connection> database_ = VlServiced::openServiceDatabase(folder_ / "service.db");
    VlServiced::SettingsStore store_{*database_};
    VlServiced::SettingsService settings_{store_};
    VlServiced::JobStore jobs_{*database_};
    VlServiced::LetterRegister letterRegister_{*database_};
    VlServiced::History history_{*database_, [] { return NOW; }};
    JobRunner runner_{jobs_, surroundings()};
};

double ratioOf(fs::path const& folder, int letters) {
    Service service(folder);
    std::vector<double> accepting;
    std::vector<double> reading;
    std::vector<double> deciding;
    for (int round = 0; round < ROUNDS; ++round) {
        std::string const id = std::to_string(letters) + '-' + std::to_string(round);
        storePack(folder / "packs.db", id, letters);
        auto const begin = Clock::now();
        service.accept(id);
        auto const accepted = Clock::now();
        Mailing::PackDatabaseReader pack(folder / "packs.db", id);
        auto const opened = Clock::now();
        VlServiced::PackSummary const summary = Service::outline(pack);
        auto const read = Clock::now();
        service.decide(summary);
        accepting.push_back(microseconds(accepted - begin));
        reading.push_back(microseconds(read - opened));
        deciding.push_back(microseconds(Clock::now() - read));
    }
    double const all = median(accepting);
    double const ratio = all / (all - median(deciding));
    std::printf("%4d letters: accepting %7.0f us, of it the outline %6.0f us, policies %6.0f us, ratio %.3f; "
                "with the outline %.3f\n",
                letters, all, median(reading), median(deciding), ratio,
                all / (all - median(deciding) - median(reading)));
    return ratio;
}

} // namespace

int main() {
    std::string name = (fs::temp_directory_path() / "vlservice.bench.XXXXXX").string();
    fs::path const folder = ::mkdtemp(name.data());
    double const worst = std::max(ratioOf(folder, 20), ratioOf(folder, 200));
    fs::remove_all(folder);
    return worst < 1.05 ? 0 : 1;
}

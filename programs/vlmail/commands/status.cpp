// vlmail status: how far the service has brought the mailings.
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/mailings/pack_delivery.h"
#include "programs/vlmail/service/service_client.h"
#include "programs/vlmail/terminal/text_table.h"
#include "vlservice/ipc/update_status.h"
#include "vlservice/json/json_text.h"
#include "vlservice/platform/local_time.h"

#include <algorithm>
#include <filesystem>
#include <memory>
#include <ostream>

namespace VlMail {
namespace {

struct Options {
    ServiceOptions service;
    std::vector<std::string> packs;
    PackDatabaseOptions database;
    bool update = false;
    bool stranded = false;
    bool json = false;
};

/// What keeps a job from going on, what should not take so long, and until when it is held.
std::string noteOn(Protocol::JobReport const& job) {
    std::string note = job.due > 0 ? "until " + LocalTime::toText(job.due) : std::string();
    for (std::string const& more : {job.problem, job.alarm})
        note += (note.empty() || more.empty() ? "" : "; ") + more;
    return note;
}

void print(std::ostream& out, std::vector<Protocol::JobReport> const& jobs) {
    constexpr auto RIGHT = TextTable::Align::Right;
    TextTable table(
        {{"mailing"}, {"state"}, {"since"}, {"documents", RIGHT}, {"pages", RIGHT}, {"title"}, {"note"}});
    for (Protocol::JobReport const& job : jobs)
        table.addRow({job.id, Protocol::stateName(job.state), LocalTime::toText(job.changed),
                      std::to_string(job.documents), std::to_string(job.pages), job.title, noteOn(job)});
    if (table.empty())
        out << "the service has no such mailings\n";
    else
        table.print(out);
}

/// By which channels it failed before, whether it left its mailing's file, and what its carrier says.
std::string noteOn(Protocol::LetterReport const& letter) {
    std::string note;
    for (std::string const& channel : letter.tried)
        if (channel != letter.channel)
            note += (note.empty() ? "failed by " : ", ") + channel;
    if (std::ranges::find(letter.tried, letter.channel) != letter.tried.end())
        note += std::string(note.empty() ? "" : "; ") + "goes by itself";
    return note + (note.empty() || letter.says.empty() ? "" : "; ") + letter.says;
}

/// Of jobs whose letters go by carriers, or some of them do.
void printLetters(std::ostream& out, std::vector<Protocol::JobReport> const& jobs) {
    TextTable table(
        {{"mailing"}, {"letter", TextTable::Align::Right}, {"channel"}, {"state"}, {"since"}, {"note"}});
    for (Protocol::JobReport const& job : jobs)
        for (Protocol::LetterReport const& letter : job.letters)
            table.addRow({job.id, std::to_string(letter.number), letter.channel,
                          Protocol::letterStateName(letter.state), LocalTime::toText(letter.changed),
                          noteOn(letter)});
    if (table.empty())
        return;
    out << '\n';
    table.print(out);
    for (Protocol::JobReport const& job : jobs)
        if (job.lettersLeftOut > 0)
            out << job.lettersLeftOut << " more letters of mailing " << job.id << " are not shown\n";
}

/// E-mails that tell of mailings, or of their letters.
void printNotices(std::ostream& out, std::vector<Protocol::JobReport> const& jobs) {
    TextTable table({{"mailing"}, {"notice"}, {"of"}, {"state"}, {"since"}, {"note"}});
    for (Protocol::JobReport const& job : jobs)
        for (Protocol::NoticeReport const& notice : job.notices)
            table.addRow({job.id, 'n' + std::to_string(notice.number),
                          notice.letter == 0 ? "the mailing" : "letter " + std::to_string(notice.letter),
                          Protocol::letterStateName(notice.state), LocalTime::toText(notice.changed),
                          notice.says});
    if (table.empty())
        return;
    out << '\n';
    table.print(out);
    for (Protocol::JobReport const& job : jobs)
        if (job.noticesLeftOut > 0)
            out << job.noticesLeftOut << " more notices of mailing " << job.id << " are not shown\n";
}

bool anyFailed(std::vector<Protocol::JobReport> const& jobs) {
    return std::ranges::any_of(
        jobs, [](Protocol::JobReport const& job) { return job.state == Protocol::JobState::Failed; });
}

/// The packs that wait in the pack database and that the service knows nothing of.
int showStranded(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    std::vector<Mailing::StoredPack> const packs =
        settlePacks(*service, databaseFor(options.database, *service));
    constexpr auto RIGHT = TextTable::Align::Right;
    TextTable table({{"mailing"}, {"since"}, {"pages", RIGHT}, {"title"}});
    json::Array list;
    for (auto const& [info, created, pages] : packs) {
        table.addRow({info.id, LocalTime::toText(created), std::to_string(pages), info.title});
        list.append(json::Object{{"id", info.id},
                                 {"title", info.title},
                                 {"cfg_id", info.cfgId},
                                 {"created", created},
                                 {"pages", pages}});
    }
    if (options.json)
        terminal.out << json::Object{{"stranded", list}} << '\n';
    else if (packs.empty())
        terminal.out << "no mailing is stranded\n";
    else
        table.print(terminal.out);
    return packs.empty() ? FINE : INCOMPLETE;
}

int showStatus(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    std::filesystem::path const database = options.database.file.empty()
                                               ? std::filesystem::path()
                                               : std::filesystem::absolute(options.database.file);
    Protocol::JobsQuery query;
    query.folder = database.parent_path().string();
    query.database = database.filename().string();
    query.ids = options.packs;
    // Of all mailings they are more than a person looks at.
    query.letters = options.json || !options.packs.empty();
    if (options.update)
        service->call<Ipc::UpdateStatus>(query.folder, query.database);
    json::Object const answer = ask(*service, query);
    std::vector<Protocol::JobReport> const jobs = Protocol::JobsAnswer(answer).jobs;
    if (options.json)
        terminal.out << answer << '\n';
    else {
        print(terminal.out, jobs);
        printLetters(terminal.out, jobs);
        printNotices(terminal.out, jobs);
    }
    return anyFailed(jobs) ? INCOMPLETE : FINE;
}

} // namespace

void addStatusCommand(Base::Command const& app, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const status =
        app.addCommand("status", "Shows how far the service has brought the mailings");
    status.addOption("MAILING", options->packs, "Ids of mailings [all]");
    status.addOption("--database", options->database.file, "Only mailings from this pack database")
        .valueName("FILE");
    status.addFlag("--stranded", options->stranded,
                   "Mailings in the pack database that the service has no job of");
    status.addOption("--node", options->database.node, "The node whose pack database --stranded looks into")
        .showDefault();
    status.addFlag("--update", options->update, "Have the service look first at what the carrier has done");
    status.addFlag("--json", options->json, "The service's answer as one JSON object");
    addServiceOptions(status, options->service);
    status.whenNamed([=, &task] {
        task = [=](Terminal const& terminal) {
            return options->stranded ? showStranded(*options, terminal) : showStatus(*options, terminal);
        };
    });
}

} // namespace VlMail

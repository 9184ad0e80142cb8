// vlmail mail and plan: the whole road from documents to mailings, in one go or decided first and carried out
// later.
#include "programs/base/local_offset.h"
#include "programs/base/pending_file.h"
#include "programs/vlmail/commands/batch_command.h"
#include "programs/vlmail/commands/batch_sources.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/letters/batch.h"
#include "programs/vlmail/letters/making_ready.h"
#include "programs/vlmail/letters/node_settings.h"
#include "programs/vlmail/mailings/dispatch.h"
#include "programs/vlmail/mailings/pack_delivery.h"
#include "programs/vlmail/mailings/plan.h"
#include "programs/vlmail/mailings/price.h"
#include "programs/vlmail/service/service_client.h"
#include "programs/vlmail/service/service_documents.h"
#include "vlservice/json/json_text.h"

#include <ctime>
#include <filesystem>
#include <memory>
#include <optional>
#include <ostream>
#include <utility>

namespace VlMail {
namespace {

struct Options {
    std::vector<std::string> files;
    SourceOptions sources;
    std::string plan;
    std::string output;
    bool send = false;
    bool upload = false;
    bool price = false;
    bool json = false;
    WorkerOptions reading;
    std::size_t checkEvery = 1;
    bool acceptJoined = false;
    std::string again;

    Along::Joins joins() const { return acceptJoined ? Along::Joins::Accept : Along::Joins::Doubt; }
};

int report(Dispatch const& dispatch, Options const& options, Terminal const& terminal) {
    if (options.json)
        terminal.out << dispatch.toJson() << '\n';
    else
        dispatch.print();
    return exitStatusOf(dispatch.end());
}

/// Where the mailings go, by the options.
BeginMailing destinationOf(Options const& options, BatchSources& sources) {
    return options.send ? mailingsToService(*sources.service(), options.sources.nodeId(), options.upload)
                        : mailingsIntoFolder(options.output);
}

/// Erases what is left of earlier mailings that the service has. A run that was broken off may be made again
/// within the day: what is left of it tells that its letters are on their way.
void settleEarlier(Options const& options, BatchSources& sources) {
    constexpr long long DAY = 24 * 60 * 60;
    if (!options.send)
        return;
    try {
        Channel::Client& service = sources.service()->client();
        settlePacks(service, packDatabaseOf(service, options.sources.nodeId()), DAY);
    } catch (std::exception const&) {
        // The next mailing settles it.
    }
}

/// What the service had before stays behind, unless it is to go out again. What is left of a run that was not
/// finished is gone on with.
class Known {
public:
    Known(Options const& options, BatchSources& sources) : again_(options.again) {
        if (!options.send || !again_.empty())
            return;
        std::vector<std::string> begun;
        std::string const node = options.sources.nodeId();
        for (Mailing::StoredPack const& pack :
             Mailing::finishedPacks(packDatabaseOf(sources.service()->client(), node)))
            if (begun.size() < Protocol::RegisterQuery::MAX_PACKS)
                begun.push_back(pack.info.id);
        sent_.emplace(registerOf(*sources.service()), node, std::move(begun));
    }

    void tell(Dispatch& dispatch) {
        dispatch.sendAgain(again_);
        if (sent_)
            dispatch.leaveOut(*sent_);
    }

private:
    std::string again_;
    std::optional<SentBefore> sent_;
};

/// Prepares what the documents' pack presets name.
MakingReady makingFor(Options const& options, BatchSources& sources, Cfg::Presets const& presets,
                      MakingReady::Colours colours) {
    MakingReady making(colours);
    making.prepareFor(options.files, presets, sources.documents(), options.reading.workers());
    return making;
}

/// By the clock and the place of this machine.
MailingPolicies policiesOf(NodeSettings const& settings) {
    return {settings.sourced(), {std::time(nullptr), &Base::localOffset}, settings.sendsNotices()};
}

int mailDocuments(Options const& options, Terminal const& terminal) {
    BatchSources sources(options.sources, terminal, options.send);
    NodeSettings const settings = sources.settings();
    Cfg::Presets const presets = settings.presets();
    MakingReady making = makingFor(options, sources, presets, MakingReady::Colours::Counted);
    Known known(options, sources);
    Dispatch dispatch(presets, making, policiesOf(settings), destinationOf(options, sources), terminal);
    known.tell(dispatch);
    BatchProgress progress(terminal);
    readBatch(options.files, settings, options.reading.workers(),
              {.pages = Along::Pages::Yes,
               .joins = options.joins(),
               .checks = Along::Checks::Yes,
               .checkEvery = options.checkEvery,
               .making = &making},
              progress, [&](std::size_t, ReadResult result) { dispatch.take(std::move(result)); });
    dispatch.finish();
    settleEarlier(options, sources);
    return report(dispatch, options, terminal);
}

int mailPlan(Options const& options, Terminal const& terminal) {
    Plan const plan = Plan::fromFile(options.plan);
    plan.requireUnchanged();
    BatchSources sources(options.sources, terminal, options.send || plan.usesService());
    NodeSettings const settings = plan.settings();
    Cfg::Presets const presets = settings.presets();
    MakingReady making;
    plan.prepare(making, presets, options.reading.workers(), [&](std::string const& sha256) {
        return sources.service()->repeat(
            [&](Channel::Client& service) { return fetchDocument(service, sha256); });
    });
    Known known(options, sources);
    Dispatch dispatch(presets, making, policiesOf(settings), destinationOf(options, sources), terminal);
    known.tell(dispatch);
    BatchProgress progress(terminal);
    splitBatch(plan.documents(), presets, options.reading.workers(), options.checkEvery, making, progress,
               [&](std::size_t, ReadResult result) { dispatch.take(std::move(result)); });
    dispatch.finish();
    settleEarlier(options, sources);
    return report(dispatch, options, terminal);
}

int makePlan(Options const& options, Terminal const& terminal) {
    BatchSources sources(options.sources, terminal);
    NodeSettings const settings = sources.settings();
    Cfg::Presets const presets = settings.presets();
    MakingReady making =
        makingFor(options, sources, presets,
                  options.price ? MakingReady::Colours::Counted : MakingReady::Colours::Ignored);
    Plan plan(settings, making.usedDocuments());
    Dispatch dispatch(presets, making, policiesOf(settings), mailingsNowhere(), terminal);
    dispatch.tellLetters();
    BatchProgress progress(terminal);
    readBatch(options.files, settings, options.reading.workers(),
              {.pages = Along::Pages::Planned,
               .digest = Along::Digest::Yes,
               .joins = options.joins(),
               .checks = Along::Checks::Yes,
               .making = &making},
              progress, [&](std::size_t index, ReadResult result) {
                  plan.add({std::filesystem::absolute(options.files[index]), result.sha256, result.reading});
                  dispatch.take(std::move(result));
              });
    dispatch.finish();
    if (options.price)
        dispatch.estimate(*connectToService(options.sources.service, terminal.err));
    Base::writeFile(options.output, plan.toText(dispatch.toJson()));
    return report(dispatch, options, terminal);
}

void addBatchOptions(Base::Command const& command, Options& options) {
    command.addFlag("--json", options.json, "The outcome as one JSON object");
    addWorkerOptions(command, options.reading);
}

auto addAcceptJoined(Base::Command const& command, Options& options) {
    return command.addFlag("--accept-joined", options.acceptJoined,
                           "Takes pages for one letter that look like letters of their own");
}

} // namespace

void addMailCommand(Base::Command const& app, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const mail =
        app.addCommand("mail", "Packs the letters in documents, one mailing file a pack preset");
    auto const files = mail.addOption("FILE", options->files, "PDF or text documents");
    auto const sources = addSourceOptions(mail, options->sources);
    auto const acceptJoined = addAcceptJoined(mail, *options);
    mail.addOption("--plan", options->plan, "Carries out what vlmail plan has decided")
        .excludes(files)
        .excludes(sources.settings)
        .excludes(sources.documents)
        .excludes(acceptJoined);
    auto const output =
        mail.addOption("-o,--output", options->output, "The folder for the mailing files; made when missing");
    auto const send =
        mail.addFlag("--send", options->send, "Gives the mailings to the service instead").excludes(output);
    mail.addFlag("--upload", options->upload, "Has the service hand the mailings on at once").needs(send);
    mail.addOption("--again", options->again,
                   "Sends letters that went out before, too, for this reason, which goes on record")
        .needs(send);
    addBatchOptions(mail, *options);
    mail.addCount("--check-every", options->checkEvery,
                  "Holds each N-th page that is written against the document's; 1 is every page")
        .showDefault();
    mail.whenNamed([=, &task] {
        if (options->files.empty() && options->plan.empty())
            throw Base::UsageError("FILE or --plan is required");
        if (options->output.empty() && !options->send)
            throw Base::UsageError("--output or --send is required");
        task = [=](Terminal const& terminal) {
            return options->plan.empty() ? mailDocuments(*options, terminal) : mailPlan(*options, terminal);
        };
    });
}

void addPlanCommand(Base::Command const& app, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const plan =
        app.addCommand("plan", "Decides a batch without any effect, for vlmail mail --plan");
    plan.addOption("FILE", options->files, "PDF or text documents").required();
    addSourceOptions(plan, options->sources);
    plan.addOption("-o,--output", options->output, "The file for the plan").required();
    addAcceptJoined(plan, *options);
    plan.addFlag("--price", options->price, "Asks the service what the mailings would cost");
    addBatchOptions(plan, *options);
    plan.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return makePlan(*options, terminal); }; });
}

} // namespace VlMail

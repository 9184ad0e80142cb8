// vlmail mail and plan: the whole road from documents to mailings, in one go or decided first and carried out
// later.
#include "programs/base/local_offset.h"
#include "programs/base/pending_file.h"
#include "programs/vlmail/commands/batch_command.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/commands/settings.h"
#include "programs/vlmail/letters/batch.h"
#include "programs/vlmail/letters/making_ready.h"
#include "programs/vlmail/letters/node_settings.h"
#include "programs/vlmail/mailings/dispatch.h"
#include "programs/vlmail/mailings/plan.h"
#include "programs/vlmail/mailings/price.h"
#include "programs/vlmail/service/service_client.h"
#include "vlservice/json/json_text.h"

#include <ctime>
#include <filesystem>
#include <memory>
#include <ostream>

namespace VlMail {
namespace {

struct Options {
    std::vector<std::string> files;
    std::string settings;
    std::string documents;
    std::string plan;
    std::string output;
    bool send = false;
    bool upload = false;
    bool price = false;
    std::string node = "/";
    ServiceOptions service;
    bool json = false;
    WorkerOptions reading;
    std::size_t checkEvery = 1;
    bool acceptJoined = false;

    Along::Joins joins() const { return acceptJoined ? Along::Joins::Accept : Along::Joins::Doubt; }
};

int report(Dispatch const& dispatch, Options const& options, Terminal const& terminal) {
    if (options.json)
        terminal.out << dispatch.toJson() << '\n';
    else
        dispatch.print();
    return exitStatusOf(dispatch.end());
}

/// Where the mailings go, by the options. The connection is there when a service is to get them.
struct Destination {
    Destination(Options const& options, Terminal const& terminal)
        : service(options.send ? std::make_unique<ServiceLine>(lineToService(options.service, terminal))
                               : nullptr),
          nodeId(nodeIdIn(options.node)), begin(service ? mailingsToService(*service, nodeId, options.upload)
                                                        : mailingsIntoFolder(options.output)) {}

    std::unique_ptr<ServiceLine> service;
    std::string nodeId;
    BeginMailing begin;
};

/// What counts at the node, as the service tells it.
NodeSettings settingsFromService(Channel::Client& service, std::string const& nodeId) {
    std::vector<std::string> parts = Policy::Rules::parts();
    parts.push_back(Cfg::Presets::PART_NAME);
    return NodeSettings::resolved(fetchSettings(service, nodeId, parts),
                                  "the service, at " + nodeInWords(nodeId));
}

NodeSettings settingsFor(Options const& options, Destination const& destination) {
    return options.settings.empty() && destination.service
               ? settingsFromService(destination.service->client(), destination.nodeId)
               : NodeSettings::fromFileIfNamed(options.settings);
}

/// Prepares what the documents' pack presets name.
MakingReady makingFor(Options const& options, Cfg::Presets const& presets, MakingReady::Colours colours) {
    MakingReady making(colours);
    making.prepareFor(options.files, presets, options.documents, options.reading.workers());
    return making;
}

/// By the clock and the place of this machine.
MailingPolicies policiesOf(NodeSettings const& settings) {
    return {settings.sourced(), {std::time(nullptr), &Base::localOffset}};
}

int mailDocuments(Options const& options, Terminal const& terminal) {
    Destination const destination(options, terminal);
    NodeSettings const settings = settingsFor(options, destination);
    Cfg::Presets const presets = settings.presets();
    MakingReady making = makingFor(options, presets, MakingReady::Colours::Counted);
    Dispatch dispatch(presets, making, policiesOf(settings), destination.begin, terminal);
    BatchProgress progress(terminal);
    readBatch(options.files, settings, options.reading.workers(),
              {.pages = Along::Pages::Yes,
               .joins = options.joins(),
               .checks = Along::Checks::Yes,
               .checkEvery = options.checkEvery,
               .making = &making},
              progress, [&](std::size_t, ReadResult result) { dispatch.take(std::move(result)); });
    dispatch.finish();
    return report(dispatch, options, terminal);
}

int mailPlan(Options const& options, Terminal const& terminal) {
    Plan const plan = Plan::fromFile(options.plan);
    plan.requireUnchanged();
    Destination const destination(options, terminal);
    NodeSettings const settings = plan.settings();
    Cfg::Presets const presets = settings.presets();
    MakingReady making;
    plan.prepare(making, presets, options.reading.workers());
    Dispatch dispatch(presets, making, policiesOf(settings), destination.begin, terminal);
    BatchProgress progress(terminal);
    splitBatch(plan.documents(), presets, options.reading.workers(), options.checkEvery, making, progress,
               [&](std::size_t, ReadResult result) { dispatch.take(std::move(result)); });
    dispatch.finish();
    return report(dispatch, options, terminal);
}

int makePlan(Options const& options, Terminal const& terminal) {
    NodeSettings const settings = NodeSettings::fromFileIfNamed(options.settings);
    Cfg::Presets const presets = settings.presets();
    MakingReady making = makingFor(
        options, presets, options.price ? MakingReady::Colours::Counted : MakingReady::Colours::Ignored);
    Plan plan(settings, making.usedDocuments());
    Dispatch dispatch(presets, making, policiesOf(settings), mailingsNowhere(), terminal);
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
        dispatch.estimate(*connectToService(options.service, terminal.err));
    Base::writeFile(options.output, plan.toText(dispatch.toJson()));
    return report(dispatch, options, terminal);
}

void addBatchOptions(Base::Command const& command, Options& options) {
    command.addFlag("--json", options.json, "The outcome as one JSON object");
    addWorkerOptions(command, options.reading);
}

auto addDocuments(Base::Command const& command, Options& options) {
    return command.addOption("--documents", options.documents, DOCUMENTS_HELP);
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
    auto const settings =
        mail.addOption("--settings", options->settings, "A JSON document with settings parts of a node");
    auto const documents = addDocuments(mail, *options);
    auto const acceptJoined = addAcceptJoined(mail, *options);
    mail.addOption("--plan", options->plan, "Carries out what vlmail plan has decided")
        .excludes(files)
        .excludes(settings)
        .excludes(documents)
        .excludes(acceptJoined);
    auto const output =
        mail.addOption("-o,--output", options->output, "The folder for the mailing files; made when missing");
    auto const send =
        mail.addFlag("--send", options->send, "Gives the mailings to the service instead").excludes(output);
    mail.addOption("--node", options->node, "The node to send for, whose settings apply without --settings")
        .needs(send);
    mail.addFlag("--upload", options->upload, "Has the service hand the mailings on at once").needs(send);
    addServiceOptions(mail, options->service);
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
    plan.addOption("--settings", options->settings, "A JSON document with settings parts of a node");
    plan.addOption("-o,--output", options->output, "The file for the plan").required();
    addDocuments(plan, *options);
    addAcceptJoined(plan, *options);
    plan.addFlag("--price", options->price, "Asks the service what the mailings would cost");
    addServiceOptions(plan, options->service);
    addBatchOptions(plan, *options);
    plan.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return makePlan(*options, terminal); }; });
}

} // namespace VlMail

#include "programs/vlmail/commands/batch_sources.h"

#include "programs/policy/limits.h"
#include "programs/production/prepared_document.h"
#include "programs/vlmail/commands/batch_command.h"
#include "programs/vlmail/commands/settings.h"
#include "programs/vlmail/service/service_documents.h"

#include <chrono>
#include <map>
#include <memory>
#include <utility>
#include <vector>

namespace VlMail {
namespace {

/// What counts at the node, as the service tells it.
NodeSettings settingsFromService(Channel::Client& service, std::string const& nodeId) {
    std::vector<std::string> parts = Policy::Rules::parts();
    parts.push_back(Cfg::Presets::PART_NAME);
    Protocol::SettingsQuery query(nodeId, std::move(parts));
    query.carriers = true;
    return NodeSettings::resolved(Protocol::SettingsAnswer(ask(service, query)),
                                  "the service, at " + nodeInWords(nodeId));
}

using Bytes = std::shared_ptr<std::string const>;

/// How a service is asked for documents.
struct DocumentQuestions {
    std::function<Protocol::DocumentsAnswer()> list;
    std::function<Bytes(std::string const& sha256)> fetch;
};

DocumentsElsewhere documentsBy(DocumentQuestions const& questions, std::string const& nodeId) {
    auto const known = std::make_shared<std::optional<Protocol::DocumentsAnswer>>();
    auto const find = [questions, known](std::string const& id) -> std::optional<FoundDocument> {
        try {
            if (!*known)
                *known = questions.list();
            Protocol::StoredDocument const* const document = (*known)->find(id);
            if (!document)
                return std::nullopt;
            return FoundDocument{"service:" + document->node + '/' + document->name,
                                 questions.fetch(document->sha256)};
        } catch (Base::Error const& failure) {
            throw Base::Error(Base::Code::DocumentUnknown, std::string(Production::DOCUMENT_UNKNOWN) +
                                                               "the service does not give \"" + id +
                                                               "\": " + failure.what());
        }
    };
    return {find,
            " at " + nodeInWords(nodeId) +
                " in the service; put it there with \"vlmail documents put\", or correct the pack preset"};
}

DocumentQuestions questionsBy(std::function<ServiceLine&()> const& line, std::string const& nodeId) {
    return {
        [=] { return line().repeat([&](Channel::Client& service) { return documentsOf(service, nodeId); }); },
        [=](std::string const& sha256) {
            return std::make_shared<std::string const>(
                line().repeat([&](Channel::Client& service) { return fetchDocument(service, sha256); }));
        }};
}

/// For a person who waits.
constexpr Patience SHORT{std::chrono::milliseconds(500), std::chrono::milliseconds(100)};

/// A line that is made when it is used first.
std::function<ServiceLine&()> laterLine(ServiceLine::Connect connect) {
    return [connect = std::move(connect),
            line = std::make_shared<std::optional<ServiceLine>>()]() -> ServiceLine& {
        return *line ? **line : line->emplace(connect, SHORT);
    };
}

/// Keeps what was fetched last.
std::function<Bytes(std::string const&)> keeping(std::function<Bytes(std::string const&)> fetch) {
    constexpr std::size_t MOST = 16;
    return [fetch = std::move(fetch),
            kept = std::make_shared<std::map<std::string, Bytes>>()](std::string const& sha256) {
        if (auto const known = kept->find(sha256); known != kept->end())
            return known->second;
        Bytes const bytes = fetch(sha256);
        if (kept->size() >= MOST)
            kept->clear();
        return kept->emplace(sha256, bytes).first->second;
    };
}

} // namespace

std::string SourceOptions::nodeId() const { return nodeIdIn(node); }

SourceOptionHandles addSourceOptions(Base::Command const& command, SourceOptions& options) {
    SourceOptionHandles const handles{
        command.addOption("--settings", options.settings, "A JSON document with settings parts of a node"),
        command.addOption("--documents", options.documents, DOCUMENTS_HELP),
        command.addOption("--node", options.node,
                          "The node of the service whose settings and documents count where files do not say "
                          "otherwise")};
    addServiceOptions(command, options.service);
    return handles;
}

BatchSources::BatchSources(SourceOptions const& options, Terminal const& terminal, bool usesService)
    : options_(options) {
    if (usesService || !options.node.empty())
        line_.emplace(lineToService(options.service, terminal));
}

NodeSettings BatchSources::settings() {
    return options_.settings.empty() && line_ ? settingsFromService(line_->client(), options_.nodeId())
                                              : NodeSettings::fromFileIfNamed(options_.settings);
}

DocumentFolder BatchSources::documents() {
    DocumentFolder folder(options_.documents);
    if (line_)
        folder.orElse(documentsInService(*line_, options_.nodeId()));
    return folder;
}

DocumentsElsewhere documentsInService(ServiceLine& line, std::string const& nodeId) {
    return documentsBy(questionsBy([&line]() -> ServiceLine& { return line; }, nodeId), nodeId);
}

std::function<DocumentsElsewhere()> documentsAnew(ServiceLine::Connect connect, std::string const& nodeId) {
    DocumentQuestions questions = questionsBy(laterLine(std::move(connect)), nodeId);
    questions.fetch = keeping(std::move(questions.fetch));
    return [questions, nodeId] { return documentsBy(questions, nodeId); };
}

} // namespace VlMail

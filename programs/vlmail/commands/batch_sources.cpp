#include "programs/vlmail/commands/batch_sources.h"

#include "programs/policy/limits.h"
#include "programs/production/prepared_document.h"
#include "programs/vlmail/commands/batch_command.h"
#include "programs/vlmail/commands/settings.h"
#include "programs/vlmail/service/service_documents.h"

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

FoundDocument fetched(ServiceLine& line, Protocol::StoredDocument const& document) {
    std::string bytes =
        line.repeat([&](Channel::Client& service) { return fetchDocument(service, document.sha256); });
    return {"service:" + document.node + '/' + document.name,
            std::make_shared<std::string const>(std::move(bytes))};
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
    auto const known = std::make_shared<std::optional<Protocol::DocumentsAnswer>>();
    auto const find = [&line, nodeId, known](std::string const& id) -> std::optional<FoundDocument> {
        try {
            if (!*known)
                *known = line.repeat([&](Channel::Client& service) { return documentsOf(service, nodeId); });
            Protocol::StoredDocument const* const document = (*known)->find(id);
            return document ? std::optional(fetched(line, *document)) : std::nullopt;
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

} // namespace VlMail

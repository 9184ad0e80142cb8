#pragma once
// Where a batch has its settings and its letterheads and attachments from: files, or a node of the service.

#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/letters/document_folder.h"
#include "programs/vlmail/letters/node_settings.h"

#include <functional>
#include <optional>
#include <string>

namespace VlMail {

struct SourceOptions {
    std::string settings;
    std::string documents;
    /// Empty when none was named.
    std::string node;
    ServiceOptions service;

    std::string nodeId() const;
};

/// The options of a command that have to do with them.
struct SourceOptionHandles {
    Base::Option settings;
    Base::Option documents;
    Base::Option node;
};

/// Adds --settings, --documents and --node with the options of a service. `options` has to outlive the
/// parsing of the command line.
SourceOptionHandles addSourceOptions(Base::Command const& command, SourceOptions& options);

/// What counts at a node, or what files say: a file of settings replaces those of the node, and a document in
/// a folder comes before one of the node.
class BatchSources {
public:
    /// Connects when a node was named, or when the batch goes to the service anyway. The options and the
    /// terminal have to outlive the object, and this what it gives.
    BatchSources(SourceOptions const& options, Terminal const& terminal, bool usesService = false);

    /// Null without a service.
    ServiceLine* service() { return line_ ? &*line_ : nullptr; }
    NodeSettings settings();
    DocumentFolder documents();

private:
    SourceOptions const& options_;
    std::optional<ServiceLine> line_;
};

/// A document by its id among those that count at a node, of which the service is asked once, when the first
/// is looked for. The line has to outlive it.
DocumentsElsewhere documentsInService(ServiceLine& line, std::string const& nodeId);
/// The same for who looks for documents again and again, each time among those that count then. Connects in
/// the process that looks, with the first, and keeps what was fetched.
std::function<DocumentsElsewhere()> documentsAnew(ServiceLine::Connect connect, std::string const& nodeId);

} // namespace VlMail

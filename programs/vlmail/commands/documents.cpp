// vlmail documents: the letterheads and attachments that the service keeps at its nodes.
#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/base/pending_file.h"
#include "programs/base/quoting.h"
#include "programs/base/read_file.h"
#include "programs/vlmail/commands/batch_command.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/commands/settings.h"
#include "programs/vlmail/letters/making_ready.h"
#include "programs/vlmail/service/service_documents.h"
#include "programs/vlmail/terminal/text_table.h"
#include "vlservice/json/json_text.h"
#include "vlservice/platform/local_time.h"

#include <filesystem>
#include <memory>
#include <ostream>

namespace VlMail {
namespace {

namespace fs = std::filesystem;
using Protocol::StoredDocument;

struct Options {
    ServiceOptions service;
    std::string node;
    std::string id;
    std::string file;
    bool json = false;
    WorkerOptions reading;
};

static_assert(Protocol::MAX_DOCUMENT_BYTES == Production::MAX_DOCUMENT_BYTES);

/// The name under which a file is kept: its ending tells what it is.
std::string nameFor(std::string const& id, fs::path const& file) {
    bool const hasEnding = fs::path(id).extension() == file.extension();
    return hasEnding ? id : id + file.extension().string();
}

/// The bytes of a document that mailings can use. It is read in a worker process.
std::string usableBytes(fs::path const& file, Workers const& workers) {
    Production::PreparedDocument const prepared = prepareDocuments({{file}}, workers).front();
    if (!prepared.error.empty())
        throw Base::Error(Base::Code::DocumentUnreadable, prepared.error);
    std::string bytes = Base::readFile(file);
    if (Base::sha256(bytes) != prepared.sha256)
        throw Base::Error(Base::Code::DocumentChanged,
                          Base::inQuotes(file.string()) + " has changed while it was read; put it once more");
    return bytes;
}

int put(Options const& options, Terminal const& terminal) {
    // One argument alone is the file.
    fs::path const file = options.file.empty() ? options.id : options.file;
    std::string const name = options.file.empty() ? file.filename().string() : nameFor(options.id, file);
    std::string const bytes = usableBytes(file, options.reading.workers());
    std::string const node = nodeIdIn(options.node);
    auto const service = connectToService(options.service, terminal.err);
    std::string const sha256 = putDocument(*service, node, name, bytes);
    terminal.out << name << " is at " << nodeInWords(node) << ", version " << sha256 << '\n';
    return FINE;
}

int list(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    Protocol::DocumentsAnswer const answer = documentsOf(*service, nodeIdIn(options.node));
    if (options.json) {
        terminal.out << answer.serialize() << '\n';
        return FINE;
    }
    TextTable table({{"document"}, {"at"}, {"bytes", TextTable::Align::Right}, {"since"}, {"version"}});
    for (StoredDocument const& document : answer.documents)
        table.addRow({document.name, nodeInWords(document.node), std::to_string(document.bytes),
                      LocalTime::toText(document.putAt), document.sha256});
    if (table.empty())
        terminal.out << "no document counts at " << nodeInWords(nodeIdIn(options.node)) << '\n';
    else
        table.print(terminal.out);
    return FINE;
}

/// What the person has not named is not replaced.
fs::path placeFor(Options const& options, StoredDocument const& document) {
    if (!options.file.empty())
        return options.file;
    if (fs::exists(fs::symlink_status(document.name)))
        throw Base::Error(Base::Code::FileExists,
                          Base::inQuotes(document.name) +
                              " is there already; name the file to write behind the document");
    return document.name;
}

int get(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    std::string const node = nodeIdIn(options.node);
    Protocol::DocumentsAnswer const known = documentsOf(*service, node);
    StoredDocument const* const document = known.find(options.id);
    if (!document)
        throw Base::Error(Base::Code::DocumentUnknown,
                          "there is no document " + Base::inQuotes(options.id) + " at " + nodeInWords(node) +
                              " and above it; \"vlmail documents list\" shows what there is");
    fs::path const file = placeFor(options, *document);
    Base::writeFile(file, fetchDocument(*service, document->sha256));
    terminal.out << document->name << " of " << nodeInWords(document->node) << " is in "
                 << Base::inQuotes(file.string()) << ", version " << document->sha256 << '\n';
    return FINE;
}

int remove(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    StoredDocument const removed = removeDocument(*service, {nodeIdIn(options.node), options.id});
    terminal.out << removed.name << " is gone from " << nodeInWords(removed.node) << ", version "
                 << removed.sha256 << '\n';
    return FINE;
}

using Action = int (*)(Options const&, Terminal const&);

Base::Command addAction(Base::Command const& documents, Task& task, std::shared_ptr<Options> const& options,
                        Action action, std::pair<char const*, char const*> const& named) {
    Base::Command const command = documents.addCommand(named.first, named.second);
    command.addOption("--node", options->node, "The node of the service; / is the root").required();
    addServiceOptions(command, options->service);
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return action(*options, terminal); }; });
    return command;
}

} // namespace

void addDocumentsCommand(Base::Command const& app, Task& task) {
    Base::Command const documents = app.addCommand(
        "documents", "Keeps letterheads and attachments in the service, for a node and all below it");
    documents.requireCommand();
    auto const options = std::make_shared<Options>();
    Base::Command const putting = addAction(documents, task, options, &put,
                                            {"put", "Puts a document at a node, or another version of it"});
    putting.addOption("ID", options->id, "What pack presets call it; left out, the name of the file")
        .required();
    putting.addOption("FILE", options->file, "A PDF or text document");
    addLimitOptions(putting, options->reading);
    addAction(documents, task, options, &list, {"list", "Shows the documents that count at a node"})
        .addFlag("--json", options->json, "The service's answer as one JSON object");
    Base::Command const getting = addAction(documents, task, options, &get,
                                            {"get", "Writes a document that counts at a node into a file"});
    getting.addOption("ID", options->id, "The name of the document, with its ending or without").required();
    getting.addOption("FILE", options->file,
                      "The file to write [of the document's name, unless there is one]");
    addAction(documents, task, options, &remove,
              {"remove", "Removes a document from the node that it lies at"})
        .addOption("ID", options->id, "The name of the document, with its ending or without")
        .required();
}

} // namespace VlMail

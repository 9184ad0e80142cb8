// vlmail pack list: the index of a mailing file, for a person or as JSON.
#include "programs/base/hex.h"
#include "programs/base/utf8.h"
#include "programs/vlmail/commands/pack.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/pack/container_file.h"
#include "programs/vlmail/terminal/text_table.h"
#include "vlservice/json/json_text.h"

#include <memory>
#include <ostream>

namespace VlMail {
namespace {

struct Options {
    std::string file;
    bool json = false;
};

void printTable(ContainerFile const& container, std::ostream& out) {
    using Align = TextTable::Align;
    TextTable table({{"document"},
                     {"page", Align::Right},
                     {"role"},
                     {"offset", Align::Right},
                     {"length", Align::Right},
                     {"crc"}});
    for (unsigned long long i = 0; i < container.size(); ++i) {
        ContainerFile::Entry const& entry = container.entry(i);
        table.addRow({entry.document, entry.name, entry.role, std::to_string(entry.offset),
                      std::to_string(entry.length), Base::hexNumber(entry.crc, 8)});
    }
    out << "mailing " << Base::validUtf8(container.packId()) << ", " << counted(container.size(), "blob")
        << '\n';
    if (!table.empty())
        table.print(out);
}

void printJson(ContainerFile const& container, std::ostream& out) {
    json::Array items;
    for (unsigned long long i = 0; i < container.size(); ++i) {
        ContainerFile::Entry const& entry = container.entry(i);
        items.append(json::Object{{"document", Base::validUtf8(entry.document)},
                                  {"page", Base::validUtf8(entry.name)},
                                  {"role", Base::validUtf8(entry.role)},
                                  {"offset", entry.offset},
                                  {"length", entry.length},
                                  {"crc", entry.crc}});
    }
    out << json::Object{{"id", Base::validUtf8(container.packId())}, {"items", items}} << '\n';
}

int list(Options const& options, Terminal const& terminal) {
    ContainerFile const container(options.file);
    if (options.json)
        printJson(container, terminal.out);
    else
        printTable(container, terminal.out);
    return FINE;
}

} // namespace

void addPackListCommand(Base::Command const& pack, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const command = pack.addCommand("list", "Shows the index of a mailing file");
    command.addOption("FILE", options->file, "A mailing file").required();
    command.addFlag("--json", options->json, "One JSON object: id, and items in file order");
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return list(*options, terminal); }; });
}

} // namespace VlMail

// vlmail schema: what JSON documents may hold, for editors and other programs.
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/schema/schemas.h"
#include "programs/vlmail/terminal/text_table.h"
#include "vlservice/json/json_text.h"

#include <memory>
#include <ostream>

namespace VlMail {
namespace {

int listSchemas(Terminal const& terminal) {
    TextTable table({{"schema"}, {"what it describes"}});
    for (NamedSchema const& each : schemas())
        table.addRow({each.name, each.title});
    table.print(terminal.out);
    return FINE;
}

NamedSchema const& requireSchema(std::string const& name) {
    if (NamedSchema const* const schema = schemaNamed(name))
        return *schema;
    throw Base::UsageError("there is no schema \"" + name + "\"; vlmail schema lists what there is");
}

int show(NamedSchema const& schema, Terminal const& terminal) {
    terminal.out << documentOf(schema) << '\n';
    return FINE;
}

} // namespace

void addSchemaCommand(Base::Command const& app, Task& task) {
    auto const name = std::make_shared<std::string>();
    Base::Command const schema = app.addCommand("schema", "Prints the JSON schema of a kind of document");
    schema.addOption("NAME", *name, "Such as settings, letter or carriers; without one, lists them");
    schema.whenNamed([=, &task] {
        if (name->empty())
            task = &listSchemas;
        else
            task = [&named = requireSchema(*name)](Terminal const& terminal) {
                return show(named, terminal);
            };
    });
}

} // namespace VlMail

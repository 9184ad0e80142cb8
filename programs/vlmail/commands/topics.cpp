#include "programs/vlmail/commands/topics.h"

namespace VlMail {
namespace {

constexpr char const* CLIENT = "client.md";
constexpr char const* LETTERS = "letters-and-mailings.md";
constexpr char const* PRESETS_TOOLS = "presets-tools.md";

constexpr Manual::Topic TOPICS[] = {
    {"cancel", CLIENT, "Holding, releasing and cancelling"},
    {"bounce", "carriers.md", "Delivery reports"},
    {"carriers list", "carriers.md", "How carriers are doing"},
    {"carriers pause", "carriers.md", "How carriers are doing"},
    {"carriers resume", "carriers.md", "How carriers are doing"},
    {"carriers test", "carriers.md", "How carriers are doing"},
    {"check", "check.md", ""},
    {"discover", CLIENT, "Looking for the service"},
    {"doctor", CLIENT, "Whether all is well"},
    {"documents get", CLIENT, "Documents of nodes"},
    {"documents list", CLIENT, "Documents of nodes"},
    {"documents put", CLIENT, "Documents of nodes"},
    {"documents remove", CLIENT, "Documents of nodes"},
    {"history", CLIENT, "Who has changed what"},
    {"hold", CLIENT, "Holding, releasing and cancelling"},
    {"letter", LETTERS, "Reading"},
    {"mail", LETTERS, "Mailing"},
    {"plan", LETTERS, "Planning"},
    {"pack list", CLIENT, "The index of a mailing"},
    {"presets draft", PRESETS_TOOLS, "A preset to begin with"},
    {"presets match", PRESETS_TOOLS, "Which presets a name gets"},
    {"presets lint", PRESETS_TOOLS, "What is wrong with settings"},
    {"presets test", PRESETS_TOOLS, "Whether documents still give what they gave"},
    {"price", CLIENT, "Prices"},
    {"release", CLIENT, "Holding, releasing and cancelling"},
    {"resend", "carriers.md", "Letters that are uncertain"},
    {"schema", "schemas.md", ""},
    {"send", CLIENT, "Sending mailing files"},
    {"settings impact", CLIENT, "What a change of settings would change"},
    {"settings show", CLIENT, "What counts at a node"},
    {"settings tree", CLIENT, "All nodes"},
    {"settings ids", CLIENT, "The nodes of a user"},
    {"settings service", CLIENT, "The settings of the service"},
    {"settle", "carriers.md", "Letters that are uncertain"},
    {"status", CLIENT, "How far mailings are"},
    {"token add", CLIENT, "Access tokens"},
    {"token list", CLIENT, "Access tokens"},
    {"token revoke", CLIENT, "Access tokens"},
    {"workbench", "workbench.md", ""},
    // Beside the commands.
    {Manual::EXIT_STATUS, LETTERS, "Exit status"},
    {"carriers-documents", "carriers.md", ""},
    {"errors", "errors.md", ""},
    {"explain", "explain.md", ""},
    {"formats", "formats.md", ""},
    {"jobs", "service.md", "Jobs"},
    {"reading", "reading.md", ""},
    {"report", "report.md", ""},
    {"security", "security.md", ""},
    {"service", "service.md", ""},
    {"settings-documents", "settings.md", ""},
    {"presets-documents", "presets.md", ""},
};

} // namespace

std::span<Manual::Topic const> topics() { return TOPICS; }

} // namespace VlMail

#include "programs/vlmail/commands/command.h"

#include "programs/base/plain_stream.h"
#include "programs/base/version.h"
#include "programs/mailing/pack_database.h"
#include "programs/reader/library_versions.h"

#include <algorithm>
#include <new>
#include <ostream>
#include <string_view>
#include <vector>

namespace VlMail {

char const OUT_OF_MEMORY[] =
    "vlmail: there is not enough memory; close other programs, or name fewer documents at once "
    "[out-of-memory]\n";

namespace {

constexpr char const* PROGRAM = "vlmail";
constexpr std::string_view VERSION = "--version";

/// Commands that are added together.
struct Source {
    std::vector<std::string_view> names;
    void (*add)(Base::Command const& command, Task& task);
};

/// In the order of the help.
std::vector<Source> const& sources() {
    static std::vector<Source> const all{
        {{"bounce"}, addBounceCommand},
        {{"carriers"}, addCarriersCommand},
        {{"check"}, addCheckCommand},
        {{"discover"}, addDiscoverCommand},
        {{"doctor"}, addDoctorCommand},
        {{"documents"}, addDocumentsCommand},
        {{"history"}, addHistoryCommand},
        {{"hold", "release", "cancel"}, addJobChangeCommands},
        {{"settle", "resend"}, addLetterChangeCommands},
        {{"letter"}, addLetterCommand},
        {{"mail"}, addMailCommand},
        {{"pack"}, addPackCommand},
        {{"plan"}, addPlanCommand},
        {{"presets"}, addPresetsCommand},
        {{"price"}, addPriceCommand},
        {{"schema"}, addSchemaCommand},
        {{"send"}, addSendCommand},
        {{"settings"}, addSettingsCommand},
        {{"status"}, addStatusCommand},
        {{"resume", "discard"}, addStrandedCommands},
        {{"token"}, addTokenCommand},
        {{"upload"}, addUploadCommand},
        {{"workbench"}, addWorkbenchCommand},
    };
    return all;
}

/// The options of all commands take longer than what is left of starting the program, so where the first word
/// is a command's name, the others are left out, and all where it asks for the version.
void addCommands(Base::Command const& command, Task& task, std::string_view firstWord) {
    command.requireCommand();
    if (firstWord == VERSION)
        return;
    auto const named = std::ranges::find_if(
        sources(), [&](Source const& source) { return std::ranges::count(source.names, firstWord) != 0; });
    if (named != sources().end())
        return named->add(command, task);
    for (Source const& source : sources())
        source.add(command, task);
    addHelpCommand(command, task);
}

constexpr char const* DESCRIPTION =
    "Sends letters out of documents: reads them, says what was found, and packs mailings.";

std::string versionText(std::string const& commit) {
    std::vector<Base::LibraryVersion> libraries = Reader::libraryVersions();
    libraries.push_back({"SQLite", Mailing::databaseVersion()});
    return Base::versionText(PROGRAM, commit, std::move(libraries));
}

/// Lets std::bad_alloc out: telling of a failure takes memory, too.
int runPlainly(int argc, char const* const* argv, Terminal const& terminal, std::string const& commit) {
    try {
        Base::CommandLine line(DESCRIPTION, PROGRAM);
        line.addVersion([&commit] { return versionText(commit); });
        Task task;
        addCommands(line.command(), task, argc > 1 ? argv[1] : "");
        return line.read(argc, argv, terminal.out) ? task(terminal) : FINE;
    } catch (std::bad_alloc const&) {
        throw;
    } catch (Base::UsageError const& wrong) {
        terminal.complain(wrong.code(), std::string(wrong.what()) + "; --help explains");
    } catch (std::exception const& failure) {
        terminal.complain(failure);
    }
    return FAILED;
}

int runAndFlush(int argc, char const* const* argv, Terminal const& terminal, std::string const& commit) {
    // Names and values from documents, mailings and services stand in what commands print.
    Base::PlainStream out(terminal.out);
    int const status = runPlainly(argc, argv, {out, terminal.err, terminal.showsProgress}, commit);
    if (out.flush())
        return status;
    terminal.complain(Base::Code::FileUnwritable,
                      "the results cannot be written; make room on the disk, or send them elsewhere");
    return FAILED;
}

} // namespace

Base::CommandInfo commandInfo(std::string_view firstWord) {
    Base::CommandLine line(DESCRIPTION, PROGRAM);
    line.addVersion([] { return std::string(); });
    Task task;
    addCommands(line.command(), task, firstWord);
    return line.command().info();
}

int run(int argc, char const* const* argv, Terminal const& terminal, std::string const& commit) {
    try {
        return runAndFlush(argc, argv, terminal, commit);
    } catch (std::bad_alloc const&) {
        terminal.err << OUT_OF_MEMORY << std::flush;
        return FAILED;
    }
}

} // namespace VlMail

#include "programs/vlmail/commands/command.h"

#include "programs/base/plain_stream.h"
#include "programs/base/version.h"
#include "programs/mailing/pack_database.h"
#include "programs/reader/library_versions.h"

#include <new>
#include <ostream>

namespace VlMail {

char const OUT_OF_MEMORY[] =
    "vlmail: there is not enough memory; close other programs, or name fewer documents at once "
    "[out-of-memory]\n";

namespace {

void addCommands(Base::Command const& command, Task& task) {
    command.requireCommand();
    addBounceCommand(command, task);
    addCarriersCommand(command, task);
    addCheckCommand(command, task);
    addDiscoverCommand(command, task);
    addDoctorCommand(command, task);
    addDocumentsCommand(command, task);
    addHistoryCommand(command, task);
    addJobChangeCommands(command, task);
    addLetterChangeCommands(command, task);
    addLetterCommand(command, task);
    addMailCommand(command, task);
    addPackCommand(command, task);
    addPlanCommand(command, task);
    addPresetsCommand(command, task);
    addPriceCommand(command, task);
    addSchemaCommand(command, task);
    addSendCommand(command, task);
    addSettingsCommand(command, task);
    addStatusCommand(command, task);
    addStrandedCommands(command, task);
    addTokenCommand(command, task);
    addUploadCommand(command, task);
    addWorkbenchCommand(command, task);
    addHelpCommand(command, task);
}

constexpr char const* PROGRAM = "vlmail";
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
        addCommands(line.command(), task);
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

Base::CommandInfo commandInfo() {
    Base::CommandLine line(DESCRIPTION, PROGRAM);
    line.addVersion([] { return std::string(); });
    Task task;
    addCommands(line.command(), task);
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

#include "programs/vlserviced/options.h"

#include "programs/base/command_line.h"
#include "programs/base/version.h"
#include "programs/mailing/pack_database.h"

#include <ostream>

namespace VlServiced {

namespace {

constexpr char const* PROGRAM = "vlserviced";
constexpr char const* DESCRIPTION =
    "Keeps settings for the clients of a network and brings their mailings on the way.";

void addOptions(Base::Command const& command, Options& options) {
    command
        .addOption("--data", options.data,
                   "Folder with everything that the service keeps; made when it is not there")
        .required()
        .valueName("FOLDER");
    command
        .addOption("--database", options.database,
                   "Database that several services share, postgresql://HOST/NAME [a file in the data folder]")
        .valueName("URL");
    command
        .addOption("--lease", options.lease,
                   "Seconds after which other services take up what one works on that stands still")
        .showDefault()
        .valueName("SECONDS");
    command
        .addOption("--migrate-to", options.migrateTo,
                   "Move what the data folder's file holds into an empty database, and end")
        .valueName("URL");
    command.addOption("--outbox", options.outbox, "Folder for finished mailings [outbox in the data folder]")
        .valueName("FOLDER");
    command.addOption("--token", options.token, "File with the access token [token in the data folder]")
        .valueName("FILE");
    command
        .addOption(
            "--local-packs", options.localPacks,
            "Folder below which clients on this machine may name pack databases, instead of sending pages")
        .valueName("FOLDER");
    command
        .addOption("--listen", options.listen, "IP address to listen on; all but loopback want a certificate")
        .showDefault()
        .valueName("ADDRESS");
    command.addOption("--port", options.port, "TCP port; 0 takes a free one and says which")
        .showDefault()
        .valueName("N");
    command.addOption("--certificate", options.certificate, "Certificate for TLS, with its chain")
        .valueName("PEM");
    command.addOption("--key", options.key, "Private key of the certificate").valueName("PEM");
    command
        .addOption("--announce", options.announce, "Host to answer discovery with [the address listened on]")
        .valueName("HOST");
    command.addOffFlag("--no-discovery", options.answersDiscovery,
                       "Do not answer clients that look for a service");
    command
        .addOption(
            "--metrics", options.metrics,
            "Where to answer whoever watches the service: a loopback address with a port, or unix:PATH")
        .valueName("ADDRESS:PORT");
    command.addFlag("--verbose", options.verbose, "Log every datagram of discovery");
}

void addTasks(Base::Command const& command, Options& options) {
    Base::Command const backup =
        command.addCommand("backup", "Write all that the service keeps into a file, while it runs or not");
    backup.takeOptionsAbove();
    backup.addOption("FILE", options.file, "New file for the backup").required();
    backup.whenNamed([&options] { options.task = Task::BackUp; });
    Base::Command const restore = command.addCommand(
        "restore", "Have a service go on from a backup, in a data folder that holds nothing yet");
    restore.takeOptionsAbove();
    restore.addOption("FILE", options.file, "The backup").required();
    restore.addFlag("--nothing-since", options.nothingSince,
                    "The service handed nothing over behind the backup: have mailings that wait go on");
    restore.whenNamed([&options] { options.task = Task::Restore; });
}

void requireOwnDatabase(Options const& options) {
    if (options.task == Task::Restore && !options.database.empty())
        throw Base::UsageError(
            "restore makes the database of a data folder; --migrate-to takes that to PostgreSQL");
    if (!options.migrateTo.empty() && (options.task != Task::Serve || !options.database.empty()))
        throw Base::UsageError(
            "--migrate-to moves the data folder's own database: leave --database out until that is done");
}

} // namespace

std::variant<Options, int> parseOptions(int argc, char const* const* argv, std::ostream& out,
                                        std::ostream& err, std::string const& commit) {
    Options options;
    options.commit = commit;
    Base::CommandLine line(DESCRIPTION, PROGRAM);
    line.addVersion([&commit] {
        return Base::versionText(PROGRAM, commit, {{"SQLite", Mailing::databaseVersion()}});
    });
    addOptions(line.command(), options);
    line.addConfigFile();
    addTasks(line.command(), options);
    try {
        if (!line.read(argc, argv, out))
            return 0;
        if (options.lease < 2 || options.lease > 600)
            throw Base::UsageError("--lease takes 2 to 600 seconds, and got " +
                                   std::to_string(options.lease));
        requireOwnDatabase(options);
        if (!options.migrateTo.empty())
            options.task = Task::MoveDatabase;
        return options;
    } catch (Base::UsageError const& wrong) {
        err << "vlserviced: "
            << Base::codedLine(wrong.what() + std::string("; --help explains"), wrong.code()) << '\n';
        return 1;
    }
}

Base::CommandInfo commandInfo() {
    Options options;
    Base::CommandLine line(DESCRIPTION, PROGRAM);
    line.addVersion([] { return std::string(); });
    addOptions(line.command(), options);
    line.addConfigFile();
    addTasks(line.command(), options);
    return line.command().info();
}

} // namespace VlServiced

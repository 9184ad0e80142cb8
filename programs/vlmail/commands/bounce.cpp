// vlmail bounce: hands on what servers of e-mail report of letters.
#include "programs/base/error.h"
#include "programs/base/plain_text.h"
#include "programs/base/read_file.h"
#include "programs/protocol/delivery_report.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/service/service_client.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <filesystem>
#include <memory>
#include <ostream>
#include <vector>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

/// A report may hold the letter that came back.
constexpr std::size_t MAX_MESSAGE_BYTES = std::size_t{100} << 20;

struct Options {
    ServiceOptions service;
    std::string maildir;
    bool json = false;
};

void handOn(Channel::Client& service, std::string const& message, Options const& options,
            Terminal const& terminal) {
    json::Object const answer = ask(service, Protocol::DeliveryReport(std::string_view(message)));
    if (options.json) {
        terminal.out << answer << '\n';
        return;
    }
    Protocol::LetterReport const letter = Protocol::DeliveryReportAnswer(answer).letter;
    terminal.out << letter.key << ", " << Protocol::letterStateName(letter.state)
                 << (letter.says.empty() ? "" : ": " + letter.says) << '\n';
}

/// The messages in a mailbox that nobody has seen, in the order of their names.
std::vector<fs::path> unseenIn(fs::path const& maildir) {
    std::error_code failure;
    std::vector<fs::path> files;
    for (fs::directory_entry const& entry : fs::directory_iterator(maildir / "new", failure))
        if (!entry.path().filename().string().starts_with('.') && entry.is_regular_file())
            files.push_back(entry.path());
    if (failure || !fs::is_directory(maildir / "cur"))
        throw Base::Error(Base::Code::FileUnsuitable,
                          maildir.string() + " is no mailbox (Maildir) with the folders new and cur");
    std::ranges::sort(files);
    return files;
}

/// As seen: other programs of mail leave it alone then.
void putAway(fs::path const& file, fs::path const& maildir) {
    fs::rename(file, maildir / "cur" / (file.filename().string() + ":2,S"));
}

/// What cannot be handed on stays where it is.
int handOnAll(Channel::Client& service, Options const& options, Terminal const& terminal) {
    int status = FINE;
    for (fs::path const& file : unseenIn(options.maildir)) {
        try {
            handOn(service, Base::readFile(file, MAX_MESSAGE_BYTES), options, terminal);
            putAway(file, options.maildir);
        } catch (Base::Error const& bad) {
            terminal.complain(bad.code(), file.filename().string() + ": " + bad.what());
            status = INCOMPLETE;
        }
    }
    return status;
}

int run(Options const& options, Terminal const& terminal) {
    auto const service = connectToService(options.service, terminal.err);
    if (!options.maildir.empty())
        return handOnAll(*service, options, terminal);
    handOn(*service, Base::readStandardInput(MAX_MESSAGE_BYTES), options, terminal);
    return FINE;
}

} // namespace

void addBounceCommand(Base::Command const& app, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const command = app.addCommand(
        "bounce", "Tells the service what a server of e-mail reports of a letter, from standard input");
    command.addOption("--maildir", options->maildir,
                      "Take the unseen reports of a mailbox instead; those handed on become seen");
    command.addFlag("--json", options->json, "The service's answer as one JSON object a report");
    addServiceOptions(command, options->service);
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return run(*options, terminal); }; });
}

} // namespace VlMail

// vlmail settle and resend: what a person decides of a letter that a carrier has.
#include "programs/base/error.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/service/service_client.h"
#include "vlservice/json/json_text.h"

#include <charconv>
#include <memory>
#include <ostream>

namespace VlMail {
namespace {

using Protocol::LetterAction;

struct Options {
    ServiceOptions service;
    std::string mailing;
    std::string letter;
    std::string outcome;
    bool json = false;
};

/// "3" is a letter, "n1" a notice.
Protocol::LetterChange changeOf(Options const& options, LetterAction action) {
    std::string const& text = options.letter;
    bool const isNotice = text.starts_with('n');
    long long number = 0;
    auto const [end, failure] =
        std::from_chars(text.data() + (isNotice ? 1 : 0), text.data() + text.size(), number);
    if (failure != std::errc() || end != text.data() + text.size() || number < 1)
        throw Base::Error(Base::Code::Usage,
                          "\"" + text + "\" is no number of a letter: vlmail status MAILING shows them");
    return isNotice ? Protocol::LetterChange(action, options.mailing, 0, number)
                    : Protocol::LetterChange(action, options.mailing, number);
}

/// The one of that number among letters, or among notices.
template<typename Report>
void print(std::ostream& out, std::vector<Report> const& all, long long number) {
    for (Report const& one : all)
        if (one.number == number)
            out << one.key << ", " << Protocol::letterStateName(one.state) << '\n';
}

int change(Options const& options, LetterAction action, Terminal const& terminal) {
    Protocol::LetterChange const wanted = changeOf(options, action);
    auto const service = connectToService(options.service, terminal.err);
    json::Object const answer = ask(*service, wanted);
    if (options.json) {
        terminal.out << answer << '\n';
        return FINE;
    }
    for (Protocol::JobReport const& job : Protocol::JobsAnswer(answer).jobs) {
        print(terminal.out, job.letters, wanted.letter);
        print(terminal.out, job.notices, wanted.notice);
    }
    return FINE;
}

int settle(Options const& options, Terminal const& terminal) {
    if (options.outcome != "delivered" && options.outcome != "failed")
        throw Base::Error(Base::Code::Usage,
                          "a letter is settled as delivered or failed, not as \"" + options.outcome + '"');
    return change(options,
                  options.outcome == "delivered" ? LetterAction::SettleDelivered : LetterAction::SettleFailed,
                  terminal);
}

int resend(Options const& options, Terminal const& terminal) {
    return change(options, LetterAction::Resend, terminal);
}

Base::Command addCommand(Base::Command const& app, Task& task, char const* name, char const* description,
                         int (*run)(Options const&, Terminal const&),
                         std::shared_ptr<Options> const& options) {
    Base::Command const command = app.addCommand(name, description);
    command.addOption("MAILING", options->mailing, "The id of a mailing").required();
    command
        .addOption("LETTER", options->letter,
                   "The number of the letter, or of the notice, as vlmail status MAILING has it")
        .required();
    command.addFlag("--json", options->json, "The service's answer as one JSON object");
    addServiceOptions(command, options->service);
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return run(*options, terminal); }; });
    return command;
}

} // namespace

void addLetterChangeCommands(Base::Command const& app, Task& task) {
    auto const settled = std::make_shared<Options>();
    addCommand(app, task, "settle", "Says what became of a letter that a carrier may have taken or not",
               &settle, settled)
        .addOption("OUTCOME", settled->outcome, "delivered or failed")
        .required();
    addCommand(app, task, "resend",
               "Has a letter handed over once more that is uncertain, failed or came back", &resend,
               std::make_shared<Options>());
}

} // namespace VlMail

#include "programs/carriers/command_carrier.h"

#include "programs/base/error.h"
#include "programs/base/plain_text.h"
#include "programs/base/utf8.h"
#include "programs/carriers/child_process.h"
#include "programs/carriers/placeholders.h"
#include "vlservice/json/json_text.h"

#include <sstream>
#include <unistd.h>
#include <utility>

namespace Carriers {
namespace {

/// As programs of mail tell that somebody should try later.
constexpr int TRY_LATER = 75;

std::string fieldsInJson(Parcel const& parcel) {
    OutgoingLetter const& letter = parcel.letters.front();
    json::Object fields;
    for (auto const& [name, value] : letter.fields)
        fields.set(Base::validUtf8(name), Base::validUtf8(value));
    std::ostringstream text;
    text << json::Object{{"key", letter.key},
                         {"id", parcel.mailing},
                         {"address", Base::validUtf8(letter.address)},
                         {"pages", letter.pages},
                         {"fields", fields}};
    return std::move(text).str();
}

std::string firstLine(std::string const& output) {
    return Base::oneLine(output.substr(0, output.find('\n')));
}

Outcome outcomeOf(ProgramEnd const& end, ProgramToRun const& program) {
    std::string const line = firstLine(end.output);
    std::string const words = line.empty() ? "" : ": " + line;
    switch (end.kind) {
    case ProgramEnd::Kind::OutOfTime:
        return {Outcome::Kind::Uncertain, program.program + " took more than " +
                                              std::to_string(program.timeLimit.count()) + " s and was ended" +
                                              words};
    case ProgramEnd::Kind::TooMuchOutput:
        return {Outcome::Kind::Uncertain, program.program + " wrote more than " +
                                              std::to_string(program.outputLimit) + " bytes and was ended"};
    case ProgramEnd::Kind::Killed:
        return {Outcome::Kind::Uncertain, program.program + " was ended by a signal" + words};
    case ProgramEnd::Kind::Exited:
        break;
    }
    if (end.status == 0)
        return {Outcome::Kind::Accepted, line};
    return {end.status == TRY_LATER ? Outcome::Kind::Failed : Outcome::Kind::Refused,
            program.program + " ended with status " + std::to_string(end.status) + words};
}

} // namespace

CommandCarrier::CommandCarrier(Protocol::CarrierSettings settings) : settings_(std::move(settings)) {}

std::vector<std::string> CommandCarrier::argumentsFor(Parcel const& parcel) const {
    std::vector<std::string> arguments;
    for (std::string const& text : settings_.arguments) {
        std::string filled = filledIn(text, parcel.letters.front(), parcel.mailing);
        // A value is never an option.
        if (text.starts_with('{') && filled.starts_with('-'))
            throw Base::Error(
                Base::Code::LetterUnsuitable,
                "a field of the letter begins with \"-\", which a program would take for an option");
        arguments.push_back(std::move(filled));
    }
    return arguments;
}

std::string CommandCarrier::inputFor(Parcel const& parcel) const {
    return settings_.text.empty() ? parcel.document
                                  : filledIn(settings_.text, parcel.letters.front(), parcel.mailing);
}

Outcome CommandCarrier::handOver(Parcel const& parcel, PutOnRecord const& mayHaveIt) {
    ProgramToRun program{settings_.program,
                         {},
                         settings_.user,
                         std::chrono::seconds(settings_.timeLimit),
                         static_cast<std::size_t>(settings_.outputLimit)};
    std::string input;
    try {
        program.arguments = argumentsFor(parcel);
        input = inputFor(parcel);
    } catch (Base::Error const& bad) {
        return {Outcome::Kind::Refused, bad.what()};
    }
    mayHaveIt();
    return outcomeOf(run(program, input, fieldsInJson(parcel)), program);
}

std::string CommandCarrier::test() {
    if (::access(settings_.program.c_str(), X_OK) != 0)
        throw Base::Error(Base::Code::CarrierUnavailable,
                          "there is no program " + settings_.program + " that may be run");
    return settings_.program + " can be run";
}

} // namespace Carriers

#include "programs/carriers/printer_carrier.h"

#include "programs/base/error.h"
#include "programs/base/plain_text.h"

#include <algorithm>
#include <string_view>
#include <utility>

namespace Carriers {
namespace {

constexpr std::pair<char const*, char const*> REASONS[] = {
    {"cover-open", "its cover is open"},
    {"door-open", "its door is open"},
    {"input-tray-missing", "a tray is missing"},
    {"marker-supply-empty", "out of toner or ink"},
    {"media-empty", "out of paper"},
    {"media-jam", "paper is jammed"},
    {"media-needed", "it wants paper"},
    {"offline", "it is switched off"},
    {"output-area-full", "its output is full"},
    {"paused", "it is paused"},
    {"toner-empty", "out of toner"},
};

/// Without how bad it is.
std::string_view plainReason(std::string_view reason) {
    for (std::string_view const ending : {"-error", "-warning", "-report"})
        if (reason.ends_with(ending))
            return reason.substr(0, reason.size() - ending.size());
    return reason;
}

std::string inWords(std::string const& reason) {
    auto const found = std::ranges::find(REASONS, plainReason(reason),
                                         [](auto const& row) { return std::string_view(row.first); });
    return found == std::end(REASONS) ? Base::plainLine(reason) : found->second;
}

bool isOneOf(std::string const& wanted, std::vector<std::string> const& offered) {
    return std::ranges::find(offered, wanted) != offered.end();
}

char const* colourModeOf(Printing::Colour colour) {
    switch (colour) {
    case Printing::Colour::Grey:
        return "monochrome";
    case Printing::Colour::Coloured:
        return "color";
    case Printing::Colour::AsItIs:
        break;
    }
    return "";
}

PrintWishes wishesOf(Parcel const& parcel) {
    PrintWishes wishes;
    wishes.sides = parcel.isDuplex ? "two-sided-long-edge" : "one-sided";
    wishes.colourMode = colourModeOf(parcel.printing.colour);
    wishes.media = mediaNamed(parcel.printing.width, parcel.printing.height);
    wishes.copies = parcel.printing.copies;
    return wishes;
}

/// Takes out of the wishes what the printer does not offer, and gives that on one line.
std::string notOffered(PrintWishes& wishes, PrinterFacts const& facts) {
    std::string missing;
    auto const leaveOut = [&](std::string& wish, std::vector<std::string> const& offered) {
        if (!wish.empty() && !isOneOf(wish, offered))
            missing += ", " + std::exchange(wish, {});
    };
    leaveOut(wishes.sides, facts.sides);
    leaveOut(wishes.colourMode, facts.colourModes);
    leaveOut(wishes.media, facts.media);
    if (wishes.copies > facts.mostCopies)
        missing += ", " + std::to_string(std::exchange(wishes.copies, facts.mostCopies)) + " copies";
    return missing.empty() ? missing : "; the printer does not offer " + missing.substr(2);
}

std::string nameOf(PrinterJob const& job) { return "job " + std::to_string(job.id); }

Progress progressOf(PrinterJob const& job, std::string const& hindrance) {
    using Kind = Progress::Kind;
    switch (job.state) {
    case PrinterJob::State::Printed:
        return {Kind::Delivered, nameOf(job) + " is printed"};
    case PrinterJob::State::Cancelled:
        return {Kind::Failed, nameOf(job) + " was cancelled at the printer"};
    case PrinterJob::State::Aborted:
        return {job.wasBegun ? Kind::Failed : Kind::Lost, nameOf(job) + " was aborted by the printer"};
    case PrinterJob::State::Printing:
        return {Kind::UnderWay, nameOf(job) + " is being printed" + hindrance};
    case PrinterJob::State::Waiting:
        break;
    }
    return {Kind::UnderWay, nameOf(job) + " waits at the printer" + hindrance};
}

Outcome uncertain(int job, std::string const& failure) {
    return {Outcome::Kind::Uncertain, "job " + std::to_string(job) + " may be printed: " + failure};
}

std::string list(std::vector<std::string> const& words) {
    std::string text;
    for (std::string const& word : words)
        text += (text.empty() ? "" : ", ") + Base::plainLine(word);
    return text.empty() ? "nothing" : text;
}

} // namespace

std::string reasonsInWords(std::vector<std::string> const& reasons) {
    std::string words;
    for (std::string const& reason : reasons)
        words += (words.empty() ? "" : ", ") + inWords(reason);
    return words;
}

PrinterCarrier::PrinterCarrier(std::string const& uri, StopSign const& stop)
    : uri_(uri), session_(uri, stop) {}

/// What an earlier attempt has made of jobs that the printer has done nothing with.
void PrinterCarrier::cancelLeft(std::string const& key) {
    for (PrinterJob const& job : session_.jobs())
        if (job.name == key && job.state == PrinterJob::State::Waiting && !job.wasBegun)
            session_.cancel(job.id);
}

Outcome PrinterCarrier::handOver(Parcel const& parcel, PutOnRecord const& mayHaveIt) {
    PrinterFacts const facts = session_.facts();
    if (!facts.takesJobs)
        throw Base::Error(Base::Code::CarrierUnavailable,
                          "the printer " + uri_ + " takes no jobs at the moment");
    if (!facts.takesPdf)
        throw Base::Error(Base::Code::CarrierUnsuitable, "the printer " + uri_ + " takes no PDF");
    cancelLeft(parcel.key);
    PrintWishes wishes = wishesOf(parcel);
    std::string const more = notOffered(wishes, facts);
    int const job = session_.create(parcel.key, wishes);
    mayHaveIt();
    return given(job, parcel, more);
}

Outcome PrinterCarrier::given(int job, Parcel const& parcel, std::string const& more) {
    std::string failure;
    bool isRefused = false;
    try {
        session_.send(job, parcel.document);
        return {Outcome::Kind::Accepted, "job " + std::to_string(job) + " of " + uri_ + more};
    } catch (PrinterSilence const& silence) {
        // It may print what it has while it says that the job was cancelled.
        return uncertain(job, silence.what());
    } catch (PrinterRefusal const& refusal) {
        failure = refusal.what();
        isRefused = true;
    } catch (Base::Error const& broken) {
        failure = broken.what();
    }
    if (!isTakenBack(job))
        return uncertain(job, failure);
    return {isRefused ? Outcome::Kind::Refused : Outcome::Kind::Failed, failure};
}

/// Whether nothing of it was printed, and nothing will be.
bool PrinterCarrier::isTakenBack(int job) {
    try {
        if (session_.job(job).state == PrinterJob::State::Waiting)
            session_.cancel(job);
        PrinterJob const left = session_.job(job);
        return left.isOver() && !left.wasBegun;
    } catch (Base::Error const&) {
        return false;
    }
}

std::map<std::string, Progress> PrinterCarrier::ask(std::set<std::string> const& keys) {
    std::string const reasons = reasonsInWords(session_.facts().reasons);
    std::map<std::string, Progress> progress;
    // The latest of a name counts.
    for (PrinterJob const& job : session_.jobs())
        if (keys.contains(job.name))
            progress[job.name] = toldOf(job, reasons.empty() ? reasons : ": " + reasons);
    return progress;
}

/// A job whose document never came holds up every other job of a small printer, for good.
Progress PrinterCarrier::toldOf(PrinterJob const& job, std::string const& hindrance) {
    if (!job.lacksDocument || job.state != PrinterJob::State::Waiting || job.wasBegun || !isTakenBack(job.id))
        return progressOf(job, hindrance);
    return {Progress::Kind::Lost, nameOf(job) + " never got its document, and is cancelled"};
}

std::string PrinterCarrier::test() {
    PrinterFacts const facts = session_.facts();
    if (!facts.takesPdf)
        throw Base::Error(Base::Code::CarrierUnsuitable, "the printer " + uri_ + " takes no PDF");
    std::string const reasons = reasonsInWords(facts.reasons);
    return facts.name + (facts.takesJobs ? " takes jobs" : " takes no jobs at the moment") +
           (reasons.empty() ? reasons : " (" + reasons + ')') + "; it offers " + list(facts.sides) + "; " +
           list(facts.colourModes) + "; " + list(facts.media) + "; at most " +
           std::to_string(facts.mostCopies) + (facts.mostCopies == 1 ? " copy" : " copies");
}

} // namespace Carriers

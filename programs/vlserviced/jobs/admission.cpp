#include "programs/vlserviced/jobs/admission.h"

#include "programs/base/error.h"
#include "programs/base/plain_text.h"
#include "programs/mailing/print_wishes.h"
#include "programs/policy/course.h"
#include "programs/vlserviced/store/node_id.h"

#include <algorithm>
#include <utility>
#include <vector>

namespace VlServiced {
namespace {

constexpr std::size_t MAX_TITLE_BYTES = 500;
constexpr std::size_t MAX_REASON_BYTES = 500;
constexpr long long DAY = 24 * 60 * 60;

Mailing::MailingOutline outlineOf(Mailing::PackSource& pack) {
    SharedMemBuffer const metadata = pack.metadata();
    try {
        return Mailing::outlineOf(metadata);
    } catch (std::exception const&) {
        // What is wrong would be told with values of letters.
        throw Base::Error(Base::Code::MailingDamaged,
                          "the metadata of pack " + pack.info().id + " is none of a mailing");
    }
}

/// The first few: "letters 1, 3, 4 and 7 more".
std::string numbersInWords(std::vector<long long> const& numbers) {
    constexpr std::size_t MOST = 20;
    std::string text;
    for (std::size_t i = 0; i < std::min(numbers.size(), MOST); ++i)
        text += (i == 0 ? "" : ", ") + std::to_string(numbers[i]);
    if (numbers.size() > MOST)
        text += " and " + std::to_string(numbers.size() - MOST) + " more";
    return (numbers.size() == 1 ? "letter " : "letters ") + text;
}

} // namespace

PackSummary summaryOf(Mailing::PackSource& pack) {
    PackSummary summary{pack.info().cfgId, pack.info().title, static_cast<long long>(pack.documentCount()),
                        static_cast<long long>(pack.pages().size())};
    if (summary.pages == 0)
        throw Base::Error(Base::Code::MailingInvalid, "pack " + pack.packId() + " has no pages");
    if (!Base::isPlainText(summary.title, MAX_TITLE_BYTES))
        throw Base::Error(Base::Code::MailingInvalid, "the title of pack " + pack.packId() +
                                                          " is not a line of text of at most " +
                                                          std::to_string(MAX_TITLE_BYTES) + " bytes");
    checkNodeId(summary.cfgId);
    addOutline(summary, pack);
    return summary;
}

void addOutline(PackSummary& summary, Mailing::PackSource& pack) {
    Mailing::MailingOutline outline = outlineOf(pack);
    summary.packPreset = outline.packPreset;
    summary.sheets = outline.mostSheets;
    if (!outline.again.empty() && !Base::isPlainText(outline.again, MAX_REASON_BYTES))
        throw Base::Error(Base::Code::MailingInvalid, "the reason for which pack " + pack.packId() +
                                                          " is sent again is not a line of text of at most " +
                                                          std::to_string(MAX_REASON_BYTES) + " bytes");
    summary.digests = std::move(outline.digests);
    summary.again = std::move(outline.again);
}

void requireAllowed(std::string const& packId, PackSummary const& summary, Policy::Rules const& rules,
                    Policy::Moment const& moment, Policy::PresetSource const& sourceOf) {
    std::vector<Policy::Refusal> refusals = Policy::refusalsOf(summary.packPreset, rules, moment, sourceOf);
    if (auto const refusal = Policy::refusalOfSheets(summary.sheets, rules))
        refusals.push_back(*refusal);
    if (!refusals.empty())
        throw Base::Error(Base::Code::RefusedBySettings,
                          Policy::inOneLine(refusals) + "; pack " + packId + " is not taken");
}

void enterLetters(LetterRegister& letterRegister, Job const& job, PackSummary const& summary) {
    int const days = Mailing::PrintWishes::of(summary.packPreset).duplicateDays;
    if (days == 0 || job.isTrial || summary.digests.empty())
        return;
    auto const known =
        summary.again.empty() ? LetterRegister::Known::Refused : LetterRegister::Known::SentAgain;
    std::vector<long long> const refused = letterRegister.enter(
        {job.pack.packId, job.cfgId, job.acceptedAt, job.acceptedAt + days * DAY}, summary.digests, known);
    if (!refused.empty())
        throw SentBefore(numbersInWords(refused) + " of pack " + job.pack.packId +
                             " went out before: send the others without them, or all of them with \"--again "
                             "REASON\"",
                         refused.size());
}

Job jobFor(PackLocation const& pack, PackSummary const& summary, Policy::Moment const& moment) {
    Policy::Course const course = Policy::courseOf(summary.packPreset, moment);
    Job job;
    job.pack = pack;
    job.cfgId = summary.cfgId;
    job.title = summary.title;
    job.documents = summary.documents;
    job.pages = summary.pages;
    job.acceptedAt = moment.now;
    job.toUpload = course.handsOver;
    job.toHold = course.holds;
    job.isTrial = course.isTrial;
    job.due = course.due;
    return job;
}

} // namespace VlServiced

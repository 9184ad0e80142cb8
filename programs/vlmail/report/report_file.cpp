#include "programs/vlmail/report/report_file.h"

#include "programs/base/error.h"
#include "programs/base/pending_file.h"
#include "programs/base/utf8.h"
#include "programs/vlmail/report/describe.h"

#include <algorithm>

namespace VlMail::Report {
namespace {

namespace fs = std::filesystem;

fs::path const& requireHtml(fs::path const& target) {
    if (target.extension() != ".html" && target.extension() != ".htm")
        throw Base::Error(Base::Code::Usage,
                          "cannot write a report to \"" + Base::validUtf8(target.string()) +
                              "\": its name must end in .html; give --report another name");
    return target;
}

std::size_t stuckLetters(DocumentReading const& reading) {
    return static_cast<std::size_t>(
        std::count_if(reading.letters->begin(), reading.letters->end(),
                      [](LetterReading const& letter) { return !letter.whyNot().empty(); }));
}

} // namespace

std::string stateOf(DocumentReading const& reading) {
    if (reading.failed())
        return "failed";
    if (reading.isAttachment())
        return "an attachment";
    std::size_t const stuck = stuckLetters(reading);
    std::string const letters = counted(reading.letters->size(), "letter");
    return letters + ", " + (stuck == 0 ? "ready" : std::to_string(stuck) + " cannot go out");
}

bool isTrouble(DocumentReading const& reading) {
    return reading.failed() || (reading.letters && stuckLetters(reading) > 0);
}

File::File(fs::path const& target) : target_(requireHtml(target)) {
    // Known now rather than after a long batch.
    Base::PendingFile const attempt(target_);
}

void File::take(ReadResult const& result) {
    DocumentReading const& reading = result.reading;
    entries_.push_back(
        {reading.document, stateOf(reading), isTrouble(reading),
         result.report.empty() ? section(describe(reading), entries_.size() + 1) : result.report});
}

void File::write(Outcome const& outcome) { Base::writeFile(target_, page(outcome.inWords(), entries_)); }

} // namespace VlMail::Report

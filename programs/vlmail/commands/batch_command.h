#pragma once
// What subcommands that read a batch of documents share.

#include "programs/base/command_line.h"
#include "programs/vlmail/letters/batch.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/terminal/progress.h"

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <optional>

namespace VlMail {

/// Shows on a terminal how far the batch is.
class BatchProgress : public BatchWatcher {
public:
    explicit BatchProgress(Terminal const& terminal) : terminal_(terminal) {}

    void begins(std::size_t documents) override { line_.emplace(terminal_, documents); }
    void documentsDone(std::size_t done) override { line_->documentsDone(done); }
    /// Lines may be written of what is handed over: the next step shows the progress again.
    void handsOver(std::size_t letters) override {
        line_->lettersFound(letters);
        line_->hide();
    }

private:
    Terminal const& terminal_;
    std::optional<ProgressLine> line_;
};

/// What the command line says about reading, in the units of people.
struct WorkerOptions {
    std::size_t jobs = processorCount();
    std::size_t seconds = 30;
    std::size_t mebibytes = 1024;

    Workers workers() const {
        // More is no limit at all, and would not fit.
        constexpr std::size_t MAX_SECONDS = 1'000'000'000;
        constexpr std::size_t MAX_MEBIBYTES = std::size_t{1} << 40;
        return {jobs,
                {std::chrono::seconds(std::min(seconds, MAX_SECONDS)),
                 std::uint64_t{std::min(mebibytes, MAX_MEBIBYTES)} << 20}};
    }
};

constexpr char const* DOCUMENTS_HELP =
    "The folder with the letterheads and attachments that pack presets name";

inline void addLimitOptions(Base::Command const& command, WorkerOptions& options) {
    command.addCount("--document-seconds", options.seconds, "Processor time that a document may take")
        .showDefault();
    command.addCount("--document-memory", options.mebibytes, "MiB of memory that a document may take")
        .showDefault();
}

inline void addWorkerOptions(Base::Command const& command, WorkerOptions& options) {
    command.addCount("--jobs", options.jobs, "Processes to read with");
    addLimitOptions(command, options);
}

inline ExitStatus exitStatusOf(Outcome::End end) {
    switch (end) {
    case Outcome::End::Fine:
        return FINE;
    case Outcome::End::Failed:
        break;
    case Outcome::End::Incomplete:
        return INCOMPLETE;
    }
    return FAILED;
}

} // namespace VlMail

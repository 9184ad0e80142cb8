#pragma once
// What subcommands that read a batch of documents share.

#include "programs/vlmail/letters/batch.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/terminal/progress.h"

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

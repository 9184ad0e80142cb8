#pragma once
// The report of a batch as it grows, and as a file.

#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/letters/reading.h"
#include "programs/vlmail/report/report.h"

#include <filesystem>
#include <string>
#include <vector>

namespace VlMail::Report {

/// Such as "2 letters, 1 cannot go out".
std::string stateOf(DocumentReading const& reading);
/// It failed, or some of its letters cannot go out.
bool isTrouble(DocumentReading const& reading);

/// Takes the results of a batch in its order; write() makes the file. Without it there is none.
class File {
public:
    /// Throws Error when the name is not one of an HTML file, so that a forgotten name does not cost a
    /// document, and std::system_error when no file can be made there.
    explicit File(std::filesystem::path const& target);

    void take(ReadResult const& result);
    /// Throws std::system_error.
    void write(Outcome const& outcome);

private:
    std::filesystem::path const target_;
    std::vector<Entry> entries_;
};

} // namespace VlMail::Report

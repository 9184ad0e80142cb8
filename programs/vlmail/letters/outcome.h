#pragma once
// How a batch ended.

#include "programs/vlmail/letters/reading.h"

#include <cstddef>
#include <string>
#include <vector>

namespace VlMail {

class Outcome {
public:
    enum class End {
        Fine,
        Failed,
        /// Done, but some letters cannot go out.
        Incomplete,
    };

    void count(DocumentReading const& reading);
    /// So many of those that were ready stay behind after all.
    void leaveOut(std::size_t letters) { readyLetters_ -= letters; }
    /// Something beside the documents failed.
    void fail() { failed_ = true; }

    /// "20 documents, 24 letters: 21 ready, 3 cannot go out; 1 document failed".
    std::string inWords() const;
    End end() const;

private:
    std::size_t documents_ = 0;
    std::size_t failedDocuments_ = 0;
    std::size_t letters_ = 0;
    std::size_t readyLetters_ = 0;
    bool failed_ = false;
};

/// "page 1", "pages 2-4", "pages 1, 3".
std::string pagesInWords(std::vector<int> const& pages);

/// "1 letter", "2 letters".
std::string counted(std::size_t count, std::string const& noun);

} // namespace VlMail

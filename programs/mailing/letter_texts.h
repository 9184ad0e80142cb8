#pragma once
// A mailing's metadata letter by letter, whatever their number.

#include "programs/mailing/metadata.h"

#include <string>
#include <string_view>
#include <vector>

namespace Mailing {

/// Each letter is parsed when it is asked for.
class LetterTexts {
public:
    /// Of metadata as a container holds it. Throws std::exception when it is none of a mailing.
    explicit LetterTexts(SharedMemBuffer metadata);

    /// All but the letters.
    Metadata const& mailing() const { return mailing_; }
    std::size_t size() const { return letters_.size(); }
    /// Throws std::exception when it is no letter, std::out_of_range.
    MailedLetter letter(std::size_t index) const;

    /// The same metadata with these letters alone, in the order given, and another digest of the pages, which
    /// metadata without one goes without.
    SharedMemBuffer withLetters(std::vector<std::size_t> const& indexes, std::string const& digest) const;

private:
    SharedMemBuffer text_;
    std::vector<std::string_view> letters_;
    /// The object without its letters.
    json::Object rest_;
    Metadata mailing_;
};

} // namespace Mailing

#include "programs/vlmail/letters/outcome.h"

namespace VlMail {

void Outcome::count(DocumentReading const& reading) {
    ++documents_;
    if (reading.failed())
        ++failedDocuments_;
    if (!reading.letters)
        return;
    letters_ += reading.letters->size();
    for (LetterReading const& letter : *reading.letters)
        readyLetters_ += letter.whyNot().empty();
}

std::string Outcome::inWords() const {
    std::string text = counted(documents_, "document") + ", " + counted(letters_, "letter") + ": " +
                       std::to_string(readyLetters_) + " ready, " + std::to_string(letters_ - readyLetters_) +
                       " cannot go out";
    if (failedDocuments_ > 0)
        text += "; " + counted(failedDocuments_, "document") + " failed";
    return text;
}

Outcome::End Outcome::end() const {
    if (failed_ || failedDocuments_ > 0)
        return End::Failed;
    return readyLetters_ < letters_ ? End::Incomplete : End::Fine;
}

std::string pagesInWords(std::vector<int> const& pages) {
    std::string text;
    for (std::size_t i = 0; i < pages.size();) {
        std::size_t end = i + 1;
        while (end < pages.size() && pages[end] == pages[end - 1] + 1)
            ++end;
        text += (text.empty() ? "" : ", ") + std::to_string(pages[i]);
        if (end - i > 1)
            text += '-' + std::to_string(pages[end - 1]);
        i = end;
    }
    return (pages.size() == 1 ? "page " : "pages ") + text;
}

std::string counted(std::size_t count, std::string const& noun) {
    return std::to_string(count) + ' ' + noun + (count == 1 ? "" : "s");
}

} // namespace VlMail

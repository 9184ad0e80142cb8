#pragma once
// A mailing as its container in the outbox has it, page by page and letter by letter.

#include "programs/mailing/letter_texts.h"
#include "vlservice/pack/pack_wrapper.h"

#include <filesystem>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <utility>

namespace VlServiced {

/// Used by one thread at a time.
class OutboxMailing {
public:
    /// Throws Error when there is no whole container of a mailing. What is wrong is told without words of the
    /// mailing, here and below.
    explicit OutboxMailing(std::filesystem::path const& container);

    std::string const& id() const { return container_.packId(); }
    Mailing::LetterTexts const& letters() const { return *letters_; }

    /// The entries of a letter's pages. Throws Error when one of them is not there.
    std::set<unsigned long long> entriesOf(Mailing::MailedLetter const& letter) const;
    unsigned long long entryOf(std::string const& document, int page) const;
    PackWrapper::BinEntry const& entry(unsigned long long at) const { return container_.bin(at); }
    /// As the container has it. Throws Error when it is damaged.
    SharedMemBuffer blob(unsigned long long at);

private:
    PackWrapper container_;
    /// By the names of document and page.
    std::map<std::pair<std::string, std::string>, unsigned long long> entries_;
    std::optional<Mailing::LetterTexts> letters_;
};

} // namespace VlServiced

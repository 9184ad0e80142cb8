#pragma once
// Makes a mailing out of letters: stores their pages and groups those that go out as one.

#include "programs/mailing/entries_digest.h"
#include "programs/mailing/metadata.h"
#include "programs/vlmail/letters/reading.h"
#include "vlservice/pack/page_saver.h"

#include <cstddef>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <vector>

namespace VlMail {

class MailingBuilder {
public:
    /// Pages go to `pages` as they come; its packId() names the mailing.
    MailingBuilder(PageSaverI& pages, std::string id, Cfg::PackPreset packPreset, long long created);

    /// A name for a document that no other document of this mailing has: two files of one name may lie in two
    /// folders.
    std::string nameFor(std::string const& document);

    /// Adds a letter under a name from nameFor(), and its pages.
    /// A letter that equals an earlier one in all that must agree joins it, unless the pack preset forbids
    /// grouping; one whose other values cannot be merged stays alone.
    void add(std::string const& document, LetterReading letter);

    Mailing::Metadata const& metadata() const { return metadata_; }
    std::size_t letterCount() const { return letterCount_; }
    std::size_t pageCount() const { return pageCount_; }

private:
    bool joinGroup(LetterReading const& letter, Mailing::DocumentPages const& pages);

    PageSaverI& pages_;
    Mailing::Metadata metadata_;
    Mailing::EntriesDigest digest_;
    std::unordered_set<std::string> documents_;
    /// Positions in metadata_.letters of those that a further letter may join, by what must agree.
    std::unordered_multimap<std::string, std::size_t> groups_;
    std::size_t letterCount_ = 0;
    std::size_t pageCount_ = 0;
};

} // namespace VlMail

#pragma once
// Makes a mailing out of letters: stores their pages, groups those that go out as one, and lays out what each
// of them is on paper.

#include "programs/mailing/entries_digest.h"
#include "programs/mailing/metadata.h"
#include "programs/vlmail/letters/making_ready.h"
#include "programs/vlmail/letters/reading.h"
#include "vlservice/pack/page_saver.h"

#include <cstddef>
#include <functional>
#include <map>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <utility>
#include <vector>

namespace VlMail {

// Of paper, by the pages of each part and whether the pack preset prints on both sides. A letter that goes
// out alone, with its cover page.
long long sheetsOf(LetterReading const& letter, Cfg::PackPreset const& packPreset);
long long sheetsOf(std::vector<MadeAttachment> const& attachments, Cfg::PackPreset const& packPreset);

class MailingBuilder {
public:
    /// Pages go to `pages` as they come; its packId() names the mailing.
    MailingBuilder(PageSaverI& pages, std::string id, Cfg::PackPreset packPreset, long long created);

    /// A name for a document that no other document of this mailing has: two files of one name may lie in two
    /// folders.
    std::string nameFor(std::string const& document);

    /// Adds a letter under a name from nameFor(), and its pages; of large pages of a document that are the
    /// same the first is stored. A letter that equals an earlier one in all that must agree joins it, unless
    /// the pack preset forbids grouping; one whose other values cannot be merged stays alone.
    void add(std::string const& document, LetterReading letter);

    /// Takes the attachments of the pack preset, in the order of its list, and the documents that were used.
    /// Their pages are stored when the mailing has letters.
    void useDocuments(std::vector<MadeAttachment> const& attachments, std::vector<UsedDocument> const& used);

    void setPurchaseOrder(std::string code) { metadata_.purchaseOrder = std::move(code); }

    /// Why the letters go out although they did before.
    void setAgain(std::string reason) { metadata_.again = std::move(reason); }

    /// A letter joins no group that would have a number of sheets then that `allows` denies.
    void limitGroups(std::function<bool(long long sheets)> allows) { allows_ = std::move(allows); }

    /// Completes the letters, and stores what they share: attachments and blank sides.
    Mailing::Metadata const& finish();

    /// Of the letters as finish() has left them.
    Mailing::Metadata const& metadata() const { return metadata_; }
    std::size_t letterCount() const { return letterCount_; }
    std::size_t pageCount() const { return pageCount_; }

private:
    /// A part of a letter, without a blank side.
    struct Part {
        Mailing::DocumentPages pages;
        /// Of the last page.
        Production::PageSize size = {};
        long long colouredPages = 0;
    };
    /// Letters that go out as one, or a letter alone.
    struct Group {
        /// A cover page, or nothing.
        std::vector<Part> cover;
        std::vector<Part> letters;
        Cfg::ExtractedFields fields;
        /// Of its letters and the cover page.
        long long sheets = 0;
        /// Of its letters.
        std::vector<std::string> digests = {};
    };
    enum class Place { First, Later };

    /// The group that the letter has joined, or nullptr.
    Group* joinedGroup(LetterReading const& letter);
    static void noteDigest(Group& group, LetterReading const& letter);
    Part stored(std::string const& document, std::vector<PageBlob> const& pages, Place place);
    int storedPage(std::string const& document, int number, SharedMemBuffer const& data);
    void save(std::string const& document, int number, SharedMemBuffer const& data);
    std::vector<Part> storedCover(std::vector<PageBlob> cover);
    void storeAttachments();
    Mailing::MailedLetter composed(Group const& group);
    std::vector<Part const*> partsOf(Group const& group) const;
    Mailing::DocumentPages blankSide(Production::PageSize size);

    PageSaverI& pages_;
    Mailing::Metadata metadata_;
    Mailing::EntriesDigest digest_;
    std::unordered_set<std::string> documents_;
    std::vector<Group> groups_;
    /// Positions in groups_ of those that a further letter may join, by what must agree.
    std::unordered_multimap<std::string, std::size_t> byFields_;
    /// Numbers of stored pages by their document's name and their digest.
    std::unordered_map<std::string, int> byContent_;
    std::vector<MadeAttachment> attachments_;
    std::function<bool(long long sheets)> allows_ = [](long long) { return true; };
    /// In the order in which they go out.
    std::vector<Part> inFront_;
    std::vector<Part> behind_;
    std::string coverName_;
    int covers_ = 0;
    std::string blankName_;
    std::map<std::pair<int, int>, int> blankSides_;
    std::size_t letterCount_ = 0;
    std::size_t pageCount_ = 0;
};

} // namespace VlMail

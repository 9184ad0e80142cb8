#include "programs/vlmail/pack/container_check.h"

#include "programs/base/quoting.h"
#include "programs/mailing/entries_digest.h"
#include "programs/mailing/metadata.h"

#include <map>
#include <optional>
#include <set>
#include <utility>

namespace VlMail {
namespace {

using Entry = ContainerFile::Entry;
/// Document and page.
using PageName = std::pair<std::string, std::string>;

std::string inWords(PageName const& name) {
    return "page " + name.second + " of " + Base::inQuotes(name.first);
}

std::map<PageName, std::size_t> pagesOfMetadata(Mailing::Metadata const& metadata) {
    std::map<PageName, std::size_t> names;
    for (Mailing::MailedLetter const& letter : metadata.letters)
        for (Mailing::DocumentPages const& document : letter.documents)
            for (int const page : document.pages)
                ++names[{document.document, std::to_string(page)}];
    return names;
}

class Checker {
public:
    explicit Checker(ContainerFile& container) : container_(container), digest_(container.packId()) {}

    ContainerCheck check() {
        for (unsigned long long i = 0; i < container_.size(); ++i)
            look(container_.entry(i), container_.blob(i));
        result_.documents = documents_.size();
        if (!hasMetadata_)
            damaged("the metadata", "it is missing");
        else if (metadata_)
            compareWithMetadata();
        return std::move(result_);
    }

private:
    void look(Entry const& entry, ContainerFile::Blob const& blob) {
        if (isPage(entry))
            lookAtPage(entry);
        else if (std::exchange(hasMetadata_, true))
            damaged("entry " + Base::inQuotes(entry.name), "it is neither a page nor the metadata");
        else
            lookAtMetadata(entry, blob);
        if (!blob.damage.empty())
            damaged(VlMail::inWords(entry), blob.damage);
    }

    void lookAtPage(Entry const& entry) {
        ++result_.pages;
        documents_.insert(entry.document);
        digest_.add(entry.document, entry.name, entry.length, entry.crc);
        if (++found_[{entry.document, entry.name}] == 2)
            damaged(VlMail::inWords(entry), "it stands in the index twice");
        if (entry.name == Container::JOB_METADATA)
            damaged(VlMail::inWords(entry), "it has the name of the metadata");
    }

    /// Metadata of another program says nothing that could be compared.
    void lookAtMetadata(Entry const& entry, ContainerFile::Blob const& blob) {
        try {
            if (blob.damage.empty())
                metadata_ = Mailing::Metadata::fromBlob(blob.bytes);
        } catch (std::exception const&) {
        }
        // That of another program may have another name, but is of no document either.
        bool const isOther =
            metadata_ && (entry.name != Container::JOB_METADATA || entry.role != Container::ROLE_FRAMEWORK);
        if (isOther || !entry.document.empty())
            damaged("the metadata", "its entry in the index is another than was written");
    }

    void compareWithMetadata() {
        std::size_t const before = result_.damages.size();
        if (metadata_->id != container_.packId())
            damaged("the id", "the index says " + Base::inQuotes(container_.packId()) + ", the metadata " +
                                  Base::inQuotes(metadata_->id));
        auto const known = pagesOfMetadata(*metadata_);
        for (auto const& [name, count] : found_)
            if (!known.contains(name))
                damaged(inWords(name), "the metadata does not know it");
        for (auto const& [name, count] : known)
            if (!found_.contains(name))
                damaged(inWords(name), "it is missing");
        if (result_.damages.size() == before && !metadata_->entriesDigest.empty() &&
            metadata_->entriesDigest != digest_.text())
            damaged("the index", "it is another than was written");
    }

    void damaged(std::string const& what, std::string const& how) {
        result_.damages.push_back(what + ": " + how);
    }

    ContainerFile& container_;
    ContainerCheck result_;
    Mailing::EntriesDigest digest_;
    std::set<std::string> documents_;
    std::map<PageName, std::size_t> found_;
    std::optional<Mailing::Metadata> metadata_;
    bool hasMetadata_ = false;
};

} // namespace

ContainerCheck checkContainer(ContainerFile& container) { return Checker(container).check(); }

} // namespace VlMail

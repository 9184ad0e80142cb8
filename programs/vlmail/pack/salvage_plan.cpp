#include "programs/vlmail/pack/salvage_plan.h"

#include "programs/mailing/metadata.h"
#include "programs/mailing/page_blob.h"
#include "programs/vlmail/pack/blob_extent.h"
#include "programs/vlmail/pack/index_remains.h"
#include "vlservice/pack/blob_format.h"
#include "vlservice/pack/container_format.h"
#include "vlservice/pack/little_endian.h"

#include <zlib.h>

#include <algorithm>
#include <iterator>
#include <map>
#include <set>
#include <tuple>
#include <utility>

namespace VlMail {
namespace {

/// Larger data is not tried as metadata.
constexpr std::uint64_t LARGEST_METADATA = std::uint64_t{1} << 28;
constexpr char const* NUMBERED_DOCUMENT = "salvaged";

SharedMemBuffer bytesOf(ByteFile& file, FoundBlob const& blob) {
    SharedMemBuffer bytes;
    bytes.resize(blob.length);
    bytes.resize(file.read(blob.offset, bytes.data(), static_cast<std::size_t>(blob.length)));
    return bytes;
}

std::uint32_t checksumOf(ByteFile& file, FoundBlob const& blob) {
    SharedMemBuffer const bytes = bytesOf(file, blob);
    return static_cast<std::uint32_t>(crc32_z(0, bytes.data(), bytes.size()));
}

/// What the offsets in the index count from.
std::uint64_t blobAreaStart(ByteFile& file) {
    std::string_view const first = file.bytesAt(0, Container::WIDE_ID_LENGTH_AT + sizeof(std::uint32_t));
    if (first.size() < Container::WIDE_ID_LENGTH_AT + sizeof(std::uint32_t))
        return 0;
    for (std::size_t i = 0; i < Container::WIDE_MAGIC.size(); ++i)
        if (LittleEndian::load<std::uint16_t>(first.data() + i * sizeof(char16_t)) !=
            Container::WIDE_MAGIC[i])
            return 0;
    return Container::WIDE_ID_LENGTH_AT + Container::WIDE_ID_EXTRA +
           std::uint64_t{LittleEndian::load<std::uint32_t>(first.data() + Container::WIDE_ID_LENGTH_AT)};
}

/// The pages that the metadata names, in the order in which they were stored; none when that order cannot be
/// told: grouping moves a document to letters that were stored earlier, and what several letters share may be
/// stored at any time.
std::vector<PageName> storedOrder(Mailing::Metadata const& metadata) {
    using Mailing::DocumentPages;
    bool const isGrouped = std::any_of(metadata.letters.begin(), metadata.letters.end(),
                                       [](auto const& letter) { return letter.documents.size() > 1; });
    if (isGrouped && metadata.letters.size() > 1)
        return {};
    std::vector<PageName> names;
    std::set<PageName> known;
    for (Mailing::MailedLetter const& letter : metadata.letters)
        for (DocumentPages const& document : letter.documents) {
            if (document.role != DocumentPages::Role::Letter)
                return {};
            for (int const page : document.pages)
                if (PageName name{document.document, std::to_string(page)}; known.insert(name).second)
                    names.push_back(std::move(name));
        }
    return names;
}

std::set<PageName> allNames(Mailing::Metadata const& metadata) {
    std::set<PageName> names;
    for (Mailing::MailedLetter const& letter : metadata.letters)
        for (Mailing::DocumentPages const& document : letter.documents)
            for (int const page : document.pages)
                names.insert({document.document, std::to_string(page)});
    return names;
}

/// Told by its name as well: an item whose role is damaged is a page still.
bool isMetadata(PackWrapper::BinEntry const& item) {
    return item.name == Container::JOB_METADATA || item.role == Container::ROLE_FRAMEWORK;
}

class Planner {
public:
    explicit Planner(ByteFile& file) : file_(file), areaStart_(blobAreaStart(file)) {}

    SalvagePlan plan() {
        findBlobs();
        remains_ = findIndexRemains(file_);
        matchByChecksum();
        matchByOffset();
        findPlainBlobs();
        chooseMetadata();
        nameByMetadata();
        numberTheRest();
        return result();
    }

private:
    using Item = PackWrapper::BinEntry;

    /// Position, length and checksum.
    using Print = std::tuple<std::uint64_t, std::uint64_t, std::uint32_t>;

    struct Candidate {
        FoundBlob blob;
        std::optional<std::size_t> item = {};
        std::optional<PageName> fromMetadata = {};
        std::optional<PageName> number = {};
        bool isMetadata = false;
    };

    ReadBytes reader() {
        return [this](std::uint64_t position, void* to, std::size_t count) {
            return file_.read(position, to, count);
        };
    }

    void findBlobs() {
        ReadBytes const read = reader();
        auto at = file_.find(DB_ZIP_MAGIC, 0);
        while (at) {
            std::uint64_t next = *at + 1;
            if (auto const extent = blobExtent(read, *at)) {
                candidates_.push_back(
                    {{*at, extent->length, extent->dataSize,
                      extent->headerIsTrue ? FoundBlob::Form::Compressed : FoundBlob::Form::WrongHeader}});
                next = *at + extent->length;
            } else if (beginsAsBlob(read, *at)) {
                damagedAt_.push_back(*at);
            }
            at = file_.find(DB_ZIP_MAGIC, next);
        }
    }

    /// The surest. Where bytes were lost the places are wrong, but the checksums still hold; the place
    /// decides among blobs of the same bytes.
    void matchByChecksum() {
        std::vector<std::uint32_t> checksums;
        for (Candidate const& candidate : candidates_)
            checksums.push_back(checksumOf(file_, candidate.blob));
        for (bool const inPlace : {true, false}) {
            std::multimap<Print, std::size_t> items;
            for (std::size_t const i : unmatchedItems()) {
                Item const& item = remains_.items[i];
                items.emplace(Print{inPlace ? positionOf(item) : 0, item.length, item.crc}, i);
            }
            for (std::size_t i = 0; i < candidates_.size(); ++i) {
                FoundBlob const& blob = candidates_[i].blob;
                auto const found = items.find({inPlace ? blob.offset : 0, blob.length, checksums[i]});
                if (candidates_[i].item || found == items.end())
                    continue;
                candidates_[i].item = found->second;
                items.erase(found);
            }
        }
    }

    /// For items whose own checksum or length is damaged, and for blobs whose header is.
    void matchByOffset() {
        std::map<std::uint64_t, std::size_t> items;
        for (std::size_t const i : unmatchedItems())
            items.emplace(positionOf(remains_.items[i]), i);
        for (Candidate& candidate : candidates_) {
            auto const found = items.find(candidate.blob.offset);
            if (!candidate.item && found != items.end())
                candidate.item = found->second;
        }
    }

    /// Where blobs that were found begin and end.
    using Taken = std::map<std::uint64_t, std::uint64_t>;

    /// Whether some of the bytes belong to another blob: an entry may stand in the index twice, or be forged.
    static bool isTaken(Taken const& taken, FoundBlob const& blob) {
        auto const behind = taken.lower_bound(blob.offset + blob.length);
        return behind != taken.begin() && std::prev(behind)->second > blob.offset;
    }

    void findPlainBlobs() {
        Taken taken;
        for (Candidate const& candidate : candidates_)
            taken.emplace(candidate.blob.offset, candidate.blob.offset + candidate.blob.length);
        for (std::size_t const i : unmatchedItems()) {
            Item const& item = remains_.items[i];
            std::uint64_t const position = positionOf(item);
            if (item.length == 0 || item.length > file_.size() || position > file_.size() - item.length)
                continue;
            FoundBlob const blob{position, item.length, item.length, FoundBlob::Form::Plain};
            if (isTaken(taken, blob) || checksumOf(file_, blob) != item.crc)
                continue;
            taken.emplace(position, position + item.length);
            candidates_.push_back({blob, i});
        }
        std::stable_sort(candidates_.begin(), candidates_.end(), [](Candidate const& a, Candidate const& b) {
            return a.blob.offset < b.blob.offset;
        });
    }

    /// The first one that the index names, and that reads as metadata where that is wanted: the roles of two
    /// items may be exchanged.
    std::vector<Candidate>::iterator findNamedMetadata(bool isReadable) {
        return std::find_if(candidates_.begin(), candidates_.end(), [&](Candidate const& candidate) {
            return candidate.item && isMetadata(remains_.items[*candidate.item]) &&
                   (!isReadable || asMetadata(candidate));
        });
    }

    /// The one that the index names, else the last one that reads as metadata.
    void chooseMetadata() {
        auto chosen = findNamedMetadata(true);
        if (chosen == candidates_.end())
            chosen = findNamedMetadata(false);
        if (chosen != candidates_.end()) {
            metadata_ = asMetadata(*chosen);
        } else {
            auto const last =
                std::find_if(candidates_.rbegin(), candidates_.rend(), [this](Candidate& candidate) {
                    metadata_ = candidate.item ? std::nullopt : asMetadata(candidate);
                    return metadata_.has_value();
                });
            chosen = last == candidates_.rend() ? candidates_.end() : std::prev(last.base());
        }
        if (chosen != candidates_.end())
            chosen->isMetadata = true;
    }

    std::optional<Mailing::Metadata> asMetadata(Candidate const& candidate) {
        if (candidate.blob.dataSize > LARGEST_METADATA)
            return std::nullopt;
        try {
            return Mailing::Metadata::fromBlob(salvagedBlob(file_, candidate.blob));
        } catch (std::exception const&) {
            return std::nullopt; // a page, or the metadata of another program
        }
    }

    /// Only where nothing has to be guessed: as many names are left as pages without one.
    void nameByMetadata() {
        if (!metadata_)
            return;
        std::vector<PageName> left;
        std::set<PageName> const taken = namesInUse();
        for (PageName& name : storedOrder(*metadata_))
            if (!taken.contains(name))
                left.push_back(std::move(name));
        std::vector<Candidate*> const unnamed = unnamedPages();
        if (left.size() != unnamed.size())
            return;
        for (std::size_t i = 0; i < unnamed.size(); ++i)
            unnamed[i]->fromMetadata = left[i];
    }

    void numberTheRest() {
        std::string document = NUMBERED_DOCUMENT;
        std::set<PageName> const taken = namesInUse();
        while (std::any_of(taken.begin(), taken.end(),
                           [&](PageName const& name) { return name.document == document; }))
            document += '_';
        int number = 0;
        for (Candidate* const page : unnamedPages())
            page->number = PageName{document, std::to_string(++number)};
    }

    SalvagePlan result() {
        SalvagePlan plan;
        plan.packId = packId();
        for (Candidate const& candidate : candidates_) {
            if (candidate.isMetadata)
                plan.metadata = candidate.blob;
            else
                plan.pages.push_back({candidate.blob, *nameOf(candidate), namedBy(candidate)});
        }
        plan.lost = lostPages();
        plan.damagedAt = damagedAt_;
        return plan;
    }

    std::string packId() const {
        if (remains_.packId)
            return *remains_.packId;
        return metadata_ ? metadata_->id : file_.path().stem().string();
    }

    /// Takes out of damagedAt_ what it gives a name to.
    std::vector<LostPage> lostPages() {
        std::vector<LostPage> lost;
        std::set<PageName> known = namesInUse();
        for (std::size_t const i : unmatchedItems()) {
            Item const& item = remains_.items[i];
            bool const isDamaged = std::erase(damagedAt_, positionOf(item)) > 0;
            if (!isMetadata(item) && item.length > 0 && known.insert({item.document, item.name}).second)
                lost.push_back({{item.document, item.name}, isDamaged});
        }
        for (PageName const& name : metadata_ ? allNames(*metadata_) : std::set<PageName>())
            if (known.insert(name).second)
                lost.push_back({name, false});
        return lost;
    }

    std::uint64_t positionOf(Item const& item) const { return areaStart_ + item.offset; }

    std::vector<std::size_t> unmatchedItems() const {
        std::vector<bool> matched(remains_.items.size());
        for (Candidate const& candidate : candidates_)
            if (candidate.item)
                matched[*candidate.item] = true;
        std::vector<std::size_t> unmatched;
        for (std::size_t i = 0; i < matched.size(); ++i)
            if (!matched[i])
                unmatched.push_back(i);
        return unmatched;
    }

    std::optional<PageName> nameOf(Candidate const& candidate) const {
        if (candidate.item)
            return PageName{remains_.items[*candidate.item].document, remains_.items[*candidate.item].name};
        return candidate.fromMetadata ? candidate.fromMetadata : candidate.number;
    }

    static NamedBy namedBy(Candidate const& candidate) {
        if (candidate.item)
            return NamedBy::Index;
        return candidate.fromMetadata ? NamedBy::Metadata : NamedBy::Nothing;
    }

    std::set<PageName> namesInUse() const {
        std::set<PageName> names;
        for (Candidate const& candidate : candidates_)
            if (auto const name = nameOf(candidate); name && !candidate.isMetadata)
                names.insert(*name);
        return names;
    }

    std::vector<Candidate*> unnamedPages() {
        std::vector<Candidate*> pages;
        for (Candidate& candidate : candidates_)
            if (!candidate.isMetadata && !nameOf(candidate))
                pages.push_back(&candidate);
        return pages;
    }

    ByteFile& file_;
    std::uint64_t areaStart_;
    std::vector<Candidate> candidates_;
    std::vector<std::uint64_t> damagedAt_;
    IndexRemains remains_;
    std::optional<Mailing::Metadata> metadata_;
};

} // namespace

bool SalvagePlan::isComplete() const {
    return metadata && lost.empty() && damagedAt.empty() &&
           std::none_of(pages.begin(), pages.end(),
                        [](SavedPage const& page) { return page.namedBy == NamedBy::Nothing; });
}

SalvagePlan planSalvage(ByteFile& file) { return Planner(file).plan(); }

SharedMemBuffer salvagedBlob(ByteFile& file, FoundBlob const& blob) {
    SharedMemBuffer bytes = bytesOf(file, blob);
    if (blob.form == FoundBlob::Form::Plain)
        return Mailing::compressed(Mailing::viewOf(bytes));
    if (blob.form == FoundBlob::Form::WrongHeader)
        LittleEndian::store(blob.dataSize, bytes.data() + DB_ZIP_MAGIC.size());
    return bytes;
}

} // namespace VlMail

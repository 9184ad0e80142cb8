#include "programs/vlmail/mailings/mailing_builder.h"

#include "programs/base/digest.h"
#include "programs/mailing/page_blob.h"
#include "programs/production/letter_parts.h"
#include "programs/reader/text_pdf.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <filesystem>
#include <sstream>
#include <utility>

namespace VlMail {
namespace {

/// In bytes. What is smaller is stored under each page's own number: it costs less than to look.
constexpr unsigned long long WORTH_SHARING = 16 << 10;

/// Letters of one group have the same key; the other way round it is sameAs() that decides.
std::string groupKey(Cfg::ExtractedFields const& fields) {
    std::ostringstream key;
    for (auto const& [priority, field] : fields) {
        if (!field.ignoreOnCompare())
            key << field.name() << '\0' << field.rawValue() << '\0';
    }
    return std::move(key).str();
}

/// Shares nothing with the original: a collected array would otherwise grow in both.
Cfg::ExtractedFields deepCopy(Cfg::ExtractedFields const& fields) {
    return Cfg::ExtractedFields(json::Value(json_deep_copy(fields.serialize().node())).toArray());
}

Production::Sides sidesOf(Cfg::PackPreset const& packPreset) {
    return packPreset.duplex() ? Production::Sides::Both : Production::Sides::One;
}

/// Those of its own pages: what joins a group gets no cover page.
long long ownSheetsOf(LetterReading const& letter, Cfg::PackPreset const& packPreset) {
    std::size_t const pages = letter.blobs.empty() ? letter.pages.size() : letter.blobs.size();
    return Production::sheetsOf({static_cast<int>(pages)}, sidesOf(packPreset));
}

} // namespace

long long sheetsOf(LetterReading const& letter, Cfg::PackPreset const& packPreset) {
    return ownSheetsOf(letter, packPreset) + (letter.coverAddress.empty() ? 0 : 1);
}

long long sheetsOf(std::vector<MadeAttachment> const& attachments, Cfg::PackPreset const& packPreset) {
    std::vector<int> pageCounts;
    for (MadeAttachment const& attachment : attachments)
        pageCounts.push_back(static_cast<int>(attachment.pages.size()));
    return Production::sheetsOf(pageCounts, sidesOf(packPreset));
}

MailingBuilder::MailingBuilder(PageSaverI& pages, std::string id, Cfg::PackPreset packPreset,
                               long long created)
    : pages_(pages), metadata_{std::move(id), created, std::move(packPreset), {}}, digest_(metadata_.id) {}

std::string MailingBuilder::nameFor(std::string const& document) {
    std::filesystem::path const path(document);
    std::string name = document;
    for (int copy = 2; !documents_.insert(name).second; ++copy)
        name = path.stem().string() + " (" + std::to_string(copy) + ')' + path.extension().string();
    return name;
}

void MailingBuilder::add(std::string const& document, LetterReading letter) {
    pageCount_ += letter.pages.size();
    ++letterCount_;
    if (Group* const group = metadata_.packPreset.noGroup() ? nullptr : joinedGroup(letter)) {
        group->sheets += ownSheetsOf(letter, metadata_.packPreset);
        group->letters.push_back(stored(document, letter.blobs, Place::Later));
        noteDigest(*group, letter);
        return;
    }
    byFields_.emplace(groupKey(letter.fields), groups_.size());
    long long const sheets = sheetsOf(letter, metadata_.packPreset);
    groups_.push_back({storedCover(std::move(letter.cover)),
                       {stored(document, letter.blobs, Place::First)},
                       std::move(letter.fields),
                       sheets});
    noteDigest(groups_.back(), letter);
}

void MailingBuilder::noteDigest(Group& group, LetterReading const& letter) {
    if (!letter.digest.empty())
        group.digests.push_back(letter.digest);
}

/// The window shows the first sheet of those that go out as one: only the first letter's counts.
std::vector<MailingBuilder::Part> MailingBuilder::storedCover(std::vector<PageBlob> cover) {
    if (cover.empty())
        return {};
    if (coverName_.empty())
        coverName_ = nameFor("cover page");
    for (PageBlob& page : cover)
        page.number = ++covers_;
    return {stored(coverName_, cover, Place::First)};
}

MailingBuilder::Group* MailingBuilder::joinedGroup(LetterReading const& letter) {
    auto const [begin, end] = byFields_.equal_range(groupKey(letter.fields));
    long long const more =
        ownSheetsOf(letter, metadata_.packPreset) + sheetsOf(attachments_, metadata_.packPreset);
    auto const found = std::find_if(begin, end, [&](auto const& entry) {
        Group const& group = groups_[entry.second];
        return group.fields.sameAs(letter.fields) && allows_(group.sheets + more);
    });
    if (found == end)
        return nullptr;
    Group& group = groups_[found->second];
    try {
        Cfg::ExtractedFields combined = deepCopy(group.fields);
        combined.combineOnGroup(letter.fields);
        group.fields = std::move(combined);
    } catch (json::Exc const&) {
        return nullptr;
    }
    return &group;
}

MailingBuilder::Part MailingBuilder::stored(std::string const& document, std::vector<PageBlob> const& pages,
                                            Place place) {
    Part part{{document, {}}};
    for (PageBlob const& page : pages) {
        bool const isOther = place == Place::Later && !page.laterData.empty();
        part.pages.pages.push_back(storedPage(document, page.number, isOther ? page.laterData : page.data));
        part.size = page.size;
        part.colouredPages += place == Place::Later ? page.isLaterColoured : page.isColoured;
    }
    return part;
}

int MailingBuilder::storedPage(std::string const& document, int number, SharedMemBuffer const& data) {
    if (data.size() < WORTH_SHARING) {
        save(document, number, data);
        return number;
    }
    std::string const content = document + '\0' + Base::sha256(Mailing::viewOf(data));
    auto const [known, isNew] = byContent_.emplace(content, number);
    if (isNew)
        save(document, number, data);
    return known->second;
}

void MailingBuilder::save(std::string const& document, int number, SharedMemBuffer const& data) {
    pages_.savePage(document, std::to_string(number), data);
    digest_.add(document, std::to_string(number), data);
    metadata_.entriesDigest = digest_.text();
}

void MailingBuilder::useDocuments(std::vector<MadeAttachment> const& attachments,
                                  std::vector<UsedDocument> const& used) {
    attachments_ = attachments;
    for (UsedDocument const& document : used)
        metadata_.usedDocuments.push_back({document.id, document.sha256});
}

Mailing::Metadata const& MailingBuilder::finish() {
    if (!groups_.empty())
        storeAttachments();
    metadata_.madeReady = true;
    metadata_.letters.clear();
    for (Group const& group : groups_)
        metadata_.letters.push_back(composed(group));
    return metadata_;
}

void MailingBuilder::storeAttachments() {
    std::vector<MadeAttachment> const attachments = std::exchange(attachments_, {});
    std::map<std::string, Part> stores;
    auto const store = [&](std::size_t at) {
        MadeAttachment const& attachment = attachments.at(at);
        auto found = stores.find(attachment.id);
        if (found == stores.end())
            found = stores
                        .emplace(attachment.id,
                                 stored(nameFor(attachment.document), attachment.pages, Place::First))
                        .first;
        found->second.pages.role = Mailing::DocumentPages::Role::Attachment;
        return found->second;
    };
    if (attachments.empty())
        return;
    Production::AttachmentOrder const order = Production::orderOf(metadata_.packPreset.attachments());
    for (std::size_t const at : order.inFront)
        inFront_.push_back(store(at));
    for (std::size_t const at : order.behind)
        behind_.push_back(store(at));
}

std::vector<MailingBuilder::Part const*> MailingBuilder::partsOf(Group const& group) const {
    std::vector<Part const*> parts;
    for (auto const* const some : {&group.cover, &inFront_, &group.letters, &behind_})
        for (Part const& part : *some)
            parts.push_back(&part);
    return parts;
}

Mailing::MailedLetter MailingBuilder::composed(Group const& group) {
    Production::Sides const sides = sidesOf(metadata_.packPreset);
    Mailing::MailedLetter letter{{}, group.fields};
    letter.digests = group.digests;
    std::vector<int> pageCounts;
    std::vector<Part const*> const parts = partsOf(group);
    for (Part const* const part : parts) {
        pageCounts.push_back(static_cast<int>(part->pages.pages.size()));
        letter.colouredPages += part->colouredPages;
        letter.documents.push_back(part->pages);
        if (part != parts.back() && Production::endsWithBlank(pageCounts.back(), sides))
            letter.documents.push_back(blankSide(part->size));
    }
    letter.sheets = Production::sheetsOf(pageCounts, sides);
    return letter;
}

Mailing::DocumentPages MailingBuilder::blankSide(Production::PageSize size) {
    if (blankName_.empty())
        blankName_ = nameFor("blank");
    int const next = static_cast<int>(blankSides_.size()) + 1;
    auto const [side, isNew] = blankSides_.emplace(std::pair{size.width, size.height}, next);
    if (isNew)
        save(blankName_, next,
             Mailing::compressed(Reader::pdfOfTypedPage({1, size.width, size.height, {}, {}}, blankName_)));
    return {blankName_, {side->second}, Mailing::DocumentPages::Role::Blank};
}

} // namespace VlMail

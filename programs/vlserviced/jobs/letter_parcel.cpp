#include "programs/vlserviced/jobs/letter_parcel.h"

#include "programs/base/error.h"
#include "programs/base/safe_name.h"
#include "programs/mailing/page_blob.h"
#include "programs/mailing/print_wishes.h"
#include "programs/production/joined_pages.h"
#include "programs/vlserviced/jobs/outbox_mailing.h"

#include <map>
#include <utility>

namespace VlServiced {
namespace {

using Role = Mailing::DocumentPages::Role;

/// What one document may hold.
constexpr std::size_t MAX_PARCEL_BYTES = std::size_t{512} << 20;

Mailing::MailedLetter letterOf(OutboxMailing const& mailing, StoredLetter const& letter) {
    try {
        return mailing.letters().letter(static_cast<std::size_t>(letter.id.number - 1));
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const&) {
        throw Base::Error(Base::Code::MailingDamaged, "what the mailing says of the letter cannot be read");
    }
}

std::string textOf(Cfg::ExtractedField const& field) {
    try {
        return field.valueToStr();
    } catch (json::Exc const&) {
        return {};
    }
}

Carriers::OutgoingLetter described(StoredLetter const& stored, Mailing::MailedLetter const& letter) {
    Carriers::OutgoingLetter outgoing;
    outgoing.number = stored.id.number;
    outgoing.key = stored.id.key();
    outgoing.sheets = letter.sheets;
    outgoing.colouredPages = letter.colouredPages;
    for (auto const& [priority, field] : letter.fields) {
        outgoing.fields.emplace_back(field.name(), textOf(field));
        if (field.name() == stored.channel && outgoing.address.empty())
            outgoing.address = outgoing.fields.back().second;
    }
    return outgoing;
}

Carriers::Printing printingOf(Cfg::PackPreset const& preset) {
    Mailing::PrintWishes const wishes = Mailing::PrintWishes::of(preset);
    Carriers::Printing printing;
    printing.width = wishes.width;
    printing.height = wishes.height;
    printing.copies = wishes.copies;
    if (preset.colorModel() == Mailing::GREY)
        printing.colour = Carriers::Printing::Colour::Grey;
    else if (preset.colorModel() == Mailing::COLOURED)
        printing.colour = Carriers::Printing::Colour::Coloured;
    return printing;
}

/// Builds a parcel letter by letter.
class ParcelMaker {
public:
    ParcelMaker(OutboxMailing& mailing, std::string const& key, LetterSource::Attachments attachments)
        : mailing_(mailing), isApart_(attachments == LetterSource::Attachments::Apart) {
        parcel_.key = key;
        parcel_.mailing = mailing.id();
        parcel_.isDuplex = mailing.letters().mailing().packPreset.duplex();
        parcel_.replyTo = mailing.letters().mailing().packPreset.userEmailOverride();
        parcel_.printing = printingOf(mailing.letters().mailing().packPreset);
    }

    /// Throws Error when the letter cannot go out; the others are as they were then.
    void add(StoredLetter const& stored) {
        Mailing::MailedLetter const letter = letterOf(mailing_, stored);
        std::size_t const before = pages_.size();
        try {
            if (parcel_.isDuplex && before % 2 == 1)
                pages_.addBlank();
            Carriers::OutgoingLetter outgoing = described(stored, letter);
            outgoing.firstPage = static_cast<long long>(pages_.size()) + 1;
            addPages(letter);
            outgoing.pages = static_cast<long long>(pages_.size()) + 1 - outgoing.firstPage;
            if (outgoing.pages == 0)
                throw Base::Error(Base::Code::MailingDamaged, "the letter has no pages");
            parcel_.letters.push_back(std::move(outgoing));
        } catch (Base::Error const&) {
            shrink(before);
            throw;
        }
    }

    Carriers::Parcel finished() {
        parcel_.pages = static_cast<long long>(pages_.size());
        if (!parcel_.letters.empty())
            parcel_.document = pages_.bytes();
        return std::move(parcel_);
    }

private:
    void addPages(Mailing::MailedLetter const& letter) {
        for (Mailing::DocumentPages const& document : letter.documents)
            if (!isApart_ || document.role == Role::Letter)
                for (int const page : document.pages)
                    addPage(mailing_.entryOf(document.document, page));
            else if (document.role == Role::Attachment)
                addFile(document);
    }

    void addFile(Mailing::DocumentPages const& document) {
        Production::JoinedPages pages;
        for (int const page : document.pages)
            add(pages, mailing_.entryOf(document.document, page));
        std::string const name = Base::safeFileName(document.document);
        parcel_.attachments.emplace_back(name.ends_with(".pdf") ? name : name + ".pdf", pages.bytes());
    }

    void addPage(unsigned long long entry) {
        auto const [place, isNew] = places_.try_emplace(entry, pages_.size());
        if (!isNew)
            return pages_.addAgain(place->second);
        add(pages_, entry);
    }

    void add(Production::JoinedPages& pages, unsigned long long entry) {
        SharedMemBuffer const pdf = Mailing::expanded(mailing_.blob(entry));
        if ((bytes_ += pdf.size()) > MAX_PARCEL_BYTES)
            throw Base::Error(Base::Code::TooLarge,
                              "there are more than 512 MiB of pages for one file; hand letters over one by "
                              "one, with \"unit\" letter");
        try {
            pages.add(Mailing::viewOf(pdf));
        } catch (Base::Error const& wrong) {
            throw Base::Error(Base::Code::MailingDamaged, "a page " + std::string(wrong.what()));
        }
    }

    void shrink(std::size_t size) {
        parcel_.attachments.clear();
        pages_.shrink(size);
        std::erase_if(places_, [size](auto const& place) { return place.second >= size; });
    }

    OutboxMailing& mailing_;
    bool isApart_;
    Carriers::Parcel parcel_;
    Production::JoinedPages pages_;
    std::size_t bytes_ = 0;
    /// Of entries among the pages.
    std::map<unsigned long long, std::size_t> places_;
};

} // namespace

LetterSource::LetterSource(std::filesystem::path const& outbox, std::string packId)
    : packId_(std::move(packId)), container_(container(outbox, packId_)) {}

LetterSource::~LetterSource() = default;

OutboxMailing& LetterSource::opened() {
    if (!mailing_)
        mailing_ = std::make_unique<OutboxMailing>(container_);
    return *mailing_;
}

MadeParcel LetterSource::parcelOf(std::vector<StoredLetter> const& letters, std::string const& key,
                                  Attachments attachments) {
    std::lock_guard<std::mutex> const lock(mutex_);
    ParcelMaker maker(opened(), key, attachments);
    MadeParcel made;
    for (StoredLetter const& letter : letters) {
        try {
            maker.add(letter);
        } catch (Base::Error const& bad) {
            made.bad.push_back({letter.id, bad.what()});
        }
    }
    made.parcel = maker.finished();
    return made;
}

} // namespace VlServiced

#include "programs/vlserviced/jobs/incoming_pack.h"

#include "programs/base/error.h"
#include "vlservice/pack/blob_format.h"
#include "vlservice/pack/container_format.h"

#include <utility>

namespace VlServiced {

IncomingPack::IncomingPack(PackHead head, std::vector<KeptPage> const& there) : head_(std::move(head)) {
    for (KeptPage const& page : there)
        add(page);
}

void IncomingPack::add(KeptPage const& page) {
    digest_.add(page.document, page.page, page.size, page.sha256);
    bytes_ += page.size;
    ++position_;
}

PagePiece IncomingPack::take(Channel::DataPiece const& piece) {
    if (piece.position != static_cast<unsigned long long>(position_))
        throw Base::Error(Base::Code::MailingDamaged, "page " + std::to_string(piece.position + 1ULL) +
                                                          " of pack " + head_.info.id + " comes where page " +
                                                          std::to_string(position_ + 1) + " is wanted");
    if (!page_)
        begin(piece);
    requireOfPage(piece);
    page_->digest.add(piece.bytes);
    page_->filled += static_cast<long long>(piece.bytes.size());
    PagePiece taken{position_, page_->pieces++, piece.bytes, {}};
    if (piece.isLast()) {
        taken.completes = KeptPage{page_->document, page_->page, page_->size, page_->digest.digest()};
        add(*taken.completes);
        page_.reset();
    }
    return taken;
}

void IncomingPack::begin(Channel::DataPiece const& piece) {
    requireNames(piece);
    if (piece.size > Mailing::MAX_BLOB_BYTES)
        refuse("has " + std::to_string(piece.size) + " bytes, and 256 MiB is the most");
    if (piece.size > static_cast<unsigned long long>(head_.bytes - bytes_))
        refuse("is more than the " + std::to_string(head_.bytes) + " bytes that the pack was said to have");
    // What follows is expanded by whoever reads the container.
    if (piece.size <= DB_ZIP_HEADER_SIZE || !piece.bytes.starts_with(DB_ZIP_MAGIC))
        refuse("is not a compressed page");
    page_ = Page{std::string(piece.document), std::string(piece.page), static_cast<long long>(piece.size)};
}

void IncomingPack::requireNames(Channel::DataPiece const& piece) const {
    if (position_ > head_.pages)
        refuse("is more than the " + std::to_string(head_.pages) + " pages that the pack was said to have");
    bool const isMetadata = position_ == head_.pages;
    if (isMetadata && !(piece.document.empty() && piece.page.empty()))
        refuse("has a name, and the metadata is wanted");
    if (!isMetadata && (piece.document.empty() || piece.page.empty()))
        refuse("has no name");
    if (!Container::mayStandInIndex(piece.document) || !Container::mayStandInIndex(piece.page))
        refuse("has a name that a container cannot hold");
}

void IncomingPack::requireOfPage(Channel::DataPiece const& piece) const {
    bool const isSame = piece.document == page_->document && piece.page == page_->page &&
                        piece.size == static_cast<unsigned long long>(page_->size);
    if (!isSame || piece.offset != static_cast<unsigned long long>(page_->filled))
        refuse("does not go on where it was");
}

void IncomingPack::requireWhole() {
    if (position_ <= head_.pages)
        throw Base::Error(Base::Code::MailingDamaged, "pack " + head_.info.id + " is not whole: page " +
                                                          std::to_string(position_ + 1) + " of " +
                                                          std::to_string(head_.pages + 1) +
                                                          " is missing, counting its metadata");
    if (bytes_ != head_.bytes || digest_.text() != head_.sha256)
        throw Base::Error(Base::Code::MailingDamaged,
                          "pack " + head_.info.id + " is not what it was said to be: its digest is another");
}

void IncomingPack::refuse(std::string const& why) const {
    throw Base::Error(Base::Code::MailingDamaged,
                      "page " + std::to_string(position_ + 1) + " of pack " + head_.info.id + ' ' + why);
}

} // namespace VlServiced

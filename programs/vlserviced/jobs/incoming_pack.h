#pragma once
// A pack whose pages are coming: what is held against what its client has said of it.

#include "programs/base/digest.h"
#include "programs/channel/data_message.h"
#include "programs/mailing/pack_digest.h"
#include "programs/vlserviced/store/pack_store.h"

#include <optional>
#include <string>
#include <vector>

namespace VlServiced {

/// Pages come in order, and their pieces too; the metadata comes last, under empty names. Every operation
/// throws Error, one line, when that is not so. Used by one thread.
class IncomingPack {
public:
    /// `there` are the pages that the store has.
    IncomingPack(PackHead head, std::vector<KeptPage> const& there);

    /// The position of the next page.
    long long have() const { return position_; }
    /// Takes the next piece; what it is to the store, in the memory of `piece`.
    PagePiece take(Channel::DataPiece const& piece);
    /// That nothing is missing and the digest is the one that was said. Asked once.
    void requireWhole();

private:
    struct Page {
        std::string document;
        std::string page;
        long long size;
        long long filled = 0;
        long long pieces = 0;
        Base::Sha256 digest = {};
    };

    void begin(Channel::DataPiece const& piece);
    void requireNames(Channel::DataPiece const& piece) const;
    void requireOfPage(Channel::DataPiece const& piece) const;
    void add(KeptPage const& page);
    [[noreturn]] void refuse(std::string const& why) const;

    PackHead head_;
    long long position_ = 0;
    long long bytes_ = 0;
    Mailing::PackDigest digest_;
    /// The one that is not there as a whole.
    std::optional<Page> page_;
};

} // namespace VlServiced

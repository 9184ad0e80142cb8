#pragma once
// A pack as it is sent where some of its letters stay behind, or all go out again.

#include "programs/mailing/pack_source.h"

#include <memory>
#include <set>
#include <string>
#include <vector>

namespace VlMail {

/// Another pack, which has to outlive it.
class EditedPack : public Mailing::PackSource {
public:
    /// Without the letters of those numbers, from 1, and without pages that no other letter has. Throws
    /// std::exception.
    static std::unique_ptr<EditedPack> without(Mailing::PackSource& pack, std::set<long long> const& numbers);
    /// All of them, with the reason why they go out again. Throws std::exception.
    static std::unique_ptr<EditedPack> again(Mailing::PackSource& pack, std::string const& reason);

    Mailing::PackInfo const& info() const override { return pack_.info(); }
    std::vector<PageName> const& pages() const override { return pages_; }
    SharedMemBuffer metadata() override { return metadata_; }

private:
    EditedPack(Mailing::PackSource& pack, std::vector<PageName> pages, SharedMemBuffer metadata);

    SharedMemBuffer load(std::string const& document, std::string const& page) override;

    Mailing::PackSource& pack_;
    std::vector<PageName> pages_;
    SharedMemBuffer metadata_;
};

} // namespace VlMail

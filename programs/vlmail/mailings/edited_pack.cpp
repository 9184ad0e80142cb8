#include "programs/vlmail/mailings/edited_pack.h"

#include "programs/mailing/entries_digest.h"
#include "programs/mailing/letter_texts.h"
#include "programs/mailing/metadata.h"

#include <cstddef>
#include <utility>

namespace VlMail {
namespace {

using PageName = Mailing::PackSource::PageName;

std::set<std::pair<std::string, std::string>> pagesOf(Mailing::LetterTexts const& letters,
                                                      std::vector<std::size_t> const& kept) {
    std::set<std::pair<std::string, std::string>> pages;
    for (std::size_t const index : kept)
        for (Mailing::DocumentPages const& document : letters.letter(index).documents)
            for (int const page : document.pages)
                pages.emplace(document.document, std::to_string(page));
    return pages;
}

std::string digestOf(Mailing::PackSource& pack, std::vector<PageName> const& pages) {
    Mailing::EntriesDigest digest(pack.packId());
    for (PageName const& page : pages)
        digest.add(page.document, page.page, pageOf(pack, page));
    return digest.text();
}

} // namespace

std::unique_ptr<EditedPack> EditedPack::without(Mailing::PackSource& pack,
                                                std::set<long long> const& numbers) {
    Mailing::LetterTexts const letters(pack.metadata());
    std::vector<std::size_t> kept;
    for (std::size_t index = 0; index < letters.size(); ++index)
        if (!numbers.contains(static_cast<long long>(index) + 1))
            kept.push_back(index);
    auto const wanted = pagesOf(letters, kept);
    std::vector<PageName> pages;
    for (PageName const& page : pack.pages())
        if (wanted.contains({page.document, page.page}))
            pages.push_back(page);
    SharedMemBuffer metadata = letters.withLetters(kept, digestOf(pack, pages));
    return std::unique_ptr<EditedPack>(new EditedPack(pack, std::move(pages), std::move(metadata)));
}

std::unique_ptr<EditedPack> EditedPack::again(Mailing::PackSource& pack, std::string const& reason) {
    return std::unique_ptr<EditedPack>(new EditedPack(
        pack, pack.pages(), Mailing::withMembers(pack.metadata(), {{Mailing::AGAIN_KEY, reason}})));
}

EditedPack::EditedPack(Mailing::PackSource& pack, std::vector<PageName> pages, SharedMemBuffer metadata)
    : PackSource(pack.packId()), pack_(pack), pages_(std::move(pages)), metadata_(std::move(metadata)) {}

SharedMemBuffer EditedPack::load(std::string const& document, std::string const& page) {
    return pageOf(pack_, {document, page});
}

} // namespace VlMail

// Pages of letters as one document: two of them, cut apart at a zero line, are added or refused, and what was
// made of them can be opened again.
#include "programs/production/joined_pages.h"
#include "programs/base/error.h"

#include <cstdint>
#include <cstdlib>
#include <string_view>

namespace {

bool isAdded(Production::JoinedPages& pages, std::string_view pdf) {
    std::size_t const before = pages.size();
    try {
        pages.add(pdf);
    } catch (Base::Error const&) {
        if (pages.size() != before)
            std::abort();
        return false;
    }
    return true;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    constexpr std::string_view CUT("\n\0\n", 3);
    std::string_view const all(reinterpret_cast<char const*>(data), size);
    std::size_t const cut = all.find(CUT);
    Production::JoinedPages pages;
    bool const hasFirst = isAdded(pages, all.substr(0, cut));
    if (cut != all.npos)
        isAdded(pages, all.substr(cut + CUT.size()));
    if (hasFirst) {
        pages.addAgain(0);
        pages.addBlank();
    }
    if (pages.size() == 0)
        return 0;
    Production::JoinedPages again;
    if (!isAdded(again, pages.bytes()))
        std::abort();
    return 0;
}

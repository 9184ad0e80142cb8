#include "programs/vlmail/explain/read_pages.h"
#include "programs/base/error.h"

namespace VlMail {

LaidOutPage const* ReadPages::page(int number) {
    auto const [at, isNew] = pages_.try_emplace(number);
    std::optional<LaidOutPage>& page = at->second;
    if (isNew && number >= 1 && number <= count()) {
        try {
            Reader::Page const& read = document_.page(number);
            page = LaidOutPage{&read, Reader::layOut(read, rules_)};
        } catch (Base::Error const&) {
            // A page that cannot be read offers nothing; whoever needs it says so.
        }
    }
    return page ? &*page : nullptr;
}

LaidOutPage const& ReadPages::laidOut(Reader::Page const& page, Reader::LayoutRules const& rules) {
    if (!byOtherRules_.empty() && byOtherRules_.begin()->second.page != &page)
        byOtherRules_.clear();
    auto const [at, isNew] = byOtherRules_.try_emplace({rules.maxSpaces, rules.maxLineDistance});
    if (isNew)
        at->second = {&page, Reader::layOut(page, rules)};
    return at->second;
}

} // namespace VlMail

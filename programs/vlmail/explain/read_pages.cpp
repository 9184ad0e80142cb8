#include "programs/vlmail/explain/read_pages.h"

namespace VlMail {

LaidOutPage const* ReadPages::page(int number) {
    auto const [at, isNew] = pages_.try_emplace(number);
    std::optional<LaidOutPage>& page = at->second;
    if (isNew && number >= 1 && number <= count()) {
        try {
            Reader::Page const& read = document_.page(number);
            page = LaidOutPage{&read, Reader::layOut(read, rules_)};
        } catch (Reader::Error const&) {
            // A page that cannot be read offers nothing; whoever needs it says so.
        }
    }
    return page ? &*page : nullptr;
}

} // namespace VlMail

#include "programs/vlserviced/jobs/outbox_mailing.h"

#include "programs/base/error.h"

namespace VlServiced {

OutboxMailing::OutboxMailing(std::filesystem::path const& container)
    : container_(container.string(), PackWrapper::PURPOSE_IMPORT, {}) {
    if (container_.failed())
        throw Base::Error(Base::Code::MailingDamaged,
                          "the container " + container.string() + " cannot be read");
    for (unsigned long long i = 0; i < container_.szBins(); ++i)
        entries_.try_emplace({container_.bin(i).document, container_.bin(i).name}, i);
    try {
        letters_.emplace(container_.inputFullMeta());
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const&) {
        throw Base::Error(Base::Code::MailingDamaged,
                          "the metadata of the container " + container.string() + " is none of a mailing");
    }
}

unsigned long long OutboxMailing::entryOf(std::string const& document, int page) const {
    auto const found = entries_.find({document, std::to_string(page)});
    if (found == entries_.end())
        throw Base::Error(Base::Code::MailingDamaged, "a page is not in the container");
    return found->second;
}

std::set<unsigned long long> OutboxMailing::entriesOf(Mailing::MailedLetter const& letter) const {
    std::set<unsigned long long> entries;
    for (Mailing::DocumentPages const& document : letter.documents)
        for (int const page : document.pages)
            entries.insert(entryOf(document.document, page));
    return entries;
}

SharedMemBuffer OutboxMailing::blob(unsigned long long at) {
    SharedMemBuffer data = container_.binData(at);
    if (data.empty())
        throw Base::Error(Base::Code::MailingDamaged, "a page is damaged in the container");
    return data;
}

} // namespace VlServiced

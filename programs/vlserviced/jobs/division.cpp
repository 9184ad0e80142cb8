#include "programs/vlserviced/jobs/division.h"

#include "programs/mailing/container_writer.h"
#include "programs/mailing/entries_digest.h"
#include "programs/vlserviced/jobs/notices.h"
#include "programs/vlserviced/jobs/outbox_mailing.h"

#include <algorithm>
#include <set>

namespace VlServiced {
namespace {

/// What becomes of a letter in the container its carrier there has to say.
std::vector<Mailing::OtherWay> otherWaysBy(Mailing::MailedLetter const& letter,
                                           Mailing::Metadata const& mailing, bool byCarrier) {
    return byCarrier ? Mailing::otherWaysOf(letter, mailing.packPreset) : std::vector<Mailing::OtherWay>();
}

/// What stays in the container.
struct Rest {
    std::vector<std::size_t> letters;
    /// In the container's order.
    std::set<unsigned long long> entries;

    void add(std::size_t index, std::set<unsigned long long> const& ofLetter) {
        letters.push_back(index);
        entries.insert(ofLetter.begin(), ofLetter.end());
    }
};

void write(Rest const& rest, OutboxMailing& mailing, std::filesystem::path const& target) {
    std::filesystem::create_directories(target.parent_path());
    Mailing::ContainerWriter container(target, mailing.id());
    Mailing::EntriesDigest digest(mailing.id());
    for (unsigned long long const at : rest.entries) {
        PackWrapper::BinEntry const& entry = mailing.entry(at);
        SharedMemBuffer const blob = mailing.blob(at);
        digest.add(entry.document, entry.name, blob);
        container.savePage(entry.document, entry.name, blob);
    }
    container.finish(mailing.letters().withLetters(rest.letters, digest.text()), "make room on the disk");
}

} // namespace

Division divide(std::filesystem::path const& container, std::filesystem::path const& rest,
                HasCarrier const& hasCarrier, Notifying notifying) {
    OutboxMailing mailing(container);
    Mailing::Metadata const& whole = mailing.letters().mailing();
    Division division;
    if (notifying == Notifying::Yes)
        addConfirmation(whole, division.notices);
    if (!whole.madeReady)
        return division;
    Rest others;
    for (std::size_t i = 0; i < mailing.letters().size(); ++i) {
        Mailing::MailedLetter const letter = mailing.letters().letter(i);
        auto const number = static_cast<long long>(i) + 1;
        std::string const channel = Mailing::channelOf(letter);
        bool const byCarrier = hasCarrier(channel);
        division.letters.push_back({number, channel, byCarrier, otherWaysBy(letter, whole, byCarrier)});
        if (!byCarrier)
            others.add(i, mailing.entriesOf(letter));
        if (notifying == Notifying::Yes)
            addNotifications(whole, number, letter, division.notices);
    }
    if (!others.letters.empty() && others.letters.size() < division.letters.size())
        write(others, mailing, rest);
    return division;
}

} // namespace VlServiced

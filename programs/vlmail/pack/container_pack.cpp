#include "programs/vlmail/pack/container_pack.h"

#include "programs/base/error.h"
#include "programs/base/quoting.h"
#include "programs/mailing/mailing_outline.h"
#include "programs/vlmail/pack/container_check.h"

namespace VlMail {
namespace {

void requireWhole(ContainerFile& file, std::string const& path) {
    ContainerCheck const check = checkContainer(file);
    if (!check.damages.empty())
        throw Base::Error(Base::Code::MailingDamaged,
                          "cannot send " + Base::inQuotes(path) + ": " + check.damages.front() +
                              "; \"vlmail pack verify\" tells all that is damaged");
    if (check.pages == 0)
        throw Base::Error(Base::Code::MailingDamaged,
                          "cannot send " + Base::inQuotes(path) + ": it has no pages");
}

} // namespace

std::unique_ptr<ContainerPack> ContainerPack::open(std::string const& path, std::string const& cfgId) {
    auto file = std::make_unique<ContainerFile>(path);
    requireWhole(*file, path);
    return std::unique_ptr<ContainerPack>(new ContainerPack(std::move(file), cfgId));
}

ContainerPack::ContainerPack(std::unique_ptr<ContainerFile> file, std::string cfgId)
    : PackSource(file->packId()), file_(std::move(file)) {
    for (unsigned long long i = 0; i < file_->size(); ++i) {
        ContainerFile::Entry const& entry = file_->entry(i);
        if (!isPage(entry)) {
            metadataAt_ = i;
        } else if (entries_.try_emplace({entry.document, entry.name}, i).second) {
            pages_.emplace_back(entry.document, entry.name);
        }
    }
    info_ = {packId(), std::move(cfgId), Mailing::outlineOf(metadata()).packPreset.title()};
}

SharedMemBuffer ContainerPack::load(std::string const& document, std::string const& page) {
    auto const entry = entries_.find({document, page});
    return entry == entries_.end() ? SharedMemBuffer() : file_->blob(entry->second).bytes;
}

} // namespace VlMail

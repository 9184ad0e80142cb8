#include "programs/vlserviced/jobs/container.h"

#include "programs/mailing/container_writer.h"
#include "programs/mailing/metadata.h"
#include "vlservice/pack/blob_format.h"
#include "vlservice/pack/container_format.h"
#include "vlservice/pack/page_saver.h"

#include <algorithm>

namespace VlServiced {
namespace {

/// A container's index is found by how its first blob begins, and readers expand every blob.
bool isCompressed(SharedMemBuffer const& blob) {
    return blob.size() > DB_ZIP_HEADER_SIZE &&
           std::equal(DB_ZIP_MAGIC.begin(), DB_ZIP_MAGIC.end(), reinterpret_cast<char const*>(blob.data()));
}

/// Names of documents stay out of it: what is at fault goes into the log, and they may be those of people.
[[noreturn]] void refuse(std::size_t position, char const* why) {
    throw BadPack(Base::Code::MailingDamaged, "page " + std::to_string(position) + " of the pack " + why);
}

void copyPages(Mailing::PackSource& pack, PageSaverI& container) {
    std::size_t position = 0;
    for (auto const& [document, page] : pack.pages()) {
        ++position;
        pack.requestPageData(document, page, [&, &document = document, &page = page](SharedMemBuffer blob) {
            if (!Container::mayStandInIndex(document) || !Container::mayStandInIndex(page))
                refuse(position, "has a name that a container cannot hold");
            if (!isCompressed(blob))
                refuse(position, "is not a compressed page");
            container.savePage(document, page, std::move(blob));
        });
    }
}

SharedMemBuffer decidedMetadata(SharedMemBuffer const& metadata, std::string const& packId,
                                json::Object const& decided) {
    if (decided.empty())
        return metadata;
    try {
        return Mailing::withMembers(metadata, decided);
    } catch (json::Exc const&) {
        throw BadPack(Base::Code::MailingDamaged, "the metadata of pack " + packId + " is none of a mailing");
    }
}

} // namespace

void writeContainer(Mailing::PackSource& pack, std::filesystem::path const& target,
                    json::Object const& decided) {
    SharedMemBuffer const metadata = pack.metadata();
    if (!isCompressed(metadata))
        throw BadPack(Base::Code::MailingDamaged,
                      "the metadata of pack " + pack.packId() + " is not compressed");
    Mailing::ContainerWriter container(target, pack.packId());
    copyPages(pack, container);
    container.finish(decidedMetadata(metadata, pack.packId(), decided), "make room on the disk");
}

} // namespace VlServiced

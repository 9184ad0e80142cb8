#include "programs/mailing/pack_source.h"

#include "programs/base/safe_name.h"

#include <unordered_set>

namespace Mailing {
namespace {

constexpr std::size_t MAX_PACK_ID_BYTES = 128;

} // namespace

bool isPackId(std::string const& id) {
    return id.size() <= MAX_PACK_ID_BYTES && Base::safeFileName(id) == id;
}

void PackSource::requestPageData(std::string const& document, std::string const& page, PageFunc func) {
    PageLoaderI::requestPageData(document, page, std::move(func));
    callPgFunc(document, page, load(document, page));
}

std::size_t PackSource::documentCount() const {
    std::unordered_set<std::string> documents;
    for (PageName const& name : pages())
        documents.insert(name.document);
    return documents.size();
}

SharedMemBuffer pageOf(PackSource& pack, PackSource::PageName const& name) {
    SharedMemBuffer page;
    pack.requestPageData(name.document, name.page, [&](SharedMemBuffer data) { page = std::move(data); });
    return page;
}

} // namespace Mailing

#include "programs/mailing/page_blob.h"

#include "programs/base/error.h"
#include "vlservice/pack/page_loader.h"
#include "vlservice/pack/page_saver.h"

#include <utility>

namespace Mailing {

SharedMemBuffer compressed(std::string_view data) {
    SharedMemBuffer blob = PageSaverI::zipDbData(data.data(), data.size());
    if (blob.empty())
        throw Base::Error(Base::Code::OutOfMemory, "there is no memory to compress " +
                                                       std::to_string(data.size()) +
                                                       " bytes; close other programs or raise the limit");
    return blob;
}

SharedMemBuffer expanded(SharedMemBuffer blob) {
    SharedMemBuffer data = PageLoaderI::unzipDbData(std::move(blob));
    if (data.empty())
        throw Base::Error(Base::Code::MailingDamaged, "it cannot be expanded, or there is no memory for it");
    return data;
}

std::string_view viewOf(SharedMemBuffer const& data) {
    return {reinterpret_cast<char const*>(data.data()), static_cast<std::size_t>(data.size())};
}

} // namespace Mailing

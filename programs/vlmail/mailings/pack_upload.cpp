#include "programs/vlmail/mailings/pack_upload.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/channel/data_message.h"
#include "programs/mailing/pack_digest.h"
#include "programs/mailing/page_blob.h"
#include "programs/vlmail/service/service_client.h"
#include "vlservice/ipc/process_pack.h"

#include <algorithm>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>

namespace VlMail {
namespace {

using Mailing::PackSource;
using Protocol::BeginPack;
using Protocol::BeginPackAnswer;

/// A pack that cannot be read: another connection would not help.
class UnreadablePack : public std::runtime_error {
public:
    using runtime_error::runtime_error;
};

/// A page by its position; the metadata stands behind the pages, under empty names.
PackSource::PageName nameAt(PackSource const& pack, long long position) {
    auto const at = static_cast<std::size_t>(position);
    return at < pack.pages().size() ? pack.pages()[at] : PackSource::PageName({}, {});
}

SharedMemBuffer blobAt(PackSource& pack, long long position) {
    bool const isPage = static_cast<std::size_t>(position) < pack.pages().size();
    SharedMemBuffer blob = isPage ? pageOf(pack, nameAt(pack, position)) : pack.metadata();
    if (blob.empty())
        throw Base::Error(Base::Code::MailingDamaged,
                          isPage ? "page " + std::to_string(position + 1) + " of it cannot be read"
                                 : "its metadata cannot be read");
    return blob;
}

/// The texts of data messages, from a position on.
class Pieces {
public:
    Pieces(PackSource& pack, long long from) : pack_(pack), position_(from) {}

    std::optional<std::string> next() {
        if (offset_ == blob_.size() && !loadNext())
            return std::nullopt;
        std::string_view const rest = Mailing::viewOf(blob_).substr(offset_);
        std::string_view const bytes = rest.substr(0, Channel::MAX_PIECE);
        PackSource::PageName const name = nameAt(pack_, position_);
        std::string text = Channel::printData({pack_.packId(), static_cast<std::uint32_t>(position_),
                                               name.document, name.page, blob_.size(), offset_, bytes});
        offset_ += bytes.size();
        if (offset_ == blob_.size())
            ++position_;
        return text;
    }

private:
    bool loadNext() {
        if (static_cast<std::size_t>(position_) > pack_.pages().size())
            return false;
        blob_ = blobAt(pack_, position_);
        offset_ = 0;
        return true;
    }

    PackSource& pack_;
    long long position_;
    SharedMemBuffer blob_;
    std::size_t offset_ = 0;
};

std::optional<std::string> nextOf(Pieces& pieces) {
    try {
        return pieces.next();
    } catch (Base::Error const& failure) {
        throw UnreadablePack(failure.what());
    }
}

/// Sends it on this connection.
void send(Channel::Client& service, PackSource& pack, BeginPackAnswer const& there,
          UploadWatcher const& watcher, long long all) {
    long long done = 0;
    Pieces pieces(pack, there.have);
    service.sendData([&] {
        std::optional<std::string> text = nextOf(pieces);
        if (text && watcher)
            watcher(done += static_cast<long long>(text->size()), all);
        return text;
    });
}

void sendAll(ServiceLine& service, PackSource& pack, BeginPack const& beginning,
             UploadWatcher const& watcher) {
    long long most = 0;
    service.repeat([&](Channel::Client& client) {
        BeginPackAnswer const there(ask(client, beginning));
        if (there.isAccepted)
            return;
        if (there.have > std::exchange(most, std::max(most, there.have)))
            service.progressed();
        send(client, pack, there, watcher, beginning.bytes);
        client.call<Ipc::ProcessPack>(Protocol::OVER_CONNECTION, Protocol::PACKS_OF_CONNECTION,
                                      pack.packId());
    });
}

/// Whether the service has taken it after all, when something failed on the way.
bool wasAccepted(ServiceLine& service, BeginPack beginning) {
    beginning.asks = true;
    try {
        return service.once(
            [&](Channel::Client& client) { return BeginPackAnswer(ask(client, beginning)).isAccepted; });
    } catch (std::exception const&) {
        return false;
    }
}

} // namespace

BeginPack beginningOf(PackSource& pack) {
    BeginPack beginning;
    beginning.id = pack.packId();
    beginning.cfgId = pack.info().cfgId;
    beginning.title = pack.info().title;
    beginning.pages = static_cast<long long>(pack.pages().size());
    Mailing::PackDigest digest;
    for (long long position = 0; position <= beginning.pages; ++position) {
        SharedMemBuffer const blob = blobAt(pack, position);
        PackSource::PageName const name = nameAt(pack, position);
        auto const size = static_cast<long long>(blob.size());
        digest.add(name.document, name.page, size, Base::sha256(Mailing::viewOf(blob)));
        beginning.bytes += size;
    }
    beginning.sha256 = digest.text();
    if (beginning.bytes > BeginPack::MAX_BYTES || beginning.pages > BeginPack::MAX_PAGES)
        throw Base::Error(
            Base::Code::TooLarge,
            "it has " + std::to_string(beginning.bytes) + " bytes and " + std::to_string(beginning.pages) +
                " pages, and 8 GiB and 10000000 pages are the most: mail fewer letters at once");
    return beginning;
}

void uploadPack(ServiceLine& service, PackSource& pack, UploadWatcher const& watcher) {
    BeginPack const beginning = beginningOf(pack);
    try {
        sendAll(service, pack, beginning, watcher);
    } catch (std::exception const&) {
        if (!wasAccepted(service, beginning))
            throw;
    }
}

} // namespace VlMail

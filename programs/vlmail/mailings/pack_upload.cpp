#include "programs/vlmail/mailings/pack_upload.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/channel/data_message.h"
#include "programs/mailing/pack_digest.h"
#include "programs/mailing/page_blob.h"
#include "programs/vlmail/service/service_client.h"
#include "vlservice/ipc/process_pack.h"

#include <algorithm>
#include <cstddef>
#include <future>
#include <iterator>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

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

/// Blobs of a pack, some MiB of them, or one.
struct Blobs {
    std::vector<SharedMemBuffer> blobs = {};
    std::size_t bytes = 0;
};

/// From a position on, to the metadata at the most.
Blobs blobsFrom(PackSource& pack, long long position, long long metadataAt) {
    constexpr std::size_t ENOUGH = 8 << 20;
    Blobs some;
    for (; position <= metadataAt && some.bytes < ENOUGH; ++position) {
        some.blobs.push_back(blobAt(pack, position));
        some.bytes += some.blobs.back().size();
    }
    return some;
}

std::vector<std::string> digestsOf(std::span<SharedMemBuffer const> blobs) {
    std::vector<std::string> digests;
    for (SharedMemBuffer const& blob : blobs)
        digests.push_back(Base::sha256(Mailing::viewOf(blob)));
    return digests;
}

/// Half of what is much is another thread's, where there is one to be had.
std::vector<std::string> digestsOf(Blobs const& some) {
    constexpr std::size_t MUCH = 1 << 20;
    std::span<SharedMemBuffer const> const all(some.blobs);
    if (some.bytes < MUCH)
        return digestsOf(all);
    std::size_t const half = all.size() / 2;
    auto rest = std::async([part = all.subspan(half)] { return digestsOf(part); });
    std::vector<std::string> digests = digestsOf(all.first(half));
    std::ranges::move(rest.get(), std::back_inserter(digests));
    return digests;
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
    for (long long position = 0; position <= beginning.pages;) {
        Blobs const some = blobsFrom(pack, position, beginning.pages);
        std::vector<std::string> const digests = digestsOf(some);
        for (std::size_t i = 0; i < digests.size(); ++i, ++position) {
            PackSource::PageName const name = nameAt(pack, position);
            auto const size = static_cast<long long>(some.blobs[i].size());
            digest.add(name.document, name.page, size, digests[i]);
            beginning.bytes += size;
        }
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

#include "programs/vlserviced/jobs/pack_reception.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/base/plain_text.h"
#include "programs/channel/data_message.h"
#include "programs/vlserviced/jobs/incoming_pack.h"
#include "programs/vlserviced/store/node_id.h"
#include "vlservice/platform/log.h"

#include <algorithm>
#include <utility>

namespace VlServiced {
namespace {

using Protocol::BeginPack;
using Protocol::BeginPackAnswer;

constexpr std::size_t MAX_TITLE_BYTES = 500;
/// How long a pack waits for its rest, or for its Process Pack.
constexpr long long UNFINISHED_SECONDS = 24 * 60 * 60;
/// What goes to the disk without waiting for more: a transaction costs as much as storing a MiB does.
constexpr std::size_t ENOUGH_BYTES = 4 << 20;

void checkBeginning(BeginPack const& pack) {
    if (!Mailing::isPackId(pack.id))
        throw Base::Error(Base::Code::MailingIdInvalid, "the pack id \"" + pack.id + "\" cannot name a file");
    if (!Base::isPlainText(pack.title, MAX_TITLE_BYTES))
        throw Base::Error(Base::Code::MailingInvalid, "the title of pack " + pack.id +
                                                          " is not a line of text of at most " +
                                                          std::to_string(MAX_TITLE_BYTES) + " bytes");
    checkNodeId(pack.cfgId);
    if (pack.pages < 1 || pack.bytes < 1)
        throw Base::Error(Base::Code::MailingInvalid, "pack " + pack.id + " has no pages");
    if (!Base::isSha256(pack.sha256))
        throw Base::Error(Base::Code::MailingInvalid,
                          "the digest of pack " + pack.id + " is none of 64 hexadecimal digits");
}

PackHead headOf(BeginPack const& pack) {
    return {{pack.id, pack.cfgId, pack.title}, pack.pages, pack.bytes, pack.sha256};
}

/// An erased pack has lost its title.
bool isSame(PackHead const& kept, PackHead const& said) {
    PackHead titled = kept;
    titled.info.title = said.info.title;
    return titled == said;
}

[[noreturn]] void refuseOther(std::string const& packId) {
    throw Base::Error(Base::Code::MailingExists, "there is another pack " + packId +
                                                     " with other pages: give this one an id of its own");
}

std::string notItsOwn(std::string const& packId) {
    return "pack " + Base::oneLine(packId) +
           " is none that this connection sends: another one goes on with it, or nobody has begun it";
}

std::string inMebibytes(long long bytes) { return std::to_string((bytes + (1 << 20) - 1) >> 20) + " MiB"; }

/// The line, or nothing.
template<typename Operation>
std::string failureOf(Operation operation) {
    try {
        operation();
        return {};
    } catch (std::bad_alloc const&) {
        throw;
    } catch (std::exception const& failure) {
        return Base::codedLine(Base::oneLine(failure.what()), Base::codeOf(failure));
    }
}

} // namespace

class PackReception::Shelf {
public:
    Shelf(std::shared_ptr<PackStore> store, std::function<long long()> now)
        : store_(std::move(store)), now_(std::move(now)) {}

    /// `isKnown` says that a job of it is on record.
    BeginPackAnswer begin(PackHead const& head, bool isKnown, std::optional<long long> quota) {
        if (isKnown)
            return ask(head, isKnown);
        std::string const& id = head.info.id;
        std::optional<KeptPack> kept = store_->find(id);
        if (kept && kept->state == KeptPack::State::Erased) {
            store_->forget(id);
            kept.reset();
        }
        if (!kept) {
            add(head, quota);
            // Another service may have been faster.
            kept = store_->find(id);
        }
        if (kept && !isSame(kept->head, head))
            refuseOther(id);
        if (kept && kept->state == KeptPack::State::Complete)
            return ask(head, isKnown);
        return goOn(head);
    }

    /// What is there, without any change.
    BeginPackAnswer ask(PackHead const& head, bool isKnown) {
        std::optional<KeptPack> const kept = store_->find(head.info.id);
        if (kept && !isSame(kept->head, head))
            refuseOther(head.info.id);
        BeginPackAnswer answer;
        answer.isAccepted = isKnown;
        if (kept)
            answer.have = static_cast<long long>(store_->pagesOf(head.info.id).size());
        return answer;
    }

    /// Pieces of one pack; the failure of one is that of all behind it.
    void store(Pieces const& pieces, std::size_t from, std::size_t to) {
        std::string const& packId = pieces[from].packId;
        bool isOpen = false;
        std::string const failure = failureOf([&] {
            Incoming& incoming = comingOf(packId);
            isOpen = true;
            std::vector<PagePiece> taken;
            for (std::size_t i = from; i < to; ++i)
                taken.push_back(incoming.pack.take(Channel::parseData(pieces[i].text)));
            store_->store(packId, incoming.fence, taken, now_());
        });
        // One that is complete may be that of a job.
        if (!failure.empty() && isOpen)
            drop(packId);
        for (std::size_t i = from; i < to; ++i)
            pieces[i].stored(failure);
    }

    void complete(std::string const& packId) {
        std::optional<KeptPack> const kept = store_->find(packId);
        if (!kept || kept->state == KeptPack::State::Erased)
            throw Base::Error(Base::Code::MailingUnknown,
                              "the service has no pack " + packId + ": send it again");
        // While somebody looks for what is of no use.
        if (store_->touch(packId, now_()))
            return;
        if (!incoming_.contains(packId))
            return completeUnheld(*kept);
        try {
            Incoming& incoming = comingOf(packId);
            incoming.pack.requireWhole();
            store_->complete(packId, incoming.fence, now_());
            incoming_.erase(packId);
        } catch (std::exception const&) {
            drop(packId);
            throw;
        }
    }

    std::vector<KeptPack> all() { return store_->all(); }

    /// Those that were refused since it was asked last.
    std::set<std::string> dropped() { return std::exchange(dropped_, {}); }

    /// A step of it; false when nothing is left to erase.
    bool eraseSome(std::string const& packId) {
        incoming_.erase(packId);
        return store_->find(packId) && store_->eraseSome(packId);
    }
    /// The same of one that is erased already, and has not come anew since.
    bool eraseMore(std::string const& packId) { return store_->eraseMore(packId); }
    void forgetUnused(std::string const& packId, long long touchedBefore) {
        store_->retire(packId, touchedBefore);
        store_->forget(packId);
    }

private:
    struct Incoming {
        IncomingPack pack;
        /// Under which it is held; another service may go on with it meanwhile.
        long long fence;
    };

    void add(PackHead const& head, std::optional<long long> quota) {
        long long const used = quota ? store_->bytesOf(head.info.cfgId) : 0;
        if (quota && used + head.bytes > *quota)
            throw Base::Error(Base::Code::QuotaExceeded,
                              "node " + head.info.cfgId + " may have " + inMebibytes(*quota) +
                                  " of packs with the service at once, and has " + inMebibytes(used) +
                                  ": pack " + head.info.id + " of " + inMebibytes(head.bytes) +
                                  " is not taken before some of them were handed over");
        store_->add(head, now_());
    }

    BeginPackAnswer goOn(PackHead const& head) {
        BeginPackAnswer answer;
        answer.have = takeHold(head).pack.have();
        return answer;
    }

    Incoming& takeHold(PackHead const& head) {
        std::string const& id = head.info.id;
        long long const fence = store_->takeHold(id);
        incoming_.erase(id);
        return incoming_.emplace(id, Incoming{IncomingPack(head, store_->pagesOf(id)), fence}).first->second;
    }

    Incoming& comingOf(std::string const& packId) {
        if (auto const found = incoming_.find(packId); found != incoming_.end())
            return found->second;
        std::optional<KeptPack> const kept = store_->find(packId);
        if (kept && kept->state == KeptPack::State::Open)
            throw Base::Error(Base::Code::LeaseLost, notItsOwn(packId));
        throw Base::Error(Base::Code::StateRefused, "pack " + packId + " is none that pages are wanted of");
    }

    /// Who holds it, of this service or another, may be about to send more.
    void completeUnheld(KeptPack const& kept) {
        std::string const& packId = kept.head.info.id;
        IncomingPack(kept.head, store_->pagesOf(packId)).requireWhole();
        store_->complete(packId, kept.fence, now_());
    }

    /// From here on it is erased, so that it may come anew; the rest goes step by step.
    void drop(std::string const& packId) {
        auto const held = incoming_.extract(packId);
        if (!held)
            return;
        dropped_.insert(packId);
        std::string const failure = failureOf([&] { store_->refuse(packId, held.mapped().fence); });
        if (!failure.empty())
            Log::Lock(4).logStreamLine() << "Pack " << packId << " cannot be erased yet. " << failure;
    }

    std::shared_ptr<PackStore> store_;
    std::function<long long()> now_;
    std::map<std::string, Incoming> incoming_;
    /// Refused, and not erased yet.
    std::set<std::string> dropped_;
};

PackReception::PackReception(std::shared_ptr<PackStore> store, JobStore const& jobs,
                             ReceptionSurroundings surroundings)
    : jobs_(jobs), surroundings_(std::move(surroundings)),
      shelf_(std::make_shared<Shelf>(std::move(store), surroundings_.now)) {}

PackReception::~PackReception() = default;

void PackReception::begin(BeginPack const& pack, Sender const& sender,
                          std::function<void(BeginPackAnswer const&, std::string const& failure)> done) {
    bool isKnown = false;
    std::string const refused = failureOf([&] {
        checkBeginning(pack);
        std::optional<Job> const job = jobs_.find(pack.id);
        if (job && !job->pack.isWithService())
            refuseOther(pack.id);
        isKnown = job.has_value();
        if (!isKnown && surroundings_.isDisabled(pack.cfgId))
            throw Base::Error(Base::Code::NodeDisabled,
                              "node " + pack.cfgId + " is disabled: pack " + pack.id + " is not taken");
    });
    if (!refused.empty())
        return done({}, refused);
    if (!pack.asks)
        letSend(pack.id, sender);
    surroundings_.onStoreThread([head = headOf(pack), asks = pack.asks, isKnown,
                                 quota = surroundings_.quota(pack.cfgId), shelf = shelf_,
                                 onOwnThread = surroundings_.onOwnThread, done] {
        BeginPackAnswer answer;
        std::string const failure = failureOf(
            [&] { answer = asks ? shelf->ask(head, isKnown) : shelf->begin(head, isKnown, quota); });
        onOwnThread([done, answer, failure] { done(answer, failure); });
    });
}

/// What another connection has sent and is not on its way to the disk would come behind the answer.
void PackReception::letSend(std::string const& packId, Sender const& sender) {
    senders_[packId] = sender;
    Pieces const all = std::exchange(waiting_, {});
    waitingBytes_ = 0;
    for (Piece const& piece : all)
        piece.packId == packId ? piece.stored(notItsOwn(packId)) : await(piece);
}

void PackReception::await(Piece piece) {
    waitingBytes_ += piece.text.size();
    waiting_.push_back(std::move(piece));
}

bool PackReception::maySend(std::string const& packId,
                            std::shared_ptr<Ipc::CmdProcessorI> const& connection) const {
    auto const sender = senders_.find(packId);
    return sender != senders_.end() && sender->second.lock() == connection;
}

void PackReception::take(std::shared_ptr<Ipc::CmdProcessorI> const& connection, std::string text,
                         Stored stored) {
    Channel::DataPiece const piece = Channel::parseData(text);
    std::string packId(piece.packId);
    if (!maySend(packId, connection))
        return stored(notItsOwn(packId));
    isEndWaiting_ = isEndWaiting_ || (piece.document.empty() && piece.isLast());
    await({std::move(packId), std::move(text), std::move(stored)});
    storeSoon();
}

/// More is on its way unless a pack is at its end, or its client waits for word of what it has sent.
void PackReception::storeSoon() {
    if (!surroundings_.soon || isEndWaiting_ || waitingBytes_ >= ENOUGH_BYTES)
        return storeWaiting();
    if (waiting_.empty() || isStoring_ || std::exchange(isReminded_, true))
        return;
    surroundings_.soon([this] {
        isReminded_ = false;
        storeWaiting();
    });
}

/// All that came while the disk was busy goes there at once.
void PackReception::storeWaiting() {
    if (waiting_.empty() || std::exchange(isStoring_, true))
        return;
    waitingBytes_ = 0;
    isEndWaiting_ = false;
    auto const pieces = std::make_shared<Pieces>(std::exchange(waiting_, {}));
    surroundings_.onStoreThread([this, pieces, shelf = shelf_, onOwnThread = surroundings_.onOwnThread] {
        std::stable_sort(pieces->begin(), pieces->end(),
                         [](Piece const& a, Piece const& b) { return a.packId < b.packId; });
        for (std::size_t from = 0, to = 0; from < pieces->size(); from = to) {
            while (to < pieces->size() && (*pieces)[to].packId == (*pieces)[from].packId)
                ++to;
            shelf->store(*pieces, from, to);
        }
        onOwnThread([this, dropped = shelf->dropped()] {
            isStoring_ = false;
            eraseAll(dropped);
            storeSoon();
        });
    });
}

void PackReception::eraseAll(std::set<std::string> const& packIds) {
    for (std::string const& packId : packIds)
        eraseMore(packId);
}

void PackReception::complete(std::string const& packId,
                             std::function<void(std::string const& failure)> done) {
    storeWaiting();
    surroundings_.onStoreThread(
        [this, packId, shelf = shelf_, onOwnThread = surroundings_.onOwnThread, done] {
            std::string const failure = failureOf([&] { shelf->complete(packId); });
            onOwnThread([this, done, failure, dropped = shelf->dropped()] {
                eraseAll(dropped);
                done(failure);
            });
        });
}

void PackReception::onJobChanged(std::string const& packId) {
    std::optional<Job> const job = jobs_.find(packId);
    if (job && job->pack.isWithService() && isDoneWithPages(*job))
        erase(packId);
}

void PackReception::erase(std::string const& packId) {
    senders_.erase(packId);
    eraseBy(packId, [packId, shelf = shelf_] { return shelf->eraseSome(packId); });
}

void PackReception::eraseMore(std::string const& packId) {
    eraseBy(packId, [packId, shelf = shelf_] { return shelf->eraseMore(packId); });
}

/// Step by step, so that others who wait for the store get their turn.
void PackReception::eraseBy(std::string const& packId, std::function<bool()> const& step) {
    surroundings_.onStoreThread([this, packId, step, onOwnThread = surroundings_.onOwnThread] {
        bool isLeft = false;
        std::string const failure = failureOf([&] { isLeft = step(); });
        onOwnThread([this, packId, isLeft, failure] {
            if (failure.empty())
                return isLeft ? eraseMore(packId) : void();
            Log::Lock(4).logStreamLine()
                << "Pack " << packId << " cannot be erased, which is tried again. " << failure;
            unerased_.insert(packId);
        });
    });
}

void PackReception::sweep() {
    eraseAll(std::exchange(unerased_, {}));
    surroundings_.onStoreThread([this, shelf = shelf_, onOwnThread = surroundings_.onOwnThread] {
        std::vector<KeptPack> packs;
        std::string const failure = failureOf([&] { packs = shelf->all(); });
        if (!failure.empty())
            Log::Lock(4).logStreamLine() << "The packs cannot be looked through. " << failure;
        onOwnThread([this, packs = std::move(packs)] { eraseUnneeded(packs); });
    });
}

bool PackReception::isOfUse(KeptPack const& pack) const {
    if (std::optional<Job> const job = jobs_.find(pack.head.info.id))
        return !isDoneWithPages(*job);
    return pack.touchedAt > surroundings_.now() - UNFINISHED_SECONDS;
}

void PackReception::eraseUnneeded(std::vector<KeptPack> const& packs) {
    for (KeptPack const& pack : packs) {
        std::string const& id = pack.head.info.id;
        if (isOfUse(pack))
            continue;
        if (jobs_.find(id)) {
            erase(id);
            continue;
        }
        senders_.erase(id);
        surroundings_.onStoreThread([id, touched = pack.touchedAt, shelf = shelf_] {
            std::string const failure = failureOf([&] { shelf->forgetUnused(id, touched); });
            if (!failure.empty())
                Log::Lock(4).logStreamLine() << "Pack " << id << " cannot be forgotten. " << failure;
        });
    }
}

} // namespace VlServiced

#pragma once
// Packs that come over connections, from their first piece to when nobody needs them any more.

#include "programs/protocol/pack_upload.h"
#include "programs/vlserviced/store/job_store.h"
#include "programs/vlserviced/store/pack_store.h"
#include "vlservice/platform/cmd.h"

#include <cstddef>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace VlServiced {

class IncomingPack;

/// What a reception needs around it.
struct ReceptionSurroundings {
    using Work = std::function<void()>;

    /// Runs work on the one thread that the store is used by, one after another.
    std::function<void(Work)> onStoreThread;
    /// Runs work on the reception's own thread; may be called from any.
    std::function<void(Work)> onOwnThread;
    /// Seconds since the epoch; may be called from any thread.
    std::function<long long()> now;
    /// How many bytes the packs of a node may have together.
    std::function<std::optional<long long>(std::string const& cfgId)> quota;
    std::function<bool(std::string const& cfgId)> isDisabled;
    /// Runs work on the reception's own thread some milliseconds later, so that pieces that come one upon the
    /// other go to the disk at once. Without it none waits for another.
    std::function<void(Work)> soon = {};
};

/// Used by one thread, which never waits for the disk. One connection at a time sends a pack: whoever began
/// it last.
class PackReception {
public:
    /// Who sends a pack.
    using Sender = std::weak_ptr<Ipc::CmdProcessorI>;

    /// The jobs have to outlive the reception, and it has to outlive the work on its own thread.
    PackReception(std::shared_ptr<PackStore> store, JobStore const& jobs, ReceptionSurroundings surroundings);
    ~PackReception();

    /// From here on the sender may send pages of the pack, unless it only asks. `done` is called once, later,
    /// with the answer, or with the reason as one line and an answer that says nothing.
    void begin(Protocol::BeginPack const& pack, Sender const& sender,
               std::function<void(Protocol::BeginPackAnswer const&, std::string const& failure)> done);
    /// Told once, from any thread, that a piece is on the disk, or the reason as one line.
    using Stored = std::function<void(std::string const& failure)>;

    /// A piece of a page, as the text of a data message. What cannot be taken ends its pack: nothing of it is
    /// kept. Throws Error when the text is none of data.
    void take(std::shared_ptr<Ipc::CmdProcessorI> const& connection, std::string text, Stored stored);
    /// That all of a pack is there; a pack that is not as it was said to be goes. `done` is called once,
    /// later, with the reason as one line or nothing.
    void complete(std::string const& packId, std::function<void(std::string const& failure)> done);

    /// Has a pack come anew, if it comes at all.
    void drop(std::string const& packId) { erase(packId); }

    /// How many pieces wait for the store's thread.
    std::size_t waiting() const { return waiting_.size(); }

    /// Looks whether the pages of a job are of use still.
    void onJobChanged(std::string const& packId);
    /// Erases what nobody needs any more: packs whose jobs are done with their pages, those that were not
    /// finished or announced within a day, and what was forgotten of a job.
    void sweep();

private:
    struct Piece {
        std::string packId;
        std::string text;
        Stored stored;
    };
    using Pieces = std::vector<Piece>;
    /// What the store's thread has to itself.
    class Shelf;

    void storeSoon();
    void storeWaiting();
    void letSend(std::string const& packId, Sender const& sender);
    void await(Piece piece);
    void erase(std::string const& packId);
    void eraseMore(std::string const& packId);
    void eraseBy(std::string const& packId, std::function<bool()> const& step);
    void eraseAll(std::set<std::string> const& packIds);
    void eraseUnneeded(std::vector<KeptPack> const& packs);
    bool isOfUse(KeptPack const& pack) const;
    bool maySend(std::string const& packId, std::shared_ptr<Ipc::CmdProcessorI> const& connection) const;

    JobStore const& jobs_;
    ReceptionSurroundings surroundings_;
    std::shared_ptr<Shelf> shelf_;
    std::map<std::string, Sender> senders_;
    /// Those that the store's thread has not been given yet.
    Pieces waiting_;
    std::size_t waitingBytes_ = 0;
    /// Whether one that waits is the last of its pack.
    bool isEndWaiting_ = false;
    bool isStoring_ = false;
    /// Whether it has asked to be reminded of those that wait.
    bool isReminded_ = false;
    /// Packs that something kept from being erased.
    std::set<std::string> unerased_;
};

} // namespace VlServiced

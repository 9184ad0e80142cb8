#pragma once
// Packs that came over connections, as the service keeps them until their containers are handed over: a row a
// pack, a row a page, and the bytes of pages in pieces.

#include "programs/database/failure.h"
#include "programs/mailing/pack_source.h"

#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace VlServiced {

/// What a client says of a pack before it sends it. Two packs are the same when all of it is.
struct PackHead {
    Mailing::PackInfo info;
    /// Less the metadata.
    long long pages = 0;
    /// Of all blobs.
    long long bytes = 0;
    /// As Mailing::PackDigest computes it.
    std::string sha256;

    bool operator==(PackHead const&) const = default;
};

struct KeptPack {
    enum class State {
        /// Pages are missing.
        Open,
        Complete,
        /// Its pages are gone, or about to go; id and digest are kept to know it again.
        Erased,
    };

    PackHead head;
    State state = State::Open;
    /// When something of it came last, seconds since the epoch.
    long long touchedAt = 0;
    /// Of who took hold of it last.
    long long fence = 0;
};

/// A page that is there as a whole.
struct KeptPage {
    std::string document;
    std::string page;
    long long size = 0;
    std::string sha256;
};

/// A piece of the page at a position, from 0; the metadata stands behind the pages, under empty names.
struct PagePiece {
    long long position = 0;
    /// Among the pieces of its page, from 0.
    long long number = 0;
    std::string_view bytes;
    /// With the last piece: the page that it completes.
    std::optional<KeptPage> completes;
};

/// Every change is one transaction and on the disk when the operation returns; each throws Error, and has
/// changed nothing then. Used by one thread, but for open().
class PackStore {
public:
    virtual ~PackStore();

    virtual std::optional<KeptPack> find(std::string const& packId) = 0;
    virtual std::vector<KeptPack> all() = 0;
    /// Of the packs of a node that are not erased, as their heads say.
    virtual long long bytesOf(std::string const& cfgId) = 0;
    /// Those of a pack that are there, from the first on.
    virtual std::vector<KeptPage> pagesOf(std::string const& packId) = 0;

    /// Begins a pack; nothing happens to one that is there.
    virtual void add(PackHead const& head, long long now) = 0;
    /// Drops the pieces of the page that is not there as a whole, and gives a number that grows each time:
    /// from here on whoever has a smaller one changes the pack no more, in whichever process he is.
    virtual long long takeHold(std::string const& packId) = 0;
    virtual void store(std::string const& packId, long long fence, std::vector<PagePiece> const& pieces,
                       long long now) = 0;
    virtual void complete(std::string const& packId, long long fence, long long now) = 0;
    /// Has a complete pack be of use from here on; false when there is none.
    virtual bool touch(std::string const& packId, long long now) = 0;

    /// Takes a pack for erased that is not complete; nothing happens to another.
    virtual void refuse(std::string const& packId, long long fence) = 0;
    /// Takes a pack for erased that was not of use since; nothing happens to another.
    virtual void retire(std::string const& packId, long long touchedBefore) = 0;
    /// Takes the pack for erased, and erases some MiB of it; false when nothing of it is left but id and
    /// digest.
    virtual bool eraseSome(std::string const& packId) = 0;
    /// Erases some MiB of an erased pack; false when nothing is left, and of another.
    virtual bool eraseMore(std::string const& packId) = 0;
    /// Erases what is left of an erased pack; nothing happens to another.
    virtual void forget(std::string const& packId) = 0;

    /// A pack that is complete. May be called from any thread.
    virtual std::unique_ptr<Mailing::PackSource> open(std::string const& packId) const = 0;
};

/// In a database of several services, whose schema is there.
std::unique_ptr<PackStore> openSharedPackStore(std::string const& address);

/// In an SQLite file of its own, which is made when it is not there.
std::unique_ptr<PackStore> openSqlitePackStore(std::filesystem::path const& file);

/// The kind of that file.
Database::DatabaseKind const& packStoreDatabase();

} // namespace VlServiced

// Pieces of pages as a client sends them for a pack that it has begun: each is a byte for its length and the
// text of a data message behind the pack's id. They are taken in order under the rules of the pack or end it,
// and what is complete is what was said of it.

#include "programs/base/error.h"
#include "programs/database/sqlite_connection.h"
#include "programs/vlserviced/jobs/pack_reception.h"
#include "programs/vlserviced/store/schema.h"
#include "vlservice/platform/log.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <string>

namespace {

using VlServiced::KeptPack;

struct Client : Ipc::CmdProcessorI {
    void submit(std::shared_ptr<Ipc::CmdI>) override {}
};

/// A reception in memory.
struct MemoryReception {
    Database::SqliteConnection database{
        Database::openDatabase(":memory:", VlServiced::serviceDatabase(), Database::Journal::Rollback)};
    VlServiced::JobStore jobs{database};
    std::shared_ptr<VlServiced::PackStore> store = VlServiced::openSqlitePackStore(":memory:");
    std::shared_ptr<Client> client = std::make_shared<Client>();
    VlServiced::PackReception reception{store,
                                        jobs,
                                        {[](std::function<void()> const& work) { work(); },
                                         [](std::function<void()> const& work) { work(); },
                                         [] { return 1LL; }, [](std::string const&) { return std::nullopt; },
                                         [](std::string const&) { return false; }}};

    void begin() {
        Protocol::BeginPack pack;
        pack.id = "p1";
        pack.pages = 2;
        pack.bytes = 60;
        pack.sha256 = std::string(64, '0');
        reception.begin(pack, client, [](Protocol::BeginPackAnswer const&, std::string const&) {});
    }
    /// False when it is refused.
    bool take(std::string text) {
        bool isStored = false;
        reception.take(client, std::move(text),
                       [&](std::string const& failure) { isStored = failure.empty(); });
        return isStored;
    }
    /// Refused pieces leave nothing behind.
    void requireConsistent(bool isRefused) const {
        auto const kept = store->find("p1");
        bool const isThere = kept && kept->state != KeptPack::State::Erased;
        if (isRefused && (isThere || (kept && !store->pagesOf("p1").empty())))
            std::abort();
        long long bytes = 0;
        if (isThere)
            for (VlServiced::KeptPage const& page : store->pagesOf("p1"))
                bytes += page.size;
        if (bytes > 60)
            std::abort();
    }
};

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    static auto const silent = Log::setSink({});
    MemoryReception memory;
    memory.begin();
    std::string_view rest(reinterpret_cast<char const*>(data), size);
    while (!rest.empty()) {
        std::size_t const length =
            std::min<std::size_t>(static_cast<unsigned char>(rest[0]), rest.size() - 1);
        std::string text = std::string("\2p1") + std::string(rest.substr(1, length));
        rest.remove_prefix(1 + length);
        try {
            bool const isStored = memory.take(std::move(text));
            memory.requireConsistent(!isStored);
        } catch (Base::Error const&) {
            // No data at all: the connection ends.
        }
    }
    memory.reception.complete("p1", [](std::string const& failure) {
        if (failure.empty())
            std::abort();
    });
    return 0;
}

// Requests as the service carries them out: the first byte is the command's number, the rest the JSON text,
// and several requests, each ended by a zero byte, meet the same database. Whatever they say, the settings
// can be read afterwards.

#include "programs/database/sqlite_connection.h"
#include "programs/vlserviced/processor.h"
#include "programs/vlserviced/settings/parts.h"
#include "programs/vlserviced/store/schema.h"
#include "vlservice/ipc/make_empty_cmd.h"
#include "vlservice/ipc/process_pack.h"
#include "vlservice/json/json_text.h"
#include "vlservice/platform/log.h"

#include <cstdint>
#include <cstdlib>
#include <sstream>

namespace {

/// A service in memory whose jobs never get to work.
struct MemoryService {
    Database::SqliteConnection database{
        Database::openDatabase(":memory:", VlServiced::serviceDatabase(), Database::Journal::Rollback)};
    VlServiced::SettingsStore store{database};
    VlServiced::History history{database, [] { return 1LL; }};
    VlServiced::SettingsService settings{store, &VlServiced::SettingsService::localClock, history};
    VlServiced::DocumentStore documentStore{database};
    VlServiced::DocumentService documents{documentStore, store, settings, [] { return 1LL; }};
    VlServiced::JobStore jobs{database};
    VlServiced::LetterStore letters{database, jobs};
    VlServiced::LetterRunner letterRunner{
        letters, jobs,
        VlServiced::LetterSurroundings{
            [](std::string const&, std::size_t, VlServiced::LetterSurroundings::Work const&) {},
            [](VlServiced::LetterSurroundings::Work const&) {},
            [](VlServiced::LetterSurroundings::Work const&) {}, [] { return 1LL; },
            [this] { return settings.service(); }, "/missing/outbox"}};
    VlServiced::JobRunner runner{jobs,
                                 {[](VlServiced::JobSurroundings::Work const&) {},
                                  [](VlServiced::JobSurroundings::Work const&) {},
                                  [](VlServiced::JobSurroundings::Work const&) {}, [] { return 1LL; },
                                  [this] { return settings.service(); }, "/missing/outbox"}};
    VlServiced::PackReception packs{VlServiced::openSqlitePackStore(":memory:"),
                                    jobs,
                                    {[](VlServiced::JobSurroundings::Work const& work) { work(); },
                                     [](VlServiced::JobSurroundings::Work const& work) { work(); },
                                     [] { return 1LL; }, [](std::string const&) { return std::nullopt; },
                                     [](std::string const&) { return false; }}};
    VlServiced::LetterRegister letterRegister{database};
    VlServiced::TokenStore tokenStore{database};
    VlServiced::TokenService tokens{tokenStore, std::string(32, 't'), [] { return 1LL; }, history};
    VlServiced::Access access{[] { return 1LL; }};
    std::shared_ptr<VlServiced::Processor> processor =
        std::make_shared<VlServiced::Processor>(VlServiced::ProcessorSurroundings{
            settings, documents, tokens, access, history, jobs, runner, letterRunner, packs, letterRegister,
            "/missing/outbox", [] { return 1LL; }, [] { return Protocol::HealthAnswer(); }});

    void carryOut(std::string const& request) {
        auto const cmd = Ipc::makeEmptyCmd(static_cast<unsigned char>(request[0]), processor);
        // A pack's place is any file of the machine.
        if (!cmd || cmd->id() == Ipc::ProcessPack::CMD_ID)
            return;
        try {
            auto& json = static_cast<Ipc::JsonCmdBase&>(*cmd);
            json.deserializeReq(json::strToObject(request.data() + 1, request.size() - 1));
            processor->submit(cmd);
            std::ostringstream text;
            text << json.serializeResp();
        } catch (std::exception const&) {
            // Refused, as an error message.
        }
    }

    void requireReadable() const {
        for (VlServiced::SettingsNode const& node : store.nodes())
            settings.effective({node.id, {}});
        settings.tree();
    }
};

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    static auto const silent = Log::setSink({});
    MemoryService service;
    std::istringstream requests(std::string(reinterpret_cast<char const*>(data), size));
    for (std::string request; std::getline(requests, request, '\0');)
        if (!request.empty())
            service.carryOut(request);
    try {
        service.requireReadable();
    } catch (std::exception const&) {
        std::abort();
    }
    return 0;
}

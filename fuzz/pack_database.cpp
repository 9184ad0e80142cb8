// A pack database that somebody has forged, as the service reads it: whatever it holds, reading ends in time
// with what is there or a clear failure, and the file stays as it is. A container that is made of it can be
// opened.

#include "programs/mailing/pack_database.h"
#include "fuzz/private_folder.h"
#include "programs/vlmail/pack/container_file.h"
#include "programs/vlserviced/jobs/container.h"
#include "vlservice/platform/log.h"

#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <optional>
#include <string>

namespace {

namespace fs = std::filesystem;

constexpr char const* PACK = "p1";

void require(bool holds) {
    if (!holds)
        std::abort();
}

fs::path databaseFile() { return privateFolder() / "packs.db"; }

void write(std::string const& bytes) {
    std::ofstream(databaseFile(), std::ios::binary | std::ios::trunc) << bytes;
    fs::permissions(databaseFile(), fs::perms(0600));
}

std::string read() {
    std::ifstream in(databaseFile(), std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

/// How many pages the pack has, when it can be read.
std::optional<std::size_t> readPack() {
    constexpr std::size_t MOST = 50;
    try {
        Mailing::PackDatabaseReader pages(databaseFile(), PACK);
        pages.metadata();
        std::size_t asked = 0;
        for (auto const& [document, page] : pages.pages())
            if (++asked <= MOST)
                pages.requestPageData(document, page, [](SharedMemBuffer const&) {});
        return pages.pages().size();
    } catch (Base::Error const&) {
        return std::nullopt;
    }
}

void makeContainer(std::size_t pages) {
    fs::path const container = privateFolder() / "p1.mailing";
    try {
        Mailing::PackDatabaseReader source(databaseFile(), PACK);
        VlServiced::writeContainer(source, container);
    } catch (Base::Error const&) {
        require(!fs::exists(container));
        return;
    }
    require(VlMail::ContainerFile(container).size() == pages + 1);
    fs::remove(container);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    static auto const silent = Log::setSink({});
    std::string const bytes(reinterpret_cast<char const*>(data), size);
    write(bytes);
    if (std::optional<std::size_t> const pages = readPack())
        makeContainer(*pages);
    require(read() == bytes);
    return 0;
}

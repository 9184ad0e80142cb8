// A pack database that somebody has forged, as the service reads it: whatever it holds, reading ends in time
// with what is there or a clear failure, and the file stays as it is.

#include "programs/mailing/pack_database.h"
#include "vlservice/platform/log.h"

#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <unistd.h>

namespace {

namespace fs = std::filesystem;

/// A file of this process in a folder of its own.
fs::path databaseFile() {
    static fs::path const file = [] {
        std::string folder = (fs::temp_directory_path() / "pack_database.XXXXXX").string();
        if (!::mkdtemp(folder.data()))
            std::abort();
        return fs::path(folder) / "packs.db";
    }();
    return file;
}

void write(std::string const& bytes) {
    std::ofstream(databaseFile(), std::ios::binary | std::ios::trunc) << bytes;
    fs::permissions(databaseFile(), fs::perms(0600));
}

std::string read() {
    std::ifstream in(databaseFile(), std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

void readPack() {
    constexpr std::size_t MOST = 50;
    try {
        Mailing::PackDatabaseReader pages(databaseFile(), "p1");
        pages.metadata();
        std::size_t asked = 0;
        for (auto const& [document, page] : pages.pages())
            if (++asked <= MOST)
                pages.requestPageData(document, page, [](SharedMemBuffer const&) {});
    } catch (Base::Error const&) {
        // Refused.
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    static auto const silent = Log::setSink({});
    std::string const bytes(reinterpret_cast<char const*>(data), size);
    write(bytes);
    readPack();
    if (read() != bytes)
        std::abort();
    return 0;
}

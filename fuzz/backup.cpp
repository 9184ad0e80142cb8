// A backup that somebody has forged, with the right digest behind it where the first byte is "+": whatever
// its header says, extracting it ends with a clear failure or with files that lie in the folder and have its
// bytes.

#include "fuzz/private_folder.h"
#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/vlserviced/store/backup_file.h"

#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <system_error>

namespace {

namespace fs = std::filesystem;

/// All that lies in a folder and below it.
std::uintmax_t bytesIn(fs::path const& folder) {
    std::uintmax_t bytes = 0;
    for (fs::directory_entry const& entry : fs::recursive_directory_iterator(folder))
        if (entry.is_regular_file())
            bytes += entry.file_size();
    return bytes;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    std::string text(reinterpret_cast<char const*>(data), size);
    if (text.starts_with('+')) {
        text.erase(0, 1);
        text += Base::sha256(text) + '\n';
    }
    fs::path const file = privateFolder() / "backup";
    fs::path const out = privateFolder() / "inner" / "out";
    std::ofstream(file, std::ios::binary | std::ios::trunc) << text;
    fs::remove_all(privateFolder() / "inner");
    fs::create_directories(out);
    try {
        VlServiced::extractBackup(file, out);
    } catch (Base::Error const&) {
        // Refused with one line.
    } catch (std::system_error const&) {
        // A name that the file system does not take.
    }
    if (bytesIn(privateFolder() / "inner") != bytesIn(out) || bytesIn(out) > text.size())
        std::abort();
    return 0;
}

#include "programs/vlserviced/jobs/hand_over.h"

#include "programs/base/file_descriptor.h"
#include "vlservice/json/json_text.h"
#include "vlservice/platform/log.h"

#include <array>
#include <cerrno>
#include <fcntl.h>
#include <fstream>
#include <system_error>

namespace VlServiced {
namespace {

namespace fs = std::filesystem;

/// A report is a line; a larger file is none.
constexpr std::size_t MAX_REPORT_BYTES = 64 << 10;

fs::path temporaryOf(fs::path const& folder, std::string const& name) {
    return folder / ("." + name + ".part");
}

/// A folder that is gone, say one that is not mounted, says nothing about what lies in it.
void requireFolder(fs::path const& folder) {
    if (!fs::is_directory(folder))
        throw std::system_error(ENOENT, std::generic_category(),
                                "there is no upload folder " + folder.string());
}

} // namespace

void stage(fs::path const& container, fs::path const& folder) {
    requireFolder(folder);
    fs::path const temporary = temporaryOf(folder, container.filename().string());
    fs::copy_file(container, temporary, fs::copy_options::overwrite_existing);
    Base::FileDescriptor(temporary, O_RDONLY).sync();
    Base::syncFolder(folder);
}

void publish(std::string const& name, fs::path const& folder) {
    requireFolder(folder);
    fs::path const temporary = temporaryOf(folder, name);
    if (!fs::exists(temporary))
        return;
    fs::rename(temporary, folder / name);
    Base::syncFolder(folder);
}

bool liesIn(fs::path const& folder, std::string const& name) {
    requireFolder(folder);
    return fs::exists(folder / name);
}

std::optional<CarrierReport> carrierReport(fs::path const& folder, std::string const& name) {
    fs::path const file = folder / (name + ".status");
    // A pipe of that name would hold up its reader.
    std::error_code error;
    if (!fs::is_regular_file(file, error))
        return std::nullopt;
    std::ifstream in(file, std::ios::binary);
    std::string text(MAX_REPORT_BYTES, '\0');
    in.read(text.data(), static_cast<std::streamsize>(text.size()));
    try {
        json::Object const report = json::strToObject(text.data(), static_cast<std::size_t>(in.gcount()));
        std::string const state = report.get("state").textOrEmpty();
        if (state == "delivered" || state == "failed")
            return CarrierReport{state == "delivered", report.get("text").textOrEmpty()};
        Log::Lock(4).logStreamLine() << "The report " << file << " has no state that is known";
    } catch (json::Exc const& failure) {
        Log::Lock(4).logStreamLine() << "The report " << file << " cannot be read. " << failure.what();
    }
    return std::nullopt;
}

} // namespace VlServiced

#include "programs/vlserviced/jobs/hand_over.h"

#include "programs/base/file_descriptor.h"
#include "programs/protocol/job.h"
#include "vlservice/json/json_text.h"
#include "vlservice/platform/log.h"

#include <fcntl.h>
#include <optional>
#include <regex>
#include <sys/stat.h>
#include <system_error>
#include <utility>
#include <vector>

namespace VlServiced {
namespace {

namespace fs = std::filesystem;

/// A report is a line; a larger file is none.
constexpr std::size_t MAX_REPORT_BYTES = 64 << 10;
constexpr std::size_t COPY_BYTES = 1 << 20;

std::string stagedName(std::string const& name, long long fence) {
    return Base::temporaryOf(fence == 0 ? name : name + '.' + std::to_string(fence));
}

/// The container's name and the fence of a file's name; nothing when it is none that was staged under a
/// fence.
std::optional<std::pair<std::string, long long>> stagedIn(std::string const& file) {
    static std::regex const FORM(R"(\.(.+\.mailing)\.(\d{1,18})\.part)");
    std::smatch found;
    if (!std::regex_match(file, found, FORM))
        return std::nullopt;
    return std::pair(found[1].str(), std::stoll(found[2].str()));
}

std::string reportOf(std::string const& name) { return name + ".status"; }

mode_t modeOf(Base::FileDescriptor const& file) {
    struct stat status {};
    ::fstat(file.number(), &status);
    return status.st_mode;
}

} // namespace

void stage(fs::path const& container, UploadFolder const& folder, long long fence) {
    Base::FileDescriptor source(container, O_RDONLY);
    Base::FileDescriptor target = folder.newFile(stagedName(container.filename().string(), fence), 0600);
    std::vector<char> buffer(COPY_BYTES);
    while (std::size_t const size = source.read(buffer.data(), buffer.size()))
        target.writeAll({buffer.data(), size});
    ::fchmod(target.number(), modeOf(source) & 0777);
    target.sync();
    target.close();
    folder.sync();
}

void discardHandedOver(std::string const& name, UploadFolder const& folder) {
    for (std::string const& file : {name, reportOf(name)})
        folder.removeIfThere(file);
    folder.sync();
}

void unstage(std::string const& name, UploadFolder const& folder, long long fence) {
    folder.removeIfThere(stagedName(name, fence));
}

void publish(std::string const& name, UploadFolder const& folder, long long fence) {
    std::string const temporary = stagedName(name, fence);
    if (!folder.has(temporary))
        return;
    try {
        folder.rename(temporary, name);
    } catch (std::system_error const& failure) {
        // Another service was faster.
        if (failure.code() != std::errc::no_such_file_or_directory)
            throw;
    }
    folder.sync();
}

void sweepStaged(UploadFolder const& folder,
                 std::function<bool(std::string const& name, long long fence)> const& isOfUse) {
    // By the folder that is held open, whatever is mounted there meanwhile.
    fs::path const opened = "/proc/self/fd/" + std::to_string(folder.descriptor());
    std::vector<std::pair<std::string, long long>> left;
    for (fs::directory_entry const& entry : fs::directory_iterator(opened))
        if (auto const found = stagedIn(entry.path().filename().string());
            found && !isOfUse(found->first, found->second))
            left.push_back(*found);
    for (auto const& [name, fence] : left)
        unstage(name, folder, fence);
}

bool liesIn(UploadFolder const& folder, std::string const& name) { return folder.has(name); }

std::optional<CarrierReport> carrierReport(UploadFolder const& folder, std::string const& name) {
    std::string const file = reportOf(name);
    // A pipe of that name would hold up its reader.
    int const descriptor =
        ::openat(folder.descriptor(), file.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
    if (descriptor < 0)
        return std::nullopt;
    fs::path const path = folder.path() / file;
    Base::FileDescriptor in(descriptor, path);
    if (!S_ISREG(modeOf(in)))
        return std::nullopt;
    std::vector<char> text(MAX_REPORT_BYTES);
    std::size_t const size = in.read(text.data(), text.size());
    try {
        json::Object const report = json::strToObject(text.data(), size);
        std::string const state = report.get("state").textOrEmpty();
        bool const isDelivered = state == Protocol::stateName(Protocol::JobState::Delivered);
        if (isDelivered || state == Protocol::stateName(Protocol::JobState::Failed))
            return CarrierReport{isDelivered, report.get("text").textOrEmpty()};
        Log::Lock(4).logStreamLine() << "The report " << path << " has no state that is known";
    } catch (json::Exc const&) {
        // What the parser says quotes the carrier's text, which may tell of a recipient.
        Log::Lock(4).logStreamLine() << "The report " << path << " cannot be read: it is no JSON object";
    }
    return std::nullopt;
}

} // namespace VlServiced

#include "programs/carriers/folder_carrier.h"

#include "programs/base/file_descriptor.h"
#include "programs/carriers/control_file.h"

#include <cerrno>
#include <fcntl.h>
#include <system_error>
#include <unistd.h>
#include <utility>

namespace Carriers {
namespace {

namespace fs = std::filesystem;

constexpr std::uintmax_t MIB = 1 << 20;

[[noreturn]] void failInto(fs::path const& folder) {
    throw std::system_error(errno, std::generic_category(), "cannot write into " + folder.string());
}

/// A file that is being written. Its name is made from the final one, so that what a crash leaves goes with
/// the next attempt, and nothing that anybody may have put there is written to.
class PartFile {
public:
    explicit PartFile(fs::path const& target)
        : name_(target.parent_path() / ("." + target.filename().string() + ".part")) {}
    ~PartFile() { ::unlink(name_.c_str()); }
    PartFile(PartFile const&) = delete;
    PartFile& operator=(PartFile const&) = delete;

    /// Until the disk has it.
    void write(std::string_view bytes) const {
        ::unlink(name_.c_str());
        int const number = ::open(name_.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0666);
        if (number < 0)
            failInto(name_.parent_path());
        Base::FileDescriptor file(number, name_);
        file.writeAll(bytes);
        file.sync();
        file.close();
    }
    void rename(fs::path const& target) const {
        if (::rename(name_.c_str(), target.c_str()) != 0)
            failInto(name_.parent_path());
    }

private:
    fs::path name_;
};

void writeFile(fs::path const& target, std::string_view bytes) {
    PartFile const part(target);
    part.write(bytes);
    part.rename(target);
}

} // namespace

FolderCarrier::FolderCarrier(fs::path folder) : folder_(std::move(folder)) {}

Outcome FolderCarrier::handOver(Parcel const& parcel, PutOnRecord const& /*mayHaveIt*/) {
    std::string const document = parcel.key + ".pdf";
    writeFile(folder_ / document, parcel.document);
    writeFile(folder_ / (parcel.key + ".csv"), controlCsv(parcel, document));
    // Whoever finds the last one finds the others, also behind a power failure.
    Base::syncFolder(folder_);
    writeFile(folder_ / (parcel.key + ".json"), controlJson(parcel, document));
    Base::syncFolder(folder_);
    return {Outcome::Kind::Accepted, "in " + folder_.string()};
}

std::string FolderCarrier::test() {
    PartFile(folder_ / "test").write("test");
    return folder_.string() + " can be written into and has room for " +
           std::to_string(fs::space(folder_).available / MIB) + " MiB";
}

} // namespace Carriers

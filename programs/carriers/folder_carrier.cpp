#include "programs/carriers/folder_carrier.h"

#include "programs/base/error.h"
#include "programs/base/file_descriptor.h"
#include "programs/carriers/control_file.h"

#include <fcntl.h>
#include <string_view>
#include <unistd.h>
#include <utility>

namespace Carriers {
namespace {

namespace fs = std::filesystem;

constexpr std::uintmax_t MIB = 1 << 20;
constexpr char const* IN_WORDS = "folder";

/// A file that is being written, which goes with this object. Its name is made from the final one, so that
/// what a crash leaves goes with the next attempt.
class PartFile {
public:
    PartFile(Base::MarkedFolder const& folder, std::string const& target)
        : folder_(folder), name_(Base::temporaryOf(target)) {}
    ~PartFile() { ::unlinkat(folder_.descriptor(), name_.c_str(), 0); }
    PartFile(PartFile const&) = delete;
    PartFile& operator=(PartFile const&) = delete;

    /// Until the disk has it.
    void write(std::string_view bytes) const {
        Base::FileDescriptor file = folder_.newFile(name_, 0666);
        file.writeAll(bytes);
        file.sync();
        file.close();
    }
    void rename(std::string const& target) const { folder_.rename(name_, target); }

private:
    Base::MarkedFolder const& folder_;
    std::string name_;
};

} // namespace

FolderCarrier::FolderCarrier(fs::path folder, std::string identity)
    : folder_(std::move(folder)), identity_(std::move(identity)) {}

Base::MarkedFolder FolderCarrier::opened() const {
    if (identity_.empty()) {
        Base::FileDescriptor const there(folder_, O_RDONLY | O_DIRECTORY);
        throw Base::Error(Base::Code::CarrierUnavailable,
                          "the folder " + folder_.string() +
                              " could not be had when it was set: set \"carriers\" once more");
    }
    return {IN_WORDS, folder_, identity_};
}

Outcome FolderCarrier::handOver(Parcel const& parcel, PutOnRecord const& /*mayHaveIt*/) {
    Base::MarkedFolder const folder = opened();
    forEachFile(parcel, [&](std::string const& name, std::string_view bytes, bool isLast) {
        PartFile const part(folder, name);
        part.write(bytes);
        // Whoever finds the last one finds the others, also behind a power failure.
        if (isLast)
            folder.sync();
        part.rename(name);
    });
    folder.sync();
    return {Outcome::Kind::Accepted, "in " + folder_.string()};
}

std::string FolderCarrier::test() {
    Base::MarkedFolder const folder = opened();
    PartFile(folder, "test").write("test");
    return folder_.string() + " can be written into and has room for " +
           std::to_string(fs::space(folder_).available / MIB) + " MiB";
}

std::string identityOfFolder(fs::path const& folder) {
    return Base::MarkedFolder(IN_WORDS, folder, {}).identity().text();
}

} // namespace Carriers

// vlmail pack extract: the pages of a mailing file and its metadata as files of their own.
#include "programs/base/error.h"
#include "programs/base/pending_file.h"
#include "programs/base/quoting.h"
#include "programs/base/safe_name.h"
#include "programs/mailing/page_blob.h"
#include "programs/vlmail/commands/pack.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/pack/container_file.h"
#include "vlservice/pack/page_loader.h"

#include <filesystem>
#include <memory>
#include <ostream>
#include <set>
#include <string_view>
#include <system_error>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

struct Options {
    std::string file;
    std::string folder;
};

/// A new folder, or one in which nothing stands that could be overwritten.
class OutputFolder {
public:
    /// Throws Error.
    explicit OutputFolder(fs::path path) : path_(std::move(path)) {
        std::error_code failure;
        fs::create_directories(path_, failure);
        bool const isEmpty = !failure && fs::is_empty(path_, failure);
        if (failure)
            throw Base::Error(Base::Code::FileUnwritable, "cannot write into \"" + path_.string() +
                                                              "\": " + failure.message() +
                                                              "; name another folder with -o");
        if (!isEmpty)
            throw Base::Error(Base::Code::FileExists,
                              "the folder \"" + path_.string() + "\" is not empty; name a new one with -o");
    }

    /// Under a name made of `name`, which may be any text, and `ending`. Throws Error.
    void write(std::string const& name, std::string const& ending, std::string_view data) {
        fs::path const file = path_ / freeName(Base::safeFileName(name), ending);
        try {
            Base::writeFile(file, data, Base::PendingFile::Durability::Lazy);
        } catch (std::system_error const& failure) {
            throw Base::Error(Base::Code::FileUnwritable,
                              "cannot write " + Base::inQuotes(file.string()) + ": " +
                                  failure.code().message() +
                                  "; make room on the disk or name another folder");
        }
    }

private:
    /// Different names may give the same safe one.
    std::string freeName(std::string const& name, std::string const& ending) {
        std::string candidate = name + ending;
        for (int copy = 2; !taken_.insert(candidate).second; ++copy)
            candidate = name + " (" + std::to_string(copy) + ')' + ending;
        return candidate;
    }

    fs::path path_;
    std::set<std::string> taken_;
};

std::string endingOf(std::string_view data) { return data.starts_with("%PDF-") ? ".pdf" : ".bin"; }

void writeEntry(OutputFolder& folder, ContainerFile::Entry const& entry, std::string_view data) {
    if (!isPage(entry))
        return folder.write("metadata", data.starts_with('{') ? ".json" : ".bin", data);
    std::string const stem = fs::path(entry.document).stem().string();
    folder.write((stem.empty() ? "page" : stem) + '-' + entry.name, endingOf(data), data);
}

/// How much may come out of a mailing: more than any has, and less than one can be forged to give.
class Room {
public:
    explicit Room(std::uint64_t fileSize) : limit_(BASE + TIMES * fileSize), left_(limit_) {}

    /// Empty when there is room, which is taken then.
    std::string whyNot(std::uint64_t size) {
        if (size > left_)
            return "the mailing expands to more than " + std::to_string(limit_) + " bytes";
        left_ -= size;
        return {};
    }

private:
    static constexpr std::uint64_t BASE = std::uint64_t{16} << 20;
    static constexpr std::uint64_t TIMES = 64;

    std::uint64_t limit_;
    std::uint64_t left_;
};

SharedMemBuffer expanded(ContainerFile::Entry const& entry, ContainerFile::Blob const& blob) {
    try {
        return Mailing::expanded(blob.bytes);
    } catch (Base::Error const& failure) {
        throw Base::Error(Base::Code::MailingDamaged,
                          "cannot extract " + inWords(entry) + ": " + failure.what());
    }
}

int extract(Options const& options, Terminal const& terminal) {
    ContainerFile container(options.file);
    OutputFolder folder(options.folder);
    Room room(container.fileSize());
    std::size_t written = 0;
    for (unsigned long long i = 0; i < container.size(); ++i) {
        ContainerFile::Entry const& entry = container.entry(i);
        ContainerFile::Blob const blob = container.blob(i);
        std::string const why = blob.damage.empty() ? room.whyNot(blob.dataSize) : blob.damage;
        if (!why.empty()) {
            terminal.complain(Base::Code::MailingDamaged,
                              inWords(entry) + " in \"" + options.file + "\" is left out: " + why);
            continue;
        }
        writeEntry(folder, entry, Mailing::viewOf(expanded(entry, blob)));
        ++written;
    }
    terminal.out << counted(written, "file") << " written into " << options.folder << '\n';
    return written == container.size() ? FINE : FAILED;
}

} // namespace

void addPackExtractCommand(Base::Command const& pack, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const command = pack.addCommand(
        "extract", "Writes the pages of a mailing file and its metadata into a folder, expanded");
    command.addOption("FILE", options->file, "A mailing file").required();
    command.addOption("-o,--output", options->folder, "A new or empty folder").required();
    command.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return extract(*options, terminal); }; });
}

} // namespace VlMail

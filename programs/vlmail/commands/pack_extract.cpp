// vlmail pack extract: the pages of a mailing file and its metadata as files of their own.
#include "programs/base/error.h"
#include "programs/base/safe_name.h"
#include "programs/vlmail/commands/pack.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/pack/container_file.h"
#include "vlservice/pack/page_loader.h"

#include <filesystem>
#include <fstream>
#include <memory>
#include <ostream>
#include <set>
#include <string_view>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

struct Options {
    std::string file;
    std::string folder;
};

std::string_view viewOf(SharedMemBuffer const& data) {
    return {reinterpret_cast<char const*>(data.data()), static_cast<std::size_t>(data.size())};
}

/// A new folder, or one in which nothing stands that could be overwritten.
class OutputFolder {
public:
    /// Throws Error.
    explicit OutputFolder(fs::path path) : path_(std::move(path)) {
        std::error_code failure;
        fs::create_directories(path_, failure);
        bool const isEmpty = !failure && fs::is_empty(path_, failure);
        if (failure)
            throw Base::Error("cannot write into \"" + path_.string() + "\": " + failure.message() +
                              "; name another folder with -o");
        if (!isEmpty)
            throw Base::Error("the folder \"" + path_.string() + "\" is not empty; name a new one with -o");
    }

    /// Under a name made of `name`, which may be any text, and `ending`. Throws Error.
    void write(std::string const& name, std::string const& ending, std::string_view data) {
        fs::path const file = path_ / freeName(Base::safeFileName(name), ending);
        std::ofstream out(file, std::ios::binary);
        if (!out.write(data.data(), static_cast<std::streamsize>(data.size())).flush())
            throw Base::Error("cannot write \"" + file.string() +
                              "\"; make room on the disk or name another folder");
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

int extract(Options const& options, Terminal const& terminal) {
    ContainerFile container(options.file);
    OutputFolder folder(options.folder);
    std::size_t written = 0;
    for (unsigned long long i = 0; i < container.size(); ++i) {
        ContainerFile::Entry const& entry = container.entry(i);
        ContainerFile::Blob const blob = container.blob(i);
        if (!blob.damage.empty()) {
            terminal.complain(inWords(entry) + " in \"" + options.file + "\" is left out: " + blob.damage);
            continue;
        }
        writeEntry(folder, entry, viewOf(PageLoaderI::unzipDbData(blob.bytes)));
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

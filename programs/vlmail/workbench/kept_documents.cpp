#include "programs/vlmail/workbench/kept_documents.h"

#include "programs/base/error.h"
#include "programs/base/quoting.h"

#include <algorithm>
#include <cerrno>
#include <sys/stat.h>
#include <system_error>

namespace VlMail::Workbench {

namespace {

struct stat statusOf(std::filesystem::path const& file) {
    struct stat status {};
    if (::stat(file.c_str(), &status) != 0)
        throw Base::Error(Base::Code::FileUnreadable, "cannot read " + Base::inQuotes(file.string()) + ": " +
                                                          std::generic_category().message(errno) +
                                                          "; look whether it is still there");
    return status;
}

FileMark markIn(struct stat const& status) {
    constexpr std::int64_t NANOSECONDS = 1'000'000'000;
    return {status.st_dev, status.st_ino, static_cast<std::uint64_t>(status.st_size),
            status.st_mtim.tv_sec * NANOSECONDS + status.st_mtim.tv_nsec};
}

} // namespace

std::string versionOf(FileMark const& mark) {
    return std::to_string(mark.device) + '-' + std::to_string(mark.inode) + '-' + std::to_string(mark.size) +
           '-' + std::to_string(mark.modified);
}

FileMark markOf(std::filesystem::path const& file) {
    struct stat const status = statusOf(file);
    if (!S_ISREG(status.st_mode))
        throw Base::Error(Base::Code::FileUnsuitable,
                          "cannot read " + Base::inQuotes(file.string()) + ": it is no ordinary file");
    return markIn(status);
}

FileMark markOfFolder(std::filesystem::path const& folder) { return markIn(statusOf(folder)); }

Reader::Document& KeptDocuments::document(std::filesystem::path const& file) {
    FileMark const mark = markOf(file);
    auto const kept = std::ranges::find(kept_, file, &Kept::file);
    if (kept != kept_.end() && kept->mark == mark) {
        kept_.splice(kept_.begin(), kept_, kept);
        return kept_.front().document;
    }
    if (kept != kept_.end()) {
        bytes_ -= kept->mark.size;
        kept_.erase(kept);
    }
    kept_.push_front({file, mark, Reader::openDocument(file)});
    bytes_ += mark.size;
    dropOldest();
    return kept_.front().document;
}

void KeptDocuments::dropOldest() {
    while (kept_.size() > 1 && (kept_.size() > MOST || bytes_ > MOST_BYTES)) {
        bytes_ -= kept_.back().mark.size;
        kept_.pop_back();
    }
}

} // namespace VlMail::Workbench

#include "programs/vlmail/pack/byte_file.h"

#include "programs/base/error.h"

#include <algorithm>
#include <fcntl.h>
#include <sys/stat.h>
#include <system_error>

namespace VlMail {
namespace {

constexpr std::size_t WINDOW = std::size_t{1} << 20;
/// A search looks at less than the window, so that searches one behind the other share it.
constexpr std::size_t STEP = std::size_t{1} << 12;

[[noreturn]] void cannotRead(std::filesystem::path const& path, std::string const& why) {
    throw Base::Error(Base::Code::FileUnreadable, "cannot read \"" + path.string() + "\": " + why);
}

Base::FileDescriptor openForReading(std::filesystem::path const& path) {
    try {
        // Without waiting, should it be a pipe.
        return Base::FileDescriptor(path, O_RDONLY | O_NONBLOCK);
    } catch (std::system_error const& failure) {
        cannotRead(path, failure.code().message() + "; check the name");
    }
}

} // namespace

ByteFile::ByteFile(std::filesystem::path const& path) : file_(openForReading(path)) {
    struct stat status {};
    ::fstat(file_.number(), &status);
    if (!S_ISREG(status.st_mode))
        cannotRead(path, "it is no file; name a mailing file");
    size_ = static_cast<std::uint64_t>(status.st_size);
}

std::size_t ByteFile::read(std::uint64_t position, void* to, std::size_t count) {
    if (count > WINDOW)
        return readPast(position, static_cast<char*>(to), count);
    std::string_view const bytes = bytesAt(position, count);
    std::copy(bytes.begin(), bytes.end(), static_cast<char*>(to));
    return bytes.size();
}

std::string_view ByteFile::bytesAt(std::uint64_t position, std::size_t count) {
    std::uint64_t const left = position < size_ ? size_ - position : 0;
    auto const wanted = static_cast<std::size_t>(std::min<std::uint64_t>(count, left));
    if (wanted == 0)
        return {};
    if (position < windowAt_ || position + wanted > windowAt_ + window_.size())
        moveWindow(position,
                   static_cast<std::size_t>(std::min<std::uint64_t>(std::max(wanted, WINDOW), left)));
    // A file that has shrunk meanwhile gives less.
    return std::string_view(window_).substr(static_cast<std::size_t>(position - windowAt_), wanted);
}

std::optional<std::uint64_t> ByteFile::find(std::string_view text, std::uint64_t from) {
    for (std::uint64_t at = from; at < size_; at += STEP) {
        // Overlapping: the text may stand across two steps.
        std::size_t const found = bytesAt(at, STEP + text.size() - 1).find(text);
        if (found != std::string_view::npos)
            return at + found;
    }
    return std::nullopt;
}

void ByteFile::moveWindow(std::uint64_t position, std::size_t count) {
    window_.resize(count);
    windowAt_ = position;
    window_.resize(readPast(position, window_.data(), count));
}

std::size_t ByteFile::readPast(std::uint64_t position, char* to, std::size_t count) const {
    try {
        return file_.readAt(position, to, count);
    } catch (std::system_error const& failure) {
        cannotRead(path(), failure.code().message() + "; copy the file to another disk");
    }
}

} // namespace VlMail

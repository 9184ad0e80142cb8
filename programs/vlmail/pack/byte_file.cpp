#include "programs/vlmail/pack/byte_file.h"

#include "programs/base/error.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>

namespace VlMail {
namespace {

constexpr std::size_t WINDOW = std::size_t{1} << 20;
/// A search looks at less than the window, so that searches one behind the other share it.
constexpr std::size_t STEP = std::size_t{1} << 12;

[[noreturn]] void cannotRead(std::filesystem::path const& path, std::string const& why) {
    throw Base::Error("cannot read \"" + path.string() + "\": " + why);
}

} // namespace

ByteFile::ByteFile(std::filesystem::path path)
    : path_(std::move(path)), number_(::open(path_.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK)) {
    if (number_ < 0)
        cannotRead(path_, std::string(std::strerror(errno)) + "; check the name");
    struct stat status {};
    ::fstat(number_, &status);
    if (!S_ISREG(status.st_mode)) {
        ::close(number_);
        cannotRead(path_, "it is no file; name a mailing file");
    }
    size_ = static_cast<std::uint64_t>(status.st_size);
}

ByteFile::~ByteFile() { ::close(number_); }

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
    std::size_t done = 0;
    while (done < count) {
        ssize_t const step = ::pread(number_, to + done, count - done, static_cast<off_t>(position + done));
        if (step < 0 && errno != EINTR)
            cannotRead(path_, std::string(std::strerror(errno)) + "; copy the file to another disk");
        if (step == 0)
            break;
        done += step > 0 ? static_cast<std::size_t>(step) : 0;
    }
    return done;
}

} // namespace VlMail

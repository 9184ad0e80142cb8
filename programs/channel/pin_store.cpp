#include "programs/channel/pin_store.h"

#include "programs/base/error.h"
#include "programs/base/private_file.h"

#include <unistd.h>

#include <sstream>
#include <string_view>

namespace Channel {

namespace {

/// Whether these are 32 bytes in pairs of hexadecimal digits with a colon between each two.
bool isWhole(std::string const& fingerprint) {
    constexpr std::size_t LENGTH = 32 * 3 - 1;
    if (fingerprint.size() != LENGTH)
        return false;
    for (std::size_t i = 0; i < LENGTH; ++i) {
        bool const fits =
            i % 3 == 2 ? fingerprint[i] == ':'
                       : std::string_view("0123456789ABCDEF").find(fingerprint[i]) != std::string::npos;
        if (!fits)
            return false;
    }
    return true;
}

} // namespace

std::optional<std::string> PinStore::find(std::string const& service) const {
    if (::access(file_.c_str(), F_OK) != 0)
        return std::nullopt;
    std::istringstream lines(Base::readPrivateFile(file_));
    std::string line;
    while (std::getline(lines, line)) {
        std::istringstream words(line);
        std::string name;
        std::string fingerprint;
        // A disk that was full leaves half a line.
        if (words >> name >> fingerprint && name == service && isWhole(fingerprint))
            return fingerprint;
    }
    return std::nullopt;
}

void PinStore::add(std::string const& service, std::string const& fingerprint) const {
    std::string line = service + ' ' + fingerprint + '\n';
    // An editor may have left the last line without an end.
    std::string const lines =
        ::access(file_.c_str(), F_OK) == 0 ? Base::readPrivateFile(file_) : std::string();
    if (!lines.empty() && lines.back() != '\n')
        line.insert(0, 1, '\n');
    Base::appendToPrivateFile(file_, line);
}

} // namespace Channel

#include "programs/channel/pin_store.h"

#include "programs/base/error.h"
#include "programs/base/private_file.h"

#include <unistd.h>

#include <sstream>

namespace Channel {

std::optional<std::string> PinStore::find(std::string const& service) const {
    if (::access(file_.c_str(), F_OK) != 0)
        return std::nullopt;
    std::istringstream lines(Base::readPrivateFile(file_));
    std::string line;
    while (std::getline(lines, line)) {
        std::istringstream words(line);
        std::string name;
        std::string fingerprint;
        if (words >> name >> fingerprint && name == service)
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

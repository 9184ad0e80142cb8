#include "programs/channel/pin_store.h"

#include "programs/channel/error.h"
#include "programs/channel/private_file.h"

#include <unistd.h>

#include <sstream>

namespace Channel {

std::optional<std::string> PinStore::find(std::string const& service) const {
    if (::access(file_.c_str(), F_OK) != 0)
        return std::nullopt;
    std::istringstream lines(readPrivateFile(file_));
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
    appendToPrivateFile(file_, service + ' ' + fingerprint + '\n');
}

} // namespace Channel

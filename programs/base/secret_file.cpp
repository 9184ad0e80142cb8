#include "programs/base/secret_file.h"

#include "programs/base/error.h"
#include "programs/base/quoting.h"

#include <cstdlib>

namespace Base {

std::string secretFile(std::string const& name) {
    if (name.starts_with('/'))
        return name;
    char const* const folder = std::getenv("CREDENTIALS_DIRECTORY");
    if (!folder)
        throw Error(Base::Code::SettingMissing,
                    "the service has been handed no credentials, and so no " + inQuotes(name));
    return std::string(folder) + '/' + name;
}

} // namespace Base

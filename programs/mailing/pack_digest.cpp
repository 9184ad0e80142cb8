#include "programs/mailing/pack_digest.h"

#include "programs/mailing/measured.h"

namespace Mailing {
void PackDigest::add(std::string const& document, std::string const& page, long long size,
                     std::string const& sha256) {
    digest_.add(measured(document) + measured(page) + std::to_string(size) + ',' + sha256 + ';');
}

} // namespace Mailing

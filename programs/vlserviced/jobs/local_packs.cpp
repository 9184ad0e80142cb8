#include "programs/vlserviced/jobs/local_packs.h"

#include "programs/base/error.h"
#include "programs/mailing/pack_database.h"

#include <algorithm>
#include <system_error>

namespace VlServiced {
namespace {

namespace fs = std::filesystem;

fs::path resolved(fs::path const& folder) {
    if (folder.empty())
        return folder;
    std::error_code failure;
    fs::path const path = fs::canonical(folder, failure);
    if (failure || !fs::is_directory(path))
        throw Base::Error(Base::Code::FileUnreadable,
                          "the folder of --local-packs is not there: " + folder.string());
    return path;
}

bool isBelow(fs::path const& folder, fs::path const& file) {
    auto const [end, rest] = std::mismatch(folder.begin(), folder.end(), file.begin(), file.end());
    return end == folder.end() && rest != file.end();
}

} // namespace

LocalPacks::LocalPacks(fs::path const& folder) : folder_(resolved(folder)) {}

std::unique_ptr<Mailing::PackSource> LocalPacks::open(PackLocation const& pack) const {
    if (folder_.empty())
        throw Base::Error(
            Base::Code::ServiceOutdated,
            "this service takes pages over the connection alone and no pack database by its path: "
            "use a vlmail that sends them, or start vlserviced with --local-packs FOLDER on the "
            "machine of the client");
    std::error_code failure;
    fs::path const file = fs::canonical(pack.file(), failure);
    if (failure)
        throw Base::Error(Base::Code::DatabaseMissing, "there is no pack database " + pack.file().string());
    if (!isBelow(folder_, file))
        throw Base::Error(Base::Code::DatabaseUnusable, "the pack database " + pack.file().string() +
                                                            " does not lie below " + folder_.string() +
                                                            ", the folder of --local-packs");
    return std::make_unique<Mailing::PackDatabaseReader>(file, pack.packId);
}

} // namespace VlServiced

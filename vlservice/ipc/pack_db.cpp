#include "vlservice/ipc/pack_db.h"

namespace Ipc {
namespace {

constexpr char const* DB_HOST = "db_host";
constexpr char const* DB_NAME = "db_name";

} // namespace

json::Object PackDb::serialize() const { return {{DB_HOST, host}, {DB_NAME, name}}; }

void PackDb::deserialize(json::Object const& request) {
    host = request.get(DB_HOST).toString();
    name = request.get(DB_NAME).toString();
}

} // namespace Ipc

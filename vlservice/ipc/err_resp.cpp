#include "vlservice/ipc/err_resp.h"

namespace Ipc {
namespace {

constexpr char const* ERR = "err";

} // namespace

json::Object errToResp(std::string const& error) {
    json::Object response;
    if (!error.empty())
        response.set(ERR, error);
    return response;
}

std::string errFromResp(json::Object const& response) { return response.get(ERR).textOrEmpty(); }

} // namespace Ipc

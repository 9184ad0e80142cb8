#include "vlservice/ipc/cfg_ids_for_user.h"

#include "vlservice/ipc/cmd_processor_vlsvc.h"

#include <utility>

namespace Ipc {
namespace {

constexpr char const* INCLUDED_USER = "inc_usr";
constexpr char const* ID_DATAS = "id_dtas";
constexpr char const* ID = "id";
constexpr char const* DESCRIPTION = "descr";
constexpr char const* DISABLED = "disabled";

json::Object toJson(CfgIdsForUser::IdData const& idData) {
    json::Object object{{ID, idData.id}, {DESCRIPTION, idData.description}};
    if (idData.disabled)
        object.set(DISABLED, true);
    return object;
}

CfgIdsForUser::IdData fromJson(json::Object const& object) {
    return {object.get(ID).textOrEmpty(), object.get(DESCRIPTION).toString(), object.get(DISABLED).isTrue()};
}

} // namespace

CfgIdsForUser::CfgIdsForUser(std::shared_ptr<CmdProcessorI> processor)
    : CmdVLSvcBase(CMD_ID, std::move(processor)) {}

CfgIdsForUser::CfgIdsForUser(std::shared_ptr<CmdProcessorI> processor, std::string user)
    : CmdVLSvcBase(CMD_ID, std::move(processor)), user_(std::move(user)) {}

char const* CfgIdsForUser::name() const { return "Config Ids For User"; }

void CfgIdsForUser::addToResp(IdData idData) { ids_.push_back(std::move(idData)); }

json::Object CfgIdsForUser::serializeReq() const {
    json::Object request;
    if (!user_.empty())
        request.set(INCLUDED_USER, user_);
    return request;
}

void CfgIdsForUser::deserializeReq(json::Object const& request) {
    user_ = request.get(INCLUDED_USER).textOrEmpty();
}

json::Object CfgIdsForUser::serializeResp() const {
    json::Array ids;
    for (IdData const& idData : ids_)
        ids.append(toJson(idData));
    return {{ID_DATAS, ids}};
}

void CfgIdsForUser::deserializeResp(json::Object const& response) {
    std::vector<IdData> ids;
    for (json::Value const& element : response.get(ID_DATAS).toArray())
        ids.push_back(fromJson(element.toObject()));
    ids_ = std::move(ids);
}

void CfgIdsForUser::accept(CmdProcessorVLSvcI& processor) { processor.visit(*this); }

} // namespace Ipc

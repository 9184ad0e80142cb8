#include "vlservice/ipc/make_empty_cmd.h"

#include "vlservice/ipc/cfg_ids_for_user.h"
#include "vlservice/ipc/cfg_ids_tree.h"
#include "vlservice/ipc/cs_config_ids_list.h"
#include "vlservice/ipc/cs_config_srv_change.h"
#include "vlservice/ipc/get_svc_cfg.h"
#include "vlservice/ipc/price_est.h"
#include "vlservice/ipc/process_pack.h"
#include "vlservice/ipc/remove_cfg_node.h"
#include "vlservice/ipc/set_part_tmpl.h"
#include "vlservice/ipc/set_svc_cfg.h"
#include "vlservice/ipc/update_cfg.h"
#include "vlservice/ipc/update_status.h"
#include "vlservice/ipc/upload_queued.h"

#include <array>
#include <utility>

namespace Ipc {
namespace {

using Maker = std::shared_ptr<CmdVLSvcBase> (*)(std::shared_ptr<CmdProcessorI>);

template<typename Cmd>
std::shared_ptr<CmdVLSvcBase> make(std::shared_ptr<CmdProcessorI> processor) {
    return std::make_shared<Cmd>(std::move(processor));
}

template<typename... Cmds>
constexpr std::array<Maker, 256> makersByNumber() {
    std::array<Maker, 256> makers{};
    ((makers[Cmds::CMD_ID] = make<Cmds>), ...);
    return makers;
}

constexpr auto MAKERS =
    makersByNumber<SetApp, SetInet, SetPresets, SetProfiles, SetPO, SetDepartments, RemoveCfgNode,
                   CfgIdsForUser, CfgIdsTree, UploadQueued, UpdateStatus, UpdateCfg, PriceEst, ProcessPack,
                   GetSvcCfg, SetSvcCfg, CSConfigIdsList, CSConfigSrvChange>();

} // namespace

std::shared_ptr<CmdVLSvcBase> makeEmptyCmd(unsigned char id, std::shared_ptr<CmdProcessorI> processor) {
    Maker const maker = MAKERS[id];
    return maker ? maker(std::move(processor)) : nullptr;
}

} // namespace Ipc

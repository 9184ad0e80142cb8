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

#include <utility>

namespace Ipc {
namespace {

template<typename... Cmds>
std::shared_ptr<CmdVLSvcBase> makeOneOf(unsigned char id, std::shared_ptr<CmdProcessorI> processor) {
    std::shared_ptr<CmdVLSvcBase> cmd;
    ((id == Cmds::CMD_ID && (cmd = std::make_shared<Cmds>(std::move(processor)), true)) || ...);
    return cmd;
}

} // namespace

std::shared_ptr<CmdVLSvcBase> makeEmptyCmd(unsigned char id, std::shared_ptr<CmdProcessorI> processor) {
    return makeOneOf<SetApp, SetInet, SetProfiles, SetPO, SetDepartments, RemoveCfgNode, CfgIdsForUser,
                     CfgIdsTree, UploadQueued, UpdateStatus, UpdateCfg, PriceEst, ProcessPack, GetSvcCfg,
                     SetSvcCfg, CSConfigIdsList, CSConfigSrvChange>(id, std::move(processor));
}

} // namespace Ipc

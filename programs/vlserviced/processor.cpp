#include "programs/vlserviced/processor.h"

#include "programs/base/error.h"
#include "programs/base/one_line.h"
#include "programs/vlserviced/jobs/job_list.h"
#include "programs/vlserviced/settings/parts.h"
#include "vlservice/ipc/cfg_ids_for_user.h"
#include "vlservice/ipc/cfg_ids_tree.h"
#include "vlservice/ipc/cs_config_ids_list.h"
#include "vlservice/ipc/cs_config_srv_change.h"
#include "vlservice/ipc/get_svc_cfg.h"
#include "vlservice/ipc/gui_fwd.h"
#include "vlservice/ipc/price_est.h"
#include "vlservice/ipc/process_pack.h"
#include "vlservice/ipc/remove_cfg_node.h"
#include "vlservice/ipc/set_svc_cfg.h"
#include "vlservice/ipc/update_cfg.h"
#include "vlservice/ipc/update_status.h"
#include "vlservice/ipc/upload_queued.h"
#include "vlservice/platform/log.h"

#include <utility>

namespace VlServiced {
namespace {

/// The line for "err": empty when the operation succeeds.
template<typename Operation>
std::string errorOf(Ipc::CmdI const& cmd, Operation operation) {
    try {
        operation();
        return {};
    } catch (std::exception const& failure) {
        std::string line = Base::oneLine(failure.what());
        Log::Lock(4).logStreamLine() << "Command " << cmd.name() << " was refused: " << line;
        return line;
    }
}

/// The answer, or an object with the one key "err".
template<typename Operation>
json::Object answerOrError(Ipc::CmdI const& cmd, Operation operation) {
    json::Object answer;
    std::string const error = errorOf(cmd, [&] { answer = operation(); });
    return error.empty() ? answer : json::Object{{"err", error}};
}

std::vector<std::string> partsIn(json::Object const& query) {
    json::Value const parts = query.get("parts");
    std::vector<std::string> names;
    if (parts)
        for (json::Value const& part : parts.toArray())
            names.emplace_back(part.toString());
    return names;
}

} // namespace

Processor::Processor(SettingsService& settings, JobStore& jobs, JobRunner& runner,
                     std::filesystem::path outbox, std::function<long long()> now)
    : settings_(settings), jobs_(jobs), runner_(runner), outbox_(std::move(outbox)), now_(std::move(now)) {}

void Processor::submit(std::shared_ptr<Ipc::CmdI> cmd) { cmd->accept(*this); }

void Processor::visit(Ipc::CSConfigSrvChange& cmd) {
    settings_.suspend(static_cast<int>(cmd.suspend()));
    runner_.resume();
}

void Processor::visit(Ipc::CSConfigIdsList& cmd) {
    cmd.setResp(answerOrError(cmd, [&] { return answer(cmd.reqParams()); }));
}

/// The command has one payload for many questions: "query" says which.
json::Object Processor::answer(json::Object const& query) const {
    std::string const kind = query.get("query").textOrEmpty();
    if (kind == "settings")
        return settingsOf(query);
    if (kind == "jobs")
        return listJobs(query, jobs_, settings_, outbox_, now_());
    throw Base::Error("there is no query \"" + kind + "\"; there are settings, jobs");
}

json::Object Processor::settingsOf(json::Object const& query) const {
    json::Value const id = query.get("id");
    // Anything but a text would read as the root.
    if (!id.isString())
        throw Base::Error("\"id\" of a query for settings has to be the id of a node");
    return settings_.effective(id.toString(), partsIn(query));
}

void Processor::visit(Ipc::GuiFwd&) { throw Base::Error("the service forwards nothing to a user interface"); }

void Processor::visit(Ipc::SetSvcCfg& cmd) { settings_.changeService(cmd.req()); }

void Processor::visit(Ipc::GetSvcCfg& cmd) {
    cmd.setResp(answerOrError(cmd, [&] { return serviceOverview(); }));
}

json::Object Processor::serviceOverview() const {
    json::Object overview = settings_.service().stored();
    overview.set("outbox", outbox_.string());
    json::Object counts;
    for (auto const& [state, count] : jobs_.counts())
        counts.set(stateName(state), count);
    overview.set("jobs", counts);
    return overview;
}

void Processor::visit(Ipc::ProcessPack& cmd) {
    runner_.accept({cmd.dbHostPort(), cmd.dbName(), cmd.packId()});
}

void Processor::visit(Ipc::PriceEst& cmd) {
    cmd.setResp(answerOrError(cmd, [&] { return estimate(cmd.reqParams(), settings_.service().tariff()); }));
}

void Processor::visit(Ipc::UpdateCfg& cmd) {
    cmd.setResp(errorOf(cmd, [&] { settings_.update(cmd.cfgId().str(), cmd.resetCfg()); }));
}

void Processor::visit(Ipc::UpdateStatus& cmd) { runner_.updateStatus(cmd.dbHost(), cmd.dbName()); }

void Processor::visit(Ipc::UploadQueued& cmd) { runner_.upload(cmd.dbHost(), cmd.dbName()); }

void Processor::visit(Ipc::CfgIdsTree& cmd) {
    cmd.setResp(answerOrError(cmd, [&] { return settings_.tree(); }));
}

void Processor::visit(Ipc::CfgIdsForUser& cmd) {
    for (auto const& [id, description, disabled] : settings_.usableNodes(cmd.inclUser()))
        cmd.addToResp({id, description, disabled});
}

void Processor::visit(Ipc::RemoveCfgNode& cmd) {
    cmd.setResp(errorOf(cmd, [&] { settings_.remove(cmd.cfgId().str()); }));
}

void Processor::visit(Ipc::SetPartBase& cmd) {
    cmd.setResp(errorOf(cmd, [&] { settings_.setPart(cmd.cfgId().str(), cmd.partName(), cmd.partJson()); }));
}

} // namespace VlServiced

#include "programs/policy/rights.h"

#include "programs/base/plain_text.h"
#include "programs/protocol/carrier.h"
#include "programs/protocol/delivery_report.h"
#include "programs/protocol/documents.h"
#include "programs/protocol/health.h"
#include "programs/protocol/history.h"
#include "programs/protocol/job.h"
#include "programs/protocol/letter.h"
#include "programs/protocol/letter_register.h"
#include "programs/protocol/pack_upload.h"
#include "programs/protocol/settings.h"
#include "vlservice/cfg/cfg_node_id.h"
#include "vlservice/ipc/cfg_ids_for_user.h"
#include "vlservice/ipc/cfg_ids_tree.h"
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

#include <algorithm>
#include <iterator>

namespace Policy {
namespace {

using Protocol::roleName;

struct CommandRight {
    unsigned char command;
    Right right;
};

constexpr CommandRight OF_COMMANDS[] = {
    {Ipc::SetApp::CMD_ID, {Role::Settings, Place::Node}},
    {Ipc::SetInet::CMD_ID, {Role::Settings, Place::Node}},
    {Ipc::SetPresets::CMD_ID, {Role::Settings, Place::Node}},
    {Ipc::SetProfiles::CMD_ID, {Role::Settings, Place::Node}},
    {Ipc::SetPO::CMD_ID, {Role::Settings, Place::Node}},
    {Ipc::SetDepartments::CMD_ID, {Role::Settings, Place::Node}},
    {Ipc::RemoveCfgNode::CMD_ID, {Role::Settings, Place::Node}},
    {Ipc::UpdateCfg::CMD_ID, {Role::Settings, Place::Node}},
    {Ipc::CfgIdsForUser::CMD_ID, {Role::Read, Place::Anywhere}},
    {Ipc::CfgIdsTree::CMD_ID, {Role::Read, Place::Anywhere}},
    {Ipc::PriceEst::CMD_ID, {Role::Read, Place::Anywhere}},
    // It looks what became of jobs, and tells nothing of it.
    {Ipc::UpdateStatus::CMD_ID, {Role::Read, Place::Anywhere}},
    {Ipc::UploadQueued::CMD_ID, {Role::Send, Place::Anywhere}},
    // Whose the pack is stands in the pack.
    {Ipc::ProcessPack::CMD_ID, {Role::Send, Place::Anywhere}},
    {Ipc::GetSvcCfg::CMD_ID, {Role::Admin, Place::Root}},
    {Ipc::SetSvcCfg::CMD_ID, {Role::Admin, Place::Root}},
    {Ipc::CSConfigSrvChange::CMD_ID, {Role::Admin, Place::Root}},
};

struct QuestionRight {
    char const* question;
    Right right;
};

constexpr QuestionRight OF_QUESTIONS[] = {
    {Protocol::SettingsQuery::KIND, {Role::Read, Place::Node}},
    {Protocol::DocumentsQuery::KIND, {Role::Read, Place::Node}},
    {Protocol::DocumentPieceQuery::KIND, {Role::Read, Place::Anywhere}},
    {Protocol::DocumentUpload::KIND, {Role::Settings, Place::Node}},
    {Protocol::DocumentRemoval::KIND, {Role::Settings, Place::Node}},
    {Protocol::JobsQuery::KIND, {Role::Read, Place::Anywhere}},
    {Protocol::JobsChange::KIND, {Role::Send, Place::Anywhere}},
    {Protocol::LetterChange::KIND, {Role::Send, Place::Anywhere}},
    {Protocol::DeliveryReport::KIND, {Role::Send, Place::Anywhere}},
    {Protocol::BeginPack::KIND, {Role::Send, Place::Node}},
    {Protocol::RegisterQuery::KIND, {Role::Send, Place::Node}},
    {Protocol::CarriersQuery::KIND, {Role::Admin, Place::Root}},
    {Protocol::CarrierChange::KIND, {Role::Admin, Place::Root}},
    {Protocol::HealthQuery::KIND, {Role::Admin, Place::Root}},
    {Protocol::TokenAddition::KIND, {Role::Admin, Place::Node}},
    {Protocol::TokensQuery::KIND, {Role::Admin, Place::Anywhere}},
    {Protocol::TokenRevocation::KIND, {Role::Admin, Place::Anywhere}},
    {Protocol::HistoryQuery::KIND, {Role::Admin, Place::Anywhere}},
    {Protocol::SettingsImpactQuery::KIND, {Role::Settings, Place::Node}},
    {Protocol::SettingsReplacement::KIND, {Role::Settings, Place::Node}},
};

std::string placeInWords(std::string const& node) { return node.empty() ? "the root" : Base::oneLine(node); }

bool isSameOrAbove(std::string const& node, std::string const& other) {
    return node.empty() || node == other ||
           Cfg::CfgNodeId(Cfg::Id(node, false)).isParentOf(Cfg::CfgNodeId(Cfg::Id(other, false)));
}

} // namespace

bool Grant::covers(std::string const& nodeId) const { return isSameOrAbove(node, nodeId); }

std::optional<Right> rightFor(unsigned char command) {
    auto const* const found = std::find_if(std::begin(OF_COMMANDS), std::end(OF_COMMANDS),
                                           [&](CommandRight const& row) { return row.command == command; });
    return found == std::end(OF_COMMANDS) ? std::nullopt : std::optional(found->right);
}

std::optional<Right> rightFor(std::string const& question) {
    auto const* const found =
        std::find_if(std::begin(OF_QUESTIONS), std::end(OF_QUESTIONS),
                     [&](QuestionRight const& row) { return question == row.question; });
    return found == std::end(OF_QUESTIONS) ? std::nullopt : std::optional(found->right);
}

std::vector<std::string> knownQuestions() {
    std::vector<std::string> questions;
    for (QuestionRight const& row : OF_QUESTIONS)
        questions.emplace_back(row.question);
    return questions;
}

std::string refusalOf(Grant const& grant, Right const& right, std::string const& node) {
    bool const isThere =
        right.place == Place::Anywhere || grant.covers(right.place == Place::Root ? std::string() : node);
    if (grant.role >= right.role && isThere)
        return {};
    std::string const place =
        right.place == Place::Anywhere ? "" : " at " + placeInWords(right.place == Place::Root ? "" : node);
    return "this needs the role " + std::string(roleName(right.role)) + place + ", and the token " +
           grant.name + " has the role " + roleName(grant.role) + " at " + placeInWords(grant.node) +
           ": ask for a token that may (\"vlmail token add\")";
}

std::string refusalOfGranting(Grant const& holder, Role role, std::string const& node) {
    if (std::string refusal = refusalOf(holder, {Role::Admin, Place::Node}, node); !refusal.empty())
        return refusal;
    return refusalOf(holder, {role, Place::Node}, node);
}

} // namespace Policy

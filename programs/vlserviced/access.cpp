#include "programs/vlserviced/access.h"

#include "programs/base/error.h"
#include "programs/protocol/pack_upload.h"
#include "programs/protocol/query.h"
#include "programs/vlserviced/store/node_id.h"
#include "vlservice/ipc/cs_config_ids_list.h"
#include "vlservice/ipc/remove_cfg_node.h"
#include "vlservice/ipc/set_part_base.h"
#include "vlservice/ipc/update_cfg.h"
#include "vlservice/platform/log.h"

#include <optional>
#include <utility>

namespace VlServiced {
namespace {

constexpr long long BETWEEN_LINES = 60;

/// The question that a command carries, or nothing.
json::Object const* questionOf(Ipc::CmdI const& cmd) {
    auto const* const list = dynamic_cast<Ipc::CSConfigIdsList const*>(&cmd);
    return list ? &list->reqParams() : nullptr;
}

char const* nodeKeyOf(json::Object const& question) {
    using Protocol::BeginPack;
    return Protocol::kindOf(question) == BeginPack::KIND ? BeginPack::CFG_ID : Protocol::NODE_ID;
}

/// The text for a question that names no node; what is wrong with it is told when it is answered.
std::string nodeOf(Ipc::CmdI const& cmd) {
    if (auto const* const set = dynamic_cast<Ipc::SetPartBase const*>(&cmd))
        return set->cfgId().str();
    if (auto const* const removal = dynamic_cast<Ipc::RemoveCfgNode const*>(&cmd))
        return removal->cfgId().str();
    if (auto const* const update = dynamic_cast<Ipc::UpdateCfg const*>(&cmd))
        return update->cfgId().str();
    json::Object const* const question = questionOf(cmd);
    return question ? question->get(nodeKeyOf(*question)).textOrEmpty() : std::string();
}

/// There is an answer to a question that nobody knows, and it is the same for all.
Policy::Right rightFor(Ipc::CmdI const& cmd) {
    json::Object const* const question = questionOf(cmd);
    std::optional<Policy::Right> const right =
        question ? Policy::rightFor(Protocol::kindOf(*question)) : Policy::rightFor(cmd.id());
    return right.value_or(question ? Policy::Right{Policy::Role::Read, Policy::Place::Anywhere}
                                   : Policy::Right{Policy::Role::Admin, Policy::Place::Root});
}

} // namespace

RefusedAttempts::RefusedAttempts(std::function<long long()> now) : now_(std::move(now)) {}

bool RefusedAttempts::isTime() const { return !hasTold_ || now_() - toldAt_ >= BETWEEN_LINES; }

void RefusedAttempts::note(std::string const& line) {
    ++count_;
    last_ = line;
    if (!isTime()) {
        ++leftOut_;
        return;
    }
    tellWhatWasLeftOut();
    hasTold_ = true;
    toldAt_ = now_();
    Log::Lock(4).logStreamLine() << "An attempt was refused: " << line;
}

void RefusedAttempts::tellWhatWasLeftOut() {
    if (leftOut_ == 0 || !isTime())
        return;
    toldAt_ = now_();
    Log::Lock(4).logStreamLine() << "Of attempts that were refused there were " << std::exchange(leftOut_, 0)
                                 << " more, " << count_ << " since the start";
}

void Access::require(Ipc::CmdI const& cmd, Policy::Grant const& by) {
    Policy::Right const right = rightFor(cmd);
    std::string const node = right.place == Policy::Place::Node ? nodeOf(cmd) : std::string();
    // A long one costs memory in what tells of nodes above it.
    if (!by.node.empty())
        checkNodeId(node);
    require(right, node, by);
}

void Access::require(Policy::Role role, std::string const& node, Policy::Grant const& by) {
    require({role, Policy::Place::Node}, node, by);
}

void Access::require(Policy::Right const& right, std::string const& node, Policy::Grant const& by) {
    std::string const refusal = Policy::refusalOf(by, right, node);
    if (refusal.empty())
        return;
    refused_.note(refusal);
    throw Base::Error(Base::Code::NotAllowed, refusal);
}

} // namespace VlServiced

#include "programs/vlserviced/processor.h"

#include "programs/base/error.h"
#include "programs/base/plain_text.h"
#include "programs/carriers/mime_message.h"
#include "programs/carriers/smtp_carrier.h"
#include "programs/protocol/failure.h"
#include "programs/protocol/query.h"
#include "programs/vlserviced/jobs/job_list.h"
#include "programs/vlserviced/jobs/known_letters.h"
#include "programs/vlserviced/settings/estimate.h"
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

/// Empty for all other questions.
std::string channelToTest(json::Object const& question) {
    using Protocol::CarrierChange;
    if (Protocol::kindOf(question) != CarrierChange::KIND)
        return {};
    try {
        CarrierChange const change(question);
        return change.action == Protocol::CarrierAction::Test ? change.channel : std::string();
    } catch (std::exception const&) {
        // What is wrong with it is told as the answer.
        return {};
    }
}

/// Of nodes above those that the grant covers only the ids are told, and nothing of those beside them.
Protocol::TreeNode coveredOf(Protocol::TreeNode tree, Policy::Grant const& by) {
    if (by.covers(tree.id))
        return tree;
    Protocol::TreeNode shown;
    shown.id = tree.id;
    for (Protocol::TreeNode& child : tree.children)
        if (by.covers(child.id) || Policy::Grant{{}, {}, child.id}.covers(by.node))
            shown.children.push_back(coveredOf(std::move(child), by));
    return shown;
}

} // namespace

/// The line for "err": empty when the operation succeeds.
template<typename Operation>
std::string Processor::errorOf(Ipc::CmdI const& cmd, Operation operation) {
    try {
        operation();
        return {};
    } catch (std::exception const& failure) {
        std::string const line = Base::oneLine(failure.what());
        Log::Lock(4).logStreamLine() << "Command " << cmd.name() << " was refused: " << line;
        noteRefusal(line);
        return Base::codedLine(line, Base::codeOf(failure));
    }
}

/// The answer, or an object with the one key "err".
template<typename Operation>
json::Object Processor::answerOrError(Ipc::CmdI const& cmd, Operation operation) {
    json::Object answer;
    std::string const error = errorOf(cmd, [&] { answer = operation(); });
    return error.empty() ? answer : Protocol::failureAnswer(error);
}

void Processor::noteRefusal(std::string const& line) {
    if (measures_)
        measures_->noteRefusal(around_.access.refused().isLast(line) ? Refusal::Rights : Refusal::Request);
}

void Processor::carryOut(std::shared_ptr<Ipc::CmdI> const& cmd, Policy::Grant const& by,
                         std::function<void(std::string const& failure)> done) {
    by_ = by;
    History::Person const acting(around_.history, by_.name);
    done_ = std::move(done);
    std::string failed;
    try {
        around_.access.require(*cmd, by_);
        cmd->accept(*this);
    } catch (std::exception const& failure) {
        failed = Base::codedLine(failure);
        noteRefusal(failure.what());
    }
    if (auto const unfinished = std::exchange(done_, {}))
        unfinished(failed);
}

void Processor::submit(std::shared_ptr<Ipc::CmdI> cmd) {
    carryOut(cmd, Policy::Grant::ofService(), [](std::string const&) {});
}

void Processor::visit(Ipc::CSConfigSrvChange& cmd) {
    around_.settings.suspend(static_cast<int>(cmd.suspend()));
    around_.runner.resume();
    around_.letters.proceed();
}

void Processor::visit(Ipc::CSConfigIdsList& cmd) {
    if (std::string const channel = channelToTest(cmd.reqParams()); !channel.empty())
        return testCarrier(channel, cmd);
    if (Protocol::kindOf(cmd.reqParams()) == Protocol::BeginPack::KIND)
        return beginPack(cmd);
    cmd.setResp(answerOrError(cmd, [&] { return answer(cmd.reqParams()); }));
}

/// Its answer comes when the pack store has been asked.
void Processor::beginPack(Ipc::CSConfigIdsList& cmd) {
    Protocol::BeginPack pack;
    std::string const malformed = errorOf(cmd, [&] { pack = Protocol::BeginPack(cmd.reqParams()); });
    if (!malformed.empty())
        return cmd.setResp(Protocol::failureAnswer(malformed));
    auto const answered = std::static_pointer_cast<Ipc::CSConfigIdsList>(cmd.shared_from_this());
    around_.packs.begin(pack, cmd.processor(),
                        [this, answered, done = std::exchange(done_, {})](
                            Protocol::BeginPackAnswer const& answer, std::string const& failure) {
                            answered->setResp(answerOrError(*answered, [&] {
                                return failure.empty()
                                           ? answer.serialize()
                                           : throw Base::errorSaid(failure, Base::Code::Unexpected);
                            }));
                            done({});
                        });
}

/// The command has one payload for many questions.
std::vector<Processor::Question> const& Processor::answerers() {
    using namespace Protocol;
    static std::vector<Question> const all{
        {SettingsQuery::KIND,
         [](Processor& self, json::Object const& question) {
             return self.around_.settings.effective(SettingsQuery(question)).serialize();
         }},
        {JobsQuery::KIND,
         [](Processor& self, json::Object const& question) {
             return self.listed(JobsQuery(question)).serialize();
         }},
        {JobsChange::KIND,
         [](Processor& self, json::Object const& question) { return self.changeJobs(JobsChange(question)); }},
        {DocumentsQuery::KIND,
         [](Processor& self, json::Object const& question) {
             return self.around_.documents.list(DocumentsQuery(question)).serialize();
         }},
        {DocumentPieceQuery::KIND,
         [](Processor& self, json::Object const& question) {
             DocumentPieceQuery const query(question);
             self.around_.documents.requireTold(query.sha256, self.by_);
             return self.around_.documents.piece(query).serialize();
         }},
        {DocumentUpload::KIND,
         [](Processor& self, json::Object const& question) {
             return self.around_.documents.put(DocumentUpload(question)).serialize();
         }},
        {DocumentRemoval::KIND,
         [](Processor& self, json::Object const& question) {
             return self.around_.documents.remove(DocumentRemoval(question)).serialize();
         }},
        {LetterChange::KIND,
         [](Processor& self, json::Object const& question) {
             return self.changeLetter(LetterChange(question));
         }},
        {DeliveryReport::KIND,
         [](Processor& self, json::Object const& question) {
             return self.noteReport(DeliveryReport(question)).serialize();
         }},
        {CarriersQuery::KIND,
         [](Processor& self, json::Object const&) { return self.around_.letters.list().serialize(); }},
        {CarrierChange::KIND,
         [](Processor& self, json::Object const& question) {
             return self.changeCarrier(CarrierChange(question));
         }},
        {TokenAddition::KIND,
         [](Processor& self, json::Object const& question) {
             return self.around_.tokens.add(TokenAddition(question), self.by_).serialize();
         }},
        {TokensQuery::KIND,
         [](Processor& self, json::Object const&) { return self.around_.tokens.list(self.by_).serialize(); }},
        {TokenRevocation::KIND,
         [](Processor& self, json::Object const& question) {
             return self.around_.tokens.revoke(TokenRevocation(question), self.by_).serialize();
         }},
        {HealthQuery::KIND,
         [](Processor& self, json::Object const&) { return self.around_.health().serialize(); }},
        {HistoryQuery::KIND,
         [](Processor& self, json::Object const& question) {
             return self.historyOf(HistoryQuery(question)).serialize();
         }},
        {SettingsImpactQuery::KIND,
         [](Processor& self, json::Object const& question) {
             return self.around_.settings.impact(SettingsImpactQuery(question)).serialize();
         }},
        {SettingsReplacement::KIND,
         [](Processor& self, json::Object const& question) {
             return self.around_.settings.replace(SettingsReplacement(question)).serialize();
         }},
        {RegisterQuery::KIND,
         [](Processor& self, json::Object const& question) {
             return self.knownIn(RegisterQuery(question)).serialize();
         }},
        {BeginPack::KIND, nullptr},
    };
    return all;
}

std::vector<std::string> Processor::questions() {
    std::vector<std::string> kinds;
    for (Question const& question : answerers())
        kinds.emplace_back(question.kind);
    return kinds;
}

json::Object Processor::answer(json::Object const& question) {
    std::string const kind = Protocol::kindOf(question);
    std::string all;
    for (Question const& known : answerers()) {
        if (known.answer && kind == known.kind)
            return known.answer(*this, question);
        all += (all.empty() ? "" : ", ") + std::string(known.kind);
    }
    throw Base::Error(Base::Code::ServiceOutdated, "there is no query \"" + kind + "\"; there are " + all);
}

json::Object Processor::changeJobs(Protocol::JobsChange const& change) {
    Protocol::JobsChangeAnswer answer;
    Protocol::JobsQuery changed;
    for (std::string const& id : change.ids) {
        try {
            requireJob(id);
            around_.runner.change(change.action, id);
            changed.ids.push_back(id);
        } catch (Base::Error const& refused) {
            answer.refused.emplace_back(id, Base::codedLine(refused));
        }
    }
    if (!changed.ids.empty())
        answer.jobs = listed(changed).jobs;
    return answer.serialize();
}

Protocol::JobsAnswer Processor::listed(Protocol::JobsQuery const& query) const {
    return listJobs(query, around_.jobs, around_.letters.store(), around_.settings, around_.outbox,
                    around_.now(), by_);
}

Protocol::HistoryAnswer Processor::historyOf(Protocol::HistoryQuery const& query) {
    if (query.id)
        around_.access.require(Policy::Role::Admin, *query.id, by_);
    Protocol::HistoryAnswer answer;
    answer.entries = around_.history.of(query.id.value_or(by_.node), query.limit);
    return answer;
}

Protocol::RegisterAnswer Processor::knownIn(Protocol::RegisterQuery const& query) const {
    Protocol::RegisterAnswer answer = knownLetters(query, around_.letterRegister, around_.jobs,
                                                   around_.letters.store(), around_.now(), by_);
    if (measures_)
        measures_->noteSentBefore(LeftOut::Told, answer.letters.size());
    return answer;
}

/// Of jobs of other nodes the holder is told what he is told of those that there are not.
void Processor::requireJob(std::string const& packId) const {
    std::optional<Job> const job = around_.jobs.find(packId);
    if (!job || !by_.covers(job->cfgId))
        throw Base::Error(Base::Code::MailingUnknown, "there is no mailing " + Base::oneLine(packId));
}

json::Object Processor::changeLetter(Protocol::LetterChange const& change) {
    requireJob(change.id);
    around_.letters.decide(change);
    Protocol::JobsQuery changed;
    changed.ids = {change.id};
    changed.letters = true;
    return listed(changed).serialize();
}

Protocol::DeliveryReportAnswer Processor::noteReport(Protocol::DeliveryReport const& report) {
    Carriers::MailReport const mail = Carriers::mailReportIn(report.message);
    auto const id = LetterId::ofKey(Carriers::keyOfMessageId(mail.messageId));
    if (!id)
        throw Base::Error(Base::Code::LetterUnknown,
                          "the report is about a message that is no letter of this service");
    requireJob(id->packId);
    StoredLetter const letter = around_.letters.note(*id, mail.kind, mail.says);
    Protocol::DeliveryReportAnswer answer;
    answer.id = letter.id.packId;
    answer.letter.number = letter.id.isNotice() ? -letter.id.number : letter.id.number;
    answer.letter.key = letter.id.key();
    answer.letter.channel = letter.channel;
    answer.letter.state = letter.state;
    answer.letter.says = letter.says;
    answer.letter.changed = letter.changedAt;
    return answer;
}

json::Object Processor::changeCarrier(Protocol::CarrierChange const& change) {
    if (change.action == Protocol::CarrierAction::Pause)
        around_.letters.pause(change.channel);
    else
        around_.letters.resume(change.channel);
    return around_.letters.list().serialize();
}

void Processor::testCarrier(std::string const& channel, Ipc::CSConfigIdsList& cmd) {
    auto const done = done_;
    std::string const refused = errorOf(cmd, [&] {
        around_.letters.test(channel, [&cmd, done](std::string const& says, std::string const& failure) {
            Protocol::CarrierTestAnswer answer;
            answer.says = says;
            cmd.setResp(failure.empty() ? answer.serialize()
                                        : Protocol::failureAnswer(
                                              Base::codedLine(failure, Base::Code::CarrierUnavailable)));
            done({});
        });
    });
    if (refused.empty())
        done_ = {};
    else
        cmd.setResp(Protocol::failureAnswer(refused));
}

void Processor::visit(Ipc::GuiFwd&) {
    throw Base::Error(Base::Code::RequestInvalid, "the service forwards nothing to a user interface");
}

void Processor::visit(Ipc::SetSvcCfg& cmd) {
    around_.settings.changeService(cmd.req());
    around_.letters.proceed();
}

void Processor::visit(Ipc::GetSvcCfg& cmd) {
    cmd.setResp(answerOrError(cmd, [&] { return serviceOverview(); }));
}

json::Object Processor::serviceOverview() const {
    json::Object counts;
    for (auto const& [state, count] : around_.jobs.counts())
        counts.set(Protocol::stateName(state), count);
    return Protocol::serviceOverview(around_.settings.service().told(), around_.outbox.string(), counts);
}

void Processor::visit(Ipc::ProcessPack& cmd) {
    PackLocation pack{cmd.dbHostPort(), cmd.dbName(), cmd.packId()};
    auto done = std::exchange(done_, {});
    JobRunner::RequireNode const mayBeOf = [this, by = by_](std::string const& node) {
        around_.access.require(Policy::Role::Send, node, by);
    };
    if (!pack.isWithService())
        return around_.runner.accept(pack, mayBeOf, std::move(done));
    pack.database = Protocol::PACKS_OF_CONNECTION;
    // Of a job that is on record the pages may be gone.
    if (around_.jobs.find(pack.packId))
        return around_.runner.accept(pack, mayBeOf, std::move(done));
    around_.packs.complete(pack.packId, [this, pack, mayBeOf, done = std::move(done),
                                         who = by_.name](std::string const& failure) {
        History::Person const acting(around_.history, who);
        failure.empty() ? around_.runner.accept(pack, mayBeOf, done) : done(failure);
    });
}

void Processor::visit(Ipc::PriceEst& cmd) {
    cmd.setResp(answerOrError(cmd, [&] {
        return estimate(Protocol::PriceRequest(cmd.reqParams()), around_.settings.service().tariff())
            .serialize();
    }));
}

void Processor::visit(Ipc::UpdateCfg& cmd) {
    cmd.setResp(errorOf(cmd, [&] { around_.settings.update(cmd.cfgId().str(), cmd.resetCfg()); }));
}

void Processor::visit(Ipc::UpdateStatus& cmd) { around_.runner.updateStatus(cmd.dbHost(), cmd.dbName()); }

void Processor::visit(Ipc::UploadQueued& cmd) { around_.runner.upload(cmd.dbHost(), cmd.dbName(), by_); }

void Processor::visit(Ipc::CfgIdsTree& cmd) {
    cmd.setResp(answerOrError(cmd, [&] { return coveredOf(around_.settings.tree(), by_).serialize(); }));
}

void Processor::visit(Ipc::CfgIdsForUser& cmd) {
    for (auto const& [id, description, disabled] : around_.settings.usableNodes(cmd.inclUser()))
        if (by_.covers(id))
            cmd.addToResp({id, description, disabled});
}

void Processor::visit(Ipc::RemoveCfgNode& cmd) {
    cmd.setResp(errorOf(cmd, [&] { around_.settings.remove(cmd.cfgId().str()); }));
}

void Processor::visit(Ipc::SetPartBase& cmd) {
    cmd.setResp(
        errorOf(cmd, [&] { around_.settings.setPart(cmd.cfgId().str(), cmd.partName(), cmd.partJson()); }));
}

} // namespace VlServiced

#pragma once
// Carries out the commands that clients send.

#include "programs/protocol/delivery_report.h"
#include "programs/protocol/health.h"
#include "programs/protocol/letter_register.h"
#include "programs/vlserviced/access.h"
#include "programs/vlserviced/jobs/job_runner.h"
#include "programs/vlserviced/jobs/letter_runner.h"
#include "programs/vlserviced/jobs/pack_reception.h"
#include "programs/vlserviced/metrics/measures.h"
#include "programs/vlserviced/settings/document_service.h"
#include "programs/vlserviced/settings/settings_service.h"
#include "programs/vlserviced/settings/token_service.h"
#include "programs/vlserviced/store/letter_register.h"
#include "vlservice/ipc/cmd_processor_vlsvc.h"
#include "vlservice/ipc/set_part_base.h"

#include <filesystem>
#include <functional>
#include <string>
#include <utility>
#include <vector>

namespace VlServiced {

/// What commands are carried out on. All that is referred to has to outlive the processor.
struct ProcessorSurroundings {
    SettingsService& settings;
    DocumentService& documents;
    TokenService& tokens;
    Access& access;
    History& history;
    JobStore& jobs;
    JobRunner& runner;
    LetterRunner& letters;
    PackReception& packs;
    LetterRegister const& letterRegister;
    std::filesystem::path outbox;
    std::function<long long()> now;
    std::function<Protocol::HealthAnswer()> health;
};

/// A command is done when its visit returns, unless the visit takes what is to be called then. What fails is
/// told in the command's own response where that has room for it, as one line under "err"; otherwise the
/// visit throws Error.
class Processor : public Ipc::CmdProcessorVLSvcI, public Ipc::SetPartProcessorI {
public:
    explicit Processor(ProcessorSurroundings surroundings) : around_(std::move(surroundings)) {}

    /// Notes refusals from here on; the measures have to outlive the processor.
    void countIn(Measures& measures) { measures_ = &measures; }

    /// The kinds of questions that it answers.
    static std::vector<std::string> questions();

    /// Carries a command out for the holder of a grant. `done` is called once, on this thread, possibly
    /// later; with the reason, one line, when the command failed and its response has no room for that.
    void carryOut(std::shared_ptr<Ipc::CmdI> const& cmd, Policy::Grant const& by,
                  std::function<void(std::string const& failure)> done);
    /// For the service itself.
    void submit(std::shared_ptr<Ipc::CmdI> cmd) override;

    void visit(Ipc::CSConfigSrvChange& cmd) override;
    void visit(Ipc::CSConfigIdsList& cmd) override;
    void visit(Ipc::GuiFwd& cmd) override;
    void visit(Ipc::SetSvcCfg& cmd) override;
    void visit(Ipc::GetSvcCfg& cmd) override;
    void visit(Ipc::ProcessPack& cmd) override;
    void visit(Ipc::PriceEst& cmd) override;
    void visit(Ipc::UpdateCfg& cmd) override;
    void visit(Ipc::UpdateStatus& cmd) override;
    void visit(Ipc::UploadQueued& cmd) override;
    void visit(Ipc::CfgIdsTree& cmd) override;
    void visit(Ipc::CfgIdsForUser& cmd) override;
    void visit(Ipc::RemoveCfgNode& cmd) override;
    void visit(Ipc::SetPartBase& cmd) override;

private:
    using Answerer = json::Object (*)(Processor&, json::Object const& question);
    struct Question {
        char const* kind;
        /// Null for those whose answer comes later.
        Answerer answer;
    };
    static std::vector<Question> const& answerers();

    template<typename Operation>
    std::string errorOf(Ipc::CmdI const& cmd, Operation operation);
    template<typename Operation>
    json::Object answerOrError(Ipc::CmdI const& cmd, Operation operation);
    void noteRefusal(std::string const& line);
    json::Object answer(json::Object const& question);
    void beginPack(Ipc::CSConfigIdsList& cmd);
    json::Object changeJobs(Protocol::JobsChange const& change);
    json::Object changeLetter(Protocol::LetterChange const& change);
    Protocol::DeliveryReportAnswer noteReport(Protocol::DeliveryReport const& report);
    json::Object changeCarrier(Protocol::CarrierChange const& change);
    Protocol::JobsAnswer listed(Protocol::JobsQuery const& query) const;
    Protocol::HistoryAnswer historyOf(Protocol::HistoryQuery const& query);
    Protocol::RegisterAnswer knownIn(Protocol::RegisterQuery const& query) const;
    void requireJob(std::string const& packId) const;
    void testCarrier(std::string const& channel, Ipc::CSConfigIdsList& cmd);
    json::Object serviceOverview() const;

    ProcessorSurroundings const around_;
    Measures* measures_ = nullptr;
    /// Of the command at hand.
    Policy::Grant by_;
    std::function<void(std::string const& failure)> done_;
};

} // namespace VlServiced

#include "vlservice/platform/cmd.h"

#include "vlservice/platform/log.h"

#include <utility>

namespace Ipc {

using namespace std::chrono_literals;

std::chrono::milliseconds Timeouts::duration(TimeoutId id) {
    switch (id) {
    case TIMEOUT_ID_0:
        return 0s;
    case TIMEOUT_ID_1:
        return 10s;
    case TIMEOUT_ID_2:
        return 30s;
    case TIMEOUT_ID_3:
        return 120s;
    }
    return 0s;
}

CmdTransferI::~CmdTransferI() = default;

CmdProcessorI::~CmdProcessorI() = default;

CmdTransferI* CmdProcessorI::transfer() { return nullptr; }

namespace {
constexpr char const* NO_FORM = "The command has no form to be sent in";
} // namespace

CmdI::CmdI(unsigned char id, std::shared_ptr<CmdProcessorI> processor)
    : id_(id), processor_(std::move(processor)) {}

CmdI::~CmdI() = default;

Timeouts::TimeoutId CmdI::reqTimeoutId() const { return Timeouts::TIMEOUT_ID_1; }

void CmdI::onTransferError(std::string message) {
    Log::Lock log(4);
    log.logStreamLine() << "Command " << name() << " failed in transfer. " << message;
}

void CmdI::sendReq() { onTransferError(NO_FORM); }
void CmdI::readReq() { onTransferError(NO_FORM); }
void CmdI::sendResp() { onTransferError(NO_FORM); }
void CmdI::readResp() { onTransferError(NO_FORM); }
void CmdI::accept(CmdProcessorI&) {}
bool CmdI::sendNextReqAfterDone() const { return true; }

JsonCmdBase::JsonCmdBase(unsigned char id, std::shared_ptr<CmdProcessorI> processor)
    : CmdI(id, std::move(processor)) {}

JsonCmdBase::~JsonCmdBase() = default;

CmdTransferI* JsonCmdBase::transferOrFail() {
    CmdTransferI* const transfer = processor() ? processor()->transfer() : nullptr;
    if (!transfer)
        onTransferError("There is no connection");
    return transfer;
}

std::shared_ptr<JsonCmdBase> JsonCmdBase::self() {
    return std::static_pointer_cast<JsonCmdBase>(shared_from_this());
}

void JsonCmdBase::sendReq() {
    if (CmdTransferI* const transfer = transferOrFail())
        transfer->send(self(), CmdTransferI::Message::Request, serializeReq(),
                       [cmd = self()] { cmd->sendReqDone(); });
}

void JsonCmdBase::readReq() {
    if (CmdTransferI* const transfer = transferOrFail())
        transfer->read(self(), CmdTransferI::Message::Request, [cmd = self()](json::Object const& request) {
            cmd->deserializeReq(request);
            cmd->readReqDone();
        });
}

void JsonCmdBase::sendResp() {
    if (CmdTransferI* const transfer = transferOrFail())
        transfer->send(self(), CmdTransferI::Message::Response, serializeResp(),
                       [cmd = self()] { cmd->sendRespDone(); });
}

void JsonCmdBase::readResp() {
    if (CmdTransferI* const transfer = transferOrFail())
        transfer->read(self(), CmdTransferI::Message::Response, [cmd = self()](json::Object const& response) {
            cmd->deserializeResp(response);
            cmd->readRespDone();
        });
}

json::Object JsonCmdBase::serializeReq() const { return {}; }
void JsonCmdBase::sendReqDone() {}
void JsonCmdBase::deserializeReq(json::Object const&) {}
void JsonCmdBase::readReqDone() {}
json::Object JsonCmdBase::serializeResp() const { return {}; }
void JsonCmdBase::sendRespDone() {}
void JsonCmdBase::deserializeResp(json::Object const&) {}
void JsonCmdBase::readRespDone() {}

} // namespace Ipc

#pragma once
// The bases of commands: what a command is to the connection that carries it and to the processor that
// handles it.

#include "vlservice/export.h"
#include "vlservice/json/json.h"

#include <chrono>
#include <functional>
#include <memory>
#include <string>

namespace Ipc {

class CmdI;

/// How long a request may take.
class VLSERVICE_EXPORT Timeouts {
public:
    /// Names of the limits.
    enum TimeoutId { TIMEOUT_ID_0 = 0, TIMEOUT_ID_1 = 1, TIMEOUT_ID_2 = 2, TIMEOUT_ID_3 = 3 };

    /// Zero, which is no limit, for 0; then 10 s, 30 s and 120 s.
    static std::chrono::milliseconds duration(TimeoutId id);
};

/// Carries the messages of commands. A connection between programs implements it; a processor hands it out.
/// A message that cannot be carried ends in the command's onTransferError. The functions are called later or
/// at once.
class VLSERVICE_EXPORT CmdTransferI {
public:
    /// Which half of a command travels.
    enum class Message { Request, Response };

    virtual ~CmdTransferI();
    /// Sends a message; `gone` is called when it has been written.
    virtual void send(std::shared_ptr<CmdI> cmd, Message which, json::Object const& message,
                      std::function<void()> gone) = 0;
    /// Receives a message and hands it to `taken`; what that throws is a transfer failure.
    virtual void read(std::shared_ptr<CmdI> cmd, Message which,
                      std::function<void(json::Object const&)> taken) = 0;
};

/// Receives commands.
class VLSERVICE_EXPORT CmdProcessorI {
public:
    /// Takes charge of a command.
    virtual void submit(std::shared_ptr<CmdI> cmd) = 0;
    virtual ~CmdProcessorI();

    /// What carries this processor's commands; null when they never leave the program.
    virtual CmdTransferI* transfer();
};

/// A command: a number, a name, and its steps over a connection. Held by std::shared_ptr; one thread at a
/// time.
class VLSERVICE_EXPORT CmdI : public std::enable_shared_from_this<CmdI> {
protected:
    virtual ~CmdI();

public:
    CmdI(unsigned char id, std::shared_ptr<CmdProcessorI> processor);
    CmdI(CmdI const&) = default;

    unsigned char id() const { return id_; }                                       ///< the number
    std::shared_ptr<CmdProcessorI> const& processor() const { return processor_; } ///< shared

    /// The display name.
    virtual char const* name() const = 0;
    /// Which timeout governs the request; TIMEOUT_ID_1 unless overridden.
    virtual Timeouts::TimeoutId reqTimeoutId() const;
    /// Told the text of a transfer failure; logs it.
    virtual void onTransferError(std::string message);
    /// The four steps of a transfer. A command that has no form to be sent in ends them in onTransferError.
    virtual void sendReq();
    virtual void readReq();  ///< on the other side
    virtual void sendResp(); ///< on the other side
    virtual void readResp(); ///< where it began
    /// Shows itself to the processor; here nothing.
    virtual void accept(CmdProcessorI& processor);
    /// Whether the next request may be sent when this command is done; true.
    virtual bool sendNextReqAfterDone() const;

private:
    unsigned char id_;
    std::shared_ptr<CmdProcessorI> processor_;
};

/// A command whose request and response are JSON objects. The four transfer steps run over
/// processor()->transfer(); without one they end in onTransferError. The base's serialisation gives an empty
/// object and its reading takes nothing.
class VLSERVICE_EXPORT JsonCmdBase : public CmdI {
protected:
    ~JsonCmdBase() override;

public:
    JsonCmdBase(unsigned char id, std::shared_ptr<CmdProcessorI> processor);
    JsonCmdBase(JsonCmdBase const&) = default;

    void sendReq() override;
    void readReq() override;  ///< on the other side
    void sendResp() override; ///< on the other side
    void readResp() override; ///< where it began

    virtual json::Object serializeReq() const; ///< what the request carries
    /// The request has gone.
    virtual void sendReqDone();
    virtual void deserializeReq(json::Object const& request); ///< throws what it cannot take
    /// The request has been read.
    virtual void readReqDone();
    virtual json::Object serializeResp() const; ///< what the response carries
    /// The response has gone.
    virtual void sendRespDone();
    virtual void deserializeResp(json::Object const& response); ///< throws what it cannot take
    /// The response has been read.
    virtual void readRespDone();

private:
    /// Null, and the command has been told, when there is no connection.
    CmdTransferI* transferOrFail();
    std::shared_ptr<JsonCmdBase> self();
};

} // namespace Ipc

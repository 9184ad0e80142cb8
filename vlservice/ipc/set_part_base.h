#pragma once
// What the commands that set a part of a node's settings have in common, and what handles them.

#include "vlservice/cfg/id.h"
#include "vlservice/ipc/cmd_vlsvc_base.h"

#include <string>

namespace Ipc {

/// Carries the node's id and the part as JSON; the response is an error text. The heirs name the part.
class VLSERVICE_EXPORT SetPartBase : public CmdVLSvcBase {
protected:
    ~SetPartBase() override;

public:
    SetPartBase(unsigned char id, std::shared_ptr<CmdProcessorI> processor);
    SetPartBase(unsigned char id, std::shared_ptr<CmdProcessorI> processor, Cfg::Id cfgId,
                json::Value partJson);
    SetPartBase(SetPartBase const&) = default;

    /// The part's PART_NAME.
    virtual std::string const& partName() const = 0;

    Cfg::Id const& cfgId() const { return cfgId_; }
    /// The part as its own serialize gives it; the empty handle when all of it is inherited.
    json::Value const& partJson() const { return partJson_; }
    bool respOK() const { return error_.empty(); }
    /// Empty on success.
    std::string const& respErrMsg() const { return error_; }
    void setResp(std::string error);

    using CmdVLSvcBase::accept;

private:
    json::Object serializeReq() const override;
    /// Throws json::Exc, and changes nothing, when the id is no text or the part could not be read.
    void deserializeReq(json::Object const& request) override;
    json::Object serializeResp() const override;
    void deserializeResp(json::Object const& response) override;
    /// Reaches a processor that is a SetPartProcessorI too; any other makes the response an error.
    void accept(CmdProcessorVLSvcI& processor) override;
    /// Throws json::Exc when the part's class cannot read this.
    virtual void requireReadable(json::Value const& partJson) const = 0;

    Cfg::Id cfgId_;
    json::Value partJson_;
    std::string error_;
};

/// Handles the commands that set a part. A processor implements it beside CmdProcessorVLSvcI.
class VLSERVICE_EXPORT SetPartProcessorI {
public:
    virtual ~SetPartProcessorI();
    virtual void visit(SetPartBase& cmd) = 0;
};

} // namespace Ipc

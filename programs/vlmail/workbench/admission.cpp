#include "programs/vlmail/workbench/admission.h"

#include "programs/channel/proof.h"

namespace VlMail::Workbench {
namespace {

using Code = Base::Code;

/// A name that leads here by a server of names of somebody else's is not this machine's.
bool isFromElsewhere(Request const& request, std::string const& host) {
    return request.host != host || (!request.origin.empty() && request.origin != "http://" + host);
}

} // namespace

std::string Admission::host() const { return "127.0.0.1:" + std::to_string(port); }

std::string Admission::url() const { return "http://" + host() + "/#" + token; }

std::optional<Answer> Admission::refusalOf(Request const& request) const {
    if (isFromElsewhere(request, host()))
        return failureOf(403, Code::NotAllowed,
                         "the workbench answers its own page alone; open the address that it has printed");
    bool const isApi = request.target.starts_with(API);
    if (request.method != (isApi ? Request::Method::Post : Request::Method::Get))
        return failureOf(405, Code::RequestInvalid,
                         isApi ? "ask for this by POST" : "ask for files of the page by GET");
    if (isApi && !Channel::isSameProof(request.token, token))
        return failureOf(403, Code::TokenRefused,
                         "this page belongs to a workbench that has ended, or its address is not whole; open "
                         "the address that \"vlmail workbench\" has printed");
    return std::nullopt;
}

} // namespace VlMail::Workbench

#include "programs/vlmail/workbench/workbench.h"

#include "programs/base/error.h"
#include "programs/channel/token.h"
#include "programs/vlmail/workbench/admission.h"
#include "programs/vlmail/workbench/door.h"
#include "programs/vlmail/workbench/page_files.h"

#include <utility>

#include <boost/asio/io_context.hpp>
#include <boost/asio/signal_set.hpp>

#include <csignal>

namespace VlMail::Workbench {

void serve(Setup const&, std::function<void(std::string const& url)> const& begun) {
    boost::asio::io_context io(1);
    boost::asio::signal_set signals(io, SIGINT, SIGTERM);
    signals.async_wait([&](boost::system::error_code const&, int) { io.stop(); });
    Door door(io);
    Admission const admission{Channel::makeNonce(), door.port()};
    door.open([&](Request const& request, Door::Respond const& respond) {
        if (auto refusal = admission.refusalOf(request))
            return respond(std::move(*refusal));
        if (!request.target.starts_with(API))
            return respond(pageFile(request.target));
        respond(failureOf(404, Base::Code::RequestInvalid, "there is no such request"));
    });
    begun(admission.url());
    io.run();
}

} // namespace VlMail::Workbench

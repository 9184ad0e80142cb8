#include "programs/vlmail/workbench/workbench.h"

#include "programs/base/error.h"
#include "programs/base/quoting.h"
#include "programs/channel/token.h"
#include "programs/vlmail/workbench/admission.h"
#include "programs/vlmail/workbench/door.h"
#include "programs/vlmail/workbench/page_files.h"
#include "programs/vlmail/workbench/session.h"

#include <utility>

#include <boost/asio/io_context.hpp>
#include <boost/asio/signal_set.hpp>

#include <csignal>
#include <string_view>
#include <system_error>

namespace VlMail::Workbench {
namespace {

std::filesystem::path requireFolder(std::filesystem::path const& folder) {
    std::error_code failure;
    std::filesystem::path const found = std::filesystem::canonical(folder, failure);
    std::filesystem::directory_iterator const entries(failure ? folder : found, failure);
    if (failure)
        throw Base::Error(Base::Code::FileUnreadable,
                          "cannot look into the folder " + Base::inQuotes(folder.string()) + ": " +
                              failure.message() + "; name a folder with documents");
    return found;
}

} // namespace

void serve(Setup const& setup, std::unique_ptr<SettingsStore> store,
           std::function<void(std::string const& url)> const& begun) {
    boost::asio::io_context io(1);
    boost::asio::signal_set signals(io, SIGINT, SIGTERM);
    signals.async_wait([&](boost::system::error_code const&, int) { io.stop(); });
    Session session(io, {requireFolder(setup.folder), setup.letterheads, setup.elsewhere}, setup.limits,
                    std::move(store));
    Door door(io);
    Admission const admission{Channel::makeNonce(), door.port()};
    door.open([&](Request request, Door::Respond const& respond) {
        if (auto refusal = admission.refusalOf(request))
            return respond(std::move(*refusal));
        if (!request.target.starts_with(API))
            return respond(pageFile(request.target));
        session.answer(request.target.substr(std::string_view(API).size()), std::move(request.body), respond);
    });
    begun(admission.url());
    io.run();
}

} // namespace VlMail::Workbench

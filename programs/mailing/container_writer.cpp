#include "programs/mailing/container_writer.h"

#include "programs/base/error.h"
#include "programs/base/quoting.h"

#include <cerrno>
#include <system_error>
#include <utility>

namespace Mailing {

ContainerWriter::ContainerWriter(std::filesystem::path const& target, std::string const& mailingId)
    : PageSaverI(mailingId), file_(target),
      container_(file_.temporary().string(), PackWrapper::PURPOSE_OUTPUT, mailingId) {
    noteFailure();
}

/// The container says only that it failed; right behind the call that did, the system still knows why.
void ContainerWriter::noteFailure() {
    if (container_.failed() && failure_ == 0)
        failure_ = errno != 0 ? errno : EIO;
}

void ContainerWriter::savePage(std::string const& document, std::string const& page, SharedMemBuffer blob) {
    errno = 0;
    container_.savePage(document, page, std::move(blob));
    noteFailure();
}

void ContainerWriter::finish(SharedMemBuffer metadata, std::string const& remedy) {
    errno = 0;
    if (!container_.finalizeOutput(std::move(metadata))) {
        noteFailure();
        throw Base::Error(Base::Code::FileUnwritable,
                          "cannot write " + Base::inQuotes(file_.target().string()) + ": " +
                              std::generic_category().message(failure_) + "; " + remedy);
    }
    file_.commit();
}

} // namespace Mailing

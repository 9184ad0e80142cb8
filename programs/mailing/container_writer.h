#pragma once
// The container of a mailing as a file that appears under its name only when it is whole.

#include "programs/base/pending_file.h"
#include "vlservice/pack/pack_wrapper.h"
#include "vlservice/pack/page_saver.h"

#include <filesystem>
#include <string>

namespace Mailing {

class ContainerWriter : public PageSaverI {
public:
    /// Throws std::system_error when no file can be made beside the target.
    ContainerWriter(std::filesystem::path const& target, std::string const& mailingId);

    std::filesystem::path const& target() const { return file_.target(); }
    /// A failure is kept for finish().
    void savePage(std::string const& document, std::string const& page, SharedMemBuffer blob) override;
    /// Lets the file appear. Throws Base::Error, which says why and ends with the remedy, when something
    /// could not be written, and std::system_error as Base::PendingFile does.
    void finish(SharedMemBuffer metadata, std::string const& remedy);

private:
    void noteFailure();

    Base::PendingFile file_;
    PackWrapper container_;
    /// The system's number of what went wrong first.
    int failure_ = 0;
};

} // namespace Mailing

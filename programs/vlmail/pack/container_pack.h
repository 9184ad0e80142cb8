#pragma once
// A mailing file as a pack that can be sent.

#include "programs/mailing/pack_source.h"
#include "programs/vlmail/pack/container_file.h"

#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace VlMail {

/// All of it was found whole before.
class ContainerPack : public Mailing::PackSource {
public:
    /// Throws Error when there is no such file, any of it is damaged, or it has no pages.
    static std::unique_ptr<ContainerPack> open(std::string const& path, std::string const& cfgId);

    Mailing::PackInfo const& info() const override { return info_; }
    std::vector<PageName> const& pages() const override { return pages_; }
    SharedMemBuffer metadata() override { return file_->blob(metadataAt_).bytes; }

private:
    ContainerPack(std::unique_ptr<ContainerFile> file, std::string cfgId);

    SharedMemBuffer load(std::string const& document, std::string const& page) override;

    std::unique_ptr<ContainerFile> file_;
    Mailing::PackInfo info_;
    std::vector<PageName> pages_;
    /// Where in the file's index they stand.
    std::map<std::pair<std::string, std::string>, unsigned long long> entries_;
    unsigned long long metadataAt_ = 0;
};

} // namespace VlMail

#pragma once
// The folder that finished containers are handed on to.

#include "programs/base/marked_folder.h"

#include <filesystem>
#include <string>

namespace VlServiced {

class UploadFolder : public Base::MarkedFolder {
public:
    UploadFolder(std::filesystem::path const& folder, std::string const& identity)
        : MarkedFolder("upload folder", folder, identity) {}
};

} // namespace VlServiced

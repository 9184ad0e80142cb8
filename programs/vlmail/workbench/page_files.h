#pragma once
// The files of the page, as they stand in page/, and the styles that it shares with reports.

#include "programs/vlmail/workbench/answer.h"

#include <filesystem>
#include <span>
#include <string_view>

namespace VlMail::Workbench {

struct PageFile {
    std::string_view name;
    std::string_view content;
};

/// Those of page/, made a source when the program is built.
std::span<PageFile const> embeddedFiles();

/// Where the system has the editor for JSON.
constexpr char const* CODEMIRROR_FOLDER = "/usr/share/javascript/codemirror";

/// The file that a browser asks for by this target; 404 where there is none. Those of the editor are read
/// from `codemirror`, and of these only the ones that the page uses.
Answer pageFile(std::string_view target, std::filesystem::path const& codemirror = CODEMIRROR_FOLDER);

} // namespace VlMail::Workbench

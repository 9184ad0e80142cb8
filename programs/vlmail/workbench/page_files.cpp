#include "programs/vlmail/workbench/page_files.h"

#include "programs/base/error.h"
#include "programs/base/read_file.h"
#include "programs/vlmail/report/shapes.h"

#include <algorithm>
#include <array>
#include <string>
#include <utility>

namespace VlMail::Workbench {
namespace {

constexpr std::string_view EDITOR = "codemirror/";

struct Type {
    std::string_view ending;
    char const* name;
};

constexpr std::array TYPES{
    Type{".html", "text/html; charset=utf-8"},
    Type{".css", "text/css; charset=utf-8"},
    Type{".js", "text/javascript; charset=utf-8"},
    Type{".mjs", "text/javascript; charset=utf-8"},
    Type{".svg", "image/svg+xml"},
};

/// What the page may load of the editor, and where the package has it.
constexpr std::array<std::pair<std::string_view, char const*>, 20> EDITOR_FILES{{
    {"codemirror.js", "lib/codemirror.js"},
    {"codemirror.css", "lib/codemirror.css"},
    {"javascript.js", "mode/javascript/javascript.js"},
    {"lint.js", "addon/lint/lint.js"},
    {"lint.css", "addon/lint/lint.css"},
    {"show-hint.js", "addon/hint/show-hint.js"},
    {"show-hint.css", "addon/hint/show-hint.css"},
    {"foldcode.js", "addon/fold/foldcode.js"},
    {"foldgutter.js", "addon/fold/foldgutter.js"},
    {"foldgutter.css", "addon/fold/foldgutter.css"},
    {"brace-fold.js", "addon/fold/brace-fold.js"},
    {"matchbrackets.js", "addon/edit/matchbrackets.js"},
    {"closebrackets.js", "addon/edit/closebrackets.js"},
    {"search.js", "addon/search/search.js"},
    {"searchcursor.js", "addon/search/searchcursor.js"},
    {"jump-to-line.js", "addon/search/jump-to-line.js"},
    {"dialog.js", "addon/dialog/dialog.js"},
    {"dialog.css", "addon/dialog/dialog.css"},
    {"active-line.js", "addon/selection/active-line.js"},
    {"annotatescrollbar.js", "addon/scroll/annotatescrollbar.js"},
}};

std::string typeOf(std::string_view name) {
    auto const type =
        std::ranges::find_if(TYPES, [&](Type const& one) { return name.ends_with(one.ending); });
    return type == TYPES.end() ? "application/octet-stream" : type->name;
}

Answer noSuchFile() {
    return failureOf(404, Base::Code::FileUnreadable, "there is no such file of the workbench's page");
}

Answer editorFile(std::string_view name, std::filesystem::path const& folder) {
    auto const* const file =
        std::ranges::find(EDITOR_FILES, name, &std::pair<std::string_view, char const*>::first);
    if (file == EDITOR_FILES.end())
        return noSuchFile();
    try {
        return {200, typeOf(name), Base::readFile(folder / file->second)};
    } catch (Base::Error const&) {
        // The page does without.
        return noSuchFile();
    }
}

} // namespace

Answer pageFile(std::string_view target, std::filesystem::path const& codemirror) {
    std::string_view name = target.substr(0, target.find('?'));
    name.remove_prefix(name.starts_with('/') ? 1 : 0);
    if (name.starts_with(EDITOR))
        return editorFile(name.substr(EDITOR.size()), codemirror);
    if (name == "drawing.css")
        return {200, typeOf(name), Report::DRAWING_STYLE};
    auto const files = embeddedFiles();
    auto const file = std::ranges::find(files, name.empty() ? "index.html" : name, &PageFile::name);
    return file == files.end() ? noSuchFile() : Answer{200, typeOf(file->name), std::string(file->content)};
}

} // namespace VlMail::Workbench

#include "programs/vlmail/workbench/document_list.h"

#include "programs/base/error.h"
#include "programs/base/quoting.h"
#include "programs/base/utf8.h"
#include "programs/vlmail/golden/test_case.h"
#include "programs/vlmail/workbench/kept_documents.h"

#include <algorithm>
#include <set>
#include <string_view>
#include <system_error>

namespace VlMail::Workbench {
namespace {

namespace fs = std::filesystem;

void addProblem(DocumentList& list, fs::path const& where, std::string const& why) {
    list.problems.push_back("cannot look into " + Base::inQuotes(Base::validUtf8(where.string())) + ": " +
                            why);
}

/// Goes down without following links, so that no circle of them is walked.
class Walk {
public:
    explicit Walk(fs::path folder) : root_(std::move(folder)) {}

    DocumentList list() {
        folder(root_);
        for (ListedDocument& document : list_.documents)
            document.isGolden = files_.contains(expectationBeside(document.name).string());
        std::ranges::sort(list_.documents, {}, &ListedDocument::name);
        return std::move(list_);
    }

private:
    void folder(fs::path const& path) {
        std::error_code failure;
        fs::directory_iterator entries(path, failure);
        for (; !failure && entries != fs::directory_iterator(); entries.increment(failure))
            entry(*entries);
        if (failure)
            addProblem(list_, path, failure.message());
    }

    void entry(fs::directory_entry const& one) {
        std::error_code ignored;
        std::string const name = one.path().lexically_relative(root_).string();
        if (one.is_directory(ignored) && !one.is_symlink(ignored))
            return folder(one.path());
        if (!one.is_regular_file(ignored))
            return;
        if (!Base::isUtf8(name))
            return addProblem(list_, one.path(), "its name is no UTF-8; rename it");
        files_.insert(name);
        if (isTestDocument(one.path()))
            document(one.path(), name);
    }

    void document(fs::path const& file, std::string const& name) {
        try {
            FileMark const mark = markOf(file);
            list_.documents.push_back({name, mark.size, versionOf(mark)});
        } catch (Base::Error const&) {
            // It has gone while the others were looked at.
        }
    }

    fs::path root_;
    std::set<std::string> files_;
    DocumentList list_;
};

} // namespace

DocumentList documentsIn(fs::path const& folder) { return Walk(folder).list(); }

bool isNameInside(fs::path const& folder, std::string const& name) {
    fs::path const path = name;
    bool const isPlain = !name.empty() && name.find('\0') == std::string::npos && path.is_relative() &&
                         path.lexically_normal() == path && *path.begin() != ".." && isTestDocument(path);
    std::error_code failure;
    return isPlain && fs::is_regular_file(folder / path, failure);
}

} // namespace VlMail::Workbench

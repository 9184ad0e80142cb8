#include "programs/vlmail/letters/document_folder.h"

#include "programs/base/error.h"
#include "programs/base/plain_text.h"
#include "programs/base/quoting.h"
#include "programs/production/prepared_document.h"

#include <algorithm>
#include <system_error>
#include <utility>
#include <vector>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

bool isBeforeWithoutEnding(fs::path const& a, fs::path const& b) {
    bool const isPdf = a.extension() == ".pdf";
    return isPdf != (b.extension() == ".pdf") ? isPdf : a.filename() < b.filename();
}

std::vector<fs::path> filesIn(fs::path const& folder) {
    std::vector<fs::path> files;
    for (fs::directory_entry const& entry : fs::directory_iterator(folder))
        if (!entry.is_directory())
            files.push_back(entry.path());
    std::sort(files.begin(), files.end(), isBeforeWithoutEnding);
    return files;
}

} // namespace

DocumentFolder::DocumentFolder(fs::path folder) : folder_(std::move(folder)) {
    if (folder_.empty())
        return;
    try {
        folder_ = fs::canonical(folder_);
        for (fs::path const& file : filesIn(folder_))
            listed_.add(file);
    } catch (fs::filesystem_error const& failure) {
        throw Base::Error(Base::Code::FileUnreadable,
                          "cannot list the folder " + Base::inQuotes(folder_.string()) + ": " +
                              failure.code().message() + "; name another with --documents");
    }
}

void DocumentFolder::Names::add(fs::path const& file) {
    whole_.emplace(file.filename().string(), file);
    withoutEnding_.emplace(file.stem().string(), file);
}

fs::path const* DocumentFolder::Names::find(std::string const& id) const {
    for (auto const* const names : {&whole_, &withoutEnding_})
        if (auto const found = names->find(id); found != names->end())
            return &found->second;
    return nullptr;
}

FoundDocument DocumentFolder::find(std::string const& id) const {
    if (!Production::isDocumentId(id))
        throw Base::Error(Base::Code::DocumentUnknown,
                          std::string(Production::DOCUMENT_UNKNOWN) + Base::inQuotes(Base::plainText(id)) +
                              " cannot be the name of a document; correct the pack preset");
    if (auto const fixed = fixed_.find(id); fixed != fixed_.end())
        return fixed->second;
    if (fs::path const* const file = batch_.find(id))
        return {fs::absolute(*file)};
    if (fs::path const* const file = listed_.find(id)) {
        requireInside(id, *file);
        return {*file};
    }
    if (elsewhere_)
        if (std::optional<FoundDocument> found = elsewhere_->find(id))
            return std::move(*found);
    throw Base::Error(Base::Code::DocumentUnknown, std::string(Production::DOCUMENT_UNKNOWN) +
                                                       "there is no document " + Base::inQuotes(id) +
                                                       places());
}

/// A link may lead anywhere.
void DocumentFolder::requireInside(std::string const& id, fs::path const& file) const {
    std::error_code failure;
    if (fs::canonical(file, failure).parent_path() != folder_ || failure)
        throw Base::Error(Base::Code::DocumentUnknown,
                          std::string(Production::DOCUMENT_UNKNOWN) + Base::inQuotes(id) + " in " +
                              Base::inQuotes(folder_.string()) +
                              " is a link out of the folder; put the document there itself");
}

std::string DocumentFolder::places() const {
    std::string const inFolder = folder_.empty() ? "" : " in " + Base::inQuotes(folder_.string());
    if (elsewhere_)
        return inFolder + (folder_.empty() ? "" : " or") + elsewhere_->place;
    return folder_.empty() ? "; name the folder that it lies in with --documents, or correct the pack preset"
                           : inFolder + "; put it there, or correct the pack preset";
}

} // namespace VlMail

#pragma once
// What letters are made ready with, as long as the settings and the files that they name stay what they were.

#include "programs/vlmail/letters/making_ready.h"
#include "programs/vlmail/workbench/folders.h"
#include "programs/vlmail/workbench/kept_documents.h"
#include "programs/vlmail/workbench/settings_in_work.h"

#include <filesystem>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace VlMail::Workbench {

class KeptMaking {
public:
    explicit KeptMaking(Folders folders) : folders_(std::move(folders)) {}

    /// For that document; valid until the next call. Throws Base::Error when the folder cannot be listed.
    MakingReady& making(std::filesystem::path const& document, SettingsInWork& settings);
    /// The same text means other settings.
    void forget() { making_.reset(); }

private:
    using Marks = std::vector<std::pair<std::filesystem::path, FileMark>>;

    Marks marksNow() const;
    bool isCurrent() const;

    Folders folders_;
    std::filesystem::path document_;
    std::string settings_;
    /// Of the folder and the files that are used.
    Marks marks_;
    std::unique_ptr<MakingReady> making_;
};

} // namespace VlMail::Workbench

#include "programs/vlmail/workbench/kept_making.h"

#include "programs/base/error.h"

namespace VlMail::Workbench {

KeptMaking::Marks KeptMaking::marksNow() const {
    Marks marks;
    if (!folders_.letterheads.empty())
        marks.emplace_back(folders_.letterheads, markOfFolder(folders_.letterheads));
    for (UsedDocument const& used : making_->usedDocuments())
        if (!used.isOfService)
            marks.emplace_back(used.file, markOf(used.file));
    return marks;
}

bool KeptMaking::isCurrent() const {
    try {
        return making_ && making_->isWhole() && marksNow() == marks_;
    } catch (Base::Error const&) {
        // One of them has vanished.
        return false;
    }
}

MakingReady& KeptMaking::making(std::filesystem::path const& document, SettingsInWork& settings) {
    if (document == document_ && settings.text().text() == settings_ && isCurrent())
        return *making_;
    making_ = std::make_unique<MakingReady>(MakingReady::Colours::Ignored);
    making_->prepareFor({document.string()}, settings.presets().presets(), folders_.named(), {});
    document_ = document;
    settings_ = settings.text().text();
    marks_ = marksNow();
    return *making_;
}

} // namespace VlMail::Workbench

#include "programs/vlmail/workbench/printed_picture.h"

#include "programs/base/error.h"
#include "programs/reader/document.h"
#include "programs/vlmail/letters/reading.h"
#include "programs/vlmail/report/printed_pages.h"

#include <algorithm>
#include <array>
#include <string_view>
#include <utility>
#include <vector>

namespace VlMail::Workbench {
namespace {

using Report::Side;

/// In the order of Side::Kind.
constexpr std::array<std::string_view, 4> KINDS{"page", "blank", "attachment", "cover"};

bool isSame(Side const& one, Side const& other) {
    return one.kind == other.kind && one.page == other.page && one.attachment == other.attachment;
}

[[noreturn]] void refuse(Side const& side) {
    throw Base::Error(Base::Code::RequestInvalid,
                      "nothing like " + inWords(side) + " goes out with the letter");
}

std::string pictureIn(std::vector<LetterReading> const& letters, Report::PrintedPages& pages,
                      WantedPicture const& wanted) {
    auto const letter = std::ranges::find_if(letters, [&](LetterReading const& one) {
        return std::ranges::find(one.pages, wanted.page) != one.pages.end();
    });
    if (!wanted.side)
        return letter == letters.end() ? Report::pictureOf(pages.document(), wanted.page, wanted.dotsPerInch)
                                       : pages.picture(*letter, wanted.page, wanted.dotsPerInch);
    if (letter == letters.end())
        refuse(*wanted.side);
    for (Side const& side : pages.sides(*letter))
        if (isSame(side, *wanted.side))
            return pages.picture(*letter, side, wanted.dotsPerInch);
    refuse(*wanted.side);
}

} // namespace

std::string printedPicture(Reader::Document& document, SettingsInWork& settings, MakingReady& making,
                           WantedPicture const& wanted) {
    std::optional<std::string> png;
    bool hasLetters = false;
    Along along;
    // Only a look at the paper tells which letter gets a cover page.
    along.checks =
        wanted.side && wanted.side->kind == Side::Kind::Cover ? Along::Checks::Yes : Along::Checks::No;
    along.afterReading = [&](ReadResult& result, OpenDocument const& read) {
        hasLetters = true;
        Report::PrintedPages pages(read.document, read.packPreset, making);
        png = pictureIn(*result.reading.letters, pages, wanted);
    };
    DocumentReading const reading =
        readDocument(document, settings.presets(), settings.node(), along).reading;
    if (hasLetters && reading.failed())
        throw Base::Error(reading.code, reading.error);
    if (!png && wanted.side)
        refuse(*wanted.side);
    return png ? *std::move(png) : Report::pictureOf(document, wanted.page, wanted.dotsPerInch);
}

json::Object toJson(Side const& side) {
    return {{"kind", std::string(KINDS.at(static_cast<std::size_t>(side.kind)))},
            {"width", side.width},
            {"height", side.height},
            {"page", side.page},
            {"attachment", static_cast<long long>(side.attachment)},
            {"id", side.id}};
}

std::optional<Side> sideIn(json::Value const& value) {
    if (!value || !value.isObject())
        return std::nullopt;
    json::Object const object = value.toObject();
    auto const* const kind = std::ranges::find(KINDS, object.get("kind").toString());
    long long const page = object.get("page").toInt();
    long long const attachment = object.get("attachment").toInt();
    constexpr long long MOST = 1'000'000;
    if (kind == KINDS.end() || page < 0 || page > MOST || attachment < 0 || attachment > MOST)
        throw Base::Error(Base::Code::RequestInvalid, "\"side\" is one of those of the letter");
    return Side{.kind = static_cast<Side::Kind>(kind - KINDS.begin()),
                .page = static_cast<int>(page),
                .attachment = static_cast<std::size_t>(attachment)};
}

} // namespace VlMail::Workbench

#include "programs/vlmail/workbench/printed_picture.h"

#include "programs/base/error.h"
#include "programs/reader/document.h"
#include "programs/vlmail/report/printed_pages.h"

#include <algorithm>
#include <array>
#include <string_view>
#include <utility>

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

std::string pictureOf(Side const& wanted, LetterReading const& letter, Report::PrintedPages& pages,
                      double dotsPerInch) {
    for (Side const& side : pages.sides(letter))
        if (isSame(side, wanted))
            return pages.picture(letter, side, dotsPerInch);
    refuse(wanted);
}

} // namespace

PrintedLetters lettersIn(Reader::Document& document, SettingsInWork& settings, Along::Checks checks) {
    PrintedLetters printed;
    printed.areChecked = checks == Along::Checks::Yes;
    Along along;
    along.checks = checks;
    along.afterReading = [&](ReadResult const&, OpenDocument const& read) {
        printed.packPreset = read.packPreset;
    };
    DocumentReading reading = readDocument(document, settings.presets(), settings.node(), along).reading;
    if (reading.letters)
        printed.letters = *std::move(reading.letters);
    return printed;
}

std::string printedPicture(Reader::Document& document, PrintedLetters const& printed, MakingReady& making,
                           WantedPicture const& wanted) {
    auto const letter = std::ranges::find_if(printed.letters, [&](LetterReading const& one) {
        return std::ranges::find(one.pages, wanted.page) != one.pages.end();
    });
    Report::PrintedPages pages(document, printed.packPreset, making);
    if (letter != printed.letters.end())
        return wanted.side ? pictureOf(*wanted.side, *letter, pages, wanted.dotsPerInch)
                           : pages.picture(*letter, wanted.page, wanted.dotsPerInch);
    if (wanted.side)
        refuse(*wanted.side);
    return Report::pictureOf(document, wanted.page, wanted.dotsPerInch);
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

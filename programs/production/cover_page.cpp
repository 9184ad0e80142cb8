#include "programs/production/cover_page.h"

#include "programs/base/error.h"
#include "programs/base/utf8.h"
#include "programs/reader/text_pdf.h"
#include "programs/reader/typed_page.h"

#include <algorithm>
#include <sstream>

namespace Production {
namespace {

namespace TypedPage = Reader::TypedPage;

/// From the left edge of a window to the address, where there is room.
constexpr int INDENT = 500;

std::vector<std::string> linesOf(std::string const& address) {
    std::istringstream in(address);
    std::vector<std::string> lines;
    for (std::string line; std::getline(in, line);)
        if (line.find_first_not_of(" \t\r") != line.npos)
            lines.push_back(line);
    return lines;
}

int lengthOf(int count, double step) { return static_cast<int>(std::ceil(count * step)); }

int columnsOf(std::vector<std::string> const& lines) {
    std::size_t most = 0;
    for (std::string const& line : lines)
        most = std::max(most, Base::characterCount(line));
    return static_cast<int>(most);
}

/// Where the first letter of the first line stands.
Reader::Point placeFor(std::vector<std::string> const& lines, Box const& window) {
    int const width = lengthOf(columnsOf(lines), TypedPage::COLUMN);
    int const height = lengthOf(static_cast<int>(lines.size()), TypedPage::ROW);
    if (lines.empty() || width > window.width() || height > window.height())
        throw Base::Error(Base::Code::LetterUnsuitable,
                          "the address does not fit into the window; shorten its lines");
    return {window.left + std::min(INDENT, (window.width() - width) / 2),
            window.top + (window.height() - height) / 2};
}

void type(Reader::Page& page, std::string const& line, Reader::Point at) {
    std::istringstream in(line);
    std::size_t searched = 0;
    for (std::string word; in >> word;) {
        std::size_t const begin = line.find(word, searched);
        searched = begin + word.size();
        auto const columns = static_cast<int>(Base::characterCount(std::string_view(line).substr(0, begin)));
        int const left = at.x + lengthOf(columns, TypedPage::COLUMN);
        int const right = left + lengthOf(static_cast<int>(Base::characterCount(word)), TypedPage::COLUMN);
        page.words.push_back({word, {left, at.y, right, at.y + TypedPage::SIZE}, TypedPage::SIZE});
    }
}

bool isOfWindow(Finding const& finding) {
    return finding.code == Code::AddressOutsideWindow || finding.code == Code::TextInWindow;
}

} // namespace

std::string coverPage(std::string const& address, ProductionRules const& rules) {
    if (!rules.window)
        throw Base::Error(Base::Code::SettingMissing,
                          "the pack preset has no window; add \"window\" to its \"production\"");
    std::vector<std::string> const lines = linesOf(address);
    Reader::Point const first = placeFor(lines, *rules.window);
    Reader::Page page{1, rules.sheet.width, rules.sheet.height, {}, {{TypedPage::FONT}}, true};
    for (std::size_t i = 0; i < lines.size(); ++i)
        type(page, lines[i], {first.x, first.y + lengthOf(static_cast<int>(i), TypedPage::ROW)});
    return Reader::pdfOfTypedPage(page, "the cover page");
}

bool repairByCoverPage(std::vector<Finding>& findings, std::string const& address,
                       ProductionRules const& rules) {
    if (!rules.makesCoverPage || std::ranges::none_of(findings, isOfWindow))
        return false;
    try {
        coverPage(address, rules);
        std::erase_if(findings, isOfWindow);
        return true;
    } catch (Base::Error const&) {
        // What is wrong with the letter's own page is still told.
        return false;
    }
}

} // namespace Production

#include "programs/vlmail/terminal/text_table.h"

#include "programs/base/plain_text.h"

#include <unicode/uchar.h>
#include <unicode/utf8.h>

#include <algorithm>
#include <ostream>
#include <utility>

namespace VlMail {
namespace {

constexpr std::size_t GAP = 2;

std::size_t characterWidth(UChar32 c) {
    int const category = u_charType(c);
    if (category == U_NON_SPACING_MARK || category == U_ENCLOSING_MARK || category == U_FORMAT_CHAR)
        return 0;
    int const width = u_getIntPropertyValue(c, UCHAR_EAST_ASIAN_WIDTH);
    return width == U_EA_WIDE || width == U_EA_FULLWIDTH ? 2 : 1;
}

} // namespace

std::size_t displayWidth(std::string const& text) {
    std::size_t width = 0;
    auto const length = static_cast<int32_t>(text.size());
    for (int32_t at = 0; at < length;) {
        UChar32 c;
        U8_NEXT(text.data(), at, length, c);
        width += c < 0 ? 1 : characterWidth(c);
    }
    return width;
}

TextTable::TextTable(std::vector<Column> columns) : columns_(std::move(columns)) {}

void TextTable::addRow(std::vector<std::string> cells) {
    cells.resize(columns_.size());
    std::transform(cells.begin(), cells.end(), cells.begin(), Base::plainLine);
    rows_.push_back(std::move(cells));
}

void TextTable::print(std::ostream& out, std::size_t indent) const {
    std::vector<std::string> titles;
    std::vector<std::size_t> widths;
    for (std::size_t i = 0; i < columns_.size(); ++i) {
        titles.push_back(columns_[i].title);
        widths.push_back(displayWidth(columns_[i].title));
        for (auto const& row : rows_)
            widths[i] = std::max(widths[i], displayWidth(row[i]));
    }
    auto const printRow = [&](std::vector<std::string> const& cells) {
        std::string line(indent, ' ');
        for (std::size_t i = 0; i < cells.size(); ++i) {
            std::string const padding(widths[i] - displayWidth(cells[i]), ' ');
            line += columns_[i].align == Align::Right ? padding + cells[i] : cells[i] + padding;
            line.append(GAP, ' ');
        }
        line.erase(line.find_last_not_of(' ') + 1);
        out << line << '\n';
    };
    printRow(titles);
    std::for_each(rows_.begin(), rows_.end(), printRow);
}

} // namespace VlMail

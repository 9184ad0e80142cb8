#include "programs/manual/markdown.h"

#include <algorithm>
#include <sstream>
#include <string_view>
#include <utility>

namespace Manual {
namespace {

using Kind = Block::Kind;

constexpr std::string_view FENCE = "```";

/// "[text](address)" as "text".
std::string withoutAddresses(std::string const& line) {
    std::string text;
    std::size_t at = 0;
    while (at < line.size()) {
        auto const middle = line.find("](", at);
        auto const begin = middle == std::string::npos ? middle : line.rfind('[', middle);
        auto const end = middle == std::string::npos ? middle : line.find(')', middle);
        if (begin == std::string::npos || begin < at || end == std::string::npos)
            break;
        text += line.substr(at, begin - at) + line.substr(begin + 1, middle - begin - 1);
        at = end + 1;
    }
    return text + line.substr(at);
}

std::string trimmed(std::string_view text) {
    auto const begin = text.find_first_not_of(' ');
    return begin == std::string_view::npos
               ? std::string()
               : std::string(text.substr(begin, text.find_last_not_of(' ') + 1 - begin));
}

/// "| a | b \| c |" as "a" and "b | c".
std::vector<std::string> cellsOf(std::string const& line) {
    std::vector<std::string> cells;
    std::string cell;
    for (std::size_t i = 1; i < line.size(); ++i) {
        if (line[i] == '\\' && i + 1 < line.size() && line[i + 1] == '|') {
            cell += line[++i];
        } else if (line[i] == '|') {
            cells.push_back(trimmed(cell));
            cell.clear();
        } else {
            cell += line[i];
        }
    }
    return cells;
}

bool isItem(std::string const& line) {
    auto const digits = line.find_first_not_of("0123456789");
    return line.starts_with("- ") ||
           (digits != 0 && digits != std::string::npos && line.substr(digits, 2) == ". ");
}

/// A line that is for those who keep the page.
bool isRemark(std::string const& line) {
    std::string const text = trimmed(line);
    return text.starts_with("<!--") && text.ends_with("-->");
}

bool isRule(std::string const& line) { return line.find_first_not_of("|-: ") == std::string::npos; }

void addRow(Table& table, std::vector<std::string> cells) {
    cells.resize(table.head.size());
    table.rows.push_back(std::move(cells));
}

class Blocks {
public:
    std::vector<Block> take(std::string const& markdown) {
        std::istringstream in(markdown);
        for (std::string line; std::getline(in, line);)
            takeLine(line);
        return std::move(blocks_);
    }

private:
    void takeLine(std::string const& line) {
        if (trimmed(line).starts_with(FENCE))
            takeFence(line.find(FENCE));
        else if (isCode_)
            blocks_.back().text +=
                line.substr(std::min({codeIndent_, line.find_first_not_of(' '), line.size()})) + '\n';
        else if (!isRemark(line))
            takeText(withoutAddresses(line));
    }

    /// A fence of an item stands as far in as the item's text, and so do the lines in it.
    void takeFence(std::size_t indent) {
        isCode_ = !isCode_;
        codeIndent_ = indent;
        if (isCode_)
            blocks_.push_back({Kind::Code});
        goesOn_ = false;
    }

    void takeText(std::string const& line) {
        bool const isRow = line.starts_with('|');
        if (isRow)
            takeRow(line);
        else if (line.starts_with('#'))
            blocks_.push_back({Kind::Heading, trimmed(line.substr(line.find_first_not_of('#')))});
        else if (isItem(line))
            begin(Kind::Item, line.substr(line.find(' ') + 1));
        else if (goesOn_ && !trimmed(line).empty())
            blocks_.back().text += ' ' + trimmed(line);
        else if (!trimmed(line).empty())
            begin(Kind::Paragraph, trimmed(line));
        goesOn_ = !isRow && !line.starts_with('#') && !trimmed(line).empty();
        inTable_ = isRow;
    }

    void begin(Kind kind, std::string text) { blocks_.push_back({kind, std::move(text)}); }

    void takeRow(std::string const& line) {
        if (isRule(line))
            return;
        std::vector<std::string> cells = cellsOf(line);
        if (cells.empty())
            return;
        if (!inTable_) {
            if (cells.front().find(' ') != std::string::npos)
                begin(Kind::Paragraph, cells.front() + ':');
            return;
        }
        Block row{Kind::Row, cells.front()};
        for (std::size_t i = 1; i < cells.size(); ++i)
            if (!cells[i].empty())
                row.cells.push_back(std::move(cells[i]));
        blocks_.push_back(std::move(row));
    }

    std::vector<Block> blocks_;
    bool isCode_ = false;
    std::size_t codeIndent_ = 0;
    bool inTable_ = false;
    /// Whether the next line belongs to the last block.
    bool goesOn_ = false;
};

} // namespace

std::vector<Block> blocksOf(std::string const& markdown) { return Blocks().take(markdown); }

std::vector<Table> tablesOf(std::string const& markdown) {
    std::vector<Table> tables;
    std::istringstream in(markdown);
    std::string heading;
    bool inTable = false;
    for (std::string line; std::getline(in, line);) {
        if (line.starts_with('#'))
            heading = trimmed(line.substr(line.find_first_not_of('#')));
        bool const isRow = line.starts_with('|');
        if (isRow && !inTable)
            tables.push_back({heading, cellsOf(line)});
        else if (isRow && !isRule(line))
            addRow(tables.back(), cellsOf(withoutAddresses(line)));
        inTable = isRow;
    }
    return tables;
}

std::vector<Span> spansOf(std::string const& text) {
    std::vector<Span> spans{{}};
    for (std::size_t i = 0; i < text.size(); ++i) {
        bool const isStrong = text.compare(i, 2, "**") == 0;
        if (!isStrong && text[i] != '`') {
            spans.back().text += text[i];
            continue;
        }
        i += isStrong ? 1 : 0;
        spans.push_back({{}, !spans.back().isMarked});
    }
    std::erase_if(spans, [](Span const& span) { return span.text.empty(); });
    return spans;
}

} // namespace Manual

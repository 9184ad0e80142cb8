#pragma once
// Tables for people: columns as wide as their widest cell, in characters as a terminal shows them.

#include <iosfwd>
#include <string>
#include <vector>

namespace VlMail {

class TextTable {
public:
    enum class Align { Left, Right };

    struct Column {
        std::string title;
        Align align = Align::Left;
    };

    explicit TextTable(std::vector<Column> columns);

    /// As many cells as there are columns. Line breaks and other control characters in a cell are shown as
    /// blanks.
    void addRow(std::vector<std::string> cells);
    bool empty() const { return rows_.empty(); }

    /// Titles, then the rows, each line indented by `indent` blanks and without blanks at its end.
    void print(std::ostream& out, std::size_t indent = 0) const;

private:
    std::vector<Column> columns_;
    std::vector<std::vector<std::string>> rows_;
};

/// Columns that a terminal needs for UTF-8 text: wide characters take two, combining marks none.
std::size_t displayWidth(std::string const& text);

} // namespace VlMail

#pragma once
// The sheet on which the characters of a text file stand: 12 columns an inch, 6 rows an inch, on A4.

#include "programs/reader/geometry.h"

namespace Reader::TypedPage {

// In 1/100 mm; a page with more rows or columns than fit has a larger sheet.
constexpr int WIDTH = 21000;
constexpr int HEIGHT = 29700;
constexpr int LEFT = 2500;
constexpr int TOP = 1000;

constexpr double COLUMN = INCH / 12;
constexpr double ROW = INCH / 6;
/// 10 points, of which a letter takes 6 in width, a column.
constexpr double POINTS = 10;
/// Width of a letter in thousandths of the font size.
constexpr int LETTER = 600;
constexpr int SIZE = 353;
/// From the top of a row's letters to the line they stand on.
constexpr int ASCENT = 280;
constexpr char const* FONT = "Courier";

/// Columns from one stop of the tabulator to the next.
constexpr int TAB = 8;

/// Rows and columns count from 0; `end` is the column behind the last.
inline Box boxOf(int row, int column, int end) {
    int const top = TOP + static_cast<int>(std::lround(row * ROW));
    return {LEFT + static_cast<int>(std::lround(column * COLUMN)), top,
            LEFT + static_cast<int>(std::lround(end * COLUMN)), top + SIZE};
}

} // namespace Reader::TypedPage

#pragma once
// Whether two pages show the same.

#include "programs/reader/page.h"

#include <string>

namespace Reader {

/// Of a drawn page: three bytes a point, red, green and blue, row by row.
struct Picture {
    int width = 0;
    int height = 0;
    std::string points;
};

/// How a part of a page is drawn: the part in points of the whole picture.
struct Raster {
    double acrossDotsPerInch = 0;
    double downDotsPerInch = 0;
    int left = 0;
    int top = 0;
    int width = 0;
    int height = 0;
};

/// The same texts at the same places, in whatever order.
bool haveSameWords(Page const& one, Page const& other);

/// Within what the smoothing of edges changes.
bool lookTheSame(Picture const& one, Picture const& other);

} // namespace Reader

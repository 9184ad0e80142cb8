#include "programs/production/colour.h"

#include "programs/production/said_colours.h"

#include <algorithm>
#include <cstddef>
#include <optional>
#include <string>

namespace Production {
namespace {

/// Of 255: by how much the parts of a grey may differ.
constexpr int GREY = 24;
/// So many points may be stray ones.
constexpr std::size_t STRAY_POINTS = 3;

bool isColoured(unsigned char red, unsigned char green, unsigned char blue) {
    auto const [least, most] = std::minmax({red, green, blue});
    return most - least > GREY;
}

} // namespace

bool isColoured(Reader::Picture const& picture) {
    std::string const& points = picture.points;
    std::size_t coloured = 0;
    for (std::size_t i = 0; i + 2 < points.size() && coloured <= STRAY_POINTS; i += 3)
        coloured +=
            isColoured(static_cast<unsigned char>(points[i]), static_cast<unsigned char>(points[i + 1]),
                       static_cast<unsigned char>(points[i + 2]));
    return coloured > STRAY_POINTS;
}

bool hasColour(Reader::Document& document, int number, std::string const& pdf) {
    if (!maySayColour(pdf))
        return false;
    std::optional<Reader::Document> printed = document.printed(number);
    std::optional<Reader::Picture> const picture = printed
                                                       ? printed->drawPage(1, LOOKED_AT_DOTS_PER_INCH)
                                                       : document.drawPage(number, LOOKED_AT_DOTS_PER_INCH);
    return picture && isColoured(*picture);
}

} // namespace Production

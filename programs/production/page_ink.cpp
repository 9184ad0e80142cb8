#include "programs/production/page_ink.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <numeric>
#include <string>

namespace Production {
namespace {

/// Of 255: what is lighter is a tint that scanners and backgrounds have everywhere.
constexpr unsigned char LIGHTEST_INK = 240;
/// The side of a point of the coarse picture, in 1/100 mm.
constexpr double POINT = Reader::INCH / Reader::OVERVIEW_DOTS_PER_INCH;
/// By so many points edges are moved and softened when a picture is drawn.
constexpr int BLUR = 1;
/// A point of a fine strip is 0.01 mm wide.
constexpr double FINE = Reader::INCH;
/// Along the strip a picture as coarse as the first would do; this one tells lines apart.
constexpr double ALONG = 72;

bool isDarkAt(std::string const& points, std::size_t at) {
    auto const shade = [&](std::size_t i) { return static_cast<unsigned char>(points[i]); };
    return std::min({shade(at), shade(at + 1), shade(at + 2)}) < LIGHTEST_INK;
}

/// A point from `point` on before which there is none but white ones. Most of a page is paper, passed over
/// eight bytes at a time.
std::size_t skipPaper(std::string const& points, std::size_t point, std::size_t end) {
    constexpr std::uint64_t PAPER = ~std::uint64_t{0};
    std::size_t at = 3 * point;
    for (std::uint64_t some = PAPER; at + sizeof some <= 3 * end; at += sizeof some) {
        std::memcpy(&some, points.data() + at, sizeof some);
        if (some != PAPER)
            break;
    }
    return at / 3;
}

void unite(std::optional<Box>& all, Box const& more) { all = all ? all->united(more) : more; }

bool isIn(std::span<Box const> boxes, Reader::Point point) {
    return std::ranges::any_of(boxes, [&](Box const& box) { return box.contains(point); });
}

/// The edges of points `from` to `to` of a row or column of a picture.
int edge(double point, double side) { return static_cast<int>(std::lround(point * side)); }

Box pointAt(int column, int row) {
    return {edge(column, POINT), edge(row, POINT), edge(column + 1, POINT), edge(row + 1, POINT)};
}

/// Points of one direction that may have a part in a stretch, and those that have surely all of theirs there.
struct Stretch {
    int begin = 0;
    int end = 0;
    int sureBegin = 0;
    int sureEnd = 0;

    Stretch(int from, int to, int count)
        : begin(clamped(std::floor(from / POINT) - BLUR, count)),
          end(clamped(std::ceil(to / POINT) + BLUR, count)),
          sureBegin(from <= 0 ? 0 : clamped(std::ceil(from / POINT) + BLUR, count)),
          sureEnd(to >= edge(count, POINT) ? count : clamped(std::floor(to / POINT) - BLUR, count)) {}

    bool isNearBegin(int point) const { return point < sureBegin; }
    bool isNearEnd(int point) const { return point >= sureEnd; }
    bool isSure(int point) const { return !isNearBegin(point) && !isNearEnd(point); }

private:
    static int clamped(double point, int count) {
        return static_cast<int>(std::clamp(point, 0.0, 1.0 * count));
    }
};

/// Whether a point of 0.01 mm, or the middle of a longer one, lies in a stretch.
bool liesIn(int from, int to, int pointFrom, int pointTo) {
    double const middle = std::midpoint(1.0 * pointFrom, 1.0 * pointTo);
    return middle > from && middle < to;
}

/// Around the dark points of a part of a page that lie in the zone.
std::optional<Box> darkPart(Reader::Picture const& picture, Reader::Raster const& raster, Box const& zone,
                            std::span<Box const> except) {
    double const across = Reader::INCH / raster.acrossDotsPerInch;
    double const down = Reader::INCH / raster.downDotsPerInch;
    std::optional<Box> found;
    for (int row = 0; row < picture.height; ++row)
        for (int column = 0; column < picture.width; ++column) {
            auto const at = static_cast<std::size_t>(row) * static_cast<std::size_t>(picture.width) +
                            static_cast<std::size_t>(column);
            if (!isDarkAt(picture.points, 3 * at))
                continue;
            Box const point{edge(raster.left + column, across), edge(raster.top + row, down),
                            edge(raster.left + column + 1, across), edge(raster.top + row + 1, down)};
            if (liesIn(zone.left, zone.right, point.left, point.right) &&
                liesIn(zone.top, zone.bottom, point.top, point.bottom) && !isIn(except, point.centre()))
                unite(found, point);
        }
    return found;
}

} // namespace

PageInk::PageInk(Reader::Document& document, int page) : document_(document), page_(page) {
    std::optional<Reader::Picture> const& picture = document.overview(page);
    isTyped_ = !picture;
    if (picture)
        addPicture(*picture);
    else
        addWords();
}

void PageInk::addWords() {
    for (Reader::Word const& word : document_.page(page_).words)
        unite(bounds_, word.box);
}

void PageInk::addPicture(Reader::Picture const& picture) {
    columns_ = picture.width;
    rows_ = picture.height;
    dark_.resize(picture.points.size() / 3);
    std::optional<Box> points;
    auto const width = static_cast<std::size_t>(columns_);
    for (std::size_t at = 0; at < dark_.size(); ++at) {
        at = skipPaper(picture.points, at, dark_.size());
        if (at == dark_.size() || !isDarkAt(picture.points, 3 * at))
            continue;
        dark_[at] = 1;
        auto const column = static_cast<int>(at % width);
        auto const row = static_cast<int>(at / width);
        unite(points, {column, row, column, row});
    }
    if (points)
        bounds_ = pointAt(points->left, points->top).united(pointAt(points->right, points->bottom));
}

std::optional<Box> PageInk::inside(Box const& zone, std::span<Box const> except) {
    if (isTyped_)
        return wordsInside(zone, except);
    Stretch const across(zone.left, zone.right, columns_);
    Stretch const down(zone.top, zone.bottom, rows_);
    std::optional<Box> found;
    OpenEdges open;
    for (int row = down.begin; row < down.end; ++row)
        for (int column = across.begin; column < across.end; ++column) {
            if (!isDark(column, row))
                continue;
            Box const point = pointAt(column, row);
            if (isIn(except, point.centre()))
                continue;
            if (across.isSure(column) && down.isSure(row))
                unite(found, point);
            open.left |= across.isNearBegin(column);
            open.right |= across.isNearEnd(column);
            open.top |= down.isNearBegin(row);
            open.bottom |= down.isNearEnd(row);
        }
    return found ? found : alongEdges(zone, except, open);
}

std::optional<Box> PageInk::wordsInside(Box const& zone, std::span<Box const> except) const {
    std::optional<Box> found;
    for (Reader::Word const& word : document_.page(page_).words)
        if (word.box.left < zone.right && zone.left < word.box.right && word.box.top < zone.bottom &&
            zone.top < word.box.bottom && !isIn(except, word.box.centre()))
            unite(found, word.box);
    return found;
}

/// The strips hold all points that may or may not lie in the zone.
std::optional<Box> PageInk::alongEdges(Box const& zone, std::span<Box const> except, OpenEdges const& open) {
    constexpr int HALF = static_cast<int>((BLUR + 2) * POINT);
    std::optional<Box> found;
    auto const look = [&](bool isOpen, bool isUpright, int at) {
        if (!isOpen)
            return;
        if (std::optional<Box> const more = drawnInside({isUpright, at - HALF, at + HALF}, zone, except))
            unite(found, *more);
    };
    look(open.left, true, zone.left);
    look(open.right, true, zone.right);
    look(open.top, false, zone.top);
    look(open.bottom, false, zone.bottom);
    return found;
}

std::optional<Box> PageInk::drawnInside(Strip strip, Box const& zone, std::span<Box const> except) {
    int const pageEnd = edge(strip.isUpright ? columns_ : rows_, POINT);
    strip.from = std::clamp(strip.from, 0, pageEnd);
    strip.to = std::clamp(strip.to, 0, pageEnd);
    int const length = static_cast<int>(
        std::ceil((strip.isUpright ? rows_ : columns_) * ALONG / Reader::OVERVIEW_DOTS_PER_INCH));
    if (strip.from == strip.to)
        return std::nullopt;
    Reader::Raster const raster =
        strip.isUpright ? Reader::Raster{FINE, ALONG, strip.from, 0, strip.to - strip.from, length}
                        : Reader::Raster{ALONG, FINE, 0, strip.from, length, strip.to - strip.from};
    std::optional<Reader::Picture> const picture = document_.drawPart(page_, raster);
    return picture ? darkPart(*picture, raster, zone, except) : std::nullopt;
}

} // namespace Production

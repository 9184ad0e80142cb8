#pragma once
// Where something is printed on a page.

#include "programs/reader/document.h"

#include <cstdint>
#include <optional>
#include <span>
#include <vector>

namespace Production {

using Reader::Box;

/// What is darker than a light tint. The page is drawn once, coarsely; only where something is printed close
/// to the edge of a zone that is asked for, a strip along that edge is drawn so finely that 0.01 mm count.
/// A typed page, which nothing else is on, has its words for ink.
class PageInk {
public:
    /// Throws Base::Error when the page cannot be read or drawn. The document must live longer.
    PageInk(Reader::Document& document, int page);

    bool isEmpty() const { return !bounds_; }
    /// Around everything, within a point of the coarse picture; nothing on an empty page.
    std::optional<Box> const& bounds() const { return bounds_; }

    /// Around what is printed inside the zone and has its middle in none of `except`. The zone may reach
    /// beyond the page.
    std::optional<Box> inside(Box const& zone, std::span<Box const> except = {});

private:
    void addWords();
    void addPicture(Reader::Picture const& picture);
    std::optional<Box> wordsInside(Box const& zone, std::span<Box const> except) const;
    /// Edges of a zone with something close to them that may lie inside or outside.
    struct OpenEdges {
        bool left = false;
        bool top = false;
        bool right = false;
        bool bottom = false;
    };
    std::optional<Box> alongEdges(Box const& zone, std::span<Box const> except, OpenEdges const& open);
    /// Upright or across the page.
    struct Strip {
        bool isUpright = true;
        int from = 0;
        int to = 0;
    };
    std::optional<Box> drawnInside(Strip strip, Box const& zone, std::span<Box const> except);
    bool isDark(int column, int row) const {
        return dark_[static_cast<std::size_t>(row) * static_cast<std::size_t>(columns_) +
                     static_cast<std::size_t>(column)] != 0;
    }

    Reader::Document& document_;
    int page_;
    bool isTyped_ = false;
    int columns_ = 0;
    int rows_ = 0;
    std::vector<std::uint8_t> dark_;
    std::optional<Box> bounds_;
};

} // namespace Production

#include "programs/production/words.h"

#include "programs/base/millimetres.h"
#include "programs/base/quoting.h"
#include "programs/base/utf8.h"
#include "programs/reader/layout.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <iterator>
#include <utility>

namespace Production {
namespace {

int intoRoom(int from, int to, int roomFrom, int roomTo) {
    if (to - from > roomTo - roomFrom || (from >= roomFrom && to <= roomTo))
        return 0;
    return from < roomFrom ? roomFrom - from : roomTo - to;
}

/// Nobody moves anything by less.
std::string inTenths(int hundredths) { return Base::withMillimetres((std::abs(hundredths) + 9) / 10 * 10); }

std::string oneWay(int length, char const* forwards, char const* backwards) {
    return inTenths(length) + ' ' + (length > 0 ? forwards : backwards);
}

std::string joined(std::string const& one, std::string const& other) {
    return one.empty() || other.empty() ? one + other : one + " and " + other;
}

std::string smaller(int size, int room, char const* word) {
    return size > room ? inTenths(size - room) + ' ' + word : std::string();
}

bool haveCommonPart(Box const& one, Box const& other) {
    return one.left < other.right && other.left < one.right && one.top < other.bottom &&
           other.top < one.bottom;
}

std::string inShortQuotes(std::string const& text) {
    constexpr std::size_t SHOWN = 40;
    std::string const start(Base::firstCharacters(text, SHOWN));
    return Base::inQuotes(start + (start.size() < text.size() ? "..." : ""));
}

} // namespace

bool isInside(Box const& box, Box const& room) {
    return box.left >= room.left && box.top >= room.top && box.right <= room.right &&
           box.bottom <= room.bottom;
}

Way wayInto(Box const& box, Box const& room) {
    return {intoRoom(box.left, box.right, room.left, room.right),
            intoRoom(box.top, box.bottom, room.top, room.bottom)};
}

Way wayOutOf(Box const& box, Box const& zone, Box const& room) {
    std::array const ways{Way{0, zone.top - box.bottom}, Way{0, zone.bottom - box.top},
                          Way{zone.left - box.right, 0}, Way{zone.right - box.left, 0}};
    auto const cost = [&](Way const& way) {
        bool const stays = isInside(box.movedBy({way.right, way.down}), room);
        return std::pair(!stays, std::abs(way.right) + std::abs(way.down));
    };
    return *std::ranges::min_element(ways, {}, cost);
}

std::string inWords(Way const& way) {
    return joined(way.right == 0 ? "" : oneWay(way.right, "right", "left"),
                  way.down == 0 ? "" : oneWay(way.down, "down", "up"));
}

std::string fixFor(Box const& box, Box const& room) {
    std::string const way = inWords(wayInto(box, room));
    std::string const size =
        joined(smaller(box.width(), room.width(), "narrower"), smaller(box.height(), room.height(), "lower"));
    return joined(way.empty() ? "" : "move it " + way, size.empty() ? "" : "make it " + size);
}

std::string placeInWords(Box const& box) {
    return Base::inMillimetres(box.left) + " to " + Base::withMillimetres(box.right) + " across and " +
           Base::inMillimetres(box.top) + " to " + Base::withMillimetres(box.bottom) + " down";
}

Reader::Page wordsOf(Reader::Page const& page, Box const& box) {
    Reader::Page part{page.number, page.width, page.height, {}, page.fonts};
    std::ranges::copy_if(page.words, std::back_inserter(part.words),
                         [&](Reader::Word const& word) { return haveCommonPart(word.box, box); });
    return part;
}

std::vector<TextBlock> blocksIn(Reader::Page const& page) {
    Reader::Layout const layout = Reader::layOut(page);
    std::vector<TextBlock> blocks;
    for (Reader::Block const& block : layout.blocks) {
        std::string text;
        int size = 0;
        for (std::size_t line = block.firstLine; line < block.endLine; ++line) {
            text += (text.empty() ? "" : " ") + Reader::textOf(page, layout.lines[line]);
            size = std::max(size, layout.lines[line].size);
        }
        blocks.push_back({block.box, size, inShortQuotes(text)});
    }
    return blocks;
}

std::string textInWords(Reader::Page const& page, Box const& box) {
    Reader::Page const part = wordsOf(page, box);
    std::string text;
    for (Reader::Line const& line : Reader::layOut(part).lines)
        text += (text.empty() ? "" : " ") + Reader::textOf(part, line);
    return text.empty() ? "something" : inShortQuotes(text);
}

} // namespace Production

// Words anywhere on a page, eight bytes each: made into lines, blocks and the texts of zones, of which lines
// are joined, and which are then cut line by line. The last sixteen bytes are the edges of a zone, too.
#include "programs/reader/zone_text.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <set>
#include <string>
#include <vector>

namespace {

constexpr std::size_t BYTES_PER_WORD = 8;

void require(bool holds) {
    if (!holds)
        std::abort();
}

Reader::Page pageOf(std::uint8_t const* data, std::size_t size) {
    Reader::Page page{1, 21000, 29700, {}, {{"Serif"}, {"Mono", 0.6}}};
    for (; size >= BYTES_PER_WORD; data += BYTES_PER_WORD, size -= BYTES_PER_WORD) {
        Reader::Word word;
        word.text = std::string(1 + data[0] % 12, static_cast<char>('a' + data[0] % 26));
        word.box.left = data[1] * 80;
        word.box.top = data[2] * 115 + data[3];
        word.box.right = word.box.left + data[4] * 10;
        word.box.bottom = word.box.top + data[5] * 3;
        word.size = 1 + data[6] * 3;
        word.font = data[7] & 1;
        word.blankBehind = data[7] & 2;
        word.turn = static_cast<Reader::Turn>(data[7] >> 2 & 3);
        page.words.push_back(word);
    }
    return page;
}

/// As settings may say it: anywhere.
Reader::Box zoneOf(std::uint8_t const* data, std::size_t size) {
    std::array<int, 4> edges{};
    if (size >= sizeof edges)
        std::memcpy(edges.data(), data + size - sizeof edges, sizeof edges);
    return {edges[0], edges[1], edges[2], edges[3]};
}

/// Each word is on one line, or a copy of one that is; each line in one block.
void check(Reader::Page const& page, Reader::Layout const& layout) {
    std::vector<int> uses(page.words.size());
    std::size_t line = 0;
    for (Reader::Block const& block : layout.blocks) {
        require(block.firstLine == line && block.endLine > line);
        line = block.endLine;
    }
    require(line == layout.lines.size());
    for (Reader::Line const& one : layout.lines)
        for (Reader::LineWord const& word : one.words) {
            require(++uses.at(word.word) == 1);
            require(one.box.united(page.words[word.word].box) == one.box);
        }
}

void cut(Reader::ZoneText zone) {
    std::string const before = zone.text();
    require(zone.stretch(0, before.size()).text == before);
    while (!zone.text().empty()) {
        std::size_t const middle = zone.text().size() / 2;
        std::size_t const rest = zone.text().size();
        std::string const gone = zone.cutLines(middle, 1);
        if (gone.empty()) {
            // The middle is a line break.
            require(zone.text()[middle] == '\n' && !zone.cutLines(middle + 1, 1).empty());
            continue;
        }
        require(zone.text().size() + gone.size() + 1 == rest || zone.text().empty());
    }
}

void join(Reader::ZoneText const& zone) {
    std::vector<Reader::PlacedLine> const lines = zone.placedLines();
    for (Reader::LineJoin const& join : Reader::joinsOf(lines)) {
        std::set<std::size_t> const distinct(join.lines.begin(), join.lines.end());
        require(distinct.size() == join.lines.size() && distinct.size() > 1);
        require(*distinct.rbegin() < lines.size());
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    Reader::Page const page = pageOf(data, size);
    Reader::Layout const layout = Reader::layOut(page);
    check(page, layout);
    join(Reader::ZoneText::inside(page, layout, {0, 0, 21000, 29700}));
    cut(Reader::ZoneText::inside(page, layout, {0, 0, 21000, 29700}));
    cut(Reader::ZoneText::nearest(page, layout, {4500, 6200}));
    Reader::Box const zone = zoneOf(data, size);
    cut(Reader::ZoneText::inside(page, layout, zone));
    cut(Reader::ZoneText::nearest(page, layout, {zone.left, zone.top}));
    return 0;
}

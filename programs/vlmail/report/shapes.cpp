#include "programs/vlmail/report/shapes.h"

#include <algorithm>
#include <array>

namespace VlMail::Report {
namespace {

using Reader::Box;

/// In the order of Field::State.
constexpr std::array STATES{
    StateLook{"\u2713 found", ""},         StateLook{"= default", "quiet"},
    StateLook{"\u2013 not used", "quiet"}, StateLook{"\u2013 not found", "quiet"},
    StateLook{"\u2717 invalid", "bad"},    StateLook{"\u2717 missing", "bad"},
};

/// In the order of Field::Tag.
constexpr std::array TAGS{"", " front", " above"};

/// Settings may place a zone anywhere: what lies off the page ends at its edge.
Box onPage(Box const& box, Sheet const& sheet) {
    Box clipped;
    clipped.left = std::clamp(box.left, 0, sheet.width);
    clipped.top = std::clamp(box.top, 0, sheet.height);
    clipped.right = std::clamp(box.right, clipped.left, sheet.width);
    clipped.bottom = std::clamp(box.bottom, clipped.top, sheet.height);
    return clipped;
}

Shape shapeOf(Zone const& zone, std::size_t index, Sheet const& sheet) {
    constexpr int TAG_HEIGHT = 400;
    Box const box = onPage(zone.box, sheet);
    std::string look = "zone";
    look += zone.isAddressWindow ? " window" : "";
    look += zone.isByPoint ? " point" : "";
    look += box.top < TAG_HEIGHT ? " high" : "";
    std::string const name = kindOf(zone) + ' ' + zone.name;
    return {look, box, name, name, index};
}

/// The first box of a match bears the name, and those of lines that were joined with it do not.
void addShapes(std::vector<Shape>& shapes, Field const& field, std::size_t zone, std::size_t index,
               Sheet const& sheet) {
    StateLook const state = lookOf(field);
    std::string const look = std::string("match ") + state.look;
    for (Box const& box : field.match) {
        Shape shape{look, onPage(box, sheet)};
        shape.label = "field " + field.name + ", joined line";
        shape.zone = zone;
        shape.field = index;
        if (&box == &field.match.front()) {
            shape.look += TAGS.at(static_cast<std::size_t>(field.tag));
            shape.tag = (isTrouble(field) ? "\u2717 " : "") + field.name;
            shape.label = "field " + field.name + ": " + state.words;
        }
        shapes.push_back(std::move(shape));
    }
}

/// The name stands where the sheet does not end.
Shape shapeOf(Fault const& fault, std::size_t index, Sheet const& sheet) {
    constexpr int TAG_HEIGHT = 500;
    Box const box = onPage(fault.box, sheet);
    std::string look = fault.isError ? "fault" : "fault slight";
    look += box.centre().x > sheet.width / 2 ? " front" : "";
    look += box.bottom > sheet.height - TAG_HEIGHT ? " above" : "";
    Shape shape{look, box, fault.code, fault.code + ": " + fault.says};
    shape.fault = index;
    return shape;
}

/// Those of a sheet, the largest first.
std::vector<std::size_t> bySize(std::vector<Zone> const& zones, std::size_t sheet) {
    std::vector<std::size_t> order;
    for (std::size_t i = 0; i < zones.size(); ++i)
        if (zones[i].sheet == sheet && zones[i].whyNowhere.empty())
            order.push_back(i);
    auto const area = [&](std::size_t index) {
        return 1.0 * zones[index].box.width() * zones[index].box.height();
    };
    std::stable_sort(order.begin(), order.end(),
                     [&](std::size_t one, std::size_t other) { return area(one) > area(other); });
    return order;
}

} // namespace

StateLook lookOf(Field const& field) { return STATES.at(static_cast<std::size_t>(field.state)); }

bool isTrouble(Field const& field) {
    return field.state == Field::State::Invalid || field.state == Field::State::Missing;
}

std::string kindOf(Zone const& zone) { return zone.isAddressWindow ? "address window" : "zone"; }

std::vector<Shape> shapesOn(Letter const& letter, std::size_t place) {
    Sheet const& sheet = letter.sheets[place];
    std::vector<Shape> shapes;
    if (sheet.width <= 0 || sheet.height <= 0)
        return shapes;
    std::vector<std::size_t> order = bySize(letter.zones, place);
    for (std::size_t const index : order)
        shapes.push_back(shapeOf(letter.zones[index], index, sheet));
    std::sort(order.begin(), order.end());
    for (std::size_t const index : order) {
        std::vector<Field> const& fields = letter.zones[index].fields;
        for (std::size_t k = 0; k < fields.size(); ++k)
            addShapes(shapes, fields[k], index, k, sheet);
    }
    for (std::size_t i = 0; i < letter.faults.size(); ++i)
        if (std::ranges::find(letter.faults[i].sheets, place) != letter.faults[i].sheets.end())
            shapes.push_back(shapeOf(letter.faults[i], i, sheet));
    return shapes;
}

} // namespace VlMail::Report

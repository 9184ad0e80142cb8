#include "programs/vlmail/report/report.h"

#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/presets/words.h"
#include "programs/vlmail/report/html.h"
#include "programs/vlmail/report/style.h"

#include <algorithm>
#include <array>
#include <functional>
#include <numeric>

namespace VlMail::Report {
namespace {

using Reader::Box;

/// Nothing may be loaded or run but what the page brings itself; texts that slip through stay harmless.
constexpr char const* POLICY =
    "default-src 'none'; img-src data:; style-src 'unsafe-inline'; base-uri 'none'; form-action 'none'";

struct StateLook {
    char const* words;
    /// Of the style sheet.
    char const* look;
};

/// In the order of Field::State.
constexpr std::array STATES{
    StateLook{"\u2713 found", ""},         StateLook{"= default", "quiet"},
    StateLook{"\u2013 not used", "quiet"}, StateLook{"\u2013 not found", "quiet"},
    StateLook{"\u2717 invalid", "bad"},    StateLook{"\u2717 missing", "bad"},
};

/// In the order of Field::Tag.
constexpr std::array TAGS{"", " front", " above"};

StateLook lookOf(Field const& field) { return STATES.at(static_cast<std::size_t>(field.state)); }

bool isTrouble(Field const& field) {
    return field.state == Field::State::Invalid || field.state == Field::State::Missing;
}

std::string stateSpan(std::string const& words, std::string const& look) {
    return "<span class=\"state " + look + "\">" + escaped(words) + "</span>";
}

std::string numbered(std::string const& anchor, char kind, std::size_t index) {
    return anchor + kind + std::to_string(index + 1);
}

/// The anchors of what is on the picture and of its row beside it point at each other.
std::string rowAnchor(std::string const& anchor) { return anchor + "r"; }

std::string placeOf(Box const& box) {
    return inMillimetres(box.left) + "\u2013" + inMillimetres(box.right) + " \u00d7 " +
           inMillimetres(box.top) + "\u2013" + inMillimetres(box.bottom) + " mm";
}

/// Settings may place a zone anywhere: what lies off the page ends at its edge.
Box onPage(Box const& box, Sheet const& sheet) {
    Box clipped;
    clipped.left = std::clamp(box.left, 0, sheet.width);
    clipped.top = std::clamp(box.top, 0, sheet.height);
    clipped.right = std::clamp(box.right, clipped.left, sheet.width);
    clipped.bottom = std::clamp(box.bottom, clipped.top, sheet.height);
    return clipped;
}

std::string styleOf(Box const& box, Sheet const& sheet) {
    return "left:" + percent(box.left, sheet.width) + ";top:" + percent(box.top, sheet.height) +
           ";width:" + percent(box.width(), sheet.width) + ";height:" + percent(box.height(), sheet.height);
}

/// A mark on a sheet that leads to `row`.
std::string overlay(std::string const& anchor, std::string const& row, std::string const& look,
                    Box const& box, Sheet const& sheet, std::string const& tag, std::string const& label) {
    return "<a class=\"" + look + "\" id=\"" + anchor + "\" href=\"#" + row + "\" style=\"" +
           styleOf(box, sheet) + "\" aria-label=\"" + escaped(label) + "\"><span class=\"tag\">" +
           isolated(tag) + "</span></a>\n";
}

std::string overlay(std::string const& anchor, std::string const& look, Box const& box, Sheet const& sheet,
                    std::string const& tag, std::string const& label) {
    return overlay(anchor, rowAnchor(anchor), look, box, sheet, tag, label);
}

std::string kindOf(Zone const& zone) { return zone.isAddressWindow ? "address window" : "zone"; }

std::string overlayOf(Zone const& zone, std::string const& anchor, Sheet const& sheet) {
    constexpr int TAG_HEIGHT = 400;
    Box const box = onPage(zone.box, sheet);
    std::string look = "zone";
    look += zone.isAddressWindow ? " window" : "";
    look += zone.isByPoint ? " point" : "";
    look += box.top < TAG_HEIGHT ? " high" : "";
    std::string const name = kindOf(zone) + ' ' + zone.name;
    return overlay(anchor, look, box, sheet, name, name);
}

/// The first box of a match bears the name; those of lines that were joined with it lead to the same row.
std::string overlayOf(Field const& field, std::string const& anchor, Sheet const& sheet) {
    StateLook const state = lookOf(field);
    std::string const look = std::string("match ") + state.look;
    std::string const tag = (isTrouble(field) ? "\u2717 " : "") + field.name;
    std::string html =
        overlay(anchor, look + TAGS.at(static_cast<std::size_t>(field.tag)),
                onPage(field.match.front(), sheet), sheet, tag, "field " + field.name + ": " + state.words);
    for (std::size_t i = 1; i < field.match.size(); ++i)
        html += "<a class=\"" + look + "\" href=\"#" + rowAnchor(anchor) + "\" style=\"" +
                styleOf(onPage(field.match[i], sheet), sheet) + "\" aria-label=\"field " +
                escaped(field.name) + ", joined line\"></a>\n";
    return html;
}

/// The name stands where the sheet does not end.
std::string overlayOf(Fault const& fault, std::string const& anchor, std::string const& row,
                      Sheet const& sheet) {
    constexpr int TAG_HEIGHT = 500;
    Box const box = onPage(fault.box, sheet);
    std::string look = fault.isError ? "fault" : "fault slight";
    look += box.centre().x > sheet.width / 2 ? " front" : "";
    look += box.bottom > sheet.height - TAG_HEIGHT ? " above" : "";
    return overlay(anchor, row, look, box, sheet, fault.code, fault.code + ": " + fault.says);
}

/// Those of a sheet, the largest first, so that none hides another from the pointer.
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

std::string faultsOn(Letter const& letter, std::size_t place, std::string const& anchor) {
    std::string html;
    for (std::size_t i = 0; i < letter.faults.size(); ++i) {
        Fault const& fault = letter.faults[i];
        std::string const one = numbered(anchor, 'p', i);
        auto const on = std::ranges::find(fault.sheets, place);
        if (on != fault.sheets.end())
            html += overlayOf(fault, on == fault.sheets.begin() ? one : numbered(one, 's', place),
                              rowAnchor(one), letter.sheets[place]);
    }
    return html;
}

std::string overlaysOf(Letter const& letter, std::size_t place, std::string const& anchor) {
    Sheet const& sheet = letter.sheets[place];
    if (sheet.width <= 0 || sheet.height <= 0)
        return {};
    std::vector<std::size_t> order = bySize(letter.zones, place);
    std::string html;
    for (std::size_t const index : order)
        html += overlayOf(letter.zones[index], numbered(anchor, 'z', index), sheet);
    std::sort(order.begin(), order.end());
    for (std::size_t const index : order) {
        std::vector<Field> const& fields = letter.zones[index].fields;
        for (std::size_t k = 0; k < fields.size(); ++k) {
            if (!fields[k].match.empty())
                html += overlayOf(fields[k], numbered(numbered(anchor, 'z', index), 'f', k), sheet);
        }
    }
    return html + faultsOn(letter, place, anchor);
}

std::string pictureOf(Sheet const& sheet) {
    if (sheet.png.empty())
        return "<p>" + isolated(sheet.whyNoPicture) + "</p>\n";
    return "<img alt=\"page " + std::to_string(sheet.page) + "\" src=\"" + pngUri(sheet.png) + "\">\n";
}

bool isSearched(Letter const& letter, std::size_t sheet) {
    return sheet == 0 || std::ranges::find(letter.zones, sheet, &Zone::sheet) != letter.zones.end();
}

std::string figureOf(Letter const& letter, std::size_t place, std::string const& anchor) {
    Sheet const& sheet = letter.sheets[place];
    return "<figure><div class=\"sheet\" style=\"--w:" + std::to_string(std::max(sheet.width, 1)) +
           ";--h:" + std::to_string(std::max(sheet.height, 1)) + "\">\n" + pictureOf(sheet) +
           overlaysOf(letter, place, anchor) + "</div>\n<figcaption>Page " + std::to_string(sheet.page) +
           (isSearched(letter, place) ? ", on which the fields of this letter were searched"
                                      : ", on which something is wrong") +
           ".</figcaption></figure>\n";
}

std::string figuresOf(Letter const& letter, std::string const& anchor) {
    std::string html;
    for (std::size_t i = 0; i < letter.sheets.size(); ++i)
        html += figureOf(letter, i, anchor);
    return letter.sheets.size() == 1 ? html : "<div>\n" + html + "</div>\n";
}

/// A field on the picture is reached from its name.
std::string nameCell(Field const& field, std::string const& anchor) {
    std::string const name = isolated(field.name);
    if (field.match.empty())
        return name;
    return "<a href=\"#" + anchor + "\">" + name + "</a>";
}

std::string noteOf(Field const& field) {
    return field.note.empty() ? std::string() : "<small>" + isolated(field.note) + "</small>";
}

std::string rowOf(Field const& field, std::string const& anchor) {
    StateLook const state = lookOf(field);
    return "<tr id=\"" + rowAnchor(anchor) + "\" class=\"" + state.look + "\"><th scope=\"row\">" +
           nameCell(field, anchor) + "</th><td class=\"value\">" + isolated(field.value) + "</td><td>" +
           stateSpan(state.words, state.look) + noteOf(field) + "</td></tr>\n";
}

/// A zone on the picture is reached from its name.
std::string zoneCell(Zone const& zone, std::string const& anchor) {
    std::string const name = escaped(kindOf(zone)) + ' ' + isolated(zone.name);
    return zone.whyNowhere.empty() ? "<a href=\"#" + anchor + "\">" + name + "</a>" : name;
}

std::string placeOf(Zone const& zone, std::vector<Sheet> const& sheets) {
    if (!zone.whyNowhere.empty())
        return isolated(zone.whyNowhere);
    return placeOf(zone.box) + (zone.isByPoint ? ", the text nearest to its point" : "") +
           (zone.sheet > 0 ? ", page " + std::to_string(sheets[zone.sheet].page) : std::string());
}

std::string rowsOf(Zone const& zone, std::vector<Sheet> const& sheets, std::string const& anchor) {
    std::string html = "<tbody>\n<tr class=\"group\" id=\"" + rowAnchor(anchor) +
                       "\"><th scope=\"rowgroup\" colspan=\"3\">" + zoneCell(zone, anchor) + " <small>" +
                       placeOf(zone, sheets) + "</small></th></tr>\n";
    for (std::size_t i = 0; i < zone.fields.size(); ++i)
        html += rowOf(zone.fields[i], numbered(anchor, 'f', i));
    return html + "</tbody>\n";
}

std::string tableOf(Letter const& letter, std::string const& anchor) {
    if (letter.zones.empty())
        return "<p>The preset searches for no fields.</p>\n";
    std::string html = "<table><caption>Fields, by zone</caption>\n<thead><tr><th scope=\"col\">Field</th>"
                       "<th scope=\"col\">Value</th><th scope=\"col\">State</th></tr></thead>\n";
    for (std::size_t i = 0; i < letter.zones.size(); ++i)
        html += rowsOf(letter.zones[i], letter.sheets, numbered(anchor, 'z', i));
    return html + "</table>\n";
}

std::string rowOf(Fault const& fault, std::string const& anchor) {
    std::string const code = fault.sheets.empty()
                                 ? escaped(fault.code)
                                 : "<a href=\"#" + anchor + "\">" + escaped(fault.code) + "</a>";
    return "<tr id=\"" + rowAnchor(anchor) + "\" class=\"" + (fault.isError ? "bad" : "") +
           "\"><th scope=\"row\">" + code + "</th><td>" +
           stateSpan(fault.isError ? "\u2717 error" : "! warning", fault.isError ? "bad" : "quiet") +
           "<small>" + escaped(fault.pages) + "</small></td><td>" + isolated(fault.says) + "<small>" +
           isolated(fault.fix) + "</small></td></tr>\n";
}

std::string faultsOf(Letter const& letter, std::string const& anchor) {
    if (letter.faults.empty())
        return {};
    std::string html = "<table><caption>What is wrong</caption>\n<thead><tr><th scope=\"col\">Found</th><th "
                       "scope=\"col\">State</th><th scope=\"col\">What and remedy</th></tr></thead>\n";
    for (std::size_t i = 0; i < letter.faults.size(); ++i)
        html += rowOf(letter.faults[i], numbered(anchor, 'p', i));
    return html + "</table>\n";
}

std::string whyNotOf(Letter const& letter) {
    if (letter.whyNot.empty())
        return {};
    return "<p class=\"why\">\u2717 cannot go out: " + isolated(letter.whyNot) + "</p>\n";
}

std::string letterHeading(Letter const& letter, std::string const& anchor, std::string const& count) {
    std::string const state =
        letter.whyNot.empty() ? stateSpan("\u2713 ready", "") : stateSpan("\u2717 cannot go out", "bad");
    return "<h3 id=\"" + anchor + "h\">Letter " + count + ", " + escaped(letter.pages) + ": " + state +
           "</h3>\n";
}

std::string sideHtml(Side const& side) {
    std::string const name = isolated(side.name);
    std::string const picture = side.png.empty() ? "" : "<img alt=\"\" src=\"" + pngUri(side.png) + "\">";
    return "<li><div class=\"side\" style=\"--w:" + std::to_string(std::max(side.width, 1)) +
           ";--h:" + std::to_string(std::max(side.height, 1)) + "\">" + picture + "</div>" + name + "</li>\n";
}

std::string sidesHtml(Letter const& letter) {
    if (letter.sides.empty())
        return {};
    std::string html = "<ol class=\"sides\" aria-label=\"Sides of paper\">\n";
    for (Side const& side : letter.sides)
        html += sideHtml(side);
    return html + "</ol>\n";
}

std::string letterHtml(Letter const& letter, std::string const& anchor, std::string const& count) {
    std::string const fields = anchor + "t";
    return "<article class=\"letter\" id=\"" + anchor + "\" aria-labelledby=\"" + anchor + "h\">\n" +
           letterHeading(letter, anchor, count) + "<a class=\"skip\" href=\"#" + fields +
           "\">Skip the picture</a>\n<div class=\"beside\">\n" + figuresOf(letter, anchor) +
           "<div class=\"fields\" id=\"" + fields + "\" tabindex=\"-1\">\n" + whyNotOf(letter) +
           faultsOf(letter, anchor) + tableOf(letter, anchor) + "</div></div>\n" + sidesHtml(letter) +
           "</article>\n";
}

std::string lettersHtml(Document const& document, std::string const& anchor) {
    std::string html;
    std::string const of = " of " + std::to_string(document.letters.size());
    for (std::size_t i = 0; i < document.letters.size(); ++i)
        html += letterHtml(document.letters[i], numbered(anchor, 'l', i), std::to_string(i + 1) + of);
    return html;
}

std::string presetsOf(Document const& document) {
    return "<p class=\"quietly\">read by the preset for <code>" + isolated(document.extractPreset) +
           "</code>, sent by the pack preset <code>" + isolated(document.packPreset) + "</code></p>\n";
}

std::string bodyOf(Document const& document, std::string const& anchor) {
    if (!document.error.empty())
        return "<p class=\"why\">\u2717 " + isolated(document.error) + "</p>\n";
    if (document.isAttachment)
        return presetsOf(document) + "<p>An attachment: it holds no letters.</p>\n";
    return presetsOf(document) + lettersHtml(document, anchor);
}

std::string anchorOf(std::size_t place) { return 'd' + std::to_string(place); }

std::string overviewOf(std::vector<Entry> const& entries) {
    std::string html = "<nav aria-label=\"Documents\"><ol class=\"overview\">\n";
    for (std::size_t i = 0; i < entries.size(); ++i)
        html += "<li><a href=\"#" + anchorOf(i + 1) + "\">" + isolated(entries[i].name) + "</a> " +
                stateSpan((entries[i].isTrouble ? "\u2717 " : "\u2713 ") + entries[i].state,
                          entries[i].isTrouble ? "bad" : "") +
                "</li>\n";
    return html + "</ol></nav>\n";
}

std::string skipToTrouble(std::vector<Entry> const& entries) {
    auto const first = std::find_if(entries.begin(), entries.end(), std::mem_fn(&Entry::isTrouble));
    if (first == entries.end())
        return {};
    std::size_t const place = static_cast<std::size_t>(first - entries.begin()) + 1;
    return "<a class=\"skip\" href=\"#" + anchorOf(place) +
           "\">Skip to the first document with trouble</a>\n";
}

constexpr char const* LEGEND = R"html(<ul class="legend" aria-label="Marks on the pages">
<li><span class="zone window"></span>address window</li>
<li><span class="zone"></span>zone</li>
<li><span class="zone point"></span>zone found by its point</li>
<li><span class="match"></span>found</li>
<li><span class="match quiet"></span>matched, but not used</li>
<li><span class="match bad"></span>&#10007; invalid</li>
<li><span class="fault"></span>&#10007; wrong</li>
</ul>
)html";

std::string headOf(std::string const& outcome) {
    return std::string("<!DOCTYPE html>\n<html lang=\"en\">\n<head>\n<meta charset=\"utf-8\">\n") +
           "<meta http-equiv=\"Content-Security-Policy\" content=\"" + POLICY + "\">\n" +
           "<meta name=\"viewport\" content=\"width=device-width, initial-scale=1\">\n" +
           "<meta name=\"referrer\" content=\"no-referrer\">\n<title>Letters: " + escaped(outcome) +
           "</title>\n<style>" + STYLE + "</style>\n</head>\n";
}

} // namespace

std::string section(Document const& document, std::size_t place) {
    std::string const anchor = anchorOf(place);
    bool const isBare = document.letters.empty();
    return "<section class=\"document" + std::string(isBare ? " bare" : "") + "\" id=\"" + anchor +
           "\" aria-labelledby=\"" + anchor + "h\">\n<h2 id=\"" + anchor + "h\">" + isolated(document.name) +
           "</h2>\n" + bodyOf(document, anchor) +
           "<p class=\"back\"><a href=\"#top\">Back to the overview</a></p>\n" + "</section>\n";
}

std::string page(std::string const& outcome, std::vector<Entry> const& entries) {
    std::string html =
        headOf(outcome) + "<body id=\"top\">\n<a class=\"skip\" href=\"#letters\">Skip to the letters</a>\n" +
        skipToTrouble(entries) + "<header>\n<h1>Letters</h1>\n<p>" + escaped(outcome) + "</p>\n" +
        overviewOf(entries) + LEGEND + "</header>\n<main id=\"letters\" tabindex=\"-1\">\n";
    for (Entry const& entry : entries)
        html += entry.section;
    return html + "</main>\n</body>\n</html>\n";
}

} // namespace VlMail::Report

#include "programs/vlmail/report/report.h"

#include "programs/base/quoting.h"
#include "programs/vlmail/letters/outcome.h"
#include "programs/vlmail/presets/words.h"
#include "programs/vlmail/report/html.h"
#include "programs/vlmail/report/shapes.h"
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

std::string styleOf(Box const& box, Sheet const& sheet) {
    return "left:" + percent(box.left, sheet.width) + ";top:" + percent(box.top, sheet.height) +
           ";width:" + percent(box.width(), sheet.width) + ";height:" + percent(box.height(), sheet.height);
}

/// Where a mark leads, and its own anchor; of a match in several lines, or a fault on several sheets, the
/// first is what the row leads back to.
struct Anchors {
    std::string row;
    std::string own = {};
};

Anchors anchorsOf(Shape const& shape, Letter const& letter, std::size_t place, std::string const& anchor) {
    if (shape.fault) {
        std::string const one = numbered(anchor, 'p', *shape.fault);
        bool const isFirst = letter.faults[*shape.fault].sheets.front() == place;
        return {rowAnchor(one), isFirst ? one : numbered(one, 's', place)};
    }
    std::string one = numbered(anchor, 'z', *shape.zone);
    if (shape.field)
        one = numbered(one, 'f', *shape.field);
    return {rowAnchor(one), shape.tag ? one : std::string()};
}

std::string htmlOf(Shape const& shape, Anchors const& anchors, Sheet const& sheet) {
    return "<a class=\"" + shape.look + '"' + (anchors.own.empty() ? "" : " id=\"" + anchors.own + '"') +
           " href=\"#" + anchors.row + "\" style=\"" + styleOf(shape.box, sheet) + "\" aria-label=\"" +
           escaped(shape.label) + "\">" +
           (shape.tag ? "<span class=\"tag\">" + isolated(*shape.tag) + "</span>" : "") + "</a>\n";
}

std::string overlaysOf(Letter const& letter, std::size_t place, std::string const& anchor) {
    std::string html;
    for (Shape const& shape : shapesOn(letter, place))
        html += htmlOf(shape, anchorsOf(shape, letter, place, anchor), letter.sheets[place]);
    return html;
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
    std::string const name = isolated(inWords(side));
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
           "</title>\n<style>" + STYLE + DRAWING_STYLE + PRINT_STYLE + "</style>\n</head>\n";
}

} // namespace

std::string inWords(Side const& side) {
    std::string const page = "page " + std::to_string(side.page);
    switch (side.kind) {
    case Side::Kind::Blank:
        return "blank side";
    case Side::Kind::Cover:
        return "cover page";
    case Side::Kind::Attachment:
        return page + " of " + Base::inQuotes(side.id);
    case Side::Kind::Page:
        break;
    }
    return page;
}

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

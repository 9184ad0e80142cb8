#pragma once
// Letters on paper for tests: what stands where is told in 1/100 mm from the top left of an A4 page.

#include "programs/production/check_letter.h"
#include "tests/support/json_literal.h"
#include "tests/support/pdf_maker.h"

#include <cstdio>
#include <optional>
#include <string>
#include <vector>

namespace VLServiceTest {

/// The exact size of A4 in points.
inline constexpr char const* A4_PAGE = "/MediaBox [0 0 595.27559 841.88976]";

inline std::string inPoints(double hundredths) {
    char text[32];
    std::snprintf(text, sizeof text, "%.5f ", hundredths * 72 / 2540);
    return text;
}

/// A black box.
inline std::string box(Reader::Box const& place) {
    return inPoints(place.left) + inPoints(29700 - place.bottom) + inPoints(place.width()) +
           inPoints(place.height()) + "re f\n";
}

/// `base` is the line on which the letters stand.
inline std::string text(int left, int base, std::string const& words, int points = 10) {
    return "BT /F " + std::to_string(points) + " Tf " + inPoints(left) + inPoints(29700 - base) + "Td (" +
           words + ") Tj ET\n";
}

inline Cfg::PackPreset packPreset(json::Value const& production) {
    json::Object object{{"name", "Bills"}};
    if (production)
        object.set("production", production);
    return {object, {}};
}

inline Production::PrintRules printRules(json::Value const& production, json::Value const& app = {}) {
    return {packPreset(production), Cfg::App(app, true, false), "\"node.json\""};
}

/// What is found in all pages of a PDF as one letter.
inline std::vector<Production::Finding>
findingsIn(Reader::Document& document, Production::PrintRules const& rules,
           std::optional<Production::PlacedAddress> const& address = {}) {
    std::vector<int> pages;
    for (int page = 1; page <= document.pageCount(); ++page)
        pages.push_back(page);
    return Production::checkLetter({document, pages, address ? &*address : nullptr}, rules);
}

inline std::vector<Production::Finding>
findingsIn(std::string const& pdf, Production::PrintRules const& rules,
           std::optional<Production::PlacedAddress> const& address = {}) {
    Reader::Document document = Reader::openDocument(pdf, "a.pdf");
    return findingsIn(document, rules, address);
}

inline std::vector<std::string> codesOf(std::vector<Production::Finding> const& findings) {
    std::vector<std::string> codes;
    for (Production::Finding const& finding : findings)
        codes.emplace_back(Production::nameOf(finding.code));
    return codes;
}

inline std::string a4Page(std::string const& content, std::string const& keys = A4_PAGE) {
    return Reader::PdfMaker().page(content, keys).bytes();
}

} // namespace VLServiceTest

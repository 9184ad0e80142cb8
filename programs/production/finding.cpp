#include "programs/production/finding.h"

#include "programs/base/json_schema.h"
#include "programs/base/plain_text.h"
#include "vlservice/cfg/geometry.h"

#include <algorithm>
#include <array>
#include <utility>

namespace Production {
namespace {

using enum Severity;

constexpr char const* CODE_KEY = "code";
constexpr char const* SEVERITY_KEY = "severity";
constexpr char const* PAGES_KEY = "pages";
constexpr char const* BOX_KEY = "box";
constexpr char const* SAYS_KEY = "says";
constexpr char const* FIX_KEY = "fix";

constexpr std::array ROWS{
    CodeRow{Code::PageSize, "page-size", Error, false},
    CodeRow{Code::PageOrientation, "page-orientation", Error, false},
    CodeRow{Code::PageEmpty, "page-empty", Warning, false},
    CodeRow{Code::PageUnreadable, "page-unreadable", Error, false},
    CodeRow{Code::PageRedrawn, "page-redrawn", Warning, false},
    CodeRow{Code::ContentOutsidePrintArea, "content-outside-print-area", Error, true},
    CodeRow{Code::AddressOutsideWindow, "address-outside-window", Error, true},
    CodeRow{Code::TextInWindow, "text-in-window", Error, true},
    CodeRow{Code::ClearZone, "clear-zone", Error, true},
    CodeRow{Code::AddressTooFewLines, "address-too-few-lines", Error, false},
    CodeRow{Code::AddressTooManyLines, "address-too-many-lines", Error, false},
    CodeRow{Code::AddressNoPostcode, "address-no-postcode", Error, false},
    CodeRow{Code::FontNotEmbedded, "font-not-embedded", Warning, false},
    CodeRow{Code::AnnotationLost, "annotation-lost", Warning, false},
    CodeRow{Code::EmbeddedFileLost, "embedded-file-lost", Warning, false},
    CodeRow{Code::TooManySheets, "too-many-sheets", Error, false},
    CodeRow{Code::DocumentUnknown, "document-unknown", Error, false},
    CodeRow{Code::DocumentDamaged, "document-damaged", Error, false},
    CodeRow{Code::DocumentSize, "document-size", Error, false},
    CodeRow{Code::ProductionRefused, "production-refused", Error, false},
};

static_assert(ROWS.size() == static_cast<std::size_t>(Code::COUNT_));
static_assert(std::ranges::is_sorted(ROWS, {}, &CodeRow::code));

CodeRow const& rowOf(Code code) { return ROWS.at(static_cast<std::size_t>(code)); }

Code codeNamed(std::string const& name) {
    auto const row = std::ranges::find_if(ROWS, [&](CodeRow const& one) { return one.name == name; });
    if (row == ROWS.end())
        throw json::Exc("JSON error: Unknown code of a finding");
    return row->code;
}

Severity severityNamed(std::string const& name) {
    for (Severity const severity : {Error, Warning})
        if (name == inWords(severity))
            return severity;
    throw json::Exc("JSON error: Unknown severity of a finding");
}

Cfg::Rect rectOf(Box const& box) { return {box.left, box.top, box.right, box.bottom}; }

} // namespace

std::span<CodeRow const> codes() { return ROWS; }

char const* nameOf(Code code) { return rowOf(code).name; }

char const* inWords(Severity severity) { return severity == Error ? "error" : "warning"; }

json::Object Finding::toJson() const {
    json::Array numbers;
    for (int const page : pages)
        numbers.append(page);
    return {{CODE_KEY, nameOf(code)}, {SEVERITY_KEY, inWords(severity)},
            {PAGES_KEY, numbers},     {BOX_KEY, rectOf(box).serialize()},
            {SAYS_KEY, says},         {FIX_KEY, fix}};
}

Finding Finding::fromJson(json::Object const& object) {
    Cfg::Rect const rect(object.get(BOX_KEY));
    Finding finding{codeNamed(object.get(CODE_KEY).toString()),
                    severityNamed(object.get(SEVERITY_KEY).toString()),
                    {},
                    {rect.left, rect.top, rect.right, rect.bottom},
                    object.get(SAYS_KEY).toString(),
                    object.get(FIX_KEY).toString()};
    for (json::Value const& page : object.get(PAGES_KEY).toArray())
        finding.pages.push_back(static_cast<int>(page.toInt()));
    return finding;
}

json::Object Finding::schema() {
    namespace Schema = Base::Schema;
    json::Array names;
    for (CodeRow const& row : ROWS)
        names.append(row.name);
    Schema::Members box(Schema::Members::Others::Refused);
    for (json::KeyRow const& row : Cfg::Rect::keys().rows)
        box.add(row.name, Schema::integer());
    return Schema::Members(Schema::Members::Others::Refused)
        .require(CODE_KEY, {{"enum", names}})
        .require(SEVERITY_KEY, Schema::words({inWords(Error), inWords(Warning)}))
        .require(PAGES_KEY, Schema::listOf(Schema::integer(1)))
        .require(BOX_KEY, box.schema())
        .require(SAYS_KEY, Schema::text())
        .require(FIX_KEY, Schema::text())
        .schema();
}

void Findings::add(Code code, Place const& place, std::string says, std::string fix) {
    // Texts of documents stand in it, which may be anything.
    says = Base::oneLine(says);
    auto const& [left, top, right, bottom] = place.box;
    auto const [known, isNew] =
        known_.try_emplace({code, says, fix, left, top, right, bottom}, findings_.size());
    if (isNew) {
        CodeRow const& row = rowOf(code);
        bool const isForgiven = row.isLoose && deviation_ == Deviation::Loose;
        findings_.push_back(
            {code, isForgiven ? Warning : row.severity, {}, place.box, std::move(says), std::move(fix)});
    }
    std::vector<int>& pages = findings_[known->second].pages;
    if (place.page > 0 && (pages.empty() || pages.back() != place.page))
        pages.push_back(place.page);
}

std::vector<Finding> Findings::take() {
    std::vector<Finding> all = std::move(findings_);
    std::stable_partition(all.begin(), all.end(), [](Finding const& finding) { return finding.isError(); });
    if (all.size() > MOST)
        all.erase(all.begin() + MOST, all.end());
    return all;
}

Finding redrawnFinding(std::vector<int> pages, std::string const& whose) {
    return {Code::PageRedrawn,
            rowOf(Code::PageRedrawn).severity,
            std::move(pages),
            {},
            whose + "contents are damaged: what can be shown of them is written anew",
            "look whether all is there, or export the document again"};
}

} // namespace Production

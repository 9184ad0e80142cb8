#pragma once
// What would go wrong with a letter on paper: a code for programs, and words for people.

#include "programs/reader/geometry.h"
#include "vlservice/json/json.h"

#include <map>
#include <span>
#include <string>
#include <tuple>
#include <vector>

namespace Production {

using Reader::Box;

enum class Severity { Error, Warning };

/// Every kind of finding; its row stands in finding.cpp, in this order.
enum class Code {
    PageSize,
    PageOrientation,
    PageEmpty,
    PageUnreadable,
    PageRedrawn,
    ContentOutsidePrintArea,
    AddressOutsideWindow,
    TextInWindow,
    ClearZone,
    AddressTooFewLines,
    AddressTooManyLines,
    AddressNoPostcode,
    FontNotEmbedded,
    AnnotationLost,
    EmbeddedFileLost,
    TooManySheets,
    DocumentUnknown,
    DocumentDamaged,
    DocumentSize,
    ProductionRefused,
    COUNT_,
};

struct CodeRow {
    Code code;
    /// Stable, for programs.
    char const* name;
    Severity severity;
    /// An error that the setting "loose_letter_deviation" turns into a warning.
    bool isLoose;
};

/// One row a code, in the order of Code.
std::span<CodeRow const> codes();
char const* nameOf(Code code);

struct Finding {
    Code code;
    Severity severity;
    /// From 1, rising; none when the whole document is meant.
    std::vector<int> pages;
    /// The place on each of these pages, in 1/100 mm; all 0 without one.
    Box box;
    /// What is wrong and what to do, a clause each.
    std::string says;
    std::string fix;

    bool isError() const { return severity == Severity::Error; }
    /// {"code", "severity", "pages", "box", "says", "fix"}.
    json::Object toJson() const;
    /// Takes what toJson() gives. Throws json::Exc, also for a code or severity that there is none of.
    static Finding fromJson(json::Object const& object);
    /// Of that object.
    static json::Object schema();

    friend bool operator==(Finding const&, Finding const&) = default;
};

/// What stands beside the code of a finding.
struct Place {
    /// 0 when the whole document is meant.
    int page = 0;
    Box box = {};
};

/// The findings of a letter in the making.
class Findings {
public:
    /// A letter with more has them not told.
    static constexpr std::size_t MOST = 100;

    enum class Deviation { Strict, Loose };
    explicit Findings(Deviation deviation = Deviation::Strict) : deviation_(deviation) {}

    /// What is said of one page with the same words and box as of another becomes one finding.
    void add(Code code, Place const& place, std::string says, std::string fix);

    /// Errors first, then in the order in which they were added; MOST at most.
    std::vector<Finding> take();

private:
    using Key = std::tuple<Code, std::string, std::string, int, int, int, int>;

    Deviation deviation_;
    std::vector<Finding> findings_;
    std::map<Key, std::size_t> known_;
};

char const* inWords(Severity severity);

/// Of pages whose contents cannot be unpacked whole. `whose` stands in front of what it says, for a document
/// other than the letter's.
Finding redrawnFinding(std::vector<int> pages, std::string const& whose = {});

} // namespace Production

// Which extraction preset a document gets to, and which ones none gets to.
#include "programs/patterns/outline.h"
#include "programs/patterns/pattern.h"
#include "programs/patterns/samples.h"
#include "programs/vlmail/presets/checks.h"
#include "programs/vlmail/presets/words.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <limits>
#include <optional>
#include <string>
#include <vector>

namespace VlMail {
namespace {

using enum FindingKind;

constexpr std::size_t SAMPLES = 40;

/// Names that have nothing in common but a character: what fits them all fits everything.
constexpr std::array<char const*, 12> ODD_NAMES{
    "a",
    "7",
    " ",
    "Invoice 2017.pdf",
    "x.PDF",
    ".hidden",
    "\xC3\xA9t\xC3\xA9.docx",
    "(1)[2]{3}.txt",
    "-_#@!",
    "\n",
    "a\nb",
    "\xE6\x97\xA5\xE6\x9C\xAC",
};

/// An extraction preset with names that its expression fits.
struct Reachable {
    ListedExtractPreset const& listed;
    std::optional<Patterns::Pattern> pattern;
    std::vector<std::string> names;
    /// The expression fits one name alone, but for letter case.
    bool hasOneName = false;

    bool fits(std::string const& name) const {
        return pattern && pattern->fits(name) == Patterns::Pattern::Answer::Yes;
    }
    template<typename Names>
    bool fitsAll(Names const& all) const {
        return std::all_of(std::begin(all), std::end(all), [&](auto const& name) { return fits(name); });
    }
};

std::optional<Patterns::Pattern> compiled(std::string const& text) {
    try {
        return Patterns::Pattern(text, Patterns::Pattern::Use::Name);
    } catch (Patterns::Broken const&) {
        return std::nullopt;
    }
}

bool isOneName(std::vector<Patterns::Sequence> const& outline) {
    return outline.size() == 1 && std::ranges::all_of(outline.front(), [](Patterns::Piece const& piece) {
               return piece.kind == Patterns::Piece::Kind::Literal && piece.least == piece.most;
           });
}

Reachable reachable(ListedExtractPreset const& listed) {
    Reachable preset{listed, compiled(listed.match()), {}, isOneName(Patterns::outlineOf(listed.match()))};
    if (preset.pattern)
        preset.names = Patterns::samplesOf(*preset.pattern, SAMPLES);
    return preset;
}

std::vector<Reachable> allReachable(PresetsDocument const& document) {
    std::vector<Reachable> presets;
    for (ListedExtractPreset const& listed : document.extractPresets())
        presets.push_back(reachable(listed));
    return presets;
}

bool isSameLetter(unsigned char a, unsigned char b) {
    // Beyond ASCII the engine knows more of letter case.
    return a >= 0x80 || b >= 0x80 || std::tolower(a) == std::tolower(b);
}

/// Told without the engine: there may be thousands of presets that were made for one name each.
bool haveOtherNames(Reachable const& a, Reachable const& b) {
    return a.hasOneName && b.hasOneName &&
           !std::ranges::equal(a.listed.match(), b.listed.match(), isSameLetter);
}

bool shadows(Reachable const& earlier, Reachable const& later) {
    bool const hasTooFew = earlier.hasOneName && !later.hasOneName;
    return !hasTooFew && !haveOtherNames(earlier, later) && earlier.fitsAll(later.names);
}

/// Whether nothing is left for `later`, beyond doubt: not by its samples alone.
bool surelyShadows(Reachable const& earlier, Reachable const& later) {
    return earlier.listed.match() == later.listed.match() || later.hasOneName || earlier.fitsAll(ODD_NAMES);
}

std::string orderInWords(ListedExtractPreset const& preset) {
    return preset.json.get("order") ? std::to_string(preset.preset.order()) : "missing, which counts as 0";
}

/// Why `earlier` is tried before `later`.
std::string precedence(ListedExtractPreset const& earlier, ListedExtractPreset const& later) {
    if (earlier.preset.order() == later.preset.order())
        return "it stands in front";
    return "its \"order\" is " + orderInWords(earlier) + " (here it is " + orderInWords(later) + ")";
}

void reportShadow(Reachable const& earlier, Reachable const& later, Findings& findings) {
    findings.add(surelyShadows(earlier, later) ? UnreachablePreset : ShadowedPreset, later.listed.place,
                 {inWords(earlier.listed.preset), earlier.listed.place.pointer(),
                  precedence(earlier.listed, later.listed), std::to_string(earlier.listed.preset.order()),
                  inQuotes(later.names.back())});
}

bool usesOrder(PresetsDocument const& document) {
    return std::ranges::any_of(document.extractPresets(),
                               [](auto const& preset) { return preset.preset.order() != 0; });
}

/// Names that both may fit: those of each, and one of the first joined with one of the second.
std::vector<std::string> commonCandidates(Reachable const& a, Reachable const& b) {
    constexpr std::size_t JOINED = 4;
    std::vector<std::string> names = a.names;
    names.insert(names.end(), b.names.begin(), b.names.end());
    if (a.hasOneName || b.hasOneName)
        return names;
    for (std::size_t i = 0; i < std::min(JOINED, a.names.size()); ++i) {
        for (std::size_t j = 0; j < std::min(JOINED, b.names.size()); ++j) {
            names.push_back(a.names[i] + b.names[j]);
            names.push_back(b.names[j] + a.names[i]);
        }
    }
    return names;
}

/// A name that both fit, unless the first gets all names of the second.
std::optional<std::string> sharedName(Reachable const& first, Reachable const& second) {
    if (haveOtherNames(first, second) || first.fitsAll(second.names))
        return std::nullopt;
    std::vector<std::string> const names = commonCandidates(first, second);
    auto const shared = std::ranges::find_if(
        names, [&](std::string const& name) { return first.fits(name) && second.fits(name); });
    return shared == names.end() ? std::nullopt : std::optional(*shared);
}

void checkTie(Reachable const& earlier, Reachable const& later, Findings& findings) {
    int const order = later.listed.preset.order();
    if (earlier.listed.preset.order() != order)
        return;
    if (auto const name = sharedName(earlier, later))
        findings.add(OrderTie, later.listed.place,
                     {inWords(earlier.listed.preset), earlier.listed.place.pointer(), std::to_string(order),
                      inQuotes(*name)});
}

/// Programs give it to catch-alls, and to presets that are made for one document and age out.
void checkLastOrder(Reachable const& preset, Findings& findings) {
    constexpr int LAST = std::numeric_limits<int>::max();
    Cfg::ExtractPreset const& extract = preset.listed.preset;
    if (extract.order() == LAST && !extract.lastUsedIsSet() && !preset.fitsAll(ODD_NAMES))
        findings.add(LastOrder, preset.listed.place / "order", {std::to_string(LAST)});
}

bool hasEnding(std::string const& name) { return name.find('.') != std::string::npos; }

/// Whether the expression fits names, but none with an ending such as documents have.
bool fitsNoEnding(Reachable const& preset) {
    if (preset.names.empty() || std::ranges::any_of(preset.names, hasEnding))
        return false;
    for (std::string const& name : preset.names)
        for (char const* ending : {".pdf", ".txt", "a.pdf", " 1.pdf"})
            if (preset.fits(name + ending))
                return false;
    return true;
}

} // namespace

void checkMatches(PresetsDocument const& document, Findings& findings) {
    for (ListedExtractPreset const& listed : document.extractPresets()) {
        if (listed.match().empty()) {
            findings.add(EmptyMatch, listed.place);
            continue;
        }
        Reachable const preset = reachable(listed);
        if (fitsNoEnding(preset))
            findings.add(MatchWithoutEnding, listed.place / "match",
                         {inQuotes(preset.names.front()), inQuotes(listed.match() + ".*")});
    }
}

void checkReach(PresetsDocument const& document, Findings& findings) {
    std::vector<Reachable> const presets = allReachable(document);
    for (auto later = presets.begin(); later != presets.end(); ++later) {
        // What a parent offers may well be replaced here.
        if (later->names.empty() || later->listed.inherited)
            continue;
        auto const earlier = std::find_if(presets.begin(), later,
                                          [&](Reachable const& preset) { return shadows(preset, *later); });
        if (earlier != later)
            reportShadow(*earlier, *later, findings);
    }
}

void checkOrders(PresetsDocument const& document, Findings& findings) {
    if (!usesOrder(document))
        return;
    std::vector<Reachable> const presets = allReachable(document);
    for (auto later = presets.begin(); later != presets.end(); ++later) {
        checkLastOrder(*later, findings);
        for (auto earlier = presets.begin(); earlier != later; ++earlier)
            checkTie(*earlier, *later, findings);
    }
}

void checkErasedPresets(PresetsDocument const& document, Findings& findings) {
    for (ListedExtractPreset const& listed : document.extractPresets())
        if (listed.preset.eraseMe())
            findings.add(ErasedPresetMatches, listed.place / "erase_me");
}

} // namespace VlMail

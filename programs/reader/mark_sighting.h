#pragma once
// Where a page has the mark that begins a letter, or something so like it that it may have been meant.

#include "programs/reader/layout.h"
#include "programs/reader/pattern_time.h"
#include "programs/reader/reading_rules.h"
#include "programs/reader/trace.h"

#include "vlservice/extract/extract_preset.h"

#include <optional>
#include <string>
#include <vector>

namespace Reader {

struct MarkSighting {
    enum class Nearness {
        Found,  ///< it is the mark
        Nearly, ///< but for letter case, blanks, characters that look alike, or a zone that ends too early
        Label,  ///< only what stands in front of the value
    };

    /// Among the marks of the preset.
    std::size_t mark = 0;
    Nearness nearness = Nearness::Found;
    /// In one case and without blanks, to compare it; empty where only the label is.
    std::string value;
    /// The lines that it stands in.
    std::string text;
    Box box;
    /// What keeps it from being the mark, as a clause.
    std::string difference = {};
};

/// The marks of a preset and what is like them.
class MarkWatch {
public:
    /// Both must live longer. Zones that the rules put on other pages than a letter's first have no marks.
    MarkWatch(Cfg::ExtractPreset const& preset, ReadingRules const& rules);

    std::size_t count() const { return marks_.size(); }
    std::string const& nameOf(std::size_t mark) const { return marks_[mark].field->name(); }

    /// The marks that were found on a page.
    std::vector<MarkSighting> found(PageTrace const& trace) const;
    /// What is like a mark on a page that has none: of each mark the nearest. Stops when the time is up.
    std::vector<MarkSighting> nearly(Page const& page, Layout const& layout, PatternTime& time) const;

private:
    /// A pattern that is taken less exactly than it is written.
    struct Reading {
        Cfg::ExtractField field;
        bool isOfPlainText = false;
        char const* difference = "";
    };
    struct Mark {
        Cfg::ExtractZone const* zone;
        ZoneRules rules;
        Cfg::ExtractField const* field;
        /// Taken in all these ways together, then in one each.
        Reading loose;
        std::vector<Reading> single;
        /// None where the pattern begins with the value, or has too little in front of it.
        std::optional<Reading> label;
    };

    static Mark markOf(Cfg::ExtractZone const& zone, ZoneRules const* rules, Cfg::ExtractField const& field);
    std::optional<MarkSighting> nearly(Mark const& mark, Page const& page, Layout const& layout) const;

    std::vector<Mark> marks_;
};

/// In one case and without blanks.
std::string comparable(std::string_view text);

} // namespace Reader

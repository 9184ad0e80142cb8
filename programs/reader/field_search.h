#pragma once
// The fields of one letter, searched zone by zone.

#include "programs/reader/joined_search.h"
#include "programs/reader/pattern_time.h"
#include "programs/reader/reading_rules.h"
#include "programs/reader/trace.h"

#include "vlservice/extract/extracted_fields.h"

#include <cstddef>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace Reader {

/// What the search for one letter's fields has given.
struct FieldsFound {
    /// Validated.
    Cfg::ExtractedFields fields;
    /// The obligatory fields that were not found and have no default.
    std::vector<std::string> missing;
    /// What a person should know of values, a line each that begins with the field's name.
    std::vector<std::string> warnings;
};

/// The next place where a zone may be; nothing when there is no further one.
using NextView = std::function<std::optional<ZoneView>()>;

/// What the library says of a pattern that cannot be searched in a text. Throws std::bad_alloc when that was
/// for want of memory: such a field is not one that a letter does not have.
std::string const& requireMemory(std::string const& reason);

class FieldSearch {
public:
    /// `document` names it in messages; the rules and the time must live as long as the search.
    FieldSearch(std::string document, ReadingRules const& rules, PatternTime& time);

    /// Searches the zone's fields, which take their lines out of the text one after the other. Throws Error
    /// when a field's validation pattern fails, or the document's time for patterns is up; a failing
    /// extraction pattern is logged by the library and finds nothing.
    void search(Cfg::ExtractZone const& zone, ZoneView view);
    /// The same in the first of several places where one of the zone's fields is found. `order` tells where
    /// the zone stands among the others, whose order is that in which they were searched.
    void search(Cfg::ExtractZone const& zone, std::size_t order, NextView const& next);

    /// Searches ordinary fields of which no zone has a value again, each once, in joined lines of what is
    /// left of each zone's text. So no join takes from a field what it finds without. Throws what search()
    /// does.
    void searchJoinedLines();

    /// A field that separates letters was found.
    bool isMarked() const { return isMarked_; }
    /// What was seen so far, in the order of the zones.
    std::vector<ZoneTrace> zones() const;

    /// A trace gets the zones.
    FieldsFound finish(PageTrace* trace = nullptr);

private:
    /// One field in one zone.
    struct Try {
        std::shared_ptr<Cfg::ExtractedField> value = {};
        bool isFound = false;
        bool isTriedInJoinedLines = false;
        FieldTrace trace = {};
        PatternTime::Clock::duration spent = {};

        std::string const& name() const { return trace.definition->name(); }
        /// Of the values of a name the first of the highest rank counts.
        int rank() const { return isFound ? (trace.joined ? 1 : 2) : 0; }
    };
    /// A zone in one place.
    struct Sight {
        ZoneText text;
        ZoneTrace trace;
        std::vector<Try> fields = {};

        bool hasFound() const;
    };
    struct SearchedZone {
        Cfg::ExtractZone const* definition = nullptr;
        std::size_t order = 0;
        /// One, or all that were looked at in vain.
        std::vector<Sight> sights = {};
    };

    Sight searchAt(Cfg::ExtractZone const& zone, ZoneView view);
    void search(Cfg::ExtractField const& field, Sight& sight);
    void searchJoinedLines(Sight& sight);
    void searchJoinedLines(Try& field, ZoneText& text);
    /// Of a value in joined lines: the labels of other fields are none.
    Worth worthOf(Cfg::ExtractField const& field, Cfg::ExtractedField const& found) const;
    bool hasFound(std::string const& name) const;
    void takeValue(Try& field, std::shared_ptr<Cfg::ExtractedField> value);
    /// What `cut` gives of the field, in what is left of its time.
    template<typename Cut>
    std::shared_ptr<Cfg::ExtractedField> inTime(Try& field, Cut const& cut);
    void requireTime(Cfg::ExtractField const& field) const;
    std::string validate(Cfg::ExtractField const& field, Cfg::ExtractedField& value) const;
    std::vector<Try*> countingTries();
    void hand(Try& counting);

    std::string document_;
    ReadingRules const& rules_;
    PatternTime& time_;
    std::vector<SearchedZone> zones_;
    FieldsFound found_;
    bool isMarked_ = false;
};

/// Whether finding the field begins a letter.
bool separatesLetters(Cfg::ExtractField const& field);

/// Takes one field out of a zone's text: not validated, or its default, or null. Fills the trace but for its
/// value and whether it counts.
std::shared_ptr<Cfg::ExtractedField> cutField(Cfg::ExtractField const& field, ZoneText& text,
                                              FieldTrace& trace);

} // namespace Reader

#pragma once
// One field that a letter misses, and the means to search it in another way: what the kinds of near misses
// share.

#include "programs/vlmail/explain/near_miss.h"

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

namespace VlMail {

/// Patterns are tried so often at most for one kind of near miss.
constexpr std::size_t MAX_TRIES = 300;

/// A match of the field somewhere else or in another way.
struct Hit {
    Reader::Stretch match;
    bool isValid = false;
};

/// A match in a text that has no place on the page: its first byte and the one behind its last.
struct PlainHit {
    std::size_t begin = 0;
    std::size_t end = 0;
    bool isValid = false;
};

/// What one way to look for near misses gives.
struct Found {
    std::string says;
    std::string text = {};
    /// 0 when the text stands nowhere.
    int page = 0;
    Reader::Box box = {};
    /// The field would have a valid value; or the cause is certain.
    bool isValid = false;
    /// As NearMiss has it.
    json::Value change = {};

    Found by(json::Value what) && {
        change = std::move(what);
        return std::move(*this);
    }
};

class Search {
public:
    /// All of them must live as long as the search.
    Search(MissedField const& missed, ReadPages& pages, LaidOutPage const& page,
           Reader::PatternTime::Turn const& turn)
        : missed_(missed), pages_(pages), page_(page), turn_(turn), searchedText_(remaining(textOn(page))) {}

    MissedField const& missed() const { return missed_; }
    Reader::FieldTrace const& trace() const { return missed_.field; }
    Cfg::ExtractField const& field() const { return *missed_.field.definition; }
    std::string const& pattern() const { return field().strRegex(); }
    Cfg::ExtractZone const& zone() const { return *missed_.zone.definition; }
    /// Such as: zone "Info".
    std::string zoneName() const;
    /// On the page, and what the settings tell it from there.
    Reader::Box location() const { return *missed_.zone.place.location; }
    Reader::Point origin() const { return missed_.zone.place.origin(); }
    Reader::Point point() const { return missed_.zone.place.point; }
    int pageNumber() const { return missed_.page(); }
    LaidOutPage const& page() const { return page_; }
    ReadPages& pages() const { return pages_; }
    /// The letter's other pages that are looked at.
    std::vector<int> otherPages() const;

    /// It was found, but its value was refused.
    bool isRefused() const { return trace().rawText || trace().isTooWide; }
    /// The pattern begins at the beginning of the text: in other places of the letter it means nothing.
    bool takesWholeText() const { return pattern().starts_with("\\A"); }
    /// Whether a hit says anything: another refused value is no help where there is one already.
    bool helps(bool isValid) const { return isValid || !isRefused(); }

    /// The zone's text on that page; its anchor, where it has one, is searched there.
    Reader::ZoneText textOn(LaidOutPage const& page) const { return textOn(page, zone()); }
    /// The same of another zone of the preset.
    Reader::ZoneText textOn(LaidOutPage const& page, Cfg::ExtractZone const& zone) const;
    /// The same with another location.
    Reader::ZoneText textInside(Reader::Box const& location) const;
    static Reader::ZoneText everythingOn(LaidOutPage const& page);
    /// What the fields that are searched earlier leave of the text.
    Reader::ZoneText remaining(Reader::ZoneText text) const;
    /// The text in which the field was searched.
    Reader::ZoneText const& searchedText() const { return searchedText_; }
    std::vector<Reader::FieldTrace const*> earlierFields() const;

    /// The field with another pattern.
    Cfg::ExtractField withPattern(std::string const& pattern) const;

    // Searches. They find nothing any more when patterns have failed too often, each of which may have cost
    // seconds, or the time is up.

    bool isGivenUp() const;
    /// Why patterns could not be searched, in the engine's words.
    std::vector<std::string> const& failures() const { return failures_; }

    /// Takes the hit's lines out of the text, as reading does, joined lines too.
    std::optional<Hit> cut(Cfg::ExtractField const& field, Reader::ZoneText& text) const;
    std::optional<Hit> find(Cfg::ExtractField const& field, Reader::ZoneText text) const {
        return cut(field, text);
    }
    std::optional<Hit> find(Reader::ZoneText text) const { return cut(field(), text); }
    std::optional<PlainHit> find(Cfg::ExtractField const& field, std::string text) const;

    /// The hit as a near miss, if there is one that helps; `says` is asked for its words.
    template<typename Says>
    std::optional<Found> told(std::optional<Hit> const& hit, int pageNumber, Says const& says) const {
        if (!hit || !helps(hit->isValid))
            return std::nullopt;
        return Found{says(*hit), hit->match.text, pageNumber, hit->match.box, hit->isValid};
    }

private:
    std::shared_ptr<Cfg::ExtractedField> cutAsItStands(Cfg::ExtractField const& field, Reader::ZoneText& text,
                                                       Reader::FieldTrace& trace) const;

    MissedField const& missed_;
    ReadPages& pages_;
    LaidOutPage const& page_;
    Reader::PatternTime::Turn const& turn_;
    /// A search that fails is remembered, whoever asked for it.
    mutable std::vector<std::string> failures_;
    Reader::ZoneText searchedText_;
};

/// Keeps the first candidate that gives a valid value, and before there is one the first of all.
class Best {
public:
    void offer(std::optional<Found> candidate) {
        if (candidate && (!best_ || (candidate->isValid && !best_->isValid)))
            best_ = std::move(candidate);
    }
    bool isValid() const { return best_ && best_->isValid; }
    std::optional<Found> take() { return std::move(best_); }

private:
    std::optional<Found> best_;
};

} // namespace VlMail

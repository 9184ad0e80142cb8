#pragma once
// Letters as one HTML page for people: each with the picture of its page, over it what was searched and found
// where, beside it a table of the fields. The page stands alone: it loads nothing and runs nothing.

#include "programs/reader/geometry.h"

#include <cstddef>
#include <string>
#include <vector>

namespace VlMail::Report {

struct Field {
    enum class State {
        Found,
        Default,  ///< nothing was found, and the settings have a value for that
        Unused,   ///< another field of the same name counts
        NotFound, ///< and nobody minds
        Invalid,
        Missing, ///< not found, although obligatory
    };

    /// Where the name stands at the match, at the first of its boxes.
    enum class Tag { Behind, InFront, Above };

    std::string name;
    std::string value = {};
    State state = State::Found;
    /// What there is to add, for people.
    std::string note = {};
    /// Where the pattern matched: one box, or one for each of the lines that were joined; empty without a
    /// match.
    std::vector<Reader::Box> match = {};
    Tag tag = Tag::Behind;
};

struct Zone {
    std::string name;
    /// Where it lies on its page.
    Reader::Box box;
    /// A recipient address is searched in it.
    bool isAddressWindow = false;
    /// Found by its most probable point: the box is around the text that was nearest.
    bool isByPoint = false;
    std::vector<Field> fields = {};
    /// Among the sheets of its letter.
    std::size_t sheet = 0;
    /// Why it lies nowhere; then it is not drawn.
    std::string whyNowhere = {};
};

/// A page of a letter on which fields were searched.
struct Sheet {
    int page = 1;
    /// As shown, in 1/100 mm.
    int width = 0;
    int height = 0;
    /// A picture of it, or else why there is none.
    std::string png = {};
    std::string whyNoPicture = {};
};

/// What would go wrong with a letter on paper.
struct Fault {
    std::string code;
    bool isError = true;
    /// In words.
    std::string pages;
    std::string says;
    std::string fix;
    /// Drawn at the box on each of these, by their places among the sheets of the letter; none without one.
    std::vector<std::size_t> sheets = {};
    Reader::Box box = {};
};

/// A side of paper, small.
struct Side {
    enum class Kind { Page, Blank, Attachment, Cover };

    Kind kind = Kind::Page;
    /// In 1/100 mm.
    int width = 0;
    int height = 0;
    /// Of the letter's document, or of the attachment; from 1.
    int page = 0;
    /// Its place in the pack preset's list, and the id that it has there.
    std::size_t attachment = 0;
    std::string id = {};
    /// None of a blank side.
    std::string png = {};
};

/// Such as "page 2 of "terms"".
std::string inWords(Side const& side);

struct Letter {
    /// All its pages in words.
    std::string pages;
    /// Why it cannot go out; empty when it can.
    std::string whyNot = {};
    /// Its first page, and others on which zones or faults lie.
    std::vector<Sheet> sheets = {};
    std::vector<Zone> zones = {};
    std::vector<Fault> faults = {};
    /// All that goes out, in its order, where that is more than its pages.
    std::vector<Side> sides = {};
};

struct Document {
    std::string name;
    /// When it could not be read; the rest is empty then.
    std::string error = {};
    std::string extractPreset = {};
    std::string packPreset = {};
    bool isAttachment = false;
    std::vector<Letter> letters = {};
};

/// A document's part of the page. Its anchors begin with "d" and `place`, which is from 1 and another for
/// each document of a page.
std::string section(Document const& document, std::size_t place);

/// A document in the overview.
struct Entry {
    std::string name;
    /// Such as "2 letters, 1 cannot go out".
    std::string state;
    bool isTrouble = false;
    /// As section() gives it for the entry's place.
    std::string section = {};
};

/// The whole page. `outcome` sums it up in words.
std::string page(std::string const& outcome, std::vector<Entry> const& entries);

} // namespace VlMail::Report

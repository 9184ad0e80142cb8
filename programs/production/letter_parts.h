#pragma once
// What a letter is made of on paper: parts in their order, the letterheads on their pages, blank sides and
// sheets. Decided without looking at any page.

#include "programs/reader/page.h"
#include "vlservice/presets/letterhead_inf.h"
#include "vlservice/presets/pack_preset.h"

#include <cstddef>
#include <string>
#include <vector>

namespace Production {

/// Pages that belong together: letterheads begin anew with each part, and so does a sheet with duplex.
struct Part {
    enum class Kind {
        FirstLetter, ///< alone, or the first of the letters that go out as one
        LaterLetter,
        Attachment,
    };

    Kind kind = Kind::FirstLetter;
    /// Of an attachment, as the pack preset has it.
    std::string id = {};

    bool isAttachment() const { return kind == Kind::Attachment; }
};

/// Whether the letterhead is meant for pages of this part.
bool appliesTo(Part const& part, Cfg::LetterheadInf const& letterhead);

/// A page of a letterhead that lies on a page.
struct Layer {
    /// Among the letterheads of the pack preset.
    std::size_t letterhead = 0;
    /// From 1.
    int page = 1;

    friend bool operator==(Layer const&, Layer const&) = default;
};

struct Layers {
    /// Both from below.
    std::vector<Layer> under = {};
    std::vector<Layer> over = {};

    bool empty() const { return under.empty() && over.empty(); }

    friend bool operator==(Layers const&, Layers const&) = default;
};

/// What lies on page `number`, from 1, of a part. `pageCounts` are those of the letterheads, one each.
Layers layersOn(int number, Part const& part, std::vector<Cfg::LetterheadInf> const& letterheads,
                std::vector<int> const& pageCounts);

/// Attachments, as positions in the pack preset's list, in the order in which they go out.
struct AttachmentOrder {
    std::vector<std::size_t> inFront = {};
    std::vector<std::size_t> behind = {};
};

AttachmentOrder orderOf(std::vector<Cfg::PackPreset::Attachment> const& attachments);

enum class Sides { One, Both };

/// Whether a part of so many pages that another one follows ends with a blank side.
bool endsWithBlank(int pages, Sides sides);

/// `pageCounts` are those of a letter's parts, without blank sides.
long long sheetsOf(std::vector<int> const& pageCounts, Sides sides);

using Reader::PageSize;

/// Within 2 mm in both directions.
bool areAlike(PageSize one, PageSize other);

/// By how many quarters a page is turned clockwise for a pack preset's orientation: one that is wider than
/// high stands upright with its upper edge to the left, and the other way back lies across.
int quarterTurnsFor(PackForcedOrientation orientation, PageSize page);

} // namespace Production

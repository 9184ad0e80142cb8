#pragma once
// What a page of a document has beside what is printed of it.

#include "programs/reader/geometry.h"

#include <string>
#include <vector>

namespace Reader {

/// A note, a film or a form's field, which a screen shows and a print does not.
struct LostAnnotation {
    /// For people: "a note", "a film".
    std::string kind;
    Box box;
};

struct PageExtras {
    /// Names of the fonts that the document uses on the page and does not carry.
    std::vector<std::string> fontsNotEmbedded;
    std::vector<LostAnnotation> lostAnnotations;
};

} // namespace Reader

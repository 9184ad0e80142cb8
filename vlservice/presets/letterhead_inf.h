#pragma once
// One letterhead of a pack preset: the document with it, and the pages of a mailing that it applies to.

#include "vlservice/export.h"
#include "vlservice/json/json.h"
#include "vlservice/json/record_keys.h"

#include <string>
#include <vector>

namespace Cfg {

/// A plain record; copies share the additional JSON node.
struct VLSERVICE_EXPORT LetterheadInf {
    LetterheadInf() = default;
    LetterheadInf(std::string document, bool notForLetters, bool notForAttachments, bool repeatLast,
                  bool firstGroupedOnly, bool aboveContent);
    /// From the id as a string, or from an object with "id".
    /// Throws json::Exc for anything else and for attachments that are no list of strings.
    LetterheadInf(json::Value const& value);

    /// Whether no document is named, whatever the other members hold.
    bool empty() const { return id.empty(); }

    /// An object when one of the flags is set, otherwise the id as a string.
    /// Deliberate: the string form drops `whichAttachments` and `additional`.
    json::Value serialize() const;
    static json::RecordKeys const& keys();

    /// `additional` is not compared.
    bool operator==(LetterheadInf const& other) const;
    bool operator!=(LetterheadInf const& other) const { return !(*this == other); }

    std::string id; ///< of the document
    bool skipLetters = false;
    bool skipAttachments = false;
    std::vector<std::string> whichAttachments;
    bool repeatLastPage = false;
    bool applyFirstGroupedOnly = false; ///< only on the first of grouped letters
    bool onTop = false;                 ///< above the page's content
    json::Value additional;             ///< unknown keys as an object, or the empty handle
};

} // namespace Cfg

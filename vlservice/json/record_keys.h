#pragma once
// What a record's keys are and how each is read, for those who check documents, show where values come from
// or describe them: they ask the record, `Cfg::App::keys()` or `Cfg::ExtractField::keys()`, and keep no list
// of their own.

#include "vlservice/export.h"

#include <string>
#include <string_view>
#include <vector>

namespace json {

struct RecordKeys;

/// How a value is read.
enum class KeyType {
    Text,
    Flag,   ///< only JSON true sets it
    Int32,  ///< cut to 32 bits
    UInt32, ///< the same without a sign
    Int64,
    UInt64,  ///< the same without a sign
    Bits,    ///< a word of flag bits, with rules of its own on them
    Number,  ///< integer or real
    Record,  ///< an object
    Records, ///< a list of objects
    Numbers, ///< a list of integers
    Texts,   ///< a list of texts
    Any,     ///< whatever stands there; rules of its own hold for it
};

/// What becomes of a value of another type.
enum class KeyUse {
    Lenient,  ///< it reads as the default
    Checked,  ///< it is refused
    Required, ///< the same, and so is a missing one
    Dropped,  ///< the key is another program's: it is read by nobody and not kept
};

/// Where the form of an inherited value may stand, `{"inh": true, "v": VALUE}`.
enum class Inheritance {
    None,
    Whole,      ///< around the value
    ByElements, ///< around each element of the list
};

/// A type with the keys of its records.
struct KeyForm {
    KeyType type; ///< of a value
    /// Of a Record, or of each of the Records; null for other types.
    RecordKeys const* record = nullptr;
};

struct KeyRow {
    std::string name;             ///< as it is written
    KeyForm form;                 ///< what it holds
    KeyUse use = KeyUse::Lenient; ///< what becomes of another type
    /// What a missing key reads as, as JSON text, in a settings part the default of the root. Empty when that
    /// is no value at all.
    std::string missing = {};
    Inheritance inheritance = Inheritance::None; ///< in a settings part
};

/// The keys of a record in the order in which they are written, those that are dropped behind them.
struct VLSERVICE_EXPORT RecordKeys {
    std::vector<KeyRow> rows; ///< a row for each key
    /// Keys without a row are kept and written back.
    bool keepsOthers = false;
    /// A text may stand for the object: the value of its first key.
    bool mayBeText = false;

    /// Null when there is none.
    KeyRow const* find(std::string_view name) const;
};

} // namespace json

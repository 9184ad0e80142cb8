#pragma once
// The keys that settings documents may have, record by record, and how each is read.

#include <cstdint>
#include <span>
#include <string>

namespace VlMail {

struct RecordKeys;

/// How a value is read, and what stands for one that is missing or of another type.
enum class KeyType {
    Text,    ///< reads as empty
    Flag,    ///< only JSON true sets it
    Int32,   ///< cut to 32 bits; reads as 0
    UInt32,  ///< the same without a sign
    Int64,   ///< reads as 0
    UInt64,  ///< the same without a sign
    Number,  ///< integer or real; reads as the default
    Record,  ///< an object
    Records, ///< a list of objects
    Numbers, ///< a list of integers
    Texts,   ///< a list of texts
    Any,     ///< looked at elsewhere
};

enum class KeyUse {
    Lenient,  ///< a value of another type reads as the default
    Checked,  ///< a value of another type is refused
    Required, ///< the same, and so is a missing one
    Dropped,  ///< read by nobody and not kept
};

struct KeyRow {
    char const* name;
    KeyType type;
    KeyUse use = KeyUse::Lenient;
    /// Of a Record, or of each of the Records.
    RecordKeys const* record = nullptr;
    /// What a value of another type reads as, where it is not the type's own.
    char const* missing = nullptr;
};

struct RecordKeys {
    std::span<KeyRow const> rows;
    /// Keys without a row are kept and written back.
    bool keepsOthers = false;
    /// May stand as a text, the id, instead of an object.
    bool mayBeText = false;
    /// Each value may be wrapped as an inherited one.
    bool wrapsValues = false;
    /// The record itself may be, as an element of a list.
    bool mayBeWrapped = false;
};

struct PartKeys {
    char const* name;
    RecordKeys const* record;
};

/// The settings parts of a node.
std::span<PartKeys const> partKeys();

extern RecordKeys const PRESETS_KEYS;

/// Of the candidates the one that the name was probably meant to be; empty when none is near.
std::string nearestName(std::string const& name, std::span<std::string const> candidates);

} // namespace VlMail

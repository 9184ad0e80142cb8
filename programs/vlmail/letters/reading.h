#pragma once
// What reading a document by the presets has given, and its JSON form, in which worker processes hand it
// over.

#include "vlservice/extract/extracted_fields.h"
#include "vlservice/pack/shared_mem_buffer.h"
#include "vlservice/presets/presets.h"

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace VlMail {

class NodeSettings;

struct LetterReading {
    /// From 1.
    std::vector<int> pages;
    Cfg::ExtractedFields fields;
    /// The obligatory fields that the letter does not have. They do not keep it from going out.
    std::vector<std::string> missing = {};

    /// Whether the letter can go out. Otherwise `message` has the library's words, which are empty when the
    /// letter has no address to go to.
    bool isProductionReady(std::string& message) const { return fields.isProductionReady(message); }
    /// Why the letter cannot go out, for people; empty when it can.
    std::string whyNot() const;
};

struct DocumentReading {
    std::string document;
    /// One line, when the document could not be read; of the rest only the trace is set then.
    std::string error;
    /// The match text of the extraction preset, and what it is called.
    std::string extractPreset;
    std::string extractPresetName;
    std::string packPreset;
    /// None for an attachment, which holds no letters.
    std::optional<std::vector<LetterReading>> letters;
    /// How it came about, as docs/explain.md tells; there only when it was asked for, also with an error.
    json::Value trace = {};

    bool failed() const { return !error.empty(); }
    bool isAttachment() const { return !failed() && !letters; }

    /// {"document", "extract_preset", "pack_preset", "letters"}, or {"document", "error"}; and "trace".
    /// A letter is {"pages", "fields", "production_ready", "message", "primary_address"}, and "missing" when
    /// it misses obligatory fields.
    json::Object toJson() const;
    /// Takes what toJson() gives. Throws json::Exc.
    static DocumentReading fromJson(json::Object const& object);
};

/// A page of a document, compressed as containers and databases keep it.
struct PageBlob {
    int number = 0;
    SharedMemBuffer data;
};

/// A document as read, and on request the pages of its letters.
struct ReadResult {
    DocumentReading reading;
    /// Of the file; empty when it could not be read.
    std::string sha256 = {};
    /// For each letter of the reading the blobs of its pages, when they were asked for; none for a letter
    /// that cannot go out.
    std::vector<std::vector<PageBlob>> pages = {};
    /// The document's section of a report, when it was asked for and there are letters.
    std::string report = {};
};

json::Array toJsonArray(std::vector<int> const& numbers);

/// What comes along with the letters, as a set.
enum class Along : unsigned {
    Nothing = 0,
    Pages = 1,
    Report = 2,
    /// How the letters came about, as the reading's `trace`.
    Trace = 4,
};

constexpr Along operator|(Along one, Along other) {
    return static_cast<Along>(static_cast<unsigned>(one) | static_cast<unsigned>(other));
}
constexpr bool contains(Along set, Along one) {
    return (static_cast<unsigned>(set) & static_cast<unsigned>(one)) != 0;
}

/// Reads a document as the settings say; `place` is its place in a report, from 1. Failures are the reading's
/// `error`; nothing derived from std::exception is thrown.
ReadResult readDocument(std::filesystem::path const& file, Cfg::Presets const& presets,
                        NodeSettings const& settings, Along along, std::size_t place);

/// The pages of a document that was read before, for the letters that can go out. A document that is not the
/// one with that digest any more is a failure, said in the reading's `error`.
ReadResult splitDocument(std::filesystem::path const& file, std::string const& sha256,
                         DocumentReading reading);

} // namespace VlMail

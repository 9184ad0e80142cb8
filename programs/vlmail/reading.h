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

    /// Whether the letter can go out. Otherwise `message` has the library's words, which are empty when the
    /// letter has no address to go to.
    bool isProductionReady(std::string& message) const { return fields.isProductionReady(message); }
    /// Why the letter cannot go out, for people; empty when it can.
    std::string whyNot() const;
};

struct DocumentReading {
    std::string document;
    /// One line, when the document could not be read; nothing else is set then.
    std::string error;
    /// The match text of the extraction preset, and what it is called.
    std::string extractPreset;
    std::string extractPresetName;
    std::string packPreset;
    /// None for an attachment, which holds no letters.
    std::optional<std::vector<LetterReading>> letters;

    bool failed() const { return !error.empty(); }
    bool isAttachment() const { return !failed() && !letters; }

    /// {"document", "extract_preset", "pack_preset", "letters"}, or {"document", "error"}.
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
    /// For each letter of the reading the blobs of its pages; empty for a letter that cannot go out.
    std::vector<std::vector<PageBlob>> pages;
};

enum class WithPages { No, Yes };

/// Reads a document as the settings say. Failures are the reading's `error`; nothing derived from
/// std::exception is thrown.
ReadResult readDocument(std::filesystem::path const& file, Cfg::Presets const& presets,
                        NodeSettings const& settings, WithPages withPages);

} // namespace VlMail

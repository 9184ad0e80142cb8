#pragma once
// What reading a document by the presets has given, and its JSON form, in which worker processes hand it
// over.

#include "programs/base/error_code.h"
#include "programs/production/finding.h"
#include "programs/reader/letter_joins.h"
#include "programs/vlmail/letters/page_blob.h"
#include "vlservice/extract/extracted_fields.h"
#include "vlservice/presets/presets.h"

#include <cstddef>
#include <filesystem>
#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace Base::Schema {
class Members;
} // namespace Base::Schema

namespace Reader {
class Document;
struct Trace;
} // namespace Reader

namespace VlMail {

class MakingReady;
class NodeSettings;
class PresetIndex;

struct LetterReading {
    /// From 1.
    std::vector<int> pages;
    Cfg::ExtractedFields fields;
    /// The obligatory fields that the letter does not have. They do not keep it from going out.
    std::vector<std::string> missing = {};
    /// Its pages in their order, when they were asked for; none of a letter that cannot go out.
    std::vector<PageBlob> blobs = {};
    /// What a person should know of the values, one line each.
    std::vector<std::string> warnings = {};
    /// Those of its pages that would not look like the document's. They keep it from going out.
    std::vector<int> differingPages = {};
    /// Those of its pages that may begin another letter. They keep it from going out.
    std::vector<Reader::DoubtfulJoin> doubtfulJoins = {};
    /// What would go wrong with it on paper, when that was asked for, and why its pages cannot be made ready.
    /// Errors keep it from going out.
    std::vector<Production::Finding> findings = {};
    /// The address for a cover page in front of the letter; empty without one.
    std::string coverAddress = {};
    /// The cover page, when pages were asked for and there is one.
    std::vector<PageBlob> cover = {};
    /// By which the service knows it again, where its pages were asked for; 64 hexadecimal digits.
    std::string digest = {};
    /// What of it the settings do not allow, "code: line". It keeps the letter from going out.
    std::string refusal = {};

    /// Whether the letter can go out. Otherwise `message` has the library's words, which are empty when the
    /// letter has no address to go to.
    bool isProductionReady(std::string& message) const { return fields.isProductionReady(message); }
    /// Why the letter cannot go out, for people; empty when it can.
    std::string whyNot() const;
    /// The code that stands in front of it; empty when there is none.
    std::string codeOfWhyNot() const;
};

struct DocumentReading {
    std::string document;
    /// One line, when the document could not be read; of the rest only the trace is set then.
    std::string error;
    /// Of the error, when there is one.
    Base::Code code = Base::Code::Unexpected;
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

    /// {"document", "extract_preset", "pack_preset", "letters"}, or {"document", "error", "code"}; and
    /// "trace".
    /// A letter is {"pages", "fields", "production_ready", "message", "primary_address"}, and where there are
    /// any "missing", the names of obligatory fields, "warnings", "differing_pages", "not_separated",
    /// "findings" and "cover_page".
    json::Object toJson() const;
    /// Takes what toJson() gives. Throws json::Exc.
    static DocumentReading fromJson(json::Object const& object);
    /// The keys of that object, as a JSON schema's; letters are the definition LETTER_DEFINITION.
    static void describe(Base::Schema::Members& into);
};

/// As schemas name a letter's object.
inline constexpr char const* LETTER_DEFINITION = "letter";
/// Its fields are the definition Mailing::EXTRACTED_FIELD.
json::Object letterSchema();

/// A document as read.
struct ReadResult {
    DocumentReading reading;
    /// Of the file, when it was asked for; empty when it could not be read.
    std::string sha256 = {};
    /// The document's section of a report, when Along::afterReading makes one.
    std::string report = {};
};

json::Array toJsonArray(std::vector<int> const& numbers);

/// A document where it has been read, with how its letters came about.
struct OpenDocument {
    Reader::Document& document;
    Cfg::ExtractPreset const& preset;
    Cfg::PackPreset const& packPreset;
    Reader::Trace const& trace;
    /// Among those of the batch, from 1.
    std::size_t place;
};

/// What comes along with a document's letters. The functions run where the document is read, which may be a
/// worker process: they change the result and nothing else. What they throw is the reading's `error`.
struct Along {
    /// The pages of letters that can go out: none, what is known of them without writing them, or all.
    enum class Pages { No, Planned, Yes };
    enum class Digest : bool { No, Yes };
    /// Whether pages that may begin another letter keep theirs from going out, or are only told of.
    enum class Joins : bool { Doubt, Accept };
    /// Whether it is looked what would go wrong with the letters on paper, for which every page is drawn.
    enum class Checks : bool { No, Yes };

    Pages pages = Pages::No;
    Digest digest = Digest::No;
    Joins joins = Joins::Doubt;
    Checks checks = Checks::No;
    /// Whether a letter is held against the settings' limit by itself. Who makes mailings asks for them
    /// whole.
    enum class Limits : bool { No, Yes };
    Limits limits = Limits::No;
    /// Of the pages that are written, the first and every so many behind it are held against the document's.
    std::size_t checkEvery = 1;
    /// What pages are made ready with; they are left as they are without it. It outlives the batch.
    MakingReady* making = nullptr;
    /// Called with the document's name alone, before it is opened.
    std::function<void(ReadResult&, Cfg::Presets const&)> beforeReading = {};
    /// Called when its letters are there; an attachment has none.
    std::function<void(ReadResult&, OpenDocument const&)> afterReading = {};
};

/// Reads a document as the settings say; `place` is among those of the batch, from 1. Failures are the
/// reading's `error`; nothing derived from std::exception is thrown.
ReadResult readDocument(std::filesystem::path const& file, PresetIndex const& presets,
                        NodeSettings const& settings, Along const& along, std::size_t place);

/// The same with a document that is open already.
ReadResult readDocument(Reader::Document& document, PresetIndex const& presets, NodeSettings const& settings,
                        Along const& along);

/// A document whose letters have been decided on.
struct DecidedDocument {
    /// Absolute.
    std::filesystem::path file;
    std::string sha256;
    DocumentReading reading;
};

/// The pages of those of its letters that can go out, made ready as the pack preset of that name in `presets`
/// says. A document that is not the one with that digest any more is a failure, said in the reading's
/// `error`.
ReadResult splitDocument(DecidedDocument decided, Cfg::Presets const& presets, std::size_t checkEvery,
                         MakingReady& making);

} // namespace VlMail

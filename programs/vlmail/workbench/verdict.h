#pragma once
// What settings make of a document in short, and whether others make more of it.

#include "programs/vlmail/letters/reading.h"
#include "vlservice/extract/extract_zones.h"

#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace VlMail::Workbench {

/// What was expected of a document beside which a golden case lies.
struct GoldenVerdict {
    bool isOk = false;
    /// The expectation cannot be used.
    bool isFailed = false;
    /// A sentence each.
    std::vector<std::string> differences = {};
};

struct DocumentVerdict {
    struct Value {
        std::string text;
        bool isValid = false;
    };

    DocumentReading reading;
    /// By their fields; of several letters their numbers stand in front.
    std::map<std::string, Value> values = {};
    std::optional<GoldenVerdict> golden = {};

    std::size_t readyLetters() const;
    json::Object toJson() const;
};

/// "ready", "trouble", "attachment" or "failed".
char const* verdictWord(DocumentReading const& reading);

/// Takes a reading; the definitions tell why values differ from what is expected in the file, if it is there.
DocumentVerdict verdictOf(DocumentReading reading, std::filesystem::path const& expectation,
                          Cfg::ExtractZones const& definitions);

struct Comparison {
    enum class Change { Same, Other, Better, Worse };

    Change change = Change::Same;
    /// A line each, such as: total: nothing -> 12.30.
    std::vector<std::string> lines = {};
};

char const* nameOf(Comparison::Change change);

/// Whatever is lost makes it worse, also beside what is won.
Comparison compare(DocumentVerdict const& before, DocumentVerdict const& after);

} // namespace VlMail::Workbench

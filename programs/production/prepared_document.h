#pragma once
// Letterheads and attachments: documents that a pack preset names by an id, as pages that stand alone.

#include "programs/production/finding.h"
#include "programs/production/letter_parts.h"

#include <cstddef>
#include <filesystem>
#include <map>
#include <string>
#include <vector>

namespace Production {

// How the lines begin that say why a document cannot be used.
constexpr char const* DOCUMENT_UNKNOWN = "document-unknown: ";
constexpr char const* DOCUMENT_DAMAGED = "document-damaged: ";
constexpr char const* DOCUMENT_SIZE = "document-size: ";

constexpr std::size_t MAX_DOCUMENT_BYTES = std::size_t{64} << 20;
constexpr int MAX_DOCUMENT_PAGES = 500;

struct PreparedPage {
    /// Of this page alone.
    std::string pdf;
    PageSize size;
    bool isColoured = false;
};

struct PreparedDocument {
    /// A code and one line, when it cannot be used; it has no pages then.
    std::string error = {};
    /// Of the document, 64 hexadecimal digits; empty when there is none.
    std::string sha256 = {};
    std::vector<PreparedPage> pages = {};
    /// From 1: those with contents that are damaged.
    std::vector<int> redrawnPages = {};
};

/// By id.
using PreparedDocuments = std::map<std::string, PreparedDocument>;

/// Whether an id can name a document: it has to be a safe file name.
bool isDocumentId(std::string const& id);

/// Why a file of more than MAX_DOCUMENT_BYTES cannot be used, for those who look at its size before reading
/// it.
std::string whyTooLarge(std::filesystem::path const& name);

/// What stands behind a code and in front of the last semicolon of such a line is what is wrong, the rest
/// what to do.
Finding findingOf(std::string const& line);

/// Takes a document apart; `name` stands for it in messages and tells its kind by its ending. What is wrong
/// with it is the result's error; nothing derived from std::exception is thrown but std::bad_alloc.
PreparedDocument prepare(std::string bytes, std::filesystem::path const& name);

} // namespace Production

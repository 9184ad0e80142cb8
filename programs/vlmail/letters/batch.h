#pragma once
// Reading many documents at once.

#include "programs/vlmail/letters/reading.h"
#include "programs/vlmail/terminal/terminal.h"

#include <functional>

namespace VlMail {

class NodeSettings;

/// Reads the files by the settings, on up to `workers` processes, and hands each result over in the order of
/// the files. Shows progress where a person watches. A document that brings its reader down has that for its
/// error.
void readBatch(std::vector<std::string> const& files, NodeSettings const& settings, std::size_t workers,
               Along const& along, Terminal const& terminal,
               std::function<void(std::size_t, ReadResult)> const& take);

/// The same with the pages of documents that were read before, as splitDocument() gives them.
void splitBatch(std::vector<DecidedDocument> const& documents, std::size_t workers, Terminal const& terminal,
                std::function<void(std::size_t, ReadResult)> const& take);

} // namespace VlMail

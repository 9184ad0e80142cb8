#pragma once
// Reading many documents at once.

#include "programs/vlmail/letters/reading.h"
#include "programs/vlmail/letters/worker_pool.h"

#include <functional>
#include <string>

namespace VlMail {

class NodeSettings;

/// Told how far a batch is.
class BatchWatcher {
public:
    virtual ~BatchWatcher() = default;

    virtual void begins(std::size_t /*documents*/) {}
    /// In whatever order.
    virtual void documentsDone(std::size_t /*done*/) {}
    /// Before the result of a document with so many letters is handed over.
    virtual void handsOver(std::size_t /*letters*/) {}
};

/// Why a document has no result and what to do, as the rest of a line.
std::string inWords(JobFailure failure, JobLimits const& limits);

/// Reads the files by the settings in worker processes and hands each result over in the order of the files.
/// A document that brings its reader down, or takes more than it may, has that for its error.
void readBatch(std::vector<std::string> const& files, NodeSettings const& settings, Workers const& workers,
               Along const& along, BatchWatcher& watcher,
               std::function<void(std::size_t, ReadResult)> const& take);

/// The same with the pages of documents that were read before, as splitDocument() gives them.
void splitBatch(std::vector<DecidedDocument> const& documents, Cfg::Presets const& presets,
                Workers const& workers, std::size_t checkEvery, MakingReady& making, BatchWatcher& watcher,
                std::function<void(std::size_t, ReadResult)> const& take);

} // namespace VlMail

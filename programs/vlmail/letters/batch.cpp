#include "programs/vlmail/letters/batch.h"

#include "programs/base/utf8.h"
#include "programs/reader/document.h"
#include "programs/vlmail/letters/node_settings.h"
#include "programs/vlmail/letters/preset_index.h"
#include "programs/vlmail/letters/worker_pool.h"
#include "vlservice/json/json_text.h"

#include <filesystem>
#include <sstream>
#include <string_view>
#include <utility>

namespace VlMail {
namespace {

std::string pack(ReadResult const& result) {
    WorkerMessage message;
    std::ostringstream text;
    text << result.reading.toJson();
    message.put(std::move(text).str());
    message.put(result.sha256);
    message.put(result.report);
    if (result.reading.letters)
        for (LetterReading const& letter : *result.reading.letters) {
            put(message, letter.cover);
            put(message, letter.blobs);
            message.put(letter.digest);
        }
    return message.take();
}

ReadResult unpack(std::string bytes) {
    WorkerMessage message(std::move(bytes));
    std::string_view const json = message.bytes();
    ReadResult result{DocumentReading::fromJson(json::strToObject(json.data(), json.size()))};
    result.sha256 = message.text();
    result.report = message.text();
    if (result.reading.letters)
        for (LetterReading& letter : *result.reading.letters) {
            letter.cover = takeBlobs(message);
            letter.blobs = takeBlobs(message);
            letter.digest = message.text();
        }
    return result;
}

ReadResult unread(std::string const& file, JobFailure failure, JobLimits const& limits) {
    ReadResult result;
    result.reading.document = Base::validUtf8(std::filesystem::path(file).filename().string());
    result.reading.code = Base::Code::LimitExceeded;
    result.reading.error = "cannot read \"" + Base::validUtf8(file) + "\": " + inWords(failure, limits);
    return result;
}

void runBatch(std::size_t count, Workers const& workers, BatchWatcher& watcher,
              std::function<ReadResult(std::size_t)> const& work,
              std::function<std::string(std::size_t)> const& fileOf,
              std::function<void(std::size_t, ReadResult)> const& take) {
    watcher.begins(count);
    auto const consume = [&](std::size_t index, JobResult job) {
        auto const* const failure = std::get_if<JobFailure>(&job);
        ReadResult result = failure ? unread(fileOf(index), *failure, workers.limits)
                                    : unpack(std::get<std::string>(std::move(job)));
        watcher.handsOver(result.reading.letters ? result.reading.letters->size() : 0);
        take(index, std::move(result));
    };
    runJobs(
        count, workers, [&](std::size_t index) { return pack(work(index)); }, consume,
        [&](std::size_t done) { watcher.documentsDone(done); });
}

} // namespace

std::string inWords(JobFailure failure, JobLimits const& limits) {
    auto const seconds = [&] {
        std::string const milliseconds = std::to_string(limits.processor.count() % 1000);
        return std::to_string(limits.processor.count() / 1000) +
               (milliseconds == "0" ? "" : '.' + std::string(3 - milliseconds.size(), '0') + milliseconds);
    };
    switch (failure) {
    case JobFailure::Died:
        break;
    case JobFailure::OutOfTime:
        return "it took more than " + seconds() +
               " s of processor time; print it to a new PDF, or give --document-seconds a larger number";
    case JobFailure::OutOfMemory:
        return "it took more than " + std::to_string(limits.memory >> 20) +
               " MiB of memory; print it to a new PDF, or give --document-memory a larger number";
    case JobFailure::NoMemory:
        return "there is not enough memory for it; close other programs, or give --jobs a smaller number";
    }
    return "the reader broke down over it; the document is damaged, print it to a new PDF";
}

void readBatch(std::vector<std::string> const& files, NodeSettings const& settings, Workers const& workers,
               Along const& along, BatchWatcher& watcher,
               std::function<void(std::size_t, ReadResult)> const& take) {
    Cfg::Presets const presets = settings.presets();
    PresetIndex const presetIndex(presets);
    runBatch(
        files.size(), workers, watcher,
        [&](std::size_t at) { return readDocument(files[at], presetIndex, settings, along, at + 1); },
        [&](std::size_t index) { return files[index]; }, take);
}

void splitBatch(std::vector<DecidedDocument> const& documents, Cfg::Presets const& presets,
                Workers const& workers, std::size_t checkEvery, MakingReady& making, BatchWatcher& watcher,
                std::function<void(std::size_t, ReadResult)> const& take) {
    runBatch(
        documents.size(), workers, watcher,
        [&](std::size_t index) { return splitDocument(documents[index], presets, checkEvery, making); },
        [&](std::size_t index) { return documents[index].file.string(); }, take);
}

} // namespace VlMail

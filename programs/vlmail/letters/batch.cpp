#include "programs/vlmail/letters/batch.h"

#include "programs/base/utf8.h"
#include "programs/reader/document.h"
#include "programs/vlmail/letters/node_settings.h"
#include "programs/vlmail/letters/preset_index.h"
#include "programs/vlmail/letters/worker_pool.h"
#include "vlservice/json/json_text.h"

#include <cstdint>
#include <cstring>
#include <filesystem>
#include <sstream>
#include <utility>

namespace VlMail {
namespace {

/// What a worker hands over: numbers in the machine's order and byte strings behind their lengths.
class Message {
public:
    Message() = default;
    explicit Message(std::string bytes) : bytes_(std::move(bytes)) {}

    void put(std::uint64_t number) { bytes_.append(reinterpret_cast<char const*>(&number), sizeof number); }
    void put(void const* data, std::size_t size) {
        put(size);
        bytes_.append(static_cast<char const*>(data), size);
    }
    std::uint64_t number() {
        std::uint64_t number = 0;
        std::memcpy(&number, bytes_.data() + at_, sizeof number);
        at_ += sizeof number;
        return number;
    }
    /// The next byte string, valid as long as the message.
    std::pair<char const*, std::size_t> bytes() {
        std::size_t const size = number();
        at_ += size;
        return {bytes_.data() + at_ - size, size};
    }
    std::string take() { return std::move(bytes_); }

private:
    std::string bytes_;
    std::size_t at_ = 0;
};

void put(Message& message, std::vector<PageBlob> const& blobs) {
    message.put(blobs.size());
    for (PageBlob const& blob : blobs) {
        message.put(static_cast<std::uint64_t>(blob.number));
        message.put(blob.data.data(), blob.data.size());
    }
}

std::vector<PageBlob> takeBlobs(Message& message) {
    std::vector<PageBlob> blobs(message.number());
    for (PageBlob& blob : blobs) {
        blob.number = static_cast<int>(message.number());
        auto const [data, size] = message.bytes();
        blob.data = SharedMemBuffer::copyOf(data, size);
    }
    return blobs;
}

std::string pack(ReadResult const& result) {
    Message message;
    std::ostringstream text;
    text << result.reading.toJson();
    std::string const json = std::move(text).str();
    message.put(json.data(), json.size());
    message.put(result.sha256.data(), result.sha256.size());
    message.put(result.report.data(), result.report.size());
    if (result.reading.letters)
        for (LetterReading const& letter : *result.reading.letters)
            put(message, letter.blobs);
    return message.take();
}

ReadResult unpack(std::string bytes) {
    Message message(std::move(bytes));
    auto const [json, length] = message.bytes();
    ReadResult result{DocumentReading::fromJson(json::strToObject(json, length))};
    auto const [digest, digestLength] = message.bytes();
    result.sha256.assign(digest, digestLength);
    auto const [report, reportLength] = message.bytes();
    result.report.assign(report, reportLength);
    if (result.reading.letters)
        for (LetterReading& letter : *result.reading.letters)
            letter.blobs = takeBlobs(message);
    return result;
}

ReadResult unread(std::string const& file, JobFailure failure, JobLimits const& limits) {
    ReadResult result;
    result.reading.document = Base::validUtf8(std::filesystem::path(file).filename().string());
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

void splitBatch(std::vector<DecidedDocument> const& documents, Workers const& workers, std::size_t checkEvery,
                BatchWatcher& watcher, std::function<void(std::size_t, ReadResult)> const& take) {
    runBatch(
        documents.size(), workers, watcher,
        [&](std::size_t index) { return splitDocument(documents[index], checkEvery); },
        [&](std::size_t index) { return documents[index].file.string(); }, take);
}

} // namespace VlMail

#include "programs/vlmail/letters/batch.h"

#include "programs/base/utf8.h"
#include "programs/reader/document.h"
#include "programs/vlmail/letters/node_settings.h"
#include "programs/vlmail/letters/worker_pool.h"
#include "programs/vlmail/terminal/progress.h"
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

std::string pack(ReadResult const& result) {
    Message message;
    std::ostringstream text;
    text << result.reading.toJson();
    std::string const json = std::move(text).str();
    message.put(json.data(), json.size());
    message.put(result.sha256.data(), result.sha256.size());
    message.put(result.report.data(), result.report.size());
    message.put(result.pages.size());
    for (auto const& letter : result.pages) {
        message.put(letter.size());
        for (PageBlob const& blob : letter) {
            message.put(static_cast<std::uint64_t>(blob.number));
            message.put(blob.data.data(), blob.data.size());
        }
    }
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
    result.pages.resize(message.number());
    for (auto& letter : result.pages) {
        letter.resize(message.number());
        for (PageBlob& blob : letter) {
            blob.number = static_cast<int>(message.number());
            auto const [data, size] = message.bytes();
            blob.data = SharedMemBuffer::copyOf(data, size);
        }
    }
    return result;
}

ReadResult crashed(std::string const& file) {
    ReadResult result;
    result.reading.document = Base::validUtf8(std::filesystem::path(file).filename().string());
    result.reading.error =
        "cannot read \"" + Base::validUtf8(file) +
        "\": the reader broke down over it; the document is damaged, print it to a new PDF";
    return result;
}

void runBatch(std::size_t count, std::size_t workers, Terminal const& terminal,
              std::function<ReadResult(std::size_t)> const& work,
              std::function<std::string(std::size_t)> const& fileOf,
              std::function<void(std::size_t, ReadResult)> const& take) {
    ProgressLine progress(terminal, count);
    auto const consume = [&](std::size_t index, std::optional<std::string> bytes) {
        ReadResult result = bytes ? unpack(std::move(*bytes)) : crashed(fileOf(index));
        if (result.reading.letters)
            progress.lettersFound(result.reading.letters->size());
        progress.hide();
        take(index, std::move(result));
    };
    runJobs(
        count, workers, [&](std::size_t index) { return pack(work(index)); }, consume,
        [&](std::size_t done) { progress.documentsDone(done); });
}

} // namespace

void readBatch(std::vector<std::string> const& files, NodeSettings const& settings, std::size_t workers,
               Along along, Terminal const& terminal,
               std::function<void(std::size_t, ReadResult)> const& take) {
    Cfg::Presets const presets = settings.presets();
    runBatch(
        files.size(), workers, terminal,
        [&](std::size_t index) { return readDocument(files[index], presets, settings, along, index + 1); },
        [&](std::size_t index) { return files[index]; }, take);
}

void splitBatch(std::vector<Plan::Document> const& documents, std::size_t workers, Terminal const& terminal,
                std::function<void(std::size_t, ReadResult)> const& take) {
    runBatch(
        documents.size(), workers, terminal,
        [&](std::size_t index) {
            Plan::Document const& document = documents[index];
            return splitDocument(document.file, document.sha256, document.reading);
        },
        [&](std::size_t index) { return documents[index].file.string(); }, take);
}

} // namespace VlMail

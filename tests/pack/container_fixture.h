#pragma once
// A folder of its own with one container in it, verbs to write and damage the file, and the layouts byte by
// byte.

#include "tests/support/log_lines.h"
#include "tests/support/temporary_folder.h"
#include "vlservice/pack/pack_wrapper.h"

#include <gmock/gmock.h>
#include <zlib.h>

#include <cstdint>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <optional>
#include <string>
#include <vector>

using VLServiceTest::LogLine;
using VLServiceTest::LogLines;

inline std::string littleEndian(std::uint64_t number, int bytes = 8) {
    std::string text;
    for (int i = 0; i < bytes; ++i)
        text += static_cast<char>(number >> (8 * i));
    return text;
}

inline SharedMemBuffer bufferOf(std::string const& bytes) {
    return SharedMemBuffer::copyOf(bytes.data(), bytes.size());
}

inline std::string textOf(SharedMemBuffer const& buffer) {
    return {reinterpret_cast<char const*>(buffer.data()), static_cast<std::size_t>(buffer.size())};
}

inline std::uint32_t crcOf(std::string const& bytes) {
    return static_cast<std::uint32_t>(
        crc32(0, reinterpret_cast<Bytef const*>(bytes.data()), static_cast<uInt>(bytes.size())));
}

/// A blob that can be told from others; begins as all blobs do.
inline std::string blobOf(std::string const& content) { return "TEZ." + content; }

/// An item as the writer prints it.
inline std::string item(std::string const& name, std::uint64_t offset, std::string const& blob,
                        std::string const& document = "a.pdf") {
    return "<mailitem name=\"" + name + "\" offset=\"" + std::to_string(offset) + "\" length=\"" +
           std::to_string(blob.size()) + "\" role=\"page\" crc=\"" + std::to_string(crcOf(blob)) +
           "\" document=\"" + document + "\" />";
}

inline std::string indexOf(std::string const& items,
                           std::string const& attributes = "id=\"m1\" items=\"1\"") {
    return "<?xml version=\"1.0\" encoding=\"UTF-8\" standalone=\"yes\" ?><vantelar><corbulet " + attributes +
           ">" + items + "</corbulet></vantelar>";
}

inline std::string trailingLayout(std::string const& blobs, std::string const& index) {
    return blobs + index + littleEndian(blobs.size());
}

/// Offsets in the index count from the start of the file, so that of the first blob is 8.
inline std::string leadingLayout(std::string const& blobs, std::string const& index) {
    return littleEndian(8 + blobs.size()) + blobs + index;
}

inline std::string wideMagic() {
    std::string magic;
    for (char c : std::string("Corbulet"))
        magic += std::string{c, '\0'};
    return magic + std::string(2, '\0');
}

inline std::string wideHeader(std::string const& id) {
    return wideMagic() + "????????" + littleEndian(id.size(), 4) + id + "?";
}

inline std::string wideTrailer(std::int64_t position) {
    return littleEndian(static_cast<std::uint64_t>(position)) + "....................";
}

/// Offsets in the index count from the start of the blobs.
inline std::string wideLayout(std::string const& id, std::string const& blobs, std::string const& index) {
    return wideHeader(id) + blobs + index + wideTrailer(static_cast<std::int64_t>(blobs.size()));
}

class ContainerTest : public testing::Test {
protected:
    void write(std::string const& bytes) {
        std::ofstream(file_, std::ios::binary)
            .write(bytes.data(), static_cast<std::streamsize>(bytes.size()));
    }
    std::string read() const {
        std::ifstream in(file_, std::ios::binary);
        return {std::istreambuf_iterator<char>(in), {}};
    }
    void cut(std::size_t size) { std::filesystem::resize_file(file_, size); }
    /// In place: a file that is written anew each time costs the disk too much.
    void flip(std::size_t position, std::size_t bit = 0) {
        std::fstream file(file_, std::ios::in | std::ios::out | std::ios::binary);
        file.seekg(static_cast<std::streamoff>(position));
        char const byte = static_cast<char>(file.get() ^ (1 << bit));
        file.seekp(static_cast<std::streamoff>(position));
        file.put(byte);
    }

    /// Two pages and metadata, by the writer.
    void writeMailing() {
        PackWrapper out(file_.string(), PackWrapper::PURPOSE_OUTPUT, "m1");
        out.savePage("a.pdf", "1", bufferOf(PAGE_1));
        out.savePage("a.pdf", "2", bufferOf(PAGE_2));
        ASSERT_TRUE(out.finalizeOutput(bufferOf(METADATA)));
    }

    PackWrapper& open() { return wrapper_.emplace(file_.string(), PackWrapper::PURPOSE_IMPORT, "unused"); }

    /// What the callback got; none when it was not called.
    static std::optional<std::string> page(PackWrapper& wrapper, std::string const& document,
                                           std::string const& name) {
        std::optional<std::string> answer;
        wrapper.requestPageData(document, name, [&](SharedMemBuffer data) { answer = textOf(data); });
        return answer;
    }

    /// The path as messages show it.
    std::string quoted() const { return '"' + file_.string() + '"'; }

    std::string const PAGE_1 = blobOf("first page");
    std::string const PAGE_2 = blobOf("second page");
    std::string const METADATA = blobOf("metadata");

    TemporaryFolder folder_;
    std::filesystem::path file_ = folder_ / "m.mailing";
    LogLines log_;
    std::optional<PackWrapper> wrapper_;
};

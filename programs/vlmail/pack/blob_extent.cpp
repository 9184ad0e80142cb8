#include "programs/vlmail/pack/blob_extent.h"

#include "vlservice/pack/blob_format.h"
#include "vlservice/pack/little_endian.h"

#include <zlib.h>

#include <algorithm>
#include <vector>

namespace VlMail {
namespace {

constexpr std::size_t PIECE = std::size_t{1} << 16;

/// Expands a zlib stream without keeping what comes out.
class StreamMeasure {
public:
    StreamMeasure() { inflateInit(&stream_); }
    ~StreamMeasure() { inflateEnd(&stream_); }
    StreamMeasure(StreamMeasure const&) = delete;
    StreamMeasure& operator=(StreamMeasure const&) = delete;

    /// False when the stream does not end well.
    bool run(ReadBytes const& read, std::uint64_t position) {
        int result = Z_OK;
        while (result == Z_OK) {
            stream_.avail_in = static_cast<uInt>(read(position, input_.data(), input_.size()));
            stream_.next_in = input_.data();
            if (stream_.avail_in == 0)
                return false;
            position += stream_.avail_in;
            result = expandInput();
        }
        return result == Z_STREAM_END;
    }

    std::uint64_t lengthOfStream() const { return stream_.total_in; }
    std::uint64_t sizeOfData() const { return stream_.total_out; }

private:
    int expandInput() {
        int result = Z_OK;
        while (result == Z_OK && (stream_.avail_in > 0 || stream_.avail_out == 0)) {
            stream_.next_out = output_.data();
            stream_.avail_out = static_cast<uInt>(output_.size());
            result = inflate(&stream_, Z_NO_FLUSH);
        }
        // Nothing was left to expand in this input; the next may go on.
        return result == Z_BUF_ERROR && stream_.avail_in == 0 ? Z_OK : result;
    }

    z_stream stream_{};
    std::vector<Bytef> input_ = std::vector<Bytef>(PIECE);
    std::vector<Bytef> output_ = std::vector<Bytef>(PIECE);
};

std::optional<std::uint64_t> claimAt(ReadBytes const& read, std::uint64_t position) {
    unsigned char header[DB_ZIP_HEADER_SIZE];
    if (read(position, header, sizeof header) != sizeof header ||
        !std::equal(DB_ZIP_MAGIC.begin(), DB_ZIP_MAGIC.end(), header))
        return std::nullopt;
    return LittleEndian::load<std::uint64_t>(header + DB_ZIP_MAGIC.size());
}

} // namespace

bool beginsAsBlob(ReadBytes const& read, std::uint64_t position) {
    unsigned char zlib[2];
    return claimAt(read, position) && read(position + DB_ZIP_HEADER_SIZE, zlib, sizeof zlib) == sizeof zlib &&
           (zlib[0] & 0x0F) == Z_DEFLATED && (zlib[0] * 256 + zlib[1]) % 31 == 0;
}

std::optional<BlobExtent> blobExtent(ReadBytes const& read, std::uint64_t position) {
    auto const claim = claimAt(read, position);
    StreamMeasure measure;
    if (!claim || !measure.run(read, position + DB_ZIP_HEADER_SIZE))
        return std::nullopt;
    return BlobExtent{DB_ZIP_HEADER_SIZE + measure.lengthOfStream(), measure.sizeOfData(),
                      *claim == measure.sizeOfData()};
}

} // namespace VlMail

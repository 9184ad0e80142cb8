#include "programs/channel/data_message.h"

#include "programs/base/error.h"
#include "programs/channel/network_order.h"
#include "vlservice/ipc/process_pack.h"

#include <limits>

namespace Channel {
namespace {

static_assert(PACK_DATA == Ipc::ProcessPack::CMD_ID);

template<typename Length>
void appendText(std::string& bytes, std::string_view text, char const* what) {
    if (text.size() > std::numeric_limits<Length>::max())
        throw Base::Error(Base::Code::TooLarge, std::string("The name of a ") + what + " has " +
                                                    std::to_string(text.size()) + " bytes, and " +
                                                    std::to_string(std::numeric_limits<Length>::max()) +
                                                    " is the most that can be sent.");
    appendNumber(bytes, static_cast<Length>(text.size()));
    bytes += text;
}

/// Takes what it reads off the front.
class TextReader {
public:
    explicit TextReader(std::string_view text) : rest_(text) {}

    template<typename Number>
    Number number() {
        return numberAt<Number>(take(sizeof(Number)), 0);
    }
    template<typename Length>
    std::string_view text() {
        return take(number<Length>());
    }
    std::string_view rest() const { return rest_; }

private:
    std::string_view take(std::size_t size) {
        if (size > rest_.size())
            throw Base::Error(Base::Code::ConnectionBroken, "A data message ends before its names do.");
        std::string_view const taken = rest_.substr(0, size);
        rest_.remove_prefix(size);
        return taken;
    }

    std::string_view rest_;
};

void requireInsidePage(DataPiece const& piece) {
    if (piece.bytes.empty() || piece.bytes.size() > MAX_PIECE)
        throw Base::Error(Base::Code::ConnectionBroken,
                          "A data message holds " + std::to_string(piece.bytes.size()) +
                              " bytes of a page, and 1 to " + std::to_string(MAX_PIECE) + " is what it may.");
    if (piece.offset > piece.size || piece.bytes.size() > piece.size - piece.offset)
        throw Base::Error(Base::Code::ConnectionBroken,
                          "A data message holds bytes behind the end of its page.");
}

} // namespace

std::string printData(DataPiece const& piece) {
    requireInsidePage(piece);
    std::string text;
    text.reserve(64 + piece.packId.size() + piece.document.size() + piece.page.size() + piece.bytes.size());
    appendText<std::uint8_t>(text, piece.packId, "pack");
    appendNumber(text, piece.position);
    appendText<std::uint16_t>(text, piece.document, "document");
    appendText<std::uint16_t>(text, piece.page, "page");
    appendNumber(text, piece.size);
    appendNumber(text, piece.offset);
    text += piece.bytes;
    return text;
}

DataPiece parseData(std::string_view text) {
    TextReader reader(text);
    DataPiece piece;
    piece.packId = reader.text<std::uint8_t>();
    piece.position = reader.number<std::uint32_t>();
    piece.document = reader.text<std::uint16_t>();
    piece.page = reader.text<std::uint16_t>();
    piece.size = reader.number<std::uint64_t>();
    piece.offset = reader.number<std::uint64_t>();
    piece.bytes = reader.rest();
    requireInsidePage(piece);
    return piece;
}

} // namespace Channel

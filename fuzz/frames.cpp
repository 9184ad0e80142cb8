// Bytes from the other side of a connection, in pieces of a size that the first byte tells: they are refused,
// or cut into messages that are written as the same bytes, however they were cut. The texts of data are
// refused or written as the same text.
#include "programs/base/error.h"
#include "programs/channel/data_message.h"
#include "programs/channel/frame.h"
#include "programs/channel/message_text.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>

namespace {

struct Outcome {
    /// What the messages that were read are written as, the preface in front.
    std::string rewritten;
    std::size_t messages = 0;
    bool isRefused = false;
};

void requireSameData(std::string_view text) {
    try {
        if (Channel::printData(Channel::parseData(text)) != text)
            std::abort();
    } catch (Base::Error const&) {
        // No data.
    }
}

void take(Channel::FrameDecoder& decoder, Outcome& outcome) {
    while (auto const frame = decoder.next()) {
        Channel::appendFrame(outcome.rewritten, *frame);
        Channel::reasonOf(frame->text);
        if (frame->kind == Channel::Kind::Data)
            requireSameData(frame->text);
        ++outcome.messages;
    }
}

Outcome decode(std::string_view bytes, std::size_t piece) {
    Channel::FrameDecoder decoder;
    Outcome outcome;
    try {
        while (!bytes.empty()) {
            auto const room = decoder.room();
            std::size_t const size = std::min({room.size(), bytes.size(), piece});
            std::copy_n(bytes.begin(), size, room.begin());
            decoder.commit(size);
            bytes.remove_prefix(size);
            take(decoder, outcome);
        }
    } catch (Base::Error const&) {
        outcome.isRefused = true;
    }
    outcome.rewritten.insert(0, Channel::preface(decoder.version()));
    return outcome;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    if (size == 0)
        return 0;
    std::string_view const bytes(reinterpret_cast<char const*>(data) + 1, size - 1);
    Outcome const whole = decode(bytes, bytes.size() + 1);
    Outcome const pieces = decode(bytes, data[0] + 1u);
    if (whole.rewritten != pieces.rewritten || whole.isRefused != pieces.isRefused)
        std::abort();
    if (whole.messages > 0 && !bytes.starts_with(whole.rewritten))
        std::abort();
    return 0;
}

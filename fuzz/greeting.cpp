// Messages from a stranger to either side of the greeting: he may say whatever he likes, and is never let in.
// The first byte tells the side, the version and the client's token; then each message is its command, kind
// and sequence number, the size of its text in two bytes, and the text.
#include "programs/channel/greeting.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <string_view>

namespace {

std::string const NONCE(64, '0');

Channel::Terms terms(std::uint8_t first) {
    std::uint16_t const version = first % 4 < 2 ? Channel::VERSION : Channel::VERSION_1;
    return {version, "0123456789abcdef0123456789abcdef", "", "127.0.0.1:40000", "127.0.0.1:4711"};
}

std::string const NAMED = "0123456789abcdef." + std::string(64, 'a');

/// Of any id, so that whoever names one is asked for its proof.
std::optional<Channel::TokenKeys> keys(std::string const&) { return Channel::keysOf(NAMED); }

template<typename Side>
void tell(Side& side, std::string_view bytes) {
    constexpr std::size_t HEAD = 5;
    auto const at = [&](std::size_t i) { return static_cast<std::uint8_t>(bytes[i]); };
    while (bytes.size() >= HEAD) {
        std::size_t const size = std::min<std::size_t>(at(3) << 8 | at(4), bytes.size() - HEAD);
        Channel::Frame const message{at(0), static_cast<Channel::Kind>(at(1) % 3 + 1), at(2),
                                     bytes.substr(HEAD, size)};
        if (side.take(message).verdict == Channel::GreetingStep::Verdict::Welcome)
            std::abort();
        bytes.remove_prefix(HEAD + size);
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    if (size == 0)
        return 0;
    std::string_view const messages(reinterpret_cast<char const*>(data) + 1, size - 1);
    if (data[0] % 2 == 0) {
        Channel::ServiceGreeting service(terms(data[0]), NONCE, Channel::TakesData::Yes, &keys);
        tell(service, messages);
    } else {
        Channel::Terms known = terms(data[0]);
        if (data[0] % 8 > 3)
            known.token = NAMED;
        Channel::ClientGreeting client(known, NONCE);
        tell(client, messages);
    }
    return 0;
}

// Datagrams from the network as question and as answer: no stranger's answer is proven, and what a service
// says to a question fits into a datagram and is proven to who asked.
#include "programs/channel/discovery_proof.h"
#include "vlservice/ipc/discovery_base.h"
#include "vlservice/json/json_text.h"

#include <cstdint>
#include <cstdlib>
#include <sstream>

namespace {

constexpr std::size_t MAX_DATAGRAM = 1024;
std::string const TOKEN = "0123456789abcdef0123456789abcdef";
std::string const OWN_NONCE(64, '0');

void ask(json::Object const& question) {
    std::optional<std::string> const nonce = Channel::nonceIn(question);
    if (Channel::tokenIdIn(question).size() > OWN_NONCE.size())
        std::abort();
    json::Object const answer = Channel::makeAnswer(std::string(255, 'h'), 65535, TOKEN, nonce);
    std::ostringstream text;
    text << answer;
    if (text.str().size() > MAX_DATAGRAM || (nonce && !Channel::isProven(answer, TOKEN, *nonce)))
        std::abort();
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    try {
        json::Object const datagram = json::strToObject(reinterpret_cast<char const*>(data), size);
        if (Ipc::DiscoveryBase::isReq(datagram))
            ask(datagram);
        else if (Channel::isProven(datagram, TOKEN, OWN_NONCE))
            std::abort();
    } catch (json::Exc const&) {
        return 0;
    }
    return 0;
}

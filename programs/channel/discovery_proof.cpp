#include "programs/channel/discovery_proof.h"

#include "programs/channel/greeting.h"
#include "programs/channel/proof.h"

#include "vlservice/ipc/discovery_base.h"

#include <algorithm>

namespace Channel {
namespace {

using Ipc::DiscoveryBase;

constexpr std::size_t MAX_NONCE = 64;

bool isHexDigit(char c) { return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f'); }

} // namespace

json::Object signedQuestion(std::string const& nonce) {
    json::Object question = DiscoveryBase::makeReq();
    question.set(NONCE, nonce);
    return question;
}

std::optional<std::string> nonceIn(json::Object const& question) {
    std::string nonce = question.get(NONCE).textOrEmpty();
    if (nonce.empty() || nonce.size() > MAX_NONCE || !std::all_of(nonce.begin(), nonce.end(), isHexDigit))
        return std::nullopt;
    return nonce;
}

json::Object makeAnswer(std::string const& host, std::uint16_t port, std::string const& token,
                        std::optional<std::string> const& nonce) {
    json::Object answer{{DiscoveryBase::SVC_HOST_FLD_NAME.c_str(), host},
                        {DiscoveryBase::SVC_PORT_FLD_NAME.c_str(), port}};
    if (nonce) {
        answer.set(NONCE, *nonce);
        answer.set(PROOF, makeDiscoveryProof(token, *nonce, host, port));
    }
    return answer;
}

bool isProven(json::Object const& answer, std::string const& token, std::string const& nonce) {
    long long const port = answer.get(DiscoveryBase::SVC_PORT_FLD_NAME).intOrZero();
    if (port < 1 || port > 65535 || answer.get(NONCE).textOrEmpty() != nonce)
        return false;
    std::string const proof =
        makeDiscoveryProof(token, nonce, answer.get(DiscoveryBase::SVC_HOST_FLD_NAME).textOrEmpty(),
                           static_cast<std::uint16_t>(port));
    return isSameProof(answer.get(PROOF).textOrEmpty(), proof);
}

} // namespace Channel

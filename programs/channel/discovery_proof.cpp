#include "programs/channel/discovery_proof.h"

#include "programs/channel/greeting.h"
#include "programs/channel/proof.h"
#include "programs/channel/token.h"

#include "vlservice/ipc/discovery_base.h"

#include <algorithm>

namespace Channel {
namespace {

using Ipc::DiscoveryBase;

constexpr std::size_t MAX_NONCE = 64;

bool isHexDigit(char c) { return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f'); }

/// A text under a key that somebody would put there; empty otherwise.
std::string digitsIn(json::Object const& question, char const* key) {
    std::string const digits = question.get(key).textOrEmpty();
    bool const isGood = digits.size() <= MAX_NONCE && std::all_of(digits.begin(), digits.end(), isHexDigit);
    return isGood ? digits : std::string();
}

} // namespace

json::Object signedQuestion(std::string const& nonce, std::string const& token) {
    json::Object question = DiscoveryBase::makeReq();
    question.set(NONCE, nonce);
    if (std::string const id = tokenIdOf(token); !id.empty())
        question.set(TOKEN_ID, id);
    return question;
}

std::optional<std::string> nonceIn(json::Object const& question) {
    std::string const nonce = digitsIn(question, NONCE);
    return nonce.empty() ? std::nullopt : std::optional(nonce);
}

std::string tokenIdIn(json::Object const& question) { return digitsIn(question, TOKEN_ID); }

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
    std::string const key = tokenIdOf(token).empty() ? token : keysOf(token).service;
    std::string const proof =
        makeDiscoveryProof(key, nonce, answer.get(DiscoveryBase::SVC_HOST_FLD_NAME).textOrEmpty(),
                           static_cast<std::uint16_t>(port));
    return isSameProof(answer.get(PROOF).textOrEmpty(), proof);
}

} // namespace Channel

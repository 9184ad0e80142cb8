#include "programs/channel/greeting.h"

#include "programs/base/digest.h"
#include "programs/base/error.h"
#include "programs/base/hex.h"
#include "programs/channel/message_text.h"
#include "programs/channel/token.h"

#include <utility>

namespace Channel {
namespace {

using Verdict = GreetingStep::Verdict;

GreetingStep refusal(std::string reason) { return {Verdict::Refused, std::nullopt, std::move(reason)}; }

GreetingStep goOn(Kind kind, std::uint32_t sequence, json::Object const& text) {
    return {Verdict::GoesOn, GreetingStep::Reply{kind, sequence, print(text)}, {}};
}

json::Object requestIn(Frame const& message, std::uint32_t sequence) {
    if (message.command != GREETING || message.kind != Kind::Request || message.sequence != sequence)
        throw Base::Error(Base::Code::ConnectionBroken, "The greeting is missing.");
    return parse(message.text);
}

/// The same terms between two who share something else.
Terms sharing(std::string secret, Terms terms) {
    terms.token = std::move(secret);
    return terms;
}

/// Without TLS version 2 is held by the addresses of both ends and by seals.
bool isHeldByAddresses(Terms const& terms) { return terms.version > VERSION_1 && terms.fingerprint.empty(); }

std::optional<SealKeys> sealsFor(Terms const& terms, std::string const& clientNonce,
                                 std::string const& serviceNonce) {
    if (!isHeldByAddresses(terms))
        return std::nullopt;
    return SealKeys{makeSealKey(Side::Client, terms, clientNonce, serviceNonce),
                    makeSealKey(Side::Service, terms, clientNonce, serviceNonce)};
}

json::Object answerIn(Frame const& message, std::uint32_t sequence) {
    if (message.kind == Kind::Error)
        throw Base::Error(Base::Code::ConnectionRefused, "It refuses: " + reasonOf(message.text));
    if (message.command != GREETING || message.kind != Kind::Response || message.sequence != sequence)
        throw Base::Error(Base::Code::ConnectionBroken, "It does not greet.");
    return parse(message.text);
}

} // namespace

// --- the service

GreetingStep ServiceGreeting::take(Frame const& message) {
    // Over, unless the step gets to its end.
    State const state = std::exchange(state_, State::Over);
    try {
        switch (state) {
        case State::Challenge:
            return answerChallenge(message);
        case State::Proof:
            return checkProof(message);
        case State::Over:
            break;
        }
    } catch (std::exception const& e) {
        return refusal(Base::codedLine(e));
    }
    return refusal("The greeting is over.");
}

GreetingStep ServiceGreeting::answerChallenge(Frame const& message) {
    json::Object const request = requestIn(message, CHALLENGE);
    clientNonce_ = request.get(NONCE).toString();
    lookUpToken(request.get(TOKEN_ID));
    Terms const terms = keys_ ? sharing(keys_->service, terms_) : terms_;
    GreetingStep step =
        goOn(Kind::Response, CHALLENGE,
             {{NONCE, nonce_}, {PROOF, makeProof(Side::Service, terms, clientNonce_, nonce_)}});
    state_ = State::Proof;
    return step;
}

void ServiceGreeting::lookUpToken(json::Value const& id) {
    if (!id)
        return;
    tokenId_ = id.toString();
    if (tokens_)
        keys_ = tokens_(tokenId_);
    if (!keys_)
        throw Base::Error(Base::Code::TokenRefused,
                          "Its access token is none of this service, or was revoked.");
}

std::string ServiceGreeting::provenSecret(std::string const& proof) const {
    if (!keys_)
        return isSameProof(proof, makeProof(Side::Client, terms_, clientNonce_, nonce_)) ? terms_.token
                                                                                         : std::string();
    std::string key = keyShownBy(proof, sharing(keys_->clientDigest, terms_), clientNonce_, nonce_);
    return isSameProof(Base::sha256(key), Base::toHex(keys_->clientDigest.data(), keys_->clientDigest.size()))
               ? key
               : std::string();
}

GreetingStep ServiceGreeting::checkProof(Frame const& message) {
    std::string const secret = provenSecret(requestIn(message, PROVING).get(PROOF).toString());
    if (secret.empty())
        return refusal("Its access token is not the one of this service.");
    bool const tells = takesData_ == TakesData::Yes && terms_.version > VERSION_1;
    json::Object const welcome = tells ? json::Object{{TAKES_DATA, true}} : json::Object();
    return {Verdict::Welcome,
            GreetingStep::Reply{Kind::Response, PROVING, print(welcome)},
            {},
            sealsFor(sharing(secret, terms_), clientNonce_, nonce_)};
}

// --- the client

ClientGreeting::ClientGreeting(Terms terms, std::string nonce)
    : terms_(std::move(terms)), nonce_(std::move(nonce)), tokenId_(tokenIdOf(terms_.token)) {
    if (tokenId_.empty())
        return;
    keys_ = keysOf(terms_.token);
    clientKey_ = clientKeyOf(terms_.token);
}

GreetingStep::Reply ClientGreeting::challenge() const {
    json::Object text{{NONCE, nonce_}};
    if (keys_)
        text.set(TOKEN_ID, tokenId_);
    return {Kind::Request, CHALLENGE, print(text)};
}

std::string ClientGreeting::proof() const {
    return keys_ ? makeKeyProof(clientKey_, sharing(keys_->clientDigest, terms_), nonce_, serviceNonce_)
                 : makeProof(Side::Client, terms_, nonce_, serviceNonce_);
}

GreetingStep ClientGreeting::take(Frame const& message) {
    State const state = std::exchange(state_, State::Over);
    try {
        switch (state) {
        case State::Challenge:
            return prove(message);
        case State::Proof:
            return welcomed(message);
        case State::Over:
            break;
        }
    } catch (std::exception const& e) {
        return refusal(Base::codedLine(e));
    }
    return refusal("The greeting is over.");
}

GreetingStep ClientGreeting::welcomed(Frame const& message) const {
    bool const takesData = json_is_true(answerIn(message, PROVING).get(TAKES_DATA).node());
    return {Verdict::Welcome,
            std::nullopt,
            {},
            sealsFor(keys_ ? sharing(clientKey_, terms_) : terms_, nonce_, serviceNonce_),
            takesData && terms_.version > VERSION_1};
}

GreetingStep ClientGreeting::prove(Frame const& message) {
    json::Object const answer = answerIn(message, CHALLENGE);
    serviceNonce_ = answer.get(NONCE).toString();
    Terms const terms = keys_ ? sharing(keys_->service, terms_) : terms_;
    if (!isSameProof(answer.get(PROOF).toString(), makeProof(Side::Service, terms, nonce_, serviceNonce_)))
        return refusal(isHeldByAddresses(terms_)
                           ? "Whoever answers there does not know our access token, or passes us on."
                           : "Whoever answers there does not know our access token.");
    GreetingStep step = goOn(Kind::Request, PROVING, {{PROOF, proof()}});
    state_ = State::Proof;
    return step;
}

} // namespace Channel

#include "programs/channel/greeting.h"

#include "programs/base/error.h"
#include "programs/channel/message_text.h"

#include <utility>

namespace Channel {
namespace {

using Verdict = GreetingStep::Verdict;

GreetingStep refusal(std::string reason) { return {Verdict::Refused, std::nullopt, std::move(reason)}; }

GreetingStep goOn(Kind kind, std::uint32_t sequence, json::Object const& text) {
    return {Verdict::GoesOn, GreetingStep::Reply{kind, sequence, print(text)}, {}};
}

std::string textUnder(char const* key, Frame const& message, std::uint32_t sequence) {
    if (message.command != GREETING || message.kind != Kind::Request || message.sequence != sequence)
        throw Base::Error("The greeting is missing.");
    return parse(message.text).get(key).toString();
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
        throw Base::Error("It refuses: " + reasonOf(message.text));
    if (message.command != GREETING || message.kind != Kind::Response || message.sequence != sequence)
        throw Base::Error("It does not greet.");
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
        return refusal(e.what());
    }
    return refusal("The greeting is over.");
}

GreetingStep ServiceGreeting::answerChallenge(Frame const& message) {
    clientNonce_ = textUnder(NONCE, message, CHALLENGE);
    GreetingStep step =
        goOn(Kind::Response, CHALLENGE,
             {{NONCE, nonce_}, {PROOF, makeProof(Side::Service, terms_, clientNonce_, nonce_)}});
    state_ = State::Proof;
    return step;
}

GreetingStep ServiceGreeting::checkProof(Frame const& message) {
    std::string const expected = makeProof(Side::Client, terms_, clientNonce_, nonce_);
    if (!isSameProof(textUnder(PROOF, message, PROVING), expected))
        return refusal("Its access token is not the one of this service.");
    bool const tells = takesData_ == TakesData::Yes && terms_.version > VERSION_1;
    json::Object const welcome = tells ? json::Object{{TAKES_DATA, true}} : json::Object();
    return {Verdict::Welcome,
            GreetingStep::Reply{Kind::Response, PROVING, print(welcome)},
            {},
            sealsFor(terms_, clientNonce_, nonce_)};
}

// --- the client

GreetingStep::Reply ClientGreeting::challenge() const {
    return {Kind::Request, CHALLENGE, print({{NONCE, nonce_}})};
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
        return refusal(e.what());
    }
    return refusal("The greeting is over.");
}

GreetingStep ClientGreeting::welcomed(Frame const& message) const {
    bool const takesData = json_is_true(answerIn(message, PROVING).get(TAKES_DATA).node());
    return {Verdict::Welcome,
            std::nullopt,
            {},
            sealsFor(terms_, nonce_, serviceNonce_),
            takesData && terms_.version > VERSION_1};
}

GreetingStep ClientGreeting::prove(Frame const& message) {
    json::Object const answer = answerIn(message, CHALLENGE);
    serviceNonce_ = answer.get(NONCE).toString();
    if (!isSameProof(answer.get(PROOF).toString(), makeProof(Side::Service, terms_, nonce_, serviceNonce_)))
        return refusal(isHeldByAddresses(terms_)
                           ? "Whoever answers there does not know our access token, or passes us on."
                           : "Whoever answers there does not know our access token.");
    GreetingStep step =
        goOn(Kind::Request, PROVING, {{PROOF, makeProof(Side::Client, terms_, nonce_, serviceNonce_)}});
    state_ = State::Proof;
    return step;
}

} // namespace Channel

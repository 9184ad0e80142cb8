#pragma once
// The greeting, by which both sides prove that they know the access token before anything else is said:
//
//     client:  {"nonce"}              request 0      with "token", the id of a token that has one
//     service: {"nonce", "proof"}     response 0
//     client:  {"proof"}              request 1
//     service: {}                     response 1, or an error
//
// In version 2 a service that takes data says {"data": true} in the end.
//
// Each side is a machine without a socket or a clock: messages go in, messages and a verdict come out.

#include "programs/channel/frame.h"
#include "programs/channel/proof.h"
#include "programs/channel/seal.h"
#include "vlservice/json/json.h"

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <utility>

namespace Channel {

constexpr char const* NONCE = "nonce";
constexpr char const* PROOF = "proof";
constexpr char const* TAKES_DATA = "data";
constexpr char const* TOKEN_ID = "token";

constexpr std::uint32_t CHALLENGE = 0;
constexpr std::uint32_t PROVING = 1;
constexpr std::uint32_t FIRST_COMMAND = 2;

/// All that a stranger may send.
constexpr std::uint32_t MAX_GREETING = 1024;

/// What follows from a message.
struct GreetingStep {
    enum class Verdict { GoesOn, Welcome, Refused };
    /// A message of command 0.
    struct Reply {
        Kind kind;
        std::uint32_t sequence;
        std::string text;

        Frame frame() const { return {GREETING, kind, sequence, text}; }
    };

    Verdict verdict;
    /// To be sent next.
    std::optional<Reply> reply;
    /// Why it is refused, one line for a person.
    std::string reason;
    /// With a welcome in version 2 without TLS: what seals all that follows.
    std::optional<SealKeys> seals = std::nullopt;
    /// With a welcome: whether the service takes data.
    bool takesData = false;
};

enum class TakesData { No, Yes };

/// What a service keeps of its token of that id; nothing when there is none.
using TokenLookup = std::function<std::optional<TokenKeys>(std::string const& id)>;

/// The side that lets in: who knows the token of the terms, or one of those that have an id.
class ServiceGreeting {
public:
    /// The nonce is new for each connection.
    ServiceGreeting(Terms terms, std::string nonce, TakesData takesData = TakesData::No,
                    TokenLookup tokens = {})
        : terms_(std::move(terms)), nonce_(std::move(nonce)), takesData_(takesData),
          tokens_(std::move(tokens)) {}

    /// Takes the client's next message. After a welcome or a refusal everything is refused.
    GreetingStep take(Frame const& message);
    /// The id of the token that the client shows; empty for that of the terms.
    std::string const& tokenId() const { return tokenId_; }

private:
    enum class State { Challenge, Proof, Over };

    GreetingStep answerChallenge(Frame const& message);
    void lookUpToken(json::Value const& id);
    GreetingStep checkProof(Frame const& message);
    /// What the client's proof shows that it knows; empty when it is wrong.
    std::string provenSecret(std::string const& proof) const;

    Terms terms_;
    std::string nonce_;
    TakesData takesData_;
    TokenLookup tokens_;
    std::string tokenId_;
    std::optional<TokenKeys> keys_;
    std::string clientNonce_;
    State state_ = State::Challenge;
};

/// The side that asks to be let in. It proves nothing to a service that has not proved itself.
class ClientGreeting {
public:
    /// The nonce is new for each connection.
    ClientGreeting(Terms terms, std::string nonce);

    /// What the greeting begins with.
    GreetingStep::Reply challenge() const;
    /// Takes the service's next message. After a welcome or a refusal everything is refused.
    GreetingStep take(Frame const& message);

private:
    enum class State { Challenge, Proof, Over };

    GreetingStep prove(Frame const& message);
    GreetingStep welcomed(Frame const& message) const;
    std::string proof() const;

    Terms terms_;
    std::string nonce_;
    std::string serviceNonce_;
    std::string tokenId_;
    /// Of a token that has an id.
    std::string clientKey_;
    std::optional<TokenKeys> keys_;
    State state_ = State::Challenge;
};

} // namespace Channel

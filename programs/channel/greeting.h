#pragma once
// The greeting, by which both sides prove that they know the access token before anything else is said:
//
//     client:  {"nonce"}              request 0
//     service: {"nonce", "proof"}     response 0
//     client:  {"proof"}              request 1
//     service: {}                     response 1, or an error
//
// Each side is a machine without a socket or a clock: messages go in, messages and a verdict come out.

#include "programs/channel/frame.h"

#include <cstdint>
#include <optional>
#include <string>

namespace Channel {

constexpr char const* NONCE = "nonce";
constexpr char const* PROOF = "proof";

constexpr std::uint32_t CHALLENGE = 0;
constexpr std::uint32_t PROVING = 1;
constexpr std::uint32_t FIRST_COMMAND = 2;

/// All that a stranger may send.
constexpr std::uint32_t MAX_GREETING = 1024;

/// What a side knows of the connection.
struct GreetingTerms {
    std::string token;
    /// Of the service's certificate as this side sees it; empty without TLS.
    std::string fingerprint;
    /// New for each connection.
    std::string nonce;
};

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
};

/// The side that lets in.
class ServiceGreeting {
public:
    explicit ServiceGreeting(GreetingTerms terms) : terms_(std::move(terms)) {}

    /// Takes the client's next message. After a welcome or a refusal everything is refused.
    GreetingStep take(Frame const& message);

private:
    enum class State { Challenge, Proof, Over };

    GreetingStep answerChallenge(Frame const& message);
    GreetingStep checkProof(Frame const& message);

    GreetingTerms terms_;
    std::string clientNonce_;
    State state_ = State::Challenge;
};

/// The side that asks to be let in. It proves nothing to a service that has not proved itself.
class ClientGreeting {
public:
    explicit ClientGreeting(GreetingTerms terms) : terms_(std::move(terms)) {}

    /// What the greeting begins with.
    GreetingStep::Reply challenge() const;
    /// Takes the service's next message. After a welcome or a refusal everything is refused.
    GreetingStep take(Frame const& message);

private:
    enum class State { Challenge, Proof, Over };

    GreetingStep prove(Frame const& message);

    GreetingTerms terms_;
    State state_ = State::Challenge;
};

} // namespace Channel

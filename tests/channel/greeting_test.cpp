// The greeting of both sides, message by message, without a connection.

#include "programs/channel/greeting.h"
#include "programs/channel/message_text.h"
#include "programs/channel/token.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

using namespace testing;
using namespace Channel;
using Verdict = GreetingStep::Verdict;

namespace {

std::string const TOKEN = "0123456789abcdef0123456789abcdef";
std::string const CLIENT_NONCE(64, '0');
std::string const SERVICE_NONCE(64, 'f');

GreetingTerms clientTerms(std::string const& token = TOKEN, std::string const& fingerprint = "AA") {
    return {token, fingerprint, CLIENT_NONCE};
}
GreetingTerms serviceTerms(std::string const& token = TOKEN, std::string const& fingerprint = "AA") {
    return {token, fingerprint, SERVICE_NONCE};
}

/// What both sides think in the end, when each gets what the other one says.
struct Outcome {
    Verdict client = Verdict::GoesOn;
    Verdict service = Verdict::GoesOn;
    std::string reason;
    friend bool operator==(Outcome const&, Outcome const&) = default;
};

Outcome greet(GreetingTerms const& ofClient, GreetingTerms const& ofService) {
    ClientGreeting client(ofClient);
    ServiceGreeting service(ofService);
    Outcome outcome;
    std::optional<GreetingStep::Reply> said = client.challenge();
    while (said) {
        GreetingStep const answer = service.take(said->frame());
        outcome.service = answer.verdict;
        if (answer.verdict == Verdict::Refused) {
            outcome.reason = answer.reason;
            return outcome;
        }
        GreetingStep const next = client.take(answer.reply->frame());
        outcome.client = next.verdict;
        outcome.reason = next.reason;
        said = next.reply;
    }
    return outcome;
}

TEST(Greetings, WelcomeWhoKnowsTheToken) {
    EXPECT_EQ(greet(clientTerms(), serviceTerms()), (Outcome{Verdict::Welcome, Verdict::Welcome, ""}));
}

TEST(Greetings, EndAtTheClientWhenTokenOrCertificateDiffer) {
    Outcome const refused{Verdict::Refused, Verdict::GoesOn,
                          "Whoever answers there does not know our access token."};
    EXPECT_EQ(greet(clientTerms(TOKEN + "x"), serviceTerms()), refused);
    EXPECT_EQ(greet(clientTerms(TOKEN, "BB"), serviceTerms()), refused);
    EXPECT_EQ(greet(clientTerms(TOKEN, ""), serviceTerms()), refused);
}

/// A message and what becomes of it.
struct Case {
    char const* name;
    int command;
    Kind kind;
    std::uint32_t sequence;
    std::string text;
    std::string reason;

    Frame frame() const { return {static_cast<std::uint8_t>(command), kind, sequence, text}; }
};

constexpr auto NO_GREETING = "The greeting is missing.";
constexpr auto NO_ANSWER = "It does not greet.";
constexpr auto NO_TEXT = "JSON error: Wrong type: empty. Expected type: string";
constexpr auto OTHER_TOKEN = "Its access token is not the one of this service.";

/// Refused, with that reason, and everything behind it too.
template<typename Side>
void expectRefused(Side& side, Case const& bad) {
    GreetingStep const step = side.take(bad.frame());
    EXPECT_EQ(step.verdict, Verdict::Refused);
    EXPECT_EQ(step.reason, bad.reason);
    EXPECT_FALSE(step.reply);
    EXPECT_EQ(side.take(bad.frame()).reason, "The greeting is over.");
}

class BadChallenges : public TestWithParam<Case> {};
TEST_P(BadChallenges, AreRefusedByTheService) {
    ServiceGreeting service(serviceTerms());
    expectRefused(service, GetParam());
}
INSTANTIATE_TEST_SUITE_P(Messages, BadChallenges,
                         Values(Case{"OtherCommand", 24, Kind::Request, 0, R"({"nonce":"n"})", NO_GREETING},
                                Case{"OtherKind", 0, Kind::Response, 0, R"({"nonce":"n"})", NO_GREETING},
                                Case{"OtherSequence", 0, Kind::Request, 1, R"({"nonce":"n"})", NO_GREETING},
                                Case{"NoNonce", 0, Kind::Request, 0, "{}", NO_TEXT},
                                Case{"NumberAsNonce", 0, Kind::Request, 0, R"({"nonce":1})",
                                     "JSON error: Wrong type: integer. Expected type: string"},
                                Case{"NoObject", 0, Kind::Request, 0, "[]",
                                     "JSON error: Wrong type: array. Expected type: object"}),
                         [](auto const& instance) { return instance.param.name; });

class BadProofs : public TestWithParam<Case> {};
TEST_P(BadProofs, AreRefusedByTheService) {
    ServiceGreeting service(serviceTerms());
    ASSERT_EQ(service.take(ClientGreeting(clientTerms()).challenge().frame()).verdict, Verdict::GoesOn);
    expectRefused(service, GetParam());
}
INSTANTIATE_TEST_SUITE_P(Messages, BadProofs,
                         Values(Case{"TheChallengeAgain", 0, Kind::Request, 0, R"({"nonce":"n"})",
                                     NO_GREETING},
                                Case{"ACommand", 24, Kind::Request, 1, "{}", NO_GREETING},
                                Case{"NoProof", 0, Kind::Request, 1, "{}", NO_TEXT},
                                Case{"EmptyProof", 0, Kind::Request, 1, R"({"proof":""})", OTHER_TOKEN},
                                Case{"AnyProof", 0, Kind::Request, 1, R"({"proof":"0123"})", OTHER_TOKEN}),
                         [](auto const& instance) { return instance.param.name; });

TEST(Greetings, AreNotHeldByTheServicesOwnProof) {
    ServiceGreeting service(serviceTerms());
    GreetingStep const answer = service.take(ClientGreeting(clientTerms()).challenge().frame());
    json::Object const proof{{PROOF, parse(answer.reply->text).get(PROOF)}};
    std::string const text = print(proof);
    EXPECT_EQ(service.take({GREETING, Kind::Request, PROVING, text}).reason, OTHER_TOKEN);
}

TEST(Greetings, AreOverBehindTheWelcome) {
    ClientGreeting client(clientTerms());
    ServiceGreeting service(serviceTerms());
    auto const proof = client.take(service.take(client.challenge().frame()).reply->frame()).reply;
    ASSERT_EQ(service.take(proof->frame()).verdict, Verdict::Welcome);
    EXPECT_EQ(service.take(proof->frame()).reason, "The greeting is over.");
}

class BadAnswers : public TestWithParam<Case> {};
TEST_P(BadAnswers, AreRefusedByTheClient) {
    ClientGreeting client(clientTerms());
    expectRefused(client, GetParam());
}
INSTANTIATE_TEST_SUITE_P(Messages, BadAnswers,
                         Values(Case{"OtherCommand", 1, Kind::Response, 0, "{}", NO_ANSWER},
                                Case{"OtherKind", 0, Kind::Request, 0, "{}", NO_ANSWER},
                                Case{"OtherSequence", 0, Kind::Response, 1, "{}", NO_ANSWER},
                                Case{"Refusal", 0, Kind::Error, 0, R"({"err":"Not today."})",
                                     "It refuses: Not today."},
                                Case{"NoNonce", 0, Kind::Response, 0, R"({"proof":"p"})", NO_TEXT},
                                Case{"NoProof", 0, Kind::Response, 0, R"({"nonce":"n"})", NO_TEXT},
                                Case{"EmptyProof", 0, Kind::Response, 0, R"({"nonce":"n","proof":""})",
                                     "Whoever answers there does not know our access token."}),
                         [](auto const& instance) { return instance.param.name; });

TEST(Greetings, AreRefusedByTheClientWhenTheWelcomeIsNone) {
    Case const answers[] = {{"", 0, Kind::Response, 0, "{}", NO_ANSWER},
                            {"", 24, Kind::Response, 1, "{}", NO_ANSWER},
                            {"", 0, Kind::Error, 0, R"({"err":"No."})", "It refuses: No."}};
    for (Case const& answer : answers) {
        ClientGreeting client(clientTerms());
        ServiceGreeting service(serviceTerms());
        ASSERT_EQ(client.take(service.take(client.challenge().frame()).reply->frame()).verdict,
                  Verdict::GoesOn);
        expectRefused(client, answer);
    }
}

} // namespace

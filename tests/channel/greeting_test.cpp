// The greeting of both sides, message by message, without a connection.

#include "programs/base/hex.h"
#include "programs/channel/greeting.h"
#include "programs/channel/message_text.h"
#include "programs/channel/token.h"
#include "tests/channel/known_texts.h"
#include "tests/support/coded_lines.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

using namespace testing;
using namespace Channel;
using ChannelTest::NO_GREETING;
using ChannelTest::NO_KNOWLEDGE;
using ChannelTest::plainTerms;
using ChannelTest::TOKEN;
using Verdict = GreetingStep::Verdict;

namespace {

std::string const CLIENT_NONCE(64, '0');
std::string const SERVICE_NONCE(64, 'f');

Terms tlsTerms(std::uint16_t version = VERSION) { return {version, TOKEN, "AA", "", ""}; }

ClientGreeting makeClient(Terms const& terms = plainTerms()) { return {terms, CLIENT_NONCE}; }
ServiceGreeting makeService(Terms const& terms = plainTerms()) { return {terms, SERVICE_NONCE}; }

/// What both sides think in the end, when each gets what the other one says.
struct Outcome {
    GreetingStep client;
    GreetingStep service;
};

Outcome greet(Terms const& ofClient, Terms const& ofService) {
    ClientGreeting client = makeClient(ofClient);
    ServiceGreeting service = makeService(ofService);
    Outcome outcome{};
    std::optional<GreetingStep::Reply> said = client.challenge();
    while (said) {
        outcome.service = service.take(said->frame());
        if (!outcome.service.reply)
            break;
        outcome.client = client.take(outcome.service.reply->frame());
        said = outcome.client.reply;
    }
    return outcome;
}

TEST(Greetings, WelcomeWhoKnowsTheToken) {
    for (std::uint16_t const version : {VERSION_1, VERSION})
        for (Terms const& terms : {plainTerms(version), tlsTerms(version)}) {
            Outcome const outcome = greet(terms, terms);
            EXPECT_EQ(outcome.client.verdict, Verdict::Welcome);
            EXPECT_EQ(outcome.service.verdict, Verdict::Welcome);
        }
}

TEST(Greetings, GiveBothSidesTheSameSealsInVersion2WithoutTls) {
    Outcome const outcome = greet(plainTerms(), plainTerms());
    ASSERT_TRUE(outcome.client.seals && outcome.service.seals);
    EXPECT_EQ(outcome.client.seals->client, outcome.service.seals->client);
    EXPECT_EQ(outcome.client.seals->service, outcome.service.seals->service);
    EXPECT_NE(outcome.client.seals->client, outcome.client.seals->service);
    for (Terms const& terms : {plainTerms(VERSION_1), tlsTerms(VERSION_1), tlsTerms()})
        EXPECT_FALSE(greet(terms, terms).service.seals);
}

/// The service's last word.
GreetingStep::Reply welcomeOf(Terms const& terms, TakesData takesData) {
    ServiceGreeting service(terms, SERVICE_NONCE, takesData);
    ClientGreeting client = makeClient(terms);
    auto const proof = client.take(service.take(client.challenge().frame()).reply->frame()).reply;
    return service.take(proof->frame()).reply.value();
}

TEST(Greetings, TellInVersion2WhetherTheServiceTakesData) {
    EXPECT_EQ(welcomeOf(plainTerms(), TakesData::Yes).text, R"({"data":true})");
    EXPECT_EQ(welcomeOf(plainTerms(), TakesData::No).text, "{}");
    EXPECT_EQ(welcomeOf(plainTerms(VERSION_1), TakesData::Yes).text, "{}");
    for (auto const& [text, takesData] :
         {std::pair{R"({"data":true})", true}, {R"({"data":1})", false}, {R"({})", false}}) {
        ClientGreeting client = makeClient();
        ServiceGreeting service = makeService();
        client.take(service.take(client.challenge().frame()).reply->frame());
        EXPECT_EQ(client.take({GREETING, Kind::Response, PROVING, text}).takesData, takesData) << text;
    }
}

/// That the client refuses the service, which learns nothing.
void expectNoProof(Terms const& ofClient, Terms const& ofService, std::string const& reason) {
    Outcome const outcome = greet(ofClient, ofService);
    EXPECT_EQ(outcome.client.verdict, Verdict::Refused);
    EXPECT_EQ(outcome.client.reason, reason);
    EXPECT_EQ(outcome.service.verdict, Verdict::GoesOn);
}

TEST(Greetings, EndAtTheClientWhenTokenOrCertificateDiffer) {
    std::string const reason = "Whoever answers there does not know our access token.";
    Terms other = tlsTerms();
    other.token += 'x';
    expectNoProof(other, tlsTerms(), reason);
    other = tlsTerms();
    other.fingerprint = "BB";
    expectNoProof(other, tlsTerms(), reason);
}

TEST(Greetings, EndAtTheClientWhenTheAddressesDifferWithoutTls) {
    Terms other = plainTerms();
    other.clientAddress = "127.0.0.1:40001";
    expectNoProof(plainTerms(), other, NO_KNOWLEDGE);
    other = plainTerms();
    other.serviceAddress = "127.0.0.1:4712";
    expectNoProof(plainTerms(), other, NO_KNOWLEDGE);
}

TEST(Greetings, EndAtTheClientWhenTheVersionsDiffer) {
    expectNoProof(plainTerms(), plainTerms(VERSION_1), NO_KNOWLEDGE);
    expectNoProof(plainTerms(VERSION_1), plainTerms(),
                  "Whoever answers there does not know our access token.");
}

std::string const NAMED = "0123456789abcdef." + std::string(64, 'a');

Terms withToken(std::string const& token, Terms terms) {
    terms.token = token;
    return terms;
}

/// Knows NAMED by its keys alone.
std::optional<TokenKeys> knownToken(std::string const& id) {
    return id == "0123456789abcdef" ? std::optional(keysOf(NAMED)) : std::nullopt;
}

Outcome greetByName(std::string const& token, Terms const& terms, TokenLookup const& known = &knownToken) {
    ClientGreeting client = makeClient(withToken(token, terms));
    ServiceGreeting service(terms, SERVICE_NONCE, TakesData::No, known);
    Outcome outcome{};
    outcome.service = service.take(client.challenge().frame());
    while (outcome.service.reply) {
        outcome.client = client.take(outcome.service.reply->frame());
        if (!outcome.client.reply)
            break;
        outcome.service = service.take(outcome.client.reply->frame());
    }
    return outcome;
}

TEST(GreetingsByATokenWithAnId, WelcomeWhoHasTheToken) {
    for (std::uint16_t const version : {VERSION_1, VERSION})
        for (Terms const& terms : {plainTerms(version), tlsTerms(version)}) {
            Outcome const outcome = greetByName(NAMED, terms);
            EXPECT_EQ(outcome.client.verdict, Verdict::Welcome);
            EXPECT_EQ(outcome.service.verdict, Verdict::Welcome);
            EXPECT_EQ(outcome.client.seals.has_value(), outcome.service.seals.has_value());
        }
    Outcome const sealed = greetByName(NAMED, plainTerms());
    EXPECT_EQ(sealed.client.seals->client, sealed.service.seals->client);
    EXPECT_EQ(sealed.client.seals->service, sealed.service.seals->service);
    EXPECT_NE(sealed.client.seals->client, greet(plainTerms(), plainTerms()).client.seals->client);
}

TEST(GreetingsByATokenWithAnId, TellTheServiceWhichItIs) {
    ServiceGreeting service(plainTerms(), SERVICE_NONCE, TakesData::No, &knownToken);
    EXPECT_EQ(service.tokenId(), "");
    service.take(makeClient(withToken(NAMED, plainTerms())).challenge().frame());
    EXPECT_EQ(service.tokenId(), "0123456789abcdef");
}

TEST(GreetingsByATokenWithAnId, EndWhereTheServiceHasNoSuchToken) {
    std::string const unknown = "f123456789abcdef." + std::string(64, 'a');
    std::string const reason = "Its access token is none of this service, or was revoked. [token-refused]";
    EXPECT_EQ(greetByName(unknown, plainTerms()).service.reason, reason);
    EXPECT_EQ(greetByName(NAMED, plainTerms(), {}).service.reason, reason);
}

TEST(GreetingsByATokenWithAnId, EndAtTheClientWhenTheSecretDiffers) {
    std::string other = NAMED;
    other.back() = 'b';
    Outcome const outcome = greetByName(other, plainTerms());
    EXPECT_EQ(outcome.client.reason, NO_KNOWLEDGE);
    EXPECT_EQ(outcome.service.verdict, Verdict::GoesOn);
}

/// As somebody would who has got hold of what the service keeps of the token.
TEST(GreetingsByATokenWithAnId, LetNobodyInByWhatTheServiceKeeps) {
    TokenKeys const kept = keysOf(NAMED);
    auto const hexOf = [](std::string const& bytes) { return Base::toHex(bytes.data(), bytes.size()); };
    Terms const byDigest = withToken(kept.clientDigest, plainTerms());
    for (std::string const& proof :
         {makeProof(Side::Client, byDigest, CLIENT_NONCE, SERVICE_NONCE),
          makeKeyProof(kept.clientDigest, byDigest, CLIENT_NONCE, SERVICE_NONCE),
          makeKeyProof(kept.service, byDigest, CLIENT_NONCE, SERVICE_NONCE),
          makeProof(Side::Client, withToken(kept.service, plainTerms()), CLIENT_NONCE, SERVICE_NONCE),
          makeProof(Side::Client, plainTerms(), CLIENT_NONCE, SERVICE_NONCE), hexOf(kept.clientDigest),
          std::string(), std::string(64, '0'), std::string(62, '0'), std::string(64, 'x')}) {
        ServiceGreeting service(plainTerms(), SERVICE_NONCE, TakesData::No, &knownToken);
        service.take(makeClient(withToken(NAMED, plainTerms())).challenge().frame());
        json::Object const text{{PROOF, proof}};
        std::string const said = print(text);
        EXPECT_EQ(service.take({GREETING, Kind::Request, PROVING, said}).reason,
                  "Its access token is not the one of this service.")
            << proof;
    }
}

TEST(GreetingsByATokenWithAnId, ShowTheKeyToWhoKnowsItsDigestAlone) {
    Terms const byDigest = withToken(keysOf(NAMED).clientDigest, plainTerms());
    std::string const proof = makeKeyProof(clientKeyOf(NAMED), byDigest, CLIENT_NONCE, SERVICE_NONCE);
    EXPECT_EQ(keyShownBy(proof, byDigest, CLIENT_NONCE, SERVICE_NONCE), clientKeyOf(NAMED));
    EXPECT_NE(keyShownBy(proof, plainTerms(), CLIENT_NONCE, SERVICE_NONCE), clientKeyOf(NAMED));
    EXPECT_NE(keyShownBy(proof, byDigest, SERVICE_NONCE, CLIENT_NONCE), clientKeyOf(NAMED));
    EXPECT_EQ(keyShownBy("0g", byDigest, CLIENT_NONCE, SERVICE_NONCE), "");
}

TEST(TokenIds, AreThoseOfTokensOfThatForm) {
    EXPECT_EQ(tokenIdOf(NAMED), "0123456789abcdef");
    for (std::string const& token :
         {std::string(), TOKEN, std::string(81, 'a'), "0123456789ABCDEF." + std::string(64, 'a'),
          "0123456789abcdef." + std::string(63, 'a'), "0123456789abcdef-" + std::string(64, 'a')})
        EXPECT_EQ(tokenIdOf(token), "") << token;
    EXPECT_NE(tokenIdOf(makeNamedToken()), tokenIdOf(makeNamedToken()));
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

constexpr auto NO_ANSWER = "It does not greet.";
constexpr auto NO_TEXT = "JSON error: Wrong type: empty. Expected type: string";
constexpr auto OTHER_TOKEN = "Its access token is not the one of this service.";

/// Refused, with that reason, and everything behind it too.
template<typename Side>
void expectRefused(Side& side, Case const& bad) {
    GreetingStep const step = side.take(bad.frame());
    EXPECT_EQ(step.verdict, Verdict::Refused);
    EXPECT_EQ(wordsOf(step.reason), bad.reason);
    EXPECT_FALSE(step.reply);
    EXPECT_EQ(side.take(bad.frame()).reason, "The greeting is over.");
}

class BadChallenges : public TestWithParam<Case> {};
TEST_P(BadChallenges, AreRefusedByTheService) {
    ServiceGreeting service = makeService();
    expectRefused(service, GetParam());
}
INSTANTIATE_TEST_SUITE_P(Messages, BadChallenges,
                         Values(Case{"OtherCommand", 24, Kind::Request, 0, R"({"nonce":"n"})", NO_GREETING},
                                Case{"OtherKind", 0, Kind::Response, 0, R"({"nonce":"n"})", NO_GREETING},
                                Case{"OtherSequence", 0, Kind::Request, 1, R"({"nonce":"n"})", NO_GREETING},
                                Case{"NoNonce", 0, Kind::Request, 0, "{}", NO_TEXT},
                                Case{"NumberAsNonce", 0, Kind::Request, 0, R"({"nonce":1})",
                                     "JSON error: Wrong type: integer. Expected type: string"},
                                Case{"NumberAsToken", 0, Kind::Request, 0, R"({"nonce":"n","token":1})",
                                     "JSON error: Wrong type: integer. Expected type: string"},
                                Case{"NoObject", 0, Kind::Request, 0, "[]",
                                     "JSON error: Wrong type: array. Expected type: object"}),
                         [](auto const& instance) { return instance.param.name; });

class BadProofs : public TestWithParam<Case> {};
TEST_P(BadProofs, AreRefusedByTheService) {
    ServiceGreeting service = makeService();
    ASSERT_EQ(service.take(makeClient().challenge().frame()).verdict, Verdict::GoesOn);
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
    ServiceGreeting service = makeService();
    GreetingStep const answer = service.take(makeClient().challenge().frame());
    json::Object const proof{{PROOF, parse(answer.reply->text).get(PROOF)}};
    std::string const text = print(proof);
    EXPECT_EQ(service.take({GREETING, Kind::Request, PROVING, text}).reason, OTHER_TOKEN);
}

TEST(Greetings, AreOverBehindTheWelcome) {
    ClientGreeting client = makeClient();
    ServiceGreeting service = makeService();
    auto const proof = client.take(service.take(client.challenge().frame()).reply->frame()).reply;
    ASSERT_EQ(service.take(proof->frame()).verdict, Verdict::Welcome);
    EXPECT_EQ(service.take(proof->frame()).reason, "The greeting is over.");
}

class BadAnswers : public TestWithParam<Case> {};
TEST_P(BadAnswers, AreRefusedByTheClient) {
    ClientGreeting client = makeClient();
    expectRefused(client, GetParam());
}
INSTANTIATE_TEST_SUITE_P(
    Messages, BadAnswers,
    Values(Case{"OtherCommand", 1, Kind::Response, 0, "{}", NO_ANSWER},
           Case{"OtherKind", 0, Kind::Request, 0, "{}", NO_ANSWER},
           Case{"OtherSequence", 0, Kind::Response, 1, "{}", NO_ANSWER},
           Case{"Refusal", 0, Kind::Error, 0, R"({"err":"Not today."})", "It refuses: Not today."},
           Case{"NoNonce", 0, Kind::Response, 0, R"({"proof":"p"})", NO_TEXT},
           Case{"NoProof", 0, Kind::Response, 0, R"({"nonce":"n"})", NO_TEXT},
           Case{"EmptyProof", 0, Kind::Response, 0, R"({"nonce":"n","proof":""})", NO_KNOWLEDGE}),
    [](auto const& instance) { return instance.param.name; });

TEST(Greetings, AreRefusedByTheClientWhenTheWelcomeIsNone) {
    Case const answers[] = {{"", 0, Kind::Response, 0, "{}", NO_ANSWER},
                            {"", 24, Kind::Response, 1, "{}", NO_ANSWER},
                            {"", 0, Kind::Error, 0, R"({"err":"No."})", "It refuses: No."}};
    for (Case const& answer : answers) {
        ClientGreeting client = makeClient();
        ServiceGreeting service = makeService();
        ASSERT_EQ(client.take(service.take(client.challenge().frame()).reply->frame()).verdict,
                  Verdict::GoesOn);
        expectRefused(client, answer);
    }
}

} // namespace

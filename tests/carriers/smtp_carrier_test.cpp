#include "programs/carriers/smtp_carrier.h"

#include "tests/carriers/smtp_server.h"
#include "tests/channel/test_certificate.h"
#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/json_help.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <memory>
#include <sys/stat.h>

namespace {

namespace fs = std::filesystem;

using Carriers::Outcome;
using testing::AllOf;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;
using testing::StartsWith;
using VLServiceTest::SmtpServer;

/// A carrier in front of a server on this machine.
class SmtpCarrierTest : public testing::Test {
protected:
    SmtpCarrierTest() {
        settings_.type = Protocol::CarrierType::Smtp;
        settings_.from = "bills@acme.example";
        settings_.subject = "Invoice {invoice}";
        settings_.startsTls = false;
        parcel_.key = "p1-2";
        parcel_.mailing = "p1";
        parcel_.document = "%PDF of p1-2";
        Carriers::OutgoingLetter& letter = parcel_.letters.emplace_back();
        letter.key = "p1-2";
        letter.address = "ada@example.com";
        letter.fields = {{"email", letter.address}, {"invoice", "4711"}};
    }

    /// False, with the reason, where there is no server to be had.
    bool begin(std::string const& wanted = "{}") {
        server_.reset();
        carrier_.reset();
        fs::remove_all(folder_ / "mails");
        server_ = std::make_unique<SmtpServer>(folder_ / "mails", parse(wanted));
        why_ = server_->missing();
        settings_.url = server_->url();
        return why_.empty();
    }
    Outcome handOver() {
        if (!carrier_)
            carrier_ = std::make_unique<Carriers::SmtpCarrier>(settings_);
        return carrier_->handOver(parcel_, [this] {
            ++recorded_;
            hadWhenRecorded_ = server_->messages().size();
        });
    }
    std::string told() {
        constexpr char const* KINDS[] = {"accepted", "refused", "failed", "uncertain"};
        std::string outcome;
        try {
            Outcome const made = handOver();
            outcome = KINDS[static_cast<int>(made.kind)] + std::string(": ") + made.says;
        } catch (std::exception const& failure) {
            outcome = std::string("failed: ") + failure.what();
        }
        if (auto const at = outcome.find(settings_.url); at != outcome.npos)
            outcome.replace(at, settings_.url.size(), "SERVER");
        return outcome;
    }
    std::string password(std::string const& text, char const* name = "password") {
        fs::path const file = folder_ / name;
        std::ofstream(file) << text;
        ::chmod(file.c_str(), 0600);
        return file.string();
    }
    /// A server with STARTTLS and a user, and settings that go with it.
    bool beginWithTls(std::string const& more = "") {
        auto const files = ChannelTest::makeCertificate(folder_.path().string(), "127.0.0.1");
        settings_.startsTls = true;
        settings_.caFile = files.certificateFile;
        settings_.user = "acme";
        settings_.passwordFile = password("sesame-9\n");
        return begin(R"({"login":["acme","sesame-9"],"tls":[")" + files.certificateFile + "\",\"" +
                     files.keyFile + "\"]" + more + "}");
    }

    TemporaryFolder folder_;
    std::unique_ptr<SmtpServer> server_;
    std::unique_ptr<Carriers::SmtpCarrier> carrier_;
    std::string why_;
    Protocol::CarrierSettings settings_;
    Carriers::Parcel parcel_;
    int recorded_ = 0;
    std::size_t hadWhenRecorded_ = 0;
};

#define REQUIRE_SERVER(isThere)                                                                              \
    if (!(isThere))                                                                                          \
    GTEST_SKIP() << why_

TEST_F(SmtpCarrierTest, SendsTheLetterAndPutsItOnRecordBeforeTheServerMayHaveIt) {
    REQUIRE_SERVER(begin());
    EXPECT_EQ(told(), "accepted: 250 2.0.0 taken");
    EXPECT_EQ(recorded_, 1);
    EXPECT_EQ(hadWhenRecorded_, 0U);
    ASSERT_THAT(server_->messages(), SizeIs(1));
    std::string const message = server_->messages().front();
    EXPECT_THAT(message, StartsWith("bills@acme.example\nada@example.com\n"));
    for (char const* const header :
         {"\r\nTo: ada@example.com\r\n", "From: bills@acme.example\r\n", "\r\nSubject: Invoice 4711\r\n",
          "\r\nMessage-Id: <p1-2@acme.example>\r\n"})
        EXPECT_THAT(message, HasSubstr(header));
}

TEST_F(SmtpCarrierTest, SendsAttachmentsAsFilesAndSaysWhereAnswersGo) {
    REQUIRE_SERVER(begin());
    parcel_.attachments = {{"terms.pdf", "%PDF of terms"}};
    parcel_.replyTo = "service@acme.example";
    EXPECT_EQ(told(), "accepted: 250 2.0.0 taken");
    EXPECT_THAT(server_->messages().front(),
                AllOf(HasSubstr("filename=p1-2.pdf"), HasSubstr("filename=terms.pdf"),
                      HasSubstr("JVBERiBvZiB0ZXJtcw=="),
                      HasSubstr("\r\nReply-To: service@acme.example\r\n")));
}

TEST_F(SmtpCarrierTest, GivesUpAServerThatHangsWhenTheServiceEnds) {
    REQUIRE_SERVER(begin(R"({"behind":{".":"hang once"}})"));
    Carriers::StopSign const stop;
    Carriers::SmtpCarrier carrier(settings_, stop);
    Outcome const cut = carrier.handOver(parcel_, [&] { stop.raise(); });
    EXPECT_EQ(cut.kind, Outcome::Kind::Uncertain) << "the server may have it";
    EXPECT_THAT(cut.says, testing::EndsWith("the service was ended before it answered"));
    Outcome const begun = carrier.handOver(parcel_, [] { ADD_FAILURE() << "nothing is begun"; });
    EXPECT_EQ(begun.kind, Outcome::Kind::Failed) << "nobody has it";
}

TEST_F(SmtpCarrierTest, SendsNoticesAsTextsAlone) {
    REQUIRE_SERVER(begin());
    Carriers::SmtpCarrier carrier(settings_);
    int recorded = 0;
    auto const send = [&](char const* to) {
        return carrier.send(Carriers::Notice{"p1-n1", to, "office@acme.example",
                                             "Handed over: \"Rechnungen M\u00e4rz\"",
                                             "The mailing was handed over.\n\npostal: 2 letters accepted\n"},
                            [&] { ++recorded; });
    };
    EXPECT_EQ(send("ada@example.com").kind, Outcome::Kind::Accepted);
    EXPECT_EQ(recorded, 1);
    ASSERT_THAT(server_->messages(), SizeIs(1));
    std::string const message = server_->messages().front();
    EXPECT_THAT(message, StartsWith("bills@acme.example\nada@example.com\n"));
    for (char const* const line :
         {"Message-Id: <p1-n1@acme.example>\r\n", "Reply-To: office@acme.example\r\n",
          "Auto-Submitted: auto-generated\r\n", "Content-Type: text/plain; charset=utf-8\r\n",
          "postal: 2 letters accepted\r\n"})
        EXPECT_THAT(message, HasSubstr(line));
    EXPECT_THAT(message, Not(HasSubstr("attachment")));
    Outcome const refused = send("+49 341 1");
    EXPECT_EQ(refused.kind, Outcome::Kind::Refused);
    EXPECT_EQ(refused.says, "\"+49 341 1\" is not one plain e-mail address");
    EXPECT_EQ(recorded, 1);
}

TEST_F(SmtpCarrierTest, KeepsTheConnection) {
    REQUIRE_SERVER(begin(R"({"connections":1})"));
    for (int i = 0; i < 3; ++i)
        EXPECT_EQ(told(), "accepted: 250 2.0.0 taken");
    EXPECT_THAT(server_->messages(), SizeIs(3));
    carrier_.reset();
    EXPECT_THAT(told(), StartsWith("failed: "));
}

TEST_F(SmtpCarrierTest, ChangesOverToTlsAndLogsIn) {
    REQUIRE_SERVER(beginWithTls());
    EXPECT_EQ(told(), "accepted: 250 2.0.0 taken");
    EXPECT_EQ(told(), "accepted: 250 2.0.0 taken");
    EXPECT_THAT(server_->messages(), SizeIs(2));
}

TEST_F(SmtpCarrierTest, SaysNothingToAServerWithoutTls) {
    REQUIRE_SERVER(begin());
    settings_.startsTls = true;
    EXPECT_EQ(told(), "failed: SERVER: STARTTLS not supported.");
    EXPECT_EQ(recorded_, 0);
    EXPECT_THAT(server_->messages(), IsEmpty());
}

TEST_F(SmtpCarrierTest, SaysNothingToAServerWithAnotherCertificate) {
    REQUIRE_SERVER(beginWithTls());
    settings_.caFile = ChannelTest::makeCertificate(folder_.path().string(), "another").certificateFile;
    EXPECT_THAT(told(), StartsWith("failed: SERVER: SSL certificate problem"));
    EXPECT_THAT(server_->messages(), IsEmpty());
}

TEST_F(SmtpCarrierTest, TellsNoSecretOfAUserThatIsNotLetIn) {
    REQUIRE_SERVER(beginWithTls());
    settings_.passwordFile = password("wrong-7");
    EXPECT_EQ(told(), "failed: SERVER does not let the user acme in (535)");
    settings_.passwordFile = (folder_ / "gone").string();
    carrier_.reset();
    EXPECT_THAT(told(), AllOf(StartsWith("failed: "), HasSubstr("gone")));
    settings_.passwordFile = "mail-password";
    carrier_.reset();
    EXPECT_EQ(told(), "failed: the service has been handed no credentials, and so no \"mail-password\"");
}

TEST_F(SmtpCarrierTest, TellsNoSecretThatAServerRepeats) {
    REQUIRE_SERVER(beginWithTls(R"(,"replies":{"AUTH":"535 you said AGFjbWUAc2VzYW1lLTk="})"));
    EXPECT_EQ(told(), "failed: SERVER does not let the user acme in (535)");
}

TEST_F(SmtpCarrierTest, TakesACredentialOfTheSystemsManager) {
    REQUIRE_SERVER(beginWithTls());
    password("sesame-9", "mail-password");
    settings_.passwordFile = "mail-password";
    ::setenv("CREDENTIALS_DIRECTORY", folder_.path().c_str(), 1);
    EXPECT_EQ(told(), "accepted: 250 2.0.0 taken");
    ::unsetenv("CREDENTIALS_DIRECTORY");
}

TEST_F(SmtpCarrierTest, TellsRefusalsOfALetterFromItsOwnFailures) {
    struct Case {
        char const* replies;
        char const* outcome;
    };
    for (auto const& [replies, outcome] : {
             Case{R"("RCPT":"550 5.1.1 no such user")", "refused: 550 5.1.1 no such user"},
             Case{R"("RCPT":"550-no\n550 such user")", "refused: 550 no such user"},
             Case{R"("RCPT":"450 4.2.1 later")", "failed: SERVER says: 450 4.2.1 later"},
             Case{R"("MAIL":"553 not you")", "refused: 553 not you"},
             Case{R"("MAIL":"530 5.7.0 log in first")", "failed: SERVER says: 530 5.7.0 log in first"},
             Case{R"("MAIL":"451 full")", "failed: SERVER says: 451 full"},
             Case{R"("DATA":"554 no")", "refused: 554 no"},
             Case{R"("EHLO":"421 go away")", "failed: SERVER says: 421 go away"},
             Case{R"(".":"554 5.6.0 looks like spam")", "refused: 554 5.6.0 looks like spam"},
             Case{R"(".":"452 mailbox full")", "failed: 452 mailbox full"},
             Case{R"(".":"421 good bye")", "failed: 421 good bye"},
         }) {
        REQUIRE_SERVER(begin("{\"replies\":{" + std::string(replies) + "}}"));
        EXPECT_EQ(told(), outcome) << replies;
        EXPECT_THAT(server_->messages(), IsEmpty()) << replies;
    }
}

TEST_F(SmtpCarrierTest, GoesOnBehindARefusal) {
    REQUIRE_SERVER(begin(R"({"size":2000})"));
    parcel_.document = std::string(5000, 'x');
    EXPECT_THAT(told(), StartsWith("refused: 552"));
    parcel_.document = "%PDF";
    EXPECT_EQ(told(), "accepted: 250 2.0.0 taken");
}

TEST_F(SmtpCarrierTest, HoldsAServerThatSpeaksGarbageForOneThatFails) {
    REQUIRE_SERVER(begin(R"({"replies":{"MAIL":"\u0007gobble \u001b[31m"}})"));
    EXPECT_EQ(told(), "failed: SERVER: it does not answer as a server of e-mail does");
    REQUIRE_SERVER(begin(R"({"replies":{".":"gobble"}})"));
    EXPECT_EQ(told(), "uncertain: SERVER did not say whether it has taken the message: "
                      "it does not answer as a server of e-mail does");
}

TEST_F(SmtpCarrierTest, IsUncertainWhenTheConnectionEndsBehindTheLastByte) {
    REQUIRE_SERVER(begin(R"({"behind":{".":"cut"}})"));
    EXPECT_THAT(told(), StartsWith("uncertain: SERVER did not say whether it has taken the message: "));
    EXPECT_THAT(server_->messages(), SizeIs(1));
}

TEST_F(SmtpCarrierTest, SendsNothingThatCannotBePutOnRecord) {
    REQUIRE_SERVER(begin());
    Carriers::SmtpCarrier carrier(settings_);
    EXPECT_EQ(
        failureOf([&] { carrier.handOver(parcel_, [] { throw std::runtime_error("the disk is full"); }); }),
        "the disk is full");
    EXPECT_EQ(told(), "accepted: 250 2.0.0 taken");
    EXPECT_THAT(server_->messages(), SizeIs(1));
}

TEST_F(SmtpCarrierTest, FailsWhereThereIsNoServer) {
    REQUIRE_SERVER(begin());
    server_.reset();
    Carriers::SmtpCarrier carrier(settings_);
    EXPECT_THAT(carrier.handOver(parcel_, [] {}).says, HasSubstr("Couldn't connect to server"));
    EXPECT_THAT(failureOf([&] { carrier.test(); }), StartsWith(settings_.url + ": "));
}

TEST_F(SmtpCarrierTest, GoesOnWithAServerThatGaveUpTheConnection) {
    REQUIRE_SERVER(begin(R"({"behind":{".":"leave"}})"));
    for (int i = 0; i < 20; ++i)
        EXPECT_EQ(told(), "accepted: 250 2.0.0 taken");
    EXPECT_THAT(server_->messages(), SizeIs(20));
}

TEST_F(SmtpCarrierTest, SaysWhatTheServerOffers) {
    REQUIRE_SERVER(begin(R"({"size":1000})"));
    EXPECT_EQ(Carriers::SmtpCarrier(settings_).test(), settings_.url + " offers SIZE 1000, 8BITMIME, HELP");
    REQUIRE_SERVER(beginWithTls());
    EXPECT_THAT(Carriers::SmtpCarrier(settings_).test(),
                AllOf(StartsWith(settings_.url + " lets the user acme in and offers SIZE"),
                      HasSubstr("AUTH LOGIN PLAIN")));
    settings_.passwordFile = password("wrong-7");
    EXPECT_EQ(failureOf([&] { Carriers::SmtpCarrier(settings_).test(); }),
              settings_.url + " does not let the user acme in (535)");
    EXPECT_THAT(server_->messages(), IsEmpty());
}

TEST_F(SmtpCarrierTest, SendsToOnePlainAddressAlone) {
    for (char const* const bad :
         {"", "ada", "ada@example.com, bob@example.com", "ada@example.com\r\nRCPT TO:<x@y.example>",
          "Ada <ada@example.com>", "zo\xC3\xAB@example.com", "ada@example.com>"}) {
        parcel_.letters.front().address = bad;
        Outcome const outcome = Carriers::SmtpCarrier(settings_).handOver(parcel_, [] { FAIL(); });
        EXPECT_EQ(outcome.kind, Outcome::Kind::Refused) << bad;
        EXPECT_EQ(outcome.says, '"' + std::string(bad) + "\" is not one plain e-mail address");
    }
    parcel_.letters.front().address = "ada@example.com";
    parcel_.replyTo = "x\r\nBcc: y@z.example";
    EXPECT_EQ(Carriers::SmtpCarrier(settings_).handOver(parcel_, [] { FAIL(); }).kind,
              Outcome::Kind::Refused);
}

TEST_F(SmtpCarrierTest, FillsTheTextsInOnceAndKeepsEachInItsPlace) {
    REQUIRE_SERVER(begin());
    settings_.text = "Dear {name},\n{key} of {id}\n.\nQUIT\n";
    parcel_.letters.front().fields = {{"invoice", "47\r\nBcc: evil@example.com\r\n\r\n{key}"},
                                      {"name", "Z\xC3\xB6\xC3\xAB"}};
    EXPECT_EQ(told(), "accepted: 250 2.0.0 taken");
    std::string const message = server_->messages().front();
    EXPECT_THAT(message, HasSubstr("\r\nSubject: Invoice 47  Bcc: evil@example.com    {key}\r\n"));
    EXPECT_THAT(message, Not(HasSubstr("\nBcc:")));
    EXPECT_THAT(message, HasSubstr("Dear Z=C3=B6=C3=AB,\r\np1-2 of p1\r\n.\r\nQUIT\r\n"));
    settings_.text = "{no_such_field}";
    carrier_.reset();
    EXPECT_EQ(told(), "refused: the letter has no field \"no_such_field\", which its carrier needs");
}

TEST_F(SmtpCarrierTest, MakesTheAddressOfAFaxGateway) {
    REQUIRE_SERVER(begin());
    settings_.to = "{phone_number}@fax.example";
    parcel_.letters.front().address = "+49 (30) 12-34";
    EXPECT_EQ(told(), "accepted: 250 2.0.0 taken");
    EXPECT_THAT(server_->messages().front(), StartsWith("bills@acme.example\n+49301234@fax.example\n"));
    parcel_.letters.front().address = "none";
    EXPECT_EQ(told(), "refused: the letter's address is no telephone number, which its carrier needs");
}

/// What becomes of a letter when the connection ends at each line.
class CutConnections : public SmtpCarrierTest, public testing::WithParamInterface<char const*> {};

TEST_P(CutConnections, LoseNoLetterAndSendNoneTwiceUnlessItIsTold) {
    int uncertain = 0;
    for (int line = 1; line <= 60; ++line) {
        REQUIRE_SERVER(begin(R"({"cut":[")" + std::string(GetParam()) + "\"," + std::to_string(line) + "]}"));
        std::string const outcome = told();
        std::size_t const had = server_->messages().size();
        if (outcome.starts_with("accepted")) {
            EXPECT_EQ(had, 1U) << line;
            break;
        }
        if (outcome.starts_with("uncertain")) {
            EXPECT_LE(had, 1U) << line;
            ++uncertain;
        } else {
            EXPECT_THAT(outcome, StartsWith("failed")) << line;
            EXPECT_EQ(had, 0U) << line << outcome;
            EXPECT_EQ(told(), "accepted: 250 2.0.0 taken") << line;
        }
        EXPECT_LT(line, 60);
    }
    EXPECT_GE(uncertain, 1);
}

INSTANTIATE_TEST_SUITE_P(OfEachSide, CutConnections, testing::Values("from", "to"));

TEST(MessageIds, AreMadeOfKeysAndGiveThemBack) {
    for (std::string const key : {"p1-2", "a b@c-1", "\xC3\xA4.%-9", "7d3f-44-1"}) {
        std::string const id = Carriers::messageIdFor(key, "acme.example");
        EXPECT_EQ(Carriers::keyOfMessageId(id), key);
        EXPECT_EQ(id.find_first_not_of("abcdefghijklmnopqrstuvwxyz0123456789-%@."), id.npos) << id;
        EXPECT_EQ(id.find('@'), id.rfind('@'));
    }
    EXPECT_EQ(Carriers::messageIdFor("p1-2", "acme.example"), "p1-2@acme.example");
    EXPECT_EQ(Carriers::keyOfMessageId("a%2"), "");
    EXPECT_EQ(Carriers::keyOfMessageId("a%zz@b"), "");
}

} // namespace

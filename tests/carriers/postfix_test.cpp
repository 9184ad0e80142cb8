// Letters to a mail server that people run, and what it sends back.
#include "programs/base/base64.h"
#include "programs/carriers/mime_message.h"
#include "programs/carriers/smtp_carrier.h"
#include "tests/carriers/parcel_help.h"
#include "tests/carriers/postfix_server.h"
#include "tests/channel/test_certificate.h"
#include "tests/support/temporary_folder.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <optional>

namespace {

namespace fs = std::filesystem;

using Carriers::MailReport;
using Carriers::Outcome;
using testing::AllOf;
using testing::HasSubstr;
using testing::StartsWith;

class PostfixTest : public testing::Test {
protected:
    void SetUp() override {
        if (!PostfixServer::whyNot().empty())
            GTEST_SKIP() << PostfixServer::whyNot();
        fs::permissions(folder_.path(), fs::perms(0755));
        auto const files = ChannelTest::makeCertificate(folder_.path().string(), "127.0.0.1");
        server_.emplace(folder_ / "server", files.certificateFile, files.keyFile);
        Protocol::CarrierSettings settings;
        settings.type = Protocol::CarrierType::Smtp;
        settings.url = server_->url();
        settings.caFile = files.certificateFile;
        settings.from = "bills@acme.example";
        settings.subject = "Rechnung für {key}";
        settings.text = "Dear customer,\n\nhere it is.\n";
        carrier_.emplace(settings);
    }

    Outcome sendTo(std::string const& address, std::string const& document = "%PDF of a letter") {
        Carriers::Parcel parcel;
        parcel.key = "p1-2";
        parcel.mailing = "p1";
        parcel.document = document;
        Carriers::OutgoingLetter& letter = parcel.letters.emplace_back();
        letter.key = parcel.key;
        letter.address = address;
        return carrier_->handOver(parcel, [] {});
    }

    TemporaryFolder folder_;
    std::optional<PostfixServer> server_;
    std::optional<Carriers::SmtpCarrier> carrier_;
};

TEST_F(PostfixTest, DeliversALetterThatCameWithTlsIntoTheMailbox) {
    Outcome const outcome = sendTo("ada@example.com");
    EXPECT_EQ(outcome.kind, Outcome::Kind::Accepted);
    EXPECT_THAT(outcome.says, StartsWith("250 2.0.0 Ok: queued as "));
    EXPECT_THAT(server_->mailOf("ada"),
                AllOf(StartsWith("Return-Path: <bills@acme.example>\n"), HasSubstr("with ESMTPS id "),
                      HasSubstr("\nMessage-Id: <p1-2@acme.example>\n"),
                      HasSubstr("\nSubject: Rechnung =?UTF-8?B?ZsO8cg==?= p1-2\n"),
                      HasSubstr("filename=p1-2.pdf"), HasSubstr(Base::toBase64("%PDF of a letter"))));
}

TEST_F(PostfixTest, TellsOfARecipientWhomTheServerDoesNotKnowInItsWords) {
    Outcome const outcome = sendTo("nobody@example.com");
    EXPECT_EQ(outcome.kind, Outcome::Kind::Refused);
    EXPECT_EQ(outcome.says,
              "550 5.1.1 <nobody@example.com>: Recipient address rejected: User unknown in virtual "
              "mailbox table");
    EXPECT_EQ(sendTo("ada@example.com").kind, Outcome::Kind::Accepted) << "others go on";
}

TEST_F(PostfixTest, RefusesALetterThatIsLargerThanTheServerTakes) {
    Outcome const outcome = sendTo("ada@example.com", std::string(PostfixServer::SIZE_LIMIT, 'x'));
    EXPECT_EQ(outcome.kind, Outcome::Kind::Refused);
    EXPECT_EQ(outcome.says, "552 5.3.4 Message size exceeds fixed limit");
}

TEST_F(PostfixTest, ReadsFromTheServersReportWhichLetterCameBack) {
    ASSERT_EQ(sendTo("gone@example.com").kind, Outcome::Kind::Accepted);
    MailReport const report = Carriers::mailReportIn(server_->mailOf("bills"));
    EXPECT_EQ(report.kind, MailReport::Kind::Returned);
    EXPECT_EQ(Carriers::keyOfMessageId(report.messageId), "p1-2");
    EXPECT_EQ(report.says, "user unknown");
}

TEST_F(PostfixTest, SaysWhatTheServerOffers) {
    EXPECT_THAT(carrier_->test(), AllOf(StartsWith(server_->url() + " offers "), HasSubstr("SIZE 3000000")));
}

} // namespace

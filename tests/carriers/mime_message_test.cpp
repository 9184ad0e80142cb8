#include "programs/carriers/mime_message.h"

#include "programs/base/base64.h"
#include "programs/base/error.h"
#include "tests/support/failure_of.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using Carriers::MailMessage;
using Carriers::MailReport;
using testing::EndsWith;
using testing::HasSubstr;
using testing::StartsWith;

MailMessage billOf(std::string const& subject) {
    MailMessage message;
    message.from = "bills@acme.example";
    message.to = "ada@example.com";
    message.subject = subject;
    message.messageId = "p1-2@acme.example";
    message.attachments = {{"p1-2.pdf", "%PDF"}};
    return message;
}

/// Without what tells the time.
std::string undated(std::string const& mime) {
    EXPECT_THAT(mime, StartsWith("Date: "));
    return mime.substr(mime.find("\r\n") + 2);
}

TEST(MimeMessages, AreHeadersATextAndFiles) {
    MailMessage message = billOf("Invoice 4711");
    message.fromName = "Acme, Bills";
    message.text = "Dear Ada,\nhere it is.\n";
    std::string const mime = Carriers::inMime(message);
    EXPECT_EQ(undated(mime), "From: \"Acme, Bills\" <bills@acme.example>\r\n"
                             "Subject: Invoice 4711\r\n"
                             "To: ada@example.com\r\n"
                             "Message-Id: <p1-2@acme.example>\r\n"
                             "Auto-Submitted: auto-generated\r\n"
                             "MIME-Version: 1.0\r\n"
                             "Content-Type: multipart/mixed; boundary=\"=_part\"\r\n"
                             "\r\n"
                             "--=_part\r\n"
                             "Content-Type: text/plain; charset=utf-8\r\n"
                             "Content-Transfer-Encoding: quoted-printable\r\n"
                             "\r\n"
                             "Dear Ada,\r\n"
                             "here it is.\r\n"
                             "\r\n"
                             "--=_part\r\n"
                             "Content-Type: application/pdf; name=p1-2.pdf\r\n"
                             "Content-Transfer-Encoding: base64\r\n"
                             "Content-Disposition: attachment; filename=p1-2.pdf\r\n"
                             "\r\n"
                             "JVBERg==\r\n"
                             "\r\n"
                             "--=_part--\r\n");
}

TEST(MimeMessages, AreTheSameForTheSame) {
    EXPECT_EQ(undated(Carriers::inMime(billOf("a"))), undated(Carriers::inMime(billOf("a"))));
}

TEST(MimeMessages, HaveShortLinesThatEndAsTheyMust) {
    MailMessage message = billOf("Fällig: " + std::string(200, 'x') + " " + std::string(80, '\xC3') + '\xBC');
    message.subject = "F\xC3\xA4llig " + std::string(100, 'x') + ' ' + std::string(100, 'y');
    message.text = std::string(5000, 'z') + "\n.\nFrom me\n=_part\n--=_part--\n";
    std::string const file = std::string("\0\r\n.\r\n\xFF", 7) + std::string(10'000, 'a');
    message.attachments.front().bytes = file;
    std::string const mime = Carriers::inMime(message);
    std::size_t longest = 0;
    for (std::size_t at = 0; at < mime.size();) {
        std::size_t const end = mime.find('\n', at);
        ASSERT_NE(end, mime.npos);
        ASSERT_EQ(mime[end - 1], '\r');
        longest = std::max(longest, end - at);
        at = end + 1;
    }
    EXPECT_LT(longest, 200U);
    EXPECT_THAT(mime, EndsWith("\r\n--=_part--\r\n"));
    EXPECT_THAT(mime, HasSubstr("=3D_part"));
    EXPECT_EQ(mime.find("\r\n--=_part--\r\n"), mime.size() - 14);
}

TEST(MimeMessages, AreReadInAnyPiecesAndHoldTheirFiles) {
    MailMessage message = billOf("a");
    for (std::size_t const size : {0U, 1U, 2U, 3U, 56U, 57U, 58U, 113U, 114U, 1000U}) {
        std::string file;
        for (std::size_t i = 0; i < size; ++i)
            file += static_cast<char>(i * 37);
        message.attachments = {{"a.pdf", file}, {"b.pdf", file}};
        std::string const whole = undated(Carriers::inMime(message));
        std::string encoded = "\r\n\r\n";
        for (std::size_t at = 0; at < size; at += 57)
            encoded += Base::toBase64(file.substr(at, 57)) + "\r\n";
        std::size_t const first = whole.find(encoded + "\r\n--=_part\r\n");
        EXPECT_NE(first, whole.npos) << size;
        EXPECT_NE(whole.find(encoded + "\r\n--=_part--", first + 1), whole.npos) << size;
        for (std::size_t room = Carriers::MimeText::MIN_ROOM; room < 300; room += 7) {
            Carriers::MimeText text(message);
            std::string buffer(room, ' ');
            std::string read;
            while (std::size_t const taken = text.read(buffer.data(), room))
                read.append(buffer, 0, taken);
            EXPECT_EQ(read.size(), text.size());
            EXPECT_EQ(undated(read), whole) << size << ' ' << room;
        }
    }
}

std::string report(std::string const& status, std::string const& third) {
    return "From: MAILER-DAEMON@mail.example\r\n"
           "To: bills@acme.example\r\n"
           "Subject: Undelivered Mail Returned to Sender\r\n"
           "MIME-Version: 1.0\r\n"
           "Content-Type: multipart/report; report-type=delivery-status; boundary=\"XX\"\r\n"
           "\r\n"
           "--XX\r\n"
           "\r\n"
           "Dear sender, action: delivered\r\n"
           "--XX\r\n"
           "Content-Type: message/delivery-status\r\n"
           "\r\n"
           "Reporting-MTA: dns; mail.example\r\n"
           "\r\n" +
           status + "\r\n--XX\r\n" + third + "\r\n--XX--\r\n";
}

std::string const ORIGINAL = "Content-Type: message/rfc822\r\n\r\n"
                             "From: bills@acme.example\r\nMessage-ID:\r\n <p1-2@acme.example>\r\n\r\ntext";
std::string const HEADERS = "Content-Type: text/rfc822-headers\r\n\r\n"
                            "Subject: x\r\nmessage-id: <p1-2@acme.example>\r\n";

TEST(MailReports, TellWhatBecameOfWhichMessage) {
    for (std::string const& third : {ORIGINAL, HEADERS}) {
        MailReport const read =
            Carriers::mailReportIn(report("Final-Recipient: rfc822; ada@example.com\r\n"
                                          "ACTION: Failed\r\n"
                                          "Status: 5.1.1\r\n"
                                          "Diagnostic-Code: smtp; 550 no\r\n\tsuch user\r\n",
                                          third));
        EXPECT_EQ(read.kind, MailReport::Kind::Returned);
        EXPECT_EQ(read.messageId, "p1-2@acme.example");
        EXPECT_EQ(read.says, "550 no such user");
    }
    EXPECT_EQ(Carriers::mailReportIn(report("Action: delivered\r\n", HEADERS)).kind,
              MailReport::Kind::Delivered);
    EXPECT_EQ(Carriers::mailReportIn(report("Action: delayed\r\n", HEADERS)).kind,
              MailReport::Kind::UnderWay);
    EXPECT_EQ(Carriers::mailReportIn(report("Action: relayed\r\n", HEADERS)).kind,
              MailReport::Kind::UnderWay);
}

TEST(MailReports, AreReadWithUnixLinesToo) {
    std::string text = report("Action: failed\r\n", ORIGINAL);
    std::erase(text, '\r');
    EXPECT_EQ(Carriers::mailReportIn(text).messageId, "p1-2@acme.example");
}

TEST(MailReports, AreReadWhereTheirEndIsMissing) {
    std::string const text = report("Action: failed\r\n", ORIGINAL);
    for (std::size_t size = 0; size < text.size(); ++size) {
        try {
            MailReport const read = Carriers::mailReportIn(text.substr(0, size));
            EXPECT_THAT("p1-2@acme.example", testing::StartsWith(read.messageId)) << size;
        } catch (Base::Error const&) {
            EXPECT_LT(size, text.find("<p1-2") + 19);
        }
    }
}

TEST(MailReports, AreNotReadIntoOtherMessages) {
    for (std::string const& other :
         {std::string(), std::string("Subject: hi\r\n\r\nhello"), std::string("\0\xFF\n:", 4)})
        EXPECT_EQ(failureOf([&] { Carriers::mailReportIn(other); }),
                  "the message is no report of a server of e-mail (multipart/report)");
    EXPECT_EQ(failureOf([] { Carriers::mailReportIn({}); }),
              "the message is no report of a server of e-mail (multipart/report)");
    std::string text = report("Action: failed\r\n", "\r\nno original");
    EXPECT_EQ(failureOf([&] { Carriers::mailReportIn(text); }),
              "the report does not tell which message it is about (Message-ID)");
    EXPECT_EQ(Carriers::mailReportIn("In-Reply-To: <p1-3@acme.example>\r\n" + text).messageId,
              "p1-3@acme.example");
    text.replace(text.find("message/delivery-status"), 23, "text/plain; x=abcdefghi");
    EXPECT_EQ(failureOf([&] { Carriers::mailReportIn(text); }),
              "the report does not tell what became of a message (message/delivery-status)");
}

} // namespace

#include "programs/vlmail/workbench/admission.h"
#include "programs/vlmail/workbench/page_files.h"
#include "programs/vlmail/workbench/request.h"

#include "programs/base/error.h"
#include "tests/support/temporary_folder.h"

#include <fstream>
#include <gmock/gmock.h>

namespace {

using namespace VlMail::Workbench;
using testing::HasSubstr;
using testing::StartsWith;

std::string post(std::string const& body) {
    return "POST /api/state HTTP/1.1\r\nHost: 127.0.0.1:80\r\nX-Workbench-Token: t\r\nContent-Length: " +
           std::to_string(body.size()) + "\r\n\r\n" + body;
}

TEST(WorkbenchRequests, AreReadByteByByte) {
    RequestReader reader;
    std::string const text = post("{}");
    for (char const c : text.substr(0, text.size() - 1)) {
        reader.put({&c, 1});
        ASSERT_FALSE(reader.take());
    }
    EXPECT_FALSE(reader.isBetweenRequests());
    reader.put(text.substr(text.size() - 1));
    auto const taken = reader.take();
    ASSERT_TRUE(taken);
    Request const request = std::get<Request>(*taken);
    EXPECT_EQ(request.method, Request::Method::Post);
    EXPECT_EQ(request.target, "/api/state");
    EXPECT_EQ(request.host, "127.0.0.1:80");
    EXPECT_EQ(request.token, "t");
    EXPECT_EQ(request.body, "{}");
    EXPECT_TRUE(reader.isBetweenRequests());
}

TEST(WorkbenchRequests, ComeOneBehindTheOther) {
    RequestReader reader;
    reader.put(post("{\"a\":1}") + post("{\"b\":2}"));
    EXPECT_EQ(std::get<Request>(*reader.take()).body, "{\"a\":1}");
    EXPECT_EQ(std::get<Request>(*reader.take()).body, "{\"b\":2}");
    EXPECT_FALSE(reader.take());
}

Answer refusalOf(std::string const& text) {
    RequestReader reader;
    reader.put(text);
    auto const taken = reader.take();
    return taken && std::holds_alternative<Answer>(*taken) ? std::get<Answer>(*taken) : Answer{};
}

TEST(WorkbenchRequests, AreRefusedAboveFourMebibytesBeforeTheyCome) {
    Answer const refusal =
        refusalOf("POST /api/evaluate HTTP/1.1\r\nHost: x\r\nContent-Length: 4194305\r\n\r\n");
    EXPECT_EQ(refusal.status, 413);
    EXPECT_EQ(refusal.body,
              "{\"error\":{\"code\":\"too-large\",\"line\":\"the request has more than 4 MiB; the "
              "settings are too large for the workbench\"}}\n");
}

TEST(WorkbenchRequests, OfFourMebibytesAreRead) {
    RequestReader reader;
    reader.put(post(std::string(MAX_BODY_BYTES, ' ')));
    auto const taken = reader.take();
    ASSERT_TRUE(taken && std::holds_alternative<Request>(*taken));
    EXPECT_EQ(std::get<Request>(*taken).body.size(), MAX_BODY_BYTES);
}

TEST(WorkbenchRequests, WithEndlessHeadersAreRefused) {
    EXPECT_EQ(refusalOf("GET / HTTP/1.1\r\nX: " + std::string(MAX_HEADER_BYTES, 'x')).status, 431);
}

TEST(WorkbenchRequests, ThatAreNoneAreRefused) {
    EXPECT_EQ(refusalOf("\x16\x03\x01 what is this\r\n\r\n").status, 400);
    EXPECT_EQ(refusalOf("GET / HTTP/1.1\r\nContent-Length: -1\r\n\r\n").status, 400);
}

TEST(WorkbenchAnswers, KeepBrowsersFromAnythingButShowingThem) {
    std::string const text = wireTextOf({200, "text/html", "<p>"}, true);
    EXPECT_THAT(text, StartsWith("HTTP/1.1 200 OK\r\n"));
    EXPECT_THAT(text, HasSubstr("\r\nCache-Control: no-store\r\n"));
    EXPECT_THAT(text, HasSubstr("\r\nX-Content-Type-Options: nosniff\r\n"));
    EXPECT_THAT(text,
                HasSubstr("\r\nContent-Security-Policy: default-src 'none'; script-src 'self'; style-src "
                          "'self'; img-src 'self' blob:; connect-src 'self'; base-uri 'none'; form-action "
                          "'none'; frame-ancestors 'none'\r\n"));
    EXPECT_THAT(text, HasSubstr("\r\nContent-Length: 3\r\n\r\n<p>"));
}

TEST(WorkbenchAnswers, OfFailuresAreTheirCodeAndOneLine) {
    Answer const answer = failureOf(Base::Error(Base::Code::SettingsChanged, "b\xff\"c"));
    EXPECT_EQ(answer.status, 409);
    EXPECT_EQ(answer.body, "{\"error\":{\"code\":\"settings-changed\",\"line\":\"b\xef\xbf\xbd\\\"c\"}}\n");
}

class WorkbenchAdmission : public testing::Test {
protected:
    /// 0 when the request may go on.
    int status() const {
        auto const refusal = admission.refusalOf(request);
        return refusal ? refusal->status : 0;
    }

    Admission admission{"secret", 4711};
    Request request{Request::Method::Post, "/api/state", "127.0.0.1:4711", "http://127.0.0.1:4711", "secret"};
};

TEST_F(WorkbenchAdmission, TakesThePageWithTheToken) {
    EXPECT_EQ(status(), 0);
    request.origin.clear();
    EXPECT_EQ(status(), 0);
}

TEST_F(WorkbenchAdmission, RefusesAnotherToken) {
    for (char const* const token : {"", "secre", "secret ", "Secret", "secretsecret"}) {
        request.token = token;
        EXPECT_EQ(status(), 403) << token;
    }
}

TEST_F(WorkbenchAdmission, NeverTakesAnEmptyToken) {
    admission.token.clear();
    request.token.clear();
    EXPECT_EQ(status(), 403);
}

TEST_F(WorkbenchAdmission, RefusesOtherHosts) {
    for (char const* const host :
         {"", "localhost:4711", "127.0.0.1", "127.0.0.1:4712", "evil.example:4711"}) {
        request.host = host;
        EXPECT_EQ(status(), 403) << host;
        EXPECT_THAT(admission.refusalOf(request)->body, HasSubstr("\"not-allowed\"")) << host;
    }
}

TEST_F(WorkbenchAdmission, RefusesPagesOfOtherOrigins) {
    for (char const* const origin :
         {"null", "https://127.0.0.1:4711", "http://127.0.0.1:4711.evil.example", "http://localhost:4711"}) {
        request.origin = origin;
        EXPECT_EQ(status(), 403) << origin;
    }
}

TEST_F(WorkbenchAdmission, WantsPostForRequestsAndGetForFiles) {
    request.method = Request::Method::Get;
    EXPECT_EQ(status(), 405);
    request = {Request::Method::Post, "/", "127.0.0.1:4711"};
    EXPECT_EQ(status(), 405);
    request.method = Request::Method::Get;
    EXPECT_EQ(status(), 0);
}

TEST_F(WorkbenchAdmission, PutsTheTokenWhereItIsNotSent) {
    EXPECT_EQ(admission.url(), "http://127.0.0.1:4711/#secret");
}

TEST(WorkbenchPage, IsEmbedded) {
    Answer const page = pageFile("/");
    EXPECT_EQ(page.status, 200);
    EXPECT_EQ(page.type, "text/html; charset=utf-8");
    EXPECT_THAT(page.body, StartsWith("<!DOCTYPE html>"));
    EXPECT_EQ(pageFile("/index.html?x=1").body, page.body);
}

TEST(WorkbenchPage, HasNoOtherFiles) {
    for (char const* const target :
         {"/other", "/../door.h", "//etc/passwd", "*", "", "/codemirror/", "/page/",
          "/codemirror/../../../../etc/passwd", "/codemirror/lib/codemirror.js"})
        EXPECT_EQ(pageFile(target).status, std::string(target).empty() ? 200 : 404) << target;
}

TEST(WorkbenchPage, TakesTheEditorFromWhereTheSystemHasIt) {
    TemporaryFolder const folder;
    EXPECT_EQ(pageFile("/codemirror/codemirror.js", folder.path()).status, 404);
    std::filesystem::create_directory(folder.path() / "lib");
    std::ofstream(folder.path() / "lib" / "codemirror.js") << "let a";
    Answer const file = pageFile("/codemirror/codemirror.js", folder.path());
    EXPECT_EQ(file.status, 200);
    EXPECT_EQ(file.type, "text/javascript; charset=utf-8");
    EXPECT_EQ(file.body, "let a");
}

} // namespace

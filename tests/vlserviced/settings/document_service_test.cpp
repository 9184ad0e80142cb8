#include "programs/vlserviced/settings/document_service.h"

#include "programs/base/base64.h"
#include "programs/vlserviced/store/schema.h"
#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"

#include <gmock/gmock.h>

namespace {

using Protocol::DocumentUpload;
using testing::ElementsAre;
using testing::IsEmpty;
using VlServiced::DocumentService;

/// What put() gives when it has nothing to complain of.
constexpr char const* STORED = "nothing was thrown";

class DocumentServiceTest : public testing::Test {
protected:
    DocumentServiceTest() {
        nodes_.add("u=bob/ou=sales/a=acme");
        nodes_.add("u=eve/");
    }

    static DocumentUpload upload(std::string const& node, std::string const& name, std::string const& bytes) {
        DocumentUpload whole;
        whole.id = node;
        whole.name = name;
        whole.sha256 = Base::sha256(bytes);
        whole.bytes = static_cast<long long>(bytes.size());
        whole.data = Base::toBase64(bytes);
        return whole;
    }
    std::string put(std::string const& node, std::string const& name, std::string const& bytes) {
        return failureOf([&] { EXPECT_TRUE(service_.put(upload(node, name, bytes)).complete); });
    }
    /// Sends the first bytes alone.
    DocumentUpload begun(std::string const& bytes, std::size_t first, std::string const& name = "x.pdf") {
        DocumentUpload piece = upload("a=acme", name, bytes);
        piece.data = Base::toBase64(bytes.substr(0, first));
        piece.upload = service_.put(piece).upload;
        piece.offset = static_cast<long long>(first);
        piece.data = Base::toBase64(bytes.substr(first));
        return piece;
    }
    std::vector<std::string> listed(std::string const& node) const {
        std::vector<std::string> lines;
        for (auto const& document : service_.list(Protocol::DocumentsQuery(node)).documents)
            lines.push_back(document.node + ":" + document.name);
        return lines;
    }
    int pieces() { return static_cast<int>(database_->number("SELECT count(*) FROM document_pieces")); }

    TemporaryFolder folder_;
    std::unique_ptr<Database::Connection> database_ = VlServiced::openServiceDatabase(folder_ / "service.db");
    VlServiced::SettingsStore nodes_{*database_};
    VlServiced::SettingsService settings_{nodes_};
    VlServiced::DocumentStore documents_{*database_};
    long long now_ = 1000;
    DocumentService service_{documents_, nodes_, settings_, [this] { return now_; }};
};

TEST_F(DocumentServiceTest, TellsWhatCountsAtANodeTheNearestOfANameAlone) {
    EXPECT_EQ(put("", "blue.pdf", "root"), STORED);
    EXPECT_EQ(put("", "all.pdf", "root"), STORED);
    EXPECT_EQ(put("a=acme", "blue.pdf", "acme"), STORED);
    EXPECT_EQ(put("a=acme", "green.pdf", "acme"), STORED);
    EXPECT_EQ(put("u=bob/ou=sales/a=acme", "blue.pdf", "bob"), STORED);
    EXPECT_THAT(listed("u=bob/ou=sales/a=acme"),
                ElementsAre("u=bob/ou=sales/a=acme:blue.pdf", "a=acme:green.pdf", ":all.pdf"));
    EXPECT_THAT(listed("ou=new/a=acme"), ElementsAre("a=acme:blue.pdf", "a=acme:green.pdf", ":all.pdf"));
    EXPECT_THAT(listed("u=eve/"), ElementsAre(":all.pdf", ":blue.pdf"));
    EXPECT_THAT(listed(""), ElementsAre(":all.pdf", ":blue.pdf"));
}

TEST_F(DocumentServiceTest, TakesADocumentInPiecesAndGivesItBack) {
    DocumentUpload rest = begun("first and second", 5);
    EXPECT_THAT(listed("a=acme"), IsEmpty());
    EXPECT_TRUE(service_.put(rest).complete);
    EXPECT_THAT(listed("a=acme"), ElementsAre("a=acme:x.pdf"));
    EXPECT_EQ(service_.piece({rest.sha256, 0}).data, Base::toBase64("first"));
    EXPECT_EQ(service_.piece({rest.sha256, 5}).data, Base::toBase64(" and second"));
    EXPECT_EQ(service_.piece({rest.sha256, 16}).data, "");
    EXPECT_EQ(failureOf([&] {
                  service_.piece({std::string(64, '7'), 0});
              }),
              "the service has no document of the digest " + std::string(64, '7') +
                  " any more: it was replaced or removed");
}

TEST_F(DocumentServiceTest, RefusesWhatCannotBeADocumentOfANode) {
    EXPECT_EQ(
        put("a=new", "x.pdf", "x"),
        "there is no node a=new; correct the id, or set something at it first (\"vlmail settings set\")");
    EXPECT_THAT(put("new", "x.pdf", "x"), testing::StartsWith("node id \"new\" is not valid: "));
    for (std::string const name : {"../up", ".hidden", "", "a/b", "a\nb"})
        EXPECT_THAT(
            put("a=acme", name, "x"),
            testing::EndsWith("was not stored: that cannot be the name of a document; choose one without / "
                              "\\ : * ? \" < > |, control characters and a dot in front, of at most 200 "
                              "bytes"))
            << name;
    EXPECT_EQ(
        put("a=acme", "x.pdf", ""),
        "the document \"x.pdf\" was not stored: it has to have 1 byte at least and 64 MiB at most; leave "
        "out what is not to be printed");
    DocumentUpload huge = upload("a=acme", "x.pdf", "x");
    huge.bytes = Protocol::MAX_DOCUMENT_BYTES + 1;
    EXPECT_EQ(
        failureOf([&] { service_.put(huge); }),
        "the document \"x.pdf\" was not stored: it has to have 1 byte at least and 64 MiB at most; leave "
        "out what is not to be printed");
    EXPECT_EQ(pieces(), 0);
}

TEST_F(DocumentServiceTest, KeepsNothingOfPiecesThatDoNotFit) {
    std::string const noFit =
        "the document \"x.pdf\" was not stored: its pieces do not fit together; put it once more";
    std::string const brokenOff =
        "the document \"x.pdf\" was not stored: it was broken off, and nothing of it is "
        "kept; put it once more";
    for (long long const offset : {0LL, 4LL, 6LL, 1'000'000LL}) {
        DocumentUpload rest = begun("first and second", 5);
        rest.offset = offset;
        EXPECT_EQ(failureOf([&] { service_.put(rest); }), noFit) << offset;
        EXPECT_EQ(pieces(), 0);
        rest.offset = 5;
        EXPECT_EQ(failureOf([&] { service_.put(rest); }), brokenOff);
    }
    DocumentUpload rest = begun("first and second", 5);
    rest.data = Base::toBase64(" and second and more");
    EXPECT_EQ(failureOf([&] { service_.put(rest); }), noFit);
    rest = begun("first and second", 5);
    rest.data = Base::toBase64(" and SECOND");
    EXPECT_EQ(failureOf([&] { service_.put(rest); }), "the document \"x.pdf\" was not stored: what arrived "
                                                      "is another document than its digest says; put it "
                                                      "once more");
    rest = begun("first and second", 5);
    rest.name = "y.pdf";
    EXPECT_THAT(failureOf([&] { service_.put(rest); }), testing::HasSubstr("it was broken off"));
    EXPECT_THAT(listed("a=acme"), IsEmpty());
}

TEST_F(DocumentServiceTest, TakesPiecesOfItsSizeAlone) {
    std::string const wrong =
        "the document \"x.pdf\" was not stored: a piece of it has to be 1 to 1048576 bytes in "
        "Base64";
    DocumentUpload piece = upload("a=acme", "x.pdf", std::string(Protocol::MAX_PIECE_BYTES + 1, 'x'));
    EXPECT_EQ(failureOf([&] { service_.put(piece); }), wrong);
    for (char const* const data : {"", "x", "eA=", "eA==\n", "\xff"}) {
        piece.data = data;
        EXPECT_EQ(failureOf([&] { service_.put(piece); }), wrong) << data;
    }
    EXPECT_EQ(put("a=acme", "x.pdf", std::string(Protocol::MAX_PIECE_BYTES, 'x')), STORED);
    EXPECT_EQ(pieces(), 1);
}

TEST_F(DocumentServiceTest, ForgetsWhatStandsStillAndTheOldestOfTooMany) {
    DocumentUpload const stalled = begun("first and second", 5, "stalled");
    now_ += DocumentService::UPLOAD_PATIENCE;
    service_.dropStalled();
    EXPECT_EQ(pieces(), 1);
    now_ += 1;
    service_.dropStalled();
    EXPECT_EQ(pieces(), 0);
    EXPECT_THAT(failureOf([&] { service_.put(stalled); }), testing::HasSubstr("it was broken off"));
    DocumentUpload const first = begun("first and second", 5, "first");
    ++now_;
    DocumentUpload const second = begun("first and second", 5, "second");
    for (std::size_t i = 1; i < DocumentService::MAX_UPLOADS; ++i)
        begun("first and second", 5, "more");
    EXPECT_EQ(pieces(), static_cast<int>(DocumentService::MAX_UPLOADS));
    EXPECT_THAT(failureOf([&] { service_.put(first); }), testing::HasSubstr("it was broken off"));
    EXPECT_TRUE(service_.put(second).complete);
}

TEST_F(DocumentServiceTest, KeepsNothingOfWhatAnEarlierProcessDidNotFinish) {
    DocumentUpload const rest = begun("first and second", 5);
    DocumentService next(documents_, nodes_, settings_, [] { return 1000LL; });
    EXPECT_EQ(pieces(), 0);
    EXPECT_THAT(failureOf([&] { next.put(rest); }), testing::HasSubstr("it was broken off"));
}

TEST_F(DocumentServiceTest, StoresNothingAtANodeThatGoesMeanwhile) {
    DocumentUpload rest = upload("u=eve/", "x", "first and second");
    rest.data = Base::toBase64("first");
    rest.upload = service_.put(rest).upload;
    nodes_.remove("u=eve/");
    rest.offset = 5;
    rest.data = Base::toBase64(" and second");
    EXPECT_THAT(failureOf([&] { service_.put(rest); }), testing::StartsWith("there is no node u=eve/; "));
    EXPECT_EQ(pieces(), 0);
}

TEST_F(DocumentServiceTest, RemovesWhatLiesAtTheNodeItself) {
    put("a=acme", "blue.pdf", "blue");
    put("", "red.pdf", "red");
    EXPECT_EQ(
        failureOf([&] {
            service_.remove({"a=acme", "red"});
        }),
        "node a=acme has no document \"red\" of its own; \"vlmail documents list\" shows which lies where");
    EXPECT_EQ(service_.remove({"a=acme", "blue"}).name, "blue.pdf");
    EXPECT_EQ(service_.remove({"", "red.pdf"}).sha256, Base::sha256("red"));
    EXPECT_THAT(listed("a=acme"), IsEmpty());
    EXPECT_EQ(
        failureOf([&] {
            service_.remove({"", "red.pdf"});
        }),
        "the root has no document \"red.pdf\" of its own; \"vlmail documents list\" shows which lies where");
    EXPECT_THAT(failureOf([&] { service_.remove({"a=new", "x"}); }), testing::StartsWith("there is no node"));
}

TEST_F(DocumentServiceTest, ChangesNothingWhileChangesAreHeldBack) {
    put("a=acme", "blue.pdf", "blue");
    settings_.suspend(1);
    std::string const held = "changes of settings are held back at the moment";
    EXPECT_EQ(put("a=acme", "x.pdf", "x"), held);
    EXPECT_EQ(failureOf([&] { service_.remove({"a=acme", "blue"}); }), held);
    EXPECT_THAT(listed("a=acme"), ElementsAre("a=acme:blue.pdf"));
}

TEST_F(DocumentServiceTest, HasNoRoomForMoreThanSoManyAtANode) {
    // What is counted here need not survive a power cut, and five hundred waits for the disk are long.
    database_->run("PRAGMA synchronous = OFF");
    for (long long i = 0; i < Protocol::MAX_DOCUMENTS; ++i)
        ASSERT_EQ(put("", std::to_string(i), "x"), STORED);
    EXPECT_EQ(put("", "more", "x"),
              "the document \"more\" was not stored: the root has 500 documents, more are not "
              "possible; remove some first");
    EXPECT_EQ(put("", "7", "another"), STORED);
}

TEST_F(DocumentServiceTest, TellsOfADiskThatIsFullAndKeepsNothing) {
    put("a=acme", "old.pdf", "old");
    database_->run("PRAGMA max_page_count = " + std::to_string(database_->number("PRAGMA page_count") + 8));
    EXPECT_EQ(put("a=acme", "x.pdf", std::string(500'000, 'x')),
              "the document \"x.pdf\" was not stored: database or disk is full; make room on the disk of the "
              "service");
    EXPECT_THAT(listed("a=acme"), ElementsAre("a=acme:old.pdf"));
    EXPECT_EQ(put("a=acme", "small.pdf", "small"), STORED);
    EXPECT_EQ(pieces(), 2);
}

} // namespace

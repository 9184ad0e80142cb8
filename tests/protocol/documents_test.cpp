#include "programs/protocol/documents.h"

#include "tests/support/failure_of.h"
#include "tests/vlserviced/json_help.h"

#include <gtest/gtest.h>

namespace {

using Protocol::DocumentPieceQuery;
using Protocol::DocumentRemoval;
using Protocol::DocumentsAnswer;
using Protocol::DocumentsQuery;
using Protocol::DocumentUpload;
using Protocol::StoredDocument;

DocumentsAnswer answerOf(std::vector<std::pair<std::string, std::string>> const& nodesAndNames) {
    DocumentsAnswer answer;
    for (auto const& [node, name] : nodesAndNames) {
        answer.documents.emplace_back();
        answer.documents.back().node = node;
        answer.documents.back().name = name;
    }
    return answer;
}

std::string found(DocumentsAnswer const& answer, std::string const& id) {
    StoredDocument const* const document = answer.find(id);
    return document ? document->node + ":" + document->name : "none";
}

TEST(QuestionsAboutDocuments, NeverTakeAMissingIdForTheRoot) {
    EXPECT_EQ(DocumentsQuery(parse(R"({"id":""})")).id, "");
    EXPECT_EQ(failureOf([] { DocumentsQuery{parse("{}")}; }),
              "\"id\" of a query for documents has to be the id of a node");
    EXPECT_EQ(failureOf([] { DocumentRemoval{parse(R"({"document":"x"})")}; }),
              "\"id\" of a removal of a document has to be the id of a node");
    EXPECT_EQ(failureOf([] { DocumentUpload{parse(R"({"id":7})")}; }),
              "\"id\" of a piece of a document has to be the id of a node");
}

TEST(QuestionsAboutDocuments, TakeDigestsAndNumbersOfTheirForm) {
    std::string const wrong =
        "\"sha256\" of a query for a piece of a document has to be 64 hexadecimal digits";
    for (std::string const& digest :
         {std::string(63, '0'), std::string(65, '0'), std::string(64, 'A'), "../" + std::string(61, '0')})
        EXPECT_EQ(failureOf([&] { DocumentPieceQuery{DocumentPieceQuery(digest, 0).serialize()}; }), wrong)
            << digest;
    EXPECT_EQ(failureOf([] { DocumentPieceQuery{parse(R"({"offset":-1})")}; }),
              "\"offset\" of a query for a piece of a document has to be an integer from 0 to 67108864");
    EXPECT_EQ(failureOf([] { DocumentUpload{parse(R"({"id":"","bytes":-1})")}; }),
              "\"bytes\" of a piece of a document has to be an integer above -1");
}

TEST(DocumentsAnswers, FindTheDocumentOfTheNearestNodeThatHasOneWholeNamesFirstThenPdfs) {
    DocumentsAnswer const answer = answerOf({{"u=bob/a=acme", "blue.txt"},
                                             {"u=bob/a=acme", "green"},
                                             {"u=bob/a=acme", "green.pdf"},
                                             {"a=acme", "blue"},
                                             {"a=acme", "red.aaa"},
                                             {"a=acme", "red.pdf"},
                                             {"", "red"},
                                             {"", "last.pdf"}});
    EXPECT_EQ(found(answer, "blue"), "u=bob/a=acme:blue.txt") << "the nearest node, not the better name";
    EXPECT_EQ(found(answer, "green"), "u=bob/a=acme:green");
    EXPECT_EQ(found(answer, "green.pdf"), "u=bob/a=acme:green.pdf");
    EXPECT_EQ(found(answer, "red"), "a=acme:red.pdf");
    EXPECT_EQ(found(answer, "last"), ":last.pdf");
    EXPECT_EQ(found(answer, "last.txt"), "none");
    EXPECT_EQ(found(answer, ""), "none");
    EXPECT_EQ(found({}, "x"), "none");
}

TEST(DocumentsAnswers, AreReadBackAsTheyWereWritten) {
    std::string const text =
        R"({"documents":[{"name":"b.pdf","node":"a=acme","bytes":7,"sha256":"00","put_at":1000}]})";
    EXPECT_EQ(print(DocumentsAnswer(parse(text)).serialize()), text);
}

} // namespace

#include "programs/vlserviced/store/document_store.h"

#include "programs/base/digest.h"
#include "programs/vlserviced/store/settings_store.h"
#include "tests/vlserviced/store_database.h"

#include <gmock/gmock.h>

namespace {

using Protocol::StoredDocument;
using testing::ElementsAre;
using testing::IsEmpty;

class DocumentStoreTest : public VLServiceTest::OnEachDatabase {
protected:
    DocumentStoreTest() {
        nodes_.add("u=bob/a=acme");
        nodes_.add("a=other");
    }

    std::string put(std::string const& node, std::string const& name,
                    std::vector<std::string> const& pieces) {
        long long const content = store_.begin();
        std::string whole;
        for (std::string const& piece : pieces) {
            store_.add(content, piece);
            whole += piece;
        }
        StoredDocument document;
        document.node = node;
        document.name = name;
        document.sha256 = Base::sha256(whole);
        document.putAt = 1000;
        store_.finish(content, document);
        return document.sha256;
    }
    std::vector<std::string> namesAt(std::string const& node) const {
        std::vector<std::string> names;
        for (StoredDocument const& document : store_.at(node))
            names.push_back(document.name);
        return names;
    }
    int count(std::string const& table) {
        return static_cast<int>(database_->number("SELECT count(*) FROM " + table));
    }

    VlServiced::SettingsStore nodes_{*database_};
    VlServiced::DocumentStore store_{*database_};
};

TEST_P(DocumentStoreTest, KeepsADocumentAtANode) {
    std::string const digest = put("a=acme", "blue.pdf", {"first", "second"});
    EXPECT_THAT(namesAt("u=bob/a=acme"), IsEmpty());
    ASSERT_THAT(namesAt("a=acme"), ElementsAre("blue.pdf"));
    StoredDocument const document = store_.at("a=acme").front();
    EXPECT_EQ(document.node, "a=acme");
    EXPECT_EQ(document.bytes, 11);
    EXPECT_EQ(document.sha256, digest);
    EXPECT_EQ(document.putAt, 1000);
}

TEST_P(DocumentStoreTest, GivesPiecesFromAnyPlace) {
    std::string const digest = put("", "x", {"first", "second"});
    EXPECT_EQ(store_.piece(digest, 0), "first");
    EXPECT_EQ(store_.piece(digest, 3), "st");
    EXPECT_EQ(store_.piece(digest, 5), "second");
    EXPECT_EQ(store_.piece(digest, 11), "");
    EXPECT_EQ(store_.piece(digest, 1'000'000), "");
    EXPECT_EQ(store_.piece(std::string(64, '0'), 0), std::nullopt);
}

TEST_P(DocumentStoreTest, GivesBytesOfAllKinds) {
    std::string bytes(3000, '\0');
    for (std::size_t i = 0; i < bytes.size(); ++i)
        bytes[i] = static_cast<char>(i * 31);
    EXPECT_EQ(store_.piece(put("", "x", {bytes}), 0), bytes);
}

TEST_P(DocumentStoreTest, ReplacesADocumentOfThatNameAndForgetsItsContent) {
    std::string const first = put("a=acme", "blue.pdf", {"first"});
    std::string const second = put("a=acme", "blue.pdf", {"second"});
    EXPECT_THAT(namesAt("a=acme"), ElementsAre("blue.pdf"));
    EXPECT_EQ(store_.piece(first, 0), std::nullopt);
    EXPECT_EQ(store_.piece(second, 0), "second");
    EXPECT_EQ(put("a=acme", "blue.pdf", {"sec", "ond"}), second) << "the same once more";
    EXPECT_EQ(store_.piece(second, 0), "second");
    EXPECT_EQ(count("document_contents"), 1);
    EXPECT_EQ(count("document_pieces"), 1);
}

TEST_P(DocumentStoreTest, KeepsAContentOnceAndAsLongAsADocumentHasIt) {
    std::string const digest = put("a=acme", "a", {"same"});
    EXPECT_EQ(put("a=other", "b", {"same"}), digest);
    EXPECT_EQ(count("document_contents"), 1);
    store_.remove("a=acme", "a");
    EXPECT_EQ(store_.piece(digest, 0), "same");
    store_.remove("a=other", "b");
    EXPECT_EQ(store_.piece(digest, 0), std::nullopt);
    EXPECT_EQ(count("document_pieces"), 0);
}

TEST_P(DocumentStoreTest, ForgetsDocumentsWithTheirNode) {
    std::string const kept = put("a=acme", "a", {"kept"});
    std::string const gone = put("u=bob/a=acme", "b", {"gone"});
    nodes_.remove("u=bob/a=acme");
    EXPECT_EQ(store_.piece(kept, 0), "kept");
    EXPECT_EQ(store_.piece(gone, 0), std::nullopt);
    EXPECT_EQ(count("document_pieces"), 1);
}

TEST_P(DocumentStoreTest, ShowsNobodyWhatIsNotFinished) {
    std::string const digest = put("", "x", {"whole"});
    store_.add(store_.begin(), "whol");
    long long const other = store_.begin();
    store_.add(other, "other");
    EXPECT_THAT(namesAt(""), ElementsAre("x"));
    EXPECT_EQ(store_.piece(Base::sha256("other"), 0), std::nullopt);
    store_.drop(other);
    EXPECT_EQ(count("document_pieces"), 2);
    store_.dropUnfinished(0);
    EXPECT_EQ(count("document_pieces"), 1);
    EXPECT_EQ(store_.piece(digest, 0), "whole");
}

TEST_P(DocumentStoreTest, LeavesWhatAnotherServiceIsAboutToFinish) {
    long long const content = store_.begin();
    store_.add(content, "first half, ");
    auto const database = open();
    VlServiced::DocumentStore(*database).dropUnfinished(60);
    EXPECT_EQ(count("document_pieces"), isPostgres() ? 1 : 0) << "a file belongs to one service";
    database_->change("UPDATE document_contents SET touched_at = clock_ms() - 60001");
    VlServiced::DocumentStore(*database).dropUnfinished(60);
    EXPECT_EQ(count("document_pieces"), 0);
}

VLSERVICE_ON_EACH_DATABASE(DocumentStoreTest);

} // namespace

#include "programs/vlmail/letters/document_folder.h"

#include "programs/base/error.h"
#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"

#include <gmock/gmock.h>

#include <fstream>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

class DocumentFolderTest : public testing::Test {
protected:
    DocumentFolderTest() {
        fs::create_directories(folder_ / "docs" / "inner");
        root_ = fs::canonical(folder_ / "docs");
    }
    void write(std::string const& name) const { std::ofstream(root_ / name) << name; }
    std::string found(std::string const& id) const {
        try {
            return DocumentFolder(root_).find(id).file.lexically_relative(root_).string();
        } catch (Base::Error const& failure) {
            return failure.what();
        }
    }

    TemporaryFolder folder_;
    fs::path root_;
};

TEST_F(DocumentFolderTest, FindsFilesByTheirNamesWithAndWithoutEnding) {
    write("blue.pdf");
    write("Größe 1.txt");
    write("bare");
    EXPECT_EQ(found("blue"), "blue.pdf");
    EXPECT_EQ(found("blue.pdf"), "blue.pdf");
    EXPECT_EQ(found("Größe 1"), "Größe 1.txt");
    EXPECT_EQ(found("bare"), "bare");
    EXPECT_THAT(found("BLUE"), testing::StartsWith("document-unknown: there is no document \"BLUE\" in "));
    EXPECT_THAT(found("inner"), testing::StartsWith("document-unknown: "));
}

TEST_F(DocumentFolderTest, PrefersWholeNamesThenPdfsThenTheOrderOfNames) {
    write("a");
    write("a.pdf");
    EXPECT_EQ(found("a"), "a");
    write("b.aaa");
    write("b.pdf");
    EXPECT_EQ(found("b"), "b.pdf");
    write("c.txt");
    write("c.md");
    EXPECT_EQ(found("c"), "c.md");
}

TEST_F(DocumentFolderTest, FollowsLinksThatStayInTheFolder) {
    write("blue.pdf");
    fs::create_symlink("blue.pdf", root_ / "alias.pdf");
    std::ofstream(folder_ / "secret.pdf") << "x";
    fs::create_symlink("../secret.pdf", root_ / "leak.pdf");
    fs::create_symlink("nothing", root_ / "broken.pdf");
    fs::create_symlink("inner", root_ / "folder.pdf");
    EXPECT_EQ(found("alias"), "alias.pdf");
    EXPECT_THAT(found("leak"), testing::HasSubstr("is a link out of the folder"));
    EXPECT_THAT(found("broken"), testing::StartsWith("document-unknown: "));
    EXPECT_THAT(found("folder"), testing::StartsWith("document-unknown: "));
}

TEST_F(DocumentFolderTest, TakesDocumentsOfTheBatchFirstAndThoseThatAreFixedBeforeAll) {
    write("blue.pdf");
    DocumentFolder folder(root_);
    folder.add("/batch/blue.txt");
    folder.add("/later/blue.txt");
    EXPECT_EQ(folder.find("blue").file, "/batch/blue.txt");
    EXPECT_EQ(folder.find("blue.pdf").file, root_ / "blue.pdf");
    folder.fix("blue", {"/fixed/green.pdf"});
    EXPECT_EQ(folder.find("blue").file, "/fixed/green.pdf");
}

TEST_F(DocumentFolderTest, LooksElsewhereForWhatLiesNeitherInTheBatchNorInTheFolder) {
    write("blue.pdf");
    std::vector<std::string> asked;
    VlMail::DocumentsElsewhere const elsewhere{
        [&](std::string const& id) {
            asked.push_back(id);
            return id == "red" ? std::optional<FoundDocument>(
                                     {"service:a=acme/red.pdf", std::make_shared<std::string const>("%PDF-")})
                               : std::nullopt;
        },
        " at a=acme in the service; put it there"};
    DocumentFolder folder(root_);
    folder.orElse(elsewhere);
    EXPECT_FALSE(folder.find("blue").isOfService());
    EXPECT_EQ(folder.find("red").file, "service:a=acme/red.pdf");
    EXPECT_EQ(*folder.find("red").bytes, "%PDF-");
    EXPECT_EQ(failureOf([&] { folder.find("gone"); }),
              "document-unknown: there is no document \"gone\" in \"" + root_.string() +
                  "\" or at a=acme in the service; put it there");
    DocumentFolder none;
    none.orElse(elsewhere);
    EXPECT_EQ(failureOf([&] { none.find("gone"); }),
              "document-unknown: there is no document \"gone\" at a=acme in the service; put it there");
    EXPECT_EQ(failureOf([&] { none.find("../up"); }),
              "document-unknown: \"../up\" cannot be the name of a document; correct the pack preset");
    EXPECT_THAT(asked, testing::ElementsAre("red", "red", "gone", "gone"));
}

TEST_F(DocumentFolderTest, KnowsNoUnsafeNames) {
    for (char const* const id : {"..", "../docs/blue", "inner/x", "", ".hidden"})
        EXPECT_THAT(found(id), testing::EndsWith("cannot be the name of a document; correct the pack preset"))
            << id;
}

} // namespace
} // namespace VlMail

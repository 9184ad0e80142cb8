#include "programs/production/prepared_document.h"

#include "tests/support/pdf_maker.h"
#include "tests/support/raw_pdf.h"

#include <gmock/gmock.h>

namespace Production {
namespace {

using testing::IsEmpty;
using testing::SizeIs;

TEST(PreparedDocuments, ArePagesThatStandAlone) {
    std::string const bytes = Reader::PdfMaker()
                                  .page("BT /F 10 Tf 72 700 Td (One) Tj ET")
                                  .page("1 0 0 rg 100 100 50 50 re f", "/MediaBox [0 0 842 595]")
                                  .bytes();
    PreparedDocument const document = prepare(bytes, "/docs/blue.pdf");
    EXPECT_EQ(document.error, "");
    EXPECT_THAT(document.sha256, SizeIs(64));
    ASSERT_THAT(document.pages, SizeIs(2));
    EXPECT_EQ(document.pages[0].size, (PageSize{20990, 29704}));
    EXPECT_EQ(document.pages[1].size, (PageSize{29704, 20990}));
    EXPECT_FALSE(document.pages[0].isColoured);
    EXPECT_TRUE(document.pages[1].isColoured);
    EXPECT_EQ(document.pages[0].pdf.substr(0, 5), "%PDF-");
}

TEST(PreparedDocuments, MayBeText) {
    PreparedDocument const document = prepare("Terms\fand more", "/docs/terms.txt");
    EXPECT_EQ(document.error, "");
    EXPECT_THAT(document.pages, SizeIs(2));
    EXPECT_FALSE(document.pages.at(0).isColoured);
}

TEST(PreparedDocuments, TellPagesWhoseContentsAreWrittenAnew) {
    using VLServiceTest::onePage;
    EXPECT_THAT(prepare(onePage("0 0 10 10 re f").bytes(), "a.pdf").redrawnPages, IsEmpty());
    PreparedDocument const damaged =
        prepare(onePage("").stream(5, "/Filter /FlateDecode", "no deflated bytes").bytes(), "a.pdf");
    EXPECT_EQ(damaged.error, "");
    EXPECT_THAT(damaged.redrawnPages, testing::ElementsAre(1));
}

TEST(PreparedDocuments, SayWhatIsWrongInOneLineWithACode) {
    Reader::PdfMaker many;
    for (int page = 0; page <= MAX_DOCUMENT_PAGES; ++page)
        many.page("");
    std::pair<std::string, std::string> const table[] = {
        {"%PDF-1.7 nothing", "document-damaged: /docs/blue.pdf: is a damaged PDF; export the document again"},
        {"", "document-damaged: /docs/blue.pdf: is empty; export the document again"},
        {Reader::PdfMaker().page("").encrypted("secret"),
         "document-damaged: /docs/blue.pdf: is an encrypted PDF; save it without a password"},
        {Reader::PdfMaker().page("").losePage().bytes(),
         "document-damaged: /docs/blue.pdf: page 2 is damaged; export the document again"},
        {many.bytes(),
         "document-size: /docs/blue.pdf: has more than 500 pages; leave out what is not to be printed"},
        {std::string(MAX_DOCUMENT_BYTES + 1, 'x'),
         "document-size: /docs/blue.pdf: has more than 64 MiB; leave out what is not to be printed"},
    };
    for (auto const& [bytes, error] : table) {
        PreparedDocument const document = prepare(bytes, "/docs/blue.pdf");
        EXPECT_EQ(document.error, error);
        EXPECT_THAT(document.pages, IsEmpty());
    }
}

TEST(PreparedDocuments, MayHaveAsManyPagesAsTheBoundSays) {
    Reader::PdfMaker many;
    for (int page = 0; page < MAX_DOCUMENT_PAGES; ++page)
        many.page("", "/MediaBox [0 0 20 20]");
    EXPECT_THAT(prepare(many.bytes(), "a.pdf").pages, SizeIs(MAX_DOCUMENT_PAGES));
}

TEST(DocumentIds, AreSafeNamesOfFiles) {
    for (char const* const id : {"blue", "blue.pdf", "Größe 1.pdf"})
        EXPECT_TRUE(isDocumentId(id)) << id;
    for (char const* const id : {"", ".", "..", "../blue", "a/b", "a\\b", ".hidden", "a\nb", "\xFF"})
        EXPECT_FALSE(isDocumentId(id)) << id;
}

} // namespace
} // namespace Production

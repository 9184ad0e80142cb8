// Documents that are made to stop whoever reads them.
#include "programs/vlmail/letters/batch.h"
#include "programs/vlmail/letters/node_settings.h"
#include "tests/support/raw_pdf.h"
#include "tests/support/temporary_folder.h"

#include <gmock/gmock.h>

#include <fstream>

namespace VlMail {
namespace {

using testing::AnyOf;
using VLServiceTest::deflated;
using VLServiceTest::formTree;
using VLServiceTest::onePage;
using VLServiceTest::RawPdf;

constexpr char const* PLAIN = "BT /F 10 Tf 72 700 Td (Hello) Tj ET";

constexpr JobLimits LIMITS{std::chrono::milliseconds(400), std::uint64_t{256} << 20};

class HostileDocuments : public testing::Test {
protected:
    /// Reads the document between two that are in order, and gives its error.
    std::string errorOf(std::string const& pdf, JobLimits const& limits = LIMITS) {
        std::vector<std::string> const files{write("a.pdf", onePage(PLAIN).bytes()), write("x.pdf", pdf),
                                             write("b.pdf", onePage(PLAIN).bytes())};
        std::vector<std::string> errors;
        BatchWatcher watcher;
        readBatch(files, NodeSettings(), {2, limits}, {.pages = Along::Pages::Yes}, watcher,
                  [&](std::size_t, ReadResult result) { errors.push_back(result.reading.error); });
        EXPECT_EQ(errors.at(0), "");
        EXPECT_EQ(errors.at(2), "");
        return errors.at(1);
    }

    std::string quoted() const { return "cannot read \"" + (folder_ / "x.pdf").string() + "\": "; }

private:
    std::string write(char const* name, std::string const& bytes) const {
        std::ofstream(folder_ / name, std::ios::binary) << bytes;
        return (folder_ / name).string();
    }

    TemporaryFolder folder_;
};

TEST_F(HostileDocuments, OfFormsThatDrawEachOtherWithoutEndAreEnded) {
    EXPECT_EQ(errorOf(formTree(40, 10)),
              quoted() + "it took more than 0.400 s of processor time; print it to a new PDF, or give "
                         "--document-seconds a larger number");
}

TEST_F(HostileDocuments, WithAFormThatDrawsItselfStopNobody) {
    RawPdf pdf = onePage("/X6 Do", "/XObject << /X6 6 0 R >>");
    pdf.stream(
        6,
        "/Type /XObject /Subtype /Form /BBox [0 0 595 842] /Resources << /Font << /F 4 0 R >> /XObject "
        "<< /X6 6 0 R >> >>",
        std::string(PLAIN) + " /X6 Do /X6 Do");
    EXPECT_THAT(errorOf(pdf.bytes(), {}),
                AnyOf("", quoted() + "the reader broke down over it; the document is damaged, print it to a "
                                     "new PDF"));
}

TEST_F(HostileDocuments, ThatSwellWhenTheyAreUnpackedAreEnded) {
    RawPdf pdf;
    pdf.stream(5, "/Filter /FlateDecode", deflated(std::string(std::size_t{8} << 20, ' ')));
    std::string contents;
    for (int i = 0; i < 1000; ++i)
        contents += "5 0 R ";
    pdf.object(3, "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595 842] /Contents [" + contents + "] >>");
    EXPECT_EQ(errorOf(pdf.behind(onePage("").bytes())),
              quoted() + "it took more than 0.400 s of processor time; print it to a new PDF, or give "
                         "--document-seconds a larger number");
}

TEST_F(HostileDocuments, ThatClaimGiantPageCountsAreCountedAnewOrRefused) {
    for (char const* const count : {"2147483647", "1000000000", "999", "-1"}) {
        RawPdf pdf = onePage(PLAIN);
        pdf.object(2, "<< /Type /Pages /Kids [3 0 R] /Count " + std::string(count) + " >>");
        EXPECT_THAT(errorOf(pdf.bytes()), AnyOf("", testing::EndsWith("; export the document again")))
            << count;
    }
}

TEST_F(HostileDocuments, WhosePagesGoRoundInACircleStopNobody) {
    RawPdf pdf = onePage(PLAIN);
    pdf.object(2, "<< /Type /Pages /Kids [2 0 R 2 0 R 3 0 R] /Count 3 >>");
    EXPECT_THAT(errorOf(pdf.bytes()), AnyOf("", testing::EndsWith("; export the document again")));
}

} // namespace
} // namespace VlMail

#include "programs/vlmail/report/printed_pages.h"

#include "tests/support/temporary_folder.h"
#include "tests/vlmail/run_vlmail.h"

#include <gmock/gmock.h>

#include <fstream>
#include <sstream>

namespace VlMail::Report {
namespace {

using testing::HasSubstr;
using testing::Not;

TEST(PrintedBoxes, LieWhereTheirPageIsTurned) {
    Reader::Box const box{1000, 2000, 5000, 2500};
    Production::PageSize const page{21000, 29700};
    EXPECT_EQ(turned(box, page, 0), box);
    EXPECT_EQ(turned(box, page, 1), (Reader::Box{27200, 1000, 27700, 5000}));
    EXPECT_EQ(turned(box, page, 2), (Reader::Box{16000, 27200, 20000, 27700}));
    EXPECT_EQ(turned(box, page, 3), (Reader::Box{2000, 16000, 2500, 20000}));
    EXPECT_EQ(turned(turned(box, page, 1), page.turned(), 3), box);
}

class PrintedReports : public testing::Test {
protected:
    PrintedReports() {
        write("head.txt", "\n\n\n\n\n\nHead");
        write("terms.txt", "Terms\fmore");
        write("a.txt", "To: Ada");
    }
    void write(char const* name, std::string const& text) const {
        std::ofstream(folder_ / name, std::ios::binary) << text;
    }
    /// The report with that pack preset.
    std::string report(std::string const& keys) const {
        write("node.json", R"({"extract_presets": [{"match": ".*", "pack_preset": "P", "zones": [
            {"name": "Page", "location": {"left": 0, "top": 0, "right": 21000, "bottom": 29700}, "fields": [
             {"name": "postal", "value_extract": "^To: (?<VAL>.*)$", "priority": 1, "send_to_server": true}]}]}],
            "pack_presets": [{"name": "P")" +
                               keys + "}]}");
        std::string const file = (folder_ / "report.html").string();
        Ran const ran =
            runVlMail({"letter", (folder_ / "a.txt").string(), "--settings", (folder_ / "node.json").string(),
                       "--documents", folder_.path().string(), "--report", file});
        EXPECT_EQ(ran.err, "");
        std::ostringstream text;
        text << std::ifstream(file, std::ios::binary).rdbuf();
        return std::move(text).str();
    }
    /// The first picture in a report.
    static std::string pictureIn(std::string const& html) {
        std::size_t const at = html.find("base64,");
        return html.substr(at, html.find('"', at) - at);
    }

    TemporaryFolder folder_;
};

TEST_F(PrintedReports, ShowPagesWithTheirLetterheads) {
    std::string const plain = report("");
    std::string const made = report(R"(, "letterheads": ["head"])");
    EXPECT_NE(pictureIn(made), pictureIn(plain));
    EXPECT_EQ(pictureIn(report(R"(, "letterheads": [{"id": "head", "skip_letters": true}])")),
              pictureIn(plain));
}

TEST_F(PrintedReports, ShowAllSidesOfALetterWithAttachments) {
    std::string const html = report(R"(, "duplex": true, "attachments": ["terms"])");
    std::size_t at = html.find("class=\"sides\"");
    for (char const* const name :
         {"page 1", "blank side", "page 1 of &quot;terms&quot;", "page 2 of &quot;terms&quot;"}) {
        at = html.find(name, at);
        ASSERT_NE(at, std::string::npos) << name;
    }
    EXPECT_THAT(report(""), Not(HasSubstr("class=\"sides\"")));
}

TEST_F(PrintedReports, TurnWhatWasFoundAlongWithThePage) {
    std::string const html = report(R"(, "orientation": 2)");
    EXPECT_THAT(html, HasSubstr("--w:29700;--h:21000"));
    EXPECT_THAT(report(""), HasSubstr("--w:21000;--h:29700"));
}

} // namespace
} // namespace VlMail::Report

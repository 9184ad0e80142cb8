#include "programs/vlmail/presets/draft.h"
#include "programs/vlmail/presets/draft_labels.h"
#include "programs/vlmail/presets/lint.h"
#include "tests/support/raw_pdf.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlmail/run_vlmail.h"
#include "vlservice/json/json_text.h"

#include <gmock/gmock.h>

#include <fstream>
#include <iterator>
#include <sstream>
#include <string>
#include <vector>

using namespace VlMail;
using testing::Contains;
using testing::HasSubstr;

namespace {

std::vector<Reader::Document> documentsOf(std::vector<std::pair<std::string, std::string>> const& texts) {
    std::vector<Reader::Document> documents;
    for (auto const& [name, text] : texts)
        documents.push_back(Reader::openDocument(text, name));
    return documents;
}

/// A letter whose address stands where windows of envelopes are.
std::string letterWith(std::string const& body) {
    return std::string(13, '\n') + "Lena Brandt\n12 Long Street\nLeeds LS1 4AP\n\n\n\n\n" + body;
}

std::string textOf(json::Object const& object) {
    std::ostringstream text;
    text << object;
    return text.str();
}

/// Values as "name: value (by what)".
std::vector<std::string> evidenceOf(std::string const& body) {
    auto documents = documentsOf({{"a 1.txt", letterWith(body)}});
    Draft const draft = draftFrom(documents);
    EXPECT_TRUE(lint(PresetsDocument(textOf(draft.settings))).empty()) << textOf(draft.settings);
    return draft.evidence;
}

std::string contentOf(std::string const& file) {
    std::ifstream in(file);
    return {std::istreambuf_iterator<char>(in), {}};
}

} // namespace

TEST(DraftExpressions, FitTheShapeOfTheNames) {
    EXPECT_EQ(expressionFor({"Invoice 17.pdf"}), R"(Invoice \d+\.pdf)");
    EXPECT_EQ(expressionFor({"Invoice 17.pdf", "Invoice 2018.pdf"}), R"(Invoice \d+\.pdf)");
    EXPECT_EQ(expressionFor({"Invoice Brandt.pdf", "Invoice Roe.pdf"}), R"(Invoice .*\.pdf)");
    EXPECT_EQ(expressionFor({"a.pdf", "b.pdf"}), R"(.*\.pdf)");
    EXPECT_EQ(expressionFor({"a.pdf", "b.txt"}), ".*");
    EXPECT_EQ(expressionFor({"17"}), R"(\d+)");
}

TEST(DraftLabels, AreKnownInSixLanguages) {
    struct {
        DraftKind kind;
        char const* line;
        char const* label;
        char const* value;
    } const cases[] = {
        {DraftKind::Number, "Invoice no.: A-4711", "Invoice no", "A-4711"},
        {DraftKind::Number, "Rechnungsnummer 4711", "Rechnungsnummer", "4711"},
        {DraftKind::Number, "Num\u00E9ro de facture : F17", "Num\u00E9ro de facture", "F17"},
        {DraftKind::Number, "Factuurnummer: 2014/17", "Factuurnummer", "2014/17"},
        {DraftKind::Date, "Datum: 29 maart 2014", "Datum", "29 maart 2014"},
        {DraftKind::Date, "Data: 5/3/2021", "Data", "5/3/2021"},
        {DraftKind::Date, "Fecha de factura 12 de marzo de 2020", "Fecha de factura", "12 de marzo de 2020"},
        {DraftKind::Amount, "TOTAL DUE \u20AC 1,234.50", "TOTAL DUE", "\u20AC 1,234.50"},
        {DraftKind::Amount, "Gesamtbetrag: 1.234,56 EUR", "Gesamtbetrag", "1.234,56"},
        {DraftKind::Amount, "Totale fattura 12,50", "Totale fattura", "12,50"},
        {DraftKind::Customer, "Kunden-Nr. K17", "Kunden-Nr", "K17"},
        {DraftKind::Customer, "N\u00FAmero de cliente: 17", "N\u00FAmero de cliente", "17"},
        {DraftKind::Email, "E-mail: jane@acme.example", "E-mail", "jane@acme.example"},
    };
    for (auto const& [kind, line, label, value] : cases) {
        auto const labelled = labelledValue(draftFields()[static_cast<std::size_t>(kind)], line);
        ASSERT_TRUE(labelled) << line;
        EXPECT_EQ(labelled->label, label) << line;
        EXPECT_EQ(labelled->value, value) << line;
    }
    for (char const* line : {"Totally 17", "Total", "Total: none", "the total is 17"})
        EXPECT_FALSE(labelledValue(draftFields()[static_cast<std::size_t>(DraftKind::Amount)], line)) << line;
}

TEST(Drafts, SayWhatTheySawAndReadIt) {
    EXPECT_THAT(
        evidenceOf(
            "Invoice no.: A-4711\nDate: 05/03/2021\nCustomer no: 17\nE-mail: jane@acme.example\n\nTotal: "
            "1,234.50\n"),
        testing::ElementsAre(
            R"(match: a \d+\.txt)",
            HasSubstr("address: \"Lena Brandt / 12 Long Street / Leeds LS1 4AP\" in \"a 1.txt\", from "),
            R"(number: "A-4711" behind "Invoice no" in "a 1.txt", found in 1 of 1)",
            R"(date: "05/03/2021" behind "Date" in "a 1.txt", found in 1 of 1)",
            R"(amount: "1,234.50" behind "Total" in "a 1.txt", found in 1 of 1)",
            R"(customer: "17" behind "Customer no" in "a 1.txt", found in 1 of 1)",
            R"(email: "jane@acme.example" behind "E-mail" in "a 1.txt", found in 1 of 1)"));
}

TEST(Drafts, TakeNumbersAndMonthsAsTheyAreWritten) {
    auto documents = documentsOf(
        {{"Rechnung 1.txt", letterWith("Datum: 29. M\u00E4rz 2014\nGesamtbetrag: 1.234,56 EUR\n")}});
    Draft const draft = draftFrom(documents);
    EXPECT_TRUE(lint(PresetsDocument(textOf(draft.settings))).empty());
    EXPECT_THAT(textOf(draft.settings),
                HasSubstr(R"("reading":{"months":"de","decimal":",","grouping":".' "})"));
    EXPECT_THAT(draft.evidence, Contains(HasSubstr("amount: \"1.234,56\" behind \"Gesamtbetrag\"")));
    EXPECT_THAT(draft.evidence, Contains(HasSubstr("date: \"29. M\u00E4rz 2014\" behind \"Datum\"")));
}

TEST(Drafts, CountTheLettersThatHaveAField) {
    auto documents = documentsOf({{"a1.txt", letterWith("Total: 12.50\n")},
                                  {"a2.txt", letterWith("Total: 7.25\n")},
                                  {"a3.txt", letterWith("Thank you.\n")}});
    EXPECT_THAT(draftFrom(documents).evidence,
                Contains("amount: \"12.50\" behind \"Total\" in \"a1.txt\", found in 2 of 3"));
}

TEST(Drafts, HaveAnAddressWhereNoneWasSeen) {
    auto documents = documentsOf({{"a.txt", "Hello\n"}});
    Draft const draft = draftFrom(documents);
    EXPECT_TRUE(lint(PresetsDocument(textOf(draft.settings))).empty());
    EXPECT_THAT(
        draft.evidence,
        Contains("address: none was seen; the block of text nearest to the window of an envelope is taken"));
}

TEST(Drafts, KeepTheirZonesOnTheSheetsOfLetters) {
    // A4 that was rounded up, and a poster.
    for (int const height : {842, 2400}) {
        VLServiceTest::RawPdf pdf = VLServiceTest::onePage("BT /F 10 Tf 72 " + std::to_string(height - 300) +
                                                           " Td (Total: 12.50) Tj ET");
        pdf.object(3, "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595.3 " + std::to_string(height) +
                          "] /Contents 5 0 R /Resources << /Font << /F 4 0 R >> >> >>");
        std::vector<Reader::Document> documents;
        documents.push_back(Reader::openDocument(pdf.bytes(), "a.pdf"));
        ASSERT_GT(documents[0].page(1).height, 29700);
        Draft const draft = draftFrom(documents);
        EXPECT_TRUE(lint(PresetsDocument(textOf(draft.settings))).empty()) << textOf(draft.settings);
        EXPECT_THAT(textOf(draft.settings), HasSubstr(R"("bottom":29700)"));
    }
}

TEST(Drafts, TakeNoProseForAnAddress) {
    std::string const prose = "We thank you for the order that you have placed\nand hope that all is well.\n";
    auto documents = documentsOf({{"a.txt", std::string(13, '\n') + prose}});
    EXPECT_THAT(draftFrom(documents).evidence, Contains(HasSubstr("address: none was seen")));
    auto withAddress = documentsOf(
        {{"a.txt", std::string(13, '\n') + prose + "\n\n\nLena Brandt\n12 Long Street\nLeeds LS1 4AP\n"}});
    EXPECT_THAT(draftFrom(withAddress).evidence,
                Contains(HasSubstr("address: \"Lena Brandt / 12 Long Street")));
}

TEST(DraftCommand, EndsOverADocumentThatTakesTooLong) {
    TemporaryFolder const folder;
    std::string const letter = (folder / "a.pdf").string();
    std::string const settings = (folder / "node.json").string();
    std::ofstream(letter, std::ios::binary) << VLServiceTest::formTree(40, 10);
    Ran const ran = runVlMail({"presets", "draft", letter, "-o", settings, "--document-seconds", "1"});
    EXPECT_EQ(ran.status, FAILED);
    EXPECT_EQ(ran.err,
              "vlmail: cannot make a draft of 1 document: it took more than 1 s of processor time; print it "
              "to a new PDF, or give --document-seconds a larger number [limit-exceeded]\n");
    EXPECT_EQ(contentOf(settings), "");
}

TEST(DraftCommand, SaysWhatCannotBeRead) {
    TemporaryFolder const folder;
    std::string const settings = (folder / "node.json").string();
    Ran const ran = runVlMail({"presets", "draft", (folder / "gone.pdf").string(), "-o", settings});
    EXPECT_EQ(ran.status, FAILED);
    EXPECT_THAT(ran.err, HasSubstr("gone.pdf: there is no such file"));
}

TEST(DraftCommand, WritesSettingsOnce) {
    TemporaryFolder const folder;
    std::string const letter = (folder / "a 1.txt").string();
    std::string const settings = (folder / "node.json").string();
    std::ofstream(letter) << letterWith("Total: 12.50\n");
    Ran const first = runVlMail({"presets", "draft", letter, "-o", settings});
    EXPECT_EQ(first.status, FINE) << first.err;
    EXPECT_THAT(first.out, HasSubstr("amount: \"12.50\" behind \"Total\" in \"a 1.txt\", found in 1 of 1\n"));
    std::string const written = contentOf(settings);
    EXPECT_EQ(runVlMail({"presets", "lint", settings}).out, settings + ": 0 errors, 0 warnings\n");
    Ran const read = runVlMail({"letter", letter, "--settings", settings});
    EXPECT_EQ(read.status, FINE) << read.out << read.err;
    Ran const second = runVlMail({"presets", "draft", letter, "-o", settings});
    EXPECT_EQ(second.status, FAILED);
    EXPECT_EQ(second.err, "vlmail: there is a file \"" + settings +
                              "\" already; name another one, or remove it [file-exists]\n");
    EXPECT_EQ(contentOf(settings), written);
}

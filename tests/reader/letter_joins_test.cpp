#include "programs/reader/address_text.h"
#include "programs/reader/letters.h"
#include "programs/reader/page_numbering.h"

#include "tests/support/typesetter.h"
#include "vlservice/json/json_text.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <chrono>
#include <string>
#include <vector>

namespace Reader {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

/// An address in the window, and a mark below it.
Cfg::ExtractPreset presetWith(std::string const& mark, std::string const& zone = R"({"left": 0, "top": 0,
    "right": 21000, "bottom": 29700})") {
    std::string const all = R"({"match": ".*", "zones": [
        {"name": "Address", "location": {"left": 2000, "top": 4500, "right": 11000, "bottom": 8500}, "fields": [
            {"name": "postal", "priority": 1, "send_to_server": true,
             "value_extract": "\\A(?<VAL>(.{1,72}\\n){0,8}.{1,72})\\Z", "value_match": "(.{1,72}(\\n|$)){2,7}"}]},
        {"name": "Head", "location": )" +
                            zone + R"(, "fields": [{"name": "number", "mark": 1, "value_extract": ")" + mark +
                            R"("}]}]})";
    return Cfg::ExtractPreset(json::strToObject(all.data(), all.size()));
}

constexpr char const* NUMBER_MARK = "^Invoice No\\\\. (?<VAL>\\\\d+)$";

/// A page of a typed letter: the address is in its 10th to 14th row, the head in the 20th.
std::string typed(std::string const& address, std::string const& head, std::string const& foot = "") {
    std::string page(9, '\n');
    page += address;
    page.append(static_cast<std::size_t>(10 - std::count(address.begin(), address.end(), '\n')), '\n');
    page += head + "\n\nWe are pleased to send you what you ordered.";
    page.append(28, '\n');
    return page + foot;
}

constexpr char const* ADA = "Ada Byron\n12 St James's Square\nLondon SW1Y 4LE";
constexpr char const* LENA = "Lena Brandt\nM\u00FChlweg 5\n34117 Kassel";
constexpr char const* TABLE = "2 candles\n5 matches\n3 lamps";

std::vector<Letter> lettersOf(std::vector<std::string> const& pages, Cfg::ExtractPreset const& preset) {
    std::string text;
    for (std::string const& page : pages)
        text += (&page == &pages.front() ? "" : "\f") + page;
    Document document = openDocument(text, "batch.txt");
    return readLetters(document, preset);
}

/// "PAGE: what it says" of all letters.
std::vector<std::string> doubtsOf(std::vector<std::string> const& pages, Cfg::ExtractPreset const& preset) {
    std::vector<std::string> doubts;
    for (Letter const& letter : lettersOf(pages, preset))
        for (DoubtfulJoin const& join : letter.doubtfulJoins)
            doubts.push_back(std::to_string(join.page) + ": " + join.says);
    return doubts;
}

TEST(DoubtfulJoins, AreMarksInAnotherLetterCase) {
    auto const letters = lettersOf({typed(ADA, "Invoice No. 4711"), typed(TABLE, "continued"),
                                    typed(LENA, "INVOICE NO. 4712"), typed(ADA, "Invoice No. 4713")},
                                   presetWith(NUMBER_MARK));
    ASSERT_THAT(letters, SizeIs(2));
    EXPECT_THAT(letters[0].pages, ElementsAre(1, 2, 3));
    ASSERT_THAT(letters[0].doubtfulJoins, SizeIs(1));
    EXPECT_EQ(letters[0].doubtfulJoins[0].page, 3);
    EXPECT_EQ(letters[0].doubtfulJoins[0].says,
              "\"INVOICE NO. 4712\" nearly is the mark \"number\", with another letter case");
    EXPECT_THAT(letters[1].doubtfulJoins, IsEmpty());
}

TEST(DoubtfulJoins, AreMarksWrittenInAnotherWay) {
    struct {
        char const* head;
        char const* difference;
    } const CASES[]{
        {"Invoice  No\u2024 4712", "with characters that look alike"},
        {"InvoiceNo. 4712", "with other blanks"},
        {"INVOICE NO.4712", "written in another way"},
        {"Invoice No. A4712", "with another value than its pattern takes"},
        {"Invoice No. 47-12", "with another value than its pattern takes"},
    };
    for (auto const& [head, difference] : CASES)
        EXPECT_THAT(doubtsOf({typed(ADA, "Invoice No. 4711"), typed(TABLE, head)}, presetWith(NUMBER_MARK)),
                    ElementsAre(HasSubstr(difference)))
            << head;
}

TEST(DoubtfulJoins, AreMarksThatStandALittleBeyondTheirZone) {
    // The head is in the row from 91 mm to 95 mm.
    auto const preset =
        presetWith(NUMBER_MARK, R"({"left": 0, "top": 8000, "right": 21000, "bottom": 9600})");
    EXPECT_THAT(doubtsOf({typed(ADA, "Invoice No. 4711"), typed(TABLE, "\n\nInvoice No. 4712")}, preset),
                ElementsAre(HasSubstr("mm beyond the zone \"Head\"")));
    EXPECT_THAT(
        doubtsOf({typed(ADA, "Invoice No. 4711"), typed(TABLE, "\n\n\n\n\n\n\n\nInvoice No. 4712")}, preset),
        IsEmpty());
}

ReadingRules headRules(std::string const& rules) {
    std::string const all = R"({"zones": {"Head": )" + rules + "}}";
    std::vector<RulesFault> faults;
    ReadingRules const read = ReadingRules::from(json::strToObject(all.data(), all.size()), faults);
    EXPECT_THAT(faults, IsEmpty());
    return read;
}

TEST(DoubtfulJoins, AreMarksInZonesThatAnAnchorPlaces) {
    auto const preset = presetWith(NUMBER_MARK, R"({"left": 0, "top": 0, "right": 9000, "bottom": 900})");
    ReadingRules const rules = headRules(R"({"anchor": "^Acme"})");
    auto const doubtsIn = [&](std::string const& head) {
        Document document =
            openDocument(typed(ADA, "Acme\nInvoice No. 4711") + '\f' + typed(TABLE, head), "batch.txt");
        return readLetters(document, preset, nullptr, rules).at(0).doubtfulJoins;
    };
    ASSERT_THAT(doubtsIn("\nAcme\nINVOICE NO. 4712"), SizeIs(1));
    EXPECT_THAT(doubtsIn("Acme\n\n\nInvoice No. 4712").at(0).says, HasSubstr("mm beyond the zone \"Head\""));
    EXPECT_THAT(doubtsIn("INVOICE NO. 4712"), IsEmpty());
}

TEST(DoubtfulJoins, AreMarksInZonesThatAreReadByColumns) {
    std::string const mark = "^Invoice\\\\nNo. (?<VAL>\\\\d+)$";
    ReadingRules const rules = headRules(R"({"column": true})");
    auto const lettersIn = [&](std::string const& head) {
        Document document = openDocument(typed(ADA, "Invoice              Date\nNo. 4711             5 May") +
                                             '\f' + typed(TABLE, head),
                                         "batch.txt");
        return readLetters(document, presetWith(mark), nullptr, rules);
    };
    EXPECT_THAT(lettersIn("Invoice              Date\nNo. 4712             5 May"), SizeIs(2));
    EXPECT_THAT(lettersIn("INVOICE              Date\nNO. 4712             5 May").at(0).doubtfulJoins,
                SizeIs(1));
}

TEST(DoubtfulJoins, AreNoMarksOfOtherPages) {
    Document document =
        openDocument(typed(ADA, "Invoice No. 4711") + '\f' + typed(TABLE, "INVOICE NO. 4712"), "batch.txt");
    EXPECT_THAT(readLetters(document, presetWith(NUMBER_MARK), nullptr, headRules(R"({"page": 2})"))
                    .at(0)
                    .doubtfulJoins,
                IsEmpty());
}

TEST(DoubtfulJoins, SayWhereThePageLooksLikeThat) {
    Document document =
        openDocument(typed(ADA, "Invoice No. 4711") + '\f' + typed(TABLE, "INVOICE NO. 4712"), "batch.txt");
    Trace trace;
    auto const letters = readLetters(document, presetWith(NUMBER_MARK), &trace);
    ASSERT_THAT(letters.at(0).doubtfulJoins, SizeIs(1));
    DoubtfulJoin const& join = letters[0].doubtfulJoins[0];
    EXPECT_NE(join.box, Box());
    EXPECT_FALSE(trace.pages.at(0).doubtfulJoin);
    ASSERT_TRUE(trace.pages.at(1).doubtfulJoin);
    EXPECT_EQ(trace.pages[1].doubtfulJoin->says, join.says);
    EXPECT_EQ(trace.pages[1].doubtfulJoin->box, join.box);
}

TEST(DoubtfulJoins, AreAllLettersOfABatchWhereTheMarkIsNowhere) {
    EXPECT_THAT(doubtsOf({typed("", "INVOICE NO. 4711"), typed("", "more"), typed("", "INVOICE NO. 4712"),
                          typed("", "INVOICE NO. 4713")},
                         presetWith(NUMBER_MARK)),
                ElementsAre(HasSubstr("3: \"INVOICE NO. 4712\""), HasSubstr("4: \"INVOICE NO. 4713\"")));
}

TEST(DoubtfulJoins, AreOtherAddressesWhereLettersHaveThem) {
    EXPECT_THAT(
        doubtsOf({typed(ADA, "Invoice No. 4711"), typed(LENA, "Credit note 17")}, presetWith(NUMBER_MARK)),
        ElementsAre("2: it has another address where letters begin: \"Lena Brandt M\u00FChlweg 5 "
                    "34117 Kassel\""));
}

TEST(DoubtfulJoins, ArePagesThatAreCountedFromOneAgain) {
    EXPECT_THAT(doubtsOf({typed(ADA, "Invoice No. 4711", "Page 1 of 2"), typed(TABLE, "more", "Page 2 of 2"),
                          typed(TABLE, "Reminder", "Page 1 of 2"), typed(TABLE, "more", "Page 2 of 2")},
                         presetWith(NUMBER_MARK)),
                ElementsAre("3: it counts its pages from 1 again: \"Page 1 of 2\""));
}

TEST(DoubtfulJoins, AreNotPagesThatRepeatTheHeadOfTheirLetter) {
    EXPECT_THAT(doubtsOf({typed(ADA, "Invoice No. 4711"), typed(ADA, "INVOICE NO. 4711"),
                          typed(ADA, "Invoice No. 4711, continued"),
                          typed("Ms Ada Byron\n12 St James's Square\nLondon SW1Y 4LE", "more")},
                         presetWith(NUMBER_MARK)),
                IsEmpty());
}

TEST(DoubtfulJoins, AreNotPagesThatCountOn) {
    EXPECT_THAT(
        doubtsOf({typed(ADA, "Invoice No. 4711", "Page 1 of 3"), typed(LENA, "INVOICE NO. 9", "Page 2 of 3"),
                  typed(LENA, "Invoice No. X9", "Page 3 of 3")},
                 presetWith(NUMBER_MARK)),
        IsEmpty());
    EXPECT_THAT(
        doubtsOf({typed(ADA, "Page 1 of 3"), typed(TABLE, "Page 2 of 3"), typed(TABLE, "Page 3 of 3")},
                 presetWith("^Page (?<VAL>1 of \\\\d+)$")),
        IsEmpty());
}

TEST(DoubtfulJoins, AreToldWhereTheWholeDocumentIsCounted) {
    EXPECT_THAT(doubtsOf({typed(ADA, "Invoice No. 4711", "Page 1 of 3"),
                          typed(ADA, "Invoice No. 4712", "Page 2 of 3"),
                          typed(LENA, "INVOICE NO. 4713", "Page 3 of 3")},
                         presetWith(NUMBER_MARK)),
                ElementsAre(HasSubstr("3: \"INVOICE NO. 4713\"")));
}

TEST(DoubtfulJoins, AreNotMarksInProseAndTables) {
    EXPECT_THAT(
        doubtsOf(
            {typed(ADA, "Invoice No. 4711"),
             typed(TABLE, "\n\n\n\n\n\n\n\n\n\ninvoice no. 4690\ninvoice no. 4698"),
             typed("10115 candles\n10116 matches\n10117 Lamps\n10118 Shades", "more"),
             typed("as we have agreed on the phone on 3 March with\nMs Byron of 12 St James's Square in\n"
                   "London, your order comes in two parts.",
                   "more")},
            presetWith(NUMBER_MARK)),
        IsEmpty());
}

TEST(DoubtfulJoins, AreNotEnclosuresThatCountElsewhere) {
    EXPECT_THAT(
        doubtsOf({typed(ADA, "Invoice No. 4711", "Page 1 of 1"), typed("Page 1 of 2\nTerms", "of sale")},
                 presetWith(NUMBER_MARK)),
        IsEmpty());
}

TEST(DoubtfulJoins, AreNotToldOfADocumentThatIsOneLetter) {
    Cfg::ExtractPreset preset = presetWith(NUMBER_MARK);
    preset.zones().setSingleLetterField(true);
    EXPECT_THAT(doubtsOf({typed(ADA, "Invoice No. 4711"), typed(LENA, "INVOICE NO. 4712")}, preset),
                IsEmpty());
}

TEST(DoubtfulJoins, AreSaidToBeUnknownWhenMarksTakeTooLong) {
    std::string const hard = "invoice x" + std::string(900, 'x');
    Document document = openDocument("INVOICE X:\f" + hard, "batch.txt");
    std::chrono::milliseconds const limit(50);
    auto const letters = readLetters(
        document, presetWith("^INVOICE X(?<VAL>.*.*.*.*.*:)", R"({"right": 999999, "bottom": 29700})"),
        nullptr, {}, {limit, limit});
    ASSERT_THAT(letters, SizeIs(1));
    EXPECT_THAT(letters[0].warnings, ElementsAre("pages: from page 2 on it was not looked whether a mark is "
                                                 "missing, since the marks' patterns take too long"));
}

TEST(PostalAddresses, HaveANameAStreetAndATown) {
    for (char const* address :
         {"Lena Brandt\nM\u00FChlweg 5\n34117 Kassel",
          "Firma\nOtto GmbH\nPostfach 12 34\nD-34117 Kassel\nGermany", ADA,
          "Mme Anne Petit\n12, rue du Lac\n1200 Gen\u00E8ve 3", "J. de Vries\nKade 1\n1012 AB Amsterdam",
          "Jan Nowak\nul. D\u0142uga 5\n30-001 Krak\u00F3w", "Bo Ek\nStorgatan 1\n114 55 Stockholm",
          "John Doe\n500 Main St\nAustin, TX 73301", "Mario Rossi\nVia Roma 1\n20121 Milano MI"})
        EXPECT_TRUE(looksLikePostalAddress(address)) << address;
}

TEST(PostalAddresses, AreNeitherTablesNorProseNorParts) {
    for (char const* text :
         {"", "Lena Brandt\n34117 Kassel", "10115 Candle\n10116 Match\n10117 Lamp",
          "Total\n3 parts\n4 parts\n5 parts", "Lena Brandt\nM\u00FChlweg 5\nKassel",
          "1 Lena\nM\u00FChlweg 5\n34117 Kassel",
          "Lena Brandt\nM\u00FChlweg 5, second floor, the door on the left hand side\n34117 Kassel",
          "Lena Brandt\nM\u00FChlweg 5\n34117 Kassel\nCustomer 17\nDate 5"})
        EXPECT_FALSE(looksLikePostalAddress(text)) << text;
}

std::vector<int> numbersOn(std::string const& line) {
    Typesetter page;
    page.line(2000, 5000, line);
    std::vector<int> numbers;
    for (PageNumbering const& numbering : pageNumberingsOn(page.page, layOut(page.page)))
        numbers.push_back(numbering.number);
    return numbers;
}

TEST(PageNumberings, AreReadInSixLanguages) {
    for (char const* line :
         {"Page 2 of 3", "Seite 2 von 3", "Page 2 sur 3", "Pagina 2 van 3", "Pagina 2 di 3",
          "P\u00E1gina 2 de 3", "Invoice 17, Seite 2/3", "2/3", "- 2 -", "Blatt 2"})
        EXPECT_THAT(numbersOn(line), ElementsAre(2)) << line;
}

TEST(PageNumberings, AreNoDatesNumbersAndSentences) {
    for (char const* line : {"2", "3/2/2024", "see page 2", "homepage 2 of 3 and more", "Invoice 2 of 3"})
        EXPECT_THAT(numbersOn(line), IsEmpty()) << line;
}

} // namespace
} // namespace Reader

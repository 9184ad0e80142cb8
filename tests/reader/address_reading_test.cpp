// Addresses as they are printed, and as a person reads them.
#include "programs/base/log_capture.h"
#include "programs/reader/clean_text.h"
#include "programs/reader/field_search.h"
#include "programs/reader/letters.h"
#include "programs/reader/writing_direction.h"

#include "tests/support/failing_memory.h"
#include "tests/support/json_literal.h"
#include "tests/support/raw_pdf.h"
#include "tests/support/typesetter.h"

#include <gmock/gmock.h>

#include <new>
#include <optional>
#include <string>
#include <vector>

namespace Reader {
namespace {

using namespace VLServiceTest;
using testing::ElementsAre;

constexpr Box WINDOW{2000, 4500, 11000, 9000};
constexpr int SMALL = 250;

ZoneText windowOf(Typesetter const& set) { return ZoneText::inside(set.page, layOut(set.page), WINDOW); }

/// What the standard definition of an address finds in the window.
FieldTrace addressIn(Typesetter const& set, Cfg::ExtractField const& field = Cfg::ExtractField::DefPostal()) {
    ZoneText text = windowOf(set);
    FieldTrace trace;
    cutField(field, text, trace);
    return trace;
}

Cfg::ExtractField addressBy(std::string const& pattern, int priority = 1) {
    Cfg::ExtractField field(Cfg::ExtractField::DefPostal());
    field.setRegex(pattern);
    field.setPriority(priority);
    return field;
}

Typesetter withSendersLine() {
    Typesetter set;
    set.line(2500, 5000, "Candle Works Ltd, 1 Wick Lane, Leeds LS1 4AP", SMALL);
    set.line(2500, 6000, "Lena Brandt");
    set.line(2500, 6480, "3 Orchard Close");
    set.line(2500, 6960, "Whitstable CT5 1AA");
    return set;
}

TEST(SendersLines, AreLeftOutOfAnAddressAndTold) {
    FieldTrace const trace = addressIn(withSendersLine());
    EXPECT_EQ(trace.rawText, "Lena Brandt\n3 Orchard Close\nWhitstable CT5 1AA");
    EXPECT_EQ(trace.sendersLine, "Candle Works Ltd, 1 Wick Lane, Leeds LS1 4AP");
    EXPECT_EQ(trace.cut, trace.rawText);
    EXPECT_EQ(addressIn(withSendersLine(), addressBy("^(?<VAL>.+\\n.+\\n.+)$")).rawText, trace.rawText);
}

TEST(SendersLines, MayBeTwo) {
    Typesetter set = withSendersLine();
    set.line(2500, 4700, "If undelivered return to", SMALL);
    EXPECT_EQ(addressIn(set).sendersLine,
              "If undelivered return to\nCandle Works Ltd, 1 Wick Lane, Leeds LS1 4AP");
}

TEST(SendersLines, StayForPatternsThatSayHowTheAddressBegins) {
    FieldTrace const trace = addressIn(withSendersLine(), addressBy("\\A.*\\n(?<VAL>(.|\\n)*)\\z"));
    EXPECT_EQ(trace.rawText, "Lena Brandt\n3 Orchard Close\nWhitstable CT5 1AA");
    EXPECT_EQ(trace.sendersLine, "");
}

TEST(SendersLines, StayForFieldsThatAreNoAddressOrOneLine) {
    EXPECT_EQ(addressIn(withSendersLine(), addressBy("\\A(?<VAL>.*)", 0)).rawText,
              "Candle Works Ltd, 1 Wick Lane, Leeds LS1 4AP");
    EXPECT_EQ(addressIn(withSendersLine(), addressBy("^(?<VAL>.*)$")).rawText,
              "Candle Works Ltd, 1 Wick Lane, Leeds LS1 4AP");
}

TEST(SendersLines, StayForFieldsThatIgnoreTheSizeOfPrint) {
    Cfg::ExtractField field(Cfg::ExtractField::DefPostal());
    field.setIgnoreFontMertics(true);
    FieldTrace const trace = addressIn(withSendersLine(), field);
    EXPECT_EQ(trace.rawText, "Candle Works Ltd, 1 Wick Lane, Leeds LS1 4AP\n"
                             "Lena Brandt\n3 Orchard Close\nWhitstable CT5 1AA");
    EXPECT_EQ(trace.sendersLine, "");
}

TEST(SendersLines, StayInTheTextWhenNoAddressIsFound) {
    Typesetter const set = withSendersLine();
    ZoneText text = windowOf(set);
    FieldTrace trace;
    cutField(addressBy("\\A(?<VAL>Nobody\\n.*)\\z"), text, trace);
    EXPECT_FALSE(trace.rawText);
    EXPECT_EQ(text.text(), windowOf(set).text());
}

TEST(SendersLines, AreNotLinesOfTheAddress) {
    // Hardly smaller; below it; beside it; and all that there is above one line.
    Typesetter hardly;
    hardly.line(2500, 5520, "For the attention of", 340);
    hardly.line(2500, 6000, "Lena Brandt");
    hardly.line(2500, 6480, "Whitstable");
    EXPECT_EQ(addressIn(hardly).rawText, "For the attention of\nLena Brandt\nWhitstable");
    Typesetter below;
    below.line(2500, 6000, "Lena Brandt");
    below.line(2500, 6480, "Whitstable");
    below.line(2500, 6800, "United Kingdom", SMALL);
    EXPECT_EQ(addressIn(below).rawText, "Lena Brandt\nWhitstable\nUnited Kingdom");
    Typesetter beside;
    beside.line(8500, 5900, "our no. 5", SMALL);
    beside.line(2500, 6000, "Lena Brandt");
    beside.line(2500, 6480, "Whitstable");
    EXPECT_EQ(addressIn(beside).sendersLine, "");
    Typesetter heading;
    heading.line(2500, 5600, "a heading in small print", SMALL);
    heading.line(2500, 6000, "INVOICE");
    EXPECT_EQ(addressIn(heading).sendersLine, "");
}

TEST(Addresses, InSeveralBlocksAreJoinedFromTopToBottom) {
    Typesetter set;
    // The second line overlaps neither of its neighbours: it is a block of its own.
    set.line(2500, 6000, "Lena");
    set.line(6000, 6480, "Orchard Close");
    set.line(2500, 6960, "CT5");
    set.line(2500, 8000, "United Kingdom");
    EXPECT_EQ(windowOf(set).text(), "Lena\nOrchard Close\nCT5\nUnited Kingdom");
}

/// Of a zone that is found by its point, 45 mm across and 62 mm down.
std::string nearestText(Typesetter const& set,
                        std::string const& fields = R"({"name": "postal", "priority": 1,
    "value_extract": "\\A(?<VAL>(.+\\n?)+)\\Z"})") {
    std::string const zone = R"({"name": "_Address", "fields": [)" + fields + "]}";
    return textOf(set.page, layOut(set.page), Cfg::ExtractZone(json::strToObject(zone.data(), zone.size())))
        .text();
}

Typesetter withATownApart() {
    Typesetter set;
    set.line(2500, 5000, "Candle Works Ltd, 1 Wick Lane, Leeds LS1 4AP", SMALL);
    set.line(2500, 6000, "Lena Brandt");
    set.line(2500, 6480, "3 Orchard Close");
    set.line(2500, 7440, "Whitstable CT5 1AA");
    set.line(2500, 9500, "Dear Ms Brandt,");
    return set;
}

TEST(Addresses, InSeveralBlocksAreJoinedWithoutALocationToo) {
    EXPECT_EQ(nearestText(withATownApart()), "Lena Brandt\n3 Orchard Close\nWhitstable CT5 1AA");
    Typesetter scattered;
    scattered.line(2500, 4600, "Lena Brandt");
    scattered.line(2500, 5600, "3 Orchard Close");
    scattered.line(2500, 6600, "Whitstable CT5 1AA");
    EXPECT_EQ(nearestText(scattered), "Lena Brandt\n3 Orchard Close\nWhitstable CT5 1AA");
}

TEST(Addresses, AreJoinedOnlyWhereTheBlocksTogetherReadAsOne) {
    std::string const upper = "Lena Brandt\n3 Orchard Close";
    EXPECT_EQ(nearestText(withATownApart(), R"({"name": "total", "value_extract": "x"})"), upper);
    for (auto const& [left, base, town, size] :
         {std::tuple(2500, 9000, "Whitstable CT5 1AA", Typesetter::SIZE),
          {6000, 7440, "Whitstable CT5 1AA", Typesetter::SIZE},
          {2500, 7440, "Whitstable CT5 1AA", SMALL},
          {2500, 7440, "Our order of May", Typesetter::SIZE}}) {
        Typesetter set;
        set.line(2500, 6000, "Lena Brandt");
        set.line(2500, 6480, "3 Orchard Close");
        set.line(left, base, town, size);
        EXPECT_EQ(nearestText(set), upper) << left << ' ' << base << town << size;
    }
    Typesetter whole = withSendersLine();
    whole.line(2500, 7900, "United Kingdom");
    EXPECT_EQ(nearestText(whole), "Lena Brandt\n3 Orchard Close\nWhitstable CT5 1AA");
}

TEST(Addresses, BesideOtherTextAreReadBlockByBlock) {
    Typesetter set;
    set.line(2500, 6000, "Lena Brandt");
    set.line(8000, 6100, "Date: 5");
    set.line(2500, 6480, "Whitstable");
    set.line(8000, 6580, "No: 6");
    EXPECT_EQ(windowOf(set).text(), "Lena Brandt\nWhitstable\nDate: 5\nNo: 6");
}

TEST(HyphensAndBlanks, AreReadAsTheyAreSeen) {
    EXPECT_EQ(cleanText(u"Kunden\u2011Nr."), "Kunden-Nr.");
    EXPECT_EQ(cleanText(u"Kunden\u2010Nr."), "Kunden-Nr.");
    EXPECT_EQ(cleanText(u"Kun\u00ADden"), "Kunden");
    EXPECT_EQ(cleanText(u"12\u00A0345\u202F678"), "12 345 678");
    EXPECT_EQ(cleanText(u"2023\u20132024"), "2023\u20132024") << "a dash is seen as one";
}

/// The lines of a page, with single letters that far apart.
std::string spaced(std::vector<std::string> const& words, int gap, int blank) {
    Typesetter set;
    int left = 2500;
    for (std::string const& word : words) {
        for (char const letter : word)
            left = set.word(left, 6000, std::string(1, letter)) + gap;
        left += blank - gap;
    }
    return windowOf(set).text();
}

TEST(LetterSpacing, IsReadAsWords) {
    EXPECT_EQ(spaced({"RECHNUNG"}, 80, 0), "RECHNUNG");
    EXPECT_EQ(spaced({"RECHNUNG", "NR.", "17"}, 80, 200), "RECHNUNG NR. 17");
    EXPECT_EQ(spaced({"Total:"}, 100, 0), "Total:");
}

TEST(LetterSpacing, IsNotSeenInFiguresAndFewLetters) {
    EXPECT_EQ(spaced({"12345"}, 100, 0), "1 2 3 4 5");
    EXPECT_EQ(spaced({"abc"}, 100, 0), "a b c");
    EXPECT_EQ(spaced({"a", "b", "c", "d", "e"}, 80, 200), "abcde") << "letters that stand alike are one word";
    EXPECT_EQ(spaced({"ab", "cd", "ef"}, 80, 200), "a b c d e f");
}

TEST(LetterSpacing, LeavesWordsBesideItAlone) {
    Typesetter set;
    int left = set.line(2500, 6000, "No 5 of") + 100;
    for (char const letter : std::string("TOTAL"))
        left = set.word(left, 6000, std::string(1, letter)) + 80;
    set.line(left + 40, 6000, "is due");
    EXPECT_EQ(windowOf(set).text(), "No 5 of TOTAL is due");
}

// Hebrew letters: alef, bet, gimel, dalet.
constexpr char const* ABGD = "\u05D0\u05D1\u05D2\u05D3";
constexpr char const* ALEF = "\u05D0";
constexpr char const* BET = "\u05D1";
constexpr char const* GIMEL = "\u05D2";

TEST(ReadingOrder, TurnsWordsRound) {
    EXPECT_EQ(inReadingOrder(u"\u05D3\u05D2\u05D1\u05D0"), u"\u05D0\u05D1\u05D2\u05D3");
    EXPECT_EQ(inReadingOrder(u"abc 12"), u"abc 12");
    EXPECT_EQ(inReadingOrder(u"(\u05D1\u05D0)"), u"(\u05D0\u05D1)");
    EXPECT_EQ(inReadingOrder(u""), u"");
}

std::vector<std::size_t> orderOf(std::vector<std::string_view> const& words) { return readingOrderOf(words); }

TEST(ReadingOrder, BeginsOnTheRightOfALineFromRightToLeft) {
    EXPECT_THAT(orderOf({ALEF, BET, GIMEL}), ElementsAre(2, 1, 0));
    EXPECT_THAT(orderOf({ALEF, "12", GIMEL}), ElementsAre(2, 1, 0));
    EXPECT_THAT(orderOf({ALEF, "Main", "Street", "12", BET}), ElementsAre(4, 1, 2, 3, 0));
    EXPECT_THAT(orderOf({"to", "Mr", ALEF, BET, "in", "London"}), ElementsAre(0, 1, 3, 2, 4, 5));
    EXPECT_THAT(orderOf({"a", "b"}), ElementsAre(0, 1));
    EXPECT_THAT(orderOf({}), ElementsAre());
}

/// A page in whose font the letters from a to z are those of Hebrew.
std::string hebrewPdf(std::string const& content) {
    VLServiceTest::RawPdf pdf = VLServiceTest::onePage(content);
    pdf.object(
        4,
        "<< /Type /Font /Subtype /Type1 /BaseFont /Courier /Encoding /WinAnsiEncoding /ToUnicode 6 0 R >>");
    pdf.stream(
        6, "",
        "/CIDInit /ProcSet findresource begin 12 dict begin begincmap /CMapName /H def /CMapType 2 def\n"
        "1 begincodespacerange <00> <FF> endcodespacerange\n"
        "2 beginbfrange <61> <7A> <05D0> <20> <3A> <0020> endbfrange\n"
        "endcmap CMapName currentdict /CMap defineresource pop end end");
    return pdf.bytes();
}

std::string textOfPage(Document& document) {
    Page const& page = document.page(1);
    return ZoneText::inside(page, layOut(page), {0, 0, 21000, 29700}).text();
}

TEST(TextFromRightToLeft, IsReadInLogicalOrder) {
    // Drawn from left to right, as it is seen.
    Document document = openDocument(hebrewPdf("BT /F 12 Tf 100 700 Td (dcba 123 hgfe) Tj ET"), "a.pdf");
    EXPECT_EQ(textOfPage(document), "\u05D4\u05D5\u05D6\u05D7 123 " + std::string(ABGD));
    EXPECT_TRUE(document.showsTheSame(1, document.singlePagePdf(1)));
}

TEST(TextFromRightToLeft, HasTheBoxesOfItsWords) {
    Document document = openDocument(hebrewPdf("BT /F 12 Tf 100 700 Td (dcba 123 hgfe) Tj ET"), "a.pdf");
    Page const& page = document.page(1);
    ZoneText const text = ZoneText::inside(page, layOut(page), {0, 0, 21000, 29700});
    // Eight bytes of the word that is read first and stands on the right.
    EXPECT_GT(text.stretch(0, 8).box.left, text.stretch(9, 3).box.left);
    EXPECT_EQ(text.stretch(9, 3).text, "123");
}

TEST(TextFromRightToLeft, IsNotTurnedRoundWhereItWasTyped) {
    Document document = openDocument(std::string(ABGD) + " " + ALEF, "a.txt");
    EXPECT_EQ(textOfPage(document), std::string(ABGD) + " " + ALEF);
}

TEST(TextFromRightToLeft, ThatWasTypedIsWrittenAsItWas) {
    Document document = openDocument("\u0645\u0631\u062D\u0628\u0627 abc 12", "a.txt");
    EXPECT_TRUE(document.showsTheSame(1, document.singlePagePdf(1)));
}

TEST(AddressZones, OfPresetsLeaveSendersLinesOut) {
    Cfg::ExtractPreset const preset(R"({"zones": [{"name": "_Address",
        "location": {"left": 2000, "top": 4500, "right": 11000, "bottom": 9000}, "fields": [
            {"name": "postal", "priority": 1, "send_to_server": true, "width": 14000,
             "value_extract": "\\A(?<VAL>(.{1,72}\\n){0,8}.{1,72})\\Z"}]}]})"_json.toObject());
    Document document =
        openDocument(VLServiceTest::onePage(
                         "BT /F 6 Tf 70 690 Td (Kerzen GmbH, Weg 1, 34117 Kassel) Tj ET "
                         "BT /F 11 Tf 14 TL 70 670 Td (Lena Brandt) Tj T* (Weg 5) Tj T* (34117 Kassel) Tj ET")
                         .bytes(),
                     "a.pdf");
    Trace trace;
    std::vector<Letter> const letters = readLetters(document, preset, &trace);
    EXPECT_EQ(letters.at(0).fields.begin()->second.valueToStr(), "Lena Brandt\nWeg 5\n34117 Kassel");
    EXPECT_EQ(trace.pages.at(0).zones.at(0).fields.at(0).sendersLine, "Kerzen GmbH, Weg 1, 34117 Kassel");
}

TEST(Addresses, AreNotMissingWhereMemoryIs) {
    Base::LogCapture const quiet;
    Typesetter const set = withSendersLine();
    Cfg::ExtractField const& field = Cfg::ExtractField::DefPostal();
    auto const whole = addressIn(set, field).rawText;
    bool isRefused = true;
    for (long call = 1; isRefused; ++call) {
        ZoneText text = windowOf(set);
        FieldTrace trace;
        FailingMemory const memory(call);
        try {
            cutField(field, text, trace);
            EXPECT_EQ(trace.rawText, whole) << call;
        } catch (std::bad_alloc const&) {
        }
        isRefused = memory.hasFailed();
    }
}

TEST(AddressZones, WithSendersLinesTellOfDoubtfulJoins) {
    Cfg::ExtractPreset const preset(R"({"zones": [{"name": "_Address",
        "location": {"left": 2000, "top": 4500, "right": 11000, "bottom": 9000}, "fields": [
            {"name": "postal", "priority": 1, "send_to_server": true, "width": 14000,
             "value_extract": "\\A(?<VAL>(.{1,72}\\n){0,8}.{1,72})\\Z"}]},
        {"name": "Text", "location": {"right": 21000, "bottom": 29700}, "fields": [
            {"name": "no", "mark": 1, "value_extract": "^No (?<VAL>\\d+)$"}]}]})"_json.toObject());
    auto const content = [](std::string const& name, std::string const& street, std::string const& head) {
        return "BT /F 6 Tf 70 690 Td (Kerzen GmbH, Weg 1, 34117 Kassel) Tj ET BT /F 11 Tf 14 TL 70 670 Td (" +
               name + ") Tj T* (" + street + ") Tj T* (34117 Kassel) Tj ET BT /F 11 Tf 70 500 Td (" + head +
               ") Tj ET";
    };
    VLServiceTest::RawPdf pdf = VLServiceTest::onePage(content("Lena Brandt", "Weg 5", "No 17"));
    pdf.object(2, "<< /Type /Pages /Kids [3 0 R 6 0 R] /Count 2 >>");
    pdf.object(6, "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595 842] /Contents 7 0 R /Resources << /Font "
                  "<< /F 4 0 R >> >> >>");
    pdf.stream(7, "", content("Otto Roe", "Gasse 7", "Credit note"));
    Document document = openDocument(pdf.bytes(), "a.pdf");
    std::vector<Letter> const letters = readLetters(document, preset);
    ASSERT_EQ(letters.size(), 1u);
    ASSERT_EQ(letters[0].doubtfulJoins.size(), 1u);
    EXPECT_EQ(letters[0].doubtfulJoins[0].says,
              "it has another address where letters begin: \"Otto Roe Gasse 7 34117 Kassel\"");
}

} // namespace
} // namespace Reader

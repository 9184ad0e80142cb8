#include "programs/mailing/mailing_outline.h"

#include "programs/mailing/page_blob.h"
#include "tests/support/failure_of.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using Mailing::outlineIn;

std::string metadata(std::string const& letters, std::string const& keys = "") {
    return R"({"pack_preset": "Bills", "id": "x", )" + keys + R"("letters" : [)" + letters +
           R"( ], "after": "]}\"" })";
}

std::string letter(std::string const& documents) {
    return R"({"fields": [{"value": "a \" ] } , \\"}, [[{}]], 1.5e3], "documents": [)" + documents +
           R"(], "sheets": 1})";
}

TEST(MailingOutline, HasThePackPresetAndTheSheetsOfTheLongestLetter) {
    std::string const letters =
        letter(R"({"name": "a", "pages": [1, 2, 3]})") + ", " +
        letter(R"({"name": "b", "pages": [1]}, {"pages": [ ], "name": "c"}, {"name": "d", "pages": [4,5]})");
    EXPECT_EQ(outlineIn(metadata(letters)).mostSheets, 3);
    EXPECT_EQ(outlineIn(metadata(letters, R"("duplex": true, )")).mostSheets, 2);
    EXPECT_TRUE(outlineIn(metadata(letters, R"("duplex": true, )")).packPreset.duplex());
    EXPECT_EQ(outlineIn(metadata("")).packPreset.name(), "Bills");
    EXPECT_EQ(outlineIn(metadata("")).mostSheets, 0);
}

TEST(MailingOutline, TakesBlankPagesForTheOtherSidesOfSheets) {
    std::string const letters = letter(
        R"({"name": "a", "pages": [1], "role": "letter"}, {"role": "blank", "name": "b", "pages": [1]}, )"
        R"({"name": "c", "pages": [1], "role": "attachment"})");
    EXPECT_EQ(outlineIn(metadata(letters, R"("duplex": true, )")).mostSheets, 2);
    EXPECT_EQ(outlineIn(metadata(letters)).mostSheets, 3);
}

TEST(MailingOutline, RefusesWhatIsNone) {
    std::string const good = metadata(letter(R"({"name": "a", "pages": [1, 2]})"));
    for (std::string const& bad :
         {std::string(), std::string("7"), std::string("{}"), std::string("[]"), good + "x", good + "{}",
          std::string(R"({"pack_preset": "P"})"), std::string(R"({"letters": []})"),
          std::string(R"({"pack_preset": "P", "letters": {}})"), metadata("7"), metadata(R"({"fields": []})"),
          metadata(R"({"documents": [7]})"), metadata(R"({"documents": [{"name": "a"}]})"),
          metadata(R"({"documents": [], "documents": []})"),
          metadata(letter(R"({"pages": [1], "pages": []})")),
          // Spelt so that only a reader of the whole would know the key.
          metadata(R"({"\u0064ocuments": [{"pages": [1]}]})"), metadata("", R"("\u006cetters": [], )"),
          metadata("", R"("letters": [], )"), metadata("", R"("process_mode": 10, )")})
        EXPECT_NE(failureOf([&] { outlineIn(bad); }), "nothing was thrown") << bad;
}

std::string letterWith(std::string const& digests) {
    return R"({"documents": [{"name": "a", "pages": [1]}], "digests": )" + digests + "}";
}

std::string const ONE = std::string(64, '1');
std::string const TWO = std::string(64, 'a');

TEST(MailingOutline, HasTheDigestsOfLettersWithTheNumberOfWhatTheyGoOutIn) {
    std::string const all = letterWith("[\"" + ONE + "\"]") + ", " + letterWith("[]") + ", " +
                            letterWith("[ \"" + TWO + "\" , \"" + ONE + "\" ]");
    std::string digests;
    for (Mailing::LetterDigest const& digest : outlineIn(metadata(all)).digests)
        digests += std::to_string(digest.number) + ' ' + digest.digest + '\n';
    EXPECT_EQ(digests, "1 " + ONE + "\n3 " + TWO + "\n3 " + ONE + '\n');
}

TEST(MailingOutline, HasNoDigestsOfLettersOfOlderClients) {
    Mailing::MailingOutline const outline = outlineIn(metadata(letter(R"({"name": "a", "pages": [1]})")));
    EXPECT_TRUE(outline.digests.empty());
    EXPECT_EQ(outline.again, "");
    EXPECT_EQ(outline.mostSheets, 1);
}

TEST(MailingOutline, HasTheReasonWhyLettersGoOutAgain) {
    EXPECT_EQ(outlineIn(metadata("", R"("again": "lost in the post", )")).again, "lost in the post");
}

TEST(MailingOutline, RefusesDigestsThatAreNone) {
    std::string const quoted = '"' + ONE + '"';
    for (std::string const& bad :
         {std::string("7"), quoted, std::string("[7]"), "[\"" + ONE.substr(1) + "\"]", "[\"" + ONE + "1\"]",
          "[\"" + ONE.substr(1) + "A\"]", "[\"" + ONE.substr(1) + "\"\"]", "[[" + quoted + "]]",
          '[' + quoted + "], \"digests\": [" + quoted + ']'})
        EXPECT_EQ(failureOf([&] { outlineIn(metadata(letterWith(bad))); }), "it is no metadata of a mailing")
            << bad;
}

TEST(MailingOutline, EndsAtEveryLength) {
    std::string const whole = metadata(letter(R"({"name": "a\\", "pages": [1, 2]})"));
    outlineIn(whole);
    for (std::size_t length = 0; length < whole.size() - 1; ++length)
        EXPECT_NE(failureOf([&] { outlineIn(std::string_view(whole).substr(0, length)); }),
                  "nothing was thrown")
            << length;
}

TEST(MailingOutline, IsWalkedOverWithoutGoingDeep) {
    std::string const deep = metadata(R"({"documents": [], "fields": )" + std::string(5'000'000, '[') +
                                      std::string(5'000'000, ']') + "}");
    EXPECT_EQ(outlineIn(deep).mostSheets, 0);
}

TEST(MailingOutline, IsNoneOfABlobThatClaimsMoreThanMetadataMayHave) {
    SharedMemBuffer blob = Mailing::compressed(metadata(""));
    EXPECT_EQ(Mailing::outlineOf(blob).packPreset.name(), "Bills");
    // 256 MiB and more.
    blob.data()[3 + 3] = 0x11;
    EXPECT_EQ(failureOf([&] { Mailing::outlineOf(blob); }), "it is no metadata of a mailing");
}

} // namespace

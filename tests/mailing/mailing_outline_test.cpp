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

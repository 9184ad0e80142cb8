#include "programs/patterns/required_words.h"
#include "programs/vlmail/letters/preset_index.h"
#include "vlservice/json/json.h"

#include <gmock/gmock.h>

#include <chrono>
#include <random>
#include <string>
#include <vector>

using namespace VlMail;
using testing::ElementsAre;
using testing::Optional;

namespace {

using Words = std::vector<std::string>;

Cfg::Presets presetsFor(std::vector<std::string> const& expressions) {
    json::Array presets;
    for (std::size_t i = 0; i < expressions.size(); ++i)
        presets.append(json::Object{{"match", expressions[i]},
                                    {"pack_preset", "P" + std::to_string(i % 7)},
                                    {"name", std::to_string(i)}});
    json::Array packs;
    // One is missing.
    for (int i = 0; i < 6; ++i)
        packs.append(json::Object{{"name", "P" + std::to_string(i)}});
    packs.append(json::Object{{"name", "P0"}, {"title", "second"}});
    return Cfg::Presets(json::Object{{"extract_presets", presets}, {"pack_presets", packs}}, false, false);
}

/// The presets that are found, or what is thrown.
template<typename Finder>
std::string foundBy(Finder const& finder, std::string const& name) {
    try {
        auto const& [extract, pack] = finder.findMatch(name);
        return extract.name() + ' ' + pack.name() + ' ' + pack.title();
    } catch (std::exception const& failure) {
        return failure.what();
    }
}

std::vector<std::string> manyExpressions(std::size_t count) {
    std::vector<std::string> expressions;
    for (std::size_t i = 0; i < count; ++i)
        expressions.push_back("customer " + std::to_string(i) + R"( invoice.*\.pdf)");
    return expressions;
}

/// Written out of parts, so that some mean much, some nothing and some do not compile.
std::string randomExpression(std::mt19937& random) {
    static std::vector<std::string> const PARTS{
        "invoice",    "Rechnung", "offer", "k",  "s",      "abc",        "17",       " ",
        "_",          R"(\.pdf)", ".*",    ".",  R"(\d+)", "[a-c]",      "[^x]",     "(offer|bill)",
        "(?:letter)", "(abc)?",   "x?",    "b+", "|",      "(",          ")",        "[",
        "*",          "{2}",      "(?i)",  "^",  "$",      R"(\Qa.b\E)", "\xC3\xA4", "\xFF",
        "(a+)+b",     R"(\x41)",  "(a|)",  "++", "(?=a)",  "l*"};
    std::string expression;
    for (int left = 1 + static_cast<int>(random() % 5); left > 0; --left)
        expression += PARTS[random() % PARTS.size()];
    return expression;
}

std::string randomName(std::mt19937& random) {
    static std::vector<std::string> const PARTS{"invoice",
                                                "RECHNUNG",
                                                "offer",
                                                "bill",
                                                "letter",
                                                "abc",
                                                "a",
                                                "k",
                                                "s",
                                                "17",
                                                " ",
                                                "_",
                                                ".pdf",
                                                "x",
                                                "b",
                                                "l",
                                                "\xE2\x84\xAA",
                                                "\xC5\xBF",
                                                "\xC4\xB0",
                                                "\xC3\x84",
                                                "\xFF",
                                                "a.b",
                                                "aaaaaaaaaaaaaaaaaaaaaaaaaaaaa"};
    std::string name;
    for (int left = static_cast<int>(random() % 5); left > 0; --left)
        name += PARTS[random() % PARTS.size()];
    return name;
}

} // namespace

TEST(RequiredWords, AreThoseOfEachAlternative) {
    EXPECT_THAT(Patterns::requiredWords(R"(Invoice \d+\.pdf)"),
                Optional(ElementsAre(Words{"invoice", "pdf"})));
    EXPECT_THAT(Patterns::requiredWords("offer.*|bill17"),
                Optional(ElementsAre(Words{"offer"}, Words{"bill17"})));
    EXPECT_THAT(Patterns::requiredWords("(a|b)cd?e+f(gh)(ij)?[k]"),
                Optional(ElementsAre(Words{"c", "e", "f", "gh"})));
    EXPECT_THAT(Patterns::requiredWords("stra\xC3\x9F"
                                        "e"),
                Optional(ElementsAre(Words{"stra", "e"})));
}

TEST(RequiredWords, AreNotToldOfWhatMayMeanMore) {
    for (char const* pattern :
         {"(?i)abc", "a**",   "(a",      "a)b",          "[a",      "a{2}",  "a+?",     "(ab)+",
          "^a",      "a$",    R"(\x41)", R"(\Qa\E)",     "a|",      "()",    "(?<n>a)", "(?=a)",
          "\xFF",    "[z-a]", "[]a]",    "a.*b.*c.*d.*", R"((a\))", R"(a\)", "\n",      "[[:alpha:]]"})
        EXPECT_EQ(Patterns::requiredWords(pattern), std::nullopt) << pattern;
}

TEST(PresetIndex, FindsWhatTheWalkFinds) {
    Cfg::Presets const presets = presetsFor(manyExpressions(200));
    Cfg::Presets const walked = presets;
    PresetIndex const index(presets);
    for (char const* name :
         {"Customer 17 Invoice 4711.pdf", "customer 199 invoice.PDF", "customer 6 invoice.pdf",
          "customer 200 invoice.pdf", "", "customer 17 invoice.docx", "\xFF"})
        EXPECT_EQ(foundBy(index, name), foundBy(walked, name)) << name;
    EXPECT_EQ(foundBy(index, "customer 6 invoice.pdf"),
              "Failed to find pack preset for extraction preset for customer 6 invoice.pdf");
    EXPECT_EQ(foundBy(index, "customer 7 invoice.pdf"), "7 P0 ");
}

TEST(PresetIndex, TriesWhatItDoesNotUnderstandInItsPlace) {
    std::vector<std::string> expressions = manyExpressions(100);
    expressions[21] = "(?i)customer (19|30) .*";
    expressions[25] = "customer (31 .*";
    Cfg::Presets const presets = presetsFor(expressions);
    PresetIndex const index(presets);
    EXPECT_EQ(foundBy(index, "customer 19 invoice.pdf"), "19 P5 ");
    EXPECT_EQ(foundBy(index, "customer 30 invoice.pdf"), "21 P0 ");
    EXPECT_THAT(foundBy(index, "customer 31 invoice.pdf"),
                testing::HasSubstr("Unmatched marking parenthesis"));
}

// A preset that has matched goes on answering by the expression that it had then.
TEST(PresetIndex, AsksAPresetThatIsCompiledAlready) {
    std::vector<std::string> expressions = manyExpressions(40);
    Cfg::Presets presets = presetsFor(expressions);
    EXPECT_EQ(foundBy(presets, "customer 39 invoice.pdf"), "39 P4 ");
    std::rotate(expressions.begin(), expressions.begin() + 1, expressions.end());
    Cfg::Presets const others = presetsFor(expressions);
    presets = others;
    Cfg::Presets const& stale = presets;
    PresetIndex const index(stale);
    for (int i = 0; i < 40; ++i) {
        std::string const name = "customer " + std::to_string(i) + " invoice.pdf";
        EXPECT_EQ(foundBy(index, name), foundBy(stale, name)) << name;
    }
    EXPECT_EQ(foundBy(index, "customer 39 invoice.pdf").substr(0, 2), "39");
}

TEST(PresetIndex, AgreesWithTheWalkOnAnyExpressionsAndNames) {
    for (unsigned seed = 1; seed <= 60; ++seed) {
        SCOPED_TRACE("seed " + std::to_string(seed));
        std::mt19937 random(seed);
        std::vector<std::string> expressions;
        while (expressions.size() < 40)
            expressions.push_back(randomExpression(random));
        if (seed % 3 != 0)
            std::erase_if(expressions, [](std::string const& one) { return !Patterns::requiredWords(one); });
        // So few are walked.
        expressions.resize(seed % 4 == 0 ? 1 + seed % 5 : 40, "zzz");
        Cfg::Presets const presets = presetsFor(expressions);
        PresetIndex const index(presets);
        for (int i = 0; i < 40; ++i) {
            std::string const name = randomName(random);
            ASSERT_EQ(foundBy(index, name), foundBy(Cfg::Presets(presets), name)) << name;
        }
    }
}

// Each says no in a hundredth of a second or so, which is far from what ends a search by itself.
TEST(PresetIndex, EndsInTimeAndNamesTheExpressionThatWasTriedLast) {
    using std::chrono_literals::operator""ms;
    for (std::size_t const count : {19U, 1'000U}) {
        std::vector<std::string> expressions;
        for (std::size_t i = 0; i < count; ++i)
            expressions.push_back("(?i).*.*.*:" + std::to_string(i));
        Cfg::Presets const presets = presetsFor(expressions);
        PresetIndex const index(presets, 30ms);
        EXPECT_THAT(foundBy(index, std::string(190, 'x')),
                    testing::MatchesRegex("the patterns of presets took longer than 0\\.030 s for the "
                                          "document's name, \"\\(\\?i\\)\\.\\*\\.\\*\\.\\*:[0-9]+\" last"));
    }
}

TEST(PresetIndex, HoldsFewPresetsToTheTimeToo) {
    using std::chrono_literals::operator""ms;
    Cfg::Presets const presets = presetsFor({"invoice.*", "(?i).*.*.*.*.*:1", ".*"});
    PresetIndex const index(presets, 30ms);
    EXPECT_EQ(foundBy(index, "Invoice 1"), foundBy(presets, "Invoice 1"));
    EXPECT_EQ(foundBy(index, std::string(190, 'x')),
              "the patterns of presets took longer than 0.030 s for the document's name, "
              "\"(?i).*.*.*.*.*:1\" last");
}

TEST(PresetIndex, TellsOfExpressionsThatAreTooComplexAsTheWalkDoes) {
    std::vector<std::string> expressions = manyExpressions(40);
    expressions[3] = "(?:x*)*y";
    Cfg::Presets const presets = presetsFor(expressions);
    // However slow the machine is, the expression gives up before the time does.
    PresetIndex const index(presets, std::chrono::hours(1));
    std::string const name = std::string(40, 'x');
    std::string const told = foundBy(index, name);
    EXPECT_THAT(told, testing::HasSubstr("complexity"));
    EXPECT_EQ(told, foundBy(presets, name));
}

#include "programs/patterns/outline.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

using Patterns::Piece;
using testing::ElementsAre;

namespace {

std::string dumped(std::vector<Patterns::Sequence> const& alternatives);

std::string dumpedBody(Piece const& piece) {
    switch (piece.kind) {
    case Piece::Kind::Literal:
        return "lit{" + piece.literal + '}';
    case Piece::Kind::Class:
        return "cls{" + piece.body + '}';
    case Piece::Kind::Assertion:
        return "at{" + piece.body + '}';
    case Piece::Kind::Other:
        return "other{" + piece.body + '}';
    case Piece::Kind::Group:
        break;
    }
    return "grp" + (piece.groupName.empty() ? "" : ':' + piece.groupName) + '{' + dumped(piece.alternatives) +
           '}';
}

std::string dumped(Piece const& piece) {
    if (piece.least == 1 && piece.most == 1)
        return dumpedBody(piece);
    std::string const most = piece.most == Piece::NO_LIMIT ? "" : std::to_string(piece.most);
    return "rep{" + std::to_string(piece.least) + ',' + most + ' ' + dumpedBody(piece) + '}';
}

/// "cat{...}" for pieces in a row, "alt{...|...}" for alternatives of them.
std::string dumped(std::vector<Patterns::Sequence> const& alternatives) {
    std::string text;
    for (Patterns::Sequence const& pieces : alternatives) {
        std::string row;
        for (Piece const& piece : pieces)
            row += dumped(piece);
        text += (text.empty() ? "" : "|") + (pieces.size() == 1 ? row : "cat{" + row + '}');
    }
    return alternatives.size() == 1 ? text : "alt{" + text + '}';
}

struct Case {
    char const* pattern;
    char const* tree;
};

void expectTrees(std::vector<Case> const& cases) {
    for (auto const& [pattern, tree] : cases)
        EXPECT_EQ(dumped(Patterns::outlineOf(pattern)), tree) << pattern;
}

std::vector<std::string> textsOf(Patterns::Sequence const& pieces) {
    std::vector<std::string> texts;
    for (Piece const& piece : pieces)
        texts.push_back(piece.text);
    return texts;
}

std::vector<std::string> piecesOf(std::string const& pattern) {
    return textsOf(Patterns::outlineOf(pattern).front());
}

} // namespace

TEST(OutlineTree, HasLiteralsAndEscapes) {
    expectTrees({
        {"", "cat{}"},
        {"a", "lit{a}"},
        {"ab", "cat{lit{a}lit{b}}"},
        {R"(\.)", "lit{.}"},
        {R"(\t\n)", "cat{lit{\t}lit{\n}}"},
        {R"(\x41\x{263A}b)", R"(cat{other{\x41}other{\x{263A}}lit{b}})"},
        {R"(\1\k<n>\g{2})", R"(cat{other{\1}other{\k<n>}other{\g{2}}})"},
        {R"(\Qa.b\Ec)", "cat{grp{cat{lit{a}lit{.}lit{b}}}lit{c}}"},
        {R"(\Qa)", "grp{lit{a}}"},
        {"\xC3\xA4", "lit{\xC3\xA4}"},
    });
}

TEST(OutlineTree, HasClassesAndAssertions) {
    expectTrees({
        {".", "cls{.}"},
        {R"(\d\H\p{Lu}\pL)", R"(cat{cls{\d}cls{\H}cls{\p{Lu}}cls{\pL}})"},
        {"[]a][^]]", "cat{cls{[]a]}cls{[^]]}}"},
        {R"([\]a])", R"(cls{[\]a]})"},
        {"[[:alpha:]_]", "cls{[[:alpha:]_]}"},
        {R"(^a\b$)", R"(cat{at{^}lit{a}at{\b}at{$}})"},
        {R"(\A\z)", R"(cat{at{\A}at{\z}})"},
        {"(?=a)(?!b)(?<=c)(?<!d)", "cat{at{(?=a)}at{(?!b)}at{(?<=c)}at{(?<!d)}}"},
        {"(?#why)a", "cat{at{(?#why)}lit{a}}"},
        {"(?i)a", "cat{at{(?i)}lit{a}}"},
    });
}

TEST(OutlineTree, HasRepetitions) {
    expectTrees({
        {"a*", "rep{0, lit{a}}"},
        {"a+", "rep{1, lit{a}}"},
        {"a?", "rep{0,1 lit{a}}"},
        {"a{2}", "rep{2,2 lit{a}}"},
        {"a{2,}", "rep{2, lit{a}}"},
        {"a{2,3}", "rep{2,3 lit{a}}"},
        {"a*?b++c{2}+", "cat{rep{0, lit{a}}rep{1, lit{b}}rep{2,2 lit{c}}}"},
        {"a{b", "cat{lit{a}lit{{}lit{b}}"},
        {"a{,2}", "cat{lit{a}lit{{}lit{,}lit{2}lit{}}}"},
        {"(ab)+", "rep{1, grp{cat{lit{a}lit{b}}}}"},
    });
}

TEST(OutlineTree, HasGroupsAndAlternatives) {
    expectTrees({
        {"a|b", "alt{lit{a}|lit{b}}"},
        {"a|", "alt{lit{a}|cat{}}"},
        {"(a|b(c))", "grp{alt{lit{a}|cat{lit{b}grp{lit{c}}}}}"},
        {"(?:a)(?>b)(?i:c)", "cat{grp{lit{a}}grp{lit{b}}grp{lit{c}}}"},
        {"(?<VAL>a)(?'n'b)", "cat{grp:VAL{lit{a}}grp:n{lit{b}}}"},
        {"(?|a|b)", "grp{alt{lit{a}|lit{b}}}"},
    });
}

// What the engine refuses has an outline all the same: advice is given about it.
TEST(OutlineTree, HasWhatCanBeToldOfAMalformedPattern) {
    expectTrees({
        {"(a", "grp{lit{a}}"},
        {"[a", "cls{[a}"},
        {"a\\", "cat{lit{a}other{\\}}"},
        {"a)b", "alt{lit{a}|lit{b}}"},
        {"*a", "cat{lit{*}lit{a}}"},
        {"(?<n", "grp{cat{}}"},
        {"(?P<n>a)", "other{(?P<n>a)}"},
        {R"(\x{41)", R"(other{\x{41})"},
    });
}

TEST(Outline, KeepsEachPieceAsItIsWritten) {
    struct {
        char const* pattern;
        std::vector<std::string> pieces;
    } const cases[] = {
        {"a+?b*+c{2,3}?d{2}", {"a+?", "b*+", "c{2,3}?", "d{2}"}},
        {R"(\d+\.\x41\p{Lu}*)", {R"(\d+)", R"(\.)", R"(\x41)", R"(\p{Lu}*)"}},
        {R"([]a]+[^]]x[[:alpha:]]?[\]]*)", {"[]a]+", "[^]]", "x", "[[:alpha:]]?", R"([\]]*)"}},
        {R"((a|b(c))*(?:d)(?i)(?i:e)?(?<n>f)(?=g)(?<!h))",
         {"(a|b(c))*", "(?:d)", "(?i)", "(?i:e)?", "(?<n>f)", "(?=g)", "(?<!h)"}},
        {R"(\Qa.b\Ec)", {R"(\Qa.b\E)", "c"}},
        {"\xC3\xA4+", {"\xC3\xA4+"}},
    };
    for (auto const& [pattern, pieces] : cases)
        EXPECT_EQ(piecesOf(pattern), pieces) << pattern;
}

TEST(Outline, FindsGroupsByName) {
    auto const outline = Patterns::outlineOf("a|b(?<VAL>c|d)|");
    ASSERT_TRUE(Patterns::findGroup(outline, "VAL"));
    EXPECT_EQ(Patterns::findGroup(outline, "VAL")->text, "(?<VAL>c|d)");
    EXPECT_FALSE(Patterns::findGroup(outline, "val"));
}

TEST(Outline, JoinsPlainCharacters) {
    EXPECT_THAT(textsOf(Patterns::withJoinedLiterals(Patterns::outlineOf(R"(ab\.c+de)").front())),
                ElementsAre(R"(ab\.)", "c+", "de"));
}

TEST(Outline, SurvivesDeepNesting) { EXPECT_EQ(Patterns::outlineOf(std::string(100'000, '(')).size(), 1u); }

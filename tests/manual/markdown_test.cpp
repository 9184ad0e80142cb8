#include "programs/manual/markdown.h"
#include "programs/manual/topic.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

using namespace testing;
using Manual::Block;
using Kind = Manual::Block::Kind;

namespace {

std::vector<std::string> inWords(std::string const& markdown) {
    constexpr char const* KINDS[] = {"paragraph", "heading", "item", "code", "row"};
    std::vector<std::string> words;
    for (Block const& block : Manual::blocksOf(markdown)) {
        std::string text = std::string(KINDS[static_cast<int>(block.kind)]) + ": " + block.text;
        for (std::string const& cell : block.cells)
            text += " | " + cell;
        words.push_back(text);
    }
    return words;
}

TEST(Markdown, JoinsTheLinesOfAParagraphAndOfAnItem) {
    EXPECT_THAT(inWords("One\ntwo.\n\nThree.\n- four\n  five\n- six\n1. seven\n"),
                ElementsAre("paragraph: One two.", "paragraph: Three.", "item: four five", "item: six",
                            "item: seven"));
}

TEST(Markdown, LeavesCodeAsItStands) {
    EXPECT_THAT(inWords("Run:\n```\n# vlmail [a](b)\n\n| x |\n```\nDone.\n"),
                ElementsAre("paragraph: Run:", "code: # vlmail [a](b)\n\n| x |\n", "paragraph: Done."));
}

TEST(Markdown, LeavesCodeOfAnItemAsItStandsThere) {
    EXPECT_THAT(inWords("1. Run:\n\n   ```console\n   $ ls\n\n     a\n b\n   ```\n   Done.\n"),
                ElementsAre("item: Run:", "code: $ ls\n\n  a\nb\n", "paragraph: Done."));
}

TEST(Markdown, LeavesRemarksOut) {
    EXPECT_THAT(
        inWords("One\n<!-- not run: it takes root -->\n```\n<!-- x -->\n```\n  <!-- y -->\ntwo <!-- z\n"),
        ElementsAre("paragraph: One", "code: <!-- x -->\n", "paragraph: two <!-- z"));
}

TEST(Markdown, TakesTablesRowByRow) {
    EXPECT_THAT(inWords("| Key | Holds |\n|---|---|\n| `a\\|b` | text | |\n\n| Key of it | Holds "
                        "|\n|---|---|\n| c | d |\n"),
                ElementsAre("row: `a|b` | text", "paragraph: Key of it:", "row: c | d"));
}

TEST(Markdown, TakesLinksByTheirTexts) {
    EXPECT_THAT(inWords("See [the page](a.md#b), [1] and [`that`](c.md).\n"),
                ElementsAre("paragraph: See the page, [1] and `that`."));
    EXPECT_THAT(inWords("](\n[a](\n"), ElementsAre("paragraph: ]( [a]("));
}

TEST(Markdown, TellsWhatIsMarked) {
    std::vector<std::string> words;
    for (Manual::Span const& span : Manual::spansOf("a `b` **c d** e"))
        words.push_back((span.isMarked ? "!" : "") + span.text);
    EXPECT_THAT(words, ElementsAre("a ", "!b", " ", "!c d", " e"));
}

TEST(PlainText, IsWrappedAndHasNoMarks) {
    std::string const word = "`letters`";
    std::string text;
    for (int i = 0; i < 30; ++i)
        text += word + ' ';
    std::string const plain = Manual::plainFrom(text);
    EXPECT_THAT(plain, Not(HasSubstr("`")));
    EXPECT_THAT(plain, MatchesRegex("(letters ?){12}\n(letters ?){12}\n(letters ?){6}\n"));
    EXPECT_EQ(Manual::plainFrom("## Exit\n| Key | Holds |\n|---|---|\n| `a` | b |\n\n```\nx\n\ny\n```\n"),
              "Exit\n  a\n        b\n\n    x\n    \n    y\n");
}

} // namespace

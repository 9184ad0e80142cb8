#pragma once
// The Markdown that docs/ is written in, in blocks.

#include <string>
#include <vector>

namespace Manual {

struct Block {
    enum class Kind { Paragraph, Heading, Item, Code, Row };

    Kind kind = Kind::Paragraph;
    /// In one line, but for code; links by their texts, code and emphasis as they are marked. Of a row its
    /// first cell.
    std::string text = {};
    /// The other cells of a row, without those that are empty.
    std::vector<std::string> cells = {};
};

/// Rows of a table come one by one; of its head the first cell, as a paragraph, where it is more than a word.
std::vector<Block> blocksOf(std::string const& markdown);

struct Table {
    /// The heading that it stands below, of whatever level.
    std::string heading = {};
    /// What is unmarked is left: "Key of a letter".
    std::vector<std::string> head = {};
    /// With their marks, each as long as the head.
    std::vector<std::vector<std::string>> rows = {};
};

std::vector<Table> tablesOf(std::string const& markdown);

/// A stretch of a text that is code or stressed, or neither.
struct Span {
    std::string text;
    bool isMarked = false;
};

std::vector<Span> spansOf(std::string const& text);

} // namespace Manual

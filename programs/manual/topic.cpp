#include "programs/manual/topic.h"

#include "programs/manual/markdown.h"
#include "programs/manual/pages.h"

#include <algorithm>
#include <stdexcept>

namespace Manual {
namespace {

std::string_view pageNamed(std::string_view name) {
    auto const found = std::ranges::find(pages(), name, &Page::name);
    if (found == pages().end())
        throw std::out_of_range("There is no page " + std::string(name) + ".");
    return found->text;
}

/// From the line behind the heading to the next heading of its level or above.
std::string_view sectionOf(std::string_view page, std::string_view heading) {
    auto const at = page.find("\n## " + std::string(heading));
    if (at == std::string_view::npos)
        throw std::out_of_range("There is no section " + std::string(heading) + ".");
    auto const begin = page.find('\n', at + 1) + 1;
    return page.substr(begin, page.find("\n## ", begin) - begin);
}

std::string unmarked(std::string const& text) {
    std::string plain;
    for (Span const& span : spansOf(text))
        plain += span.text;
    return plain;
}

/// At blanks, at most so many bytes a line.
std::string wrapped(std::string const& text, std::size_t indent) {
    constexpr std::size_t WIDTH = 96;
    std::string const margin(indent, ' ');
    std::string out = margin;
    std::size_t column = indent;
    for (std::size_t at = 0; at < text.size();) {
        auto const end = std::min(text.find(' ', at), text.size());
        if (column > indent && column + 1 + (end - at) > WIDTH) {
            out += '\n' + margin;
            column = indent;
        } else if (column > indent) {
            out += ' ';
            ++column;
        }
        out += text.substr(at, end - at);
        column += end - at;
        at = end + 1;
    }
    return out + '\n';
}

std::string plainRow(Block const& row) {
    std::string text;
    for (std::string const& cell : row.cells)
        text += (text.empty() ? "" : "; ") + unmarked(cell);
    return wrapped(unmarked(row.text), 2) + (text.empty() ? "" : wrapped(text, 8));
}

std::string indented(std::string const& code) {
    std::string out = "    ";
    for (std::size_t i = 0; i < code.size(); ++i) {
        out += code[i];
        if (code[i] == '\n' && i + 1 < code.size())
            out += "    ";
    }
    return out;
}

std::string plainBlock(Block const& block) {
    switch (block.kind) {
    case Block::Kind::Heading:
        return '\n' + unmarked(block.text) + "\n";
    case Block::Kind::Item:
        return "- " + wrapped(unmarked(block.text), 2).substr(2);
    case Block::Kind::Code:
        return '\n' + indented(block.text);
    case Block::Kind::Row:
        return plainRow(block);
    case Block::Kind::Paragraph:
        break;
    }
    return '\n' + wrapped(unmarked(block.text), 0);
}

} // namespace

std::string textOf(Topic const& topic) {
    std::string_view const page = pageNamed(topic.page);
    return std::string(topic.heading.empty() ? page : sectionOf(page, topic.heading));
}

std::string plainFrom(std::string const& markdown) {
    std::string text;
    for (Block const& block : blocksOf(markdown))
        text += plainBlock(block);
    return text.substr(std::min(text.find_first_not_of('\n'), text.size()));
}

Topic const* topicNamed(std::string_view name, std::span<Topic const> topics) {
    auto const found = std::ranges::find(topics, name, &Topic::name);
    return found == topics.end() ? nullptr : &*found;
}

} // namespace Manual

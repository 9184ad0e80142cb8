#include "programs/vlmail/schema/descriptions.h"

#include "programs/manual/markdown.h"
#include "programs/manual/topic.h"

#include <algorithm>
#include <map>
#include <string>

namespace VlMail {
namespace {

using Texts = std::map<std::string, std::string, std::less<>>;

/// `"id", "created"` and "`id`" name keys.
std::vector<std::string> keysIn(std::string const& cell) {
    std::vector<std::string> keys;
    for (std::size_t at = 0; (at = cell.find_first_of("\"`", at)) != cell.npos;) {
        std::size_t const end = cell.find(cell[at], at + 1);
        if (end == cell.npos)
            break;
        keys.push_back(cell.substr(at + 1, end - at - 1));
        at = end + 1;
    }
    return keys;
}

std::string plain(std::string const& cell) {
    std::string text;
    for (Manual::Span const& span : Manual::spansOf(cell))
        text += span.text;
    return text;
}

/// Of the column that tells what a key means.
std::size_t meaningIn(Manual::Table const& table) {
    for (char const* name : {"Meaning", "Holds", "Amount"})
        if (auto const found = std::ranges::find(table.head, name); found != table.head.end())
            return static_cast<std::size_t>(found - table.head.begin());
    return 0;
}

void addTable(Manual::Table const& table, Texts& texts) {
    std::size_t const meaning = meaningIn(table);
    if (meaning == 0)
        return;
    for (std::vector<std::string> const& row : table.rows)
        for (std::string const& key : keysIn(row.front()))
            texts.try_emplace(key, plain(row[meaning]));
}

Texts textsOf(KeyTables const& wanted) {
    Texts texts;
    std::string const page = Manual::textOf({"", wanted.page, ""});
    for (Manual::Table const& table : Manual::tablesOf(page))
        if (std::ranges::any_of(wanted.headings,
                                [&](std::string_view heading) { return table.heading.starts_with(heading); }))
            addTable(table, texts);
    return texts;
}

} // namespace

json::Object described(json::Object const& object, KeyTables const& tables) {
    Texts const texts = textsOf(tables);
    json::Object members;
    for (auto const& [key, member] : object.get("properties").toObject()) {
        auto const text = texts.find(std::string_view(key));
        members.set(key, text == texts.end() || text->second.empty()
                             ? member
                             : Base::Schema::with(member.toObject(), "description", text->second));
    }
    return Base::Schema::with(object, "properties", members);
}

} // namespace VlMail

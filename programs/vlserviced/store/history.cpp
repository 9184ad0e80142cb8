#include "programs/vlserviced/store/history.h"

#include "programs/base/digest.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <sstream>
#include <string_view>

namespace VlServiced {
namespace {

using Protocol::HistoryEntry;

/// Of a value; a longer one is told by its digest.
constexpr std::size_t MAX_VALUE_BYTES = 500;
/// Of all that changed.
constexpr std::size_t MAX_CHANGE_BYTES = 4000;
/// In keys of values that are nobody's affair.
constexpr std::string_view SECRETS[] = {"password", "secret", "pwd", "passphrase"};
constexpr long long DAY = 24 * 60 * 60;

std::string textOf(json::Value const& value) {
    std::ostringstream text;
    text << value;
    return std::move(text).str();
}

bool isSecret(std::string const& key) {
    // What names the file of a secret is none.
    return !key.ends_with("_file") && std::ranges::any_of(SECRETS, [&](std::string_view word) {
        return key.find(word) != std::string::npos;
    });
}

json::Value withoutSecrets(json::Value const& value);

json::Object withoutSecretsIn(json::Object const& object) {
    json::Object shown;
    for (auto const& [key, value] : object)
        shown.set(key, isSecret(key) ? json::Value("not shown") : withoutSecrets(value));
    return shown;
}

/// Settings are not nested deep: what is, was refused.
json::Value withoutSecrets(json::Value const& value) {
    if (value.isObject())
        return withoutSecretsIn(value.toObject());
    if (!value.isArray())
        return value;
    json::Array shown;
    for (json::Value const& element : value.toArray())
        shown.append(withoutSecrets(element));
    return shown;
}

json::Value brief(std::string const& key, json::Value const& value) {
    if (isSecret(key))
        return json::Value("not shown");
    std::string const text = textOf(withoutSecrets(value));
    if (text.size() <= MAX_VALUE_BYTES)
        return withoutSecrets(value);
    return json::Value(std::to_string(text.size()) + " bytes, SHA-256 " + Base::sha256(text));
}

/// Of the keys of one whose values the other has not.
json::Object unlike(json::Object const& one, json::Object const& other) {
    json::Object differing;
    for (auto const& [key, value] : one)
        if (!(other.get(key) == value))
            differing.set(key, brief(key, value));
    return differing;
}

std::string bounded(json::Object const& changes) {
    std::string const text = textOf(changes);
    if (text.size() <= MAX_CHANGE_BYTES)
        return text == "{}" ? std::string() : text;
    return std::to_string(text.size()) + " bytes, SHA-256 " + Base::sha256(text);
}

std::string patternFor(std::string const& node) {
    std::string pattern = "%/";
    for (char const c : node)
        pattern += std::string(c == '%' || c == '_' || c == '!' ? "!" : "") + c;
    return pattern;
}

HistoryEntry entryIn(Database::Rows const& row) {
    HistoryEntry entry;
    entry.at = row.number(0);
    entry.who = row.text(1);
    entry.id = row.text(2);
    entry.what = row.text(3);
    entry.was = row.text(4);
    entry.is = row.text(5);
    return entry;
}

constexpr char const* SELECT_ENTRIES = "SELECT at, who, node, what, was, is_now FROM history ";

} // namespace

void History::note(std::string const& node, std::string const& what, std::string const& was,
                   std::string const& is) {
    if (who_.empty())
        return;
    database_.change("INSERT INTO history (at, who, node, what, was, is_now) VALUES ($1, $2, $3, $4, $5, $6)",
                     now_(), who_, node, what, was, is);
}

// One database makes no difference between small and capital letters in a pattern.
std::vector<HistoryEntry> History::of(std::string const& node, long long limit) const {
    std::string const youngest = "ORDER BY number DESC LIMIT " + std::to_string(limit);
    Database::Rows rows =
        node.empty() ? database_.query(SELECT_ENTRIES + youngest)
                     : database_.query(SELECT_ENTRIES + std::string("WHERE '/' || node LIKE $1 ESCAPE '!' ") +
                                           youngest,
                                       patternFor(node));
    Policy::Grant const covering{{}, {}, node};
    std::vector<HistoryEntry> entries;
    while (rows.next())
        if (HistoryEntry entry = entryIn(rows); covering.covers(entry.id))
            entries.push_back(std::move(entry));
    std::ranges::reverse(entries);
    return entries;
}

void History::removeOld() { database_.change("DELETE FROM history WHERE at < $1", now_() - KEPT_DAYS * DAY); }

void Recorder::note(std::string const& node, std::string const& what, std::string const& was,
                    std::string const& is) const {
    if (history_ && was != is)
        history_->note(node, what, was, is);
}

void Recorder::note(std::string const& node, std::string const& what, json::Object const& was,
                    json::Object const& is) const {
    if (history_ && !history_->who().empty())
        note(node, what, bounded(unlike(was, is)), bounded(unlike(is, was)));
}

} // namespace VlServiced

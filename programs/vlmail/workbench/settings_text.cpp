#include "programs/vlmail/workbench/settings_text.h"

#include "programs/base/error.h"
#include "programs/base/quoting.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <charconv>

namespace VlMail::Workbench {
namespace {

/// Walks a text that the parser has taken already.
class PlaceReader {
public:
    explicit PlaceReader(std::string_view text) : text_(text) {}

    JsonPlace value() {
        skipBlanks();
        JsonPlace place;
        place.begin = place.keyBegin = at_;
        char const first = text_[at_];
        if (first == '{' || first == '[') {
            place.kind = first;
            members(place);
        } else if (first == '"') {
            skipText();
        } else {
            at_ = std::min(text_.find_first_of(" \t\r\n,]}", at_), text_.size());
        }
        place.end = at_;
        return place;
    }

private:
    void members(JsonPlace& place) {
        char const end = place.kind == '{' ? '}' : ']';
        ++at_;
        for (skipBlanks(); text_[at_] != end; skipBlanks()) {
            std::size_t const begin = at_;
            std::string const key = place.kind == '{' ? this->key() : std::to_string(place.members.size());
            JsonPlace member = value();
            member.keyBegin = place.kind == '{' ? begin : member.begin;
            place.members.emplace_back(key, std::move(member));
            skipBlanks();
            at_ += text_[at_] == ',' ? 1 : 0;
        }
        ++at_;
    }

    std::string key() {
        std::size_t const begin = at_;
        skipText();
        std::string_view const written = text_.substr(begin, at_ - begin);
        skipBlanks();
        ++at_; // the colon
        if (written.find('\\') == std::string_view::npos)
            return std::string(written.substr(1, written.size() - 2));
        std::string const object = '{' + std::string(written) + ":0}";
        return (*json::strToObject(object.data(), object.size()).begin()).first;
    }

    void skipText() {
        for (++at_; text_[at_] != '"'; ++at_)
            at_ += text_[at_] == '\\' ? 1 : 0;
        ++at_;
    }
    void skipBlanks() { at_ = std::min(text_.find_first_not_of(" \t\r\n", at_), text_.size()); }

    std::string_view text_;
    std::size_t at_ = 0;
};

/// A value as text, a member a line, each indented by a unit more; or all of it on one line.
class Writer {
public:
    Writer(std::string unit, bool isOnOneLine) : unit_(std::move(unit)), isOnOneLine_(isOnOneLine) {}

    std::string write(json::Value const& value, std::string const& indent) const {
        if (value.isObject())
            return list(value.toObject(), '{', '}', indent);
        if (value.isArray())
            return list(value.toArray(), '[', ']', indent);
        return json::toText(value);
    }

private:
    static std::string keyOf(std::pair<char const*, json::Value> const& member) {
        return json::toText(json::Value(member.first)) + ": ";
    }
    static std::string keyOf(json::Value const&) { return {}; }
    static json::Value valueOf(std::pair<char const*, json::Value> const& member) { return member.second; }
    static json::Value valueOf(json::Value const& element) { return element; }

    template<typename List>
    std::string list(List const& list, char begin, char end, std::string const& indent) const {
        if (list.empty())
            return {begin, end};
        std::string const inner = isOnOneLine_ ? std::string() : '\n' + indent + unit_;
        std::string text(1, begin);
        for (auto const& member : list)
            text += (text.size() == 1 ? inner : (isOnOneLine_ ? ", " : ',' + inner)) + keyOf(member) +
                    write(valueOf(member), indent + unit_);
        return text + (isOnOneLine_ ? std::string() : '\n' + indent) + end;
    }

    std::string unit_;
    bool isOnOneLine_;
};

[[noreturn]] void leadsNowhere(std::string const& pointer) {
    throw Base::Error(Base::Code::SettingUnknown,
                      "there is nothing at " + Base::inQuotes(pointer) + " in the settings any more");
}

bool isWithin(std::size_t byte) { return byte != std::string::npos; }

/// Units of UTF-16 that the byte begins.
std::size_t unitsOf(char c) {
    auto const byte = static_cast<unsigned char>(c);
    return (byte & 0xC0U) == 0x80U ? 0 : byte >= 0xF0U ? 2 : 1;
}

std::size_t unitsIn(std::string_view text) {
    std::size_t units = 0;
    for (char const c : text)
        units += unitsOf(c);
    return units;
}

Position positionIn(std::string_view text, std::size_t byte) {
    std::string_view const before = text.substr(0, byte);
    std::size_t const lineEnd = before.rfind('\n');
    std::size_t const begin = isWithin(lineEnd) ? lineEnd + 1 : 0;
    return {static_cast<std::size_t>(std::count(before.begin(), before.end(), '\n')),
            unitsIn(before.substr(begin))};
}

bool isInCharacter(std::string_view text, std::size_t byte) {
    return byte < text.size() && (static_cast<unsigned char>(text[byte]) & 0xC0U) == 0x80U;
}

std::string unescaped(std::string_view step) {
    std::string text;
    for (std::size_t i = 0; i < step.size(); ++i) {
        bool const isEscape = step[i] == '~' && i + 1 < step.size();
        text += isEscape ? (step[++i] == '1' ? '/' : '~') : step[i];
    }
    return text;
}

/// The pointer to what stands above, and the last step.
std::pair<std::string, std::string> parentOf(std::string const& pointer) {
    std::size_t const slash = pointer.rfind('/');
    if (!isWithin(slash))
        leadsNowhere(pointer);
    return {pointer.substr(0, slash), unescaped(std::string_view(pointer).substr(slash + 1))};
}

/// A list or an object that has the value alone.
json::Value inList(std::string const& key, json::Value const& value) {
    if (key != "-")
        return json::Object{{key.c_str(), value}};
    json::Array list;
    list.append(value);
    return list;
}

JsonPlace const* memberOf(JsonPlace const& place, std::string const& key) {
    auto const found = std::find_if(place.members.rbegin(), place.members.rend(),
                                    [&](auto const& member) { return member.first == key; });
    return found == place.members.rend() ? nullptr : &found->second;
}

} // namespace

std::vector<std::string> stepsOf(std::string const& pointer) {
    std::vector<std::string> steps;
    for (std::size_t at = 0; at < pointer.size();) {
        std::size_t const end = std::min(pointer.find('/', at + 1), pointer.size());
        steps.push_back(unescaped(std::string_view(pointer).substr(at + 1, end - at - 1)));
        at = end;
    }
    return steps;
}

std::optional<BrokenText> whatIsBroken(std::string const& text) {
    json_error_t error;
    json::Value const parsed(json_loadb(text.data(), text.size(), 0, &error));
    if (!parsed) {
        std::size_t const byte = std::min(static_cast<std::size_t>(std::max(error.position, 0)), text.size());
        // The parser stands behind the character that it does not take.
        return BrokenText{"line " + std::to_string(error.line) + ": " + error.text,
                          positionIn(text, byte == 0 ? 0 : byte - 1)};
    }
    if (!parsed.isObject())
        return BrokenText{"line 1: settings are an object, {...}", {}};
    return std::nullopt;
}

SettingsText::SettingsText(std::string text) : text_(std::move(text)) {
    if (auto const broken = whatIsBroken(text_))
        throw Base::Error(Base::Code::JsonMalformed,
                          "the settings are no JSON: " + broken->says + "; correct them there");
    root_ = PlaceReader(text_).value();
    lines_.push_back(0);
    for (std::size_t at = text_.find('\n'); isWithin(at); at = text_.find('\n', at + 1))
        lines_.push_back(at + 1);
}

Position SettingsText::positionOf(std::size_t byte) const {
    auto const line = std::upper_bound(lines_.begin() + 1, lines_.end(), byte) - 1;
    return {static_cast<std::size_t>(line - lines_.begin()),
            unitsIn(std::string_view(text_).substr(*line, byte - *line))};
}

JsonPlace const* SettingsText::find(std::string const& pointer) const {
    JsonPlace const* place = &root_;
    for (std::string const& step : stepsOf(pointer))
        if (place)
            place = memberOf(*place, step);
    return place;
}

JsonPlace const& SettingsText::nearest(std::string const& pointer) const {
    JsonPlace const* place = &root_;
    for (std::string const& step : stepsOf(pointer)) {
        JsonPlace const* const next = memberOf(*place, step);
        if (!next)
            break;
        place = next;
    }
    return *place;
}

std::string SettingsText::indentAt(std::size_t byte) const {
    std::size_t const lineEnd = byte == 0 ? std::string::npos : text_.rfind('\n', byte - 1);
    std::size_t const begin = isWithin(lineEnd) ? lineEnd + 1 : 0;
    return text_.substr(begin, std::min(text_.find_first_not_of(" \t", begin), byte) - begin);
}

/// By how much the members of the document are indented.
std::string SettingsText::unit() const {
    if (root_.members.empty() || isOnOneLine(root_))
        return "  ";
    std::string const indent = indentAt(root_.members.front().second.keyBegin);
    return indent.empty() ? "  " : indent;
}

bool SettingsText::isOnOneLine(JsonPlace const& place) const {
    return std::string_view(text_).substr(place.begin, place.end - place.begin).find('\n') ==
           std::string_view::npos;
}

SettingsText SettingsText::replaced(std::size_t begin, std::size_t end, std::string_view by) const {
    std::string text = text_;
    text.replace(begin, end - begin, by);
    return SettingsText(std::move(text));
}

SettingsText SettingsText::with(std::string const& pointer, json::Value const& value) const {
    if (JsonPlace const* const place = find(pointer)) {
        bool const isSmall = place->kind != ' ' && !place->members.empty() && isOnOneLine(*place);
        return replaced(place->begin, place->end,
                        Writer(unit(), isSmall).write(value, indentAt(place->keyBegin)));
    }
    auto const [above, key] = parentOf(pointer);
    JsonPlace const* const parent = find(above);
    if (!parent)
        return with(above, inList(key, value));
    bool const isEnd = key == "-" || key == std::to_string(parent->members.size());
    if (parent->kind == ' ' || (parent->kind == '[' && !isEnd))
        leadsNowhere(pointer);
    return withMember(*parent, key, value);
}

SettingsText SettingsText::withMember(JsonPlace const& parent, std::string const& key,
                                      json::Value const& value) const {
    std::string const name = parent.kind == '{' ? json::toText(json::Value(key)) + ": " : "";
    bool const isSmall = isOnOneLine(parent) && !parent.members.empty();
    std::string const indent = indentAt(parent.keyBegin);
    std::string const inner = parent.members.empty() || isOnOneLine(parent)
                                  ? indent + unit()
                                  : indentAt(parent.members.back().second.keyBegin);
    std::string const written = name + Writer(unit(), isSmall).write(value, inner);
    if (parent.members.empty())
        return replaced(parent.begin + 1, parent.end - 1, '\n' + inner + written + '\n' + indent);
    std::size_t const end = parent.members.back().second.end;
    return replaced(end, end, isSmall ? ", " + written : ",\n" + inner + written);
}

SettingsText SettingsText::withInserted(std::string const& pointer, json::Value const& value) const {
    JsonPlace const* const place = find(pointer);
    if (!place)
        return with(pointer, value);
    std::string const indent = indentAt(place->keyBegin);
    bool const isFirstOfLine =
        text_.substr(place->begin - indent.size(), indent.size()) == indent &&
        (place->begin == indent.size() || text_[place->begin - indent.size() - 1] == '\n');
    std::string const written = Writer(unit(), !isFirstOfLine).write(value, indent);
    return replaced(place->begin, place->begin, written + (isFirstOfLine ? ",\n" + indent : ", "));
}

SettingsText SettingsText::without(std::string const& pointer) const {
    auto const [above, key] = parentOf(pointer);
    JsonPlace const* const parent = find(above);
    JsonPlace const* const place = find(pointer);
    if (!parent || !place)
        leadsNowhere(pointer);
    auto const& members = parent->members;
    auto const at = std::find_if(members.begin(), members.end(),
                                 [&](auto const& member) { return &member.second == place; });
    if (members.size() == 1)
        return replaced(parent->begin + 1, parent->end - 1, "");
    if (at == members.begin())
        return replaced(place->keyBegin, std::next(at)->second.keyBegin, "");
    return replaced(std::prev(at)->second.end, place->end, "");
}

std::vector<Edit> editsBetween(SettingsText const& before, std::string const& after) {
    std::string const& text = before.text();
    if (text == after)
        return {};
    std::size_t const shorter = std::min(text.size(), after.size());
    std::size_t front = 0;
    while (front < shorter && text[front] == after[front])
        ++front;
    while (isInCharacter(text, front) || isInCharacter(after, front))
        --front;
    std::size_t back = 0;
    while (back < shorter - front && text[text.size() - back - 1] == after[after.size() - back - 1])
        ++back;
    while (isInCharacter(text, text.size() - back) || isInCharacter(after, after.size() - back))
        --back;
    return {{before.positionOf(front), before.positionOf(text.size() - back),
             after.substr(front, after.size() - back - front)}};
}

} // namespace VlMail::Workbench

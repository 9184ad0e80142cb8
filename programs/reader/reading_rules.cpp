#include "programs/reader/reading_rules.h"

#include "programs/base/error.h"
#include "programs/base/json_schema.h"
#include "programs/base/quoting.h"
#include "programs/base/utf8.h"
#include "programs/patterns/pattern.h"
#include "programs/reader/month_names.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <span>
#include <utility>

namespace Reader {
namespace {

constexpr char const* DECIMAL = "decimal";
constexpr char const* GROUPING = "grouping";
constexpr char const* MONTHS = "months";
constexpr char const* ZONES = "zones";
constexpr std::array READING_KEYS{DECIMAL, GROUPING, MONTHS, ZONES};

constexpr char const* PAGE = "page";
constexpr char const* ANCHOR = "anchor";
constexpr char const* COLUMN = "column";
constexpr std::array ZONE_KEYS{PAGE, ANCHOR, COLUMN};

constexpr char const* DECIMAL_AUTO = "auto";
constexpr char const* PAGE_LAST = "last";
constexpr char const* PAGE_ANY = "any";
constexpr std::size_t MOST_GROUPING = 8;

using Base::inQuotes;

std::vector<std::string> charactersOf(std::string_view text) {
    std::vector<std::string> characters;
    for (; !text.empty(); text.remove_prefix(characters.back().size()))
        characters.emplace_back(Base::firstCharacters(text, 1));
    return characters;
}

/// Whether a number may have it between its digits.
bool isSeparator(std::string const& character) {
    return character.size() > 1 || (!std::isalnum(static_cast<unsigned char>(character[0])) &&
                                    std::string_view("+-").find(character[0]) == std::string_view::npos &&
                                    static_cast<unsigned char>(character[0]) >= 0x20);
}

class Parser {
public:
    explicit Parser(std::vector<RulesFault>& faults) : faults_(faults) {}

    ReadingRules rules(json::Value const& reading) {
        ReadingRules rules;
        if (!reading)
            return rules;
        if (!reading.isObject()) {
            fault({}, "is no object", "write an object such as {\"decimal\": \",\", \"grouping\": \".\"}");
            return rules;
        }
        json::Object const& object = reading.toObject();
        requireKnown(object, {}, READING_KEYS);
        rules.numbers = numbers(object);
        rules.months = months(object.get(MONTHS));
        rules.zones = zones(object.get(ZONES));
        return rules;
    }

private:
    using Path = std::vector<std::string>;

    void fault(Path path, std::string what, std::string advice) {
        faults_.push_back({std::move(path), std::move(what), std::move(advice)});
    }

    void requireKnown(json::Object const& object, Path const& path, std::span<char const* const> known) {
        std::string all;
        for (char const* key : known)
            all += (all.empty() ? "" : ", ") + inQuotes(key);
        for (auto const& [key, value] : object) {
            Path at = path;
            at.emplace_back(key);
            if (std::ranges::find(known, at.back()) == known.end())
                fault(at, inQuotes(at.back()) + " is no key here", "write one of " + all);
        }
    }

    NumberRules numbers(json::Object const& object) {
        NumberRules rules;
        rules.grouping = grouping(object.get(GROUPING));
        json::Value const decimal = object.get(DECIMAL);
        if (!decimal) {
            if (object.get(GROUPING))
                fault({GROUPING}, "stands without \"decimal\" and changes nothing", "add \"decimal\"");
            return rules;
        }
        if (decimal.textOrEmpty() == DECIMAL_AUTO) {
            rules.kind = NumberRules::Decimal::Auto;
            return rules;
        }
        std::vector<std::string> const characters = charactersOf(decimal.textOrEmpty());
        if (characters.size() != 1 || !isSeparator(characters.front()) || characters.front() == " ")
            fault({DECIMAL}, "is no character that a number has in front of its decimals",
                  "write \",\" or \".\" or \"auto\"");
        else if (std::ranges::find(rules.grouping, characters.front()) != rules.grouping.end())
            fault({GROUPING}, inQuotes(characters.front()) + " is the decimal character too",
                  "take it out of one of the two");
        else
            rules = {NumberRules::Decimal::Given, characters.front(), rules.grouping};
        return rules;
    }

    std::vector<std::string> grouping(json::Value const& value) {
        if (!value)
            return {};
        std::vector<std::string> characters = charactersOf(value.textOrEmpty());
        bool const isGood = value.isString() && characters.size() <= MOST_GROUPING &&
                            std::ranges::all_of(characters, isSeparator);
        if (isGood)
            return characters;
        fault({GROUPING}, "is no list of characters that stand between groups of digits",
              "write them as one text, such as \".' \"");
        return {};
    }

    std::string months(json::Value const& value) {
        if (!value)
            return {};
        if (value.isString() && hasMonthNames(value.toString()))
            return value.toString();
        fault({MONTHS}, "is no language whose names of months are known",
              "write its code, such as \"de\", \"fr\" or \"nl\"");
        return {};
    }

    std::map<std::string, ZoneRules> zones(json::Value const& value) {
        std::map<std::string, ZoneRules> zones;
        if (!value)
            return zones;
        if (!value.isObject()) {
            fault({ZONES}, "is no object", "write the names of zones with an object each");
            return zones;
        }
        for (auto const& [name, node] : value.toObject())
            zones[name] = zone({ZONES, name}, node);
        return zones;
    }

    ZoneRules zone(Path const& path, json::Value const& node) {
        ZoneRules rules;
        if (!node.isObject()) {
            fault(path, "is no object", "write an object such as {\"page\": \"last\"}");
            return rules;
        }
        json::Object const& object = node.toObject();
        requireKnown(object, path, ZONE_KEYS);
        readPage(rules, path, object.get(PAGE));
        readAnchor(rules, path, object.get(ANCHOR));
        json::Value const column = object.get(COLUMN);
        if (column && !json_is_boolean(column.node()))
            fault(below(path, COLUMN), "is neither true nor false", "write true or false");
        rules.byColumn = column.isTrue();
        return rules;
    }

    static Path below(Path path, char const* key) {
        path.emplace_back(key);
        return path;
    }

    void readPage(ZoneRules& rules, Path const& path, json::Value const& page) {
        std::string const word = page.textOrEmpty();
        if (page.isInt() && page.toInt() >= 1 && page.toInt() <= ReadingRules::MAX_PAGE)
            rules.page = static_cast<int>(page.toInt());
        else if (word == PAGE_LAST)
            rules.pages = ZoneRules::Pages::Last;
        else if (word == PAGE_ANY)
            rules.pages = ZoneRules::Pages::Any;
        else if (page)
            fault(below(path, PAGE), "is no page of a letter", "write 1, 2 and so on, \"last\" or \"any\"");
    }

    void readAnchor(ZoneRules& rules, Path const& path, json::Value const& anchor) {
        if (!anchor)
            return;
        try {
            std::string const pattern = anchor.textOrEmpty();
            if (pattern.empty())
                fault(below(path, ANCHOR), "is no pattern", "write a pattern that fits a text of the page");
            else
                Patterns::Pattern(pattern, Patterns::Pattern::Use::Extract);
            rules.anchor = pattern;
        } catch (Patterns::Broken const& broken) {
            fault(below(path, ANCHOR),
                  "is broken at character " + std::to_string(broken.position + 1) + " (" + broken.what() +
                      ')',
                  "correct the pattern");
        }
    }

    std::vector<RulesFault>& faults_;
};

} // namespace

std::string placeInWords(char const* key, RulesFault const& fault) {
    std::string place = key;
    for (std::string const& step : fault.path)
        place += '/' + step;
    return inQuotes(place);
}

ZoneRules const* ReadingRules::forZone(std::string const& name) const {
    auto const found = zones.find(name);
    return found == zones.end() ? nullptr : &found->second;
}

bool ReadingRules::isOnFirstPage(std::string const& zone) const {
    ZoneRules const* const rules = forZone(zone);
    return !rules || rules->isOnFirstPage();
}

ReadingRules ReadingRules::from(json::Value const& reading, std::vector<RulesFault>& faults) {
    return Parser(faults).rules(reading);
}

json::Object ReadingRules::schema() {
    namespace Schema = Base::Schema;
    using Schema::Members;
    json::Object const zone =
        Members(Members::Others::Refused)
            .add(PAGE, Schema::either({Schema::integer(1, MAX_PAGE), Schema::words({PAGE_LAST, PAGE_ANY})}))
            .add(ANCHOR, Schema::with(Schema::text(), "minLength", 1))
            .add(COLUMN, Schema::flag())
            .schema();
    // As isSeparator() has it.
    std::string const separator = R"([^0-9A-Za-z+\-\u0000-\u001f])";
    json::Object const decimal =
        Schema::either({Schema::constant(DECIMAL_AUTO), Schema::textLike("^(?! )" + separator + '$')});
    return Members(Members::Others::Refused)
        .add(DECIMAL, decimal)
        .add(GROUPING, Schema::textLike('^' + separator + "{0," + std::to_string(MOST_GROUPING) + "}$"))
        .add(MONTHS, Schema::with(Schema::text(), "minLength", 1))
        .add(ZONES, Schema::mapOf(zone))
        .needs(GROUPING, DECIMAL)
        .schema();
}

ReadingRules ReadingRules::of(Cfg::PackPreset const& preset) {
    json::Value const additional = preset.jAdditional();
    std::vector<RulesFault> faults;
    ReadingRules rules = from(additional.isObject() ? additional.toObject().get(KEY) : json::Value(), faults);
    if (faults.empty())
        return rules;
    throw Base::Error(Base::Code::SettingInvalid, placeInWords(KEY, faults.front()) + " of the pack preset " +
                                                      inQuotes(preset.name()) + ' ' + faults.front().what +
                                                      "; " + faults.front().advice);
}

} // namespace Reader

#include "programs/production/production_rules.h"

#include "programs/base/json_schema.h"
#include "programs/base/millimetres.h"
#include "programs/base/quoting.h"
#include "programs/mailing/fallback.h"
#include "programs/mailing/print_wishes.h"
#include "programs/patterns/pattern.h"
#include "programs/protocol/carrier.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <utility>

namespace Production {
namespace {

using Base::inQuotes;
using Faults = std::vector<Reader::RulesFault>;
using Path = std::vector<std::string>;

using Mailing::PrintWishes;

constexpr char const* SHEET = PrintWishes::SHEET;
constexpr char const* WINDOW = "window";
constexpr char const* CLEAR_ZONES = "clear_zones";
constexpr char const* TOLERANCE = "tolerance";
constexpr char const* ADDRESS_LINES = "address_lines";
constexpr char const* POSTCODE = "postcode";
constexpr char const* REPAIR = "repair";
constexpr char const* COPIES = PrintWishes::COPIES;
constexpr char const* FALLBACK = Mailing::FALLBACK;
constexpr char const* DUPLICATE_DAYS = PrintWishes::DUPLICATE_DAYS;
constexpr std::array KEYS{SHEET,    WINDOW, CLEAR_ZONES, TOLERANCE, ADDRESS_LINES,
                          POSTCODE, REPAIR, COPIES,      FALLBACK,  DUPLICATE_DAYS};

constexpr char const* WIDTH = PrintWishes::WIDTH;
constexpr char const* HEIGHT = PrintWishes::HEIGHT;
constexpr std::array SHEET_KEYS{WIDTH, HEIGHT};

constexpr char const* PAGES = "pages";
constexpr std::array EDGES{"left", "top", "right", "bottom"};
constexpr std::array ZONE_KEYS{"left", "top", "right", "bottom", PAGES};

constexpr char const* FIRST_PAGE = "first";
constexpr char const* ALL_PAGES = "all";

constexpr char const* MIN = "min";
constexpr char const* MAX = "max";
constexpr std::array LINES_KEYS{MIN, MAX};

constexpr char const* COVER_PAGE = "cover-page";
constexpr char const* FALLBACK_ADVICE = "write names of channels such as [\"email\", \"postal\"]";

Path below(Path path, std::string key) {
    path.push_back(std::move(key));
    return path;
}

/// Reads an object key by key and keeps what is wrong with it.
class Parser {
public:
    explicit Parser(Faults& faults) : faults_(faults) {}

    ProductionRules rules(json::Value const& production) {
        ProductionRules rules;
        if (!production)
            return rules;
        rules.isGiven = true;
        if (!isObject(production, {}, "{\"window\": {...}}"))
            return rules;
        json::Object const& object = production.toObject();
        requireKnown(object, {}, KEYS);
        readSheet(rules, object.get(SHEET));
        sheet_ = rules.sheet;
        if (json::Value const window = object.get(WINDOW))
            rules.window = box(window, {WINDOW}, EDGES);
        readZones(rules, object.get(CLEAR_ZONES));
        if (json::Value const tolerance = object.get(TOLERANCE))
            rules.tolerance =
                number(tolerance, {TOLERANCE}, 0, ProductionRules::MAX_TOLERANCE).value_or(rules.tolerance);
        readLines(rules, object.get(ADDRESS_LINES));
        readPostcode(rules, object.get(POSTCODE));
        readRepair(rules, object.get(REPAIR));
        // A printer is told; here nothing depends on it.
        if (json::Value const copies = object.get(COPIES))
            number(copies, {COPIES}, 1, PrintWishes::MAX_COPIES);
        checkFallback(object.get(FALLBACK));
        // The register of letters goes by it.
        if (json::Value const days = object.get(DUPLICATE_DAYS))
            number(days, {DUPLICATE_DAYS}, 0, PrintWishes::MAX_DUPLICATE_DAYS);
        return rules;
    }

private:
    void fault(Path path, std::string what, std::string advice) {
        faults_.push_back({std::move(path), std::move(what), std::move(advice)});
    }

    bool isObject(json::Value const& value, Path const& path, std::string const& example) {
        if (value.isObject())
            return true;
        fault(path, "is no object", "write an object such as " + example);
        return false;
    }

    template<std::size_t N>
    void requireKnown(json::Object const& object, Path const& path, std::array<char const*, N> const& known) {
        std::string all;
        for (char const* key : known)
            all += (all.empty() ? "" : ", ") + inQuotes(key);
        for (auto const& [key, value] : object)
            if (std::ranges::find(known, std::string_view(key)) == known.end())
                fault(below(path, key), inQuotes(key) + " is no key here", "write one of " + all);
    }

    std::optional<int> number(json::Value const& value, Path const& path, int least, int most) {
        if (value.isInt() && value.toInt() >= least && value.toInt() <= most)
            return static_cast<int>(value.toInt());
        fault(path,
              value ? "is no integer from " + std::to_string(least) + " to " + std::to_string(most)
                    : "is missing",
              "write one; lengths are in 1/100 mm");
        return std::nullopt;
    }

    void readSheet(ProductionRules& rules, json::Value const& sheet) {
        if (!sheet || !isObject(sheet, {SHEET}, "{\"width\": 21000, \"height\": 29700}"))
            return;
        json::Object const& object = sheet.toObject();
        requireKnown(object, {SHEET}, SHEET_KEYS);
        auto const width = number(object.get(WIDTH), {SHEET, WIDTH}, 1, ProductionRules::MAX_LENGTH);
        auto const height = number(object.get(HEIGHT), {SHEET, HEIGHT}, 1, ProductionRules::MAX_LENGTH);
        if (width && height)
            rules.sheet = {*width, *height};
    }

    template<std::size_t N>
    std::optional<Box> box(json::Value const& value, Path const& path,
                           std::array<char const*, N> const& known) {
        if (!isObject(value, path, "{\"left\": 2000, \"top\": 4500, \"right\": 10500, \"bottom\": 9000}"))
            return std::nullopt;
        json::Object const& object = value.toObject();
        requireKnown(object, path, known);
        std::array<int, EDGES.size()> edges{};
        for (std::size_t i = 0; i < EDGES.size(); ++i) {
            auto const edge = number(object.get(EDGES[i]), below(path, EDGES[i]),
                                     -ProductionRules::MAX_LENGTH, ProductionRules::MAX_LENGTH);
            if (!edge)
                return std::nullopt;
            edges[i] = *edge;
        }
        Box const read{edges[0], edges[1], edges[2], edges[3]};
        return liesOnSheet(read, path) ? std::optional(read) : std::nullopt;
    }

    bool liesOnSheet(Box const& box, Path const& path) {
        if (box.left >= box.right || box.top >= box.bottom) {
            fault(path,
                  "has no area: it goes from " + Base::inMillimetres(box.left) + " to " +
                      Base::withMillimetres(box.right) + " across and from " + Base::inMillimetres(box.top) +
                      " to " + Base::withMillimetres(box.bottom) + " down",
                  "write \"left\" less than \"right\", and \"top\" less than \"bottom\"");
            return false;
        }
        if (box.left >= 0 && box.top >= 0 && box.right <= sheet_.width && box.bottom <= sheet_.height)
            return true;
        fault(path,
              "reaches beyond the sheet of " + Base::inMillimetres(sheet_.width) + " by " +
                  Base::withMillimetres(sheet_.height),
              "write edges on the sheet, in 1/100 mm, or another \"sheet\"");
        return false;
    }

    void readZones(ProductionRules& rules, json::Value const& zones) {
        if (!zones)
            return;
        if (!zones.isArray() || zones.toArray().size() > ProductionRules::MAX_ZONES)
            return fault({CLEAR_ZONES},
                         "is no list of at most " + std::to_string(ProductionRules::MAX_ZONES) + " zones",
                         "write a list such as [{\"left\": 0, \"top\": 28000, \"right\": 21000, "
                         "\"bottom\": 29700, \"pages\": \"all\"}]");
        for (std::size_t i = 0; i < zones.toArray().size(); ++i)
            readZone(rules, zones.toArray().at(i), {CLEAR_ZONES, std::to_string(i)});
    }

    void readZone(ProductionRules& rules, json::Value const& value, Path const& path) {
        std::optional<Box> const read = box(value, path, ZONE_KEYS);
        json::Value const pages = value.isObject() ? value.toObject().get(PAGES) : json::Value();
        std::string const word = pages.textOrEmpty();
        if (pages && word != FIRST_PAGE && word != ALL_PAGES)
            return fault(below(path, PAGES), "is neither \"first\" nor \"all\"",
                         "write \"first\" or \"all\"");
        if (read)
            rules.clearZones.push_back({*read, word == ALL_PAGES});
    }

    void readLines(ProductionRules& rules, json::Value const& lines) {
        if (!lines || !isObject(lines, {ADDRESS_LINES}, "{\"min\": 3, \"max\": 6}"))
            return;
        json::Object const& object = lines.toObject();
        requireKnown(object, {ADDRESS_LINES}, LINES_KEYS);
        int const min = linesIn(object, MIN);
        int const max = linesIn(object, MAX);
        if (min > 0 && max > 0 && min > max)
            return fault({ADDRESS_LINES},
                         "wants at least " + std::to_string(min) + " and at most " + std::to_string(max) +
                             " lines",
                         "write \"min\" not above \"max\"");
        rules.minLines = min;
        rules.maxLines = max;
    }

    /// 0 where nothing is said.
    int linesIn(json::Object const& object, char const* key) {
        json::Value const lines = object.get(key);
        return lines ? number(lines, {ADDRESS_LINES, key}, 1, ProductionRules::MAX_LINES).value_or(0) : 0;
    }

    void readPostcode(ProductionRules& rules, json::Value const& postcode) {
        if (!postcode)
            return;
        try {
            std::string const pattern = postcode.textOrEmpty();
            if (pattern.empty())
                return fault({POSTCODE}, "is no pattern", "write a pattern such as \"\\\\b\\\\d{5}\\\\b\"");
            Patterns::Pattern(pattern, Patterns::Pattern::Use::Extract);
            rules.postcode = pattern;
        } catch (Patterns::Broken const& broken) {
            fault({POSTCODE},
                  "is broken at character " + std::to_string(broken.position + 1) + " (" + broken.what() +
                      ')',
                  "correct the pattern");
        }
    }

    void readRepair(ProductionRules& rules, json::Value const& repair) {
        if (!repair)
            return;
        if (!repair.isArray())
            return fault({REPAIR}, "is no list", "write [\"cover-page\"]");
        for (std::size_t i = 0; i < repair.toArray().size(); ++i) {
            if (repair.toArray().at(i).textOrEmpty() != COVER_PAGE)
                fault({REPAIR, std::to_string(i)}, "is no repair that is known", "write \"cover-page\"");
            else if (!rules.window)
                fault({REPAIR, std::to_string(i)}, "has no window for the address", "add \"window\"");
            else
                rules.makesCoverPage = true;
        }
    }

    /// The service acts on it.
    void checkFallback(json::Value const& fallback) {
        if (!fallback)
            return;
        if (!fallback.isArray() || fallback.toArray().size() > Mailing::MAX_FALLBACKS)
            return fault({FALLBACK},
                         "is no list of at most " + std::to_string(Mailing::MAX_FALLBACKS) + " channels",
                         FALLBACK_ADVICE);
        for (std::size_t i = 0; i < fallback.toArray().size(); ++i)
            if (!Protocol::isChannelName(fallback.toArray().at(i).textOrEmpty()))
                fault({FALLBACK, std::to_string(i)}, "is no name of a channel", FALLBACK_ADVICE);
    }

    Faults& faults_;
    PageSize sheet_ = A4_SHEET;
};

namespace Schema = Base::Schema;
using Schema::Members;

Members boxMembers() {
    Members members(Members::Others::Refused);
    for (char const* edge : EDGES)
        members.require(edge, Schema::integer(0, ProductionRules::MAX_LENGTH));
    return members;
}

json::Object sheetSchema() {
    json::Object const length = Schema::integer(1, ProductionRules::MAX_LENGTH);
    return Members(Members::Others::Refused).require(WIDTH, length).require(HEIGHT, length).schema();
}

json::Object linesSchema() {
    json::Object const lines = Schema::integer(1, ProductionRules::MAX_LINES);
    return Members(Members::Others::Refused).add(MIN, lines).add(MAX, lines).schema();
}

bool areWithin(int tolerance, PageSize one, PageSize other) {
    return std::abs(one.width - other.width) <= tolerance && std::abs(one.height - other.height) <= tolerance;
}

} // namespace

bool ProductionRules::takes(PageSize page) const {
    return areWithin(tolerance, page, sheet) || (!isGiven && areWithin(tolerance, page, LETTER_SHEET));
}

ProductionRules ProductionRules::from(json::Value const& production, Faults& faults) {
    return Parser(faults).rules(production);
}

json::Object ProductionRules::schema() {
    json::Object const zone = boxMembers().add(PAGES, Schema::words({FIRST_PAGE, ALL_PAGES})).schema();
    json::Object const repair = Schema::listOf(Schema::constant(COVER_PAGE));
    return Members(Members::Others::Refused)
        .add(SHEET, sheetSchema())
        .add(WINDOW, boxMembers().schema())
        .add(CLEAR_ZONES, Schema::listOfAtMost(zone, MAX_ZONES))
        .add(TOLERANCE,
             Schema::with(Schema::integer(0, MAX_TOLERANCE), "default", ProductionRules().tolerance))
        .add(ADDRESS_LINES, linesSchema())
        .add(POSTCODE, Schema::with(Schema::text(), "minLength", 1))
        .add(REPAIR, repair)
        .add(COPIES, Schema::with(Schema::integer(1, PrintWishes::MAX_COPIES), "default", 1))
        .add(FALLBACK, Schema::listOfAtMost(Protocol::channelNameSchema(), Mailing::MAX_FALLBACKS))
        .add(DUPLICATE_DAYS, Schema::with(Schema::integer(0, PrintWishes::MAX_DUPLICATE_DAYS), "default",
                                          PrintWishes::DUPLICATE_DAYS_UNLESS_SET))
        .schema();
}

ProductionRules ProductionRules::of(Cfg::PackPreset const& preset, Faults& faults) {
    json::Value const additional = preset.jAdditional();
    return from(additional.isObject() ? additional.toObject().get(KEY) : json::Value(), faults);
}

std::vector<std::string> productionKeys() { return {KEYS.begin(), KEYS.end()}; }

} // namespace Production

#include "tests/vlmail/letter_set/letter_set.h"

#include "tests/vlmail/letter_set/sheet.h"

#include <array>
#include <chrono>
#include <cmath>
#include <string_view>

namespace LetterSet {
namespace {

/// What people of a country write.
struct Country {
    char const* code;
    /// In front of the number of an invoice, a reminder and a contract.
    std::array<char const*, 3> numberLabels;
    char const* dateLabel;
    char const* customerLabel;
    char const* totalLabel;
    /// The 12th of March 2024.
    char const* date;
    char const* months;
    /// In two usual writings.
    std::array<char const*, 2> amounts;
    char const* decimal;
    char const* grouping;
    std::array<char const*, 4> address;
    char const* sender;
    std::array<char const*, 3> body;
};

constexpr double TOTAL = 1234.5;

constexpr std::array COUNTRIES{
    Country{"de",
            {"Rechnungsnummer", "Mahnung Nr.", "Vertragsnummer"},
            "Datum",
            "Kundennummer",
            "Gesamtbetrag",
            "12. M\u00E4rz 2024",
            "de",
            {"1.234,50 EUR", "\u20AC 1.234,50"},
            ",",
            ".' ",
            {"Frau", "Lena Brandt", "M\u00FChlweg 5", "34117 Kassel"},
            "Kerzen GmbH \u00B7 Dochtgasse 1 \u00B7 04109 Leipzig",
            {"Sehr geehrte Frau Brandt,",
             "wir danken Ihnen f\u00FCr Ihren Auftrag vom 1. Februar 2024 \u00FCber 25 Kerzen.",
             "Bitte \u00FCberweisen Sie den Betrag innerhalb von 14 Tagen."}},
    Country{"en",
            {"Invoice number", "Reminder no.", "Contract number"},
            "Date",
            "Customer no.",
            "Total due",
            "12 March 2024",
            "en",
            {"\u00A31,234.50", "GBP 1,234.50"},
            ".",
            ",",
            {"Ms Ada Byron", "Wick House", "12 St James's Square", "London SW1Y 4LE"},
            "Candle Works Ltd, 1 Wick Lane, Leeds LS1 4AP",
            {"Dear Ms Byron,", "thank you for your order of 1 February 2024 for 25 candles.",
             "Please pay within 14 days."}},
    Country{"fr",
            {"Facture n\u00B0", "Rappel n\u00B0", "Contrat n\u00B0"},
            "Date",
            "N\u00B0 client",
            "Montant total",
            "12 mars 2024",
            "fr",
            {"1 234,50 \u20AC", "1\u00A0234,50 EUR"},
            ",",
            " ",
            {"Madame", "Anne Petit", "12, rue du Lac", "1204 Gen\u00E8ve"},
            "Bougies SA, 1 rue de la M\u00E8che, 69001 Lyon",
            {"Madame,", "nous vous remercions de votre commande du 1er f\u00E9vrier 2024 de 25 bougies.",
             "Merci de r\u00E9gler cette somme sous 14 jours."}},
    Country{"nl",
            {"Factuurnummer", "Aanmaning nr.", "Contractnummer"},
            "Datum",
            "Klantnummer",
            "Totaal te betalen",
            "12 maart 2024",
            "nl",
            {"\u20AC 1.234,50", "EUR 1.234,50"},
            ",",
            ".",
            {"Mevrouw", "J. de Vries", "Kade 7", "1012 AB Amsterdam"},
            "Kaarsen BV, Lontstraat 1, 3511 AA Utrecht",
            {"Geachte mevrouw De Vries,", "dank u voor uw bestelling van 1 februari 2024 van 25 kaarsen.",
             "Wij verzoeken u binnen 14 dagen te betalen."}},
    Country{"it",
            {"Fattura n.", "Sollecito n.", "Contratto n."},
            "Data",
            "Codice cliente",
            "Totale",
            "12 marzo 2024",
            "it",
            {"1.234,50 \u20AC", "CHF 1'234.50"},
            ",",
            ".",
            {"Egregio Signor", "Mario Rossi", "Via Roma 1", "20121 Milano MI"},
            "Candele Srl, Via dello Stoppino 1, 40121 Bologna BO",
            {"Egregio Signor Rossi,", "La ringraziamo per l'ordine del 1 febbraio 2024 di 25 candele.",
             "La preghiamo di pagare entro 14 giorni."}},
    Country{"es",
            {"Factura n\u00BA", "Aviso n\u00BA", "Contrato n\u00BA"},
            "Fecha",
            "N\u00BA de cliente",
            "Importe total",
            "12 de marzo de 2024",
            "es",
            {"1.234,50 \u20AC", "EUR 1.234,50"},
            ",",
            ".",
            {"Sra. D\u00F1a.", "Luc\u00EDa Ortega", "Calle Mayor 5, 2\u00BA", "28013 Madrid"},
            "Velas SL, Calle de la Mecha 1, 46001 Valencia",
            {"Estimada se\u00F1ora Ortega:", "le agradecemos su pedido del 1 de febrero de 2024 de 25 velas.",
             "Le rogamos que pague en un plazo de 14 d\u00EDas."}},
};

enum class Way {
    Lines,       ///< label and value in one line
    Apart,       ///< the value far to the right of its label
    Columns,     ///< a row of labels above a row of values
    InfoBlock,   ///< beside the address
    SendersLine, ///< a small line in the window, values at a tab
    TwoPages,    ///< the total is on the second page
    Stacked,     ///< each value below its label, a spaced title, the last line of the address apart
};
constexpr std::array WAYS{Way::Lines,       Way::Apart,    Way::Columns, Way::InfoBlock,
                          Way::SendersLine, Way::TwoPages, Way::Stacked};
constexpr std::array WAY_NAMES{"lines",         "apart",     "columns", "info block",
                               "sender's line", "two pages", "stacked"};

/// A field with what stands on the page.
struct Item {
    char const* name;
    std::string label;
    std::string value;
};

using Items = std::vector<Item>;

void setAddress(Document& document, Country const& country, Way way) {
    double y = 58;
    for (char const* const line : country.address) {
        bool const isTown = line == country.address.back();
        document.text(25, way == Way::Stacked && isTown ? y + 6 : y, line);
        y += 5;
    }
    if (way == Way::SendersLine)
        document.text(25, 50, country.sender, 6);
}

void setBody(Document& document, Country const& country) {
    double y = 150;
    for (char const* const line : country.body)
        document.text(25, y += 8, line);
    document.text(25, 285, country.sender, 7);
}

/// Where a field stands: places in millimetres, sizes in points.
struct Place {
    double x;
    double y;
    double valueX;
    double valueY;
    double labelSize = 11;
    double valueSize = 11;
};

Place placeOf(int i, Way way) {
    double const line = 100 + 6 * i;
    double const column = 25 + 43 * i;
    double const half = 25 + 80 * (i % 2);
    double const row = 104 + 16 * std::floor(i / 2.0);
    switch (way) {
    case Way::Apart:
        return {25, line, 150, line};
    case Way::Columns:
        return {column, 104, column, 109, 9, 9};
    case Way::InfoBlock:
        return {120, line - 42, 160, line - 42, 10, 10};
    case Way::SendersLine:
        return {25, line, 80, line};
    case Way::Stacked:
        return {half, row, half, row + 5, 9, 11};
    case Way::Lines:
    case Way::TwoPages:
        break;
    }
    return {25, line, 25, line};
}

bool hasColon(Way way) { return way != Way::Columns && way != Way::InfoBlock && way != Way::Stacked; }

void setItem(Document& document, Item const& item, Place const& place, Way way) {
    std::string const label = item.label + (hasColon(way) ? ":" : "");
    if (way == Way::Lines || way == Way::TwoPages) {
        document.text(place.x, place.y, label + ' ' + item.value);
        return;
    }
    document.text(place.x, place.y, label, place.labelSize);
    document.text(place.valueX, place.valueY, item.value, place.valueSize);
}

void setItems(Document& document, Items const& items, Way way) {
    int i = 0;
    for (Item const& item : items)
        setItem(document, item, placeOf(i++, way), way);
}

std::string pdfOf(Country const& country, Items items, Way way) {
    Document document;
    document.text(120, 20, country.sender, 9);
    setAddress(document, country, way);
    if (way == Way::Stacked)
        document.spaced(25, 92, "ORIGINAL", 6, 14);
    Item const total = items.back();
    if (way == Way::TwoPages)
        items.pop_back();
    setItems(document, items, way);
    setBody(document, country);
    if (way != Way::TwoPages)
        return document.pdf();
    document.newPage();
    document.text(25, 30, country.body[2]);
    document.text(25, 60, total.label + ":");
    document.text(150, 60, total.value);
    return document.pdf();
}

/// As a person escapes what stands on the page.
std::string escaped(std::string_view text) {
    std::string pattern;
    for (char const c : text)
        pattern += c == '.' ? std::string("\\.") : std::string(1, c);
    return pattern;
}

json::Object fieldOf(Item const& item, Way way) {
    std::string const name = item.name;
    std::string const value = name == "number" || name == "customer" ? "\\S+" : ".+";
    json::Object field{{"name", name},
                       {"value_extract", "^" + escaped(item.label) + (hasColon(way) ? ":" : "") +
                                             "\\h*(?<VAL>" + value + ")$"}};
    if (name == "date")
        field.set("value_type", 3);
    if (name == "date")
        field.set("value_min", 0);
    if (name == "date")
        field.set("value_match", "(?<day>\\d\\d?)\\.? (de )?(?<month>[^\\W\\d]+) (de )?(?<year>\\d{4})");
    if (name == "total")
        field.set("value_type", 2);
    return field;
}

json::Object zoneOf(char const* name, json::Object const& location, json::Array const& fields) {
    return {{"name", name}, {"location", location}, {"fields", fields}};
}

json::Object wholePage() { return {{"left", 0}, {"top", 0}, {"right", 21000}, {"bottom", 29700}}; }

json::Object addressZone() {
    json::Array fields;
    fields.append(json::Object{{"name", "postal"},
                               {"value_extract", "\\A(?<VAL>(.{1,72}\\n){0,8}.{1,72})\\Z"},
                               {"priority", 1},
                               {"send_to_server", true}});
    return zoneOf("Address", {{"left", 2000}, {"top", 4500}, {"right", 11500}, {"bottom", 9000}}, fields);
}

bool isOnLastPage(Item const& item, Way way) {
    return way == Way::TwoPages && item.name == std::string("total");
}

json::Object plainPresetFor(std::string const& name, Items const& items, Way way) {
    json::Array zones;
    zones.append(addressZone());
    json::Array fields;
    for (Item const& item : items)
        if (!isOnLastPage(item, way))
            fields.append(fieldOf(item, way));
    zones.append(zoneOf("Text", wholePage(), fields));
    if (way == Way::TwoPages) {
        json::Array last;
        last.append(fieldOf(items.back(), way));
        zones.append(zoneOf("Total", wholePage(), last));
    }
    return {{"match", escaped(name)}, {"name", name}, {"pack_preset", name}, {"zones", zones}};
}

/// Around the value, and nothing else but its label where both are one line.
json::Object placeOfValue(Item const& item, int i, Way way) {
    Place const place = isOnLastPage(item, way) ? Place{25, 60, 150, 60} : placeOf(i, way);
    auto const hundredths = [](double millimetres) { return static_cast<int>(millimetres * 100); };
    double const width = way == Way::Lines || way == Way::TwoPages ? 100 : 42;
    return {{"left", hundredths(place.valueX - 1)},
            {"top", hundredths(place.valueY - 4)},
            {"right", hundredths(place.valueX + width)},
            {"bottom", hundredths(place.valueY + 1)}};
}

json::Object measuredFieldOf(Item const& item, Way way) {
    json::Object field = fieldOf(item, way);
    bool const hasLabel = (way == Way::Lines || way == Way::TwoPages) && !isOnLastPage(item, way);
    if (!hasLabel)
        field.set("value_extract", "^(?<VAL>.+)$");
    return field;
}

json::Object measuredPresetFor(std::string const& name, Items const& items, Way way) {
    json::Array zones;
    zones.append(addressZone());
    for (std::size_t i = 0; i < items.size(); ++i) {
        json::Array fields;
        fields.append(measuredFieldOf(items[i], way));
        zones.append(zoneOf(isOnLastPage(items[i], way) ? "Total" : items[i].name,
                            placeOfValue(items[i], static_cast<int>(i), way), fields));
    }
    return {{"match", escaped(name)}, {"name", name}, {"pack_preset", name}, {"zones", zones}};
}

json::Object packPresetFor(std::string const& name, Country const& country, Way way, bool isSwiss) {
    json::Object reading{{"decimal", isSwiss ? "." : country.decimal},
                         {"grouping", isSwiss ? "'" : country.grouping},
                         {"months", country.months}};
    if (way == Way::TwoPages)
        reading.set("zones", json::Object{{"Total", json::Object{{"page", "last"}}}});
    return {{"name", name}, {"process_mode", 3}, {"reading", reading}};
}

long long dateInSeconds() {
    using namespace std::chrono;
    return duration_cast<seconds>(sys_days(year(2024) / March / 12).time_since_epoch()).count();
}

Letter letterOf(Country const& country, std::size_t way, std::size_t number) {
    std::string const name = std::string(country.code) + ' ' + WAY_NAMES[way] + ".pdf";
    char const* const amount = country.amounts[way % 2];
    Items const items{{"number", country.numberLabels[way % 3], "A-" + std::to_string(4700 + number)},
                      {"date", country.dateLabel, country.date},
                      {"customer", country.customerLabel, std::to_string(10'000 + 7 * number)},
                      {"total", country.totalLabel, amount}};
    std::string address;
    for (char const* const line : country.address)
        address += (address.empty() ? "" : "\n") + std::string(line);
    bool const isSwiss = std::string_view(amount).find('\'') != std::string_view::npos;
    return {name,
            pdfOf(country, items, WAYS[way]),
            plainPresetFor(name, items, WAYS[way]),
            measuredPresetFor(name, items, WAYS[way]),
            packPresetFor(name, country, WAYS[way], isSwiss),
            {{"number", items[0].value},
             {"date", dateInSeconds()},
             {"customer", items[2].value},
             {"total", TOTAL},
             {"postal", address}}};
}

} // namespace

std::vector<Letter> all() {
    std::vector<Letter> letters;
    for (Country const& country : COUNTRIES)
        for (std::size_t way = 0; way < WAYS.size(); ++way)
            letters.push_back(letterOf(country, way, letters.size()));
    return letters;
}

} // namespace LetterSet

#include "programs/vlmail/presets/draft_labels.h"

#include "programs/patterns/pattern.h"
#include "programs/patterns/repairs.h"

#include <algorithm>
#include <array>
#include <vector>

namespace VlMail {
namespace {

constexpr std::array FIELDS{
    DraftField{DraftKind::Number, "number", "Number", R"([\w/.-]*\d[\w/-]*)"},
    DraftField{
        DraftKind::Date, "date", "Date",
        R"(\d{4}-\d\d-\d\d|\d\d?[./]\d\d?[./]\d{4}|\d\d?(\.|er|st|nd|rd|th)? (de )?[^\W\d_]+\.? (de )?\d{4})"},
    DraftField{DraftKind::Amount, "amount", "Amount", R"([A-Z\x{20AC}$\x{A3}]{0,3}\h?-?\d([\d., ']*\d)?)"},
    DraftField{DraftKind::Customer, "customer", "Customer", R"([\w/.-]*\d[\w/-]*)"},
    DraftField{DraftKind::Email, "email", "Email", R"([\w.+-]+@[\w-]+\.[\w.-]*\w)"},
};

/// Alternatives, the longer ones first where one begins another. English, German, French, Dutch, Italian,
/// Spanish.
char const* labelsOf(DraftKind kind) {
    switch (kind) {
    case DraftKind::Number:
        return "invoice (number|no|nr)|invoice|(our |your "
               ")?reference|ref|rechnungsnummer|rechnungs-?nr|rechnung (nr)?|"
               "belegnummer|num\u00E9ro de facture|facture (n\u00B0|no)|facture|factuurnummer|factuur(nr)?|"
               "(numero )?fattura( n)?|n\u00FAmero de factura|factura( n\u00BA?)?";
    case DraftKind::Date:
        return "invoice date|date of invoice|rechnungsdatum|belegdatum|datum|date de (la )?facture|date "
               "d'\u00E9mission|"
               "factuurdatum|data (fattura|documento)|data|fecha de (la )?factura|fecha|date";
    case DraftKind::Amount:
        return "(grand |invoice )?total( amount)?( due)?|amount (due|payable)|balance "
               "due|gesamtbetrag|rechnungsbetrag|"
               "endbetrag|zahlbetrag|zu zahlen|gesamtsumme|summe|montant total|total (ttc|\u00E0 payer)|net "
               "\u00E0 payer|"
               "totaal( te betalen)?|totaalbedrag|te betalen|totale( fattura)?|importo totale|"
               "importe total|total a pagar";
    case DraftKind::Customer:
        return "customer (number|no|id)|account (number|no)|kundennummer|kunden-?nr|num\u00E9ro (de )?client|"
               "n\u00B0 (de )?client|klantnummer|klantnr|codice cliente|numero cliente|n\u00FAmero de "
               "cliente";
    case DraftKind::Email:
        return "e-?mail( address)?|e-?mail-?adresse|courriel|mail|correo( electr\u00F3nico)?";
    }
    return "";
}

/// Between a label and its value.
constexpr char const* GAP = R"([\h:.#-]*)";

std::string withoutBlanksAtEnd(std::string_view text) {
    return std::string(text.substr(0, text.find_last_not_of(" :.#-") + 1));
}

} // namespace

std::span<DraftField const> draftFields() { return FIELDS; }

std::optional<LabelledValue> labelledValue(DraftField const& field, std::string_view line) {
    using Patterns::Pattern;
    Pattern const label(std::string(R"(\A(?i:)") + labelsOf(field.kind) + R"()(?!\w)[\h:.#-]*)",
                        Pattern::Use::Extract);
    auto const front = label.find(line);
    if (!front)
        return std::nullopt;
    std::string_view const rest = line.substr(front->length);
    auto const value =
        Pattern(std::string(R"(\A()") + field.value + R"()(?=\s|\z|[.,;)]))", Pattern::Use::Extract)
            .find(rest);
    if (!value)
        return std::nullopt;
    return LabelledValue{withoutBlanksAtEnd(line.substr(0, front->length)),
                         std::string(rest.substr(0, value->length))};
}

std::string patternFor(DraftField const& field, std::string const& label) {
    return "^(?i:" + Patterns::escaped(label) + ')' + GAP + "(?<VAL>" + field.value + R"()(?=\s|$|[.,;)]))";
}

} // namespace VlMail

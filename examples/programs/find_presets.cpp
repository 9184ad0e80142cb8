// Completes the presets of a node by those of its parent and the global defaults, and finds the ones for
// documents.
#include "vlservice/vlservice.h"

#include <iostream>
#include <string_view>

namespace {

Cfg::Presets presetsFrom(std::string_view text, bool global) {
    return Cfg::Presets(json::strToObject(text.data(), text.size()), global, true);
}

} // namespace

int main() {
    Cfg::Presets const root = presetsFrom("{}", true);
    Cfg::Presets account = presetsFrom(R"({
        "extract_presets": [{"match": "invoice.*", "order": 10, "pack_preset": "Invoices"}],
        "pack_presets": [{"name": "Invoices", "duplex": true}]})",
                                       false);
    Cfg::Presets user = presetsFrom(R"({
        "extract_presets": [{"match": "invoice 2024.*", "order": 99, "pack_preset": "Invoices"}]})",
                                    false);
    account.combineParent(root);
    user.combineParent(account);
    for (char const* document : {"Invoice 2024-17.pdf", "invoice 2023-01.pdf", "holiday.pdf"}) {
        auto const& [extractPreset, packPreset] = user.findMatch(document);
        std::cout << document << ": read by " << extractPreset.strRegex() << ", sent by " << packPreset.name()
                  << (packPreset.duplex() ? " on both sides" : "") << '\n';
    }
}

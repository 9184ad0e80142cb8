// Takes the default fields out of a letter's text and says whether the letter can go out, and to which
// address.
#include "vlservice/vlservice.h"

#include <iostream>

int main() {
    std::string text = "Ref: 2024-17\n"
                       "Email: ada@example.org\n"
                       "Ada Lovelace\n"
                       "12 St James's Square\n"
                       "London";
    Cfg::ExtractField const* const definitions[] = {
        &Cfg::ExtractField::DefReference(), &Cfg::ExtractField::DefEmail(), &Cfg::ExtractField::DefPostal()};
    Cfg::ExtractedFields fields;
    for (Cfg::ExtractField const* definition : definitions) {
        // What a field has found leaves the text, with a measure of the caller's its line break too.
        auto const cutLine = [](std::string& from, unsigned long long offset, unsigned long long length) {
            bool const hasBreak = offset + length < from.size();
            from.erase(offset, length + hasBreak);
            return 0ULL;
        };
        if (auto const value = definition->extractField(text, cutLine)) {
            definition->validate(*value);
            fields.emplace(value->priority(), *value);
        }
    }
    for (auto const& [priority, field] : fields)
        std::cout << field.name() << ": " << field.valueToStr() << '\n';
    std::string message;
    if (fields.isProductionReady(message))
        std::cout << "goes to the " << fields.primaryAddressField()->name() << " address\n";
    else
        std::cout << "cannot go out: " << (message.empty() ? "no address" : message) << '\n';
}

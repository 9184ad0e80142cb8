// The object "reading" of a pack preset and a value that is read by it: the first line of the input is the
// object, the rest the text of a field.
#include "programs/reader/month_names.h"
#include "programs/reader/number_reading.h"
#include "programs/reader/reading_rules.h"
#include "vlservice/json/json_text.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <vector>

namespace {

void require(bool holds) {
    if (!holds)
        std::abort();
}

/// "-1234.5", as fields take it.
bool isPlainNumber(std::string const& form) {
    return !form.empty() && form.find_first_not_of("-0123456789.") == form.npos &&
           std::count(form.begin(), form.end(), '.') <= 1 && form.rfind('-') + 1 <= 1;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    std::string const input(reinterpret_cast<char const*>(data), size);
    std::size_t const end = std::min(input.find('\n'), input.size());
    std::string const text = input.substr(std::min(end + 1, input.size()));
    try {
        std::vector<Reader::RulesFault> faults;
        auto const rules = Reader::ReadingRules::from(json::strToObject(input.data(), end), faults);
        for (Reader::RulesFault const& fault : faults)
            require(!fault.what.empty() && !fault.advice.empty());
        if (rules.numbers.kind != Reader::NumberRules::Decimal::Plain)
            for (std::string const& form : Reader::numberForms(text, rules.numbers))
                require(isPlainNumber(form));
        if (!rules.months.empty())
            Reader::datesInEnglish(text, rules.months);
        Reader::doubtAbout(text, 17);
        Reader::doubtAbout(text, 17.5);
    } catch (json::Exc const&) { // no JSON object
    }
    return 0;
}

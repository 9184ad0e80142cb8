// A settings document as its writer hands it to lint: read, checked, and everything that is found put into
// words.
#include "programs/vlmail/presets/lint.h"
#include "programs/patterns/outline.h"

#include <cstdint>
#include <cstdlib>
#include <string>

namespace {

/// Each pattern is run over many lines, so documents stay small.
constexpr std::size_t LONGEST = 600;

void require(bool holds) {
    if (!holds)
        std::abort();
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    if (size > LONGEST)
        return 0;
    std::string const text(reinterpret_cast<char const*>(data), size);
    Patterns::outlineOf(text);
    try {
        for (VlMail::Finding const& finding : VlMail::lint(VlMail::PresetsDocument(text)))
            require(!finding.what.empty() && !finding.advice.empty());
    } catch (json::Exc const&) { // no JSON object
    }
    return 0;
}

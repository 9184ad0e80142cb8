// A definition's pattern, up to the first line feed, and the text of a zone behind it.
#include "vlservice/extract/extract_field.h"
#include "vlservice/platform/log.h"

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>

namespace {

void require(bool holds) {
    if (!holds)
        std::abort();
}

bool same(std::shared_ptr<Cfg::ExtractedField> const& a, std::shared_ptr<Cfg::ExtractedField> const& b) {
    return a && b ? a->serialize() == b->serialize() : a == b;
}

Cfg::ExtractField definition(std::string const& pattern, bool makeOneLine) {
    Cfg::ExtractField field(json::Object{{"name", "f"}, {"make_one_line", makeOneLine}});
    field.setRegex(pattern);
    return field;
}

void check(Cfg::ExtractField const& field, std::string const& text) {
    std::string cut = text;
    auto const value = field.extractField(cut);
    if (!value) {
        require(cut == text);
        return;
    }
    std::string matched;
    std::string measured = text;
    auto const again = Cfg::ExtractField(field).extractField(
        measured, [&](std::string& zone, unsigned long long offset, unsigned long long length) {
            matched = zone.substr(offset, length);
            zone.erase(offset, length);
            return 0ull;
        });
    require(same(value, again) && measured == cut && cut.size() + matched.size() == text.size());
    std::string const raw = value->strVal();
    require(raw.size() <= matched.size() && raw.find('\t') == raw.npos);
    require(!field.make1Line() || raw.find('\n') == raw.npos);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    Log::setSink({});
    std::string const input(reinterpret_cast<char const*>(data), size);
    std::string const pattern = input.substr(0, input.find('\n'));
    // Short texts: a runaway pattern may take a second on any, and nothing is learned from more of them.
    std::string const text = input.substr(std::min(size, pattern.size() + 1), 300);
    check(definition(pattern, false), text);
    check(definition(pattern, true), text);
    return 0;
}

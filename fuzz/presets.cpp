// A node's presets and its parent's, and a document's name: {"presets": ..., "parent": ..., "name": ...}.
// Read, matched, completed, written.
#include "vlservice/presets/presets.h"
#include "vlservice/json/json_text.h"

#include <cstdint>
#include <cstdlib>
#include <stdexcept>
#include <string>

namespace {

/// Backtracking is cut off by the engine, but late: what is matched stays small.
constexpr std::size_t LONGEST = 64;

void require(bool holds) {
    if (!holds)
        std::abort();
}

bool isCheapToMatch(Cfg::Presets const& presets, std::string const& name) {
    if (name.size() > LONGEST)
        return false;
    for (auto const& element : presets.elements<Cfg::PresetFieldIdxs::ExtractPresets>())
        if (element.value.strRegex().size() > LONGEST)
            return false;
    return true;
}

void match(Cfg::Presets const& presets, std::string const& name) {
    if (!isCheapToMatch(presets, name))
        return;
    try {
        auto const [extractPreset, packPreset] = presets.findMatch(name);
        require(extractPreset.packPresetName() == packPreset.name());
    } catch (std::runtime_error const&) { // nothing fits, or an expression is broken
    } catch (std::out_of_range const&) {  // no UTF-8
    }
}

void check(json::Object const& input, bool sorted) {
    std::string const name = input.get("name").textOrEmpty();
    Cfg::Presets const root(input.get("parent"), true, sorted);
    require(!root.empty() && root.serialize());
    match(root, name);

    json::Value const written = Cfg::Presets(input.get("presets"), false, sorted).serialize();
    // The written form has own presets only. Behind inherited ones they would be lost when a parent comes in.
    Cfg::Presets node(written, false, sorted);
    require(node.serialize() == written);
    match(node, name);
    node.combineParent(root);
    node.deserializeParent(input.get("parent"), sorted);
    require(node.serialize() == written);
    match(node, name);
    match(Cfg::Presets(node), name);
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size) {
    for (bool const sorted : {false, true}) {
        try {
            check(json::strToObject(reinterpret_cast<char const*>(data), size), sorted);
        } catch (std::runtime_error const&) { // bad JSON, process mode or pattern
        } catch (std::out_of_range const&) {  // a date by a pattern, not in UTF-8
        }
    }
    return 0;
}

#include "programs/vlmail/letters/preset_index.h"

#include "programs/base/error.h"
#include "programs/base/quoting.h"
#include "programs/base/utf8.h"
#include "programs/patterns/required_words.h"
#include "programs/reader/pattern_time.h"

#include <unicode/uchar.h>

#include <algorithm>
#include <cctype>
#include <iterator>
#include <stdexcept>

namespace VlMail {
namespace {

using enum Cfg::PresetFieldIdxs;

/// Fewer are walked as fast.
constexpr std::size_t WORTH_AN_INDEX = 6;
/// An expression may be too complex for a longer name, which must be told.
constexpr std::size_t LONGEST_NAME = 200;
constexpr std::size_t PIECE = 3;

std::uint32_t pieceAt(std::string const& text, std::size_t at) {
    auto const byte = [&](std::size_t i) {
        return static_cast<std::uint32_t>(static_cast<unsigned char>(text[i]));
    };
    return byte(at) << 16 | byte(at + 1) << 8 | byte(at + 2);
}

template<typename Use>
void forEachPiece(std::string const& text, Use use) {
    for (std::size_t at = 0; at + PIECE <= text.size(); ++at)
        use(pieceAt(text, at));
}

/// Whether letter case leads from the name to ASCII in no other way than from capitals.
bool isPlainName(std::string const& name) {
    if (name.size() > LONGEST_NAME || !Base::isUtf8(name))
        return false;
    for (std::size_t at = 0; at < name.size();) {
        auto const c = static_cast<UChar32>(Base::nextCharacter(name, at));
        if (c >= 0x80 &&
            (u_foldCase(c, U_FOLD_CASE_DEFAULT) < 0x80 || u_tolower(c) < 0x80 || u_toupper(c) < 0x80))
            return false;
    }
    return true;
}

std::string lowered(std::string name) {
    std::ranges::transform(name, name.begin(), [](char c) {
        return static_cast<unsigned char>(c) < 0x80 ? static_cast<char>(std::tolower(c)) : c;
    });
    return name;
}

using Words = std::vector<std::string>;

/// Nothing when it has to be tried for every name.
std::vector<Words> wordsOf(Cfg::ExtractPreset const& preset) {
    // One that is compiled may answer by an expression that it had before.
    auto alternatives = preset.isCompiled() ? std::nullopt : Patterns::requiredWords(preset.strRegex());
    if (!alternatives)
        return {};
    for (Words& words : *alternatives) {
        std::erase_if(words, [](std::string const& word) { return word.size() < PIECE; });
        if (words.empty())
            return {};
    }
    return std::move(*alternatives);
}

/// Whether no name makes the expression take long: at most one thing in it repeats.
bool isQuick(Cfg::ExtractPreset const& preset) {
    std::string const& pattern = preset.strRegex();
    auto const repeats = std::ranges::count_if(
        pattern, [](char c) { return std::string_view("*+?{").find(c) != std::string_view::npos; });
    return !preset.isCompiled() && repeats <= 1 && pattern.find_first_of("(|") == std::string::npos;
}

using Counts = std::unordered_map<std::uint32_t, std::size_t>;

Counts countPieces(std::vector<std::vector<Words>> const& presets) {
    Counts counts;
    for (auto const& alternatives : presets)
        for (Words const& words : alternatives)
            for (std::string const& word : words)
                forEachPiece(word, [&](std::uint32_t piece) { ++counts[piece]; });
    return counts;
}

std::uint32_t rarestPiece(Words const& words, Counts const& counts) {
    std::uint32_t rarest = pieceAt(words.front(), 0);
    for (std::string const& word : words)
        forEachPiece(word, [&](std::uint32_t piece) {
            if (counts.at(piece) < counts.at(rarest))
                rarest = piece;
        });
    return rarest;
}

} // namespace

PresetIndex::PresetIndex(Cfg::Presets const& presets, std::chrono::milliseconds time)
    : presets_(presets), time_(time),
      isIndexed_(presets.elements<ExtractPresets>().size() >= WORTH_AN_INDEX) {
    for (auto const& element : presets.elements<ExtractPresets>()) {
        all_.push_back(static_cast<std::uint32_t>(extractPresets_.size()));
        extractPresets_.push_back(&element.value);
    }
    for (auto const& element : presets.elements<PackPresets>())
        packPresets_.emplace(element.value.name(), &element.value);
    isWalked_ = !isIndexed_ && std::ranges::all_of(extractPresets_, [](auto* one) { return isQuick(*one); });
    if (!isIndexed_)
        return;
    std::vector<std::vector<Words>> words;
    for (Cfg::ExtractPreset const* const preset : extractPresets_)
        words.push_back(wordsOf(*preset));
    add(words);
}

void PresetIndex::add(std::vector<std::vector<Words>> const& wordsOfPresets) {
    Counts const counts = countPieces(wordsOfPresets);
    for (std::uint32_t position = 0; position < wordsOfPresets.size(); ++position) {
        if (wordsOfPresets[position].empty())
            always_.push_back(position);
        for (Words const& words : wordsOfPresets[position])
            byPiece_[rarestPiece(words, counts)].push_back(position);
    }
}

PresetIndex::Positions PresetIndex::candidates(std::string const& name) const {
    Positions found;
    forEachPiece(lowered(name), [&](std::uint32_t piece) {
        if (auto const known = byPiece_.find(piece); known != byPiece_.end())
            found.insert(found.end(), known->second.begin(), known->second.end());
    });
    std::ranges::sort(found);
    found.erase(std::unique(found.begin(), found.end()), found.end());
    Positions all;
    std::ranges::merge(found, always_, std::back_inserter(all));
    return all;
}

bool PresetIndex::fits(Cfg::ExtractPreset const& preset, std::string const& name,
                       Cfg::MatchTime const& time) const {
    try {
        return preset.match(name);
    } catch (std::runtime_error const&) {
        if (!time.isUp())
            throw;
        throw Base::Error(Base::Code::LimitExceeded,
                          "the patterns of presets took longer than " + Reader::inSeconds(time_) +
                              " for the document's name, " + Base::inQuotes(preset.strRegex()) + " last");
    }
}

std::optional<PresetIndex::Match> PresetIndex::firstOf(Positions const& positions, std::string const& name,
                                                       Cfg::MatchTime const& time) const {
    auto const found = std::ranges::find_if(
        positions, [&](std::uint32_t position) { return fits(*extractPresets_[position], name, time); });
    if (found == positions.end())
        return std::nullopt;
    Cfg::ExtractPreset const& preset = *extractPresets_[*found];
    auto const pack = packPresets_.find(preset.packPresetName());
    return pack == packPresets_.end() ? std::nullopt : std::optional(Match{preset, *pack->second});
}

std::optional<PresetIndex::Match> PresetIndex::findInTime(std::string const& name) const {
    Cfg::MatchTime const time(time_);
    if (isIndexed_ && isPlainName(name))
        if (auto const match = firstOf(candidates(name), name, time))
            return match;
    return firstOf(all_, name, time);
}

PresetIndex::Match PresetIndex::findMatch(std::string const& name) const {
    if (isWalked_)
        return presets_.findMatch(name);
    std::optional<Match> const match = findInTime(name);
    // The walk says what is missing, in time: all patterns before that have been tried.
    return match ? *match : presets_.findMatch(name);
}

Cfg::PackPreset const* packPresetNamed(std::string const& name, Cfg::Presets const& presets) {
    auto const& all = presets.elements<PackPresets>();
    auto const found =
        std::ranges::find_if(all, [&](auto const& element) { return element.value.name() == name; });
    return found == all.end() ? nullptr : &found->value;
}

} // namespace VlMail

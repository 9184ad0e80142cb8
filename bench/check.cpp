// What it costs to say what would go wrong with letters on paper, as "vlmail check" does: documents read,
// their fields searched, every page drawn and held against a carrier's rules, by the time that poppler alone
// takes to give the same words, in turns. The aim is 4.5 times at most. Most of it is drawing; "read" is the
// ratio without the checks.
#include "bench/example_letters.h"
#include "programs/base/read_file.h"
#include "programs/production/check_letter.h"
#include "programs/reader/letters.h"

#include "vlservice/extract/extract_field.h"
#include "vlservice/extract/extract_preset.h"
#include "vlservice/extract/extract_zone.h"
#include "vlservice/json/json_text.h"

#include <benchmark/benchmark.h>

#include <poppler-document.h>
#include <poppler-page.h>

#include <chrono>
#include <cstddef>
#include <cstring>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace {

namespace fs = std::filesystem;

constexpr char const* PACK_PRESET = R"({"name": "Bills", "production": {
    "window": {"left": 2000, "top": 4500, "right": 10500, "bottom": 9000},
    "clear_zones": [{"left": 0, "top": 28500, "right": 21000, "bottom": 29700, "pages": "all"}],
    "address_lines": {"min": 3, "max": 6}, "postcode": "\\b\\d{5}\\b"}})";

Production::PrintRules carriersRules() {
    Cfg::PackPreset const preset(json::strToObject(PACK_PRESET, std::strlen(PACK_PRESET)), {});
    return {preset, Cfg::App(json::Value(), true, false), "the benchmark"};
}

std::size_t wordsByPopplerAlone(std::string const& file) {
    std::size_t words = 0;
    std::unique_ptr<poppler::document> const document(poppler::document::load_from_file(file));
    for (int i = 0; i < document->pages(); ++i) {
        std::unique_ptr<poppler::page> const page(document->create_page(i));
        words += page->text_list(poppler::page::text_list_include_font).size();
    }
    return words;
}

/// Gives the number of findings.
std::size_t check(std::string const& file, Cfg::ExtractPreset const& preset,
                  std::optional<Production::PrintRules> const& rules) {
    Reader::Document document = Reader::openDocument(fs::path(file));
    Reader::Trace trace;
    std::size_t findings = 0;
    std::size_t next = 0;
    for (Reader::Letter const& letter : Reader::readLetters(document, preset, &trace)) {
        Reader::PageTrace const& page = trace.pages.at(next++);
        auto const address = Production::postalAddressOf(letter.fields, &page);
        for (int const number : letter.pages)
            benchmark::DoNotOptimize(document.page(number));
        if (rules)
            findings +=
                Production::checkLetter({document, letter.pages, address ? &*address : nullptr}, *rules)
                    .size();
    }
    return findings;
}

template<typename Work>
double secondsOfAll(Work const& work) {
    auto const begin = std::chrono::steady_clock::now();
    for (std::string const& file : Bench::documents())
        benchmark::DoNotOptimize(work(file));
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - begin).count();
}

/// All in turns, so that what else the machine does costs all.
void checkLetters(benchmark::State& state) {
    Cfg::ExtractPreset const preset = Bench::addressAlone();
    std::optional<Production::PrintRules> const rules = carriersRules();
    // Poppler sets itself up anew for a document while it has no other; that is not what is compared here.
    std::unique_ptr<poppler::document> const keptOpen(
        poppler::document::load_from_file(Bench::documents().front()));
    double words = 0;
    double reading = 0;
    double checking = 0;
    for (auto _ : state) {
        words += secondsOfAll(wordsByPopplerAlone);
        reading += secondsOfAll([&](std::string const& file) { return check(file, preset, std::nullopt); });
        checking += secondsOfAll([&](std::string const& file) { return check(file, preset, rules); });
    }
    state.counters["ratio"] = checking / words;
    state.counters["ratio_read"] = reading / words;
    state.counters["us_a_document"] =
        checking * 1e6 / static_cast<double>(state.iterations() * Bench::documents().size());
}

BENCHMARK(checkLetters)->Unit(benchmark::kMillisecond)->MinTime(5);

} // namespace

BENCHMARK_MAIN();

// Measures how a document's presets are found among few and many, by the index and by the walk over all of
// them, for the same names in the same run. Decides from how many presets on the index is used. To stay: at
// 10,000 presets at least 100 times faster than the walk, and never slower.
#include "programs/vlmail/letters/preset_index.h"

#include <benchmark/benchmark.h>

#include <chrono>
#include <string>
#include <vector>

namespace {

using Clock = std::chrono::steady_clock;

std::string nameOf(std::size_t number) {
    return "Invoice " + std::to_string(70'000 + number * 13) + " March.pdf";
}

/// One preset a document, as programs make them, and a few for many.
Cfg::Presets presetsFor(std::size_t count) {
    json::Array presets;
    json::Array packs;
    for (std::size_t i = 0; i < count; ++i) {
        std::string match = nameOf(i);
        match.insert(match.size() - 4, "\\");
        std::string const pack = "#auto_" + std::to_string(i);
        presets.append(json::Object{{"match", match}, {"pack_preset", pack}});
        packs.append(json::Object{{"name", pack}});
    }
    return Cfg::Presets(json::Object{{"extract_presets", presets}, {"pack_presets", packs}}, true, false);
}

template<typename Finder>
Clock::duration timeOf(Finder const& finder, std::vector<std::string> const& names) {
    auto const start = Clock::now();
    for (std::string const& name : names) {
        auto const found = finder.findMatch(name);
        benchmark::DoNotOptimize(&found.first);
    }
    return Clock::now() - start;
}

void find(benchmark::State& state) {
    auto const count = static_cast<std::size_t>(state.range(0));
    Cfg::Presets const walked = presetsFor(count);
    Cfg::Presets const indexed = walked;
    auto const start = Clock::now();
    VlMail::PresetIndex const index(indexed);
    auto const built = Clock::now() - start;
    std::vector<std::string> names{"Something else.pdf"};
    for (std::size_t i = 0; i < 20; ++i)
        names.push_back(nameOf(i * count / 20));
    timeOf(walked, names);
    auto walk = Clock::duration::max();
    auto byIndex = Clock::duration::max();
    for (auto _ : state) {
        walk = std::min(walk, timeOf(walked, names));
        byIndex = std::min(byIndex, timeOf(index, names));
    }
    state.counters["walk/index"] = static_cast<double>(walk.count()) / static_cast<double>(byIndex.count());
    state.counters["us/name"] =
        std::chrono::duration<double, std::micro>(byIndex).count() / static_cast<double>(names.size());
    state.counters["ms/built"] = std::chrono::duration<double, std::milli>(built).count();
}
BENCHMARK(find)
    ->Arg(1)
    ->Arg(2)
    ->Arg(3)
    ->Arg(5)
    ->Arg(10)
    ->Arg(19)
    ->Arg(20)
    ->Arg(100)
    ->Arg(1'000)
    ->Arg(10'000)
    ->Iterations(20)
    ->Unit(benchmark::kMillisecond);

} // namespace

BENCHMARK_MAIN();

// Measures what reading one settings document into its parts costs, against the bare parse of the same text
// in the same run. Decides whether parts may be built anew wherever settings are needed. To stay within: 2
// times the bare parse.
#include "vlservice/cfg/app.h"
#include "vlservice/cfg/departments.h"
#include "vlservice/cfg/inet.h"
#include "vlservice/cfg/po.h"
#include "vlservice/cfg/profiles.h"
#include "vlservice/json/json_text.h"
#include "vlservice/presets/presets.h"

#include <benchmark/benchmark.h>

#include <chrono>
#include <random>
#include <sstream>
#include <string>

namespace {

using Clock = std::chrono::steady_clock;

/// Words of a fixed seed, so that every run reads the same documents.
class Words {
public:
    std::string next(std::size_t length) {
        std::string word;
        for (std::size_t i = 0; i < length; ++i)
            word += static_cast<char>('a' + random_() % 26);
        return word;
    }

private:
    std::mt19937 random_{2024};
};

json::Object appSettings() {
    return Cfg::App(
               json::Object{{"descr", "Acme Letters Ltd"}, {"db_name", "letters"}, {"max_letter_sheets", 50}},
               true, false)
        .serialize()
        .toObject();
}

json::Array named(int count, Words& words) {
    json::Array array;
    for (int i = 0; i < count; ++i)
        array.append(json::Object{{"name", words.next(8)}, {"descrip", words.next(30)}});
    return array;
}

json::Object fieldOf(int number, Words& words) {
    return {{"name", words.next(8)},  {"value_extract", "^" + words.next(10) + ":\\h*(?<VAL>\\S+)$"},
            {"priority", number % 3}, {"send_to_server", true},
            {"width", 14000},         {"value_type", number % 2},
            {"value_max", 1000000}};
}

json::Object zoneOf(Words& words) {
    json::Array fields;
    for (int i = 0; i < 6; ++i)
        fields.append(fieldOf(i, words));
    return {{"name", words.next(8)},
            {"fields", fields},
            {"location", Cfg::Rect(1800, 4700, 10800, 8800).serialize()}};
}

json::Object extractPresetOf(int number, Words& words) {
    json::Array zones;
    zones.append(zoneOf(words));
    zones.append(zoneOf(words));
    return {{"match", words.next(12) + "_\\d{4}\\.pdf"},
            {"order", number},
            {"pack_preset", words.next(10)},
            {"trim_frags", true},
            {"zones", zones}};
}

json::Object packPresetOf(Words& words) {
    return {{"name", words.next(10)}, {"title", words.next(20)},  {"duplex", true},
            {"process_mode", 3},      {"profile", words.next(8)}, {"department", words.next(8)}};
}

json::Object presetsSettings(int count, Words& words) {
    json::Array extractPresets;
    json::Array packPresets;
    for (int i = 0; i < count; ++i) {
        extractPresets.append(extractPresetOf(i, words));
        packPresets.append(packPresetOf(words));
    }
    return {{"extract_presets", extractPresets}, {"pack_presets", packPresets}};
}

/// A node's settings with that many presets; with none, the parts that a client asks for most.
std::string documentWith(int presets) {
    Words words;
    json::Object document{{"app", appSettings()},
                          {"inet", Cfg::Inet(json::Value(), true, false).serialize()},
                          {"po", json::Object{{"code", words.next(12)}, {"expiry", 1900000000}}},
                          {"deps", json::Object{{"vals", named(20, words)}}},
                          {"profiles", json::Object{{"vals", named(20, words)}}}};
    if (presets > 0)
        document.set("presets", presetsSettings(presets, words));
    std::ostringstream text;
    text << document;
    return text.str();
}

void readIntoParts(json::Object const& document) {
    Cfg::App const app(document.get("app"), true, false);
    Cfg::Inet const inet(document.get("inet"), true, false);
    Cfg::PO const po(document.get("po"), false, false);
    Cfg::Departments const departments(document.get("deps"), false, false);
    Cfg::Profiles const profiles(document.get("profiles"), false, false);
    Cfg::Presets const presets(document.get("presets"), false, true);
    benchmark::DoNotOptimize(&app);
    benchmark::DoNotOptimize(&inet);
    benchmark::DoNotOptimize(&po);
    benchmark::DoNotOptimize(&departments);
    benchmark::DoNotOptimize(&profiles);
    benchmark::DoNotOptimize(&presets);
}

double secondsSince(Clock::time_point start) {
    return std::chrono::duration<double>(Clock::now() - start).count();
}

/// Both take turns, so that whatever else the machine does falls on both.
void settingsParse(benchmark::State& state) {
    std::string const text = documentWith(static_cast<int>(state.range(0)));
    double bare = 0;
    double parts = 0;
    for (auto _ : state) {
        auto start = Clock::now();
        benchmark::DoNotOptimize(json::strToObject(text.data(), text.size()));
        bare += secondsSince(start);

        start = Clock::now();
        readIntoParts(json::strToObject(text.data(), text.size()));
        double const whole = secondsSince(start);
        parts += whole;
        state.SetIterationTime(whole);
    }
    state.counters["ratio_to_bare_parse"] = parts / bare;
    state.counters["document_bytes"] = static_cast<double>(text.size());
}
BENCHMARK(settingsParse)
    ->ArgName("presets")
    ->Arg(0)
    ->Arg(10)
    ->Arg(200)
    ->UseManualTime()
    ->Unit(benchmark::kMicrosecond);

} // namespace

BENCHMARK_MAIN();

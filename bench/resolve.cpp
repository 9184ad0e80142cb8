// Measures what the settings of a node cost when the JSON of its chain is parsed: five levels, every part.
// Decides whether the service has to keep completed parts in memory. To stay under: 100 microseconds.
#include "programs/vlserviced/settings/parts.h"

#include "vlservice/json/json_text.h"

#include <benchmark/benchmark.h>

#include <string>

namespace {

using VlServiced::SettingsLevel;

SettingsLevel level(std::string const& id, std::string const& parts) {
    return {id, json::strToObject(parts.data(), parts.size())};
}

/// A user in two groups of an account, each with some settings of its own.
std::vector<SettingsLevel> fiveLevels() {
    return {
        level("u=bob/ou=north/ou=sales/a=acme",
              R"({"app":{"descr":"Bob","debug_view":1},"profiles":{"vals":[{"name":"Bob's"}]},)"
              R"("presets":{"extract_presets":[{"match":"offer.*","order":5,"pack_preset":"colour"}]}})"),
        level("ou=north/ou=sales/a=acme", R"({"po":{"code":"N-7","expiry":1900000000}})"),
        level("ou=sales/a=acme",
              R"({"app":{"max_letter_sheets":20,"enforce_po":true},)"
              R"("profiles":{"vals":[{"name":"Offer"},{"name":"Bill","descrip":"with a copy"}]}})"),
        level("a=acme", R"({"deps":{"vals":["Sales","Board",{"name":"IT","descrip":"computers"}]},)"
                        R"("inet":{"submitted_alarm_hours":8},)"
                        R"("presets":{"extract_presets":[{"match":"bill.*","order":1,"pack_preset":"plain"},)"
                        R"({"match":"reminder.*","order":2,"pack_preset":"plain"}],)"
                        R"("pack_presets":[{"name":"plain","duplex":true,"process_mode":3},)"
                        R"({"name":"colour","colour_model":2,"process_mode":1}]}})"),
        level("",
              R"({"app":{"db_name":"packs.db","db_host":"/srv/packs"},"inet":{"status_update_hours":1}})"),
    };
}

void resolveAllParts(benchmark::State& state) {
    std::vector<SettingsLevel> const chain = fiveLevels();
    for (auto _ : state)
        benchmark::DoNotOptimize(VlServiced::resolve(chain, VlServiced::partNames()));
}
BENCHMARK(resolveAllParts)->Unit(benchmark::kMicrosecond);

void resolveOnePart(benchmark::State& state) {
    std::vector<SettingsLevel> const chain = fiveLevels();
    std::string const& part = VlServiced::partNames().at(static_cast<std::size_t>(state.range(0)));
    state.SetLabel(part);
    for (auto _ : state)
        benchmark::DoNotOptimize(VlServiced::resolve(chain, {part}));
}
BENCHMARK(resolveOnePart)
    ->DenseRange(0, static_cast<long long>(VlServiced::partNames().size()) - 1)
    ->Unit(benchmark::kMicrosecond);

} // namespace

BENCHMARK_MAIN();

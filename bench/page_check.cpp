// What it costs to hold each page that is written against the document's: PDFs read, split into pages and
// compressed with the check, by the same without it, in turns. For the default of "vlmail mail
// --check-every": checking every page costs half of the mailing at most (ratio 1.5). These letters have few
// pages, so that their ratio is the highest there is. Pages that are made of the document's objects need not
// be drawn; "drawn" is what it costs to draw and read them all. The container, which costs the same either
// way, is left out.
#include "bench/example_letters.h"
#include "programs/base/read_file.h"
#include "programs/mailing/page_blob.h"
#include "programs/reader/document.h"
#include "programs/reader/letters.h"
#include "programs/reader/page_source.h"

#include "vlservice/extract/extract_field.h"
#include "vlservice/extract/extract_preset.h"
#include "vlservice/extract/extract_zone.h"

#include <benchmark/benchmark.h>

#include <chrono>
#include <cstddef>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

namespace {

namespace fs = std::filesystem;

enum class Check { No, Yes, Drawn };

bool drawsTheSame(Reader::PageSource& source, Reader::Document& document, int page, std::string const& pdf) {
    constexpr double DOTS_PER_INCH = 36;
    std::unique_ptr<Reader::PageSource> const written = Reader::openPdf(pdf, "page");
    return Reader::haveSameWords(document.page(page), written->readPage(1)) &&
           Reader::lookTheSame(*source.drawPage(page, DOTS_PER_INCH), *written->drawPage(1, DOTS_PER_INCH));
}

/// Gives the number of pages.
std::size_t split(std::string const& file, Cfg::ExtractPreset const& preset, Check check) {
    Reader::Document document = Reader::openDocument(fs::path(file));
    std::unique_ptr<Reader::PageSource> const drawn =
        check == Check::Drawn ? Reader::openPdf(Base::readFile(file), file) : nullptr;
    std::size_t pages = 0;
    for (Reader::Letter const& letter : Reader::readLetters(document, preset))
        for (int const page : letter.pages) {
            std::string const pdf = document.singlePagePdf(page);
            if (check == Check::Yes)
                benchmark::DoNotOptimize(document.showsTheSame(page, pdf));
            if (drawn)
                benchmark::DoNotOptimize(drawsTheSame(*drawn, document, page, pdf));
            benchmark::DoNotOptimize(Mailing::compressed(pdf));
            ++pages;
        }
    return pages;
}

double secondsOfAll(Cfg::ExtractPreset const& preset, Check check, std::size_t& pages) {
    auto const begin = std::chrono::steady_clock::now();
    for (std::string const& file : Bench::documents())
        pages += split(file, preset, check);
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - begin).count();
}

/// All in turns, so that what else the machine does costs all.
void checkEachPage(benchmark::State& state) {
    Cfg::ExtractPreset const preset = Bench::addressAlone();
    double with = 0;
    double without = 0;
    double drawn = 0;
    std::size_t pages = 0;
    for (auto _ : state) {
        std::size_t same = 0;
        without += secondsOfAll(preset, Check::No, same);
        with += secondsOfAll(preset, Check::Yes, pages);
        drawn += secondsOfAll(preset, Check::Drawn, same);
    }
    state.counters["ratio"] = with / without;
    state.counters["ratio_drawn"] = drawn / without;
    state.counters["us_a_page_without"] = without * 1e6 / static_cast<double>(pages);
    state.counters["us_a_page_with"] = with * 1e6 / static_cast<double>(pages);
}

BENCHMARK(checkEachPage)->Unit(benchmark::kMillisecond)->MinTime(5);

} // namespace

BENCHMARK_MAIN();

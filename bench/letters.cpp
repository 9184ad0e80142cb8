// Letters per second out of a batch of 200 PDFs, by one process and by two, beside the time that poppler
// alone takes to give the same words: what the reader adds to poppler (the aim is 1.25 times its time or
// less), and what the second core brings (1.8 times the throughput or more). Then the first page of each by
// itself, from its bytes to the fields that are found, against poppler's words without their fonts (the aim
// is 1.5 times; a quarter of poppler's time goes into naming the fonts, which sizes and blanks are told by).
#include "programs/reader/letters.h"
#include "programs/base/read_file.h"
#include "programs/reader/document.h"
#include "programs/vlmail/letters/batch.h"
#include "programs/vlmail/letters/node_settings.h"
#include "programs/vlmail/letters/worker_pool.h"

#include <benchmark/benchmark.h>

#include <poppler-document.h>
#include <poppler-page.h>

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

namespace {

namespace fs = std::filesystem;

constexpr std::size_t DOCUMENTS = 200;

/// The PDFs of an office and its like, over and over.
std::vector<std::string> const& batch() {
    static std::vector<std::string> const files = [] {
        std::vector<std::string> found;
        for (auto const& entry : fs::recursive_directory_iterator(VLSERVICE_EXAMPLE_LETTERS)) {
            std::string const ending = entry.path().extension().string();
            if (ending == ".pdf" || ending == ".PDF")
                found.push_back(entry.path().string());
        }
        std::vector<std::string> repeated;
        for (std::size_t i = 0; i < DOCUMENTS; ++i)
            repeated.push_back(found.at(i % found.size()));
        return repeated;
    }();
    return files;
}

std::string wordsByPopplerAlone(std::string const& file) {
    // Poppler sets itself up anew for a document while it has no other; that is not what is compared here.
    static std::unique_ptr<poppler::document> const keptOpen(
        poppler::document::load_from_file(batch().front()));
    std::size_t words = 0;
    std::unique_ptr<poppler::document> const document(poppler::document::load_from_file(file));
    for (int i = 0; i < document->pages(); ++i) {
        std::unique_ptr<poppler::page> const page(document->create_page(i));
        words += page->text_list(poppler::page::text_list_include_font).size();
    }
    return std::to_string(words);
}

VlMail::Workers workersIn(benchmark::State const& state) {
    return {.count = static_cast<std::size_t>(state.range(0))};
}

/// In worker processes like the reader's, so that both pay for them.
void popplerAlone(benchmark::State& state) {
    for (auto _ : state) {
        VlMail::runJobs(
            batch().size(), workersIn(state),
            [](std::size_t index) { return wordsByPopplerAlone(batch()[index]); },
            [](std::size_t, VlMail::JobResult words) { benchmark::DoNotOptimize(words); });
    }
    state.SetItemsProcessed(state.iterations() * static_cast<long long>(batch().size()));
}

void readLetters(benchmark::State& state) {
    VlMail::NodeSettings const settings;
    VlMail::BatchWatcher watcher;
    std::size_t letters = 0;
    for (auto _ : state) {
        VlMail::readBatch(batch(), settings, workersIn(state), {}, watcher,
                          [&](std::size_t, VlMail::ReadResult result) {
                              letters += result.reading.letters.value().size();
                          });
    }
    state.SetItemsProcessed(static_cast<long long>(letters));
}

std::vector<std::string> const& bytesOfBatch() {
    static std::vector<std::string> const all = [] {
        std::vector<std::string> read;
        for (std::string const& file : batch())
            read.push_back(Base::readFile(file));
        return read;
    }();
    return all;
}

std::size_t wordsOfFirstPage(std::string const& bytes) {
    std::unique_ptr<poppler::document> const document(
        poppler::document::load_from_raw_data(bytes.data(), static_cast<int>(bytes.size())));
    std::unique_ptr<poppler::page> const page(document->create_page(0));
    return page->text_list().size();
}

std::size_t fieldsOfFirstPage(std::string const& bytes, std::string const& name,
                              Cfg::ExtractPreset const& preset) {
    Reader::Document document = Reader::openDocument(bytes, name);
    return Reader::readLetters(document, preset).size();
}

template<typename Work>
std::chrono::duration<double> timeOf(Work const& work) {
    auto const start = std::chrono::steady_clock::now();
    for (std::size_t i = 0; i < batch().size(); ++i)
        benchmark::DoNotOptimize(work(i));
    return std::chrono::steady_clock::now() - start;
}

/// The ratio is that of the fastest rounds, so that what else the machine does falls out.
void firstPages(benchmark::State& state) {
    VlMail::NodeSettings const settings;
    Cfg::Presets const presets = settings.presets();
    Cfg::ExtractPreset const& preset = presets.findMatch("a.pdf").first;
    std::unique_ptr<poppler::document> const keptOpen(poppler::document::load_from_file(batch().front()));
    auto words = std::chrono::duration<double>::max();
    auto fields = words;
    for (auto _ : state) {
        words = std::min(words, timeOf([](std::size_t i) { return wordsOfFirstPage(bytesOfBatch()[i]); }));
        fields = std::min(fields, timeOf([&](std::size_t i) {
                              return fieldsOfFirstPage(bytesOfBatch()[i], batch()[i], preset);
                          }));
    }
    state.counters["ratio"] = fields / words;
}

BENCHMARK(popplerAlone)
    ->Arg(1)
    ->Arg(2)
    ->Unit(benchmark::kMillisecond)
    ->MeasureProcessCPUTime()
    ->UseRealTime();
BENCHMARK(readLetters)->Arg(1)->Arg(2)->Unit(benchmark::kMillisecond)->MeasureProcessCPUTime()->UseRealTime();
BENCHMARK(firstPages)->Unit(benchmark::kMillisecond);

} // namespace

BENCHMARK_MAIN();

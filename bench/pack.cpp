// Measures what pages cost on their way into a container and out of it, each against the least that could do
// the work: bare zlib, a bare write with a checksum. Decides whether blobs and index may stay as simple as
// they are. To reach, as `of_peer`: zipping and unzipping 0.95, writing 0.90; the growth up to 100,000 pages
// linear, their import below 1 GiB. Files go to TMPDIR.
#include "vlservice/pack/blob_format.h"
#include "vlservice/pack/pack_wrapper.h"

#include <benchmark/benchmark.h>
#include <zlib.h>

#include <algorithm>
#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <functional>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include <fcntl.h>
#include <malloc.h>
#include <unistd.h>

namespace {

constexpr std::size_t PAGE_SIZE = 50'000;

/// Bytes as pages have them: text that repeats itself, with stretches of what was compressed before.
std::string pageOf(std::size_t size, unsigned seed) {
    std::mt19937 random(seed);
    std::string page = "%PDF-1.7\n";
    while (page.size() < size) {
        if (random() % 4 == 0)
            for (auto i = random() % 200; i > 0; --i)
                page += static_cast<char>(random());
        else
            page += "1 0 0 1 " + std::to_string(random() % 600) + " Tm (Invoice " +
                    std::to_string(random() % 90) + ") Tj\n";
    }
    page.resize(size);
    return page;
}

std::vector<SharedMemBuffer> pages(std::size_t count, std::size_t size) {
    std::vector<SharedMemBuffer> all;
    for (unsigned i = 0; i < count; ++i) {
        std::string const page = pageOf(size, i);
        all.push_back(SharedMemBuffer::copyOf(page.data(), page.size()));
    }
    return all;
}

/// What could stand in a container: its first blob must begin as blobs do.
std::vector<SharedMemBuffer> blobs(std::size_t count, std::size_t size) {
    std::vector<SharedMemBuffer> all = pages(count, size);
    for (SharedMemBuffer const& blob : all)
        std::copy(DB_ZIP_MAGIC.begin(), DB_ZIP_MAGIC.end(), blob.data());
    return all;
}

class TemporaryFile {
public:
    TemporaryFile() : path_((std::filesystem::temp_directory_path() / "bench_pack.XXXXXX").string()) {
        ::close(::mkstemp(path_.data()));
    }
    ~TemporaryFile() { std::filesystem::remove(path_); }
    TemporaryFile(TemporaryFile const&) = delete;
    TemporaryFile& operator=(TemporaryFile const&) = delete;

    std::string const& path() const { return path_; }

private:
    std::string path_;
};

/// Processor time of this thread, the kernel's part included: what else the machine does is not our affair.
double now() {
    timespec time;
    ::clock_gettime(CLOCK_THREAD_CPUTIME_ID, &time);
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) / 1e9;
}

double secondsOf(std::function<void()> const& work) {
    double const start = now();
    work();
    return now() - start;
}

double median(std::vector<double> values) {
    auto const middle = values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2);
    std::nth_element(values.begin(), middle, values.end());
    return *middle;
}

/// Runs both in turn, so that the machine's moods meet both, and tells the peer's median time over ours.
void compare(benchmark::State& state, std::function<void()> const& ours, std::function<void()> const& peer) {
    std::vector<double> ourSeconds, peerSeconds;
    for (auto _ : state) {
        bool const oursFirst = ourSeconds.size() % 2 == 0;
        if (!oursFirst)
            peerSeconds.push_back(secondsOf(peer));
        ourSeconds.push_back(secondsOf(ours));
        if (oursFirst)
            peerSeconds.push_back(secondsOf(peer));
        state.SetIterationTime(ourSeconds.back());
    }
    state.counters["of_peer"] = median(peerSeconds) / median(ourSeconds);
}

void zipPages(benchmark::State& state) {
    std::vector<SharedMemBuffer> const all = pages(40, PAGE_SIZE);
    auto const ours = [&] {
        for (SharedMemBuffer const& page : all)
            benchmark::DoNotOptimize(PageSaverI::zipDbData(page));
    };
    auto const peer = [&] {
        for (SharedMemBuffer const& page : all) {
            uLongf length = compressBound(page.size());
            auto const block = std::make_unique_for_overwrite<Bytef[]>(length);
            benchmark::DoNotOptimize(compress2(block.get(), &length, page.data(), page.size(), 1));
        }
    };
    compare(state, ours, peer);
    state.SetBytesProcessed(static_cast<std::int64_t>(all.size() * PAGE_SIZE) * state.iterations());
}
BENCHMARK(zipPages)->UseManualTime()->Unit(benchmark::kMillisecond);

void unzipPages(benchmark::State& state) {
    std::vector<SharedMemBuffer> zipped = pages(40, PAGE_SIZE);
    for (SharedMemBuffer& blob : zipped)
        blob = PageSaverI::zipDbData(blob);
    auto const ours = [&] {
        for (SharedMemBuffer const& blob : zipped)
            benchmark::DoNotOptimize(PageLoaderI::unzipDbData(blob));
    };
    auto const peer = [&] {
        for (SharedMemBuffer const& blob : zipped) {
            uLongf length = PAGE_SIZE;
            auto const block = std::make_unique_for_overwrite<Bytef[]>(length);
            benchmark::DoNotOptimize(uncompress(block.get(), &length, blob.data() + DB_ZIP_HEADER_SIZE,
                                                blob.size() - DB_ZIP_HEADER_SIZE));
        }
    };
    compare(state, ours, peer);
    state.SetBytesProcessed(static_cast<std::int64_t>(zipped.size() * PAGE_SIZE) * state.iterations());
}
BENCHMARK(unzipPages)->UseManualTime()->Unit(benchmark::kMillisecond);

void writeContainer(std::string const& path, std::vector<SharedMemBuffer> const& all, std::size_t count) {
    PackWrapper out(path, PackWrapper::PURPOSE_OUTPUT, "bench");
    for (std::size_t i = 0; i < count; ++i)
        out.savePage("document.pdf", std::to_string(i + 1), all[i % all.size()]);
    if (!out.finalizeOutput(PageSaverI::zipDbData("{}", 2)))
        std::abort();
}

/// The same bytes with a checksum of each page.
void writeBare(std::string const& path, std::vector<SharedMemBuffer> const& all, std::size_t count) {
    int const file = ::open(path.c_str(), O_WRONLY | O_TRUNC);
    for (std::size_t i = 0; i < count; ++i) {
        SharedMemBuffer const& blob = all[i % all.size()];
        benchmark::DoNotOptimize(crc32(0, blob.data(), static_cast<uInt>(blob.size())));
        if (::write(file, blob.data(), blob.size()) != static_cast<ssize_t>(blob.size()))
            std::abort();
    }
    ::close(file);
}

void writeMailing(benchmark::State& state) {
    constexpr std::size_t count = 4'000;
    std::vector<SharedMemBuffer> const all = blobs(100, PAGE_SIZE);
    TemporaryFile const container, bare;
    compare(
        state, [&] { writeContainer(container.path(), all, count); },
        [&] { writeBare(bare.path(), all, count); });
    state.SetBytesProcessed(static_cast<std::int64_t>(count * PAGE_SIZE) * state.iterations());
}
BENCHMARK(writeMailing)->UseManualTime()->Iterations(15)->Unit(benchmark::kMillisecond);

/// Small blobs, so that it is the number of pages that counts.
void writeOpenAndReadPageByPage(benchmark::State& state) {
    auto const count = static_cast<std::size_t>(state.range(0));
    std::vector<SharedMemBuffer> const all = blobs(100, 200);
    TemporaryFile const container;
    for (auto _ : state) {
        writeContainer(container.path(), all, count);
        PackWrapper in(container.path(), PackWrapper::PURPOSE_IMPORT, "");
        std::size_t read = 0;
        for (std::size_t i = 0; i < count; ++i)
            in.requestPageData("document.pdf", std::to_string(i + 1),
                               [&](SharedMemBuffer page) { read += page.empty() ? 0 : 1; });
        if (read != count)
            return state.SkipWithError("not all pages came back");
    }
    state.SetItemsProcessed(state.range(0) * state.iterations());
    state.SetComplexityN(state.range(0));
}
BENCHMARK(writeOpenAndReadPageByPage)
    ->RangeMultiplier(10)
    ->Range(1'000, 100'000)
    ->Complexity(benchmark::oN)
    ->Unit(benchmark::kMillisecond);

/// A line of /proc/self/status, in MiB.
double mebibytesOf(std::string const& key) {
    std::ifstream status("/proc/self/status");
    for (std::string line; std::getline(status, line);)
        if (line.starts_with(key))
            return std::strtod(line.c_str() + key.size() + 1, nullptr) / 1024;
    return 0;
}

void importPages(benchmark::State& state) {
    auto const count = static_cast<std::size_t>(state.range(0));
    TemporaryFile const container;
    writeContainer(container.path(), blobs(100, 200), count);
    double most = 0;
    for (auto _ : state) {
        // Gives back what earlier rounds have left, and starts the peak anew.
        ::malloc_trim(0);
        std::ofstream("/proc/self/clear_refs") << 5;
        double const before = mebibytesOf("VmRSS");
        PackWrapper const in(container.path(), PackWrapper::PURPOSE_IMPORT, "");
        if (in.szBins() != count + 1)
            return state.SkipWithError("not all pages are there");
        most = std::max(most, mebibytesOf("VmHWM") - before);
    }
    state.counters["MiB"] = most;
}
BENCHMARK(importPages)->Arg(100'000)->Unit(benchmark::kMillisecond);

} // namespace

BENCHMARK_MAIN();

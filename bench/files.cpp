// Measures letters that go out as files into a folder against plain copying of the same three files with sync
// of each file and of the folder. Decides whether each file may be written under another name first, and the
// folder be synced once more before the control file is there. To reach: `of_peer` 0.8.
#include "programs/base/file_descriptor.h"
#include "programs/carriers/control_file.h"
#include "programs/carriers/folder_carrier.h"

#include <benchmark/benchmark.h>

#include <chrono>
#include <cstdint>
#include <cstdlib>
#include <fcntl.h>
#include <filesystem>
#include <string>
#include <string_view>
#include <vector>

namespace {

namespace fs = std::filesystem;

using Clock = std::chrono::steady_clock;

/// On the disk that the benchmark is started on: temporary folders may lie in memory.
class Folder {
public:
    Folder() {
        std::string name = (fs::current_path() / "bench_files.XXXXXX").string();
        if (!::mkdtemp(name.data()))
            std::abort();
        path_ = name;
        for (char const* const made : {"letters", "shop", "copies"})
            fs::create_directory(path_ / made);
    }
    ~Folder() { fs::remove_all(path_); }
    Folder(Folder const&) = delete;
    Folder& operator=(Folder const&) = delete;

    fs::path operator/(char const* name) const { return path_ / name; }

private:
    fs::path path_;
};

Carriers::Parcel letterOf(std::size_t bytes, int number) {
    Carriers::Parcel parcel;
    parcel.key = "p1-" + std::to_string(number);
    parcel.mailing = "p1";
    for (std::uint32_t seed = 7; parcel.document.size() < bytes; seed = seed * 1664525 + 1013904223)
        parcel.document += static_cast<char>(seed >> 24);
    Carriers::OutgoingLetter& letter = parcel.letters.emplace_back();
    letter.number = number;
    letter.key = parcel.key;
    letter.address = "Ada Lovelace\nLong Street 1\nLondon";
    return parcel;
}

void writeFile(fs::path const& file, std::string_view bytes) {
    Base::FileDescriptor out(file, O_WRONLY | O_CREAT | O_TRUNC, 0666);
    out.writeAll(bytes);
    out.sync();
    out.close();
}

/// As a program copies, and the disk has it.
void copyWithSync(fs::path const& from, fs::path const& to) {
    Base::FileDescriptor source(from, O_RDONLY);
    Base::FileDescriptor target(to, O_WRONLY | O_CREAT | O_TRUNC, 0666);
    std::vector<char> buffer(1 << 17);
    while (std::size_t const size = source.read(buffer.data(), buffer.size()))
        target.writeAll({buffer.data(), size});
    target.sync();
    target.close();
}

template<typename Work>
std::chrono::nanoseconds timeOf(Work const& work) {
    auto const begin = Clock::now();
    work();
    return Clock::now() - begin;
}

void files(benchmark::State& state) {
    Folder const folder;
    Carriers::FolderCarrier carrier(folder / "shop", Carriers::identityOfFolder(folder / "shop"));
    std::chrono::nanoseconds ours{};
    std::chrono::nanoseconds theirs{};
    int number = 0;
    for ([[maybe_unused]] auto _ : state) {
        Carriers::Parcel const letter = letterOf(static_cast<std::size_t>(state.range(0)), ++number);
        std::vector<std::string> names;
        Carriers::forEachFile(letter, [&](std::string const& name, std::string_view bytes, bool) {
            names.push_back(name);
            writeFile(folder / "letters" / name, bytes);
        });
        auto const handOver = [&] { ours += timeOf([&] { carrier.handOver(letter, [] {}); }); };
        // What was synced last weighs on what is synced next.
        if (number % 2 == 0)
            handOver();
        theirs += timeOf([&] {
            for (std::string const& name : names)
                copyWithSync(folder / "letters" / name, folder / "copies" / name);
            Base::syncFolder(folder / "copies");
        });
        if (number % 2 != 0)
            handOver();
    }
    state.counters["of_peer"] = static_cast<double>(theirs.count()) / static_cast<double>(ours.count());
}

BENCHMARK(files)->ArgName("bytes")->Arg(30'000)->Arg(300'000)->Arg(3'000'000)->Unit(benchmark::kMillisecond);

} // namespace

BENCHMARK_MAIN();

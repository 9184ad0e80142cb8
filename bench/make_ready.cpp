// What sheets cost beyond pages: letters mailed with a letterhead and an attachment of two pages, by the same
// letters mailed without, in turns, each as "vlmail mail" does it. For the way in which letterheads are laid
// on pages: the aim is a ratio of 1.6 at most. The letters are PDFs of an office of which each goes out
// either way.
#include "tests/support/raw_pdf.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlmail/run_vlmail.h"

#include <benchmark/benchmark.h>

#include <chrono>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

namespace fs = std::filesystem;

constexpr char const* A4 = "/MediaBox [0 0 595.276 841.89]";

/// A logo in colours, an address line, and a foot.
std::string letterhead() {
    std::string points;
    for (unsigned state = 1; points.size() < 3 * 200 * 60; state = state * 1664525 + 1013904223)
        points += static_cast<char>(state >> 24);
    VLServiceTest::RawPdf pdf = VLServiceTest::onePage(
        "q 200 0 0 60 340 760 cm /X6 Do Q 0 0 0.6 rg 60 745 475 2 re f BT /F 7 Tf 60 40 Td "
        "(Smith & Co, 1 Long Street, London) Tj ET",
        "/XObject << /X6 6 0 R >>", A4);
    pdf.stream(
        6,
        "/Type /XObject /Subtype /Image /Width 200 /Height 60 /BitsPerComponent 8 /ColorSpace /DeviceRGB "
        "/Filter /FlateDecode",
        VLServiceTest::deflated(points));
    return pdf.bytes();
}

/// The documents, the settings and what they name.
class Office {
public:
    Office() {
        fs::create_directories(folder_ / "docs");
        write("docs/head.pdf", letterhead());
        write("docs/terms.txt", "Terms\nof delivery\fand of payment\n");
        write("plain.json", settings(""));
        write("made.json", settings(R"(, "attachments": ["terms"], "letterheads": ["head"])"));
        for (auto const& entry : fs::recursive_directory_iterator(VLSERVICE_EXAMPLE_LETTERS))
            if (std::string const file = entry.path().string(); entry.path().extension() == ".pdf" &&
                                                                goesOut("plain.json", file) &&
                                                                goesOut("made.json", file))
                letters_.push_back(file);
        if (letters_.empty())
            throw std::runtime_error("none of the example letters goes out");
    }

    std::size_t letters() const { return letters_.size(); }
    double secondsFor(char const* settings) {
        auto const begin = std::chrono::steady_clock::now();
        mail(settings, letters_);
        return std::chrono::duration<double>(std::chrono::steady_clock::now() - begin).count();
    }

private:
    /// Every first line is an address, and what would go wrong on paper keeps nothing back.
    static std::string settings(std::string const& keys) {
        return R"({"app": {"print_area": {"left": 0, "top": 0, "right": 21000, "bottom": 29700},
            "loose_letter_deviation": true}, "presets": {"extract_presets": [{"match": ".*", "pack_preset": "P",
            "zones": [{"name": "Page", "location": {"left": 0, "top": 0, "right": 30000, "bottom": 40000},
            "fields": [{"name": "postal", "value_extract": "^(?<VAL>.*)$", "priority": 1,
            "send_to_server": true}]}]}], "pack_presets": [{"name": "P", "no_group": true)" +
               keys + "}]}}";
    }
    void write(char const* name, std::string const& bytes) {
        std::ofstream(folder_ / name, std::ios::binary) << bytes;
    }
    bool goesOut(char const* settings, std::string const& file) { return mail(settings, {file}) == 0; }

    int mail(char const* settings, std::vector<std::string> const& files) {
        std::vector<std::string> arguments{"mail", "--jobs",    "1",           "--settings", path(settings),
                                           "-o",   path("out"), "--documents", path("docs")};
        arguments.insert(arguments.end(), files.begin(), files.end());
        int const status = runVlMail(arguments).status;
        fs::remove_all(folder_ / "out");
        return status;
    }
    std::string path(char const* name) const { return (folder_ / name).string(); }

    TemporaryFolder folder_;
    std::vector<std::string> letters_;
};

void makeReady(benchmark::State& state) {
    static Office office;
    double with = 0;
    double without = 0;
    for (auto _ : state) {
        without += office.secondsFor("plain.json");
        with += office.secondsFor("made.json");
    }
    double const letters = static_cast<double>(office.letters()) * static_cast<double>(state.iterations());
    state.counters["ratio"] = with / without;
    state.counters["letters"] = static_cast<double>(office.letters());
    state.counters["us_a_letter_without"] = without * 1e6 / letters;
    state.counters["us_a_letter_with"] = with * 1e6 / letters;
}

BENCHMARK(makeReady)->Unit(benchmark::kMillisecond)->MinTime(5);

} // namespace

BENCHMARK_MAIN();

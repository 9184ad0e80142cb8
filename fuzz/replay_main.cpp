// Feeds every file of the folders named on the command line to a fuzz target, for builds without a fuzzing
// engine. An empty or missing folder is a failure: a target whose seeds were lost would otherwise pass
// unnoticed.
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <iterator>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size);

int main(int argc, char** argv) {
    std::size_t replayed = 0;
    for (int i = 1; i < argc; ++i) {
        for (auto const& entry : std::filesystem::recursive_directory_iterator(argv[i])) {
            if (!entry.is_regular_file())
                continue;
            std::ifstream in(entry.path(), std::ios::binary);
            std::vector<char> const bytes{std::istreambuf_iterator<char>(in), {}};
            // A copy of the exact size lets the address sanitizer see a read past the end.
            std::vector<std::uint8_t> const input(bytes.begin(), bytes.end());
            LLVMFuzzerTestOneInput(input.data(), input.size());
            ++replayed;
        }
    }
    std::cout << replayed << " inputs replayed\n";
    return replayed == 0 ? 1 : 0;
}

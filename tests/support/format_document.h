#pragma once
// The blocks in the documents about formats, which the tests hold against the bytes that are really written.

#include <algorithm>
#include <cstdio>
#include <fstream>
#include <iterator>
#include <string>

namespace VLServiceTest {

/// The text between the fence with that name and the next one.
inline std::string documentBlock(std::string const& file, std::string const& name) {
    std::ifstream in(file);
    std::string const text{std::istreambuf_iterator<char>(in), {}};
    std::string const fence = "```" + name + "\n";
    std::size_t const start = text.find(fence);
    if (start == std::string::npos)
        return "no such block";
    std::size_t const end = text.find("```", start + fence.size());
    return text.substr(start + fence.size(), end - start - fence.size());
}

/// As `hexdump -C` prints, less its last line.
inline std::string hexDump(std::string const& bytes) {
    std::string dump;
    for (std::size_t line = 0; line < bytes.size(); line += 16) {
        char part[32];
        std::snprintf(part, sizeof part, "%08zx ", line);
        std::string hex = part, text;
        for (std::size_t i = line; i < std::min(line + 16, bytes.size()); ++i) {
            std::snprintf(part, sizeof part, i % 16 == 7 ? " %02x " : " %02x",
                          static_cast<unsigned char>(bytes[i]));
            hex += part;
            text += bytes[i] >= 0x20 && bytes[i] < 0x7F ? bytes[i] : '.';
        }
        hex.resize(60, ' ');
        dump += hex + '|' + text + "|\n";
    }
    return dump;
}

} // namespace VLServiceTest

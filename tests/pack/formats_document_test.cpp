// docs/formats.md shows the smallest blob and the smallest container byte by byte: this keeps them true.
#include "tests/pack/container_fixture.h"

#include <cstdio>

namespace {

std::string document() {
    std::ifstream in(VLSERVICE_DOCS "/formats.md");
    return {std::istreambuf_iterator<char>(in), {}};
}

/// The text between the fence with that name and the next one.
std::string block(std::string const& name) {
    std::string const text = document();
    std::string const fence = "```hexdump " + name + "\n";
    std::size_t const start = text.find(fence);
    if (start == std::string::npos)
        return "no such block";
    std::size_t const end = text.find("```", start + fence.size());
    return text.substr(start + fence.size(), end - start - fence.size());
}

/// As `hexdump -C` prints, less its last line.
std::string hexDump(std::string const& bytes) {
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

class FormatsDocument : public ContainerTest {
protected:
    SharedMemBuffer const NOTHING = PageSaverI::zipDbData(SharedMemBuffer());
};

TEST_F(FormatsDocument, ShowsTheSmallestBlob) { EXPECT_EQ(block("blob"), hexDump(textOf(NOTHING))); }

TEST_F(FormatsDocument, ShowsTheSmallestContainer) {
    PackWrapper out(file_.string(), PackWrapper::PURPOSE_OUTPUT, "m");
    ASSERT_TRUE(out.finalizeOutput(NOTHING));
    EXPECT_EQ(block("container"), hexDump(read()));
    EXPECT_EQ(textOf(PackWrapper(file_.string(), PackWrapper::PURPOSE_IMPORT, "").inputFullMeta()),
              textOf(NOTHING));
}

} // namespace

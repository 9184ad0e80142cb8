// docs/formats.md shows the smallest blob and the smallest container byte by byte: this keeps them true.
#include "tests/pack/container_fixture.h"

#include "tests/support/format_document.h"

namespace {

using VLServiceTest::hexDump;

std::string block(std::string const& name) {
    return VLServiceTest::documentBlock(VLSERVICE_DOCS "/formats.md", "hexdump " + name);
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

#include "tests/pack/container_fixture.h"
#include "tests/support/failing_memory.h"

#include <array>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class WritingContainers : public ContainerTest {
protected:
    PackWrapper& create(std::string const& id = "m1") {
        return wrapper_.emplace(file_.string(), PackWrapper::PURPOSE_OUTPUT, id);
    }
    static PackWrapper::BinEntry entry(PackWrapper const& wrapper, unsigned long long index) {
        return wrapper.bin(index);
    }
};

TEST_F(WritingContainers, LayOutBlobsIndexAndTrailer) {
    std::string const first(100, 'T'), second(40, 's'), metadata(25, 'm');
    PackWrapper& out = create("m<1>");
    out.savePage("a & b.pdf", "1", bufferOf(first));
    out.savePage("a & b.pdf", "2", bufferOf(second));
    EXPECT_TRUE(out.finalizeOutput(bufferOf(metadata)));
    std::string const index =
        "<?xml version=\"1.0\" encoding=\"UTF-8\" standalone=\"yes\" ?><vantelar>"
        "<corbulet id=\"m&lt;1&gt;\" items=\"3\">"
        "<mailitem name=\"1\" offset=\"0\" length=\"100\" role=\"page\" crc=\"" +
        std::to_string(crcOf(first)) +
        "\" document=\"a &amp; b.pdf\" />"
        "<mailitem name=\"2\" offset=\"100\" length=\"40\" role=\"page\" crc=\"" +
        std::to_string(crcOf(second)) +
        "\" document=\"a &amp; b.pdf\" />"
        "<mailitem name=\"DDT440001.TDD\" offset=\"140\" length=\"25\" role=\"framework\" crc=\"" +
        std::to_string(crcOf(metadata)) + "\" /></corbulet></vantelar>";
    EXPECT_EQ(read(), first + second + metadata + index + littleEndian(165));
    EXPECT_THAT(log_.take(), IsEmpty());
}

TEST_F(WritingContainers, TellHowFarTheyAre) {
    PackWrapper& out = create();
    EXPECT_EQ(out.pthFile(), file_.string());
    EXPECT_EQ(out.szBins(), 0u);
    EXPECT_FALSE(out.outputFinalished());
    out.savePage("a.pdf", "1", bufferOf(PAGE_1));
    EXPECT_EQ(out.szBins(), 1u);
    EXPECT_FALSE(out.outputFinalished());
    EXPECT_TRUE(out.finalizeOutput(bufferOf(METADATA)));
    EXPECT_EQ(out.szBins(), 2u);
    EXPECT_TRUE(out.outputFinalished());
}

TEST_F(WritingContainers, ShowTheirEntries) {
    PackWrapper& out = create();
    out.savePage("a.pdf", "1", bufferOf(PAGE_1));
    EXPECT_TRUE(out.finalizeOutput(bufferOf(METADATA)));
    PackWrapper::BinEntry const& page = out.bin(0);
    EXPECT_EQ(page.name, "1");
    EXPECT_EQ(page.document, "a.pdf");
    EXPECT_EQ(page.role, "page");
    EXPECT_EQ(page.offset, 0u);
    EXPECT_EQ(page.length, PAGE_1.size());
    EXPECT_EQ(page.crc, crcOf(PAGE_1));
    PackWrapper::BinEntry const& metadata = out.bin(1);
    EXPECT_EQ(metadata.name, "DDT440001.TDD");
    EXPECT_EQ(metadata.document, "");
    EXPECT_EQ(metadata.role, "framework");
    EXPECT_EQ(metadata.offset, PAGE_1.size());
    EXPECT_THROW(out.bin(2), std::out_of_range);
}

TEST_F(WritingContainers, NameTheElementsThatProgramsMayAskFor) {
    EXPECT_EQ(PackWrapper::TAG_CORBULET, "corbulet");
    EXPECT_EQ(PackWrapper::TAG_CORBULET_ID, "id");
    EXPECT_EQ(PackWrapper::TAG_CORBULET_TITLE, "subject");
}

TEST_F(WritingContainers, NumberTheirPurposes) {
    EXPECT_EQ(PackWrapper::PURPOSE_IMPORT, 0);
    EXPECT_EQ(PackWrapper::PURPOSE_OUTPUT, 1);
    EXPECT_EQ(PackWrapper::PURPOSE_FAILED, 255);
    EXPECT_EQ(sizeof(PackWrapper::Purpose), 4u);
}

TEST_F(WritingContainers, TakeTheDirectionFromTheLowestBit) {
    {
        PackWrapper out(file_.string(), static_cast<PackWrapper::Purpose>(3), "m1");
        EXPECT_TRUE(out.finalizeOutput(bufferOf(METADATA)));
    }
    PackWrapper in(file_.string(), static_cast<PackWrapper::Purpose>(2), "unused");
    EXPECT_EQ(in.szBins(), 1u);
}

TEST_F(WritingContainers, LeaveTheSourcesIdEmpty) { EXPECT_EQ(create("m1").packId(), ""); }

TEST_F(WritingContainers, ReplaceAFileThatIsThere) {
    write(std::string(100'000, 'x'));
    EXPECT_TRUE(create().finalizeOutput(bufferOf(METADATA)));
    EXPECT_EQ(read().substr(0, METADATA.size()), METADATA);
    EXPECT_LT(read().size(), 1000u);
}

TEST_F(WritingContainers, MayHaveNoPages) {
    EXPECT_TRUE(create().finalizeOutput(bufferOf(METADATA)));
    EXPECT_NE(read().find(" items=\"1\""), std::string::npos);
    EXPECT_EQ(wrapper_->bin(0).offset, 0u);
    EXPECT_EQ(open().szBins(), 1u);

    EXPECT_TRUE(create().finalizeOutput(bufferOf("plain metadata")));
    EXPECT_EQ(open().szBins(), 0u) << "found although the first blob does not begin as blobs do";
}

TEST_F(WritingContainers, MayHaveEmptyMetadata) {
    PackWrapper& out = create();
    out.savePage("a.pdf", "1", bufferOf(PAGE_1));
    EXPECT_TRUE(out.finalizeOutput(SharedMemBuffer()));
    EXPECT_EQ(out.bin(1).length, 0u);
    EXPECT_EQ(out.bin(1).crc, 0u);
    EXPECT_EQ(out.bin(1).offset, PAGE_1.size());
    EXPECT_EQ(read().substr(read().size() - 8), littleEndian(PAGE_1.size()));
    EXPECT_TRUE(open().inputFullMeta().empty());
    EXPECT_THAT(log_.take(), IsEmpty());
}

TEST_F(WritingContainers, WriteADocumentForEveryPageAndNoneForTheMetadata) {
    PackWrapper& out = create();
    out.savePage("", "1", bufferOf(PAGE_1));
    EXPECT_TRUE(out.finalizeOutput(bufferOf(METADATA)));
    std::string const index = read();
    std::size_t const document = index.find(" document=\"\"");
    ASSERT_NE(document, std::string::npos);
    EXPECT_EQ(index.find("document=", document + 9), std::string::npos);
    EXPECT_EQ(page(open(), "", "1"), PAGE_1);
}

TEST_F(WritingContainers, CutTheLengthOfABlobOfFourGigabytes) {
    // Written to where nothing is kept, from memory that is never touched.
    SharedMemBuffer large;
    large.resize((1ull << 32) + 3);
    large.data()[0] = 'T';
    large.data()[1] = 'E';
    large.data()[2] = 'Z';
    PackWrapper out("/dev/null", PackWrapper::PURPOSE_OUTPUT, "m1");
    out.savePage("a.pdf", "1", large);
    out.savePage("a.pdf", "2", bufferOf(PAGE_2));
    EXPECT_EQ(out.bin(0).length, 3u);
    EXPECT_EQ(out.bin(0).crc, crcOf("TEZ"));
    EXPECT_EQ(out.bin(1).offset, (1ull << 32) + 3);
    EXPECT_THAT(log_.take(), IsEmpty());
}

TEST_F(WritingContainers, RoundTripAnyNameThatXmlCanHold) {
    std::string const names[] = {
        "Rechnung Nr. 17.pdf",
        "../../etc/passwd",
        "a\"b'c<d>e&f",
        "a\tb\nc\rd",
        " ends in blanks ",
        "",
        "Επιστολή.pdf",
        "\xF0\x9F\x93\xAE",
        "&#x41;",
        "&amp;#x41;",
        "&#x",
        "a&#x26;#xb",
        "&#65;",
        "]]>",
        "-->",
    };
    PackWrapper& out = create("&#x41; \"id\"");
    for (std::string const& name : names)
        out.savePage(name, name + "!", bufferOf(blobOf(name)));
    ASSERT_TRUE(out.finalizeOutput(bufferOf(METADATA)));
    PackWrapper& in = open();
    EXPECT_EQ(in.packId(), "&#x41; \"id\"");
    for (std::string const& name : names)
        EXPECT_EQ(page(in, name, name + "!"), blobOf(name)) << name;
    EXPECT_THAT(log_.take(), IsEmpty());
}

TEST_F(WritingContainers, RefuseNamesThatXmlCannotHold) {
    struct Case {
        char const* what;
        std::string id, document, page;
    };
    Case const cases[] = {
        {"a control character in a page's name", "m", "a.pdf", "1\x01"},
        {"a zero in a document's name", "m", std::string("a\0b", 3), "1"},
        {"a document's name in another encoding", "m", "M\xFCller.pdf", "1"},
        {"a character cut at the end", "m", "M\xC3", "1"},
        {"an overlong character", "m", "\xC0\xAF", "1"},
        {"half of a surrogate pair", "m", "\xED\xA0\x80", "1"},
        {"a character that is none", "m", "\xEF\xBF\xBF", "1"},
        {"an id with a control character", "m\x1F", "a.pdf", "1"},
    };
    for (Case const& c : cases) {
        PackWrapper& out = create(c.id);
        out.savePage(c.document, c.page, bufferOf(PAGE_1));
        EXPECT_THAT(log_.take(), IsEmpty()) << c.what;
        EXPECT_FALSE(out.finalizeOutput(bufferOf(METADATA))) << c.what;
        EXPECT_THAT(log_.take(),
                    ElementsAre(LogLine{4, "Mailing wrapper failed to save bin offsetts to " + quoted()}))
            << c.what;
        EXPECT_FALSE(std::filesystem::exists(file_)) << c.what;
    }
}

TEST_F(WritingContainers, LogAFileThatCannotBeCreated) {
    file_ = folder_ / "missing/a\"b&c.mailing";
    PackWrapper& out = create();
    EXPECT_THAT(log_.take(),
                ElementsAre(LogLine{3, "Mailing wrapper failed to create file \"" + folder_.path().string() +
                                           "/missing/a&\"b&&c.mailing\""}));
    EXPECT_FALSE(out.outputFinalished());
    out.savePage("a.pdf", "1", bufferOf(PAGE_1));
    EXPECT_FALSE(out.finalizeOutput(bufferOf(METADATA)));
    EXPECT_EQ(out.szBins(), 0u);
    EXPECT_THAT(log_.take(), IsEmpty()) << "a failed wrapper is silent";
}

TEST_F(WritingContainers, LogWhichPartDidNotFitOnTheDisk) {
    if (!std::filesystem::is_character_file("/dev/full"))
        GTEST_SKIP() << "this system has no /dev/full";
    // More than any buffer holds, so that the failure shows at once.
    std::string const large(1 << 20, 'T');
    struct Case {
        std::string page, metadata;
        int pages;
        char const* message;
    };
    Case const cases[] = {
        {large, METADATA, 1, "Mailing wrapper failed to save page data to \"/dev/full\""},
        {PAGE_1, large, 1, "Mailing wrapper failed to save mailing metadata to \"/dev/full\""},
        {"", METADATA, 500, "Mailing wrapper failed to save bin offsetts to \"/dev/full\""},
        {PAGE_1, METADATA, 1, "Mailing wrapper failed to save final offset to \"/dev/full\""},
    };
    for (Case const& c : cases) {
        PackWrapper out("/dev/full", PackWrapper::PURPOSE_OUTPUT, "m1");
        for (int i = 0; i < c.pages; ++i)
            out.savePage("a.pdf", std::to_string(i), bufferOf(c.page));
        EXPECT_FALSE(out.finalizeOutput(bufferOf(c.metadata)));
        EXPECT_THAT(log_.take(), ElementsAre(LogLine{4, c.message}));
        EXPECT_FALSE(out.outputFinalished());
    }
}

TEST_F(WritingContainers, KeepTheEntryOfAPageThatDidNotFit) {
    if (!std::filesystem::is_character_file("/dev/full"))
        GTEST_SKIP() << "this system has no /dev/full";
    PackWrapper out("/dev/full", PackWrapper::PURPOSE_OUTPUT, "m1");
    out.savePage("a.pdf", "1", bufferOf(std::string(1 << 20, 'T')));
    out.savePage("a.pdf", "2", bufferOf(PAGE_2));
    EXPECT_EQ(out.szBins(), 1u);
}

TEST_F(WritingContainers, LeaveAFileWhoseWritingFailedOnTheDisk) {
    create().finalizeOutput(bufferOf(METADATA));
    std::string const before = read();
    log_.take();
    wrapper_->savePage("a.pdf", "1", bufferOf(PAGE_1));
    EXPECT_THAT(log_.take(),
                ElementsAre(LogLine{4, "Mailing wrapper failed to save page data to " + quoted()}));
    EXPECT_EQ(wrapper_->szBins(), 2u);
    EXPECT_FALSE(wrapper_->outputFinalished());
    EXPECT_EQ(read(), before);
}

TEST_F(WritingContainers, CannotBeFinalisedTwice) {
    EXPECT_TRUE(create().finalizeOutput(bufferOf(METADATA)));
    std::string const before = read();
    EXPECT_FALSE(wrapper_->finalizeOutput(bufferOf(METADATA)));
    EXPECT_THAT(log_.take(),
                ElementsAre(LogLine{4, "Mailing wrapper failed to save mailing metadata to " + quoted()}));
    EXPECT_EQ(read(), before);
}

TEST_F(WritingContainers, LeaveAnUnfinishedFileWhenTheyGo) {
    create().savePage("a.pdf", "1", bufferOf(PAGE_1));
    wrapper_.reset();
    EXPECT_EQ(read(), PAGE_1);
    EXPECT_THAT(log_.take(), IsEmpty());
}

TEST_F(WritingContainers, AnswerARequestForAPageWithNothingAndWriteOn) {
    PackWrapper& out = create();
    out.savePage("a.pdf", "1", bufferOf(PAGE_1));
    EXPECT_EQ(page(out, "a.pdf", "1"), "");
    EXPECT_THAT(log_.take(), ElementsAre(LogLine{4, "Failed to read binary 1 from import file"}));
    EXPECT_FALSE(out.outputFinalished());
    out.savePage("a.pdf", "2", bufferOf(PAGE_2));
    EXPECT_TRUE(out.finalizeOutput(bufferOf(METADATA)));
    PackWrapper& in = open();
    EXPECT_EQ(page(in, "a.pdf", "1"), PAGE_1);
    EXPECT_EQ(page(in, "a.pdf", "2"), PAGE_2);
}

TEST_F(WritingContainers, RemoveTheFileOnARequestForAnUnknownPage) {
    PackWrapper& out = create();
    out.savePage("a.pdf", "1", bufferOf(PAGE_1));
    EXPECT_EQ(page(out, "a.pdf", "2"), std::nullopt);
    EXPECT_THAT(log_.take(), ElementsAre(LogLine{4, "Cannot find requested binary in imported file " +
                                                        quoted() + ". Doc a.pdf, page 2"}));
    EXPECT_FALSE(std::filesystem::exists(file_));
    EXPECT_FALSE(out.finalizeOutput(bufferOf(METADATA)));
    EXPECT_THAT(log_.take(), IsEmpty());
}

TEST_F(WritingContainers, KeepAFinishedFileOnARequestForAnUnknownPage) {
    EXPECT_TRUE(create().finalizeOutput(bufferOf(METADATA)));
    EXPECT_EQ(page(*wrapper_, "a.pdf", "2"), std::nullopt);
    EXPECT_TRUE(std::filesystem::exists(file_));
    EXPECT_FALSE(wrapper_->outputFinalished());
}

TEST_F(WritingContainers, StandInAsASinkOfPages) {
    PageSaverI& sink = create();
    sink.savePage("a.pdf", "1", bufferOf(PAGE_1));
    EXPECT_TRUE(wrapper_->finalizeOutput(bufferOf(METADATA)));
    EXPECT_EQ(page(open(), "a.pdf", "1"), PAGE_1);
}

TEST_F(WritingContainers, TellOfEachLackOfMemoryByTheResult) {
    SharedMemBuffer const page = bufferOf(PAGE_1);
    SharedMemBuffer const metadata = bufferOf(METADATA);
    std::string const document = "a document with a name of some length.pdf";
    bool hasFailed = true;
    long call = 0;
    while (hasFailed) {
        PackWrapper& out = create();
        bool isWhole = false;
        {
            VLServiceTest::FailingMemory const memory(++call);
            EXPECT_NO_THROW(out.savePage(document, "1", page)) << call;
            EXPECT_NO_THROW(isWhole = out.finalizeOutput(metadata)) << call;
            hasFailed = memory.hasFailed();
        }
        EXPECT_EQ(std::filesystem::exists(file_), isWhole) << call;
        EXPECT_EQ(isWhole ? open().szBins() : 0u, isWhole ? 2u : 0u) << call;
        EXPECT_TRUE(isWhole || !log_.take().empty()) << call;
    }
    // Items, attributes and the printed text take some.
    EXPECT_GT(call, 10);
}

} // namespace

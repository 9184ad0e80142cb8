#include "tests/pack/container_fixture.h"

#include <cerrno>
#include <functional>
#include <limits>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class ReadingContainers : public ContainerTest {
protected:
    LogLine parseFailure(std::string const& error = "") const {
        return {4, "Failed to parse file " + quoted() + ". Import failed. " + error};
    }
    LogLine searchFailure(std::string const& what) const {
        return {4, what + " import file " + quoted() + ". Possible file corruption"};
    }
    LogLine noIndex() const { return searchFailure("Failed to find meta in"); }

    /// Opens what cannot be imported, and gives the lines.
    std::vector<LogLine> failToOpen() {
        PackWrapper& wrapper = open();
        EXPECT_EQ(wrapper.szBins(), 0u);
        EXPECT_EQ(wrapper.packId(), "");
        return log_.take();
    }

    std::string const EMPTY_ERROR = "Error document empty.";
};

TEST_F(ReadingContainers, GivePagesAndMetadataOfWhatWasWritten) {
    writeMailing();
    PackWrapper& in = open();
    EXPECT_EQ(in.packId(), "m1");
    EXPECT_EQ(in.szBins(), 3u);
    EXPECT_EQ(in.pthFile(), file_.string());
    EXPECT_EQ(page(in, "a.pdf", "2"), PAGE_2);
    EXPECT_EQ(page(in, "a.pdf", "1"), PAGE_1);
    EXPECT_EQ(page(in, "a.pdf", "2"), PAGE_2) << "again";
    EXPECT_EQ(textOf(in.inputFullMeta()), METADATA);
    EXPECT_FALSE(in.outputFinalished());
    EXPECT_THAT(log_.take(), IsEmpty());
}

TEST_F(ReadingContainers, StandInAsASourceOfPages) {
    writeMailing();
    PageLoaderI& source = open();
    std::string answer;
    source.requestPageData("a.pdf", "1", [&](SharedMemBuffer data) { answer = textOf(data); });
    EXPECT_EQ(answer, PAGE_1);
    EXPECT_TRUE(source.nothingPening());
}

TEST_F(ReadingContainers, FindTheIndexOfEachLayout) {
    std::string const blobs = PAGE_1 + PAGE_2;
    std::string const layouts[] = {
        trailingLayout(blobs, indexOf(item("1", 0, PAGE_1) + item("2", PAGE_1.size(), PAGE_2))),
        leadingLayout(blobs, indexOf(item("1", 8, PAGE_1) + item("2", 8 + PAGE_1.size(), PAGE_2))),
        wideLayout("some id", blobs, indexOf(item("1", 0, PAGE_1) + item("2", PAGE_1.size(), PAGE_2))),
        wideLayout("", blobs, indexOf(item("1", 0, PAGE_1) + item("2", PAGE_1.size(), PAGE_2))),
    };
    for (std::string const& layout : layouts) {
        write(layout);
        PackWrapper& in = open();
        EXPECT_EQ(in.packId(), "m1");
        EXPECT_EQ(page(in, "a.pdf", "1"), PAGE_1);
        EXPECT_EQ(page(in, "a.pdf", "2"), PAGE_2);
        EXPECT_THAT(log_.take(), IsEmpty());
    }
}

TEST_F(ReadingContainers, ShowOffsetsFromTheStartOfTheFile) {
    write(wideLayout("id", PAGE_1, indexOf(item("1", 0, PAGE_1))));
    EXPECT_EQ(open().bin(0).offset, 33u);
    EXPECT_EQ(textOf(wrapper_->binData(0)), PAGE_1);
    EXPECT_THROW(wrapper_->binData(1), std::out_of_range);
}

TEST_F(ReadingContainers, LogAFileThatIsNotThere) {
    EXPECT_THAT(failToOpen(), ElementsAre(LogLine{4, "Failed to open for import file " + quoted() +
                                                         ". System error code " + std::to_string(ENOENT)}));
}

TEST_F(ReadingContainers, LogAFolder) {
    std::filesystem::create_directory(file_);
    EXPECT_THAT(failToOpen(),
                ElementsAre(LogLine{4, "Failed to read first bytes from file " + quoted() +
                                           ". Import failed, system error code " + std::to_string(EISDIR)}));
}

TEST_F(ReadingContainers, LogAFileOfFewerThanEighteenBytes) {
    for (std::size_t size : {0, 1, 17}) {
        write(std::string(size, 'T'));
        EXPECT_THAT(failToOpen(), ElementsAre(LogLine{4, "Failed to read first bytes from file " + quoted() +
                                                             ". Import failed, system error code 0"}));
    }
    write(std::string(18, 'x'));
    EXPECT_THAT(failToOpen(), ElementsAre(noIndex(), parseFailure()));
}

TEST_F(ReadingContainers, LogAFileOfNoLayout) {
    write(std::string(1000, 'x'));
    EXPECT_THAT(failToOpen(), ElementsAre(noIndex(), parseFailure()));
}

TEST_F(ReadingContainers, TellTheParsersWordsForADamagedIndex) {
    write(trailingLayout(PAGE_1, "<vantelar><corbulet id=\"m1\"><"));
    EXPECT_THAT(failToOpen(), ElementsAre(noIndex(), parseFailure("Error reading Element value.")));
    write(trailingLayout(PAGE_1, "no markup"));
    EXPECT_THAT(failToOpen(), ElementsAre(noIndex(), parseFailure(EMPTY_ERROR)));
}

TEST_F(ReadingContainers, TryALeadingOffsetWhenTheTrailingOneFails) {
    // The first eight bytes say where the index of the other layout stands; both share the "TE" at 0.
    std::string const index = indexOf(item("1", 8, PAGE_1));
    std::string head = "TE......";
    std::string bytes = head + PAGE_1 + std::string(0x4554, '.');
    std::uint64_t const position = 0x4554;
    bytes.replace(0, 8, littleEndian(position));
    bytes.resize(position);
    bytes += index + littleEndian(3);
    write(bytes);
    // The trailer is behind the end tag: the parser stops before it.
    PackWrapper& in = open();
    EXPECT_EQ(page(in, "a.pdf", "1"), PAGE_1);
    EXPECT_THAT(log_.take(), IsEmpty());
}

TEST_F(ReadingContainers, FallThroughFromATrailerThatPointsBehindTheIndex) {
    std::string bytes = trailingLayout(PAGE_1, indexOf(item("1", 0, PAGE_1)));
    for (std::uint64_t position : {bytes.size() - 8, bytes.size(), std::size_t{1} << 62}) {
        write(bytes.replace(bytes.size() - 8, 8, littleEndian(position)));
        EXPECT_THAT(failToOpen(), ElementsAre(noIndex(), parseFailure()));
    }
}

TEST_F(ReadingContainers, LogAnIndexThatWouldBeginBeforeTheFileHoweverFar) {
    LogLine const line{4, "Failed to read from file " + quoted() + ". Import failed, system error code " +
                              std::to_string(EINVAL)};
    std::int64_t const gigabytes4 = std::int64_t{1} << 32;
    std::string trailing = trailingLayout(PAGE_1, indexOf(item("1", 0, PAGE_1)));
    std::string leading = leadingLayout(PAGE_1, indexOf(item("1", 8, PAGE_1)));
    for (std::int64_t position : {std::int64_t{-1}, 1 - gigabytes4, -gigabytes4, -gigabytes4 - 1,
                                  -2 * gigabytes4, std::numeric_limits<std::int64_t>::min()}) {
        std::string const number = littleEndian(static_cast<std::uint64_t>(position));
        write(trailing.replace(trailing.size() - 8, 8, number));
        EXPECT_THAT(failToOpen(), ElementsAre(line)) << "trailing offset " << position;
        write(leading.replace(0, 8, number));
        EXPECT_THAT(failToOpen(), ElementsAre(line)) << "leading offset " << position;
    }
}

TEST_F(ReadingContainers, LogAWideHeaderCutShort) {
    for (std::size_t size = 18; size < 30; ++size) {
        write(wideHeader("id").substr(0, size));
        EXPECT_THAT(failToOpen(), ElementsAre(searchFailure("Failed to read id from"), parseFailure()));
    }
}

TEST_F(ReadingContainers, LogANegativePositionUnderAWideHeader) {
    write(wideHeader("id") + PAGE_1 + indexOf(item("1", 0, PAGE_1)) + wideTrailer(-7));
    EXPECT_THAT(failToOpen(),
                ElementsAre(searchFailure("Failed to read valid meta position (-1) from"), parseFailure()));
}

TEST_F(ReadingContainers, RefuseAPositionBehindTheTrailerOfAWideHeader) {
    write(wideHeader("id") + PAGE_1 + indexOf(item("1", 0, PAGE_1)) + wideTrailer(1'000'000));
    EXPECT_THAT(failToOpen(), ElementsAre(noIndex(), parseFailure(EMPTY_ERROR)));
}

TEST_F(ReadingContainers, EndTheSearchWhenAWideIndexHasNoSize) {
    write(wideHeader("id") + PAGE_1 + wideTrailer(static_cast<std::int64_t>(PAGE_1.size())));
    EXPECT_THAT(failToOpen(), ElementsAre(noIndex(), parseFailure(EMPTY_ERROR)));
}

TEST_F(ReadingContainers, RefuseASparseIndexOfFourGigabytes) {
    write(PAGE_1);
    std::filesystem::resize_file(file_, (std::uintmax_t{1} << 32) + 100);
    std::ofstream(file_, std::ios::binary | std::ios::app) << littleEndian(50);
    EXPECT_THAT(failToOpen(), ElementsAre(noIndex(), parseFailure()));
}

TEST_F(ReadingContainers, EndASparseIndexAtItsFirstZero) {
    write(PAGE_1);
    std::filesystem::resize_file(file_, std::uintmax_t{3} << 30);
    std::ofstream(file_, std::ios::binary | std::ios::app) << littleEndian(PAGE_1.size());
    EXPECT_THAT(failToOpen(), ElementsAre(noIndex(), parseFailure(EMPTY_ERROR)));

    std::string const index = indexOf(item("1", 0, PAGE_1));
    write(trailingLayout(PAGE_1, index + std::string(5'000'000, '\0') + "<not read"));
    EXPECT_EQ(page(open(), "a.pdf", "1"), PAGE_1);
}

TEST_F(ReadingContainers, ReadAnIndexLargerThanOnePiece) {
    std::string items;
    for (int i = 0; i < 12'000; ++i)
        items += item(std::to_string(i), 0, PAGE_1);
    write(trailingLayout(PAGE_1, indexOf(items)));
    EXPECT_EQ(open().szBins(), 12'000u);
    EXPECT_EQ(page(*wrapper_, "a.pdf", "11999"), PAGE_1);
}

TEST_F(ReadingContainers, RefuseAnIndexNestedTooDeep) {
    auto const nested = [&](int levels) {
        std::string opens, closes;
        for (int i = 0; i < levels; ++i) {
            opens += "<x>";
            closes += "</x>";
        }
        return trailingLayout(PAGE_1, indexOf(opens + closes + item("1", 0, PAGE_1)));
    };
    write(nested(62));
    EXPECT_EQ(page(open(), "a.pdf", "1"), PAGE_1);
    for (int levels : {63, 200'000}) {
        write(nested(levels));
        EXPECT_THAT(failToOpen(),
                    ElementsAre(noIndex(), parseFailure("Error: elements are nested too deep.")));
    }
}

TEST_F(ReadingContainers, RefuseAnIndexWithoutAMailing) {
    for (char const* index :
         {"<other/>", "<vantelar/>", "<vantelar><other><corbulet id='1'/></other></vantelar>",
          "<vantelar><!--corbulet--><corbulet id='1'/></vantelar>", "<corbulet id='1'/>"}) {
        write(trailingLayout(PAGE_1, index));
        EXPECT_THAT(failToOpen(),
                    ElementsAre(LogLine{4, "Invalid metadata in imported file. Missing corbulet element!"}))
            << index;
    }
}

TEST_F(ReadingContainers, RefuseAMailingWithoutAnId) {
    write(trailingLayout(PAGE_1, indexOf(item("1", 0, PAGE_1), "items=\"1\"")));
    EXPECT_THAT(failToOpen(),
                ElementsAre(LogLine{4, "Invalid metadata in imported file. Missing mailing id!"}));
    write(trailingLayout(PAGE_1, indexOf(item("1", 0, PAGE_1), "id=\"\"")));
    EXPECT_EQ(open().szBins(), 1u);
}

TEST_F(ReadingContainers, IgnoreTitleAndCountOfItems) {
    write(trailingLayout(PAGE_1, indexOf(item("1", 0, PAGE_1), "id=\"m\" subject=\"t\" items=\"many\"")));
    EXPECT_EQ(open().szBins(), 1u);
}

TEST_F(ReadingContainers, SkipWhatIsNoItemElement) {
    write(trailingLayout(PAGE_1, indexOf("<!--mailitem-->mailitem<other/>" + item("1", 0, PAGE_1))));
    EXPECT_EQ(open().szBins(), 1u);
    EXPECT_EQ(page(*wrapper_, "a.pdf", "1"), PAGE_1);
}

TEST_F(ReadingContainers, LeaveMissingAndUnreadableAttributesEmpty) {
    write(trailingLayout(PAGE_1, indexOf("<mailitem/><mailitem offset='x' length='-' crc='99999999999'/>"
                                         "<mailitem offset='7' length='4294967295' crc='4294967295'/>")));
    PackWrapper& in = open();
    ASSERT_EQ(in.szBins(), 3u);
    for (unsigned i : {0, 1}) {
        EXPECT_EQ(in.bin(i).name + in.bin(i).role + in.bin(i).document, "");
        EXPECT_EQ(in.bin(i).offset + in.bin(i).length + in.bin(i).crc, 0u);
    }
    EXPECT_EQ(in.bin(2).offset, 7u);
    EXPECT_EQ(in.bin(2).length, 0xFFFFFFFF);
    EXPECT_EQ(in.bin(2).crc, 0xFFFFFFFF);
    EXPECT_EQ(page(in, "", ""), "") << "an item of no length is whole";
    EXPECT_THAT(log_.take(), IsEmpty());
}

TEST_F(ReadingContainers, CannotReadAnItemWithoutLengthWhereNoFileCanReach) {
    write(trailingLayout(PAGE_1, indexOf("<mailitem name='1' offset='9223372036854775808'/>")));
    EXPECT_EQ(page(open(), "", "1"), "");
    EXPECT_THAT(log_.take(), ElementsAre(LogLine{4, "Failed to read binary 1 from import file"}));
}

TEST_F(ReadingContainers, FindAnItemWithoutADocumentByTheEmptyName) {
    std::string const bare = "<mailitem name=\"1\" offset=\"0\" length=\"" + std::to_string(PAGE_1.size()) +
                             "\" role=\"page\" crc=\"" + std::to_string(crcOf(PAGE_1)) + "\"/>";
    write(trailingLayout(PAGE_1, indexOf(bare)));
    EXPECT_EQ(page(open(), "", "1"), PAGE_1);
    EXPECT_EQ(page(*wrapper_, "a.pdf", "1"), std::nullopt);
}

TEST_F(ReadingContainers, GiveTheFirstOfEqualItems) {
    write(trailingLayout(PAGE_1 + PAGE_2, indexOf(item("1", PAGE_1.size(), PAGE_2) + item("1", 0, PAGE_1))));
    EXPECT_EQ(page(open(), "a.pdf", "1"), PAGE_2);
    EXPECT_EQ(textOf(wrapper_->binData(1)), PAGE_1);
}

TEST_F(ReadingContainers, TellDocumentsAndPagesApart) {
    write(trailingLayout(PAGE_1 + PAGE_2,
                         indexOf(item("1", 0, PAGE_1, "ab") + item("b1", PAGE_1.size(), PAGE_2, "a"))));
    EXPECT_EQ(page(open(), "ab", "1"), PAGE_1);
    EXPECT_EQ(page(*wrapper_, "a", "b1"), PAGE_2);
    EXPECT_EQ(page(*wrapper_, "A", "b1"), std::nullopt) << "names are compared byte for byte";
}

TEST_F(ReadingContainers, GiveTheFirstBlobThatIsNoPageAsMetadata) {
    auto const withRole = [](std::string text, std::string const& role) {
        return text.replace(text.find("\"page\""), 6, '"' + role + '"');
    };
    for (std::string const role : {"framework", "", "Page", "cover"}) {
        write(trailingLayout(PAGE_1 + PAGE_2, indexOf(item("1", 0, PAGE_1) +
                                                      withRole(item("x", PAGE_1.size(), PAGE_2), role))));
        EXPECT_EQ(textOf(open().inputFullMeta()), PAGE_2) << role;
    }
}

TEST_F(ReadingContainers, FailWithoutMetadata) {
    write(trailingLayout(PAGE_1, indexOf(item("1", 0, PAGE_1))));
    EXPECT_TRUE(open().inputFullMeta().empty());
    EXPECT_THAT(log_.take(),
                ElementsAre(LogLine{4, "Cannot find binary metadata in imported file " + quoted()}));
    EXPECT_EQ(page(*wrapper_, "a.pdf", "1"), "");
    EXPECT_THAT(log_.take(), ElementsAre(LogLine{4, "Failed to read binary 1 from import file"}));
}

TEST_F(ReadingContainers, FailAsAWholeOnARequestForAnUnknownPage) {
    writeMailing();
    PackWrapper& in = open();
    for (int i = 0; i < 2; ++i) {
        EXPECT_EQ(page(in, "a.pdf", "3"), std::nullopt);
        EXPECT_THAT(log_.take(), ElementsAre(LogLine{4, "Cannot find requested binary in imported file " +
                                                            quoted() + ". Doc a.pdf, page 3"}));
    }
    EXPECT_EQ(page(in, "a.pdf", "1"), "");
    EXPECT_TRUE(in.inputFullMeta().empty());
    EXPECT_THAT(log_.take(), ElementsAre(LogLine{4, "Failed to read binary 1 from import file"},
                                         LogLine{4, "Failed to read binary DDT440001.TDD from import file"}));
    EXPECT_EQ(in.szBins(), 3u);
    EXPECT_FALSE(in.outputFinalished());
    EXPECT_TRUE(std::filesystem::exists(file_)) << "an imported file is never removed";
}

TEST_F(ReadingContainers, DropTheFunctionOfAnUnknownPage) {
    writeMailing();
    auto const held = std::make_shared<int>();
    open().requestPageData("a.pdf", "3", [held](SharedMemBuffer) { FAIL() << "called"; });
    EXPECT_EQ(held.use_count(), 1);
}

TEST_F(ReadingContainers, RefuseAnEmptyFunction) {
    writeMailing();
    EXPECT_THROW(open().requestPageData("a.pdf", "1", {}), std::bad_function_call);
    EXPECT_EQ(page(*wrapper_, "a.pdf", "1"), PAGE_1);
}

TEST_F(ReadingContainers, LetAnExceptionOfTheFunctionThrough) {
    writeMailing();
    EXPECT_THROW(open().requestPageData("a.pdf", "1", [](SharedMemBuffer) { throw std::runtime_error("x"); }),
                 std::runtime_error);
    EXPECT_EQ(page(*wrapper_, "a.pdf", "1"), PAGE_1);
}

TEST_F(ReadingContainers, MayBeDestroyedByTheFunction) {
    writeMailing();
    open().requestPageData("a.pdf", "1", [&](SharedMemBuffer) { wrapper_.reset(); });
    EXPECT_FALSE(wrapper_);
}

TEST_F(ReadingContainers, StayUsableBesideADamagedPage) {
    writeMailing();
    flip(PAGE_1.size() + 5);
    PackWrapper& in = open();
    EXPECT_EQ(page(in, "a.pdf", "2"), "");
    EXPECT_THAT(log_.take(), ElementsAre(LogLine{4, "Failed to verify binary 2 from import file"}));
    EXPECT_EQ(page(in, "a.pdf", "1"), PAGE_1);
    EXPECT_EQ(textOf(in.inputFullMeta()), METADATA);
    EXPECT_THAT(log_.take(), IsEmpty());
}

TEST_F(ReadingContainers, RefuseALengthBehindTheEndOfTheFile) {
    std::string const index =
        indexOf("<mailitem name='long' offset='0' length='4294967295' crc='1'/>"
                "<mailitem name='far' offset='18446744073709551615' length='5' crc='1'/>"
                "<mailitem name='behind' offset='1000000' length='1' crc='1'/>" +
                item("1", 0, PAGE_1));
    write(trailingLayout(PAGE_1, index));
    PackWrapper& in = open();
    for (std::string const name : {"long", "far", "behind"}) {
        EXPECT_EQ(page(in, "", name), "");
        EXPECT_THAT(log_.take(),
                    ElementsAre(LogLine{4, "Failed to read binary " + name + " from import file"}));
    }
    EXPECT_EQ(page(in, "a.pdf", "1"), PAGE_1);
}

TEST_F(ReadingContainers, ReadOnAfterAFileWasCutUnderThem) {
    writeMailing();
    PackWrapper& in = open();
    cut(PAGE_1.size() + 3);
    EXPECT_EQ(page(in, "a.pdf", "2"), "");
    EXPECT_THAT(log_.take(), ElementsAre(LogLine{4, "Failed to read binary 2 from import file"}));
    EXPECT_EQ(page(in, "a.pdf", "1"), PAGE_1);
}

TEST_F(ReadingContainers, ReadPagesNamedInAnotherEncoding) {
    // No declaration: the bytes of the name are taken as they are.
    write(trailingLayout(PAGE_1, "<vantelar><corbulet id='m'>" + item("1", 0, PAGE_1, "M\xFCller") +
                                     "</corbulet></vantelar>"));
    EXPECT_EQ(page(open(), "M\xFCller", "1"), PAGE_1);
    // A character cut at the end must not be read past.
    write(trailingLayout(PAGE_1, "<?xml encoding='UTF-8'?><vantelar>\xF0"));
    EXPECT_THAT(failToOpen(), ElementsAre(noIndex(), parseFailure("Error reading Element value.")));
}

TEST_F(ReadingContainers, NeverImportAFileCutAnywhere) {
    writeMailing();
    for (std::size_t size = read().size(); size-- > 0;) {
        cut(size);
        EXPECT_THAT(failToOpen(), testing::Not(IsEmpty())) << size;
    }
}

TEST_F(ReadingContainers, NeverGiveOtherBytesForAFileCutAnywhere) {
    std::string const layouts[] = {
        leadingLayout(PAGE_1, indexOf(item("1", 8, PAGE_1))),
        wideLayout("id", PAGE_1, indexOf(item("1", 0, PAGE_1))),
    };
    for (std::string const& whole : layouts) {
        write(whole);
        for (std::size_t size = whole.size(); size-- > 0;) {
            cut(size);
            bool const isImported = open().szBins() == 1;
            EXPECT_EQ(log_.take().empty(), isImported) << size;
            EXPECT_TRUE(!isImported || page(*wrapper_, "a.pdf", "1") == PAGE_1) << size;
        }
    }
}

TEST_F(ReadingContainers, NeverGiveOtherBytesForAFlippedBit) {
    std::string const layouts[] = {
        trailingLayout(PAGE_1, indexOf(item("1", 0, PAGE_1))),
        leadingLayout(PAGE_1, indexOf(item("1", 8, PAGE_1))),
        wideLayout("id", PAGE_1, indexOf(item("1", 0, PAGE_1))),
    };
    for (std::string const& whole : layouts) {
        write(whole);
        for (std::size_t bit = 0; bit < whole.size() * 8; ++bit) {
            flip(bit / 8, bit % 8);
            open();
            for (unsigned long long i = 0; i < wrapper_->szBins(); ++i) {
                std::string const bytes = textOf(wrapper_->binData(i));
                EXPECT_TRUE(bytes == PAGE_1 || bytes.empty()) << "bit " << bit;
            }
            flip(bit / 8, bit % 8);
        }
    }
}

TEST_F(ReadingContainers, FailForEveryFlippedBitOfTheTrailer) {
    writeMailing();
    std::size_t const size = read().size();
    for (std::size_t bit = (size - 8) * 8; bit < size * 8; ++bit) {
        flip(bit / 8, bit % 8);
        EXPECT_THAT(failToOpen(), testing::Not(IsEmpty())) << "bit " << bit;
        flip(bit / 8, bit % 8);
    }
}

std::string manyItems(int count) {
    std::string items;
    for (int i = 0; i < count; ++i)
        items += "<mailitem/>";
    return items;
}

TEST_F(ReadingContainers, RefusesMoreItemsThanTheFileHasRoomForBlobs) {
    write(trailingLayout(blobOf("page"), indexOf(manyItems(100'001))));
    EXPECT_TRUE(open().failed());
    EXPECT_THAT(log_.take(),
                testing::Contains(LogLine{4, "Failed to parse file " + quoted() +
                                                 ". Import failed. Error: the index has more elements than "
                                                 "the file has room for blobs."}));
}

TEST_F(ReadingContainers, TakesManyItemsWhereTheFileHasRoomForThem) {
    write(trailingLayout(blobOf("page"), indexOf(manyItems(90'000))));
    EXPECT_EQ(open().szBins(), 90'000u);
    write(trailingLayout(blobOf(std::string(20'000 * 11, 'x')), indexOf(manyItems(110'000))));
    EXPECT_EQ(open().szBins(), 110'000u);
}

} // namespace

#include "programs/carriers/folder_carrier.h"

#include "programs/base/read_file.h"
#include "programs/carriers/control_file.h"
#include "tests/carriers/parcel_help.h"
#include "tests/support/failure_of.h"
#include "tests/support/small_disk.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/json_help.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>

namespace {

namespace fs = std::filesystem;

using Carriers::controlCsv;
using Carriers::csvField;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::StartsWith;

/// Knows the folder as it is.
Carriers::FolderCarrier carrierOf(fs::path const& folder) {
    return {folder, Carriers::identityOfFolder(folder)};
}

TEST(FolderCarrier, WritesADocumentAndTwoControlFilesUnderTheKey) {
    TemporaryFolder const folder;
    Carriers::FolderCarrier carrier = carrierOf(folder.path());
    Carriers::Outcome const outcome = carrier.handOver(parcelOf("p1-1", {"Ada\nLong St 1"}), noRecord);
    EXPECT_EQ(outcome.kind, Carriers::Outcome::Kind::Accepted);
    EXPECT_EQ(outcome.says, "in " + folder.path().string());
    EXPECT_THAT(namesIn(folder.path()), ElementsAre("p1-1.csv", "p1-1.json", "p1-1.pdf"));
    EXPECT_EQ(Base::readFile(folder / "p1-1.pdf"), "%PDF of p1-1");
    EXPECT_EQ(
        Base::readFile(folder / "p1-1.json"),
        R"({"key":"p1-1","mailing":"p1","file":"p1-1.pdf","pages":1,"duplex":false,"letters":[{"order":1,"key":"p1-1","first_page":1,"pages":1,"sheets":1,"coloured_pages":0,"address":"Ada\nLong St 1"}]})"
        "\n");
    EXPECT_EQ(Base::readFile(folder / "p1-1.csv"),
              "order;key;file;first_page;pages;sheets;duplex;coloured_pages;address\r\n"
              "1;p1-1;p1-1.pdf;1;1;1;0;0;Ada, Long St 1\r\n");
}

TEST(FolderCarrier, ReplacesWhatItHandedOverBeforeUnderTheKey) {
    TemporaryFolder const folder;
    Carriers::FolderCarrier carrier = carrierOf(folder.path());
    carrier.handOver(parcelOf("p1-1", {"Ada"}), noRecord);
    fs::remove(folder / "p1-1.json");
    fs::create_symlink("/etc/passwd", folder / "p1-1.json");
    carrier.handOver(parcelOf("p1-1", {"Bert"}), noRecord);
    EXPECT_EQ(namesIn(folder.path()).size(), 3U);
    EXPECT_FALSE(fs::is_symlink(folder / "p1-1.json"));
    EXPECT_THAT(Base::readFile(folder / "p1-1.json"), HasSubstr("Bert"));
}

TEST(FolderCarrier, FailsWhereTheFolderIsGone) {
    TemporaryFolder const folder;
    fs::create_directory(folder / "gone");
    Carriers::FolderCarrier carrier = carrierOf(folder / "gone");
    fs::remove_all(folder / "gone");
    std::string const text =
        "there is no folder " + (folder / "gone").string() + ": No such file or directory";
    EXPECT_EQ(failureOf([&] { carrier.handOver(parcelOf("p1-1", {"Ada"}), noRecord); }), text);
    EXPECT_EQ(failureOf([&] { carrier.test(); }), text);
}

TEST(FolderCarrier, WritesNothingWhereAShareIsNotMounted) {
    TemporaryFolder const folder;
    fs::path const shop = folder / "shop";
    fs::create_directory(shop);
    Carriers::FolderCarrier carrier = carrierOf(shop);
    std::string const mark = Base::readFile(shop / ".vlserviced");
    fs::rename(shop, folder / "unmounted");
    fs::create_directory(shop);
    std::string const text = "the folder " + shop.string() +
                             " is another one than before: mount the one whose file .vlserviced reads " +
                             mark;
    EXPECT_EQ(failureOf([&] { carrier.handOver(parcelOf("p1-1", {"Ada"}), noRecord); }), text);
    EXPECT_EQ(failureOf([&] { carrier.test(); }), text);
    EXPECT_TRUE(fs::is_empty(shop));
    fs::remove(shop);
    fs::rename(folder / "unmounted", shop);
    EXPECT_EQ(carrier.handOver(parcelOf("p1-1", {"Ada"}), noRecord).kind, Carriers::Outcome::Kind::Accepted);
}

TEST(FolderCarrier, WritesNothingIntoAFolderThatNobodyKnows) {
    TemporaryFolder const folder;
    Carriers::FolderCarrier carrier(folder.path(), {});
    std::string const text = "the folder " + folder.path().string() +
                             " could not be had when it was set: set \"carriers\" once more";
    EXPECT_EQ(failureOf([&] { carrier.handOver(parcelOf("p1-1", {"Ada"}), noRecord); }), text);
    EXPECT_TRUE(fs::is_empty(folder.path()));
}

TEST(FolderCarrier, LeavesNothingHalfOnAFullDisk) {
    VLServiceTest::SmallDisk const disk;
    if (!disk.whyNot().empty())
        GTEST_SKIP() << disk.whyNot();
    Carriers::FolderCarrier carrier = carrierOf(disk.path());
    Carriers::Parcel parcel = parcelOf("p1-1", {"Ada"});
    parcel.document.assign(100'000, 'x');
    EXPECT_THAT(failureOf([&] { carrier.handOver(parcel, noRecord); }), HasSubstr("No space left on device"));
    EXPECT_THAT(namesIn(disk.path()), ElementsAre());
}

TEST(FolderCarrier, SaysWhatRoomThereIsAndLeavesNothing) {
    TemporaryFolder const folder;
    EXPECT_THAT(carrierOf(folder.path()).test(),
                StartsWith(folder.path().string() + " can be written into and has room for "));
    EXPECT_THAT(namesIn(folder.path()), ElementsAre());
}

TEST(ControlFiles, TellOfEachLetterWhereItBegins) {
    Carriers::Parcel const parcel = parcelOf("p1-postal", {"Ada", "Bert"});
    EXPECT_EQ(controlCsv(parcel, "p1-postal.pdf"),
              "order;key;file;first_page;pages;sheets;duplex;coloured_pages;address\r\n"
              "1;p1-1;p1-postal.pdf;1;1;1;0;0;Ada\r\n"
              "2;p1-2;p1-postal.pdf;2;1;1;0;0;Bert\r\n");
}

TEST(ControlFiles, HoldNothingThatASpreadsheetWouldWorkOut) {
    struct {
        char const* text;
        char const* field;
    } const cases[] = {
        {"Ada", "Ada"},
        {"", ""},
        {"=1+1", "'=1+1"},
        {"+49 30 1", "'+49 30 1"},
        {"-1", "'-1"},
        {"@SUM", "'@SUM"},
        {"a;b", "\"a;b\""},
        {"say \"hi\"", "\"say \"\"hi\"\"\""},
        {"=\"a\";1", "\"'=\"\"a\"\";1\""},
        {"one\ntwo", "one, two"},
        {"one\r\ntwo", "one , two"},
        {"a\tb", "a b"},
        {"\xff", "\xEF\xBF\xBD"},
    };
    for (auto const& [text, field] : cases)
        EXPECT_EQ(csvField(text), field) << text;
}

} // namespace

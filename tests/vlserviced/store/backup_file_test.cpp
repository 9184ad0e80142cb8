#include "programs/vlserviced/store/backup_file.h"

#include "programs/base/digest.h"
#include "programs/base/read_file.h"
#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <fstream>

namespace {

namespace fs = std::filesystem;

using VlServiced::extractBackup;
using VlServiced::writeBackup;

class BackupFileTest : public testing::Test {
protected:
    BackupFileTest() {
        put("database", std::string("\0one\xFF", 5));
        put("empty", "");
        writeBackup(file_,
                    {{"service.db", folder_ / "database"},
                     {"token", folder_ / "empty"},
                     {"outbox/p1.mailing", folder_ / "database"}},
                    1'795'000'000);
    }

    void put(std::string const& name, std::string const& bytes) const {
        std::ofstream(folder_.path() / name, std::ios::binary) << bytes;
    }
    /// Of a file with these bytes.
    std::string refusal(std::string const& bytes) const {
        put("tried", bytes);
        fs::remove_all(folder_ / "out");
        return failureOf([&] { extractBackup(folder_ / "tried", folder_ / "out"); });
    }
    /// A backup with that header, the rest, and the right digest behind it.
    std::string refusalOfHeader(std::string const& header, std::string const& rest = "") const {
        std::string const text = "VLSERVICED BACKUP 1\n" + header + '\n' + rest;
        return refusal(text + Base::sha256(text) + '\n');
    }
    std::string damaged() const {
        return "the backup " + (folder_ / "tried").string() + " is damaged or cut off: take another one";
    }

    TemporaryFolder folder_;
    fs::path file_ = folder_ / "backup";
};

TEST_F(BackupFileTest, GivesBackWhatItHolds) {
    EXPECT_EQ(extractBackup(file_, folder_ / "out"), 1'795'000'000);
    EXPECT_EQ(Base::readFile(folder_ / "out" / "service.db"), std::string("\0one\xFF", 5));
    EXPECT_EQ(Base::readFile(folder_ / "out" / "outbox" / "p1.mailing"), std::string("\0one\xFF", 5));
    EXPECT_EQ(Base::readFile(folder_ / "out" / "token"), "");
}

TEST_F(BackupFileTest, IsForItsOwnerAloneAsIsAllOfIt) {
    EXPECT_EQ(fs::status(file_).permissions(), fs::perms(0600));
    extractBackup(file_, folder_ / "out");
    EXPECT_EQ(fs::status(folder_ / "out" / "service.db").permissions(), fs::perms(0600));
}

TEST_F(BackupFileTest, IsWrittenOverNothing) {
    EXPECT_EQ(failureOf([&] { writeBackup(file_, {}, 1); }),
              file_.string() + " is there already: name another file");
}

TEST_F(BackupFileTest, IsRefusedWhenItIsCutAnywhere) {
    std::string const whole = Base::readFile(file_);
    for (std::size_t size = 20; size < whole.size(); ++size)
        EXPECT_EQ(refusal(whole.substr(0, size)), damaged()) << size;
    EXPECT_EQ(refusal(whole + '\n'), damaged());
}

TEST_F(BackupFileTest, IsRefusedWithAnyByteFlippedBehindItsName) {
    std::string const whole = Base::readFile(file_);
    for (std::size_t at = 20; at < whole.size(); ++at) {
        std::string flipped = whole;
        flipped[at] = static_cast<char>(flipped[at] ^ 1);
        EXPECT_EQ(refusal(flipped), damaged()) << at;
    }
}

TEST_F(BackupFileTest, IsToldFromOtherFilesAndFromNewerOnes) {
    std::string const tried = (folder_ / "tried").string();
    for (std::string const& bytes : {std::string(), std::string("hello"),
                                     std::string("SQLite format 3\0", 16), std::string("VLSERVICED BACKU")})
        EXPECT_EQ(refusal(bytes), tried + " is no backup of vlserviced");
    EXPECT_EQ(refusal("VLSERVICED BACKUP 2\n{}"),
              "the backup " + tried + " was made by a newer version of this program: use that version");
}

TEST_F(BackupFileTest, IsRefusedForWhatItsHeaderSaysThoughItsDigestIsRight) {
    for (char const* const members :
         {R"({"name":"../token","bytes":0})", R"({"name":"outbox/../x.mailing","bytes":0})",
          R"({"name":"outbox/.x.mailing","bytes":0})", R"({"name":"outbox/x","bytes":0})",
          R"({"name":"/etc/passwd","bytes":0})", R"({"name":"lock","bytes":0})",
          R"({"name":"token","bytes":-1})", R"({"name":"token","bytes":1})",
          R"({"name":"token","bytes":9223372036854775807})",
          R"({"name":"token","bytes":0},{"name":"token","bytes":0})", R"({"name":5,"bytes":0})",
          R"({"bytes":0})", R"(7)"})
        EXPECT_EQ(refusalOfHeader(std::string(R"({"made":1,"members":[)") + members + "]}"), damaged())
            << members;
    EXPECT_EQ(refusalOfHeader(R"({"made":"now","members":[]})"), damaged());
    EXPECT_EQ(refusalOfHeader(R"({"made":1})"), damaged());
    EXPECT_EQ(refusalOfHeader("[]"), damaged());
    EXPECT_EQ(refusalOfHeader(R"({"made":1,"members":[]})", "more"), damaged());
    EXPECT_EQ(refusalOfHeader(R"({"made":1,"members":[]})"), "nothing was thrown");
}

} // namespace

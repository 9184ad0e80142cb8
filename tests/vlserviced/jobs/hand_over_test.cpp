#include "programs/vlserviced/jobs/hand_over.h"

#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <fstream>
#include <iterator>
#include <sys/stat.h>

namespace {

namespace fs = std::filesystem;

using VlServiced::UploadFolder;

class HandOver : public testing::Test {
protected:
    HandOver() {
        fs::create_directories(container_.parent_path());
        fs::create_directories(upload_);
        write(container_, "bytes");
    }
    static void write(fs::path const& file, std::string const& text) { std::ofstream(file) << text; }
    static std::string read(fs::path const& file) {
        std::ifstream in(file);
        return {std::istreambuf_iterator<char>(in), {}};
    }
    /// Less the folder's mark.
    std::ptrdiff_t filesInUpload() const { return std::distance(fs::directory_iterator(upload_), {}) - 1; }
    UploadFolder upload() const { return {upload_, identity_}; }
    std::string report(std::string const& text) {
        write(upload_ / "p1.mailing.status", text);
        auto const found = VlServiced::carrierReport(upload(), "p1.mailing");
        return found ? (found->delivered ? "delivered: " : "failed: ") + found->text : "none";
    }

    TemporaryFolder folder_;
    fs::path container_ = folder_.path() / "outbox" / "p1.mailing";
    fs::path upload_ = folder_.path() / "upload";
    std::string identity_;
};

TEST_F(HandOver, ShowsTheContainerOnlyWhenItIsPublished) {
    VlServiced::stage(container_, upload());
    EXPECT_FALSE(VlServiced::liesIn(upload(), "p1.mailing"));
    EXPECT_EQ(read(upload_ / ".p1.mailing.part"), "bytes");
    VlServiced::publish("p1.mailing", upload());
    EXPECT_TRUE(VlServiced::liesIn(upload(), "p1.mailing"));
    EXPECT_EQ(read(upload_ / "p1.mailing"), "bytes");
    EXPECT_EQ(filesInUpload(), 1);
    EXPECT_TRUE(fs::exists(container_));
}

TEST_F(HandOver, PublishesOnceHoweverOftenItIsCalled) {
    VlServiced::stage(container_, upload());
    VlServiced::publish("p1.mailing", upload());
    fs::remove(upload_ / "p1.mailing");
    VlServiced::publish("p1.mailing", upload());
    EXPECT_EQ(filesInUpload(), 0) << "what the carrier has taken came back";
}

TEST_F(HandOver, PublishesWhatWasStagedUnderTheFenceOnRecordAndNothingElse) {
    VlServiced::stage(container_, upload(), 3);
    write(container_, "of the service that went on");
    VlServiced::stage(container_, upload(), 4);
    VlServiced::publish("p1.mailing", upload(), 4);
    EXPECT_EQ(read(upload_ / "p1.mailing"), "of the service that went on");
    fs::remove(upload_ / "p1.mailing");
    VlServiced::publish("p1.mailing", upload(), 4);
    EXPECT_FALSE(VlServiced::liesIn(upload(), "p1.mailing"));
    EXPECT_EQ(read(upload_ / ".p1.mailing.3.part"), "bytes");
    VlServiced::unstage("p1.mailing", upload(), 3);
    EXPECT_EQ(filesInUpload(), 0);
}

TEST_F(HandOver, SweepsWhatWasStagedUnderFencesThatAreOfNoUse) {
    for (long long const fence : {1, 2, 3})
        VlServiced::stage(container_, upload(), fence);
    char const* const others[] = {".p1.mailing.part", ".p1.mailing.x.part", ".p1.mailing.1.parts",
                                  "p1.mailing.1.part"};
    for (char const* const other : others)
        write(upload_ / other, "of somebody else");
    VlServiced::sweepStaged(upload(), [](std::string const& name, long long fence) {
        EXPECT_EQ(name, "p1.mailing");
        return fence == 2;
    });
    EXPECT_FALSE(fs::exists(upload_ / ".p1.mailing.1.part"));
    EXPECT_TRUE(fs::exists(upload_ / ".p1.mailing.2.part"));
    EXPECT_FALSE(fs::exists(upload_ / ".p1.mailing.3.part"));
    for (char const* const other : others)
        EXPECT_TRUE(fs::exists(upload_ / other)) << other;
}

TEST_F(HandOver, StagesAgainOverWhatACrashLeft) {
    write(upload_ / ".p1.mailing.part", "half of a longer container");
    VlServiced::stage(container_, upload());
    EXPECT_EQ(read(upload_ / ".p1.mailing.part"), "bytes");
}

TEST_F(HandOver, SaysNothingOfAFolderThatIsGone) {
    fs::remove(upload_);
    EXPECT_EQ(failureOf([&] { upload(); }),
              "there is no upload folder " + upload_.string() + ": No such file or directory");
}

TEST_F(HandOver, KnowsTheFolderAgainUnderAnotherName) {
    identity_ = upload().identity().text();
    fs::rename(upload_, folder_ / "moved");
    upload_ = folder_ / "moved";
    EXPECT_EQ(failureOf([&] { upload(); }), "nothing was thrown");
    EXPECT_EQ(upload().identity().text(), identity_);
}

TEST_F(HandOver, SaysNothingOfAnotherFolderOfTheName) {
    std::string const mark = upload().identity().mark;
    identity_ = upload().identity().text();
    std::string const message = "the upload folder " + upload_.string() +
                                " is another one than before: mount the one whose file .vlserviced reads " +
                                mark;
    fs::rename(upload_, folder_ / "unmounted");
    fs::create_directory(upload_);
    EXPECT_EQ(failureOf([&] { upload(); }), message) << "an empty mount point";
    EXPECT_FALSE(fs::exists(upload_ / UploadFolder::MARK_FILE));
    fs::copy(folder_ / "unmounted", upload_, fs::copy_options::recursive);
    EXPECT_EQ(failureOf([&] { upload(); }), message) << "a copy with its mark";
}

TEST_F(HandOver, StaysInTheFolderThatItHasOpened) {
    UploadFolder const folder = upload();
    VlServiced::stage(container_, folder);
    fs::rename(upload_, folder_ / "unmounted");
    fs::create_directory(upload_);
    VlServiced::publish("p1.mailing", folder);
    EXPECT_TRUE(fs::exists(folder_.path() / "unmounted" / "p1.mailing"));
    EXPECT_TRUE(fs::is_empty(upload_));
}

TEST_F(HandOver, WritesThroughNoLinkUnderTheTemporaryName) {
    fs::path const victim = folder_ / "service.db";
    write(victim, "precious");
    fs::create_symlink(victim, upload_ / ".p1.mailing.part");
    VlServiced::stage(container_, upload());
    VlServiced::publish("p1.mailing", upload());
    EXPECT_EQ(read(victim), "precious");
    EXPECT_FALSE(fs::is_symlink(upload_ / "p1.mailing"));
    EXPECT_EQ(read(upload_ / "p1.mailing"), "bytes");
}

TEST_F(HandOver, TakesNoLinkForAMarkOrAReport) {
    write(folder_ / "mark", std::string(32, 'a'));
    write(folder_ / "report", R"({"state":"delivered"})");
    fs::create_symlink(folder_ / "mark", upload_ / UploadFolder::MARK_FILE);
    fs::create_symlink(folder_ / "report", upload_ / "p1.mailing.status");
    EXPECT_NE(upload().identity().mark, std::string(32, 'a'));
    EXPECT_EQ(read(folder_ / "mark"), std::string(32, 'a'));
    EXPECT_FALSE(VlServiced::carrierReport(upload(), "p1.mailing"));
}

TEST_F(HandOver, KeepsTheRightsOfTheContainer) {
    fs::permissions(container_, fs::perms(0640));
    VlServiced::stage(container_, upload());
    EXPECT_EQ(fs::status(upload_ / ".p1.mailing.part").permissions(), fs::perms(0640));
}

TEST_F(HandOver, ReadsWhatTheCarrierReports) {
    EXPECT_FALSE(VlServiced::carrierReport(upload(), "p1.mailing"));
    EXPECT_EQ(report(R"({"state":"delivered"})"), "delivered: ");
    EXPECT_EQ(report(R"({"state":"failed","text":"no such street"})"), "failed: no such street");
    EXPECT_EQ(report(R"({"state":"lost"})"), "none");
    EXPECT_EQ(report("{}"), "none");
    EXPECT_EQ(report("no JSON"), "none");
    EXPECT_EQ(report(""), "none");
    EXPECT_EQ(report(R"({"state":"delivered","text":")" + std::string(70000, 'x') + "\"}"), "none");
}

TEST_F(HandOver, TakesNoPipeForAReport) {
    ASSERT_EQ(::mkfifo((upload_ / "p1.mailing.status").c_str(), 0600), 0);
    EXPECT_FALSE(VlServiced::carrierReport(upload(), "p1.mailing"));
}

} // namespace

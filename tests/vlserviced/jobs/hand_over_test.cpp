#include "programs/vlserviced/jobs/hand_over.h"

#include "tests/support/failure_of.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <fstream>
#include <iterator>
#include <sys/stat.h>

namespace {

namespace fs = std::filesystem;

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
    std::ptrdiff_t filesInUpload() const { return std::distance(fs::directory_iterator(upload_), {}); }
    std::string report(std::string const& text) {
        write(upload_ / "p1.mailing.status", text);
        auto const found = VlServiced::carrierReport(upload_, "p1.mailing");
        return found ? (found->delivered ? "delivered: " : "failed: ") + found->text : "none";
    }

    TemporaryFolder folder_;
    fs::path container_ = folder_.path() / "outbox" / "p1.mailing";
    fs::path upload_ = folder_.path() / "upload";
};

TEST_F(HandOver, ShowsTheContainerOnlyWhenItIsPublished) {
    VlServiced::stage(container_, upload_);
    EXPECT_FALSE(VlServiced::liesIn(upload_, "p1.mailing"));
    EXPECT_EQ(read(upload_ / ".p1.mailing.part"), "bytes");
    VlServiced::publish("p1.mailing", upload_);
    EXPECT_TRUE(VlServiced::liesIn(upload_, "p1.mailing"));
    EXPECT_EQ(read(upload_ / "p1.mailing"), "bytes");
    EXPECT_EQ(filesInUpload(), 1);
    EXPECT_TRUE(fs::exists(container_));
}

TEST_F(HandOver, PublishesOnceHoweverOftenItIsCalled) {
    VlServiced::stage(container_, upload_);
    VlServiced::publish("p1.mailing", upload_);
    fs::remove(upload_ / "p1.mailing");
    VlServiced::publish("p1.mailing", upload_);
    EXPECT_EQ(filesInUpload(), 0) << "what the carrier has taken came back";
}

TEST_F(HandOver, StagesAgainOverWhatACrashLeft) {
    write(upload_ / ".p1.mailing.part", "half of a longer container");
    VlServiced::stage(container_, upload_);
    EXPECT_EQ(read(upload_ / ".p1.mailing.part"), "bytes");
}

TEST_F(HandOver, SaysNothingOfAFolderThatIsGone) {
    fs::remove(upload_);
    std::string const message =
        "there is no upload folder " + upload_.string() + ": No such file or directory";
    EXPECT_EQ(failureOf([&] { VlServiced::stage(container_, upload_); }), message);
    EXPECT_EQ(failureOf([&] { VlServiced::publish("p1.mailing", upload_); }), message);
    EXPECT_EQ(failureOf([&] { VlServiced::liesIn(upload_, "p1.mailing"); }), message);
}

TEST_F(HandOver, ReadsWhatTheCarrierReports) {
    EXPECT_FALSE(VlServiced::carrierReport(upload_, "p1.mailing"));
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
    EXPECT_FALSE(VlServiced::carrierReport(upload_, "p1.mailing"));
}

} // namespace

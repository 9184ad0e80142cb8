#include "programs/vlserviced/jobs/retention.h"

#include "programs/base/digest.h"
#include "programs/vlserviced/jobs/hand_over.h"
#include "programs/vlserviced/store/schema.h"
#include "tests/support/temporary_folder.h"
#include "tests/vlserviced/json_help.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <iterator>

namespace {

namespace fs = std::filesystem;

using testing::HasSubstr;
using testing::Not;
using VlServiced::Job;
using VlServiced::JobState;
using VlServiced::UploadFolder;

constexpr long long DAY = 86'400;

class RetentionTest : public testing::Test {
protected:
    RetentionTest() {
        fs::create_directory(outbox_);
        fs::create_directory(upload_);
    }

    void add(std::string const& id, JobState state, std::string const& uploadFolder = "") {
        Job job;
        job.pack = {"channel", "packs", id};
        job.title = "Secret title of " + id;
        job.acceptedAt = now_;
        jobs_.accept(job);
        if (!uploadFolder.empty()) {
            jobs_.advance(id, JobState::Accepted, JobState::Queued, now_);
            jobs_.beginSubmitting(id, uploadFolder, UploadFolder(uploadFolder, "").identity().text(), now_);
            jobs_.advance(id, JobState::Submitting, state, now_);
        } else if (state == JobState::Failed) {
            jobs_.fail(id, "the letter of Mr Secret", now_);
        } else {
            jobs_.advance(id, JobState::Accepted, state, now_);
        }
    }
    void sweep() {
        while (retention_.removeSome()) {
        }
        retention_.finish();
    }
    std::vector<std::string> left() {
        std::vector<std::string> ids;
        for (Job const& job : jobs_.matching({}, 1000))
            ids.push_back(job.pack.packId);
        return ids;
    }
    std::string allBytes() const {
        std::string all;
        for (fs::directory_entry const& file : fs::directory_iterator(folder_.path()))
            if (file.is_regular_file()) {
                std::ifstream in(file.path(), std::ios::binary);
                all.append(std::istreambuf_iterator<char>(in), {});
            }
        return all;
    }

    TemporaryFolder folder_;
    fs::path outbox_ = folder_ / "outbox";
    fs::path upload_ = folder_ / "upload";
    std::unique_ptr<Database::Connection> database_ = VlServiced::openServiceDatabase(folder_ / "service.db");
    VlServiced::JobStore jobs_{*database_};
    VlServiced::LetterRegister register_{*database_};
    json::Object settings_;
    long long now_ = 1000 * DAY;
    VlServiced::Retention retention_{jobs_, register_, outbox_,
                                     [this] { return VlServiced::ServiceSettings(settings_); },
                                     [this] { return now_; }};
};

TEST_F(RetentionTest, RemovesJobsThatEnded90DaysAgo) {
    for (JobState const state :
         {JobState::Lodged, JobState::Delivered, JobState::Failed, JobState::Cancelled, JobState::Tried})
        add(std::string("ended ") + stateName(state), state);
    now_ += 90 * DAY;
    sweep();
    EXPECT_EQ(left().size(), 5u) << "to the second";
    add("new", JobState::Delivered);
    ++now_;
    sweep();
    EXPECT_THAT(left(), testing::ElementsAre("new"));
}

TEST_F(RetentionTest, KeepsWhatHasNotEndedHoweverOldItIs) {
    for (JobState const state :
         {JobState::Accepted, JobState::Held, JobState::Queued, JobState::Submitting, JobState::Submitted})
        add(stateName(state), state);
    now_ += 1000 * DAY;
    sweep();
    EXPECT_EQ(left().size(), 5u);
}

TEST_F(RetentionTest, CountsFromTheEndAndNotFromTheBeginning) {
    add("slow", JobState::Held);
    now_ += 100 * DAY;
    jobs_.advance("slow", JobState::Held, JobState::Cancelled, now_);
    sweep();
    EXPECT_EQ(left().size(), 1u);
    now_ += 91 * DAY;
    sweep();
    EXPECT_EQ(left().size(), 0u);
}

TEST_F(RetentionTest, IsWhatTheSettingsSayAndForEverWithZero) {
    add("p1", JobState::Delivered);
    settings_ = parse(R"({"retention_days":0})");
    now_ += 10'000 * DAY;
    sweep();
    EXPECT_EQ(left().size(), 1u);
    settings_ = parse(R"({"retention_days":1})");
    sweep();
    EXPECT_EQ(left().size(), 0u);
}

TEST_F(RetentionTest, RemovesContainersFromTheOutboxAndFromTheFolderThatTheyWereHandedTo) {
    std::ofstream(outbox_ / "tried.mailing") << "container";
    add("tried", JobState::Tried);
    for (char const* name : {"delivered.mailing", "delivered.mailing.status", "other.mailing"})
        std::ofstream(upload_ / name) << "container";
    add("delivered", JobState::Delivered, upload_.string());
    now_ += 91 * DAY;
    sweep();
    EXPECT_TRUE(fs::is_empty(outbox_));
    EXPECT_FALSE(fs::exists(upload_ / "delivered.mailing"));
    EXPECT_FALSE(fs::exists(upload_ / "delivered.mailing.status"));
    EXPECT_TRUE(fs::exists(upload_ / "other.mailing"));
}

TEST_F(RetentionTest, TouchesNothingInAnotherFolderOfThatName) {
    add("delivered", JobState::Delivered, upload_.string());
    fs::remove_all(upload_);
    fs::create_directory(upload_);
    std::ofstream(upload_ / "delivered.mailing") << "of somebody else";
    now_ += 91 * DAY;
    sweep();
    EXPECT_TRUE(fs::exists(upload_ / "delivered.mailing"));
    EXPECT_EQ(left().size(), 0u);
}

TEST_F(RetentionTest, KeepsAJobWhoseContainerCannotBeRemoved) {
    fs::create_directories(outbox_ / "p1.mailing/full");
    add("p1", JobState::Tried);
    now_ += 91 * DAY;
    sweep();
    EXPECT_EQ(left().size(), 1u);
    fs::remove_all(outbox_ / "p1.mailing");
    sweep();
    EXPECT_EQ(left().size(), 0u);
}

TEST_F(RetentionTest, LeavesNoByteOfAJobInDatabaseAndLog) {
    for (int i = 0; i < 200; ++i)
        add("p" + std::to_string(i), i % 2 == 0 ? JobState::Failed : JobState::Delivered);
    EXPECT_THAT(allBytes(), HasSubstr("Secret title of p7"));
    now_ += 91 * DAY;
    sweep();
    EXPECT_EQ(left().size(), 0u);
    EXPECT_THAT(allBytes(), Not(HasSubstr("Secret")));
    EXPECT_EQ(fs::file_size(folder_ / "service.db-wal"), 0u);
}

TEST_F(RetentionTest, KeepsTheLettersThatWereSentForAsLongAsTheirOwnDaysSay) {
    auto const enter = [&](std::string const& pack, long long days) {
        register_.enter({pack, "a=acme", now_, now_ + days * DAY}, {{Base::sha256(pack), 1}},
                        VlServiced::LetterRegister::Known::Refused);
    };
    auto const isKnown = [&](std::string const& pack) {
        return !register_.find({Base::sha256(pack)}, now_).empty();
    };
    auto const entries = [&] { return database_->number("SELECT count(*) FROM registered_letters"); };
    add("short", JobState::Delivered);
    enter("short", 30);
    add("long", JobState::Delivered);
    enter("long", 365);
    now_ += 91 * DAY;
    sweep();
    EXPECT_EQ(left().size(), 0u);
    EXPECT_FALSE(isKnown("short"));
    EXPECT_TRUE(isKnown("long")) << "longer than its job";
    EXPECT_EQ(entries(), 1);
    settings_ = parse(R"({"retention_days":0})");
    now_ += 365 * DAY;
    sweep();
    EXPECT_EQ(entries(), 0) << "also where jobs are kept for ever";
}

} // namespace
